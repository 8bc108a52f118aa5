// The sign-in page over a fake web view and a fake service: every step, what may go wrong at each, and what is left.
#include "fake_ewk.h"
#include "upload_page.h"
#include "velora_add_account_content_sync/signin_record.h"
#include "velora_common/velora_account.h"
#include "velora_common/velora_pages.h"
#include "velora_details_content_sync/details_record.h"

namespace {

constexpr const char *web = "https://velora.example.org";
const std::string callback = std::string(web) + "/auth_complete";

class Signin : public UploadPage {
  protected:
    void SetUp() override
    {
        UploadPage::SetUp();
        forget_account();
        fake_ewk::clear();
        vconf_set_str("db/menu_widget/language", "de_DE.UTF-8");
    }
    void TearDown() override
    {
        EXPECT_EQ(signin::s_vd, nullptr);
        EXPECT_EQ(fake_ewk::live_views(), 0);
        UploadPage::TearDown();
    }
    static void forget_account()
    {
        fake_cloud_sign_in("");
        fake_cloud_revoke_tokens();
        _velora_common_account_remove_info_from_db();
    }
    static void run(const std::function<void()> &script)
    {
        Application::run([&script] {
            script();
            if (app && app->win_main)
                _velora_app_exit(app);
            seen_run.reset();
            driver::settle();
        });
    }
    static void request(const Wish &wish)
    {
        Application::request(wish);
        app = signin::s_vd ? signin::s_vd->ad : s_vd ? s_vd->ad : app;
        driver::settle();
    }
    static void add()
    {
        request({.operation = APP_CONTROL_OPERATION_ACCOUNT_ADD, .sender = "settings"});
    }
    void share(const std::vector<std::string> &names)
    {
        request({.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .paths = locals(names), .sender = "gallery"});
    }
    // The service's first page is on screen.
    static bool is_page_there()
    {
        return wait_for([] {
            int x = 0; // the page may still be on its way in
            if (signin::s_vd && signin::s_vd->web_view)
                evas_object_geometry_get(signin::s_vd->web_view, &x, nullptr, nullptr, nullptr);
            return signin::s_vd && !fake_ewk::seen().address.empty() && !app->popup && x == 0;
        });
    }
    static bool has_popup(const char *topic)
    {
        return wait_for([=] { return app->popup && std::string(app->popup_owner.topic) == topic; });
    }
    static bool popup_says(const std::string &words)
    {
        return driver::read_texts(app->popup).find(words) != std::string::npos;
    }
    static bool press(int number)
    {
        return app->popup &&
               driver::click(elm_object_part_content_get(app->popup, ("button" + std::to_string(number)).c_str()));
    }
    // A form is sent, and this comes of it.
    static void send(fake_ewk::Answer answer)
    {
        fake_ewk::site([answer](const std::string &) { return answer; });
        fake_ewk::navigate(std::string(web) + "/1/oauth/authorize");
    }
    // Done; a page on its way in takes no clicks.
    static bool upload()
    {
        for (int i = 0; i < 20; i++)
            if (UploadPage::press_done() && wait_for([] { return s_vd->phase != PHASE_BROWSING; }, 0.5))
                return true;
        return false;
    }
    // Done of the settings that follow a sign-in.
    static bool press_done()
    {
        const auto is_there = [] { return !signin::s_vd && details::s_vd; };
        for (int i = 0; i < 40 && wait_for(is_there); i++) {
            Evas_Object *bar = elm_object_item_part_content_get(details::s_vd->nf_item, "toolbar");
            driver::click(driver::find_text(bar, "Done")); // in vain while the page is on its way in
            if (wait_for([&] { return !is_there(); }, 0.2))
                return true;
        }
        return false;
    }
    static void approve()
    {
        fake_cloud_approve("someone@example.org");
        fake_ewk::navigate(callback + "?oauth_token=t&uid=1");
    }
    static bool press_back()
    {
        driver::press(app->win_main, "XF86Back");
        return true;
    }
    static bool is_left()
    {
        return wait_for([] { return !app->win_main; });
    }
    // What the device, its client and the service know of accounts: "record credentials tokens".
    static std::string accounts()
    {
        AccountInfo *info = nullptr;
        std::string all = __velora_check_account_exist(VELORA_PACKAGE, &info) == 0 ? info->user_name : "-";
        __velora_account_info_free(info);
        char *email = nullptr;
        all += cloud_content_sync_account_get_email("Velora", &email) == 0 ? std::string(" ") + email : " -";
        std::free(email);
        return all + " " + std::to_string(fake_cloud_live_tokens());
    }
};

const std::string nobody = "- - 0", somebody = "someone@example.org someone@example.org 1";

} // namespace

TEST_F(Signin, MakesAnAccountAndGoesOn)
{
    const struct {
        const char *name;
        Wish wish;
        Texts files;
    } cases[] = {
        {"settings", {.operation = APP_CONTROL_OPERATION_ACCOUNT_ADD}, {}},
        {"launch mode", {.launch_mode = "Velora_Signin"}, {}},
        {"icon", {}, {}},
        {"share", {.operation = APP_CONTROL_OPERATION_MULTI_SHARE}, {"a.txt", "b.txt"}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);

        forget_account();
        fake_ewk::clear();
        run([&] {
            Wish wish = c.wish;
            wish.paths = locals(c.files);
            fake_cloud_hold(true);
            request(wish);
            ASSERT_TRUE(has_popup("wait"));
            EXPECT_TRUE(popup_says("Loading"));
            fake_cloud_hold(false);
            ASSERT_TRUE(is_page_there());
            EXPECT_EQ(fake_ewk::seen().cookies_cleared, 1);
            send({});
            approve();
            ASSERT_TRUE(wait_for([] { return !signin::s_vd; }));
            driver::settle();
            EXPECT_EQ(accounts(), somebody);
            EXPECT_EQ(fake_ewk::live_views(), 0);
            ASSERT_TRUE(press_done());
            if (c.files.empty()) {
                EXPECT_TRUE(is_left());
                return;
            }
            ASSERT_TRUE(upload());
            ASSERT_TRUE(wait_for(is_over));
            EXPECT_EQ(rows(), (Texts{"uploaded a.txt", "uploaded b.txt"}));
        });
    }
}

TEST_F(Signin, OpensTheServicesPageInThePersonsLanguage)
{
    const std::string escaped = "https%3A%2F%2Fvelora.example.org%2Fauth_complete";
    for (const auto &[language, locale] : std::map<std::string, std::string>{
             {"de_DE.UTF-8", "de_DE"}, {"ko_KR", "ko_KR"}, {"", "en_US"}, {".UTF-8", ""}}) {
        SCOPED_TRACE(language);
        vconf_set_str("db/menu_widget/language", language.c_str());
        for (const bool is_signin : {true, false}) {
            fake_ewk::clear();
            run([&] {
                fake_cloud_hold(true);
                add();
                signin::s_vd->is_signin = is_signin;
                fake_cloud_hold(false);
                ASSERT_TRUE(is_page_there());
                const std::string token = signin::s_vd->request_token;
                const std::string page = std::string(web) + "/1/oauth/authorize?oauth_token=" + token;
                const std::string cont = taken(
                    g_uri_escape_string((page + "&oauth_callback=" + escaped + "&cl=" + locale).c_str(), "/", TRUE));
                EXPECT_EQ(fake_ewk::seen().address, is_signin
                                                        ? page + "&oauth_callback=" + callback + "&locale=" + locale
                                                        : std::string(web) + "/m/register?cl=" + locale +
                                                              "&signup_data=velora-device&cont=" + cont);
            });
        }
    }
}

TEST_F(Signin, NothingIsLeftOfOneThatFails)
{
    const auto at_page = [] { return is_page_there(); };
    const auto at_start = [] { return true; };
    const auto send_in_vain = [] { send({fake_ewk::Answer::hang}); };
    const struct {
        const char *name;
        std::function<void()> before; // the request
        std::function<bool()> reach;
        std::function<void()> fail;
        const char *says = "Something went wrong on the server";
        int button = 1;              // 0: the back key
        const char *seconds = "100"; // that a page may take
    } cases[] = {
        {"no client", [] { fake_cloud_fail_create(CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE); }, at_start, {}},
        {"no request token", [] { fake_cloud_fail_auth(1, CLOUD_CONTENT_SYNC_ERROR_NETWORK); }, at_start, {}},
        {"no web view", fake_ewk::refuse_views, at_start, {}},
        {"not allowed after all", {}, at_page, [] { fake_ewk::navigate(callback + "?oauth_token=t"); }},
        {"no e-mail", [] { fake_cloud_fail_auth(2, CLOUD_CONTENT_SYNC_ERROR_SERVER); }, at_page, approve},
        {"the service's home", {}, at_page, [] { fake_ewk::navigate(std::string(web) + "/m"); }},
        {"web process killed", {}, at_page, fake_ewk::crash},
        {"web process killed on the way",
         {},
         at_page,
         [&] {
             send_in_vain();
             fake_ewk::crash();
         }},
        {"no place for the account",
         {},
         at_page,
         [this] { // the device's database is no file any more
             std::filesystem::rename(home.path + "/accounts.db", home.path + "/kept.db");
             std::filesystem::create_directory(home.path + "/accounts.db");
             approve();
         }},
        {"no place for the credentials",
         {},
         at_page,
         [this] {
             std::filesystem::create_directories(home.path + "/cloud/Velora.credentials/full");
             approve();
         }},
        {"certificate",
         {},
         at_page,
         [] {
             send({fake_ewk::Answer::error, "", EWK_ERROR_CERTIFICATE});
         },
         "could not prove"},
        {"network",
         {},
         at_page,
         [] {
             send({fake_ewk::Answer::error, "", EWK_ERROR_NETWORK});
         },
         "does not answer"},
        {"network, and back",
         {},
         at_page,
         [] {
             send({fake_ewk::Answer::error, "", EWK_ERROR_NETWORK});
         },
         "does not answer",
         0},
        {"a page that never comes", {}, at_page, send_in_vain, "Something went wrong", 1, "0.2"},
        {"back on such a page", {}, at_page, send_in_vain, "Processing", 0},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);

        fake_app::clear();
        fake_ewk::clear();
        setenv("VELORA_PAGE_LOAD_SECONDS", c.seconds, 1);
        run([&] {
            if (c.before)
                c.before();
            add();
            ASSERT_TRUE(c.reach());
            if (c.fail)
                c.fail();
            ASSERT_TRUE(wait_for([&] { return app->popup && popup_says(c.says); }))
                << driver::read_texts(app->win_main);
            if (c.button)
                ASSERT_TRUE(press(c.button));
            else
                press_back();
            EXPECT_TRUE(is_left());
        });
        std::filesystem::remove_all(home.path + "/cloud/Velora.credentials");
        if (std::filesystem::exists(home.path + "/kept.db")) {
            std::filesystem::remove(home.path + "/accounts.db");
            std::filesystem::rename(home.path + "/kept.db", home.path + "/accounts.db");
        }
        EXPECT_EQ(accounts(), nobody);
        EXPECT_EQ(answers(), Texts{"settings canceled"});
    }
}

TEST_F(Signin, LeavesUploadsAndTheirAccountAlone)
{
    const struct {
        const char *name;
        std::function<bool()> reach, leave;
    } cases[] = {
        {"back on the first wait", [] { return has_popup("wait"); }, press_back},
        {"back on the page, which is on its way in", [] { return is_page_there(); }, press_back},
        {"back while the account is asked for",
         [] {
             if (!is_page_there())
                 return false;
             approve();
             return has_popup("wait") && wait_for([] { return fake_cloud_live_tokens() == 2; });
         },
         press_back},
        {"declined", [] { return is_page_there(); },
         [] {
             fake_ewk::navigate(callback + "?not_approved=true");
             return true;
         }},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        fake_cloud_reset();
        fake_cloud_add_folder("/Alpha");
        fake_cloud_sign_in("someone@example.org");
        fake_cloud_refresh_now();
        fake_app::clear();
        fake_ewk::clear();
        run([&] {
            share({"a.txt", "b.txt"});
            fake_cloud_set_delay(300); // a step: the files take two seconds
            ASSERT_TRUE(upload());
            ASSERT_TRUE(wait_for([] { return the_run() && !fake_cloud_upload_log().empty(); }));
            add();
            ASSERT_TRUE(c.reach());
            EXPECT_TRUE(c.leave());
            ASSERT_TRUE(wait_for([] { return !signin::s_vd; }));
            EXPECT_TRUE(app->win_main && evas_object_visible_get(app->win_main));
            EXPECT_EQ(app->popup, nullptr);
            fake_cloud_set_delay(0);
            ASSERT_TRUE(wait_for(is_over));
            EXPECT_EQ(rows(), (Texts{"uploaded a.txt", "uploaded b.txt"}));
            EXPECT_TRUE(wait_for([] { return accounts() == somebody; })) << accounts(); // while the client lives on
        });
        EXPECT_EQ(answers(), (Texts{"gallery succeeded", "settings canceled"}));
    }
}

TEST_F(Signin, OtherRequestsInTheMiddleLoseNothing)
{
    const auto before_page = [] { return true; };
    const auto at_page = [] { return is_page_there(); };
    for (const auto &reach : {std::function<bool()>(before_page), std::function<bool()>(at_page)}) {
        forget_account();
        fake_app::clear();
        fake_ewk::clear();
        run([&] {
            share({"a.txt"});
            ASSERT_TRUE(reach());
            request({.sender = "icon"});
            add();
            share({"b.txt"});
            ASSERT_TRUE(is_page_there());
            EXPECT_EQ(fake_ewk::live_views(), 1);
            approve();
            ASSERT_TRUE(press_done());
            ASSERT_TRUE(upload());
            ASSERT_TRUE(wait_for(is_over));
            EXPECT_EQ(rows().size(), 2u);
        });
        EXPECT_EQ(accounts(), somebody);
        EXPECT_EQ(answers(), (Texts{"gallery succeeded", "gallery succeeded", "icon canceled", "settings canceled"}));
    }
}

TEST_F(Signin, GivenUpAndAskedForAtOnceBeginsAnew)
{
    run([&] {
        fake_cloud_hold(true);
        share({"a.txt"});
        ASSERT_TRUE(has_popup("wait"));
        press_back();
        share({"b.txt"});
        EXPECT_TRUE(evas_object_visible_get(app->win_main));
        fake_cloud_hold(false);
        ASSERT_TRUE(is_page_there());
        approve();
        ASSERT_TRUE(press_done());
        ASSERT_TRUE(upload());
        ASSERT_TRUE(wait_for(is_over));
        EXPECT_EQ(rows(), Texts{"uploaded b.txt"});
    });
    EXPECT_EQ(accounts(), somebody);
    EXPECT_EQ(answers(), (Texts{"gallery succeeded", "gallery succeeded"}));
}

TEST_F(Signin, AShareWhileTheAccountIsRemovedGetsAnAccountAgain)
{
    for (const bool is_told : {false, true}) { // before the notice, and while it is on screen
        forget_account();
        fake_cloud_remove("/a.txt");
        fake_cloud_sign_in("someone@example.org");
        fake_cloud_refresh_now();
        fake_ewk::clear();
        run([&] {
            request({.operation = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE, .sender = "settings"});
            app = details::s_vd->ad;
            fake_cloud_hold(!is_told);
            _velora_common_add_account_with_popup_signout(app);
            ASSERT_TRUE(wait_for([&] { return app->popup && popup_says(is_told ? "signed out" : "Removing"); }));
            ASSERT_TRUE(wait_for([] { return accounts().find("example.org 1") == std::string::npos; }));
            share({"a.txt"});
            fake_cloud_hold(false);
            ASSERT_TRUE(is_page_there());
            approve();
            ASSERT_TRUE(press_done());
            ASSERT_TRUE(upload());
            ASSERT_TRUE(wait_for(is_over));
            EXPECT_EQ(rows(), Texts{"uploaded a.txt"});
        });
        EXPECT_EQ(accounts(), somebody);
    }
}

TEST_F(Signin, TheSameAccountTwiceIsOneAndAnotherOneTakesItsPlace)
{
    for (const std::string email : {"someone@example.org", "someone@example.org", "other@example.org"}) {
        SCOPED_TRACE(email);
        fake_ewk::clear();
        run([&] {
            add();
            ASSERT_TRUE(is_page_there());
            fake_cloud_approve(email);
            fake_ewk::navigate(callback);
            ASSERT_TRUE(wait_for([] { return !signin::s_vd; }));
        });
        EXPECT_EQ(accounts(), email + " " + email + " 1");
    }
}

TEST_F(Signin, WhatWasBrokenOffIsBroughtToItsEnd)
{
    // killed before the record was written, and before it was taken away
    fake_cloud_sign_in("someone@example.org");
    _velora_common_account_settle();
    EXPECT_EQ(accounts(), somebody);
    forget_account();
    add_account();
    _velora_common_account_settle();
    EXPECT_EQ(accounts(), nobody);
}

TEST_F(Signin, FilesThatARevokedTokenStoppedGoOnAfterwards)
{
    fake_cloud_sign_in("someone@example.org");
    fake_cloud_refresh_now();
    run([&] {
        share({"a.txt", "b.txt"});
        fake_cloud_hold(true);
        ASSERT_TRUE(upload());
        ASSERT_TRUE(wait_for([] { return the_run() && !fake_cloud_upload_log().empty(); }));
        fake_cloud_revoke_tokens();
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for([] { return is_over() && app->popup; }));
        EXPECT_EQ(rows(), (Texts{"failed a.txt", "failed b.txt"}));
        EXPECT_TRUE(wait_for([] { return popup_says("You have been signed out"); })) << driver::read_texts(app->popup);
        ASSERT_TRUE(press(2));
        ASSERT_TRUE(is_page_there());
        approve();
        ASSERT_TRUE(
            wait_for([] { return !signin::s_vd && is_over() && !rows().empty() && rows()[1] == "uploaded b.txt"; }));
        EXPECT_EQ(rows(), (Texts{"uploaded a.txt", "uploaded b.txt"}));

        fake_cloud_revoke_tokens();
        fake_ewk::clear();
        share({"c.txt"});
        ASSERT_TRUE(wait_for([] { return __state_shown(s_vd) == VIEW_STATE_SIGNED_OUT; }));
        ASSERT_TRUE(driver::click(driver::find_text(app->win_main, "Sign in")));
        ASSERT_TRUE(is_page_there());
        fake_cloud_sign_in(""); // another program: the next share finds no account and joins
        share({"d.txt"});
        approve();
        ASSERT_TRUE(press_done());
        ASSERT_TRUE(wait_for([] { return __state_shown(s_vd) == VIEW_STATE_NONE; }));
        ASSERT_TRUE(upload());
        ASSERT_TRUE(wait_for(is_over));
        EXPECT_EQ(rows(), (Texts{"uploaded c.txt", "uploaded d.txt"}));
    });
    EXPECT_EQ(accounts(), somebody);
}

TEST_F(Signin, AMenuHasNoLinksAndAWindowIsTheTerms)
{
    run([&] {
        add();
        ASSERT_TRUE(is_page_there());
        using enum Ewk_Context_Menu_Item_Tag;
        const auto left = fake_ewk::context_menu(
            {EWK_CONTEXT_MENU_ITEM_TAG_OPEN_LINK_IN_NEW_WINDOW, EWK_CONTEXT_MENU_ITEM_TAG_COPY,
             EWK_CONTEXT_MENU_ITEM_TAG_DOWNLOAD_LINK_TO_DISK, EWK_CONTEXT_MENU_ITEM_TAG_COPY_LINK_TO_CLIPBOARD,
             EWK_CONTEXT_MENU_ITEM_TAG_SEARCH_WEB, EWK_CONTEXT_MENU_ITEM_TAG_PASTE});
        EXPECT_EQ(left, (std::vector{EWK_CONTEXT_MENU_ITEM_TAG_COPY, EWK_CONTEXT_MENU_ITEM_TAG_PASTE}));
        fake_ewk::open_window("https://elsewhere.example/");
        ASSERT_TRUE(wait_for([] { return !fake_app::sent().empty(); }));
        char *uri = nullptr, *id = nullptr;
        app_control_get_uri(fake_app::sent()[0].request, &uri);
        app_control_get_app_id(fake_app::sent()[0].request, &id);
        EXPECT_EQ(taken(uri), std::string(web) + "/terms");
        EXPECT_EQ(taken(id), "com.orvant.browser");
    });
}
