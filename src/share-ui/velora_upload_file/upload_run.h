#pragma once
// A run: the files that one Done, or one retry, sends. A value that is fixed when its worker starts, and beside it the
// words in which the worker and the cloud client's thread report.
#include "velora_common/velora_app_data.h"
#include "velora_common/velora_upload_item.h"
#include <atomic>
#include <memory>
#include <pthread.h>
#include <semaphore>
#include <string>
#include <vector>

struct UploadRun;

struct RunFile {
    const UploadRun *run = nullptr;
    int index = 0; // its place in the run, by which messages mean it
    UploadItemHold item;
    std::string destination; // server path
    gint64 size = 0;         // bytes, when the run was prepared
};

// What comes of a run while it goes on. Each word has one writer, but for those that say otherwise; any thread reads.
struct RunReport {
    std::atomic<int> canceled = 0;                 // cancel requests; main loop
    std::atomic<int> success = 0;                  // worker
    std::atomic<int> fail = 0;                     // worker
    std::atomic<int> current = 0;                  // index of the file the worker is on
    std::atomic<gint64> bytes_canceled = 0;        // main loop
    int seen = 0, seen_ended = 0;                  // files that the line above the list has added up; main loop
    gint64 seen_bytes = 0;                         // of the latter; main loop
    std::unique_ptr<std::atomic<bool>[]> selected; // one flag a file; main loop, and the worker when a file has ended
    std::atomic<int> selected_count = 0;           // of those flags that are set; the same
    std::atomic<int> callbacks = 0;                // of transfers that are running; client thread
    bool waits = false;                            // the notification says what for; client thread
    std::atomic<bool> is_stopping = false;         // the worker has to leave; main loop
    std::counting_semaphore<> wake{0};             // a transfer ended or was cancelled, or the worker has to leave
};

// Made on the main loop, and kept by the view and by its worker. Nothing but the report changes once the worker runs.
struct UploadRun {
    int number = 0; // never given out twice
    ClientHold client;
    Ecore_Pipe *pipe = nullptr; // the view's, which outlives the worker
    std::string folder;         // where the files go
    std::vector<RunFile> files;
    gint64 bytes = 0; // of all files
    int noti_id = -1; // the ongoing notification; -1 when there is none
    mutable RunReport report;

    pthread_t thread = 0; // main loop
    bool is_joinable = false;

    int total() const
    {
        return static_cast<int>(files.size());
    }
    int remaining() const // what has not been taken out
    {
        return total() - report.canceled;
    }
    int queued() const // what has not ended either
    {
        return remaining() - report.success - report.fail;
    }
    int selected() const
    {
        return report.selected_count;
    }
    bool is_selected(int index) const
    {
        return index >= 0 && index < total() && report.selected[static_cast<size_t>(index)];
    }
    void select(int index, bool is_on) const
    {
        if (index >= 0 && index < total() && report.selected[static_cast<size_t>(index)].exchange(is_on) != is_on)
            report.selected_count += is_on ? 1 : -1;
    }
};
using RunHold = std::shared_ptr<UploadRun>;
