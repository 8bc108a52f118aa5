// Which page a launch request opens.
#include "account/account.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "main/velora_shell.h"
#include "notification/notification.h"
#include "velora_add_account_content_sync/velora_signin.h"
#include "velora_add_account_content_sync_setup_wizard/velora_signin_setupwizard.h"
#include "velora_common/velora_account.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_network.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_requests.h"
#include "velora_common/velora_upload_item.h"
#include "velora_details_content_sync/velora_details.h"
#include "velora_setup_wizard/velora_setupwizard.h"
#include "velora_upload_file/velora_upload_view.h"
#include "velora_upload_file/velora_uploads.h"
#include <clocale>
#include <cstdlib>
#include <cstring>
#include <libintl.h>
#include <string>
#include <vector>

static int __velora_get_launch_mode(const char *mode_string)
{
    if (!mode_string) {
        VELORA_LOGI("smode is NULL");
        return LAUNCH_MODE_NONE;
    }
    if (std::strcmp(mode_string, "Velora_Signin") == 0)
        return LAUNCH_MODE_SIGNIN;
    if (std::strcmp(mode_string, "Setup_Wizard_Velora_Signin") == 0)
        return LAUNCH_MODE_SETUP_WIZARD;
    if (std::strcmp(mode_string, "Setup_Wizard_Velora_Signin2") == 0)
        return LAUNCH_MODE_SETUP_WIZARD_SIGNIN;
    return LAUNCH_MODE_DETAILS; // "Velora_Details", and whatever a later sender invents
}

int __velora_read_launch_mode(app_control_h request)
{
    char *mode = nullptr;
    app_control_get_extra_data(request, "launch_mode", &mode);
    const int launch_mode = __velora_get_launch_mode(mode);
    std::free(mode);
    return launch_mode;
}

const char *__convert_uri_to_path(const char *uri)
{
    if (!uri) {
        VELORA_LOGE("uri is NULL");
        return nullptr;
    }
    constexpr size_t scheme = 7;
    return std::strncmp(uri, "file://", scheme) == 0 ? uri + scheme : uri;
}

static bool __velora_account_exists_cb(account_h account, void *)
{
    char *user_name = nullptr;
    if (account_get_user_name(account, &user_name) != ACCOUNT_ERROR_NONE)
        return false;
    std::free(user_name);
    return true;
}

static int __velora_account_exists()
{
    _velora_common_account_settle();
    if (account_connect() != ACCOUNT_ERROR_NONE)
        return -1;
    const int result = account_query_account_by_package_name(__velora_account_exists_cb, VELORA_PACKAGE, nullptr);
    account_disconnect();
    return result == ACCOUNT_ERROR_NONE ? 0 : -1;
}

void __string_array_free(char ***values, int *count)
{
    for (int i = 0; *values && i < *count; i++)
        std::free((*values)[i]);
    std::free(*values);
    *values = nullptr;
    *count = 0;
}

void __velora_join_caller_window(AppData *ad, app_control_h request)
{
    unsigned int caller = 0;
    if (app_control_get_window(request, &caller) != APP_CONTROL_ERROR_NONE || !caller)
        return;
    ad->caller_xwin = caller;
    ad->xwin = elm_win_xwindow_get(ad->win_main);
    if (!ad->xwin || !ecore_x_display_get())
        return; // not an X11 window
    ecore_x_icccm_transient_for_set(ad->xwin, ad->caller_xwin);
    ecore_x_window_client_manage(ad->caller_xwin);
}

static void __queue_paths(AppData *ad, char **uris, int count)
{
    std::vector<char *> paths;
    for (int i = 0; i < count; i++)
        if (const char *path = __convert_uri_to_path(uris[i]))
            paths.push_back(const_cast<char *>(path)); // points into the uri
    ad->upload_list = _velora_upload_items_append(ad->upload_list, paths.data(), static_cast<int>(paths.size()));
}

// Queues the files of the first share that is held, which is then taken. False when all of them were refused.
static bool __queue_held(AppData *ad, app_control_h request)
{
    char *operation = nullptr, *uri = nullptr, **array = nullptr;
    int count = 0;
    std::vector<char *> paths;
    app_control_get_operation(request, &operation);
    if (g_strcmp0(operation, APP_CONTROL_OPERATION_SHARE) == 0) {
        if (app_control_get_uri(request, &uri) == APP_CONTROL_ERROR_NONE && uri)
            paths.push_back(uri);
    } else {
        app_control_get_extra_data_array(request, APP_CONTROL_DATA_PATH, &array, &count);
        paths.assign(array, array + count);
    }
    std::vector<std::string> refused = __refused_take(&paths);
    __queue_paths(ad, paths.data(), static_cast<int>(paths.size()));
    __refused_say(refused);
    const bool is_left = refused.empty() || !paths.empty();
    const int number = _velora_request_held_taken(ad, std::move(refused), paths.size());
    std::free(operation);
    std::free(uri);
    __refused_look_on(number, array, count);
    return is_left;
}

// False when no page is opened: the network popup is showing instead, or every file was refused. What was shared before
// there was a network comes along.
static bool __dispatch_share(AppData *ad)
{
    ad->is_welcome_shown = false;
    ad->is_share = true;
    _velora_request_note_mode(ad);
    _velora_request_hold_last();
    if (!_velora_common_check_network(ad)) {
        if (!ad->popup) // nothing says why: an empty window would not either
            _velora_requests_finish_held(ad);
        return false;
    }
    ad->launch_mode = LAUNCH_MODE_SHARE;
    bool is_left = false;
    while (app_control_h held = _velora_request_held())
        is_left |= __queue_held(ad, held);
    if (!is_left) {
        _velora_request_finish(ad, _velora_request_last());
        return false;
    }
    if (__velora_account_exists() == 0)
        _velora_upload_view_create(ad);
    else
        _velora_signin_create(ad, 1);
    return true;
}

static void __dispatch_upload_result(AppData *ad, app_control_h request)
{
    if (!ad->win_main) {
        VELORA_LOGE("ad->win_main is null");
        return;
    }
    ad->launch_mode = LAUNCH_MODE_UPLOAD_RESULT;
    _velora_upload_view_keep_waiting(ad);
    _velora_upload_list_free(&ad->upload_list);
    char **paths = nullptr;
    int count = 0;
    app_control_get_extra_data_array(request, "path", &paths, &count);
    __queue_paths(ad, paths, count);
    __string_array_free(&paths, &count);

    std::free(ad->display_type);
    ad->display_type = nullptr;
    app_control_get_extra_data(request, "display_type", &ad->display_type);
    __string_array_free(&ad->result_paths, &ad->result_path_count);
    app_control_get_extra_data_array(request, "path", &ad->result_paths, &ad->result_path_count);
    _velora_upload_view_create(ad);
}

// A tap on the icon brings what is open to the front, which says more. Without an account there are no settings yet.
static void __dispatch_details(AppData *ad)
{
    if (ad->launch_mode == LAUNCH_MODE_NONE && !_velora_pages_are_empty()) {
        _velora_request_finish(ad, _velora_request_last());
    } else if (__velora_account_exists() == 0 && ad->launch_mode == LAUNCH_MODE_NONE &&
               _velora_upload_view_has_left(ad)) {
        _velora_upload_view_go_on(ad, _velora_details_create);
    } else if (__velora_account_exists() == 0) {
        _velora_details_create(ad);
    } else {
        ad->launch_mode = LAUNCH_MODE_SIGNIN;
        _velora_signin_create(ad, 1);
    }
}

static void __dispatch_default(AppData *ad, app_control_h request)
{
    ad->launch_mode = __velora_read_launch_mode(request);
    switch (ad->launch_mode) {
    case LAUNCH_MODE_SETUP_WIZARD:
        _velora_setupwizard_view_create(ad);
        break;
    case LAUNCH_MODE_SETUP_WIZARD_SIGNIN:
        _velora_signin_setupwizard_create(ad);
        break;
    case LAUNCH_MODE_SIGNIN:
        _velora_signin_create(ad, 1);
        break;
    default:
        __dispatch_details(ad);
    }
}

// The request opened nothing. With nothing else open there is nothing to be in front of either: the application leaves.
static void __nothing_more(AppData *ad)
{
    if (!ad->popup)
        _velora_request_finish(ad, _velora_request_last());
}

bool __velora_dispatch(AppData *ad, app_control_h request, const char *operation)
{
    if (g_strcmp0(operation, APP_CONTROL_OPERATION_ACCOUNT_ADD) == 0) {
        ad->launch_mode = LAUNCH_MODE_ACCOUNT_ADD;
        _velora_signin_create(ad, 1);
    } else if (g_strcmp0(operation, APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE) == 0) {
        ad->launch_mode = LAUNCH_MODE_ACCOUNT_CONFIGURE;
        __dispatch_details(ad);
    } else if (g_strcmp0(operation, APP_CONTROL_OPERATION_SHARE) == 0 ||
               g_strcmp0(operation, APP_CONTROL_OPERATION_MULTI_SHARE) == 0) {
        return __dispatch_share(ad);
    } else if (g_strcmp0(operation, APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD) == 0) {
        if (ad->win_main)
            elm_win_activate(ad->win_main);
        else
            VELORA_LOGE("ad->win_main is null");
        if (ad->win_main && __velora_account_exists() == 0 && _velora_upload_view_has_left(ad))
            _velora_upload_view_go_on(ad, nullptr);
        else
            __nothing_more(ad);
    } else if (g_strcmp0(operation, APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD_RESULT) == 0) {
        __dispatch_upload_result(ad, request);
    } else {
        __dispatch_default(ad, request);
    }
    return true;
}
