// The page: what it is made of, how it follows what others change meanwhile, and how it is left.
#include "velora_details_content_sync/velora_details.h"
#include "velora_common/velora_account.h"
#include "velora_common/velora_bottom_buttons.h"
#include "velora_common/velora_client.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_pipe.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_requests.h"
#include "velora_common/velora_signout.h"
#include "velora_common/velora_upload_item.h"
#include "velora_details_content_sync/details_record.h"
#include "velora_upload_file/velora_upload_view.h"
#include <cstdlib>

namespace details {
DetailsViewData *s_vd = nullptr;
}
using details::s_vd;

static const char s_topic_signed_out[] = "signed out";

// Whether the page is the last step of a sign-in, which can still be undone.
static bool __follows_signin(int launch_mode)
{
    return launch_mode == LAUNCH_MODE_ACCOUNT_ADD || launch_mode == LAUNCH_MODE_SHARE ||
           launch_mode == LAUNCH_MODE_SIGNIN;
}

static bool __has_menu(int launch_mode)
{
    return launch_mode == LAUNCH_MODE_DETAILS || launch_mode == LAUNCH_MODE_ACCOUNT_CONFIGURE;
}

// The account may have become another one, or be gone, and so may be what was set.

static void __signed_out_ok_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    if (_velora_popup_take_away(vd->ad, {vd, s_topic_signed_out}))
        _velora_page_leave(vd->ad, vd);
}

static void __say_signed_out(DetailsViewData *vd)
{
    AppData *ad = vd->ad;
    if (_velora_common_signout_is_under_way() || (ad->popup && !_velora_popup_is_shown(ad, {vd, ""})) ||
        _velora_popup_is_shown(ad, {vd, s_topic_signed_out}))
        return;
    _velora_popup_take_away(ad, {vd, ""});
    _velora_popup_show(
        ad, {vd, s_topic_signed_out},
        _velora_common_create_warning_popup(
            ad->win_main,
            "IDS_CLOUD_BODY_YOU_HAVE_BEEN_SIGNED_OUT_OF_YOUR_VELORA_ACCOUNT_SIGN_IN_AGAIN_TO_USE_VELORA_SERVICES",
            __signed_out_ok_cb, vd));
}

static void __account_read(DetailsViewData *vd)
{
    char *email = nullptr;
    const int error = cloud_content_sync_account_get_email(VELORA_SERVICE, &email);
    if (error != 0 && error != CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT)
        email = strdup("");                   // somebody's, for all we know
    if (g_strcmp0(email, vd->account) != 0) { // what is known is another one's
        __storage_forget(vd);
        __update_server_storage_info(vd);
    }
    std::free(vd->account);
    vd->account = email;
}

void __details_refresh(DetailsViewData *vd)
{
    __account_read(vd);
    __details_rows_read(vd);
    if (vd->account) {
        __storage_ask(vd);
        if (_velora_popup_is_shown(vd->ad, {vd, s_topic_signed_out}))
            _velora_popup_take_away(vd->ad, {vd, s_topic_signed_out});
    } else {
        __say_signed_out(vd);
    }
}

static bool __is_in_front(const DetailsViewData *vd)
{
    return elm_naviframe_top_item_get(vd->ad->naviframe) == vd->nf_item;
}

static void __page_shown_cb(void *data, Evas *, Evas_Object *, void *)
{
    __details_refresh(static_cast<DetailsViewData *>(data));
}

static void __transition_finished_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    if (__is_in_front(vd))
        __details_refresh(vd);
}

static void __window_focused_cb(void *data, Evas *, void *)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    if (__is_in_front(vd))
        __details_refresh(vd);
}

static void __language_changed_cb(void *data, Evas_Object *genlist, void *)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    __details_rows_read(vd); // with what a screen reader says of them
    __update_server_storage_info(vd);
    elm_genlist_realized_items_update(genlist);
}

// The end of the page

static Evas_Object *__page_of(DetailsViewData *vd)
{
    return elm_object_parent_widget_get(vd->genlist);
}

static void __widgets_delete(DetailsViewData *vd)
{
    Evas_Object *nf = vd->ad->naviframe;
    evas_object_event_callback_del_full(__page_of(vd), EVAS_CALLBACK_SHOW, __page_shown_cb, vd);
    evas_event_callback_del_full(evas_object_evas_get(nf), EVAS_CALLBACK_CANVAS_FOCUS_IN, __window_focused_cb, vd);
    evas_object_smart_callback_del_full(nf, "transition,finished", __transition_finished_cb, vd);
    evas_object_smart_callback_del_full(nf, "elm,action,more_event", __more_cb, vd);
    elm_naviframe_item_pop_cb_set(vd->nf_item, nullptr, nullptr);
    // Nothing of the page may have the keys' focus, or be given it, while it goes.
    elm_object_tree_focus_allow_set(nf, EINA_FALSE);
    elm_object_item_del(vd->nf_item);
    elm_object_tree_focus_allow_set(nf, EINA_TRUE);
}

static void __destroy(DetailsViewData *vd)
{
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    _velora_popup_take_away(vd->ad, {vd, ""});
    if (vd->job)
        ecore_job_del(vd->job);
    __storage_forget(vd);
    if (vd->pipe)
        _velora_common_pipe_del(vd->pipe);
    __widgets_delete(vd);
    __details_item_classes_free(vd);
    _velora_upload_list_free(&vd->files);
    std::free(vd->account);
    s_vd = nullptr;
    delete vd;
}

static void __page_end(void *page)
{
    _velora_pages_remove(page);
    __destroy(static_cast<DetailsViewData *>(page));
}

static void __page_abandon(void *page)
{
    auto *vd = static_cast<DetailsViewData *>(page);
    __storage_forget(vd);
    vd->client = nullptr;
}

static void __go_on_to_upload(void *data)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    AppData *ad = vd->ad;
    vd->job = nullptr;
    ad->upload_list = g_list_concat(ad->upload_list, g_steal_pointer(&vd->files));
    ad->launch_mode = LAUNCH_MODE_SHARE;
    __destroy(vd);
    _velora_pages_go_on(ad, vd, _velora_upload_view_create); // by the page's address alone
}

static void __done_button_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    if (vd->job || _velora_common_signout_is_under_way())
        return;
    if (vd->launch_mode == LAUNCH_MODE_SHARE) {
        vd->job = ecore_job_add(__go_on_to_upload, vd);
        return;
    }
    _velora_common_meta_refresh(vd->ad);
    _velora_page_leave(vd->ad, vd);
}

static void __leave(DetailsViewData *vd)
{
    if (__follows_signin(vd->launch_mode))
        _velora_common_signout(vd->ad, vd);
    else
        _velora_page_leave(vd->ad, vd);
}

static void __cancel_button_cb(void *data, Evas_Object *, void *)
{
    __leave(static_cast<DetailsViewData *>(data));
}

static Eina_Bool __back_cb(void *, Elm_Object_Item *)
{
    VELORA_LOGI("__back_cb is called!");
    if (s_vd)
        __leave(s_vd);
    else
        VELORA_LOGE("view is destroyed");
    return EINA_FALSE;
}

// The page itself

// Drawn as a sign; the words are for the screen reader.
static Evas_Object *__sign_button_create(Evas_Object *nf, const char *style, Evas_Smart_Cb cb, void *data)
{
    Evas_Object *button = elm_button_add(nf);
    elm_object_style_set(button, style);
    evas_object_smart_callback_add(button, "clicked", cb, data);
    return button;
}

static void __back_button_cb(void *data, Evas_Object *, void *)
{
    elm_naviframe_item_pop(static_cast<Evas_Object *>(data));
}

// What is at the edges of the page, by its launch mode; what is there goes.
static void __edges_create(DetailsViewData *vd)
{
    Evas_Object *nf = vd->ad->naviframe;
    for (const char *part : {"prev_btn", "toolbar_more_btn", "toolbar"})
        if (Evas_Object *former = elm_object_item_part_content_unset(vd->nf_item, part))
            evas_object_del(former);
    vd->more_btn = nullptr;
    if (!__follows_signin(vd->launch_mode)) {
        Evas_Object *back = __sign_button_create(nf, "naviframe/end_btn/default", __back_button_cb, nf);
        elm_object_domain_translatable_text_set(back, VELORA_SHARE_DOMAIN, "IDS_VELORA_BODY_BACK");
        elm_object_item_part_content_set(vd->nf_item, "prev_btn", back);
    }
    if (__has_menu(vd->launch_mode)) {
        vd->more_btn = __sign_button_create(nf, "naviframe/more/default", __more_cb, vd);
        elm_object_domain_translatable_text_set(vd->more_btn, VELORA_SHARE_DOMAIN, "IDS_VELORA_BODY_MORE_OPTIONS");
        elm_object_item_part_content_set(vd->nf_item, "toolbar_more_btn", vd->more_btn);
        return;
    }
    elm_object_item_part_content_set(vd->nf_item, "toolbar",
                                     _velora_common_create_bottom_buttons(nf, vd, "IDS_CLOUD_SK2_CANCEL",
                                                                          __cancel_button_cb, "IDS_CLOUD_BODY_DONE",
                                                                          __done_button_cb));
}

static void __page_create(DetailsViewData *vd)
{
    Evas_Object *nf = vd->ad->naviframe;
    __details_item_classes_create(vd);
    vd->genlist = elm_genlist_add(nf);
    elm_genlist_mode_set(vd->genlist, ELM_LIST_COMPRESS);
    evas_object_smart_callback_add(vd->genlist, "language,changed", __language_changed_cb, vd);
    __details_rows_append(vd);
    vd->nf_item = elm_naviframe_item_push(nf, VELORA_SERVICE, nullptr, nullptr, vd->genlist, nullptr);
    elm_object_item_domain_part_text_translatable_set(vd->nf_item, "default", VELORA_DOMAIN, EINA_TRUE);
    elm_naviframe_item_pop_cb_set(vd->nf_item, __back_cb, vd);
    ea_screen_reader_name_set(__page_of(vd), VELORA_SERVICE);
    __edges_create(vd);
    evas_object_smart_callback_add(nf, "elm,action,more_event", __more_cb, vd);
    evas_object_smart_callback_add(nf, "transition,finished", __transition_finished_cb, vd);
    evas_object_event_callback_add(__page_of(vd), EVAS_CALLBACK_SHOW, __page_shown_cb, vd);
    evas_event_callback_add(evas_object_evas_get(nf), EVAS_CALLBACK_CANVAS_FOCUS_IN, __window_focused_cb, vd);
    elm_object_focus_set(nf, EINA_TRUE);
}

static void __email_read(AppData *ad)
{
    AccountInfo *info = nullptr;
    if (__has_menu(ad->launch_mode) && __velora_check_account_exist(VELORA_PACKAGE, &info) == 0) {
        std::free(ad->email);
        ad->email = strdup(info->user_name);
    }
    __velora_account_info_free(info);
}

// Without a client there is nothing to be shown but why.

static int s_refused; // the request that the popup stands for

static void __no_client_ok_cb(void *data, Evas_Object *, void *)
{
    auto *ad = static_cast<AppData *>(data);
    if (_velora_popup_take_away(ad, {&s_refused, "no client"}))
        _velora_request_finish(ad, s_refused);
}

static void __say_no_client(AppData *ad)
{
    s_refused = _velora_request_last();
    _velora_popup_show(ad, {&s_refused, "no client"},
                       _velora_common_create_warning_popup(
                           ad->win_main, "IDS_CLOUD_BODY_SERVER_ERROR_OCCURRED_TRY_LATER", __no_client_ok_cb, ad));
}

static void __join(DetailsViewData *vd)
{
    AppData *ad = vd->ad;
    vd->files = g_list_concat(vd->files, g_steal_pointer(&ad->upload_list));
    if (__follows_signin(ad->launch_mode) && vd->launch_mode != LAUNCH_MODE_SHARE) { // another sign-in
        vd->launch_mode = ad->launch_mode;
        __edges_create(vd);
    }
    _velora_pages_join(ad, vd);
    elm_naviframe_item_promote(vd->nf_item);
    __details_refresh(vd);
}

void _velora_details_create(AppData *ad)
{
    VELORA_LOGI("_velora_details_create is called!");
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    ad->is_welcome_shown = false;
    __email_read(ad);
    if (s_vd) {
        __join(s_vd);
        return;
    }
    const ClientHold client = _velora_common_client_get(ad);
    if (!client) {
        __say_no_client(ad);
        return;
    }
    auto *vd = s_vd = new DetailsViewData;
    vd->ad = ad;
    vd->launch_mode = ad->launch_mode;
    vd->client = client;
    vd->files = g_steal_pointer(&ad->upload_list);
    _velora_pages_add(ad, vd, {__page_end, __page_abandon, [](void *page) {
                                   return static_cast<DetailsViewData *>(page)->files != nullptr;
                               }});
    vd->pipe = _velora_common_pipe_add(__storage_pipe_cb, vd);
    __page_create(vd);
    __details_refresh(vd);
}
