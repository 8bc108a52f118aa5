#pragma once
// What an earlier process has left to upload: the person is asked once whether it is to go on. Main loop only.
#include "velora_upload_file/upload_record.h"

// Asks, where something is left, no run is under way and nothing else is being asked. `later`, which may be null, is
// what "Later" does beside taking the question away.
void __left_ask(UploadViewData *vd, void (*later)(UploadViewData *vd) = nullptr);
// Goes on with it: a run of the files, each to the place that was chosen for it. False when nothing is left.
bool __left_go_on(UploadViewData *vd);
