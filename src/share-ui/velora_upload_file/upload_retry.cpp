#include "velora_upload_file/upload_retry.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_popup.h"
#include "velora_upload_file/upload_list.h"
#include "velora_upload_file/upload_listed.h"
#include "velora_upload_file/upload_progress.h"
#include "velora_upload_file/upload_select.h"
#include "velora_upload_file/upload_signin.h"
#include "velora_upload_file/upload_start.h"
#include "velora_upload_file/upload_text.h"

static const char s_topic[] = "retry";
static UploadItemHold s_asked; // the file that the popup is about

void __retry_popup_end(UploadViewData *vd)
{
    _velora_popup_take_away(vd->ad, {vd, s_topic});
    s_asked.reset();
}

static void __cancel_fail_popup(void *data, Evas_Object *, void *)
{
    if (!data || data != s_vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    __retry_popup_end(s_vd);
}

static Eina_Bool __idler_uploading_cb(void *data)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd || vd != s_vd || !vd->run || vd->run->is_joinable)
        VELORA_LOGE("data is NULL");
    else if (!__run_prepare(vd, 0.01))
        return ECORE_CALLBACK_RENEW;
    else
        __run_begin(vd);
    return ECORE_CALLBACK_CANCEL;
}

// A run of files that are in the list.
static void __retry_begin(UploadViewData *vd, std::vector<UploadItemHold> items)
{
    vd->ad->exit_on_pause = 0; // a result that is only looked at may go, not one that is tried again
    const char *path = items.front()->server_path;
    const std::string folder = __folder_of(path ? path : "/");
    std::vector<Elm_Object_Item *> rows;
    for (const UploadItemHold &item : items)
        if (item->gen_it)
            rows.push_back(item->gen_it);
    __run_create(vd, std::move(items), folder);
    vd->phase = PHASE_UPLOADING;
    for (Elm_Object_Item *row : rows) {
        elm_genlist_item_selected_set(row, EINA_FALSE);
        __upload_row_restyle(vd, row, ITEM_TYPE_UPLOADING);
    }
    __progress_line_update(vd);
    ecore_idler_add(__idler_uploading_cb, vd);
}

static void __upload_again_fail_popup(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    UploadItemHold item = std::move(s_asked);
    if (!vd || vd != s_vd || !item) {
        VELORA_LOGE("data is NULL");
        return;
    }
    __retry_popup_end(vd); // first: it gives the focus back to the row
    if (vd->run || !item->gen_it)
        return;
    std::vector<UploadItemHold> items;
    items.push_back(std::move(item));
    __retry_begin(vd, std::move(items));
}

bool __retry_signed_out(UploadViewData *vd)
{
    if (vd->run || (vd->phase != PHASE_ENDED && vd->phase != PHASE_RESULT))
        return false;
    std::vector<UploadItemHold> items;
    for (UploadItem *item : __listed(vd, ITEM_TYPE_FAILED))
        if (__is_signed_out(item->error))
            items.emplace_back(_velora_upload_item_ref(item));
    if (items.empty())
        return false;
    __retry_popup_end(vd);
    __retry_begin(vd, std::move(items));
    return true;
}

static void __retry_popup_show(UploadViewData *vd, UploadItem *item)
{
    Evas_Object *popup = _velora_common_with_title_btn_popup(
        vd->ad->win_main, __text("IDS_KQ_HEADER_FAILED_TO_UPLOAD_FILE_ABB"),
        __text("IDS_KQ_POP_TAP_UPLOAD_TO_TRY_AGAIN"), __cancel_fail_popup, __upload_again_fail_popup,
        __text("IDS_CLOUD_SK2_CANCEL"), __text("IDS_KQ_BUTTON_UPLOAD"), vd);
    _velora_popup_show(vd->ad, {vd, s_topic}, popup);
    s_asked.reset(_velora_upload_item_ref(item));
}

void __velora_uploading_item_selected(void *data, Evas_Object *, void *event_info)
{
    auto *record = static_cast<ItemData *>(data);
    UploadViewData *vd = s_vd;
    if (!record || !vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    VELORA_LOGI("select item style is [%d]", record->type);
    auto *row = static_cast<Elm_Object_Item *>(event_info);
    if (record->type == ITEM_TYPE_UPLOADING && vd->is_select_mode)
        __selection_row_tapped(vd, record, row);
    if (record->type != ITEM_TYPE_FAILED)
        return;
    if (row) {
        elm_genlist_item_selected_set(row, EINA_FALSE);
        record->gen_it = row;
    }
    if (!vd->run && record->item && __is_signed_out(record->item->error))
        __signin_ask(vd);
    else if (!vd->run && record->item)
        __retry_popup_show(vd, record->item.get());
}
