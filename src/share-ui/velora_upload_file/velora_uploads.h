#pragma once
// What who removes the account has to know of uploads, and to end. Main loop only.
#include "velora_common/velora_app_data.h"

// How many files wait for a folder, wait in the queue or are being uploaded now.
int _velora_upload_view_unfinished();
// Ends what is unfinished as if the person had stopped each file: what is up by then stays, and is told by a result;
// nothing else is sent. The view goes, and whoever shared is answered. Nothing when nothing is unfinished.
void _velora_upload_view_stop_all(AppData *ad);
// Deletes what this device keeps of an account that is removed: copies of files that were opened, and notifications,
// which name what was uploaded.
void _velora_upload_view_forget();
