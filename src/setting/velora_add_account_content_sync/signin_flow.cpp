// From a request token to an account of the device. The client's thread copies what it is told and sends a message;
// all else happens in the pipe's handler.
#include "vconf/vconf.h"
#include "velora_add_account_content_sync/signin_record.h"
#include "velora_add_account_content_sync/velora_signin.h"
#include "velora_add_account_content_sync_setup_wizard/velora_signin_setupwizard.h"
#include "velora_common/velora_account.h"
#include "velora_common/velora_client.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_network.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_pipe.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_requests.h"
#include "velora_common/velora_signout.h"
#include "velora_common/velora_upload_item.h"
#include "velora_details_content_sync/velora_details.h"
#include "webview/ewk.h"
#include <cstdlib>
#include <cstring>
#include <libintl.h>

// Who sent a person to the registration page.
static const char s_signup_data[] = "velora-device";
static constexpr int s_refresh_seconds = 3600;

namespace signin {
SigninViewData *s_vd = nullptr;
}
using signin::s_vd;

static void __send(const char *message)
{
    if (!s_vd)
        VELORA_LOGE("view is destroyed");
    else
        _velora_common_pipe_send_msg(s_vd->pipe, message);
}

// The client's thread. The page cancels what runs before it goes, so the record is there while these run.

static void __velora_token_info_cb(int status, const char *request_token, const char *, int error, void *)
{
    if (!s_vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    if (error != 0 || status != CLOUD_CONTENT_SYNC_STATE_DONE) {
        VELORA_LOGE("no request token: %d", error);
        s_vd->error = error;
        __send("get_access_token_fail");
        return;
    }
    std::free(s_vd->request_token);
    s_vd->request_token = strdup(request_token);
    __send("get_access_token_success");
}

static void __velora_email_cb(int, const char *email, int error, void *)
{
    if (!s_vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    if (!email || error != 0) {
        VELORA_LOGE("no e-mail: %d", error);
        __send("get_email_fail");
        return;
    }
    AppData *ad = s_vd->ad;
    std::free(ad->email);
    ad->email = strdup(email);
    __send("get_email_success");
}

static void __velora_activate_cb(int, int error, void *)
{
    __send(error == 0 ? "activate_success" : "activate_fail");
}

SignoutScope __signin_scope(const SigninViewData *vd)
{
    return vd->is_activated ? SIGNOUT_ACCOUNT : SIGNOUT_SIGN_IN;
}

// Failures

void __signin_fail(SigninViewData *vd, const char *text_id, const char *title_id)
{
    vd->is_over = true;
    if (vd->client)
        cloud_content_sync_auth_cancel(vd->client.get());
    if (vd->web_view)
        ewk_view_stop(vd->web_view);
    _velora_popup_take_away(vd->ad, {vd, ""}); // before the next one takes the focus from it, to give it back later
    Evas_Object *popup = _velora_common_create_warning_popup(vd->ad->win_main, text_id, __popup_cancel_cb, vd);
    if (title_id)
        elm_object_domain_translatable_part_text_set(popup, "title,text", VELORA_DOMAIN, title_id);
    _velora_popup_show(vd->ad, {vd, s_error_topic}, popup);
}

void __signin_fail_certificate(SigninViewData *vd)
{
    __signin_fail(vd, "IDS_VELORA_BODY_CERTIFICATE", "IDS_VELORA_HEADER_NOT_SAFE");
}

void __popup_cancel_cb(void *, Evas_Object *, void *)
{
    SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("s_vd is NULL");
        return;
    }
    AppData *ad = vd->ad;
    if (!_velora_popup_take_away(ad, {vd, ""}))
        return;
    vd->is_over = true;
    elm_object_tree_focus_allow_set(ad->naviframe, EINA_TRUE);
    _velora_common_signout_without_remove_popup(ad, vd, __signin_scope(vd));
}

static void __create_back_popup_cancel_cb(void *, Evas_Object *, void *)
{
    SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("s_vd is NULL");
        return;
    }
    AppData *ad = vd->ad;
    if (!_velora_popup_is_shown(ad, {vd, ""}))
        return;
    vd->is_over = true;
    if (vd->back) {
        _velora_common_signout_without_remove_popup(ad, vd, __signin_scope(vd));
        return;
    }
    _velora_popup_take_away(ad, {vd, ""});
    elm_object_tree_focus_allow_set(ad->naviframe, EINA_TRUE);
    if (!_velora_pages_have_others(vd))
        evas_object_hide(ad->win_main);
    _velora_common_signout(ad, vd, __signin_scope(vd));
}

// The page's address

static std::string __taken(char *text)
{
    std::string copy = text ? text : "";
    g_free(text);
    return copy;
}

// language_REGION, without a character set.
static std::string __locale()
{
    const std::string language = __taken(vconf_get_str("db/menu_widget/language"));
    return language.empty() ? "en_US" : language.substr(0, language.find('.'));
}

static std::string __authorization_address(const SigninViewData *vd)
{
    const std::string locale = __locale();
    const std::string page = vd->web + "/1/oauth/authorize?oauth_token=" + vd->request_token + "&oauth_callback=";
    if (vd->is_signin)
        return page + vd->callback + "&locale=" + locale;
    const std::string callback = __taken(g_uri_escape_string(vd->callback.c_str(), nullptr, TRUE));
    const std::string cont = __taken(g_uri_escape_string((page + callback + "&cl=" + locale).c_str(), "/", TRUE));
    return vd->web + "/m/register?cl=" + locale + "&signup_data=" + s_signup_data + "&cont=" + cont;
}

void __signin_page_load(SigninViewData *vd)
{
    if (!vd->web_view || !vd->has_token || vd->is_over)
        return;
    Ewk_Context *context = ewk_view_context_get(vd->web_view);
    Ewk_Cookie_Manager *cookies = ewk_context_cookie_manager_get(context);
    if (!cookies) { // somebody else's sign-in could still be there
        VELORA_LOGE("the cookies cannot be cleared");
        __signin_fail(vd);
        return;
    }
    ewk_cookie_manager_cookies_clear(cookies);
    const std::string url = __authorization_address(vd);
    VELORA_LOGI("url: %s", url.substr(0, url.find('?')).c_str()); // what follows it is a secret
    ewk_view_url_set(vd->web_view, url.c_str());
}

void __velora_signin_webview_cb(void *, Evas_Object *, void *event_info)
{
    auto *decision = static_cast<Ewk_Policy_Decision *>(event_info);
    if (!decision) {
        VELORA_LOGE("Invalid argument: event_info is NULL");
        return;
    }
    SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    const char *url = ewk_policy_decision_url_get(decision);
    if (vd->timeout_timer)
        ecore_timer_del(vd->timeout_timer);
    vd->timeout_timer = nullptr;
    const bool is_callback = g_str_has_prefix(url, vd->callback.c_str());
    const bool is_home = url == vd->web + "/m";
    if (!is_callback && !is_home && !vd->is_over && !vd->is_approved)
        return;
    ewk_policy_decision_ignore(decision);
    if (vd->is_over || vd->is_approved) // it is decided
        return;
    if (url == vd->callback + "?not_approved=true") {
        vd->is_over = true;
        _velora_common_pipe_send_msg(vd->pipe, "cancel");
        return;
    }
    if (is_home) {
        __signin_fail(vd);
        return;
    }
    vd->is_approved = true;
    if (!vd->ad->popup) // of the last page's load
        __signin_wait_show(vd, "IDS_CLOUD_BODY_PROCESSING_ING", __popup_cancel_cb);
    if (const int error = cloud_content_sync_auth_get_email(vd->client.get(), __velora_email_cb, vd); error != 0) {
        VELORA_LOGE("cloud_content_sync_auth_get_email failed: %d", error);
        __signin_fail(vd);
    }
}

// Messages

static void __refresh_type_set(CloudSyncHandle handle)
{
    if (cloud_content_sync_setting_set_refresh_type(handle, CLOUD_CONTENT_SYNC_REFRESH_TYPE_PERIODIC,
                                                    s_refresh_seconds) != 0)
        VELORA_LOGE("cloud_content_sync_setting_set_refresh_type failed");
}

static void __nothing_more(AppData *ad)
{
    if (_velora_pages_are_empty())
        _velora_app_exit(ad);
}

static void (*__next_page(int launch_mode))(AppData *ad)
{
    switch (launch_mode) {
    case LAUNCH_MODE_SIGNIN:
    case LAUNCH_MODE_ACCOUNT_ADD:
    case LAUNCH_MODE_SHARE:
        return _velora_details_create;
    case LAUNCH_MODE_SETUP_WIZARD:
        return _velora_signin_setupwizard_create;
    default:
        return __nothing_more;
    }
}

// The account is there: the page goes, with what it was for handed on.
static void __signed_in(SigninViewData *vd)
{
    AppData *ad = vd->ad;
    vd->is_activated = true;
    if (_velora_common_account_insert(vd->client.get(), ad->email) != 0) {
        __signin_fail(vd);
        return;
    }
    const int launch_mode = vd->files ? static_cast<int>(LAUNCH_MODE_SHARE) : vd->launch_mode;
    ad->upload_list = g_list_concat(ad->upload_list, g_steal_pointer(&vd->files));
    const ClientHold client = vd->client;
    Elm_Object_Item *item = vd->nf_item;
    auto *const done = vd->done;
    elm_object_tree_focus_allow_set(ad->naviframe, EINA_TRUE);
    _velora_popup_take_away(ad, {vd, ""});
    __signin_view_destroy(vd);
    __refresh_type_set(client.get());
    __signin_item_delete(ad, item);
    if (done)
        done(ad);
    if (done && !ad->upload_list) { // nothing came on top of what the page was opened for
        _velora_pages_remove(vd);
        return;
    }
    ad->launch_mode = launch_mode;
    if (launch_mode == LAUNCH_MODE_SETUP_WIZARD)
        _velora_common_meta_refresh(ad);
    _velora_pages_go_on(ad, vd, __next_page(launch_mode));
}

static void __activate(SigninViewData *vd)
{
    if (const int error = cloud_content_sync_activate(vd->client.get(), __velora_activate_cb, vd); error != 0) {
        VELORA_LOGE("cloud_content_sync_activate failed: %d", error);
        __signin_fail(vd);
    }
}

static void __signin_view_pipe_cb(void *, void *buffer, unsigned int)
{
    SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    if (!buffer) {
        VELORA_LOGE("Invalid argument: buffer is NULL");
        return;
    }
    const auto *message = static_cast<const char *>(buffer);
    const auto is = [message](const char *text) { return std::strcmp(message, text) == 0; };
    if (is("cancel")) {
        _velora_popup_take_away(vd->ad, {vd, ""});
        _velora_common_signout(vd->ad, vd, __signin_scope(vd));
    } else if (vd->is_over) {
        VELORA_LOGI("%s of a sign-in that is given up", message);
    } else if (is("activate_success")) {
        __signed_in(vd);
    } else if (is("activate_fail")) {
        VELORA_LOGE("cloud_content_sync_activate failed");
        __signin_fail(vd);
    } else if (is("get_email_success")) {
        __activate(vd);
    } else if (is("get_email_fail")) {
        __signin_fail(vd);
    } else if (is("get_access_token_fail")) {
        if (vd->error == CLOUD_CONTENT_SYNC_ERROR_CERTIFICATE)
            __signin_fail_certificate(vd);
        else
            __signin_fail(vd);
    } else if (is("get_access_token_success")) {
        vd->has_token = true;
        __signin_page_load(vd);
    } else {
        VELORA_LOGE("pipe message error");
    }
}

// The beginning

static bool __service_find(SigninViewData *vd)
{
    char *web = nullptr, *callback = nullptr, *ca_file = nullptr;
    if (const int error = cloud_content_sync_service_get_pages(VELORA_SERVICE, &web, &callback, &ca_file); error != 0) {
        VELORA_LOGE("cloud_content_sync_service_get_pages failed: %d", error);
        return false;
    }
    vd->web = __taken(web);
    vd->callback = __taken(callback);
    vd->ca_file = __taken(ca_file);
    return true;
}

void __signin_begin(SigninViewData *vd)
{
    vd->has_token = false;
    __signin_wait_show(vd, "IDS_CLOUD_OPT_LOADING_ING_ABB", __create_back_popup_cancel_cb);
    if (const int error = cloud_content_sync_auth_get_request_token_info(vd->client.get(), __velora_token_info_cb, vd);
        error != 0) {
        VELORA_LOGE("cloud_content_sync_auth_get_request_token_info failed: %d", error);
        __signin_fail(vd);
    }
}

// A page that is being given up makes room; one that is at work takes the request in. True when that is all.
static bool __join(AppData *ad)
{
    SigninViewData *vd = s_vd;
    if (!vd)
        return false;
    if (vd->is_over) {
        _velora_page_replace(ad, vd);
        return false;
    }
    vd->files = g_list_concat(vd->files, g_steal_pointer(&ad->upload_list));
    vd->launch_mode = ad->launch_mode;
    _velora_pages_join(ad, vd);
    elm_naviframe_item_promote(vd->nf_item);
    return true;
}

static void __create(AppData *ad, bool is_signin, void (*done)(AppData *ad), void (*back)(AppData *ad))
{
    // What the client was asked for is done; its end is not waited for, and says nothing into this page.
    _velora_common_signout_end(ad);
    auto *vd = s_vd = new SigninViewData;
    vd->is_signin = is_signin;
    vd->ad = ad;
    vd->launch_mode = ad->launch_mode;
    vd->done = done;
    vd->back = back;
    if (!done)
        vd->files = g_steal_pointer(&ad->upload_list);
    (done ? _velora_pages_add_over
          : _velora_pages_add)(ad, vd, {__signin_page_end, __signin_page_abandon, [](void *page) {
                                            return static_cast<SigninViewData *>(page)->files != nullptr;
                                        }});
    __signin_page_create(vd);
    vd->client = _velora_common_client_get(ad);
    vd->pipe = _velora_common_pipe_add(__signin_view_pipe_cb, vd);
    if (!vd->client || !__service_find(vd))
        __signin_fail(vd);
    else
        __signin_begin(vd);
}

void _velora_signin_create(AppData *ad, int is_signin)
{
    VELORA_LOGI("_velora_signin_create is called!");
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    ad->is_welcome_shown = false;
    if (!_velora_common_check_network(ad)) {
        VELORA_LOGE("network error");
        if (!ad->popup) // nothing says why: an empty window would not either
            _velora_request_finish(ad, _velora_request_last());
        return;
    }
    if (!__join(ad))
        __create(ad, is_signin != 0, nullptr, nullptr);
}

void _velora_signin_create_over(AppData *ad, int is_signin, void (*done)(AppData *ad), void (*back)(AppData *ad))
{
    if (s_vd && s_vd->is_over)
        _velora_page_replace(ad, s_vd);
    if (s_vd)
        elm_naviframe_item_promote(s_vd->nf_item);
    else if (_velora_common_check_network_without_popup(ad))
        __create(ad, is_signin != 0, done, back);
    else
        _velora_popup_show(ad, {"sign-in", "network"},
                           _velora_common_create_one_text_popup_with_timer(ad->win_main, ad));
}
