#pragma once
// The folders of the cloud: their rows, and the ways from one to another. Main loop only.
#include "velora_upload_file/upload_record.h"

// Makes a folder the open one and takes it over; the old one is let go. Null: none is open.
void __folder_open(UploadViewData *vd, cloud_content_sync_folder_h folder);
// Fills the list with the open folder's subfolders and files, or says why there are none.
void __folder_show(UploadViewData *vd);
// Whether the client knows something else of the open folder by now than its rows show.
bool __folder_list_has_changed(UploadViewData *vd);
// To the parent; false when it cannot be had.
bool __folder_go_up(UploadViewData *vd);
// To the folder of a server path, or with null to the root.
void __folder_jump(UploadViewData *vd, const char *path);
// Done can be pressed while a folder is open and known, and files wait; the line above the list follows.
void __done_update(UploadViewData *vd);
