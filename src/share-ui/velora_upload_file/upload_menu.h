#pragma once
// The more menu of a running queue. Main loop only.
#include "velora_upload_file/upload_record.h"

// The more button or the more key: opens the menu, or closes it. Nothing while there is no more button. `data` is the
// view.
void __more_create_folder_cb(void *data, Evas_Object *obj, void *event_info);
// Deletes the menu, if it is open.
void __delete_all_callback_ctxpopup();
