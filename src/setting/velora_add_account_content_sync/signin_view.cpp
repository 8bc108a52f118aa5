// The page: a web view in a button that carries the focus, what the view tells, and the ways back.
#include "velora_add_account_content_sync/signin_record.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_pipe.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_signout.h"
#include "velora_common/velora_upload_item.h"
#include "webview/ewk.h"
#include <clocale>
#include <cstdlib>
#include <iterator>
#include <libintl.h>

using signin::s_vd;

static const char s_browser[] = "com.orvant.browser";
static constexpr double s_page_load_seconds = 180;
// The wait is on screen by then, and the engine's files have been read.
static constexpr double s_build_delay = 0.1;

void __signin_wait_show(SigninViewData *vd, const char *text_id, Evas_Smart_Cb back_cb)
{
    _velora_popup_take_away(vd->ad, {vd, ""});
    Evas_Object *popup = _velora_common_progressbar_layout_create(vd->ad->win_main, text_id);
    _velora_common_register_event_for_popup(popup, back_cb, vd);
    _velora_popup_show(vd->ad, {vd, s_wait_topic}, popup);
    elm_object_tree_focus_allow_set(vd->ad->naviframe, EINA_FALSE);
}

// Focus

static void _btn_focused(void *data, Evas_Object *, void *)
{
    auto *web_view = static_cast<Evas_Object *>(data);
    if (!web_view)
        VELORA_LOGE("eo is NULL");
    else if (!elm_object_focus_get(web_view))
        elm_object_focus_set(web_view, EINA_TRUE);
}

// Not by Elementary: it would give the focus back to the button, and so on without end.
static void _btn_unfocused(void *data, Evas_Object *, void *)
{
    auto *web_view = static_cast<Evas_Object *>(data);
    if (!web_view)
        VELORA_LOGE("eo is NULL");
    else if (!elm_object_focus_get(web_view))
        evas_object_focus_set(web_view, EINA_FALSE);
}

// Loading

// Tests do not wait for three minutes.
static double __page_load_seconds()
{
    const char *seconds = g_getenv("VELORA_PAGE_LOAD_SECONDS");
    return seconds ? g_ascii_strtod(seconds, nullptr) : s_page_load_seconds;
}

static Eina_Bool __popup_timeout_cb(void *)
{
    SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return ECORE_CALLBACK_CANCEL;
    }
    vd->timeout_timer = nullptr;
    if (!vd->is_over)
        __signin_fail(vd);
    return ECORE_CALLBACK_CANCEL;
}

static void __load_started_cb(void *, Evas_Object *, void *)
{
    SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    if (vd->is_over || vd->ad->popup)
        return;
    __signin_wait_show(vd, "IDS_CLOUD_BODY_PROCESSING_ING", __popup_cancel_cb);
    vd->timeout_timer = ecore_timer_add(__page_load_seconds(), __popup_timeout_cb, nullptr);
}

static void __load_finished_cb(void *, Evas_Object *, void *)
{
    SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    if (vd->timeout_timer)
        ecore_timer_del(vd->timeout_timer);
    vd->timeout_timer = nullptr;
    if (vd->is_over || vd->is_approved) // what is on screen says more
        return;
    elm_object_tree_focus_allow_set(vd->ad->naviframe, EINA_TRUE);
    _velora_popup_take_away(vd->ad, {vd, s_wait_topic});
    elm_object_focus_set(vd->web_view, EINA_TRUE);
}

static void __again_cb(void *, Evas_Object *, void *)
{
    SigninViewData *vd = s_vd;
    if (vd && _velora_popup_take_away(vd->ad, {vd, s_error_topic}))
        __signin_begin(vd);
}

static char *__text_of_page(const char *id)
{
    return dcgettext(VELORA_DOMAIN, id, LC_MESSAGES);
}

// The network may be back in a moment: what was to be done is not given up for that.
static void __load_error_cb(void *, Evas_Object *, void *event_info)
{
    SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    const auto *error = static_cast<const Ewk_Error *>(event_info);
    VELORA_LOGE("the page cannot be loaded[%d]: %s", error->type, error->description);
    if (vd->is_over || vd->is_approved)
        return;
    if (error->type == EWK_ERROR_CERTIFICATE) {
        __signin_fail_certificate(vd);
        return;
    }
    if (error->type != EWK_ERROR_NETWORK)
        return;
    _velora_popup_take_away(vd->ad, {vd, ""}); // before the next one takes the focus from it
    _velora_popup_show(vd->ad, {vd, s_error_topic},
                       _velora_common_with_title_btn_popup(
                           vd->ad->win_main, __text_of_page("IDS_VELORA_STATE_ERROR_TITLE"),
                           __text_of_page("IDS_VELORA_STATE_ERROR_TEXT"), __popup_cancel_cb, __again_cb,
                           __text_of_page("IDS_CLOUD_SK2_CANCEL"), __text_of_page("IDS_VELORA_BUTTON_RETRY"), vd));
}

static void __webprocess_crashed_cb(void *, Evas_Object *, void *)
{
    SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    if (!vd->is_over && !vd->is_approved)
        __signin_fail(vd);
}

// What else a page asks for

// Whatever it is, it is the terms: nothing else of the service opens a window.
static void __signin_create_window_cb(void *, Evas_Object *, void *)
{
    const SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    app_control_h request = nullptr;
    if (app_control_create(&request) != APP_CONTROL_ERROR_NONE)
        return;
    if (app_control_set_uri(request, (vd->web + "/terms").c_str()) == APP_CONTROL_ERROR_NONE &&
        app_control_set_app_id(request, s_browser) == APP_CONTROL_ERROR_NONE)
        app_control_send_launch_request(request, nullptr, nullptr);
    app_control_destroy(request);
}

static void __signin_contextmenu_customize_cb(void *, Evas_Object *, void *event_info)
{
    if (!s_vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    auto *menu = static_cast<Ewk_Context_Menu *>(event_info);
    for (unsigned int i = ewk_context_menu_item_count(menu); i-- > 0;) {
        Ewk_Context_Menu_Item *item = ewk_context_menu_nth_item_get(menu, i);
        switch (ewk_context_menu_item_tag_get(item)) {
        case EWK_CONTEXT_MENU_ITEM_TAG_OPEN_LINK_IN_NEW_WINDOW:
        case EWK_CONTEXT_MENU_ITEM_TAG_DOWNLOAD_LINK_TO_DISK:
        case EWK_CONTEXT_MENU_ITEM_TAG_COPY_LINK_TO_CLIPBOARD:
        case EWK_CONTEXT_MENU_ITEM_TAG_SEARCH_WEB:
            ewk_context_menu_item_remove(menu, item);
            break;
        default:
            break;
        }
    }
}

static void __title_enable(void *data, bool is_enabled)
{
    const auto *vd = static_cast<SigninViewData *>(data);
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    Elm_Object_Item *top = elm_naviframe_top_item_get(vd->ad->naviframe);
    if (top && vd->ad->is_landscape)
        elm_naviframe_item_title_enabled_set(top, is_enabled, is_enabled);
}

static void __hide_title_toolbar(void *data, Evas_Object *, void *)
{
    __title_enable(data, false);
}

static void __show_title_toolbar(void *data, Evas_Object *, void *)
{
    __title_enable(data, true);
}

struct Handler {
    const char *event;
    Evas_Smart_Cb handler;
};
static const Handler s_view_handlers[] = {
    {"load,started", __load_started_cb},
    {"load,finished", __load_finished_cb},
    {"policy,navigation,decide", __velora_signin_webview_cb},
    {"create,window", __signin_create_window_cb},
    {"contextmenu,customize", __signin_contextmenu_customize_cb},
    {"load,error", __load_error_cb},
    {"webprocess,crashed", __webprocess_crashed_cb},
};
static const Handler s_conformant_handlers[] = {
    {"virtualkeypad,state,on", __hide_title_toolbar},
    {"virtualkeypad,state,off", __show_title_toolbar},
    {"clipboard,state,on", __hide_title_toolbar},
    {"clipboard,state,off", __show_title_toolbar},
};

// The page's life

void __signin_view_destroy(SigninViewData *vd)
{
    for (Evas_Object *one : {vd->web_view, vd->focus_btn}) // what goes with the focus is asked for it afterwards
        if (one)
            elm_object_focus_set(one, EINA_FALSE);
    if (vd->web_view) {
        elm_access_object_unregister(vd->web_view);
        ewk_view_stop(vd->web_view);
        evas_object_smart_callback_del_full(vd->focus_btn, "focused", _btn_focused, vd->web_view);
        evas_object_smart_callback_del_full(vd->focus_btn, "unfocused", _btn_unfocused, vd->web_view);
        for (const Handler &one : s_view_handlers)
            evas_object_smart_callback_del_full(vd->web_view, one.event, one.handler, vd);
    }
    if (vd->ad->conformant)
        for (const Handler &one : s_conformant_handlers)
            evas_object_smart_callback_del_full(vd->ad->conformant, one.event, one.handler, vd);
    for (Ecore_Timer *timer : {vd->timeout_timer, vd->build_timer})
        if (timer)
            ecore_timer_del(timer);
    if (vd->pipe)
        _velora_common_pipe_del(vd->pipe);
    std::free(vd->request_token);
    _velora_upload_list_free(&vd->files);
    s_vd = nullptr;
    delete vd;
}

// Client thread. Nobody waits for it.
static void __abandoned_cb(int, int, void *) {}

// Nobody knows the page any more but its widgets.
static void __leave(SigninViewData *vd)
{
    AppData *ad = vd->ad;
    _velora_pages_remove(vd);
    if (_velora_common_signout_is_under_way())
        _velora_common_signout_end(ad);
    else if (vd->client && vd->is_activated) // without a record: the next request settles it
        VELORA_LOGI("an account is left without its record");
    else if (vd->client) // which ends what runs: its callbacks need what goes now
        cloud_content_sync_auth_abandon(vd->client.get(), __abandoned_cb, nullptr);
    _velora_popup_take_away(ad, {vd, ""});
    elm_object_tree_focus_allow_set(ad->naviframe, EINA_TRUE);
    __signin_view_destroy(vd);
}

void __signin_item_delete(AppData *ad, Elm_Object_Item *item)
{
    elm_object_tree_focus_allow_set(ad->naviframe, EINA_FALSE);
    elm_object_item_del(item);
    elm_object_tree_focus_allow_set(ad->naviframe, EINA_TRUE);
}

void __signin_page_end(void *page)
{
    auto *vd = static_cast<SigninViewData *>(page);
    Elm_Object_Item *item = vd->nf_item;
    elm_naviframe_item_pop_cb_set(item, nullptr, nullptr);
    AppData *ad = vd->ad;
    auto *const back = vd->back;
    __leave(vd);
    __signin_item_delete(ad, item);
    if (back)
        back(ad);
}

void __signin_page_abandon(void *page)
{
    auto *vd = static_cast<SigninViewData *>(page);
    if (vd->client)
        cloud_content_sync_auth_cancel(vd->client.get());
    vd->client = nullptr;
    vd->is_over = true;
}

static Eina_Bool __velora_signin_back_cb(void *, Elm_Object_Item *)
{
    VELORA_LOGI("__velora_signin_back_cb is called!");
    SigninViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return EINA_FALSE;
    }
    vd->is_over = true;
    _velora_page_leave(vd->ad, vd);
    return EINA_FALSE;
}

static Eina_Bool __web_view_create(void *data)
{
    auto *vd = static_cast<SigninViewData *>(data);
    vd->build_timer = nullptr;
    if (vd->is_over)
        return ECORE_CALLBACK_CANCEL;
    vd->web_view = ewk_view_add(vd->focus_btn);
    if (!vd->web_view) {
        VELORA_LOGE("ewk_view_add failed");
        __signin_fail(vd);
        return ECORE_CALLBACK_CANCEL;
    }
    ewk_view_base_set(vd->web_view, vd->web.c_str(), vd->ca_file.c_str());
    ewk_view_text_zoom_set(vd->web_view, ea_theme_text_percent() / 100.0);
    ewk_view_dark_set(vd->web_view, ea_theme_is_dark());
    evas_object_smart_callback_add(vd->focus_btn, "focused", _btn_focused, vd->web_view);
    evas_object_smart_callback_add(vd->focus_btn, "unfocused", _btn_unfocused, vd->web_view);
    elm_object_part_content_set(vd->focus_btn, "elm.swallow.content", vd->web_view);
    evas_object_propagate_events_set(vd->web_view, EINA_FALSE);
    for (const Handler &one : s_view_handlers)
        evas_object_smart_callback_add(vd->web_view, one.event, one.handler, vd);
    elm_access_object_unregister(vd->focus_btn);
    Evas_Object *spoken = elm_access_object_register(vd->web_view, vd->ad->win_main);
    elm_object_focus_allow_set(spoken, elm_config_access_get()); // for the keys the view itself is the place
    ea_screen_reader_name_set(vd->web_view, VELORA_SERVICE);
    __signin_page_load(vd);
    return ECORE_CALLBACK_CANCEL;
}

void __signin_page_create(SigninViewData *vd)
{
    AppData *ad = vd->ad;
    ewk_prepare();
    Evas_Object *button = elm_button_add(ad->naviframe);
    elm_object_style_set(button, "naviframe/end_btn/default");
    // Drawn as a sign; the words are for the screen reader.
    elm_object_domain_translatable_text_set(button, VELORA_SHARE_DOMAIN, "IDS_VELORA_BODY_BACK");
    evas_object_smart_callback_add(
        button, "clicked",
        [](void *naviframe, Evas_Object *, void *) { elm_naviframe_item_pop(static_cast<Evas_Object *>(naviframe)); },
        ad->naviframe);
    vd->focus_btn = elm_button_add(ad->naviframe);
    elm_object_style_set(vd->focus_btn, "focus");
    ea_screen_reader_name_set(vd->focus_btn, VELORA_SERVICE);
    vd->nf_item = elm_naviframe_item_push(ad->naviframe, VELORA_SERVICE, button, nullptr, vd->focus_btn, nullptr);
    elm_object_item_domain_part_text_translatable_set(vd->nf_item, "default", VELORA_DOMAIN, EINA_TRUE);
    elm_naviframe_item_pop_cb_set(vd->nf_item, __velora_signin_back_cb, vd);
    for (const Handler &one : s_conformant_handlers)
        evas_object_smart_callback_add(ad->conformant, one.event, one.handler, vd);
    vd->build_timer = ecore_timer_add(s_build_delay, __web_view_create, vd);
}
