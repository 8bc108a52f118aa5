// The more menu, and what its one entry leads to: the account is removed from the device.
#include "velora_common/velora_client.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_more_menu.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_signout.h"
#include "velora_details_content_sync/details_record.h"
#include "velora_upload_file/velora_uploads.h"
#include <cstdio>

static const char s_topic[] = "remove account";

static void __delete_account_popup_cancel_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    _velora_popup_take_away(vd->ad, {vd, s_topic});
}

static void __delete_account_popup_ok_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    AppData *ad = vd->ad;
    if (!_velora_popup_take_away(ad, {vd, s_topic}))
        return;
    _velora_upload_view_stop_all(ad);
    _velora_upload_view_forget();
    if (!_velora_common_client_get(ad))
        VELORA_LOGE("cloud_content_sync_create failed");
    if (const int result = _velora_common_add_account_with_popup_signout(ad); result != 0)
        VELORA_LOGE("_velora_common_signout failed: %d", result);
}

static std::string __question()
{
    std::string text = __details_text("IDS_ST_POP_ALL_DATA_RELATED_TO_THIS_ACCOUNT_WILL_BE_DELETED_FROM_THE_DEVICE");
    const int count = _velora_upload_view_unfinished();
    if (count == 0)
        return text;
    char uploading[512];
    std::snprintf(
        uploading, sizeof uploading,
        __details_text(count == 1 ? "IDS_VELORA_BODY_PD_FILES_UPLOADING_ONE" : "IDS_VELORA_BODY_PD_FILES_UPLOADING"),
        count);
    return text + "<br/>" + uploading;
}

static void __question_language_cb(void *, Evas_Object *popup, void *)
{
    elm_object_text_set(popup, __question().c_str());
}

static Evas_Object *__button_add(DetailsViewData *vd, Evas_Object *popup, const char *part, const char *text_id,
                                 Evas_Smart_Cb cb)
{
    Evas_Object *button = elm_button_add(popup);
    elm_object_style_set(button, "popup");
    elm_object_domain_translatable_text_set(button, VELORA_DOMAIN, text_id);
    evas_object_smart_callback_add(button, "clicked", cb, vd);
    elm_object_part_content_set(popup, part, button);
    return button;
}

static void __delete_button_cb(void *data)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    Evas_Object *popup = elm_popup_add(vd->ad->win_main);
    elm_popup_scrollable_set(popup, EINA_TRUE); // long words in a low window
    elm_popup_align_set(popup, ELM_NOTIFY_ALIGN_FILL, 1.0);
    elm_object_domain_translatable_part_text_set(popup, "title,text", VELORA_DOMAIN,
                                                 "IDS_CLOUD_BUTTON_REMOVE_ACCOUNT_ABB");
    evas_object_size_hint_weight_set(popup, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    elm_object_text_set(popup, __question().c_str());
    evas_object_smart_callback_add(popup, "language,changed", __question_language_cb, nullptr);
    evas_object_smart_callback_add(popup, "block,clicked", __delete_account_popup_cancel_cb, vd);
    Evas_Object *cancel = __button_add(vd, popup, "button1", "IDS_CLOUD_SK2_CANCEL", __delete_account_popup_cancel_cb);
    Evas_Object *remove = __button_add(vd, popup, "button2", "IDS_CLOUD_BUTTON_REMOVE", __delete_account_popup_ok_cb);
    elm_layout_signal_emit(remove, "platform,button,destructive", "platform");
    _velora_common_register_event_for_popup(popup, __delete_account_popup_cancel_cb, vd);
    evas_object_show(popup);
    _velora_popup_show(vd->ad, {vd, s_topic}, popup);
    elm_object_focus_set(cancel, EINA_TRUE); // and not the text, because it can be scrolled
}

static void __create_more_ctxpopup(DetailsViewData *vd)
{
    _velora_more_menu_open(vd->ad, vd, VELORA_DOMAIN, "IDS_ST_OPT_REMOVE", __delete_button_cb, vd);
}

void __more_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    if (!vd->more_btn || elm_naviframe_top_item_get(vd->ad->naviframe) != vd->nf_item)
        return;
    if (!_velora_more_menu_close(vd->ad, vd) && !vd->ad->popup) // the key that opened it closes it
        __create_more_ctxpopup(vd);
}
