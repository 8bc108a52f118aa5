#pragma once
// Another try of a failed file: a run of one. Main loop only.
#include "velora_upload_file/upload_row.h"

// A tap on an upload's row; `data` is its ItemData.
void __velora_uploading_item_selected(void *data, Evas_Object *obj, void *event_info);
// Sends the failed files again for which nobody was signed in, as one run. False when there are none, or a run is under
// way.
bool __retry_signed_out(UploadViewData *vd);
// The list changes: a question about one of its rows is void.
void __retry_popup_end(UploadViewData *vd);
