#include "main/velora_pending_pages.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_requests.h"

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

void _velora_setupwizard_view_create(AppData *ad)
{
    __pending_popup_show(ad, "IDS_VELORA_BODY_SHARE_FROM_ANOTHER_APPLICATION");
}

void _velora_signin_setupwizard_create(AppData *ad)
{
    __pending_popup_show(ad, "IDS_VELORA_BODY_SHARE_FROM_ANOTHER_APPLICATION");
}
