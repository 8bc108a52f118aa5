#pragma once
// Taking uploads out of the queue. Main loop only.
#include "velora_upload_file/upload_record.h"
#include <vector>

// "clicked" of an upload row's cancel button; `data` is the row's ItemData.
void __upload_file_cancel_cb(void *data, Evas_Object *obj, void *event_info);
// Takes an upload of the running run out. A cancel that comes too late is refused, but has been counted.
void __uploading_file_mutil_cancel(UploadItem *item, UploadViewData *vd);
// The same for many, with one word to the notification at the end: the last ones first, so that the worker gets none of
// them when the running one goes.
void __uploads_cancel(UploadViewData *vd, const std::vector<UploadItem *> &items);
