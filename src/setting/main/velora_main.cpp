// Entry point, lifecycle callbacks and the one way out.
#include "app/app.h"
#include "main/velora_shell.h"
#include "notification/notification.h"
#include "vconf/vconf.h"
#include "velora_common/velora_client.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_paths.h"
#include "velora_common/velora_pipe.h"
#include "velora_common/velora_requests.h"
#include "velora_common/velora_rotation.h"
#include "velora_common/velora_signout.h"
#include "velora_common/velora_upload_item.h"
#include "velora_upload_file/velora_upload_view.h"
#include <cstdlib>
#include <cstring>
#include <functional>
#include <glib-object.h>
#include <libintl.h>

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
    _velora_upload_view_meta_done();
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
    _velora_requests_answer_all(ad);
    _velora_pages_end();
    _velora_common_signout_end(ad);

    __delete_object(&ad->popup);
    _velora_common_client_release(ad);
    if (Ecore_Pipe *pipe = ad->pipe.exchange(nullptr)) // behind the client, whose callbacks send on it
        _velora_common_pipe_del(pipe);
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
    __velora_update_indicator(ad);
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

static void __velora_app_reset(app_control_h request, void *data)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    ad->exit_on_pause = 0;
    ad->is_share = false;
    __build_window_once(ad, __velora_read_launch_mode(request));
    __set_theme(ad);
    _velora_request_add(ad, request);
    __velora_update_landscape_mode(ad);
    __velora_update_indicator(ad);
    evas_object_show(ad->win_main); // a sign-in that was given up may have hidden it
    elm_win_activate(ad->win_main);
    __velora_join_caller_window(ad, request);

    char *operation = nullptr;
    app_control_get_operation(request, &operation);
    const bool is_opened = __velora_dispatch(ad, request, operation);
    _velora_request_note_mode(ad);
    if (is_opened)
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
    _velora_pages_abandon(); // a window closed in the middle of an upload leaves a worker running
    return result;
}
