#include "assist/assist.h"
#include "driver.h"
#include "vconf/vconf.h"
#include <fstream>
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
    EXPECT_EQ(press("Escape"), "n");
    EXPECT_EQ(press("XF86Back"), "n");
    EXPECT_EQ(press("Menu"), "m");
    EXPECT_EQ(press("XF86Menu"), "m");
    EXPECT_EQ(press("a"), "");
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

TEST_F(Keys, RegistrationsComeAndGo)
{
    char x[] = "x", y[] = "y";
    ea_object_event_callback_add(naviframe, EA_CALLBACK_BACK, record, x);
    ea_object_event_callback_add(naviframe, EA_CALLBACK_BACK, record_and_delete, y);
    ea_object_event_callback_add(naviframe, EA_CALLBACK_BACK, record, const_cast<char *>("z"));
    EXPECT_EQ(ea_object_event_callback_del(naviframe, EA_CALLBACK_MORE, record_and_delete), nullptr);
    EXPECT_STREQ(static_cast<char *>(ea_object_event_callback_del(naviframe, EA_CALLBACK_BACK, record)), "z");
    ea_object_event_callback_add(naviframe, EA_CALLBACK_BACK, record, const_cast<char *>("w"));
    EXPECT_EQ(press("Escape"), "nxy"); // and w is gone with the object
    EXPECT_EQ(press("Escape"), "");
    ea_object_event_callback_add(nullptr, EA_CALLBACK_BACK, record, x);
    ea_object_event_callback_add(window, EA_CALLBACK_BACK, nullptr, x);
    EXPECT_EQ(press("Escape"), "");
    // a callback that ends everything
    ea_object_event_callback_add(
        window, EA_CALLBACK_BACK,
        [](void *data, Evas_Object *, void *) { evas_object_del(static_cast<Evas_Object *>(data)); }, window);
    driver::press(window, "Escape");
    window = nullptr;
}

TEST_F(Keys, AreLeftToWhoeverUsesThemUp)
{
    Evas_Object *entry = elm_entry_add(window);
    elm_naviframe_item_push(naviframe, "page", nullptr, nullptr, entry, nullptr);
    elm_object_focus_set(entry, EINA_TRUE);
    ASSERT_TRUE(driver::run_until([&] { return evas_focus_get(evas_object_evas_get(window)) != nullptr; }));
    EXPECT_EQ(press("Escape"), ""); // it ends the entry's composing
    EXPECT_EQ(press("XF86Back"), "n");
    EXPECT_EQ(press("XF86Back"), "n");
    // held down: one press, however often it repeats
    calls.clear();
    Evas *evas = evas_object_evas_get(window);
    for (int i = 0; i < 5; i++)
        evas_event_feed_key_down(evas, "XF86Back", "XF86Back", nullptr, nullptr, 1, nullptr);
    driver::settle();
    EXPECT_EQ(calls, "");
    driver::press(window, "XF86Back");
    EXPECT_EQ(calls, "n");
    // with a modifier it is the window manager's
    evas_event_feed_key_down(evas, "Alt_L", "Alt_L", nullptr, nullptr, 1, nullptr);
    evas_key_modifier_on(evas, "Alt");
    EXPECT_EQ(press("XF86Back"), "");
    evas_key_modifier_off(evas, "Alt");
}

class Tables : public testing::Test {
  protected:
    std::string file;

    void SetUp() override
    {
        driver::start();
        ea_theme_changeable_ui_enabled_set(true);
        char name[] = "/tmp/assist-XXXXXX";
        file = mkdtemp(name);
        setenv("PLATFORM_DATA_DIR", file.c_str(), 1);
        file += "/table.xml";
        unsetenv("ORVANT_THEME");
    }
    void TearDown() override
    {
        system(("rm -r " + file.substr(0, file.rfind('/'))).c_str());
    }
    ea_theme_color_table_h colors(const std::string &text)
    {
        std::ofstream(file) << text;
        return ea_theme_color_table_new(file.c_str());
    }
    static std::string color(const char *name)
    {
        int r = 0, g = 0, b = 0, a = 0;
        const bool set = ea_theme_color_get(name, &r, &g, &b, &a);
        char text[64];
        snprintf(text, sizeof text, "%s%d,%d,%d,%d", set ? "" : "unset ", r, g, b, a);
        return text;
    }
};

TEST_F(Tables, ColorsFollowWhatThePersonChose)
{
    ea_theme_color_table_h table =
        colors("<colors>\n<!-- one -->\n<color class='T1' light='#ff800040' dark='#010203'/></colors>");
    ASSERT_NE(table, nullptr);
    EXPECT_EQ(color("T1"), "unset 255,255,255,255");
    const char light[] = "255,128,0,64", dark[] = "1,2,3,255";
    const struct {
        const char *variable;
        int setting, style;
        const char *expected;
    } cases[] = {
        {nullptr, 0, 0, light}, {nullptr, 1, 0, dark}, {"light", 1, 0, light},
        {"dark", 0, 0, dark},   {nullptr, 0, 1, dark}, {"light", 0, 0, light},
    };
    for (const auto &one : cases) {
        one.variable ? setenv("ORVANT_THEME", one.variable, 1) : unsetenv("ORVANT_THEME");
        vconf_set_bool("db/setting/theme_dark", one.setting);
        ea_theme_colors_set(table, one.style);
        EXPECT_EQ(color("T1"), one.expected);
    }
    Evas_Object *window = elm_win_util_standard_add("t", "t");
    ea_theme_object_color_set(window, "T1");
    int r = 0, a = 0;
    evas_object_color_get(window, &r, nullptr, nullptr, &a);
    EXPECT_EQ(std::pair(r, a), std::pair(64, 64)); // premultiplied, as objects have it
    evas_object_del(window);
    ea_theme_colors_unset(table, 1);
    EXPECT_EQ(color("T1"), "unset 255,255,255,255");
    ea_theme_changeable_ui_enabled_set(false);
    ea_theme_colors_set(table, 0);
    EXPECT_EQ(color("T1"), "unset 255,255,255,255");
    ea_theme_color_table_free(table);
}

TEST_F(Tables, MalformedOnesAreRefusedWhole)
{
    const std::string good = "<color class='T2' light='#000000' dark='#000000'/>";
    for (const std::string &text : std::vector<std::string>{
             "",
             "<colors>" + good,
             "<fonts>" + good + "</fonts>",
             "<colors><colour/></colors>",
             "<colors>" + good + "<color class='T3' light='#00000' dark='#000000'/></colors>",
             "<colors><color class='T3' light='#00000g' dark='#000000'/></colors>",
             "<colors><color class='T3' light='#000000'/></colors>",
             "<colors><color class='' light='#000000' dark='#000000'/></colors>",
             "<colors><color class='T3' light='#000000' dark='#000000' other='1'/></colors>",
             "<colors><color class='T3' light='#000000' dark='#000000'>" + good + "</color></colors>",
         })
        EXPECT_EQ(colors(text), nullptr) << text;
    EXPECT_EQ(color("T2"), "unset 255,255,255,255");
    for (const char *size : {"0", "-3", "1.5", "12px", "", "99999"}) {
        std::ofstream(file) << "<fonts><font class='F' font='Sans' size='" << size << "'/></fonts>";
        EXPECT_EQ(ea_theme_font_table_new(file.c_str()), nullptr) << size;
    }
    EXPECT_EQ(ea_theme_color_table_new("/nowhere"), nullptr);
    EXPECT_EQ(ea_theme_font_table_new(nullptr), nullptr);
}

TEST_F(Tables, FontsAreSet)
{
    std::ofstream(file) << "<fonts><font class='F1' font='Sans:style=Bold' size='24'/></fonts>";
    ea_theme_font_table_h table = ea_theme_font_table_new(file.c_str());
    ASSERT_NE(table, nullptr);
    char *font = nullptr;
    int size = -1;
    EXPECT_FALSE(ea_theme_font_get("F1", &font, &size));
    ea_theme_fonts_set(table);
    EXPECT_TRUE(ea_theme_font_get("F1", &font, &size));
    EXPECT_STREQ(font, "Sans:style=Bold");
    EXPECT_EQ(size, 24);
    free(font);
    ea_theme_font_table_free(table);
}
} // namespace
