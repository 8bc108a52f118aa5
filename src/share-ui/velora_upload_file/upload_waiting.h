#pragma once
// Files that were shared and wait until a folder is chosen for them, whatever the view shows meanwhile. Main loop only.
#include "velora_common/velora_app_data.h"
#include "velora_common/velora_upload_item.h"
#include <optional>
#include <vector>

// Takes what AppData's list holds; the result is how many files came.
int __waiting_take(AppData *ad);
int __waiting_count();
// Their size, as far as they can be read, in bytes; nothing while it is being found out. The line above the list
// follows.
std::optional<gint64> __waiting_bytes();
// What is called when it has been found out; not for the few files whose sizes are known at once.
void __waiting_measured_cb_set(void (*measured)());
// The first one's local path, or null.
const char *__waiting_first();
// Hands all of them out: they wait no longer.
std::vector<UploadItemHold> __waiting_give();
