#include "velora_upload_file/upload_share.h"
#include "notification/notification.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_popup.h"
#include "velora_upload_file/upload_browser.h"
#include "velora_upload_file/upload_left.h"
#include "velora_upload_file/upload_listed.h"
#include "velora_upload_file/upload_meta.h"
#include "velora_upload_file/upload_page.h"
#include "velora_upload_file/upload_path_bar.h"
#include "velora_upload_file/upload_queue.h"
#include "velora_upload_file/upload_retry.h"
#include "velora_upload_file/upload_text.h"
#include "velora_upload_file/upload_thumbnails.h"
#include "velora_upload_file/upload_waiting.h"

static const char s_wait[] = "wait", s_nothing[] = "nothing to upload";

void __popup_exit_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    if (vd != s_vd) // pressed twice
        return;
    _velora_popup_take_away(vd->ad, {vd, ""});
    _velora_page_leave(vd->ad, vd);
}

static void __popup_hide_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    _velora_popup_take_away(vd->ad, {vd, s_wait});
    _velora_upload_list_free(&vd->ad->upload_list);
    __waiting_give().clear();
    __done_update(vd);
    elm_win_lower(vd->ad->win_main);
}

static void __btn_cancel_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    _velora_page_leave(vd->ad, vd);
}

// A share without files, or one that was given up on the wait.
static void __say_nothing_to_upload(UploadViewData *vd)
{
    if (__waiting_count() > 0 || vd->ad->popup)
        return;
    _velora_popup_show(
        vd->ad, {vd, s_nothing},
        _velora_common_create_warning_popup(vd->ad->win_main, "IDS_VELORA_BODY_NO_FILES", __popup_exit_cb, vd));
}

void __browse_begin(UploadViewData *vd)
{
    AppData *ad = vd->ad;
    vd->phase = PHASE_BROWSING;
    if (!__path_bar_exists())
        __path_bar_create(vd, __folder_jump);
    elm_object_signal_emit(vd->layout, "elm.navi.show", "elm");
    __title_set(vd, "IDS_KQ_HEADER_UPLOAD_TO_ABB2");
    cloud_content_sync_folder_h root = nullptr;
    if (cloud_content_sync_folder_get_root(vd->client.get(), &root) != 0) {
        VELORA_LOGE("cloud_content_sync_folder_get_root failed");
        _velora_page_leave(ad, vd);
        return;
    }
    __folder_open(vd, root);
    VELORA_LOGI("path: %s", ad->folder_path);
    __title_buttons_create(vd, __btn_cancel_cb, __btn_upload_cb);
    __cloud_thumbnails_watch(vd, true);
    __meta_refresh_start(vd);
    __folder_show(vd);
    if (ad->is_meta_refreshed) {
        __say_nothing_to_upload(vd);
        __left_ask(vd);
    } else {
        _velora_popup_show(ad, {vd, s_wait},
                           _velora_common_create_processing_popup_with_cancel(
                               ad->win_main, "IDS_VELORA_STATE_LOADING_TITLE", __popup_hide_cb, vd));
    }
}

bool __next_share_begin(UploadViewData *vd)
{
    if (vd->phase == PHASE_BROWSING || vd->run || __waiting_count() == 0)
        return false;
    VELORA_LOGI("the files of another share are next");
    __retry_popup_end(vd);
    __listed_clear(vd);
    vd->ad->exit_on_pause = 0;
    __browse_begin(vd);
    return true;
}

void __share_joins(UploadViewData *vd)
{
    if (__waiting_take(vd->ad) > 0)
        _velora_popup_take_away(vd->ad, {vd, s_nothing});
    if (vd->run) {
        notification_status_message_post(__text("IDS_VELORA_BODY_FILES_FOLLOW"));
    } else if (vd->phase == PHASE_BROWSING) {
        __done_update(vd);
        notification_status_message_post(__text("IDS_VELORA_BODY_FILES_JOIN"));
    } else {
        __next_share_begin(vd);
    }
}

void __share_begin_anew(UploadViewData *vd)
{
    while (!__path_bar_is_at_root())
        __path_bar_remove_last();
    __meta_refresh_start(vd);
    __folder_jump(vd, nullptr);
}

void __share_meta_done(UploadViewData *vd)
{
    _velora_popup_take_away(vd->ad, {vd, s_wait});
    if (vd->phase != PHASE_BROWSING)
        return;
    __folder_show(vd);
    __say_nothing_to_upload(vd);
    __left_ask(vd);
}

void __share_meta_changed(UploadViewData *vd)
{
    // Rows that would be the same stay, for there may be a finger on one.
    const bool is_listed = __state_shown(vd) == VIEW_STATE_NONE && __meta_state(vd) != VIEW_STATE_SIGNED_OUT;
    if (vd->phase != PHASE_BROWSING || (is_listed && !__folder_list_has_changed(vd)))
        return;
    int x = 0, y = 0, w = 0, h = 0;
    elm_scroller_region_get(vd->genlist, &x, &y, &w, &h);
    __folder_show(vd);
    elm_scroller_region_show(vd->genlist, x, y, w, h);
}
