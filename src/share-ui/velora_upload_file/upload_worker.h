#pragma once
// The worker of a run, and the callback by which the cloud client's thread reports a transfer. Neither touches a
// widget: they store plain words and write to the view's pipe.
//
// Messages, N the file's place in its run and R the run's number: "update.N.R" (look at the file again), "store.N.R"
// (it has ended), "selection.R" (it has lost its selection flag), "end.R", "storage_full.R".
#include "velora_upload_file/upload_run.h"

// Worker thread; `run` is an UploadRun. Null.
void *__thread_upload_file(void *run);
// Client thread; `file` is a RunFile.
void __upload_file_cb(int state, int ignored, int progress, int error, void *file);

// Starts the worker of a prepared run; false when there can be no thread. Main loop only.
bool __worker_start(UploadRun *run);
// Lets the worker look at its transfer at once. Any thread.
void __worker_wake(const UploadRun &run);
// Waits for a worker that has sent its last message, or has nothing left to send. Main loop only.
void __worker_join(UploadRun *run);
// Ends the running transfer and waits for the worker. Main loop only.
void __worker_stop(UploadRun *run);

// Sends a message of a run ("end" becomes "end.R"). Any thread.
void __run_send(const UploadRun &run, const char *verb);

// The name under which a file went up, or is to go up: another client may have taken the wanted one meanwhile. Any
// thread.
std::string __landed_name(const RunFile &file);
