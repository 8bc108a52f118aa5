#include "velora_setup_wizard/velora_setupwizard.h"
#include "velora_add_account_content_sync/velora_signin.h"
#include "velora_add_account_content_sync_setup_wizard/velora_signin_setupwizard.h"
#include "velora_common/velora_account.h"
#include "velora_common/velora_bottom_buttons.h"
#include "velora_common/velora_client.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_indicator.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_network.h"
#include "velora_common/velora_paths.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_setup_pages.h"
#include "velora_common/velora_setup_row.h"
#include <clocale>
#include <cstdlib>
#include <libintl.h>
#include <string>

struct WelcomeViewData {
    AppData *ad = nullptr;
    Evas_Object *layout = nullptr;
    Evas_Object *beeper = nullptr; // null without such a group

    Evas_Object *words = nullptr; // in the scroller
    Evas_Object *disclaimer = nullptr;
    Evas_Object *bottom = nullptr;
    Ecore_Job *fit_job = nullptr;
    std::string account; // whose name stands in the place of the buttons
    bool is_filled = false;
};
static WelcomeViewData *s_vd;

static const char s_disclaimer_topic[] = "disclaimer";
static const char s_previous_id[] = "IDS_CLOUD_BUTTON_PREVIOUS", s_skip_id[] = "IDS_STU_BUTTON_SKIP";
static constexpr int s_offered_gigabytes = 50;
static constexpr double s_headline_scale = 1.25;                  // of what is said below it
static constexpr int s_sign_and_gaps = 192, s_words_margins = 48; // of "scroller_lite"
static constexpr double s_drawn_scale = 1.8;
// Where the table of colours is missing: readable on light and on dark.
static constexpr unsigned int s_plain_color = 0x80868E;

static const char *__text(const char *id)
{
    return dcgettext(VELORA_DOMAIN, id, LC_MESSAGES);
}

// The page, unless it is on its way out.
static WelcomeViewData *__view()
{
    if (s_vd && _velora_setup_is_open())
        return s_vd;
    VELORA_LOGE("view is destroyed");
    return nullptr;
}

static void __view_destroy(void *page)
{
    auto *vd = static_cast<WelcomeViewData *>(page);
    if (!vd) {
        VELORA_LOGE("Invalid argument: vd is NULL");
        return;
    }
    vd->ad->is_welcome_shown = false;
    _velora_common_set_indicator_mode(vd->ad->conformant, INDICATOR_MODE_HEADER);
    if (vd->beeper)
        evas_object_del(vd->beeper);
    if (vd->fit_job)
        ecore_job_del(vd->fit_job);
    s_vd = nullptr;
    delete vd;
}

// The ways out

static void __leave(AppData *ad, const char *result)
{
    _velora_setup_result_set(ad, result);
    _velora_setup_leave(ad);
}

static void __button_Skip_cb(void *, Evas_Object *, void *)
{
    if (const WelcomeViewData *vd = __view())
        __leave(vd->ad, "rbutton_skip");
}

static void __button_previous_cb(void *, Evas_Object *, void *)
{
    if (const WelcomeViewData *vd = __view())
        __leave(vd->ad, "lbutton_click");
}

static Eina_Bool __setup_wizard_back_cb(void *, Elm_Object_Item *)
{
    VELORA_LOGI("__setup_wizard_back_cb is called!");
    if (const WelcomeViewData *vd = __view())
        __leave(vd->ad, "lbutton_click");
    return EINA_FALSE;
}

// Markup

static std::string __font(const char *theme_code)
{
    char *name = nullptr;
    int size = 0;
    ea_theme_font_get(theme_code, &name, &size);
    std::string font = name ? name : "Sans";
    std::free(name);
    return font;
}

static unsigned int __color(const char *theme_code)
{
    int r = 0, g = 0, b = 0, a = 0;
    if (!ea_theme_color_get(theme_code, &r, &g, &b, &a))
        return s_plain_color;
    return static_cast<unsigned int>((r << 16) + (g << 8) + b);
}

static Evas_Object *__label_create(Evas_Object *parent)
{
    Evas_Object *label = elm_label_add(parent);
    elm_object_style_set(label, "setupwizard"); // white: the colour is the markup's
    elm_label_line_wrap_set(label, ELM_WRAP_MIXED);
    return label;
}

static void __headline_set(Evas_Object *label, const char *text)
{
    const std::string font = __font("ATO007");
    char *markup = g_strdup_printf("<color=#%06x><align=center><font=%s text_class=ATO007><font_size=%d>%s</font_size>"
                                   "</font></align></color>",
                                   __color("ATO007"), font.c_str(), _velora_setup_font_size(label, "ATO007"), text);
    elm_object_text_set(label, markup);
    g_free(markup);
}

static void __user_name_set(Evas_Object *label, const char *user_name)
{
    const std::string font = __font("ATO004");
    char *name = elm_entry_utf8_to_markup(user_name);
    char *markup =
        g_strdup_printf("<align=center><font=%s text_class=ATO004><font_size=%d>%s</font_size></font></align>",
                        font.c_str(), _velora_setup_font_size(label, "ATO004"), name);
    elm_object_text_set(label, markup);
    ea_theme_object_color_set(label, "ATO004");
    g_free(markup);
    std::free(name);
}

static void __disclaimer_set(Evas_Object *label)
{
    const std::string font = __font("ATO004");
    const unsigned int color = __color("ATO004");
    const char *text = __text("IDS_CLOUD_BODY_DISCLAIMER");
    char *markup = g_strdup_printf("<underline=on><underline_color=#%06x><color=#%06x><align=center><font=%s "
                                   "text_class=ATO004><font_size=%d>%s</font_size></font></align></color>"
                                   "</underline_color></underline>",
                                   color, color, font.c_str(), _velora_setup_font_size(label, "ATO004"), text);
    elm_object_domain_translatable_text_set(label, VELORA_DOMAIN, markup);
    ea_screen_reader_name_set(label, text);
    g_free(markup);
}

// The disclaimer

static void __popup_ok_cb(void *, Evas_Object *, void *)
{
    if (!s_vd) {
        VELORA_LOGE("s_vd is NULL");
        return;
    }
    _velora_popup_take_away(s_vd->ad, {s_vd, s_disclaimer_topic});
}

static void __disclaimer_popup_show(WelcomeViewData *vd)
{
    _velora_popup_show(vd->ad, {vd, s_disclaimer_topic},
                       _velora_common_create_warning_popup(
                           vd->ad->win_main,
                           "IDS_CLOUD_BODY_THIS_SERVICE_IS_PROVIDED_BY_VELORA_YOUR_USE_THEREOF_DISCLAIMER_MSG",
                           __popup_ok_cb, vd));
}

static void __disclaimer_link_cb(void *, Evas_Object *, void *)
{
    WelcomeViewData *vd = __view();
    if (!vd)
        return;
    if (vd->beeper)
        elm_layout_signal_emit(vd->beeper, "beep", "elm");
    __disclaimer_popup_show(vd);
}

static Eina_Bool __velora_disclaimer_clicked_cb(void *data, Evas_Object *obj, Elm_Access_Action_Info *)
{
    __disclaimer_link_cb(data, obj, nullptr);
    return EINA_TRUE;
}

static void __disclaimer_key_down_cb(void *, Evas *, Evas_Object *, void *event_info)
{
    auto *event = static_cast<Evas_Event_Key_Down *>(event_info);
    if (event->event_flags & EVAS_EVENT_FLAG_ON_HOLD)
        return;
    if (g_strcmp0(event->keyname, "Return") != 0 && g_strcmp0(event->keyname, "KP_Enter") != 0)
        return;
    WelcomeViewData *vd = __view();
    if (!vd)
        return;
    event->event_flags = static_cast<Evas_Event_Flags>(event->event_flags | EVAS_EVENT_FLAG_ON_HOLD); // used up
    __disclaimer_popup_show(vd);
}

static void __disclaimer_tapped_cb(void *data, Evas_Object *, const char *, const char *)
{
    evas_object_smart_callback_call(static_cast<Evas_Object *>(data), "clicked", nullptr);
}

static void __disclaimer_create(WelcomeViewData *vd)
{
    Evas_Object *holder = elm_layout_add(vd->layout);
    elm_layout_file_set(holder, _velora_common_app_file("res/edje/velora_setup_wizard.edj").c_str(),
                        "disclaimer_content");
    Evas_Object *label = vd->disclaimer = __label_create(holder);
    elm_object_part_content_set(holder, "elm.swallow.content", label);
    __disclaimer_set(label);
    elm_object_focus_allow_set(label, EINA_TRUE);
    evas_object_smart_callback_add(label, "clicked", __disclaimer_link_cb, vd);
    elm_access_action_cb_set(label, ELM_ACCESS_ACTION_ACTIVATE, __velora_disclaimer_clicked_cb, vd);
    evas_object_event_callback_add(label, EVAS_CALLBACK_KEY_DOWN, __disclaimer_key_down_cb, nullptr);
    elm_layout_signal_callback_add(holder, "elm,action,click", "elm", __disclaimer_tapped_cb, label);
    elm_object_part_content_set(vd->layout, "elm.swallow.text2", holder);
}

// The account

// The sign-in is over, and the page in front again. What is done is done, also when nobody looks any more.
static void __signed_in_cb(AppData *ad)
{
    if (!__view())
        return;
    _velora_common_meta_refresh(ad);
    _velora_setup_go_on_now(ad, _velora_signin_setupwizard_create);
}

static void __signin_back_cb(AppData *ad)
{
    if (__view())
        _velora_common_set_indicator_mode(ad->conformant, INDICATOR_MODE_TRANSPARENT);
}

static void __signin_open(int is_signin)
{
    const WelcomeViewData *vd = __view();
    if (!vd)
        return;
    AppData *ad = vd->ad;
    if (!_velora_common_check_network(ad))
        return;
    ad->is_welcome_shown = false;
    _velora_common_set_indicator_mode(ad->conformant, INDICATOR_MODE_HEADER);
    _velora_signin_create_over(ad, is_signin, __signed_in_cb, __signin_back_cb);
}

static void __create_account_btn_cb(void *, Evas_Object *, void *)
{
    __signin_open(0);
}

static void __sign_in_btn_cb(void *, Evas_Object *, void *)
{
    __signin_open(1);
}

static void __button_create(WelcomeViewData *vd, const char *part, const char *text_id, Evas_Smart_Cb cb)
{
    Evas_Object *button = elm_button_add(vd->layout);
    elm_object_style_set(button, "bottom");
    elm_object_domain_translatable_text_set(button, VELORA_DOMAIN, text_id);
    evas_object_smart_callback_add(button, "clicked", cb, vd);
    elm_object_part_content_set(vd->layout, part, button);
}

static std::string __account_name()
{
    AccountInfo *info = nullptr;
    std::string name;
    if (__velora_check_account_exist(VELORA_PACKAGE, &info) == 0)
        name = info->user_name ? info->user_name : "";
    __velora_account_info_free(info);
    return name;
}

// The account's name, or the two buttons when there is none. It may have come or gone behind another page.
static void __account_fill(WelcomeViewData *vd)
{
    const std::string name = __account_name();
    if (vd->is_filled && name == vd->account)
        return;
    vd->is_filled = true;
    vd->account = name;
    for (const char *part : {"elm.swallow.btn1", "elm.swallow.btn2"})
        if (Evas_Object *former = elm_object_part_content_unset(vd->layout, part))
            evas_object_del(former);
    if (!name.empty()) {
        Evas_Object *label = __label_create(vd->layout);
        elm_object_part_content_set(vd->layout, "elm.swallow.btn1", label);
        __user_name_set(label, name.c_str());
        return;
    }
    __button_create(vd, "elm.swallow.btn1", "IDS_SA_BODY_CREATE_NEW_ACCOUNT_M_SIGN_UP", __create_account_btn_cb);
    __button_create(vd, "elm.swallow.btn2", "IDS_CLOUD_BUTTON_SIGN_IN", __sign_in_btn_cb);
    elm_layout_signal_emit(elm_object_part_content_get(vd->layout, "elm.swallow.btn1"), "platform,button,primary",
                           "platform"); // of the two what a new phone is most likely to need
}

// Down the page, and on to the buttons at its bottom.
static void __focus_chain_set(WelcomeViewData *vd)
{
    elm_object_focus_custom_chain_unset(vd->layout);
    for (const char *part : {"elm.swallow.scroller", "elm.swallow.btn1", "elm.swallow.btn2", "elm.swallow.text2"})
        if (Evas_Object *content = elm_object_part_content_get(vd->layout, part))
            elm_object_focus_custom_chain_append(vd->layout, content, nullptr);
}

static void __page_shown_cb(void *, Evas *, Evas_Object *, void *)
{
    if (!s_vd)
        return;
    __account_fill(s_vd);
    __focus_chain_set(s_vd);
}

// The page

static void __texts_set(WelcomeViewData *vd)
{
    char offer[1024];
    g_snprintf(offer, sizeof offer, __text("IDS_ST_BODY_VELORA_KEEPS_YOUR_MEMORIES_SAFE_GET_PD_GB_FOR_A_YEAR_ABB"),
               s_offered_gigabytes);
    __headline_set(elm_object_part_content_get(vd->words, "elm.swallow.text0"),
                   __text("IDS_ST_BODY_YOUR_STUFF_ANYWHERE_ABB"));
    __headline_set(elm_object_part_content_get(vd->words, "elm.swallow.text1"), offer);
    __disclaimer_set(vd->disclaimer);
    elm_object_text_set(elm_object_part_content_get(vd->bottom, "emergency_btn"), __text(s_previous_id));
    elm_object_text_set(elm_object_part_content_get(vd->bottom, "unlock_btn"), __text(s_skip_id));
}

static void __language_changed_cb(void *, Evas_Object *, void *)
{
    if (s_vd)
        __texts_set(s_vd);
}

// Letters have the size that the window has room for; where it has little the sign gives way to the words.
static void __fit_job(void *data)
{
    auto *vd = static_cast<WelcomeViewData *>(data);
    vd->fit_job = nullptr;
    __texts_set(vd);
    if (!vd->account.empty())
        __user_name_set(elm_object_part_content_get(vd->layout, "elm.swallow.btn1"), vd->account.c_str());
    int width = 0, height = 0;
    evas_object_geometry_get(elm_object_part_content_get(vd->layout, "elm.swallow.scroller"), nullptr, nullptr, &width,
                             &height);
    const double scale = elm_config_scale_get() / s_drawn_scale;
    int wanted = static_cast<int>(s_sign_and_gaps * scale);
    for (const char *part : {"elm.swallow.text0", "elm.swallow.text1"})
        wanted += _velora_setup_label_height(elm_object_part_content_get(vd->words, part),
                                             width - static_cast<int>(s_words_margins * scale));
    const bool is_low = height < wanted;
    elm_layout_signal_emit(vd->words, is_low ? "velora,sign,hide" : "velora,sign,show", "velora");
}

static void __resized_cb(void *, Evas *, Evas_Object *, void *)
{
    if (s_vd && !s_vd->fit_job)
        s_vd->fit_job = ecore_job_add(__fit_job, s_vd);
}

static void __beeper_create(WelcomeViewData *vd, const char *file)
{
    vd->beeper = elm_layout_add(vd->ad->naviframe);
    if (!elm_layout_file_set(vd->beeper, file, "beeper")) {
        evas_object_del(vd->beeper);
        vd->beeper = nullptr;
        return;
    }
    evas_object_move(vd->beeper, -1000, -1000); // to be heard alone
    evas_object_show(vd->beeper);
}

static void __words_create(WelcomeViewData *vd, const char *file)
{
    Evas_Object *scroller = elm_scroller_add(vd->layout);
    elm_scroller_bounce_set(scroller, EINA_FALSE, EINA_FALSE);
    elm_scroller_policy_set(scroller, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
    vd->words = elm_layout_add(vd->layout);
    elm_layout_file_set(vd->words, file, "scroller_lite");
    evas_object_size_hint_weight_set(vd->words, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(vd->words, EVAS_HINT_FILL, EVAS_HINT_FILL);
    Evas_Object *headline = __label_create(vd->words), *offer = __label_create(vd->words);
    elm_object_scale_set(headline, s_headline_scale);
    elm_object_part_content_set(vd->words, "elm.swallow.text0", headline);
    elm_object_part_content_set(vd->words, "elm.swallow.text1", offer);
    elm_object_content_set(scroller, vd->words);
    elm_object_part_content_set(vd->layout, "elm.swallow.scroller", scroller);
}

static Evas_Object *__spoken_title_create(WelcomeViewData *vd)
{
    Evas_Object *label = __label_create(vd->layout);
    elm_access_info_set(label, ELM_ACCESS_TYPE, VELORA_SERVICE);
    ea_screen_reader_name_set(label, VELORA_SERVICE);
    elm_object_part_content_set(vd->layout, "elm.swallow.icon.tts", label);
    return label;
}

static Elm_Object_Item *__push(WelcomeViewData *vd)
{
    Evas_Object *naviframe = vd->ad->naviframe;
    Elm_Object_Item *item = elm_naviframe_item_push(naviframe, nullptr, nullptr, nullptr, vd->layout, nullptr);
    elm_object_item_domain_part_text_translatable_set(item, "default", VELORA_DOMAIN, EINA_TRUE);
    elm_naviframe_item_title_enabled_set(item, EINA_FALSE, EINA_FALSE);
    elm_naviframe_item_pop_cb_set(item, __setup_wizard_back_cb, vd);
    vd->bottom = _velora_common_create_bottom_buttons(naviframe, vd->ad, s_previous_id, __button_previous_cb, s_skip_id,
                                                      __button_Skip_cb);
    elm_object_item_part_content_set(item, "toolbar", vd->bottom);
    Evas_Object *page = elm_object_parent_widget_get(vd->layout);
    ea_screen_reader_name_set(page, VELORA_SERVICE);
    evas_object_event_callback_add(page, EVAS_CALLBACK_SHOW, __page_shown_cb, nullptr);
    return item;
}

void _velora_setupwizard_view_create(AppData *ad)
{
    VELORA_LOGI("_velora_setupwizard_view_create is called!");
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    if (_velora_setup_join(ad))
        return;
    ad->is_welcome_shown = true;
    _velora_common_set_indicator_mode(ad->conformant, INDICATOR_MODE_TRANSLUCENT);
    _velora_common_account_settle();
    auto *vd = s_vd = new WelcomeViewData;
    vd->ad = ad;
    const std::string file = _velora_common_app_file("res/edje/velora_setup_wizard.edj");
    vd->layout = elm_layout_add(ad->naviframe);
    elm_layout_file_set(vd->layout, file.c_str(), "setupwizard_lite");
    __words_create(vd, file.c_str());
    __beeper_create(vd, file.c_str());
    Evas_Object *spoken = __spoken_title_create(vd);
    __account_fill(vd);
    __disclaimer_create(vd);
    _velora_setup_page_add(ad, vd, __push(vd), __view_destroy);
    __texts_set(vd);
    __focus_chain_set(vd);
    elm_object_focus_set(elm_object_part_content_get(vd->layout, "elm.swallow.btn1"), EINA_TRUE);
    evas_object_smart_callback_add(vd->layout, "language,changed", __language_changed_cb, nullptr);
    evas_object_event_callback_add(vd->layout, EVAS_CALLBACK_RESIZE, __resized_cb, nullptr);
    elm_access_highlight_set(spoken);
}
