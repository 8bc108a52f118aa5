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

// How many files wait for a folder, wait in the queue or are being uploaded now.
int _velora_upload_view_unfinished();

// Ends what is unfinished as if the person had stopped each file: what is up by then stays, and is told by a result;
// nothing else is sent. The view goes, and whoever shared is answered. Nothing when nothing is unfinished.
void _velora_upload_view_stop_all(AppData *ad);

// Deletes what this device keeps of an account that is removed: copies of files that were opened, and notifications,
// which name what was uploaded.
void _velora_upload_view_forget();
