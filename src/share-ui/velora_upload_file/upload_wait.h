#pragma once
// Why nothing moves: what the upload that runs waits for, and all behind it. It goes on by itself. Any thread.
#include "velora_upload_file/upload_run.h"
#include <string>

// The words of it, "" when nothing is waited for.
std::string __wait_text(const UploadRun &run);
// Shows them in the run's ongoing notification, and takes them away again; the client's thread alone.
void __wait_noti_update(const UploadRun &run);
