#pragma once
// The view's list, and how its rows look. Main loop only.
#include "velora_upload_file/upload_row.h"

Evas_Object *__genlist_create(UploadViewData *vd);
void __item_classes_create(UploadViewData *vd);
void __item_classes_free(UploadViewData *vd);

// Makes an upload's row one of another type.
void __upload_row_restyle(UploadViewData *vd, Elm_Object_Item *row, int type);
// Shows how far an upload is in its row.
void __upload_row_progress(const UploadItem *item);
