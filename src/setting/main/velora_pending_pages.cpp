#include "main/velora_pending_pages.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_popup.h"

static void __pending_popup_ok_cb(void *data, Evas_Object *, void *)
{
    auto *ad = static_cast<AppData *>(data);
    _velora_app_popup_delete(ad);
    _velora_app_exit(ad);
}

static void __pending_popup_show(AppData *ad, const char *text_id)
{
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    _velora_app_popup_delete(ad);
    ad->popup = _velora_common_create_warning_popup(ad->win_main, text_id, __pending_popup_ok_cb, ad);
}

void _velora_signin_create(AppData *ad, int)
{
    __pending_popup_show(ad, "IDS_VELORA_BODY_ADD_AN_ACCOUNT_FIRST");
}

void _velora_setupwizard_view_create(AppData *ad)
{
    __pending_popup_show(ad, "IDS_VELORA_BODY_SHARE_FROM_ANOTHER_APPLICATION");
}

void _velora_signin_setupwizard_create(AppData *ad)
{
    __pending_popup_show(ad, "IDS_VELORA_BODY_SHARE_FROM_ANOTHER_APPLICATION");
}

void _velora_details_create(AppData *ad)
{
    __pending_popup_show(ad, "IDS_VELORA_BODY_SHARE_FROM_ANOTHER_APPLICATION");
}
