#pragma once
// What the view says where it has no list to show. Main loop only.
#include "velora_upload_file/upload_record.h"

enum ViewState {
    VIEW_STATE_NONE,
    VIEW_STATE_EMPTY,
    VIEW_STATE_LOADING,
    VIEW_STATE_OFFLINE,
    VIEW_STATE_ERROR,
    VIEW_STATE_SIGNED_OUT,
    VIEW_STATE_STOPPED, // nothing is left of a queue
    VIEW_STATE_FULL     // a result without files: there was no room for any
};

// Puts a look in the place of the list, or the list back. Some looks have a button, "Try again" or "Sign in", which
// calls `again`.
void __state_show(UploadViewData *vd, ViewState state, Evas_Smart_Cb again = nullptr);
ViewState __state_shown(const UploadViewData *vd);
