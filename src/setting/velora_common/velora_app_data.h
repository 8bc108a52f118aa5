#pragma once
// The application record, and the two names every page knows of the application shell.
#include "app/app.h"
#include "assist/assist.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include <Ecore_X.h>
#include <Elementary.h>
#include <atomic>
#include <glib.h>
#include <memory>
#include <type_traits>

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

struct CloudClientDestroy {
    void operator()(CloudSyncHandle handle) const
    {
        cloud_content_sync_destroy(handle);
    }
};
// A hold on the cloud client: it is destroyed with the last one. See velora_client.h.
using ClientHold = std::shared_ptr<std::remove_pointer_t<CloudSyncHandle>>;

// Whose popup one is: the page (or whatever else shows it) by its address, and what it is about.
struct PopupOwner {
    const void *page = nullptr;
    const char *topic = ""; // a literal
};

// One instance for the life of the process, zero-filled by main. Strings, lists, pipes and handles are its own; the
// exit routine releases them. Main loop only, but for the atomic words, which workers and the cloud client's threads
// read.
struct AppData {
    app_control_h app_control = nullptr; // the last request, which velora_requests.h owns
    Evas_Object *naviframe = nullptr;    // null until the main window is built
    Evas_Object *win_main = nullptr;
    Evas_Object *conformant = nullptr;
    Evas_Object *layout_main = nullptr;
    Evas_Object *bg = nullptr;
    Evas_Object *popup = nullptr;       // the one popup on screen; changed by velora_current_popup.h alone
    int launch_mode = LAUNCH_MODE_NONE; // of the last request; a page copies what it needs of it
    bool is_landscape = false;
    char *email = nullptr;
    std::atomic<CloudSyncHandle> sync_handle = nullptr; // what `client` holds
    GList *upload_list = nullptr;                       // of UploadItem: what was shared and no page has taken yet
    char *folder_path = nullptr;                        // the open cloud folder: where uploads go
    std::atomic<bool> is_meta_refreshed = false;
    std::atomic<Ecore_Pipe *> pipe = nullptr;
    char *reply_result = nullptr; // extra data "result" of the last request's reply; null: no extra data
    Ecore_X_Window caller_xwin = 0;
    Ecore_X_Window xwin = 0;
    int cellular_state = 0;
    bool is_welcome_shown = false; // while false, cancelling a network popup ends the application
    bool is_share = false;         // the last request was a share
    ea_theme_color_table_h color_table = nullptr;
    ea_theme_font_table_h font_table = nullptr;
    std::atomic<Ecore_Pipe *> signout_pipe = nullptr;
    Evas_Object *signout_popup = nullptr;
    int exit_on_pause = 0;
    int noti_priv_id = 0; // upload notification that terminate deletes; -1: none
    char **result_paths = nullptr;
    int result_path_count = 0;
    char *display_type = nullptr;

    ClientHold client;                            // AppData's own hold
    PopupOwner popup_owner;                       // of `popup`
    void (*popup_replaced)(void *data) = nullptr; // tells that owner when somebody else's takes its place
    void *popup_replaced_data = nullptr;
};

// Leaves the application: answers everyone who waits for an answer, ends every page, deletes popup, pipe, cloud client
// and window, and ends the main loop. The one way out; main loop only. Defined by the shell.
void _velora_app_exit(AppData *ad);
