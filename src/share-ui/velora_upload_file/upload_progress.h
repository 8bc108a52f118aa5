#pragma once
// The line above the list: what is to be uploaded, how far it is, what came of it. Main loop only.
#include "velora_upload_file/upload_record.h"

// Brings the line up to date with the view's phase, its run and what waits.
void __progress_line_update(UploadViewData *vd);
// Does so once for all that happens in the time of a frame.
void __progress_line_update_soon();
