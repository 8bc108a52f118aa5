#pragma once
// The record of the sign-in page, and what its two files know of each other. Main loop only, but for `request_token`.
#include "velora_common/velora_app_data.h"
#include "velora_common/velora_signout.h"
#include <string>

struct SigninViewData {
    AppData *ad = nullptr;
    Evas_Object *web_view = nullptr; // null until the page has been on screen for a moment
    Evas_Object *focus_btn = nullptr;
    char *request_token = nullptr; // the client's thread writes it, before its message
    Ecore_Pipe *pipe = nullptr;
    Ecore_Timer *timeout_timer = nullptr;
    bool is_signin = false;

    ClientHold client;
    Elm_Object_Item *nf_item = nullptr;
    Ecore_Timer *build_timer = nullptr;  // until the web view is made
    GList *files = nullptr;              // of UploadItem: shared, and waiting for the account
    int launch_mode = LAUNCH_MODE_NONE;  // that the page was opened in
    void (*done)(AppData *ad) = nullptr; // of a page that lies over another one
    void (*back)(AppData *ad) = nullptr; // the same, when there is no account in the end
    std::string web, callback, ca_file;  // the service's addresses
    bool has_token = false;              // its message has been read: only then is the token the main loop's
    std::atomic<int> error = 0;          // why there is no request token; the client's thread
    bool is_approved = false;            // the person has allowed the device in
    bool is_activated = false;           // it is the device's account, but for its record
    bool is_over = false;                // declined, failed or given up: all that is left is to leave
};

namespace signin {
// The one page, or null. In a namespace, for every page calls its record so.
extern SigninViewData *s_vd;
} // namespace signin

// What a popup of the page is about.
inline constexpr char s_wait_topic[] = "wait", s_error_topic[] = "error";

// signin_flow.cpp

void __velora_signin_webview_cb(void *data, Evas_Object *obj, void *event_info);
// Cancel of every popup about a failure, and back on a wait: gives the sign-in up.
void __popup_cancel_cb(void *data, Evas_Object *obj, void *event_info);
// The popup that says what went wrong, in the place of what is on screen; its OK gives up. `title` may be null.
void __signin_fail(SigninViewData *vd, const char *text_id = "IDS_CLOUD_BODY_SERVER_ERROR_OCCURRED_TRY_LATER",
                   const char *title_id = nullptr);
// The service has shown a certificate that is not to be trusted.
void __signin_fail_certificate(SigninViewData *vd);
// Asks for a request token, with the wait on screen. The page that belongs to it follows.
void __signin_begin(SigninViewData *vd);
// Loads the page that the token is for, once there are both a token and a web view.
void __signin_page_load(SigninViewData *vd);
// What a sign-in that comes to nothing now has to end.
SignoutScope __signin_scope(const SigninViewData *vd);

// signin_view.cpp

// A text of the domain "velora" with a wheel; back calls back_cb.
void __signin_wait_show(SigninViewData *vd, const char *text_id, Evas_Smart_Cb back_cb);
// Builds the page and pushes it. The web view follows a moment later.
void __signin_page_create(SigninViewData *vd);
// Frees the record; the widgets stay.
void __signin_view_destroy(SigninViewData *vd);
// Takes the page's widgets away. None of them may have the keys' focus, or be given it, while it goes.
void __signin_item_delete(AppData *ad, Elm_Object_Item *item);
// The end of the page, with its widgets, for the list of pages.
void __signin_page_end(void *page);
void __signin_page_abandon(void *page);
