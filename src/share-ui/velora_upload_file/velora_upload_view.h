#pragma once
// The share upload view: pick a cloud folder, upload the shared files into it, see what became of them. Main loop only.
#include "velora_common/velora_app_data.h"

// Builds the view for AppData's launch mode (a share, or the result of an earlier one), or refreshes the one that is
// there.
void _velora_upload_view_create(AppData *ad);

// Fills the list again, from the queue or the open folder.
void _velora_upload_view_update();

// The first refresh of the folder tree has ended.
void _velora_upload_view_meta_done();

// Call before AppData's list is replaced by a result's: the files in it wait for their folder, whatever comes first.
void _velora_upload_view_keep_waiting(AppData *ad);
