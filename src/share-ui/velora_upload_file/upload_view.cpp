// The upload view's life: built by a share or a result, left by Back, Cancel or a failure.
#include "notification/notification.h"
#include "velora_common/velora_client.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_local_data.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_network.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_pipe.h"
#include "velora_common/velora_popup.h"
#include "velora_upload_file/upload_browser.h"
#include "velora_upload_file/upload_cancel.h"
#include "velora_upload_file/upload_icon.h"
#include "velora_upload_file/upload_left.h"
#include "velora_upload_file/upload_list.h"
#include "velora_upload_file/upload_listed.h"
#include "velora_upload_file/upload_menu.h"
#include "velora_upload_file/upload_messages.h"
#include "velora_upload_file/upload_notification.h"
#include "velora_upload_file/upload_open.h"
#include "velora_upload_file/upload_page.h"
#include "velora_upload_file/upload_path_bar.h"
#include "velora_upload_file/upload_progress.h"
#include "velora_upload_file/upload_queue.h"
#include "velora_upload_file/upload_result.h"
#include "velora_upload_file/upload_retry.h"
#include "velora_upload_file/upload_select.h"
#include "velora_upload_file/upload_share.h"
#include "velora_upload_file/upload_signin.h"
#include "velora_upload_file/upload_thumbnails.h"
#include "velora_upload_file/upload_waiting.h"
#include "velora_upload_file/upload_worker.h"
#include "velora_upload_file/velora_upload_view.h"
#include "velora_upload_file/velora_uploads.h"

UploadViewData *s_vd = nullptr;
std::atomic<Ecore_Pipe *> s_view_pipe = nullptr;

// The worker ends first, then what its callbacks reach; the client itself stays.
static void __destroy_view(void *data)
{
    auto *vd = static_cast<UploadViewData *>(data);
    VELORA_LOGI("__destroy_view is called!");
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    _velora_pages_remove(vd);
    __delete_all_callback_ctxpopup();
    if (vd->run) {
        __worker_stop(vd->run.get());
        if (vd->run->noti_id != -1)
            __progress_noti_delete(vd->run->noti_id);
    }
    if (vd->is_select_mode)
        __selection_cancel(vd);
    __retry_popup_end(vd);
    _velora_popup_take_away(vd->ad, {vd, ""});
    __path_bar_delete();
    __cloud_thumbnails_watch(vd, false);
    __listed_clear(vd); // with the requests of its rows
    _velora_upload_list_free(&vd->ad->upload_list);
    __waiting_give().clear();
    if (vd->folder)
        cloud_content_sync_folder_destroy(vd->folder);
    _velora_common_local_data_disconnect();
    __page_end(vd, __more_create_folder_cb);
    __item_classes_free(vd);
    __local_thumbnails_free();
    s_view_pipe = nullptr;
    if (vd->pipe)
        _velora_common_pipe_del(vd->pipe);
    s_vd = nullptr;
    delete vd;
}

static void __abandon_view(void *data)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (vd->run) {
        __worker_stop(vd->run.get());
        if (vd->run->queued() > 0)
            vd->ad->noti_priv_id = -1; // it stays, and says from now on that the rest can be uploaded
    }
    s_view_pipe = nullptr;
    __listed_forget();
    __progress_noti_flush(); // the process ends, and what it said last may stay
    vd->client = nullptr;
    vd->run = nullptr;
}

static bool __has_files(void *data)
{
    return static_cast<UploadViewData *>(data)->run || __waiting_count() > 0;
}

static Eina_Bool __btn_back_cb(void *, Elm_Object_Item *)
{
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return EINA_FALSE;
    }
    if (vd->is_select_mode) {
        __selection_cancel(vd);
    } else if (vd->phase == PHASE_BROWSING) {
        if (__path_bar_is_at_root())
            _velora_page_leave(vd->ad, vd);
        else
            __folder_go_up(vd);
    } else if (vd->run) {
        elm_win_lower(vd->ad->win_main);
        if (vd->phase == PHASE_RESULT) { // when it is raised, the queue is to be seen
            vd->phase = PHASE_UPLOADING;
            __run_rows_show(vd);
        }
    } else if (!__next_share_begin(vd)) {
        _velora_page_leave(vd->ad, vd);
    }
    return EINA_FALSE;
}

void _velora_upload_view_keep_waiting(AppData *ad)
{
    __waiting_take(ad);
}

static void __reenter(UploadViewData *vd)
{
    AppData *ad = vd->ad;
    _velora_pages_join(ad, vd);
    if (ad->launch_mode != LAUNCH_MODE_UPLOAD_RESULT) {
        __share_joins(vd);
        return;
    }
    __result_show(vd);
    // Not behind the back of a queue or of files that still have to be sent somewhere.
    ad->exit_on_pause = !vd->run && __waiting_count() == 0;
}

static void __say_no_client(UploadViewData *vd)
{
    _velora_popup_show(vd->ad, {vd, "no client"},
                       _velora_common_create_warning_popup(
                           vd->ad->win_main, "IDS_CLOUD_BODY_SERVER_ERROR_OCCURRED_TRY_LATER", __popup_exit_cb, vd));
}

static UploadViewData *__view_build(AppData *ad)
{
    _velora_common_local_data_connect();
    VELORA_LOGI("Create velora upload file view");
    auto *vd = s_vd = new UploadViewData;
    vd->ad = ad;
    _velora_pages_add(ad, vd, {__destroy_view, __abandon_view, __has_files});
    __page_create(vd, __btn_back_cb, __more_create_folder_cb);
    __item_classes_create(vd);
    vd->genlist = __genlist_create(vd);
    __waiting_measured_cb_set(__progress_line_update_soon);
    s_view_pipe = vd->pipe = _velora_common_pipe_add(__pipe_cb, vd);
    vd->client = _velora_common_client_get(ad);
    if (!vd->client)
        __say_no_client(vd);
    return vd;
}

void _velora_upload_view_create(AppData *ad)
{
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    ad->is_welcome_shown = false;
    if (!_velora_common_check_network(ad)) {
        VELORA_LOGE("network error");
        return;
    }
    if (s_vd) {
        __reenter(s_vd);
        return;
    }
    UploadViewData *vd = __view_build(ad);
    if (!vd->client)
        return;
    if (ad->launch_mode == LAUNCH_MODE_UPLOAD_RESULT) {
        __result_show(vd);
    } else {
        __waiting_take(ad);
        __browse_begin(vd);
    }
}

static void (*s_later)(AppData *ad);

static void __give_way(AppData *ad)
{
    __destroy_view(s_vd);
    s_later(ad);
}

static void __later_job(void *data)
{
    // What was shared while the question stood has the view now.
    if (data == s_vd && s_vd->phase == PHASE_ENDED && !__has_files(s_vd))
        _velora_pages_go_on(s_vd->ad, s_vd, __give_way);
}

void _velora_upload_view_go_on(AppData *ad, void (*later)(AppData *ad))
{
    const bool is_new = !s_vd;
    UploadViewData *vd = is_new ? __view_build(ad) : s_vd;
    if (!is_new)
        _velora_pages_join(ad, vd);
    if (!vd->client)
        return;
    if (!later) {
        __left_go_on(vd);
        return;
    }
    s_later = later;
    if (is_new)
        __uploads_show(vd, PHASE_ENDED);
    // The popup's button must not end under its own click.
    __left_ask(vd, [](UploadViewData *view) { ecore_job_add(__later_job, view); });
}

void __signed_in_again(AppData *)
{
    UploadViewData *vd = s_vd;
    if (vd && vd->phase == PHASE_BROWSING)
        __share_begin_anew(vd);
    else if (vd)
        __retry_signed_out(vd);
}

void _velora_upload_view_update()
{
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    if (vd->phase == PHASE_BROWSING)
        __folder_show(vd);
    else if (vd->phase == PHASE_UPLOADING && vd->run)
        __run_rows_show(vd);
}

void _velora_upload_view_meta_done()
{
    if (s_vd)
        __share_meta_done(s_vd);
}

int _velora_upload_view_unfinished()
{
    const UploadViewData *vd = s_vd;
    return vd ? __waiting_count() + (vd->run ? vd->run->queued() : 0) : 0;
}

void _velora_upload_view_stop_all(AppData *ad)
{
    UploadViewData *vd = s_vd;
    if (!vd || (!vd->run && __waiting_count() == 0))
        return;
    if (vd->run) {
        std::vector<UploadItem *> items;
        for (const RunFile &file : vd->run->files)
            if (const int state = file.item->state; state == UPLOAD_STATE_WAITING || state == UPLOAD_STATE_UPLOADING)
                items.push_back(file.item.get());
        __uploads_cancel(vd, items);
        __worker_join(vd->run.get()); // which says what is up
    }
    _velora_page_replace(ad, vd);
}

void _velora_upload_view_forget()
{
    __opened_copies_delete();
    notification_delete_all_by_type(VELORA_SHARE_PACKAGE, NOTIFICATION_TYPE_NONE);
}
