#pragma once
// The refresh of the folder tree. Main loop only.
#include "velora_upload_file/upload_state.h"

// Starts a refresh. Its end is reported as "refresh_meta_done" on the shell's pipe when the tree was not complete
// before (AppData's is_meta_refreshed is false until then), else as "meta_changed" on the view's.
void __meta_refresh_start(UploadViewData *vd);
// What the last refresh that has ended says of a list; VIEW_STATE_NONE when nothing is wrong.
ViewState __meta_state(const UploadViewData *vd);
