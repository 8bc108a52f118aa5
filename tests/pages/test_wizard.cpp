// The first-boot wizard over a fake service: every way through it, and what the caller hears. A way is a row of steps;
// a step that is not a verb is a tap on what shows that text.
#include "fake_ewk.h"
#include "upload_page.h"
#include "velora_add_account_content_sync/signin_record.h"
#include "velora_common/velora_account.h"
#include <regex>

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
    static void request(const Wish &wish)
    {
        Application::request(wish);
        driver::settle();
    }
    static Evas_Object *shown(const std::string &text)
    {
        return ad()->win_main ? driver::find_text(ad()->win_main, text) : nullptr;
    }
    // It is there, on a page that is not on its way in, for that one takes no clicks.
    static bool wait_shown(const std::string &text)
    {
        return wait_for(
            [&] {
                const Evas_Object *found = shown(text), *one = found;
                while (one && !evas_object_freeze_events_get(one))
                    one = evas_object_smart_parent_get(one);
                return found && !one;
            },
            5);
    }
    static bool tap(const std::string &text)
    {
        return wait_shown(text) && driver::click(shown(text));
    }
    static bool approve()
    {
        const auto is_there = [] {
            return signin::s_vd && signin::s_vd->web_view && !fake_ewk::seen().address.empty() && !ad()->popup;
        };
        if (!wait_for(is_there))
            return false;
        fake_cloud_approve("ann@example.com");
        fake_ewk::navigate(web + "/auth_complete?oauth_token=t&uid=1");
        return wait_for([] { return !signin::s_vd; });
    }
    bool step(const std::string &what)
    {
        const std::map<std::string, std::function<bool()>> verbs = {
            {"open", [] { return ask("Setup_Wizard_Velora_Signin", "wizard"); }},
            {"open again", [] { return ask("Setup_Wizard_Velora_Signin", "again"); }},
            {"open 2", [] { return ask("Setup_Wizard_Velora_Signin2", "wizard"); }},
            {"icon", [] { return ask(nullptr, "icon"); }},
            {"share",
             [this] {
                 request({.operation = APP_CONTROL_OPERATION_SHARE,
                          .uri = locals({"a.txt"})[0].c_str(),
                          .sender = "gallery"});
                 return true;
             }},
            {"approve", approve},
            {"signed in",
             [] { // before, and with its record
                 fake_cloud_sign_in("ann@example.com");
                 return true;
             }},
            {"signed out",
             [] {
                 fake_cloud_sign_in("");
                 return true;
             }},
            {"offline", [] { return vconf_set_str("memory/connection/type", "none") == 0; }},
            {"online", [] { return vconf_set_str("memory/connection/type", "wifi") == 0; }},
            {"back",
             [] {
                 driver::settle();
                 driver::press(ad()->win_main, "XF86Back");
                 return true;
             }},
        };
        if (what[0] == '?')
            return wait_shown(what.substr(1));
        if (what[0] == '!')
            return !shown(what.substr(1));
        const auto verb = verbs.find(what);
        return verb == verbs.end() ? tap(what) : verb->second();
    }
    static bool ask(const char *launch_mode, const char *sender)
    {
        request({.launch_mode = launch_mode, .sender = sender});
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
        {"share that signs in, and is left",
         {"open", "share", "approve", "?Upload to", "Cancel", "?ann@example.com", "!Sign in", "Skip"},
         {"gallery -", "wizard rbutton_skip"}},
        {"share that joins the sign-in",
         {"open", create, "share", "approve", "?Upload to", "Cancel", "?Upload via", enable, "Next"},
         {"gallery -", "wizard rbutton_next"},
         "on any"},
        {"share on the second page",
         {"open", "Sign in", "approve", "?Upload via", "share", "?Upload to", "Cancel", "?Upload via", "back",
          "?ann@example.com", "Skip"},
         {"gallery -", "wizard rbutton_skip"}},
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
