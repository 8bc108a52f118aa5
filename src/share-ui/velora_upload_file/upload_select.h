#pragma once
// The selection mode, in which uploads are taken out of the queue. Main loop only.
#include "velora_upload_file/upload_row.h"

// Enters it; `data` is the view.
void __ctx_delete_cb(void *data, Evas_Object *obj, void *event_info);
// Leaves it; the flags stay, for the question that may follow.
void __remove_all_selete_item(UploadViewData *vd);
// Leaves it with nothing selected.
void __selection_cancel(UploadViewData *vd);
// The run has ended: the mode does, and the question whether to stop is void.
void __selection_run_ended(UploadViewData *vd);
// A tap on an upload's row.
void __selection_row_tapped(UploadViewData *vd, ItemData *record, Elm_Object_Item *row);
// Counts again when an upload has ended and lost its flag.
void __selection_title_refresh(UploadViewData *vd);
// The row "Select All", or null.
Elm_Object_Item *__select_all_row();
