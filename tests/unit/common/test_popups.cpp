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

template <int number> void press_cb(void *data, Evas_Object *, void *)
{
    EXPECT_EQ(data, &pressed);
    pressed[number]++;
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
    const auto titled = [this](const char *second) {
        return _velora_common_with_title_btn_popup(ad.win_main, "Title", "Text", press_cb<0>, press_cb<1>, "Yes",
                                                   second, &pressed);
    };
    const struct {
        const char *name;
        Evas_Object *popup;
        int buttons;
        bool by_mouse; // the third mouse button counts as well
        const char *text;
    } cases[] = {
        {"warning", _velora_common_create_warning_popup(ad.win_main, "IDS_A", press_cb<0>, &pressed), 1, true, "IDS_A"},
        {"one button", titled(nullptr), 1, true, "Title"},
        {"two buttons", titled("No"), 2, true, "Text"},
        {"wait", _velora_common_create_processing_popup(ad.win_main, press_cb<0>, &pressed), 0, true, nullptr},
        {"wait with cancel",
         _velora_common_create_processing_popup_with_cancel(ad.win_main, "IDS_B", press_cb<0>, &pressed), 1, false,
         "IDS_B"},
    };
    for (const auto &c : cases)
        evas_object_hide(c.popup);
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        Evas_Object *popup = c.popup;
        evas_object_show(popup);
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

TEST_F(Popups, TheWifiNoticeGoesAwayByItself)
{
    ad.popup = _velora_common_create_one_text_popup_with_timer(ad.win_main, &ad);
    EXPECT_TRUE(shows(wifi_wanted));
    const double start = ecore_time_get();
    EXPECT_TRUE(driver::run_until([this] { return !ad.popup; }, 6.0));
    EXPECT_GE(ecore_time_get() - start, 2.5);

    ad.popup = _velora_common_create_one_text_popup_with_timer(ad.win_main, &ad);
    driver::settle();
    driver::press(ad.win_main, "XF86Back");
    EXPECT_EQ(ad.popup, nullptr) << "and at once by the back key";

    elm_config_access_set(EINA_TRUE);
    ad.popup = _velora_common_create_one_text_popup_with_timer(ad.win_main, &ad);
    EXPECT_EQ(elm_popup_timeout_get(ad.popup), 0.0) << "it waits for a screen reader";
    evas_object_smart_callback_call(ad.popup, "access,read,stop", nullptr);
    EXPECT_EQ(ad.popup, nullptr);
    elm_config_access_set(EINA_FALSE);
}
