#pragma once
// Opening a file of the open cloud folder: pictures from the client's cache, video and sound by a streaming address,
// everything else through the scratch folder in whichever application views it. Main loop only.
#include "velora_common/velora_content_result.h"
#include "velora_upload_file/upload_row.h"

// A tap on a file's row; `data` is its ItemData.
void __select_item_to_launch_app(void *data, Evas_Object *obj, void *event_info);
// What the client answered, when the view's pipe brings it.
void __content_result_handle(UploadViewData *vd, const ContentResultMessage &message);
// Deletes the copies that were made of files to open them.
void __opened_copies_delete();
