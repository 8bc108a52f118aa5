#pragma once
// The files of a run in the cloud client's book of uploads, which outlives the process. Any thread; what cannot be
// written is logged, where the disk is full told to the person, and costs nothing but going on after a crash.
#include "velora_upload_file/upload_run.h"

// Enters the run's files that wait.
void __book_enter(const UploadRun &run);
// Takes out files that are not going to be sent.
void __book_forget(const UploadRun &run, const std::vector<const RunFile *> &files);

struct BookEntry {
    std::string path;        // on the device
    std::string destination; // server path
};
// What is entered and has not come to an end: while no run is under way, what an earlier process has left.
std::vector<BookEntry> __book_entries(cloud_content_sync_h client);
