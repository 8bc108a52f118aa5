#pragma once
// The record of the upload view: what most of its files need. What one topic needs alone stays in that topic's file.
#include "velora_common/velora_app_data.h"
#include "velora_upload_file/upload_run.h"

enum ViewPhase {
    PHASE_BROWSING,  // a folder is being chosen
    PHASE_UPLOADING, // the list is the run's that is under way
    PHASE_ENDED,     // the list is that of a run that has ended
    PHASE_RESULT,    // the list is an earlier result's; a run may be under way behind it
};

// Main loop only.
struct UploadViewData {
    AppData *ad = nullptr;
    ClientHold client;
    Evas_Object *layout = nullptr;
    Evas_Object *genlist = nullptr;
    Elm_Genlist_Item_Class *itc_dir = nullptr;
    Elm_Genlist_Item_Class *itc_file = nullptr;
    Elm_Genlist_Item_Class *itc_uploading = nullptr;
    Elm_Genlist_Item_Class *itc_select_all = nullptr;
    Elm_Genlist_Item_Class *itc_fail = nullptr;
    Ecore_Pipe *pipe = nullptr;
    cloud_content_sync_folder_h folder = nullptr; // the open one, owned; its path is AppData's folder_path
    Elm_Object_Item *nf_item = nullptr;
    Evas_Object *cancel_btn = nullptr; // of the title, while browsing and while selecting
    Evas_Object *done_btn = nullptr;
    Evas_Object *more_btn = nullptr; // while its menu has something to offer
    ViewPhase phase = PHASE_BROWSING;
    bool is_select_mode = false; // uploads are being chosen to be taken out
    RunHold run;                 // under way; null when none is
};

// The one view, or null. Main loop only.
extern UploadViewData *s_vd;
// Its pipe, or null: for callbacks of the client's thread that may come late, and need nothing else of the view.
extern std::atomic<Ecore_Pipe *> s_view_pipe;
