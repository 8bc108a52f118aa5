// The upload view's life: built by a share or a result, left by Back, Cancel or a failure.
#include "app/app_control.h"
#include "notification/notification.h"
#include "velora_common/velora_local_data.h"
#include "velora_common/velora_network.h"
#include "velora_common/velora_paths.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_thread.h"
#include "velora_upload_file/upload_internal.h"
#include <Ecore_File.h>
#include <cstdlib>
#include <cstring>

static const char s_title[] = "IDS_KQ_HEADER_UPLOAD_TO_ABB2";

static void __more_create_folder_cb(void *data, Evas_Object *obj, void *event_info);

Evas_Object *__page_of(UploadViewData *vd)
{
    return elm_object_parent_widget_get(vd->layout);
}

void __title_set(UploadViewData *vd, const char *id)
{
    elm_object_item_domain_translatable_part_text_set(vd->nf_item, "elm.text.title", VELORA_SHARE_DOMAIN, id);
    ea_screen_reader_name_set(__page_of(vd), __text(id));
}

void __pipe_ensure(UploadViewData *vd)
{
    if (!vd->pipe)
        s_view_pipe = vd->pipe = _velora_common_pipe_add(__pipe_cb, vd);
}

void __destroy_view(UploadViewData *vd)
{
    VELORA_LOGI("__destroy_view is called!");
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    evas_object_smart_callback_del_full(vd->ad->naviframe, "elm,action,more_event", __more_create_folder_cb, vd);
    __delete_all_callback_ctxpopup();
    __worker_stop(vd);
    if (vd->pathinfo_timer)
        ecore_timer_del(vd->pathinfo_timer);
    _velora_upload_list_free(&vd->ad->upload_list);
    _velora_upload_list_free(&vd->kept);
    if (vd->noti_id != -1)
        __progress_noti_delete(vd->noti_id);
    if (vd->folder)
        cloud_content_sync_folder_destroy(vd->folder);
    _velora_common_local_data_disconnect();
    __cloud_thumbnails_watch(vd, false);
    s_view_pipe = nullptr;
    if (vd->pipe)
        _velora_common_pipe_del(vd->pipe);
    if (vd->select_all_genlist)
        remove_genlist_item(vd->select_all_genlist);
    remove_genlist_item(vd->genlist);
    __item_classes_free(vd);
    __local_thumbnails_free();
    s_vd = nullptr;
    delete vd;
}

void _velora_upload_view_end()
{
    if (s_vd)
        __destroy_view(s_vd);
}

void _velora_upload_view_abandon()
{
    if (s_vd)
        __worker_stop(s_vd);
}

static void __exit_job(void *data)
{
    _velora_app_exit(static_cast<AppData *>(data));
}

void __leave(UploadViewData *vd)
{
    AppData *ad = vd->ad;
    __destroy_view(vd);
    ecore_job_add(__exit_job, ad);
}

static void __popup_exit_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    if (vd != s_vd) // pressed twice
        return;
    _velora_app_popup_delete(vd->ad);
    __leave(vd);
}

static void __popup_hide_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    _velora_app_popup_delete(vd->ad);
    _velora_upload_list_free(&vd->ad->upload_list);
    elm_win_lower(vd->ad->win_main);
}

// Lowers the window while a worker runs; otherwise ends the view and the application.
static void __go_away(UploadViewData *vd)
{
    if (vd->thread)
        elm_win_lower(vd->ad->win_main);
    else if (!__next_share_begin(vd))
        __leave(vd);
}

static Eina_Bool __btn_back_cb(void *, Elm_Object_Item *)
{
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return EINA_FALSE;
    }
    if (vd->is_select_mode)
        __selection_cancel(vd);
    else if (vd->is_upload_started)
        __go_away(vd);
    else if (__is_at_root(vd))
        __leave(vd);
    else
        __folder_go_up(vd);
    return EINA_FALSE;
}

static void __btn_cancel_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    evas_object_del(vd->done_btn);
    evas_object_del(vd->cancel_btn);
    vd->done_btn = vd->cancel_btn = nullptr;
    __go_away(vd);
}

// The menu's entries belong to a queue: before Done, and after its end, there is nothing to offer.
static void __more_create_folder_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    if (vd == s_vd && vd->is_upload_started && vd->more_btn)
        __more_menu_open(vd);
}

Evas_Object *__title_button_create(UploadViewData *vd, const char *style, const char *id, const char *part,
                                   Evas_Smart_Cb cb)
{
    Evas_Object *button = elm_button_add(vd->ad->naviframe);
    elm_object_style_set(button, style);
    elm_object_domain_translatable_text_set(button, VELORA_SHARE_DOMAIN, id);
    evas_object_smart_callback_add(button, "clicked", cb, vd);
    elm_object_item_part_content_set(vd->nf_item, part, button);
    return button;
}

static void __push_on_naviframe(UploadViewData *vd)
{
    vd->layout = elm_layout_add(vd->ad->naviframe);
    elm_layout_file_set(vd->layout, _velora_common_app_file("res/edje/velora.edj").c_str(), "main");
    elm_theme_extension_add(nullptr, _velora_common_app_file("res/edje/velora_genlist.edj").c_str());
    if (vd->ad->launch_mode != LAUNCH_MODE_UPLOAD_RESULT)
        __path_bar_create(vd);
    __item_classes_create(vd);
    vd->genlist = __genlist_create(vd);

    Evas_Object *back = elm_button_add(vd->ad->naviframe);
    elm_object_style_set(back, "naviframe/end_btn/default");
    // Drawn as a sign; the words are for the screen reader.
    elm_object_domain_translatable_text_set(back, VELORA_SHARE_DOMAIN, "IDS_VELORA_BODY_BACK");
    vd->nf_item = elm_naviframe_item_push(vd->ad->naviframe, s_title, back, nullptr, vd->layout, nullptr);
    __title_set(vd, s_title);
    elm_naviframe_item_pop_cb_set(vd->nf_item, __btn_back_cb, vd);
    evas_object_smart_callback_add(vd->ad->naviframe, "elm,action,more_event", __more_create_folder_cb, vd);
    evas_object_smart_callback_add(
        back, "clicked",
        [](void *nf, Evas_Object *, void *) { elm_naviframe_item_pop(static_cast<Evas_Object *>(nf)); },
        vd->ad->naviframe);
}

static bool __cloud_client_create(UploadViewData *vd)
{
    AppData *ad = vd->ad;
    if (ad->sync_handle)
        return true;
    if (cloud_content_sync_create(VELORA_SERVICE, &ad->sync_handle) == 0)
        return true;
    VELORA_LOGE("cloud_content_sync_create failed");
    ad->sync_handle = nullptr;
    _velora_app_popup_delete(ad);
    ad->popup = _velora_common_create_warning_popup(ad->win_main, "IDS_CLOUD_BODY_SERVER_ERROR_OCCURRED_TRY_LATER",
                                                    __popup_exit_cb, vd);
    return false;
}

// False when the root folder cannot be had: the view is gone then.
static bool __share_create(UploadViewData *vd)
{
    AppData *ad = vd->ad;
    vd->more_btn = elm_button_add(ad->naviframe);
    elm_object_style_set(vd->more_btn, "naviframe/more/default");
    elm_object_domain_translatable_text_set(vd->more_btn, VELORA_SHARE_DOMAIN, "IDS_VELORA_BODY_MORE_OPTIONS");
    evas_object_smart_callback_add(vd->more_btn, "clicked", __more_create_folder_cb, vd);
    elm_object_item_part_content_set(vd->nf_item, "toolbar_more_btn", vd->more_btn);
    elm_object_disabled_set(vd->more_btn, EINA_TRUE); // its menu belongs to a queue
    cloud_content_sync_folder_h root = nullptr;
    if (cloud_content_sync_folder_get_root(ad->sync_handle, &root) != 0) {
        VELORA_LOGE("cloud_content_sync_folder_get_root failed");
        __leave(vd);
        return false;
    }
    __folder_open(vd, root);
    VELORA_LOGI("path: %s", ad->folder_path);
    vd->cancel_btn = __title_button_create(vd, "naviframe/title_text_left", "IDS_TPLATFORM_ACBUTTON_CANCEL_ABB",
                                           "title_left_text_btn", __btn_cancel_cb);
    vd->done_btn = __title_button_create(vd, "naviframe/title_text_right", "IDS_TPLATFORM_ACBUTTON_DONE_ABB",
                                         "title_right_text_btn", __btn_upload_cb);
    return true;
}

// Shows the folders, and a wait when the client does not know them yet.
static void __browse(UploadViewData *vd)
{
    __cloud_thumbnails_watch(vd, true);
    __meta_refresh_start(vd);
    if (vd->ad->is_meta_refreshed)
        _velora_upload_view_update();
    else
        vd->ad->popup = _velora_common_create_processing_popup(vd->ad->win_main, __popup_hide_cb, vd);
}

void __uploads_show(UploadViewData *vd)
{
    for (Evas_Object **widget : {&vd->done_btn, &vd->cancel_btn, &vd->toolbar}) {
        if (*widget)
            evas_object_del(*widget);
        *widget = nullptr;
    }
    if (vd->pathinfo_timer)
        ecore_timer_del(vd->pathinfo_timer);
    vd->pathinfo_timer = nullptr;
    remove_genlist_item(vd->genlist); // a long list that still measures its rows would keep idlers waiting
    elm_object_signal_emit(vd->layout, "elm.navi.hide", "elm");
    __title_set(vd, "IDS_KQ_HEADER_VELORA_UPLOADS_ABB");
    vd->is_upload_started = true;
}

void _velora_upload_view_keep_waiting(AppData *ad)
{
    UploadViewData *vd = s_vd;
    if (!vd)
        return;
    GList *waiting = g_list_nth(ad->upload_list, static_cast<guint>(vd->settled));
    if (!waiting)
        return;
    if (waiting->prev)
        waiting->prev->next = nullptr;
    else
        ad->upload_list = nullptr;
    waiting->prev = nullptr;
    vd->kept = g_list_concat(vd->kept, waiting);
}

static bool __is_any_waiting(const UploadViewData *vd)
{
    return vd->kept || g_list_nth(vd->ad->upload_list, static_cast<guint>(vd->settled));
}

bool __next_share_begin(UploadViewData *vd)
{
    if (!vd->is_upload_started || vd->thread || !__is_any_waiting(vd))
        return false;
    AppData *ad = vd->ad;
    VELORA_LOGI("the files of another share are next");
    _velora_app_popup_delete(ad);
    remove_genlist_item(vd->genlist);
    _velora_upload_view_keep_waiting(ad);
    _velora_upload_list_free(&ad->upload_list);
    ad->upload_list = vd->kept;
    vd->kept = nullptr;
    ad->exit_on_pause = 0;
    vd->settled = 0;
    vd->total = vd->canceled = vd->success = vd->fail = 0;
    vd->is_upload_started = false;
    vd->is_end_handled = false;
    __path_bar_create(vd);
    elm_object_signal_emit(vd->layout, "elm.navi.show", "elm");
    __title_set(vd, s_title);
    if (__share_create(vd))
        __browse(vd);
    return true;
}

// The folder that the files of a result were meant for, so that another try leads there again.
static void __result_folder_open(UploadViewData *vd)
{
    AppData *ad = vd->ad;
    char *path = nullptr;
    cloud_content_sync_folder_h folder = nullptr;
    if (ad->app_control && app_control_get_extra_data(ad->app_control, RESULT_FOLDER_KEY, &path) == 0 && path &&
        cloud_content_sync_get_folder_by_server_path(ad->sync_handle, path, &folder) == 0)
        __folder_open(vd, folder);
    std::free(path);
}

// Prepares the items of a result; false when one is missing.
static bool __result_items_prepare(UploadViewData *vd)
{
    vd->settled = vd->ad->result_path_count;
    const TakenNames taken_names(vd);
    GList *entry = vd->ad->upload_list;
    for (int i = 0; i < vd->ad->result_path_count; i++, entry = entry->next) {
        if (!entry) {
            VELORA_LOGE("upload_item is NULL");
            return false;
        }
        auto *item = static_cast<UploadItem *>(entry->data);
        item->index = i;
        item->size = ecore_file_size(item->path);
        g_free(item->server_path);
        item->server_path = __get_upload_server_path(vd, item->path);
    }
    return true;
}

static void __result_create(UploadViewData *vd)
{
    _velora_app_popup_delete(vd->ad);
    __result_folder_open(vd);
    if (!__result_items_prepare(vd))
        return;
    __uploads_show(vd);
    __result_rows_append(vd, false);
    __pipe_ensure(vd);
}

static void __uploaded_genlist(UploadViewData *vd)
{
    remove_genlist_item(vd->genlist);
    // Not behind the back of a queue or of files that still have to be sent somewhere.
    vd->ad->exit_on_pause = !vd->thread && !__is_any_waiting(vd);
    __result_rows_append(vd, true);
}

static void __reenter(UploadViewData *vd)
{
    _velora_app_popup_delete(vd->ad);
    if (vd->ad->launch_mode != LAUNCH_MODE_UPLOAD_RESULT) {
        if (vd->is_upload_started && vd->thread)
            notification_status_message_post(__text("IDS_VELORA_BODY_FILES_FOLLOW"));
        else
            __next_share_begin(vd);
        return;
    }
    if (!vd->thread)
        __result_folder_open(vd);
    if (!__result_items_prepare(vd))
        return;
    if (!vd->is_upload_started)
        __uploads_show(vd);
    __uploaded_genlist(vd);
}

void _velora_upload_view_create(AppData *ad)
{
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    ad->is_welcome_shown = false;
    if (s_vd)
        s_vd.load()->is_end_handled = false;
    if (!_velora_common_check_network(ad)) {
        VELORA_LOGE("network error");
        return;
    }
    _velora_common_local_data_connect();
    if (s_vd) {
        __reenter(s_vd);
        return;
    }
    VELORA_LOGI("Create velora upload file view");
    auto *vd = new UploadViewData;
    s_vd = vd;
    vd->ad = ad;
    __push_on_naviframe(vd);
    if (!__cloud_client_create(vd))
        return;
    if (ad->launch_mode == LAUNCH_MODE_UPLOAD_RESULT) {
        __result_create(vd);
        return;
    }
    if (ad->launch_mode == LAUNCH_MODE_SHARE && !__share_create(vd))
        return;
    __pipe_ensure(vd);
    __browse(vd);
}

static void __nothing_to_upload(UploadViewData *vd)
{
    if (vd->is_upload_started || vd->ad->upload_list || vd->ad->popup)
        return;
    vd->ad->popup =
        _velora_common_create_warning_popup(vd->ad->win_main, "IDS_VELORA_BODY_NO_FILES", __popup_exit_cb, vd);
}

void _velora_upload_view_update()
{
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    const bool was_focused = elm_object_focus_get(vd->genlist);
    remove_genlist_item(vd->genlist);
    if (vd->thread) {
        GList *entry = vd->ad->upload_list;
        for (int i = 0; i < vd->total; i++, entry = entry->next) {
            if (!entry) {
                VELORA_LOGE("upload_item is NULL");
                return;
            }
            auto *item = static_cast<UploadItem *>(entry->data);
            if (item->state != UPLOAD_STATE_DONE && item->state != UPLOAD_STATE_CANCELED)
                __upload_row_append(vd, item, i);
        }
    }
    if (vd->is_upload_started) {
        __state_show(vd, VIEW_STATE_NONE);
        return;
    }
    const int rows = __folder_list_append(vd);
    if (Elm_Object_Item *first = elm_genlist_first_item_get(vd->genlist); was_focused && first)
        elm_object_item_focus_set(first, EINA_TRUE);
    const ViewState unreachable = __meta_state();
    __state_show(vd, rows > 0 ? VIEW_STATE_NONE : unreachable != VIEW_STATE_NONE ? unreachable : VIEW_STATE_EMPTY);
    __nothing_to_upload(vd);
}
