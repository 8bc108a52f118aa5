#pragma once
// The result of an earlier run, opened from its notification. Main loop only.
#include "velora_upload_file/upload_record.h"

// Shows AppData's result, whose items are in its upload_list, in the place of what is there; a run goes on behind it.
void __result_show(UploadViewData *vd);
