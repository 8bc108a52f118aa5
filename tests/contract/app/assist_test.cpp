#include "assist/assist.h"
#include "driver.h"
#include "temp_home.h"
#include "vconf/vconf.h"
#include <gtest/gtest.h>

namespace {
std::string calls; // who got a key, in order

void record(void *data, Evas_Object *, void *)
{
    calls += static_cast<const char *>(data);
}

void record_and_delete(void *data, Evas_Object *obj, void *)
{
    calls += static_cast<const char *>(data);
    evas_object_del(obj);
}

class Keys : public testing::Test {
  protected:
    Evas_Object *window = nullptr, *naviframe = nullptr;

    void SetUp() override
    {
        driver::start();
        calls.clear();
        window = elm_win_util_standard_add("keys", "keys");
        evas_object_resize(window, 480, 800);
        Evas_Object *conformant = elm_conformant_add(window);
        elm_win_resize_object_add(window, conformant);
        naviframe = elm_naviframe_add(window);
        elm_object_content_set(conformant, naviframe);
        for (Evas_Object *obj : {conformant, naviframe, window})
            evas_object_show(obj);
        ea_object_event_callback_add(naviframe, EA_CALLBACK_BACK, record, const_cast<char *>("n"));
        ea_object_event_callback_add(naviframe, EA_CALLBACK_MORE, record, const_cast<char *>("m"));
        driver::settle();
    }
    void TearDown() override
    {
        evas_object_del(window);
        driver::settle();
    }
    Evas_Object *popup(const char *name)
    {
        Evas_Object *one = elm_popup_add(window);
        elm_object_text_set(one, name);
        evas_object_show(one);
        ea_object_event_callback_add(one, EA_CALLBACK_BACK, record_and_delete, const_cast<char *>(name));
        driver::settle();
        return one;
    }
    std::string press(const char *key)
    {
        calls.clear();
        driver::press(window, key);
        return calls;
    }
};

TEST_F(Keys, GoToTheTopmostAndNobodyElse)
{
    for (const auto &[key, expected] : {std::pair("Escape", "n"), std::pair("XF86Back", "n"), std::pair("Menu", "m"),
                                        std::pair("XF86Menu", "m"), std::pair("a", "")})
        EXPECT_EQ(press(key), expected) << key;
    Evas *evas = evas_object_evas_get(window);
    evas_key_modifier_on(evas, "Alt");
    EXPECT_EQ(press("XF86Back"), ""); // with a modifier it is the window manager's
    evas_key_modifier_off(evas, "Alt");
    popup("p");
    Evas_Object *upper = popup("q");
    EXPECT_EQ(press("XF86Menu"), ""); // behind a popup
    evas_object_hide(upper);
    EXPECT_EQ(press("XF86Back"), "p");
    EXPECT_EQ(press("XF86Menu"), "m");
    evas_object_show(upper);
    EXPECT_EQ(press("Escape"), "q");
    EXPECT_EQ(press("Escape"), "n");
    evas_object_hide(naviframe);
    EXPECT_EQ(press("Escape"), "");
}

Eina_Bool record_pop(void *, Elm_Object_Item *)
{
    calls += "p";
    return EINA_FALSE;
}

// A page that refuses to go counts how often it is asked, by a key that the window's parts hand up to the naviframe as
// well as by the registration.
TEST_F(Keys, OnePressIsOneBackWhateverHasTheFocus)
{
    ea_object_event_callback_del(naviframe, EA_CALLBACK_BACK, record);
    ea_object_event_callback_add(
        naviframe, EA_CALLBACK_BACK, [](void *, Evas_Object *obj, void *) { elm_naviframe_item_pop(obj); }, nullptr);
    Evas_Object *page = elm_box_add(naviframe), *list = elm_genlist_add(naviframe), *button = elm_button_add(naviframe);
    Evas_Object *bar = elm_toolbar_add(naviframe);
    for (Evas_Object *obj : {list, button, bar}) {
        evas_object_size_hint_weight_set(obj, 1, 1);
        evas_object_size_hint_align_set(obj, -1, -1);
        elm_box_pack_end(page, obj);
        evas_object_show(obj);
    }
    Elm_Genlist_Item_Class *rows = elm_genlist_item_class_new();
    rows->item_style = "1line";
    Elm_Object_Item *row =
        elm_genlist_item_append(list, rows, nullptr, nullptr, ELM_GENLIST_ITEM_NONE, nullptr, nullptr);
    elm_genlist_item_append(list, rows, nullptr, nullptr, ELM_GENLIST_ITEM_NONE, nullptr, nullptr);
    elm_genlist_item_class_free(rows);
    elm_toolbar_item_append(bar, nullptr, "path", nullptr, nullptr);
    elm_naviframe_item_push(naviframe, "below", nullptr, nullptr, elm_box_add(naviframe), nullptr);
    bool arrived = false;
    evas_object_smart_callback_add(
        naviframe, "transition,finished", [](void *data, Evas_Object *, void *) { *static_cast<bool *>(data) = true; },
        &arrived);
    Elm_Object_Item *top = elm_naviframe_item_push(naviframe, "top", nullptr, nullptr, page, nullptr);
    elm_naviframe_item_pop_cb_set(top, record_pop, nullptr);
    ASSERT_TRUE(driver::run_until([&arrived] { return arrived; }));
    for (const char *key : {"Escape", "XF86Back"}) {
        EXPECT_EQ(press(key), "p") << key << " with the focus on nothing";
        for (Evas_Object *obj : {list, button, bar, naviframe}) {
            elm_object_focus_set(obj, EINA_TRUE);
            driver::settle();
            EXPECT_EQ(press(key), "p") << key << " with the focus on " << elm_object_widget_type_get(obj);
        }
        elm_object_item_focus_set(row, EINA_TRUE);
        driver::settle();
        EXPECT_EQ(press(key), "p") << key << " with the focus on a row";
        elm_genlist_item_selected_set(row, EINA_TRUE);
        driver::settle();
        EXPECT_EQ(press(key), "p") << key << " with a selected row";
        elm_genlist_item_selected_set(row, EINA_FALSE);
        popup("q");
        EXPECT_EQ(press(key), "q") << key << " with a popup";
        EXPECT_EQ(press(key), "p") << key << " when the popup has gone";
        elm_object_focus_set(list, EINA_FALSE);
    }
}

TEST_F(Keys, RegistrationsComeAndGo)
{
    char x[] = "x", y[] = "y";
    ea_object_event_callback_add(naviframe, EA_CALLBACK_BACK, record, x);
    ea_object_event_callback_add(naviframe, EA_CALLBACK_BACK, record_and_delete, y);
    ea_object_event_callback_add(naviframe, EA_CALLBACK_BACK, record, const_cast<char *>("z"));
    EXPECT_STREQ(static_cast<char *>(ea_object_event_callback_del(naviframe, EA_CALLBACK_BACK, record)), "z");
    ea_object_event_callback_add(naviframe, EA_CALLBACK_BACK, record, const_cast<char *>("w"));
    EXPECT_EQ(press("Escape"), "nxy"); // and w is gone with the object
    EXPECT_EQ(press("Escape"), "");
    // a callback that ends everything
    ea_object_event_callback_add(
        window, EA_CALLBACK_BACK,
        [](void *data, Evas_Object *, void *) { evas_object_del(static_cast<Evas_Object *>(data)); }, window);
    driver::press(window, "Escape");
    window = nullptr;
}

std::string color(const char *name)
{
    int r = 0, g = 0, b = 0, a = 0;
    if (!ea_theme_color_get(name, &r, &g, &b, &a))
        return "unset";
    return std::to_string(r) + "," + std::to_string(g) + "," + std::to_string(b) + "," + std::to_string(a);
}

TEST(Tables, ColorsFollowWhatThePersonChose)
{
    const TempHome home;
    driver::start();
    ea_theme_changeable_ui_enabled_set(true);
    const auto colors = [&](const std::string &text) {
        return ea_theme_color_table_new(home.file("colors.xml", text).c_str());
    };
    const std::string good = "<color class='T1' light='#ff800040' dark='#010203'/>";
    EXPECT_EQ(colors("<colors>" + good + "<color class='T3' light='#00000g' dark='#000000'/></colors>"), nullptr);
    ea_theme_color_table_h table = colors("<colors>\n<!-- one -->\n" + good + "</colors>");
    ASSERT_NE(table, nullptr);
    EXPECT_EQ(color("T1"), "unset");
    const char light[] = "255,128,0,64", dark[] = "1,2,3,255";
    const struct {
        const char *variable;
        int setting, style;
        const char *expected;
    } cases[] = {
        {"", 0, 0, light}, {"", 1, 0, dark}, {"light", 1, 0, light}, {"dark", 0, 0, dark}, {"", 0, 1, dark},
    };
    for (const auto &one : cases) {
        setenv("ORVANT_THEME", one.variable, 1);
        vconf_set_bool("db/setting/theme_dark", one.setting);
        ea_theme_colors_set(table, one.style);
        EXPECT_EQ(color("T1"), one.expected);
    }
    ea_theme_colors_unset(table, 1);
    EXPECT_EQ(color("T1"), "unset");
    ea_theme_color_table_free(table);
}

TEST(Tables, FontsFollowTheChosenTextSize)
{
    const TempHome home;
    driver::start();
    const auto fonts = [&](const std::string &size) {
        const std::string text = "<fonts><font class='F1' font='Sans:style=Bold' size='25'/>"
                                 "<font class='F2' font='Sans' " +
                                 size + "/></fonts>";
        return ea_theme_font_table_new(home.file("fonts.xml", text).c_str());
    };
    EXPECT_EQ(fonts("size='12px'"), nullptr);
    ea_theme_font_table_h table = fonts("size='20' largest='26'");
    const struct {
        const char *variable, *setting;
        int plain, bounded;
    } cases[] = {
        {nullptr, nullptr, 25, 20},
        {nullptr, "130", 33, 26},
        {"200", "130", 50, 26},
        {"150%", nullptr, 25, 20},
    };
    for (const auto &one : cases) {
        one.variable ? setenv("ORVANT_TEXT_PERCENT", one.variable, 1) : unsetenv("ORVANT_TEXT_PERCENT");
        one.setting ? vconf_set_str("db/setting/text_percent", one.setting) : vconf_unset("db/setting/text_percent");
        ea_theme_fonts_set(table);
        char *font = nullptr;
        int plain = 0, bounded = 0;
        EXPECT_TRUE(ea_theme_font_get("F1", &font, &plain));
        EXPECT_EQ(taken(font) + std::to_string(plain), "Sans:style=Bold" + std::to_string(one.plain));
        EXPECT_TRUE(ea_theme_font_get("F2", &font, &bounded));
        EXPECT_EQ(taken(font) + std::to_string(bounded), "Sans" + std::to_string(one.bounded));
    }
    ea_theme_font_table_free(table);
}
} // namespace
