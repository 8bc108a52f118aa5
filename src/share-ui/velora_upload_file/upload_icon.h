#pragma once
// The picture of a row's file: a sign of its kind, or a picture of the file itself. Main loop only.
#include "velora_upload_file/upload_row.h"

// A new widget in `parent`; fills in the row's file type. The thumbnail is that of the local file, or with a null
// local_path that of the row's content in the cloud.
Evas_Object *__file_icon_create(Evas_Object *parent, ItemData *record, const char *local_path);

// The thumbnail that the device's media index has of a local file, or null; it belongs to the index's record.
const char *__get_local_thumbnail(const char *path);
// Forgets the media records that __get_local_thumbnail handed thumbnails out of.
void __local_thumbnails_free();
