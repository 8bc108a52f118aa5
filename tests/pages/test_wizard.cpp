// The first-boot wizard over a fake service: every way through it, and what the caller hears. A way is a row of steps;
// a step that is not a verb is a tap on what shows that text.
#include "fake_ewk.h"
#include "upload_page.h"
#include "velora_add_account_content_sync/signin_record.h"
#include "velora_common/velora_account.h"

namespace {

const std::string web = "https://velora.example.org";

class Wizard : public UploadPage {
  protected:
    void SetUp() override
    {
        UploadPage::SetUp();
        forget_account();
        fake_ewk::clear();
    }
    static void forget_account()
    {
        fake_cloud_sign_in("");
        fake_cloud_revoke_tokens();
        _velora_common_account_remove_info_from_db();
    }
    static AppData *ad()
    {
        return static_cast<AppData *>(fake_app::user_data());
    }
    static void run(const std::function<void()> &script)
    {
        Application::run([&script] {
            script();
            if (ad()->win_main)
                _velora_app_exit(ad());
            seen_run.reset();
            driver::settle();
        });
    }
    static Evas_Object *shown(const std::string &text)
    {
        return ad()->win_main ? driver::find_text(ad()->win_main, text) : nullptr;
    }
    // It is there, on a page that is not on its way in, for that one takes no clicks.
    static bool wait_shown(const std::string &text)
    {
        for (int i = 0; i < 100; i++) {
            driver::settle(); // rows have their widgets once they are drawn
            const Evas_Object *found = shown(text), *one = found;
            while (one && !evas_object_freeze_events_get(one))
                one = evas_object_smart_parent_get(one);
            if (found && !one)
                return true;
            driver::run_until([] { return false; }, 0.05);
        }
        return false;
    }
    static bool is_at_service()
    {
        return wait_for([] {
            int x = -1; // the page may still be on its way in
            if (signin::s_vd && signin::s_vd->web_view)
                evas_object_geometry_get(signin::s_vd->web_view, &x, nullptr, nullptr, nullptr);
            return x == 0 && !fake_ewk::seen().address.empty() && !ad()->popup;
        });
    }
    static bool approve()
    {
        if (!is_at_service())
            return false;
        fake_cloud_approve("ann@example.com");
        fake_ewk::navigate(web + "/auth_complete?oauth_token=t&uid=1");
        return wait_for([] { return !signin::s_vd; });
    }
    bool step(const std::string &what)
    {
        const std::map<std::string, Wish> requests = {
            {"open", {.launch_mode = "Setup_Wizard_Velora_Signin", .sender = "wizard"}},
            {"open again", {.launch_mode = "Setup_Wizard_Velora_Signin", .sender = "again"}},
            {"open 2", {.launch_mode = "Setup_Wizard_Velora_Signin2", .sender = "wizard"}},
            {"icon", {.sender = "icon"}},
            {"configure", {.operation = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE, .sender = "settings"}},
            {"share", {.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .sender = "gallery"}},
        };
        if (const auto wanted = requests.find(what); wanted != requests.end()) {
            Wish wish = wanted->second;
            if (what == "share")
                wish.paths = locals({"a.txt"});
            Application::request(wish);
            driver::settle();
        } else if (what == "approve") {
            return approve();
        } else if (what == "signed in" || what == "signed out") { // by another program
            fake_cloud_sign_in(what == "signed in" ? "ann@example.com" : "");
        } else if (what == "offline" || what == "online") {
            vconf_set_str("memory/connection/type", what == "online" ? "wifi" : "none");
        } else if (what == "back") {
            driver::press(ad()->win_main, "XF86Back");
        } else if (what[0] == '?') {
            return wait_shown(what.substr(1));
        } else if (what[0] == '!') {
            return !shown(what.substr(1));
        } else {
            return wait_shown(what) && driver::click(shown(what));
        }
        return true;
    }
    static Texts answers()
    {
        Texts all;
        for (const fake_app::Reply &reply : fake_app::replies()) {
            char *result = nullptr;
            if (reply.reply)
                app_control_get_extra_data(reply.reply, "result", &result);
            all.push_back(reply.sender + " " + (result ? result : reply.reply ? "-" : "none"));
            std::free(result);
        }
        std::ranges::sort(all);
        return all;
    }
    // What is kept for the account: whether camera upload is on, whether over Wi-Fi alone.
    static std::string settings()
    {
        cloud_content_sync_h handle = nullptr;
        bool is_on = false, is_wifi_only = false;
        cloud_content_sync_create("Velora", &handle);
        cloud_content_sync_setting_get_camera_upload(handle, &is_on);
        cloud_content_sync_setting_get_wifi_only_type(handle, CLOUD_CONTENT_TYPE_CAMERA, &is_wifi_only);
        cloud_content_sync_destroy(handle);
        return std::string(is_on ? "on" : "off") + (is_wifi_only ? " wifi" : " any");
    }
};

const char create[] = "Create new account", enable[] = "Enable camera upload", wifi_only[] = "Wi-Fi only";

} // namespace

TEST_F(Wizard, EachWayAnswersAsThePersonLeft)
{
    const struct {
        const char *name;
        Texts steps, answers;
        const char *settings = "off any";
    } cases[] = {
        {"skip", {"open", "Skip"}, {"wizard rbutton_skip"}},
        {"previous", {"open", "Previous"}, {"wizard lbutton_click"}},
        {"back", {"open", "?Skip", "back"}, {"wizard lbutton_click"}},
        {"skip, and again at once",
         {"open", "Skip", "open again", "Previous"},
         {"again lbutton_click", "wizard rbutton_skip"}},
        {"register and enable",
         {"open", create, "approve", wifi_only, enable, "Next"},
         {"wizard rbutton_next"},
         "on wifi"},
        {"sign in and skip", {"open", "Sign in", "approve", wifi_only, "Skip"}, {"wizard rbutton_skip"}},
        {"sign in and back",
         {"open", "Sign in", "approve", "?Upload via", "back", "?ann@example.com", "!Sign in", "Skip"},
         {"wizard rbutton_skip"}},
        {"back from the end",
         {"open", "Sign in", "approve", enable, "?Next", "back", "?Upload via", "back", "?ann@example.com", "back"},
         {"wizard lbutton_click"},
         "on any"},
        {"an account that was there",
         {"signed in", "open", "?ann@example.com", "!Sign in", "Skip"},
         {"wizard rbutton_skip"}},
        {"second page at once, which nobody waits for",
         {"signed in", "open 2", enable, "Next"},
         {"wizard none"},
         "on any"},
        {"no network at first",
         {"open", "offline", create, "Cancel", "?Sign in", "online", "Sign in", "approve", "Skip"},
         {"wizard rbutton_skip"}},
        {"no network after a first look at the sign-in: the popup leaves",
         {"open", "Sign in", "back", "?Skip", "offline", "Sign in", "Cancel"},
         {"wizard -"}},
        {"sign-in given up", {"open", "Sign in", "back", "?Sign in", "Skip"}, {"wizard rbutton_skip"}},
        {"not to be written, then to be written",
         {"open", "Sign in", "approve", wifi_only, "signed out", enable, "?Upload via", "signed in", enable, "Next"},
         {"wizard rbutton_next"},
         "on wifi"},
        {"second request", {"open", "open again", "Skip"}, {"again rbutton_skip", "wizard rbutton_skip"}},
        {"second request, late",
         {"open", "Sign in", "approve", "?Upload via", "open again", enable, "Next"},
         {"again rbutton_next", "wizard rbutton_next"},
         "on any"},
        {"icon", {"open", "icon", "?Skip", "Previous"}, {"icon none", "wizard lbutton_click"}},
        {"settings in the middle",
         {"signed in", "open", "configure", "?Sync schedule", "back", "?ann@example.com", "Skip"},
         {"settings none", "wizard rbutton_skip"}},
        {"share that signs in, and is left",
         {"open", "share", "approve", "?Sync schedule", "Done", "?Upload to", "Cancel", "?ann@example.com", "!Sign in",
          "Skip"},
         {"gallery -", "wizard rbutton_skip"}},
        {"share that joins the sign-in",
         {"open", create, "share", "approve", "?Sync schedule", "Done", "?Upload to", "Cancel", "?Upload via", enable,
          "Next"},
         {"gallery -", "wizard rbutton_next"},
         "on any"},
        {"share on the second page",
         {"open", "Sign in", "approve", "?Upload via", "share", "?Upload to", "Cancel", "?Upload via", "back",
          "?ann@example.com", "Skip"},
         {"gallery -", "wizard rbutton_skip"}},
        {"share of the same sign-in, behind a page that is left first",
         {"open", create, "share", "approve", "?Sync schedule", "Done", "?Upload to", "open again", "Skip",
          "?Upload to", "Cancel"},
         {"again rbutton_skip", "gallery -", "wizard rbutton_skip"}},
        {"share behind a page that is left first",
         {"open", "Sign in", "approve", "?Upload via", "share", "?Upload to", "open again", "Skip", "?Upload to",
          "Cancel"},
         {"again rbutton_skip", "gallery -", "wizard rbutton_skip"}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        fake_cloud_reset();
        fake_cloud_refresh_now();
        forget_account();
        fake_app::clear();
        fake_ewk::clear();
        vconf_set_str("memory/connection/type", "wifi");
        run([&] {
            for (const std::string &one : c.steps)
                ASSERT_TRUE(step(one)) << one << " with\n"
                                       << (ad()->win_main ? driver::read_texts(ad()->win_main) : "");
            EXPECT_TRUE(wait_for([] { return !ad()->win_main; }));
        });
        EXPECT_EQ(answers(), c.answers);
        EXPECT_EQ(settings(), c.settings);
    }
}

TEST_F(Wizard, TheDisclaimerOpensByATapAndByReturn)
{
    run([&] {
        ASSERT_TRUE(step("open"));
        Evas_Object *label = nullptr;
        const auto opens = [&](const char *key, bool is_on_hold = false) {
            elm_object_focus_set(label, EINA_TRUE);
            Evas *evas = evas_object_evas_get(label);
            evas_event_default_flags_set(evas, is_on_hold ? EVAS_EVENT_FLAG_ON_HOLD : EVAS_EVENT_FLAG_NONE);
            driver::press(ad()->win_main, key);
            evas_event_default_flags_set(evas, EVAS_EVENT_FLAG_NONE);
            return ad()->popup && step("OK") && wait_for([] { return !ad()->popup; });
        };
        ASSERT_TRUE(step("Disclaimer"));
        ASSERT_TRUE(step("OK"));
        for (label = shown("Disclaimer"); !elm_object_widget_check(label);)
            label = evas_object_smart_parent_get(label);
        EXPECT_TRUE(opens("Return"));
        EXPECT_TRUE(opens("KP_Enter"));
        EXPECT_FALSE(opens("space"));
        EXPECT_FALSE(opens("Return", true));
        EXPECT_TRUE(driver::read_texts(ad()->win_main).find("50 GB") != std::string::npos);
    });
}

TEST_F(Wizard, TheChoiceThatIsShownIsTheOneThatIsWritten)
{
    fake_cloud_sign_in("ann@example.com");
    run([&] {
        ASSERT_TRUE(step("open 2") && step("Wi-Fi only") && step(enable) && step("?Next"));
        EXPECT_EQ(settings(), "on wifi");
        Evas_Object *list = driver::find_widget(ad()->win_main, "elm_genlist");
        const auto illustration_height = [&list] {
            int height = 0;
            evas_object_geometry_get(elm_object_item_part_content_get(elm_genlist_first_item_get(list), "elm.icon"),
                                     nullptr, nullptr, nullptr, &height);
            return height;
        };
        EXPECT_EQ(illustration_height(), 584); // in a window 480 pixels wide
        ASSERT_TRUE(step("back") && step("?Upload via"));
        list = driver::find_widget(ad()->win_main, "elm_genlist");
        EXPECT_EQ(illustration_height(), 315);
        Elm_Object_Item *any = elm_genlist_nth_item_get(list, 2);
        const auto choice = [&] { // by both radios
            driver::settle();
            const auto is_on = [](Elm_Object_Item *row) {
                Evas_Object *radio = elm_object_part_content_get(elm_object_item_part_content_get(row, "elm.icon.2"),
                                                                 "elm.swallow.content");
                return elm_radio_value_get(radio) == elm_radio_state_value_get(radio);
            };
            return std::string(is_on(any) ? "any" : "") + (is_on(elm_genlist_item_next_get(any)) ? "wifi" : "");
        };
        EXPECT_EQ(choice(), "wifi");
        elm_genlist_realized_items_update(list);
        EXPECT_EQ(choice(), "wifi");
        ASSERT_TRUE(
            driver::click(driver::find_widget(elm_object_item_part_content_get(any, "elm.icon.2"), "elm_radio")));
        EXPECT_EQ(choice(), "any");
        fake_cloud_sign_in(""); // another program
        ASSERT_TRUE(step(enable) && step("?Upload via"));
        EXPECT_TRUE(wait_for([this] { return log.has("The setting could not be saved"); }));
        elm_genlist_realized_items_update(list);
        EXPECT_EQ(choice(), "any");
        fake_cloud_sign_in("ann@example.com");
        ASSERT_TRUE(step(enable) && step("?Next"));
        EXPECT_EQ(settings(), "on any");
    });
}
