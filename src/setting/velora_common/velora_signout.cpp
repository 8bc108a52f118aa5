#include "velora_common/velora_signout.h"
#include "account/account.h"
#include "notification/notification.h"
#include "velora_common/velora_account.h"
#include "velora_common/velora_client.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_pipe.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_thread.h"
#include <clocale>
#include <libintl.h>

static const char s_topic[] = "sign-out", s_end[] = "sigout_end";
static const PopupOwner s_owner = {s_topic, s_topic};
// Seconds that a person waits for a service that does not answer. The client goes on in the background.
static constexpr double s_longest_wait = 10;

// The one that is under way. The worker reads what is set before it starts.
struct Signout {
    bool is_under_way = false;
    void *page = nullptr;
    SignoutScope scope = SIGNOUT_ACCOUNT;
    ClientHold client;
    pthread_t thread = 0;
    bool is_joinable = false;
    Ecore_Timer *patience = nullptr;
};
static Signout s_signout;

static void __send_end(AppData *ad)
{
    Ecore_Pipe *pipe = ad->signout_pipe;
    if (pipe && !_velora_common_pipe_send(pipe, s_end, sizeof s_end))
        VELORA_LOGE("ecore_pipe_write failed");
}

// Client thread.
static void __cloud_content_sync_status_cb(int, int, void *data)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    __send_end(ad);
}

static void *__thread_sigout(void *data)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("data is NULL");
        return nullptr;
    }
    auto *const end =
        s_signout.scope == SIGNOUT_ACCOUNT ? cloud_content_sync_deactivate : cloud_content_sync_auth_abandon;
    const int err_code = end(s_signout.client.get(), __cloud_content_sync_status_cb, ad);
    if (err_code != 0) { // no callback will come
        VELORA_LOGE("err_code[%d]", err_code);
        __send_end(ad);
    }
    return nullptr;
}

bool _velora_common_signout_is_under_way()
{
    return s_signout.is_under_way;
}

static void __popup_deleted_cb(void *data, Evas *, Evas_Object *obj, void *)
{
    auto *ad = static_cast<AppData *>(data);
    if (ad->signout_popup == obj)
        ad->signout_popup = nullptr;
}

void _velora_common_signout_end(AppData *ad)
{
    if (!s_signout.is_under_way)
        return;
    if (s_signout.is_joinable)
        pthread_join(s_signout.thread, nullptr);
    if (s_signout.patience)
        ecore_timer_del(s_signout.patience);
    // Without this call a callback could still send on the pipe. What it ends is the waiting, not the sign-out.
    cloud_content_sync_auth_cancel(s_signout.client.get());
    if (Ecore_Pipe *pipe = ad->signout_pipe.exchange(nullptr))
        _velora_common_pipe_del(pipe);
    _velora_popup_take_away(ad, s_owner);
    if (ad->naviframe)
        elm_object_tree_focus_allow_set(ad->naviframe, EINA_TRUE);
    s_signout = {};
}

static void __leave(AppData *ad, void *page)
{
    if (page)
        _velora_page_leave(ad, page);
    else if (!_velora_pages_have_files()) // which somebody has shared meanwhile
        _velora_app_exit(ad);
}

static bool __is_account_left()
{
    char *email = nullptr;
    const bool is_left = cloud_content_sync_account_get_email(VELORA_SERVICE, &email) == 0;
    std::free(email);
    return is_left;
}

// The record goes with the account. 0, or what the account service says of a record that is there and stays.
static int __record_remove()
{
    if (__is_account_left()) { // also one that was activated in the very moment in which it was given up
        _velora_common_account_settle();
        return 0;
    }
    const int result = _velora_common_account_remove_info_from_db();
    if (result == ACCOUNT_ERROR_NONE || result == ACCOUNT_ERROR_RECORD_NOT_FOUND)
        return 0;
    VELORA_LOGE("_velora_common_account_remove_info_from_db failed: %d", result);
    return result;
}

// Ends what is under way, and the client unless a page goes on with it. The page that is to be left.
static void *__finish(AppData *ad)
{
    void *page = s_signout.page;
    _velora_common_signout_end(ad);
    if (!_velora_pages_have_others(page))
        _velora_common_client_release(ad);
    return page;
}

static bool __is_end(AppData *ad, const void *buffer)
{
    if (!buffer)
        VELORA_LOGE("Invalid argument: buffer is NULL");
    else if (!ad)
        VELORA_LOGE("ad is NULL");
    else
        return s_signout.is_under_way && g_strcmp0(static_cast<const char *>(buffer), s_end) == 0;
    return false;
}

static void __add_account_sigout_pipe_cb(void *data, void *buffer, unsigned int)
{
    auto *ad = static_cast<AppData *>(data);
    if (!__is_end(ad, buffer))
        return;
    void *page = __finish(ad);
    __record_remove();
    __leave(ad, page);
}

static void *s_told; // the page that goes with the last word

static void __remove_account_popup_ok_cb(void *data, Evas_Object *, void *)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    if (_velora_popup_take_away(ad, s_owner))
        __leave(ad, s_told);
}

static void __say_signed_out(AppData *ad)
{
    Evas_Object *popup = _velora_common_create_warning_popup(
        ad->win_main,
        "IDS_CLOUD_BODY_YOU_HAVE_BEEN_SIGNED_OUT_OF_YOUR_VELORA_ACCOUNT_SIGN_IN_AGAIN_TO_USE_VELORA_SERVICES",
        __remove_account_popup_ok_cb, ad);
    elm_object_domain_translatable_part_text_set(popup, "title,text", VELORA_DOMAIN,
                                                 "IDS_CLOUD_BUTTON_REMOVE_ACCOUNT_ABB");
    evas_object_size_hint_weight_set(popup, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    _velora_popup_show(ad, s_owner, popup);
}

static void __add_account_with_popup_sigout_pipe_cb(void *data, void *buffer, unsigned int)
{
    auto *ad = static_cast<AppData *>(data);
    if (!__is_end(ad, buffer))
        return;
    s_told = __finish(ad);
    const int result = __record_remove();
    if (__is_account_left()) // it could not be taken off the device
        notification_status_message_post(dcgettext(VELORA_DOMAIN, "IDS_VELORA_BODY_ACCOUNT_NOT_REMOVED", LC_MESSAGES));
    else if (result == 0)
        __say_signed_out(ad);
}

static Eina_Bool __patience_cb(void *data)
{
    VELORA_LOGE("the service does not answer");
    s_signout.patience = nullptr;
    __send_end(static_cast<AppData *>(data));
    return ECORE_CALLBACK_CANCEL;
}

static void __wait_ignored_cb(void *, Evas_Object *, void *) {}

static void __wait_show(AppData *ad)
{
    Evas_Object *popup = _velora_common_progressbar_layout_create(ad->win_main, "IDS_ST_POP_REMOVING_ING");
    if (!popup)
        return;
    elm_object_tree_focus_allow_set(ad->naviframe, EINA_FALSE);
    elm_object_domain_translatable_part_text_set(popup, "title,text", VELORA_DOMAIN,
                                                 "IDS_CLOUD_BUTTON_REMOVE_ACCOUNT_ABB");
    _velora_common_register_event_for_popup(popup, __wait_ignored_cb, nullptr);
    evas_object_event_callback_add(popup, EVAS_CALLBACK_DEL, __popup_deleted_cb, ad);
    _velora_popup_show(ad, s_owner, popup);
    ad->signout_popup = popup;
}

static int __signout(AppData *ad, void *page, SignoutScope scope, Ecore_Pipe_Cb receiver, bool has_wait)
{
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return -1;
    }
    if (s_signout.is_under_way)
        return 0;
    s_signout = {.is_under_way = true, .page = page, .scope = scope, .client = ad->client};
    ad->signout_pipe = _velora_common_pipe_add(receiver, ad);
    s_signout.patience = ecore_timer_add(s_longest_wait, __patience_cb, ad);
    _velora_common_create_thread(&s_signout.thread, __thread_sigout, ad);
    s_signout.is_joinable = s_signout.thread != 0;
    if (!s_signout.is_joinable) // the call itself does not block
        __thread_sigout(ad);
    if (has_wait)
        __wait_show(ad);
    return 0;
}

int _velora_common_signout(AppData *ad, void *page, SignoutScope scope)
{
    return __signout(ad, page, scope, __add_account_sigout_pipe_cb, true);
}

int _velora_common_signout_without_remove_popup(AppData *ad, void *page, SignoutScope scope)
{
    return __signout(ad, page, scope, __add_account_sigout_pipe_cb, false);
}

int _velora_common_add_account_with_popup_signout(AppData *ad, void *page)
{
    return __signout(ad, page, SIGNOUT_ACCOUNT, __add_account_with_popup_sigout_pipe_cb, true);
}
