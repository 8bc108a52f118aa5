#pragma once
// What who removes the account has to know of uploads, and to end. Main loop only.
#include "velora_common/velora_app_data.h"

// Whether an earlier process has left files that were going to be uploaded, and the person has not put them off.
bool _velora_upload_view_has_left(AppData *ad);
// The view goes on with them at once; or, with `later`, asks first, and gives way to that page when they are put off.
void _velora_upload_view_go_on(AppData *ad, void (*later)(AppData *ad));
// How many files wait for a folder, wait in the queue or are being uploaded now.
int _velora_upload_view_unfinished();
// Ends what is unfinished as if the person had stopped each file: what is up by then stays, and is told by a result;
// nothing else is sent. The view goes, and whoever shared is answered. Nothing when nothing is unfinished.
void _velora_upload_view_stop_all(AppData *ad);
// Deletes what this device keeps of an account that is removed: copies of files that were opened, and notifications,
// which name what was uploaded.
void _velora_upload_view_forget();
