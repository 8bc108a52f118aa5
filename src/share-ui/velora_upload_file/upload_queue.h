#pragma once
// The queue: Done, and the list of what is under way. Main loop only.
#include "velora_upload_file/upload_record.h"

// Makes a run of the files and shows it; it begins when the loop is idle.
void __run_of(UploadViewData *vd, std::vector<UploadItemHold> items, const std::string &folder);
// "clicked" of Done; `data` is the view.
void __btn_upload_cb(void *data, Evas_Object *obj, void *event_info);
// The list of the run that is under way, in the place of what is there.
void __run_rows_show(UploadViewData *vd);
// Folders make room for a list of uploads: no path bar, no title buttons.
void __uploads_show(UploadViewData *vd, ViewPhase phase);
