#include "velora_upload_file/upload_queue.h"
#include "velora_common/velora_log.h"
#include "velora_upload_file/upload_listed.h"
#include "velora_upload_file/upload_page.h"
#include "velora_upload_file/upload_path_bar.h"
#include "velora_upload_file/upload_progress.h"
#include "velora_upload_file/upload_retry.h"
#include "velora_upload_file/upload_start.h"
#include "velora_upload_file/upload_state.h"
#include "velora_upload_file/upload_waiting.h"

void __uploads_show(UploadViewData *vd, ViewPhase phase)
{
    __title_buttons_delete(vd);
    __path_bar_delete();
    __listed_clear(vd); // a long list that still measures its rows would keep idlers waiting
    elm_object_signal_emit(vd->layout, "elm.navi.hide", "elm");
    __title_set(vd, "IDS_KQ_HEADER_VELORA_UPLOADS_ABB");
    __state_show(vd, VIEW_STATE_NONE);
    vd->phase = phase;
}

void __run_rows_show(UploadViewData *vd)
{
    __listed_clear(vd);
    __state_show(vd, VIEW_STATE_NONE);
    __listed_show_run(vd, vd->run, __velora_uploading_item_selected);
    __progress_line_update(vd);
}

static Eina_Bool __idler_load_cb(void *data)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return ECORE_CALLBACK_CANCEL;
    }
    // The view went away before the loop was idle, or something else has the list.
    if (s_vd != vd || !vd->run || vd->run->is_joinable)
        return ECORE_CALLBACK_CANCEL;
    if (!__run_prepare(vd, 0.01))
        return ECORE_CALLBACK_RENEW;
    __run_begin(vd);
    if (vd->phase == PHASE_UPLOADING)
        __run_rows_show(vd);
    return ECORE_CALLBACK_CANCEL;
}

void __run_of(UploadViewData *vd, std::vector<UploadItemHold> items, const std::string &folder)
{
    __uploads_show(vd, PHASE_UPLOADING);
    __run_create(vd, std::move(items), folder);
    ecore_idler_add(__idler_load_cb, vd);
}

void __btn_upload_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    if (vd->phase != PHASE_BROWSING || vd->run || __waiting_count() == 0) // pressed twice
        return;
    AppData *ad = vd->ad;
    elm_win_lower(ad->win_main); // back to the application that shares, while the files go up
    __run_of(vd, __waiting_give(), ad->folder_path ? ad->folder_path : "/");
    if (ad->xwin && ecore_x_display_get())
        ecore_x_icccm_transient_for_unset(ad->xwin);
}
