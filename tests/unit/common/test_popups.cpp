// Popups as a person meets them: real widgets, real keys and clicks.
#include "driver.h"
#include "fake_app.h"
#include "temp_home.h"
#include "vconf/vconf.h"
#include "velora_common/velora_network.h"
#include "velora_common/velora_popup.h"
#include <gtest/gtest.h>

namespace {
int exits;
int pressed[2];

void first_cb(void *data, Evas_Object *, void *)
{
    EXPECT_EQ(data, &pressed);
    pressed[0]++;
}

void second_cb(void *data, Evas_Object *, void *)
{
    EXPECT_EQ(data, &pressed);
    pressed[1]++;
}
} // namespace

void _velora_app_exit(AppData *)
{
    exits++;
}

namespace {

class Popups : public testing::Test {
  protected:
    void SetUp() override
    {
        driver::start();
        fake_app::clear();
        exits = pressed[0] = pressed[1] = 0;
        ad.win_main = elm_win_add(nullptr, "popups", ELM_WIN_BASIC);
        evas_object_resize(ad.win_main, 480, 800);
        evas_object_show(ad.win_main);
    }
    void TearDown() override
    {
        evas_object_del(ad.win_main);
        driver::settle();
    }
    static Evas_Object *button(Evas_Object *popup, int number)
    {
        return elm_object_part_content_get(popup, ("button" + std::to_string(number)).c_str());
    }
    bool shows(const std::string &text)
    {
        driver::settle();
        return ("\n" + driver::read_texts(ad.win_main)).find("\n" + text + "\n") != std::string::npos;
    }

    TempHome home;
    LogCatcher log;
    AppData ad;
};

constexpr const char *mobile_off = "IDS_CLOUD_POP_MOBILE_DATA_IS_DISABLED_CONNECT_TO_WI_FI_NETWORK_INSTEAD_OR_ENABLE_"
                                   "MOBILE_DATA_AND_TRY_AGAIN";
constexpr const char *wifi_wanted = "IDS_CLOUD_BODY_WI_FI_CONNECTION_REQUIRED_CONNECT_TO_WI_FI_NETWORK_AND_TRY_AGAIN";

} // namespace

TEST_F(Popups, NetworkCheckExplainsWhatIsMissing)
{
    const struct {
        const char *connection;
        int result, quiet_result;
        const char *body; // null: no popup
        int buttons;
    } cases[] = {
        {"wifi", 1, 1, nullptr, 0},
        {"wifi:flight_mode", 1, 1, nullptr, 0},
        {"cellular", 1, 1, nullptr, 0},
        {"none:flight_mode", 0, 0, mobile_off, 3},
        {"none:roaming_off", 0, 0, mobile_off, 3},
        {"none:call_only", 0, 0, mobile_off, 3},
        {"none:out_of_service", 0, 0, wifi_wanted, 2},
        {"none:available", 0, 0, wifi_wanted, 2},
        {"unreadable", 1, 0, nullptr, 0}, // a manager that cannot say is not taken for an outage
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.connection);
        ASSERT_EQ(vconf_set_str("memory/connection/type", c.connection), 0);
        EXPECT_EQ(_velora_common_check_network_without_popup(&ad), c.quiet_result);
        EXPECT_EQ(_velora_common_check_network(&ad), c.result);
        ASSERT_EQ(ad.popup != nullptr, c.body != nullptr);
        for (int i = 1; ad.popup && i <= 3; i++)
            EXPECT_EQ(button(ad.popup, i) != nullptr, i <= c.buttons) << i;
        if (c.body) {
            EXPECT_TRUE(shows("IDS_CLOUD_HEADER_NO_NETWORK_CONNECTION"));
            EXPECT_TRUE(shows(c.body)) << driver::read_texts(ad.win_main);
        }
        _velora_app_popup_delete(&ad);
    }
    EXPECT_EQ(_velora_common_check_network(nullptr), 0);
}

TEST_F(Popups, NetworkButtonsLeadToTheSettings)
{
    const struct {
        const char *connection;
        int button;                     // 0: the back key
        const char *operation, *app_id; // of what is launched; null: none
        bool launches = true;
    } cases[] = {
        {"none", 1, nullptr, nullptr, false},
        {"none", 0, nullptr, nullptr, false},
        {"none", 2, APP_CONTROL_OPERATION_SETTING_WIFI, nullptr},
        {"none:flight_mode", 2, APP_CONTROL_OPERATION_SETTING_WIFI, nullptr},
        {"none:flight_mode", 3, nullptr, "setting-flightmode-efl"},
        {"none:roaming_off", 3, APP_CONTROL_OPERATION_SETTING_MOBILE_NETWORK, "setting-network-efl"},
        {"none:call_only", 3, APP_CONTROL_OPERATION_SETTING_MOBILE_NETWORK, "setting-network-efl"},
    };
    for (const auto &c : cases) {
        for (const bool welcome : {false, true}) {
            SCOPED_TRACE(testing::Message() << c.connection << " button " << c.button << " welcome " << welcome);
            fake_app::clear();
            exits = 0;
            ad.is_welcome_shown = welcome;
            ASSERT_EQ(vconf_set_str("memory/connection/type", c.connection), 0);
            ASSERT_EQ(_velora_common_check_network(&ad), 0);
            driver::settle();
            if (!c.button)
                driver::press(ad.win_main, "XF86Back");
            EXPECT_TRUE(!c.button || driver::click(button(ad.popup, c.button)));
            EXPECT_EQ(ad.popup, nullptr);
            EXPECT_EQ(exits, welcome ? 0 : 1);
            ASSERT_EQ(fake_app::sent().size(), c.launches ? 1u : 0u);
            if (!c.launches)
                continue;
            char *operation = nullptr, *app_id = nullptr;
            app_control_get_operation(fake_app::sent()[0].request, &operation);
            app_control_get_app_id(fake_app::sent()[0].request, &app_id);
            EXPECT_STREQ(operation, c.operation);
            EXPECT_STREQ(app_id, c.app_id);
            free(operation);
            free(app_id);
        }
    }
}

TEST_F(Popups, BackAndTheThirdMouseButtonDoWhatTheFirstButtonDoes)
{
    using Builder = Evas_Object *(*)(Evas_Object *);
    const struct {
        const char *name;
        Builder build;
        int buttons;
        bool by_mouse; // the third mouse button counts as well
        const char *text;
    } cases[] = {
        {"warning",
         [](Evas_Object *win) { return _velora_common_create_warning_popup(win, "IDS_A", first_cb, &pressed); }, 1,
         true, "IDS_A"},
        {"one button",
         [](Evas_Object *win) {
             return _velora_common_with_title_btn_popup(win, "Title", "Text", first_cb, second_cb, "Yes", nullptr,
                                                        &pressed);
         },
         1, true, "Title"},
        {"two buttons",
         [](Evas_Object *win) {
             return _velora_common_with_title_btn_popup(win, "Title", "Text", first_cb, second_cb, "Yes", "No",
                                                        &pressed);
         },
         2, true, "Text"},
        {"wait", [](Evas_Object *win) { return _velora_common_create_processing_popup(win, first_cb, &pressed); }, 0,
         true, nullptr},
        {"wait with cancel",
         [](Evas_Object *win) {
             return _velora_common_create_processing_popup_with_cancel(win, "IDS_B", first_cb, &pressed);
         },
         1, false, "IDS_B"},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        Evas_Object *popup = c.build(ad.win_main);
        ASSERT_NE(popup, nullptr);
        driver::settle();
        EXPECT_TRUE(!c.text || shows(c.text)) << driver::read_texts(ad.win_main);
        for (int i = 1; i <= 3; i++)
            EXPECT_EQ(button(popup, i) != nullptr, i <= c.buttons) << i;
        pressed[0] = pressed[1] = 0;
        driver::press(ad.win_main, "XF86Back");
        EXPECT_EQ(pressed[0], 1) << "back";
        if (c.by_mouse) {
            EXPECT_TRUE(driver::click(popup, 2));
            EXPECT_EQ(pressed[0], 1) << "second mouse button";
            EXPECT_TRUE(driver::click(popup, 3));
            EXPECT_EQ(pressed[0], 2) << "third mouse button";
        }
        for (int i = 1; i <= c.buttons; i++) {
            pressed[0] = pressed[1] = 0;
            EXPECT_TRUE(driver::click(button(popup, i)));
            EXPECT_EQ(pressed[i - 1], 1) << i;
            EXPECT_EQ(pressed[2 - i], 0) << i;
        }
        evas_object_del(popup);
    }
}

TEST_F(Popups, WithoutACallbackOnlyTheThirdMouseButtonCloses)
{
    Evas_Object *popup = _velora_common_create_processing_popup(ad.win_main, nullptr, nullptr);
    ad.popup = popup;
    evas_object_event_callback_add(
        popup, EVAS_CALLBACK_DEL,
        [](void *data, Evas *, Evas_Object *, void *) { static_cast<AppData *>(data)->popup = nullptr; }, &ad);
    driver::settle();
    driver::press(ad.win_main, "Escape");
    ASSERT_NE(ad.popup, nullptr);
    EXPECT_TRUE(driver::click(popup, 3));
    EXPECT_EQ(ad.popup, nullptr);

    popup = _velora_common_create_processing_popup_with_cancel(ad.win_main, "IDS_B", nullptr, nullptr);
    driver::settle();
    driver::press(ad.win_main, "Escape");
    EXPECT_EQ(button(popup, 1), nullptr);
    evas_object_del(popup);
}

TEST_F(Popups, TheWifiNoticeGoesAwayByItself)
{
    const struct {
        const char *how;
        bool reader;
        double least, most; // seconds until it is gone
        std::function<void(Evas_Object *)> act;
    } cases[] = {
        {"time", false, 2.5, 6.0, nullptr},
        {"back", false, 0.0, 1.0, [this](Evas_Object *) { driver::press(ad.win_main, "XF86Back"); }},
        {"read out", true, 0.0, 1.0,
         [](Evas_Object *popup) { evas_object_smart_callback_call(popup, "access,read,stop", nullptr); }},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.how);
        elm_config_access_set(c.reader);
        ad.popup = _velora_common_create_one_text_popup_with_timer(ad.win_main, &ad);
        EXPECT_EQ(elm_popup_timeout_get(ad.popup), c.reader ? 0.0 : 3.0);
        EXPECT_TRUE(shows(wifi_wanted));
        const double start = ecore_time_get();
        if (c.act)
            c.act(ad.popup);
        EXPECT_TRUE(driver::run_until([this] { return !ad.popup; }, c.most));
        EXPECT_GE(ecore_time_get() - start, c.least);
        elm_config_access_set(EINA_FALSE);
    }
}

TEST_F(Popups, LandscapeIsAQuarterTurn)
{
    for (const int rotation : {0, 90, 180, 270}) {
        elm_win_rotation_set(ad.win_main, rotation);
        EXPECT_EQ(_velora_common_get_landscape_mode(ad.win_main), rotation % 180 != 0) << rotation;
    }
    EXPECT_EQ(_velora_common_get_landscape_mode(nullptr), 0);
}
