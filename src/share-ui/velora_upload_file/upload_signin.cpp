#include "velora_upload_file/upload_signin.h"
#include "velora_add_account_content_sync/velora_signin.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_popup.h"
#include "velora_upload_file/upload_text.h"
#include <libintl.h>

static const char s_topic[] = "signed out";

bool __is_signed_out(int error)
{
    return error == CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED || error == CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
}

void __signin_open_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (vd != s_vd)
        return;
    _velora_popup_take_away(vd->ad, {vd, s_topic});
    _velora_signin_create_over(vd->ad, 1, __signed_in_again);
}

static void __cancel_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (vd == s_vd)
        _velora_popup_take_away(vd->ad, {vd, s_topic});
}

void __signin_ask(UploadViewData *vd)
{
    const char *words =
        dcgettext(VELORA_DOMAIN,
                  "IDS_CLOUD_BODY_YOU_HAVE_BEEN_SIGNED_OUT_OF_YOUR_VELORA_ACCOUNT_SIGN_IN_AGAIN_TO_USE_VELORA_SERVICES",
                  LC_MESSAGES);
    Evas_Object *popup = _velora_common_with_title_btn_popup(
        vd->ad->win_main, __text("IDS_VELORA_STATE_SIGNED_OUT_TITLE"), words, __cancel_cb, __signin_open_cb,
        __text("IDS_CLOUD_SK2_CANCEL"), __text("IDS_VELORA_BUTTON_SIGN_IN"), vd);
    _velora_popup_show(vd->ad, {vd, s_topic}, popup);
}
