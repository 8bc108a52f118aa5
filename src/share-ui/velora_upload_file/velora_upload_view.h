#pragma once
// The share upload view: pick a cloud folder, upload the shared files into it, see what became of them. Main loop only.
#include "velora_common/velora_app_data.h"

// Builds the view for AppData's launch mode (a share, or the result of an earlier one), or refreshes the one that is
// there.
void _velora_upload_view_create(AppData *ad);

// Fills the list again, from the queue and the open folder.
void _velora_upload_view_update();

// Takes the view down, if there is one, and stops its uploads. The widgets must still be there.
void _velora_upload_view_end();

// Stops the uploads of a view whose widgets may be gone already, when the process ends.
void _velora_upload_view_abandon();
