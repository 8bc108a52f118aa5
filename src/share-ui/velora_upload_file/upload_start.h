#pragma once
// The start of a run, for Done and for another try alike. Main loop only.
#include "velora_upload_file/upload_record.h"
#include <string>
#include <vector>

// Makes a run of these items, which becomes the view's; nothing of it is sent yet. `folder` is a server path.
void __run_create(UploadViewData *vd, std::vector<UploadItemHold> items, const std::string &folder);
// Reads the size of each file of the view's run, as late as can be, and gives each item that has none its destination
// in the open folder, for at most about `budget` seconds. False when there is more to do, in a later turn of the loop.
bool __run_prepare(UploadViewData *vd, double budget);
// Does what is left of that, shows the ongoing notification and starts the worker of the view's run. When there can be
// no worker, every file has failed.
void __run_begin(UploadViewData *vd);
