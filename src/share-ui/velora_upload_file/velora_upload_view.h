#pragma once
// The share upload view: pick a cloud folder, upload the shared files into it, see what became of them. Main loop only.
#include "velora_common/velora_app_data.h"

// Builds the view for AppData's launch mode (a share, or the result of an earlier one), or refreshes the one that is
// there.
void _velora_upload_view_create(AppData *ad);

// Fills the list again, from the queue and the open folder.
void _velora_upload_view_update();

// Call before AppData's list is replaced by a result's: the files in it that no folder was chosen for yet wait in the
// view, which offers them again when it is free.
void _velora_upload_view_keep_waiting(AppData *ad);

// Takes the view down, if there is one, and stops its uploads. The widgets must still be there.
void _velora_upload_view_end();

// Stops the uploads of a view whose widgets may be gone already, when the process ends.
void _velora_upload_view_abandon();
