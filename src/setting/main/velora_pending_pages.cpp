#include "main/velora_pending_pages.h"
#include "velora_add_account_content_sync/velora_signin.h"
#include "velora_common/velora_account.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_requests.h"
#include "velora_upload_file/velora_upload_view.h"

static const char s_topic[] = "pending page";
static int s_request; // that the popup stands for

static void __replaced_cb(void *data)
{
    _velora_request_answer(static_cast<AppData *>(data), s_request, APP_CONTROL_RESULT_SUCCEEDED);
}

static void __pending_popup_ok_cb(void *data, Evas_Object *, void *)
{
    auto *ad = static_cast<AppData *>(data);
    if (_velora_popup_take_away(ad, {s_topic, s_topic}))
        _velora_request_finish(ad, s_request);
}

void _velora_pending_page_end(AppData *ad)
{
    if (_velora_popup_take_away(ad, {s_topic, s_topic}))
        __replaced_cb(ad);
}

static void __pending_popup_show(AppData *ad, const char *text_id)
{
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    _velora_pending_page_end(ad);
    s_request = _velora_request_last();
    _velora_popup_show(ad, {s_topic, s_topic},
                       _velora_common_create_warning_popup(ad->win_main, text_id, __pending_popup_ok_cb, ad),
                       __replaced_cb, ad);
}

void _velora_details_create(AppData *ad)
{
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    AccountInfo *info = nullptr;
    const bool has_account = __velora_check_account_exist(VELORA_PACKAGE, &info) == 0;
    __velora_account_info_free(info);
    if (ad->launch_mode == LAUNCH_MODE_SHARE) {
        _velora_upload_view_create(ad);
    } else if (!_velora_pages_are_empty()) { // what is open is in front now, and says more
        _velora_request_finish(ad, _velora_request_last());
    } else if (!has_account) {
        ad->launch_mode = LAUNCH_MODE_SIGNIN;
        _velora_signin_create(ad, 1);
    } else {
        __pending_popup_show(ad, "IDS_VELORA_BODY_SHARE_FROM_ANOTHER_APPLICATION");
    }
}
