// The queue as the main loop sees it: its start, what the pipe says of it, cancel and retry.
#include "notification/notification.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_thread.h"
#include "velora_upload_file/upload_internal.h"
#include <Ecore_File.h>
#include <cstdio>
#include <cstdlib>
#include <cstring>

static Eina_Bool __idler_load_cb(void *data)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return ECORE_CALLBACK_CANCEL;
    }
    if (s_vd != vd) // the view went away before the loop was idle
        return ECORE_CALLBACK_CANCEL;
    const int pending = vd->total - vd->canceled - vd->success - vd->fail;
    if (pending <= 0)
        return ECORE_CALLBACK_CANCEL;
    char text[32];
    __delete_all_callback_ctxpopup();
    std::snprintf(text, sizeof text, "%d / %d", vd->success.load(), vd->total - vd->canceled);
    if (vd->noti_id > 0) {
        __progress_noti_set_content(vd->noti_id, text);
    } else {
        int noti_id = vd->noti_id;
        __progress_noti_new(text, &noti_id);
        vd->noti_id = noti_id;
        vd->ad->noti_priv_id = noti_id;
    }
    const TakenNames taken_names(vd);
    GList *entry = vd->ad->upload_list;
    for (int i = 0; i < vd->total; i++, entry = entry->next) {
        if (!entry) {
            VELORA_LOGE("upload_item is NULL");
            return ECORE_CALLBACK_CANCEL;
        }
        auto *item = static_cast<UploadItem *>(entry->data);
        item->index = i;
        item->size = ecore_file_size(item->path);
        g_free(item->server_path);
        item->server_path = __get_upload_server_path(vd, item->path);
    }
    if (!vd->thread)
        __selection_resize(vd->total);
    __worker_start(vd, __thread_upload_file, nullptr);
    _velora_upload_view_update();
    __worker_begin();
    return ECORE_CALLBACK_CANCEL;
}

void __btn_upload_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    AppData *ad = vd->ad;
    elm_win_lower(ad->win_main); // back to the application that shares, while the files go up
    __uploads_show(vd);
    vd->total = vd->settled = static_cast<int>(g_list_length(ad->upload_list));
    if (vd->more_btn)
        elm_object_disabled_set(vd->more_btn, vd->total == 0);
    ecore_idler_add(__idler_load_cb, vd);
    if (ad->xwin && ecore_x_display_get())
        ecore_x_icccm_transient_for_unset(ad->xwin);
}

static void __storage_full(UploadViewData *vd)
{
    notification_status_message_post(__text("Unable to upload, not enough memory"));
    _velora_upload_list_free(&vd->ad->upload_list);
    __leave(vd);
}

static void __run_ended(UploadViewData *vd)
{
    VELORA_LOGI("All are done");
    if (vd->is_end_handled)
        return;
    vd->is_end_handled = true;
    vd->thread = 0;
    if (vd->noti_id != -1) {
        __progress_noti_delete(vd->noti_id);
        vd->noti_id = -1;
    }
    elm_object_item_part_content_unset(vd->nf_item, "toolbar_more_btn");
    if (vd->more_btn)
        evas_object_del(vd->more_btn);
    vd->more_btn = nullptr;
    _velora_app_popup_delete(vd->ad);
    if (vd->done_btn) // the selection mode is on, with nothing left to select
        __remove_all_selete_item(vd);
    Evas_Object *window = vd->ad->win_main;
    if (__next_share_begin(vd))   // the view may be gone now
        elm_win_activate(window); // they are waiting for an answer
    else if (!elm_genlist_first_item_get(vd->genlist))
        __state_show(vd, VIEW_STATE_STOPPED);
}

static void __row_store(UploadItem *item, int index)
{
    VELORA_LOGI("--------- store: %d,upload_item->state[%d]", index, item->state.load());
    if (!item->gen_it)
        return;
    auto *record = static_cast<ItemData *>(elm_object_item_data_get(item->gen_it));
    if (!record) {
        VELORA_LOGE("item is NULL");
        return;
    }
    UploadViewData *vd = s_vd;
    record->vd = vd;
    g_free(record->name);
    record->name = g_strdup(__landed_name(vd, item).c_str());
    record->index = index;
    g_free(record->path);
    record->path = g_strdup(item->path);
    const bool is_done = item->state == UPLOAD_STATE_DONE;
    record->type = is_done ? ITEM_TYPE_UPLOADED : ITEM_TYPE_FAILED;
    elm_genlist_item_item_class_update(item->gen_it, is_done ? vd->itc_file : vd->itc_fail);
    __row_tappable_set(item->gen_it, !is_done);
    elm_genlist_item_update(item->gen_it);
}

// What is on screen stays there when it can: a cancel button that is replaced while a finger is on it is never clicked.
static void __row_refresh_progress(const UploadItem *item)
{
    if (!item->gen_it) {
        VELORA_LOGI("upload_item->gen_it is NULL");
        return;
    }
    const int state = item->state;
    Evas_Object *bar = elm_object_item_part_content_get(item->gen_it, "elm.swallow.progressbar");
    if (bar && state == UPLOAD_STATE_UPLOADING && g_strcmp0(elm_object_style_get(bar), "list_progress") == 0) {
        elm_progressbar_value_set(bar, item->progress / 100.0);
        return;
    }
    elm_genlist_item_fields_update(item->gen_it, "elm.swallow.progressbar", ELM_GENLIST_ITEM_FIELD_CONTENT);
    if (state != UPLOAD_STATE_WAITING && state != UPLOAD_STATE_UPLOADING)
        elm_genlist_item_fields_update(item->gen_it, "elm.icon.2", ELM_GENLIST_ITEM_FIELD_CONTENT);
}

// "store.N" or "update.N".
static void __item_message(UploadViewData *vd, const char *message)
{
    char **pieces = g_strsplit(message, ".", -1);
    const bool is_number = pieces[0] && pieces[1] && *pieces[1];
    if (!is_number) {
        VELORA_LOGE("split_str is NULL");
        g_strfreev(pieces);
        return;
    }
    const int index = static_cast<int>(strtol(pieces[1], nullptr, 10));
    UploadItem *item = __upload_item_find_running(vd, index);
    if (!item)
        VELORA_LOGE("upload_item is NULL");
    else if (std::strcmp(pieces[0], "store") == 0)
        __row_store(item, index);
    else if (std::strcmp(pieces[0], "update") == 0)
        __row_refresh_progress(item);
    g_strfreev(pieces);
}

// The tree was refreshed while the list was already there: the rows change, the place in the list does not. Rows that
// would be the same stay, for there may be a finger on one.
static void __meta_changed(UploadViewData *vd)
{
    if (vd->is_upload_started || (!vd->state && !__folder_list_has_changed(vd)))
        return;
    int x = 0, y = 0, w = 0, h = 0;
    elm_scroller_region_get(vd->genlist, &x, &y, &w, &h);
    _velora_upload_view_update();
    elm_scroller_region_show(vd->genlist, x, y, w, h);
}

void __pipe_cb(void *, void *buffer, unsigned int size)
{
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    if (!buffer) {
        VELORA_LOGE("Invalid argument: buffer is NULL");
        return;
    }
    if (ContentResultMessage result; _velora_common_is_content_result(buffer, size, &result)) {
        __content_result_handle(vd, result);
        return;
    }
    const auto *message = static_cast<const char *>(buffer);
    if (g_strcmp0(message, "storage_full") == 0)
        __storage_full(vd);
    else if (g_strcmp0(message, "end") == 0)
        __run_ended(vd);
    else if (g_strcmp0(message, "selection") == 0)
        __selection_title_refresh(vd);
    else if (g_strcmp0(message, "meta_changed") == 0)
        __meta_changed(vd);
    else if (std::strncmp(message, "thumb.", 6) == 0)
        __cloud_thumbnail_arrived(vd, static_cast<uint32_t>(std::strtoul(message + 6, nullptr, 10)));
    else
        __item_message(vd, message);
}

// Takes one upload out of the queue: a cancel that comes too late is refused, but has been counted. False when the
// notification need not tell of it.
static bool __take_out(UploadItem *item, UploadViewData *vd)
{
    vd->canceled++;
    if (!item) {
        VELORA_LOGE("upload_item is NULL");
        return false;
    }
    int seen = UPLOAD_STATE_WAITING;
    bool is_canceled = item->state.compare_exchange_strong(seen, UPLOAD_STATE_CANCELED);
    if (!is_canceled && seen == UPLOAD_STATE_UPLOADING)
        is_canceled = item->state.compare_exchange_strong(seen, UPLOAD_STATE_CANCELED);
    if (!is_canceled) {
        VELORA_LOGI("--- Cann't cancel it");
        return true;
    }
    if (item->gen_it)
        elm_object_item_del(item->gen_it);
    item->gen_it = nullptr;
    const bool was_running = seen == UPLOAD_STATE_UPLOADING;
    const int result = was_running ? cloud_content_sync_cancel(vd->ad->sync_handle, item->request) : 0;
    __worker_wake();
    if (result != 0)
        VELORA_LOGE("cloud_content_sync_cancel failed");
    return result == 0;
}

static void __tell_remaining(UploadViewData *vd)
{
    char text[32];
    const int remaining = vd->total - vd->canceled;
    std::snprintf(text, sizeof text, "%d / %d", vd->success + vd->fail, remaining);
    __progress_noti_set_content(vd->noti_id, text);
    if (remaining < 1)
        _velora_common_pipe_send_msg(vd->pipe, "end");
}

void __uploading_file_mutil_cancel(UploadItem *item, UploadViewData *vd)
{
    if (__take_out(item, vd))
        __tell_remaining(vd);
}

void __uploads_cancel(UploadViewData *vd, const std::vector<UploadItem *> &items)
{
    bool is_told = false;
    for (auto item = items.rbegin(); item != items.rend(); ++item)
        is_told |= __take_out(*item, vd);
    if (is_told)
        __tell_remaining(vd);
}

static void __cancel_job(void *data)
{
    if (UploadViewData *vd = s_vd)
        __uploading_file_mutil_cancel(__upload_item_find(vd, GPOINTER_TO_INT(data)), vd);
}

void __upload_file_cancel_cb(void *data, Evas_Object *, void *)
{
    auto *record = static_cast<ItemData *>(data);
    if (!record) {
        VELORA_LOGE("item is NULL");
        return;
    }
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    VELORA_LOGI("-------To cancel: %d", record->index);
    // The list may be at work on the row whose button this is; it must not lose the row before it is done.
    ecore_job_add(__cancel_job, GINT_TO_POINTER(record->index));
}

static void __cancel_fail_popup(void *data, Evas_Object *, void *)
{
    if (!data || !s_vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    _velora_app_popup_delete(s_vd.load()->ad);
}

static Eina_Bool __idler_uploading_cb(void *data)
{
    UploadViewData *vd = s_vd;
    UploadItem *item = vd ? __upload_item_find(vd, GPOINTER_TO_INT(data)) : nullptr;
    if (!item)
        VELORA_LOGE("data is NULL");
    else
        __worker_start(vd, __velora_upload_fail_reboot, item);
    return ECORE_CALLBACK_CANCEL;
}

static void __upload_again_fail_popup(void *data, Evas_Object *, void *)
{
    auto *record = static_cast<ItemData *>(data);
    UploadViewData *vd = s_vd;
    if (!record || !vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    _velora_app_popup_delete(vd->ad); // first: it gives the focus back to the row
    vd->is_uploading = true;
    vd->ad->exit_on_pause = 0; // a result that is only looked at may go, not one that is tried again
    UploadItem *item = __upload_item_find(vd, record->index);
    if (item) { // the row shows a file that waits, not one that failed
        item->error = 0;
        item->progress = 0;
        item->state = UPLOAD_STATE_WAITING;
    }
    if (record->gen_it) {
        elm_genlist_item_selected_set(record->gen_it, EINA_FALSE);
        record->vd = vd;
        record->type = ITEM_TYPE_UPLOADING;
        elm_genlist_item_item_class_update(record->gen_it, vd->itc_uploading);
        __row_tappable_set(record->gen_it, false);
        elm_genlist_item_update(record->gen_it);
    }
    if (vd->noti_id < 1) {
        int noti_id = vd->noti_id;
        __progress_noti_new("0 / 1", &noti_id);
        vd->noti_id = noti_id;
        vd->ad->noti_priv_id = noti_id;
    }
    ecore_idler_add(__idler_uploading_cb, GINT_TO_POINTER(record->index));
}

void __retry_popup_show(ItemData *record)
{
    UploadViewData *vd = s_vd;
    _velora_app_popup_delete(vd->ad);
    vd->ad->popup = _velora_common_with_title_btn_popup(
        vd->ad->win_main, __text("IDS_KQ_HEADER_FAILED_TO_UPLOAD_FILE_ABB"),
        __text("IDS_KQ_POP_TAP_UPLOAD_TO_TRY_AGAIN"), __cancel_fail_popup, __upload_again_fail_popup,
        __text("IDS_CLOUD_SK2_CANCEL"), __text("IDS_KQ_BUTTON_UPLOAD"), record);
}
