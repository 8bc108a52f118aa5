// Entry point, lifecycle callbacks, the dispatch of launch requests and the one way out.
#include "account/account.h"
#include "app/app.h"
#include "main/velora_pending_pages.h"
#include "main/velora_shell.h"
#include "notification/notification.h"
#include "vconf/vconf.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_network.h"
#include "velora_common/velora_paths.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_thread.h"
#include "velora_common/velora_upload_item.h"
#include "velora_upload_file/velora_upload_view.h"
#include <cstdlib>
#include <cstring>
#include <functional>
#include <glib-object.h>
#include <libintl.h>

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

static int __read_launch_mode(app_control_h request)
{
    char *mode = nullptr;
    app_control_get_extra_data(request, "launch_mode", &mode);
    const int launch_mode = __velora_get_launch_mode(mode);
    std::free(mode);
    return launch_mode;
}

static const char *__convert_uri_to_path(const char *uri)
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
    if (account_connect() != ACCOUNT_ERROR_NONE)
        return -1;
    const int result = account_query_account_by_package_name(__velora_account_exists_cb, VELORA_PACKAGE, nullptr);
    account_disconnect();
    return result == ACCOUNT_ERROR_NONE ? 0 : -1;
}

void __velora_update_landscape_mode(AppData *ad)
{
    int is_locked = 0;
    if (vconf_get_bool("db/setting/rotate_lock", &is_locked) == 0 && is_locked)
        return;
    ad->is_landscape = _velora_common_get_landscape_mode(ad->win_main);
}

static void __velora_pipe_cb(void *data, void *buffer, unsigned int)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("Invalid argument: data is NULL");
        return;
    }
    if (!buffer) {
        VELORA_LOGE("Invalid argument: buffer is NULL");
        return;
    }
    if (g_strcmp0(static_cast<const char *>(buffer), "refresh_meta_done") != 0)
        return;
    _velora_app_popup_delete(ad);
    _velora_upload_view_update();
}

static bool __read_exit_key(const char *key)
{
    int value = 0;
    return vconf_get_bool(key, &value) == 0 && value;
}

static void __send_reply(AppData *ad, app_control_h request)
{
    app_control_h reply = nullptr;
    if (app_control_create(&reply) != APP_CONTROL_ERROR_NONE)
        return;
    if (ad->reply_result && app_control_add_extra_data(reply, "result", ad->reply_result) != APP_CONTROL_ERROR_NONE)
        VELORA_LOGE("app_control_add_extra_data failed");
    if (app_control_reply_to_launch_request(reply, request, APP_CONTROL_RESULT_SUCCEEDED) != APP_CONTROL_ERROR_NONE)
        VELORA_LOGE("app_control_reply_to_launch_request failed");
    app_control_destroy(reply);
}

static void __string_array_free(char ***values, int *count)
{
    for (int i = 0; *values && i < *count; i++)
        std::free((*values)[i]);
    std::free(*values);
    *values = nullptr;
    *count = 0;
}

static void __delete_object(Evas_Object **obj)
{
    if (*obj)
        evas_object_del(*obj);
    *obj = nullptr;
}

void _velora_app_exit(AppData *ad)
{
    VELORA_LOGI("_velora_app_exit is called!");
    if (!ad) {
        VELORA_LOGE("app data is NULL");
        return;
    }
    const bool is_settings_waiting = __read_exit_key("db/private/ug-setting-cloud/is_exist");
    if (ad->app_control && (ad->is_share || is_settings_waiting || ad->launch_mode == LAUNCH_MODE_SETUP_WIZARD))
        __send_reply(ad, ad->app_control);
    for (GList *entry = ad->earlier_shares; entry; entry = entry->next)
        __send_reply(ad, static_cast<app_control_h>(entry->data));
    _velora_upload_view_end(); // only when something other than the view itself asked to leave

    __delete_object(&ad->popup);
    if (ad->pipe)
        _velora_common_pipe_del(ad->pipe);
    ad->pipe = nullptr;
    if (ad->sync_handle)
        cloud_content_sync_destroy(ad->sync_handle);
    ad->sync_handle = nullptr;
    std::free(ad->email);
    ad->email = nullptr;
    __delete_object(&ad->naviframe);
    __delete_object(&ad->layout_main);
    __delete_object(&ad->conformant);
    __delete_object(&ad->win_main);
    ad->bg = nullptr; // it went with the window
    if (ad->color_table) {
        ea_theme_colors_unset(ad->color_table, 1);
        ea_theme_color_table_free(ad->color_table);
    }
    ad->color_table = nullptr;
    if (ad->font_table)
        ea_theme_font_table_free(ad->font_table);
    ad->font_table = nullptr;

    if (ad->app_control)
        app_control_destroy(ad->app_control);
    ad->app_control = nullptr;
    g_list_free_full(ad->earlier_shares,
                     [](gpointer request) { app_control_destroy(static_cast<app_control_h>(request)); });
    ad->earlier_shares = nullptr;
    _velora_upload_list_free(&ad->upload_list);
    std::free(ad->folder_path);
    ad->folder_path = nullptr;
    g_free(ad->reply_result);
    ad->reply_result = nullptr;
    __string_array_free(&ad->result_paths, &ad->result_path_count);
    std::free(ad->display_type);
    ad->display_type = nullptr;

    elm_exit();
    VELORA_LOGI("_velora_app_exit is end!");
}

static bool __velora_app_create(void *)
{
    return true;
}

static void __velora_app_terminate(void *data)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    if (ad->noti_priv_id != -1) {
        if (notification_h noti = notification_load(VELORA_SHARE_PACKAGE, ad->noti_priv_id)) {
            if (const int result = notification_delete(noti); result != NOTIFICATION_ERROR_NONE)
                VELORA_LOGE("Fail to notification_delete [%d]\n", result);
            notification_free(noti);
        }
    }
    ad->noti_priv_id = -1;
}

static void __velora_app_pause(void *data)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    if (ad->exit_on_pause)
        _velora_app_exit(ad);
}

static void __velora_app_resume(void *data)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    __velora_update_landscape_mode(ad);
}

static void __velora_language_changed_cb(void *)
{
    char *language = vconf_get_str("db/menu_widget/language");
    if (!language)
        return;
    elm_language_set(language);
    std::free(language);
}

static void __build_window_once(AppData *ad, int first_mode)
{
    if (ad->naviframe)
        return;
    ad->launch_mode = LAUNCH_MODE_DETAILS;
    ad->is_meta_refreshed = true;
    if (!ad->pipe) // an earlier build may have failed half-way
        ad->pipe = _velora_common_pipe_add(__velora_pipe_cb, ad);
    __create_main_view(ad, first_mode);
}

static void __set_theme(AppData *ad)
{
    elm_app_base_scale_set(1.8);
    ea_theme_changeable_ui_enabled_set(true);
    __changeable_colors_set(ad);
    __changeable_font_set(ad);
}

static void __join_caller_window(AppData *ad, app_control_h request)
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
    for (int i = 0; i < count; i++)
        if (const char *path = __convert_uri_to_path(uris[i]))
            ad->upload_list = _velora_upload_item_append(ad->upload_list, path);
}

static void __open_share_page(AppData *ad)
{
    if (__velora_account_exists() == 0)
        _velora_upload_view_create(ad);
    else
        _velora_signin_create(ad, 1);
}

// False when the network popup is showing instead.
static bool __begin_share(AppData *ad)
{
    ad->is_welcome_shown = false;
    ad->is_share = true;
    if (!_velora_common_check_network(ad))
        return false;
    ad->launch_mode = LAUNCH_MODE_SHARE;
    return true;
}

static bool __dispatch_share(AppData *ad, app_control_h request)
{
    if (!__begin_share(ad))
        return false;
    char *uri = nullptr;
    if (app_control_get_uri(request, &uri) == APP_CONTROL_ERROR_NONE && uri)
        __queue_paths(ad, &uri, 1);
    std::free(uri);
    __open_share_page(ad);
    return true;
}

static bool __dispatch_multi_share(AppData *ad, app_control_h request)
{
    if (!__begin_share(ad))
        return false;
    char **paths = nullptr;
    int count = 0;
    app_control_get_extra_data_array(request, APP_CONTROL_DATA_PATH, &paths, &count);
    __queue_paths(ad, paths, count);
    __string_array_free(&paths, &count);
    __open_share_page(ad);
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

static void __dispatch_default(AppData *ad, app_control_h request)
{
    ad->launch_mode = __read_launch_mode(request);
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
        _velora_details_create(ad);
    }
}

// False when a failed network check ended the request.
static bool __dispatch(AppData *ad, app_control_h request, const char *operation)
{
    if (g_strcmp0(operation, APP_CONTROL_OPERATION_ACCOUNT_ADD) == 0) {
        ad->launch_mode = LAUNCH_MODE_ACCOUNT_ADD;
        _velora_signin_create(ad, 1);
    } else if (g_strcmp0(operation, APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE) == 0) {
        ad->launch_mode = LAUNCH_MODE_ACCOUNT_CONFIGURE;
        _velora_details_create(ad);
    } else if (g_strcmp0(operation, APP_CONTROL_OPERATION_SHARE) == 0) {
        return __dispatch_share(ad, request);
    } else if (g_strcmp0(operation, APP_CONTROL_OPERATION_MULTI_SHARE) == 0) {
        return __dispatch_multi_share(ad, request);
    } else if (g_strcmp0(operation, APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD) == 0) {
        if (ad->win_main)
            elm_win_activate(ad->win_main);
        else
            VELORA_LOGE("ad->win_main is null");
    } else if (g_strcmp0(operation, APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD_RESULT) == 0) {
        __dispatch_upload_result(ad, request);
    } else {
        __dispatch_default(ad, request);
    }
    return true;
}

static void __velora_app_reset(app_control_h request, void *data)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    const bool was_share = ad->is_share;
    ad->exit_on_pause = 0;
    ad->is_share = false;
    __build_window_once(ad, __read_launch_mode(request));
    __set_theme(ad);

    if (ad->app_control && was_share) // its sender still waits for the answer that every share gets
        ad->earlier_shares = g_list_append(ad->earlier_shares, ad->app_control);
    else if (ad->app_control)
        app_control_destroy(ad->app_control);
    ad->app_control = nullptr;
    app_control_clone(&ad->app_control, request);
    __velora_update_landscape_mode(ad);
    elm_win_activate(ad->win_main);
    __join_caller_window(ad, request);

    char *operation = nullptr;
    app_control_get_operation(request, &operation);
    if (__dispatch(ad, request, operation))
        VELORA_LOGI("ad->launch_mode is [%d]!", ad->launch_mode);
    std::free(operation);
}

static void __bind_catalogues()
{
    const std::string folder = _velora_common_app_file("res/locale");
    for (const char *domain : {VELORA_DOMAIN, VELORA_SHARE_DOMAIN}) {
        bindtextdomain(domain, folder.c_str());
        bind_textdomain_codeset(domain, "UTF-8");
    }
}

int main(int argc, char **argv)
{
    G_GNUC_BEGIN_IGNORE_DEPRECATIONS
    g_type_init();
    G_GNUC_END_IGNORE_DEPRECATIONS
    app_set_id(VELORA_PACKAGE);
    app_add_alias(VELORA_SHARE_PACKAGE);
    __bind_catalogues();
    app_event_callback_s lifecycle = {};
    lifecycle.create = __velora_app_create;
    lifecycle.terminate = __velora_app_terminate;
    lifecycle.pause = __velora_app_pause;
    lifecycle.resume = __velora_app_resume;
    lifecycle.app_control = __velora_app_reset;
    lifecycle.language_changed = __velora_language_changed_cb;
    static AppData ad;
    const int result = app_efl_main(&argc, &argv, &lifecycle, &ad);
    _velora_upload_view_abandon(); // a window closed in the middle of an upload leaves a worker running
    return result;
}
