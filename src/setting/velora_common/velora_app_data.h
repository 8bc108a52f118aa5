#pragma once
// The application record, and the two names every page knows of the application shell.
#include "app/app.h"
#include "assist/assist.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include <Ecore_X.h>
#include <Elementary.h>
#include <atomic>
#include <glib.h>

#define VELORA_PACKAGE "com.orvant.velora"
#define VELORA_SHARE_PACKAGE "com.orvant.velora-share"
#define VELORA_SERVICE "Velora"
#define VELORA_DOMAIN "velora"
#define VELORA_SHARE_DOMAIN "velora-share"

enum LaunchMode {
    LAUNCH_MODE_NONE = 0,
    LAUNCH_MODE_SIGNIN = 1,
    LAUNCH_MODE_SETUP_WIZARD = 2,
    LAUNCH_MODE_SETUP_WIZARD_SIGNIN = 3,
    LAUNCH_MODE_DETAILS = 4,
    LAUNCH_MODE_ACCOUNT_ADD = 5,
    LAUNCH_MODE_ACCOUNT_CONFIGURE = 6,
    LAUNCH_MODE_SHARE = 7,
    LAUNCH_MODE_UPLOAD_RESULT = 8,
};

using CloudSyncHandle = cloud_content_sync_h;

// One instance for the life of the process, zero-filled by main. Strings, lists, pipes and handles are its own; the
// exit routine releases them. Main loop only, but for the atomic word.
struct AppData {
    app_control_h app_control = nullptr; // clone of the last request; the reply is sent against it
    Evas_Object *naviframe = nullptr;    // null until the main window is built
    Evas_Object *win_main = nullptr;
    Evas_Object *conformant = nullptr;
    Evas_Object *layout_main = nullptr;
    Evas_Object *bg = nullptr;
    Evas_Object *popup = nullptr; // the one popup of whatever page is showing
    int launch_mode = LAUNCH_MODE_NONE;
    bool is_landscape = false;
    char *email = nullptr;
    CloudSyncHandle sync_handle = nullptr;
    GList *upload_list = nullptr; // of UploadItem
    char *folder_path = nullptr;  // the open cloud folder: where uploads go
    std::atomic<bool> is_meta_refreshed = false;
    Ecore_Pipe *pipe = nullptr;
    char *reply_result = nullptr; // extra data "result" of the reply; null: no extra data
    Ecore_X_Window caller_xwin = 0;
    Ecore_X_Window xwin = 0;
    int cellular_state = 0;
    bool is_welcome_shown = false; // while false, cancelling a network popup ends the application
    bool is_share = false;         // a share is always replied to
    ea_theme_color_table_h color_table = nullptr;
    ea_theme_font_table_h font_table = nullptr;
    Ecore_Pipe *signout_pipe = nullptr;
    Evas_Object *signout_popup = nullptr;
    int exit_on_pause = 0;
    int noti_priv_id = 0; // upload notification that terminate deletes; -1: none
    char **result_paths = nullptr;
    int result_path_count = 0;
    char *display_type = nullptr;
    GList *earlier_shares = nullptr; // clones of shares that a later request came after; answered at exit
};

// Leaves the application: replies to the launch request when its sender expects an answer, deletes popup, pipe, cloud
// client and window, and ends the main loop. The one way out for every page; main loop only. Defined by the shell.
void _velora_app_exit(AppData *ad);

// Deletes the current popup, if any. Main loop only.
inline void _velora_app_popup_delete(AppData *ad)
{
    if (ad->popup)
        evas_object_del(ad->popup);
    ad->popup = nullptr;
}
