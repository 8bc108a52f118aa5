#pragma once
// The path bar: the way from the root to the open folder. Main loop only.
#include "velora_upload_file/upload_record.h"

// Makes the bar, with the root alone. A tap on a part of the way takes what is behind it off the bar and calls
// jump(vd, path) 0.25 s later; path is null for what is labelled as the root.
void __path_bar_create(UploadViewData *vd, void (*jump)(UploadViewData *vd, const char *path));
void __path_bar_delete();
bool __path_bar_exists();
// A folder below the last one was opened.
void __path_bar_append(UploadViewData *vd, const char *path);
// Takes the last part off.
void __path_bar_remove_last();
// Whether the last part is the root, which the bar tells by its label: a folder of that name counts as well.
bool __path_bar_is_at_root();
// Whether a tap waits for its 0.25 s.
bool __path_bar_is_jumping();
