#include "app/app.h"
#include "main/velora_shell.h"
#include "vconf/vconf.h"
#include "velora_common/velora_indicator.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_paths.h"
#include <Ecore_Con.h>
#include <cstdlib>
#include <unistd.h>

static void __win_delete_request_cb(void *, Evas_Object *, void *)
{
    _velora_pages_abandon(); // the widgets go before the last messages of workers are read
    elm_exit();
}

// A page that slides in takes no clicks, and cannot be popped.
static bool __is_sliding(const Evas_Object *naviframe)
{
    Elm_Object_Item *top = elm_naviframe_top_item_get(naviframe);
    const Evas_Object *obj = top ? elm_object_item_content_get(top) : nullptr;
    while (obj && obj != naviframe && !evas_object_freeze_events_get(obj))
        obj = evas_object_smart_parent_get(obj);
    return obj && obj != naviframe;
}

static const char s_left[] = "page that is left once it is there";

static void __slid_in_cb(void *, Evas_Object *naviframe, void *)
{
    evas_object_smart_callback_del(naviframe, "transition,finished", __slid_in_cb);
    if (evas_object_data_del(naviframe, s_left) == elm_naviframe_top_item_get(naviframe))
        elm_naviframe_item_pop(naviframe);
}

static void __naviframe_back_cb(void *, Evas_Object *obj, void *)
{
    if (!__is_sliding(obj)) {
        elm_naviframe_item_pop(obj);
        return;
    }
    evas_object_smart_callback_del(obj, "transition,finished", __slid_in_cb); // once, however often it is pressed
    evas_object_smart_callback_add(obj, "transition,finished", __slid_in_cb, nullptr);
    evas_object_data_set(obj, s_left, elm_naviframe_top_item_get(obj));
}

static void __naviframe_more_cb(void *, Evas_Object *obj, void *)
{
    evas_object_smart_callback_call(obj, "elm,action,more_event", nullptr);
}

// The size the pages are drawn for, where the window manager leaves the choice to us: a phone's makes it the screen.
static void __set_first_size(Evas_Object *win)
{
    constexpr double drawn_scale = 1.8;
    const double scale = elm_config_scale_get() / drawn_scale;
    evas_object_resize(win, static_cast<int>(480 * scale), static_cast<int>(800 * scale));
}

// While a window wants an indicator the toolkit looks for its service once a second, for ever where there is none: the
// window wants one where there is a service.
static Elm_Win_Indicator_Mode __indicator_mode()
{
    const char *service = std::getenv("ELM_INDICATOR_SERVICE_0");
    char *path = ecore_con_local_path_new(EINA_FALSE, service ? service : "elm_indicator_portrait", 0);
    const bool is_there = path && access(path, F_OK) == 0;
    std::free(path);
    return is_there ? ELM_WIN_INDICATOR_SHOW : ELM_WIN_INDICATOR_HIDE;
}

void __velora_update_indicator(AppData *ad)
{
    if (ad->win_main)
        elm_win_indicator_mode_set(ad->win_main, __indicator_mode());
}

static Evas_Object *__create_window(AppData *ad)
{
    Evas_Object *win = app_get_preinitialized_window("velora");
    if (!win)
        win = elm_win_add(nullptr, "velora", ELM_WIN_DIALOG_BASIC);
    if (!win) {
        ad->win_main = nullptr;
        VELORA_LOGE("ad->win_main is NULL");
        return nullptr;
    }
    elm_win_conformant_set(win, EINA_TRUE);
    elm_win_title_set(win, "velora");
    evas_object_smart_callback_add(win, "delete,request", __win_delete_request_cb, ad);
    elm_win_indicator_mode_set(win, __indicator_mode());
    // With the window, for a popup that scrolls is emptied by an extension that comes while it is open.
    elm_theme_extension_add(nullptr, _velora_common_app_file("res/edje/velora_genlist.edj").c_str());
    elm_theme_extension_add(nullptr, _velora_common_app_file("res/edje/velora_setup_wizard.edj").c_str());
    __set_first_size(win);
    evas_object_show(win);
    ad->win_main = win;
    __velora_update_landscape_mode(ad);
    return win;
}

// The preinitialised object of the preinitialised window, or a new one; it fills the window.
static Evas_Object *__create_filling(AppData *ad, Evas_Object *(*preinitialized)(), Evas_Object *(*add)(Evas_Object *))
{
    Evas_Object *obj = nullptr;
    if (ad->win_main == app_get_preinitialized_window("velora"))
        obj = preinitialized();
    if (!obj)
        obj = add(ad->win_main);
    if (!obj)
        return nullptr;
    evas_object_size_hint_weight_set(obj, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    elm_win_resize_object_add(ad->win_main, obj);
    return obj;
}

static Evas_Object *__create_bg(AppData *ad)
{
    Evas_Object *bg = __create_filling(ad, app_get_preinitialized_background, elm_bg_add);
    if (!bg) {
        VELORA_LOGE("ad->bg is NULL");
        return nullptr;
    }
    evas_object_show(bg);
    return bg;
}

static Evas_Object *__create_conformant(AppData *ad, int first_mode)
{
    Evas_Object *conformant = __create_filling(ad, app_get_preinitialized_conformant, elm_conformant_add);
    if (!conformant) {
        VELORA_LOGE("ad->conformant is NULL");
        return nullptr;
    }
    __velora_update_indicator(ad);
    elm_win_indicator_opacity_set(ad->win_main, ELM_WIN_INDICATOR_OPAQUE);
    evas_object_show(conformant);
    Evas_Object *indicator_bg = elm_bg_add(conformant);
    elm_object_part_content_set(conformant, "elm.swallow.indicator_bg", indicator_bg);
    _velora_common_set_indicator_mode(conformant, first_mode == LAUNCH_MODE_SETUP_WIZARD ? INDICATOR_MODE_TRANSPARENT
                                                                                         : INDICATOR_MODE_HEADER);
    evas_object_show(indicator_bg);
    return conformant;
}

static Evas_Object *__create_layout_main(AppData *ad)
{
    Evas_Object *layout = elm_layout_add(ad->conformant);
    if (!layout) {
        VELORA_LOGE("ad->layout_main is NULL");
        return nullptr;
    }
    const char *profile = elm_config_profile_get();
    if (g_strcmp0(profile, "mobile") == 0)
        elm_layout_theme_set(layout, "layout", "application", "default");
    else if (g_strcmp0(profile, "extension") == 0)
        elm_layout_theme_set(layout, "layout", "application", "noindicator");
    evas_object_size_hint_weight_set(layout, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    elm_object_part_content_set(layout, "elm.swallow.bg", ad->bg);
    elm_object_content_set(ad->conformant, layout);
    evas_object_show(layout);
    return layout;
}

static Evas_Object *__velora_create_navi_layout(Evas_Object *parent)
{
    if (!parent) {
        VELORA_LOGE("parent is NULL");
        return nullptr;
    }
    Evas_Object *nf = elm_naviframe_add(parent);
    if (!nf)
        return nullptr;
    elm_naviframe_prev_btn_auto_pushed_set(nf, EINA_FALSE);
    ea_object_event_callback_add(nf, EA_CALLBACK_BACK, __naviframe_back_cb, nullptr);
    ea_object_event_callback_add(nf, EA_CALLBACK_MORE, __naviframe_more_cb, nullptr);
    elm_object_part_content_set(parent, "elm.swallow.content", nf);
    evas_object_show(nf);
    return nf;
}

static void __set_rotation(Evas_Object *win)
{
    if (elm_win_wm_rotation_supported_get(win)) {
        const int rotations[] = {0, 90, 180, 270};
        elm_win_wm_rotation_available_rotations_set(win, rotations, 4);
    }
    int is_first_boot = 0;
    const int rslt = vconf_get_bool("db/pwlock/first_boot", &is_first_boot);
    VELORA_LOGI("rslt is [%d]", rslt);
    elm_win_wm_rotation_preferred_rotation_set(win, rslt == 0 && is_first_boot ? 0 : -1);
}

void __create_main_view(AppData *ad, int first_mode)
{
    Evas_Object *win = __create_window(ad);
    if (!win)
        return;
    if (!(ad->bg = __create_bg(ad)) || !(ad->conformant = __create_conformant(ad, first_mode)) ||
        !(ad->layout_main = __create_layout_main(ad)))
        return;
    __velora_update_indicator(ad);
    if (!(ad->naviframe = __velora_create_navi_layout(ad->layout_main))) {
        VELORA_LOGE("nf is NULL");
        return;
    }
    __set_rotation(win);
    ea_screen_reader_support_set(win, true);
}

void __changeable_colors_set(AppData *ad)
{
    const std::string path = _velora_common_app_file("shared/res/tables/com.orvant.velora_ChangeableColorInfo.xml");
    if (ad->color_table)
        ea_theme_color_table_free(ad->color_table);
    ad->color_table = ea_theme_color_table_new(path.c_str());
    if (ad->color_table)
        ea_theme_colors_set(ad->color_table, 0);
    else
        VELORA_LOGE("color table create fail");
}

void __changeable_font_set(AppData *ad)
{
    const std::string path = _velora_common_app_file("shared/res/tables/com.orvant.velora_ChangeableColorFontInfo.xml");
    if (ad->font_table)
        ea_theme_font_table_free(ad->font_table);
    ad->font_table = ea_theme_font_table_new(path.c_str());
    if (ad->font_table)
        ea_theme_fonts_set(ad->font_table);
    else
        VELORA_LOGE("font table create fail");
}
