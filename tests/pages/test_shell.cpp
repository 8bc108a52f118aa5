// The shell: which page a request opens, and who is answered at the end. Each case is a whole run of the application;
// the pages are stand-ins that write down that they were opened.
#include "account/account.h"
#include "base/base.h"
#include "driver.h"
#include "fake_app.h"
#include "main/velora_pending_pages.h"
#include "notification/notification.h"
#include "temp_home.h"
#include "vconf/vconf.h"
#include "velora_common/velora_popup.h"
#include "velora_common/velora_thread.h"
#include "velora_common/velora_upload_item.h"
#include "velora_upload_file/velora_upload_view.h"
#include <gtest/gtest.h>

#include <utility>

int velora_main(int argc, char **argv);

namespace {
struct Opened {
    std::string page;
    int launch_mode;
    std::vector<std::string> queue;
    bool is_welcome_shown;
};
std::vector<Opened> opened;
AppData *app; // the application's one record
int view_updates, view_ends, view_abandons;

void page_opened(const char *page, AppData *ad)
{
    app = ad;
    Opened one = {page, ad->launch_mode, {}, ad->is_welcome_shown};
    for (GList *entry = ad->upload_list; entry; entry = entry->next)
        one.queue.push_back(static_cast<UploadItem *>(entry->data)->path);
    opened.push_back(one);
}
} // namespace

void _velora_signin_create(AppData *ad, int is_signin)
{
    page_opened(is_signin ? "sign-in" : "registration", ad);
}
void _velora_setupwizard_view_create(AppData *ad)
{
    page_opened("welcome", ad);
    ad->is_welcome_shown = true;
}
void _velora_signin_setupwizard_create(AppData *ad)
{
    page_opened("camera upload", ad);
}
void _velora_details_create(AppData *ad)
{
    page_opened("details", ad);
}
void _velora_upload_view_create(AppData *ad)
{
    page_opened("upload", ad);
}
void _velora_upload_view_update()
{
    view_updates++;
}
void _velora_upload_view_end()
{
    view_ends++;
}
void _velora_upload_view_abandon()
{
    view_abandons++;
}

namespace {

class Shell : public testing::Test {
  protected:
    void SetUp() override
    {
        driver::start();
        platform_package_set(VELORA_PACKAGE);
        vconf_set_str("memory/connection/type", "wifi");
        fake_app::clear();
        opened.clear();
        view_updates = view_ends = view_abandons = 0;
    }
    void TearDown() override
    {
        fake_app::clear();
    }

    static int run(std::function<void()> script)
    {
        char name[] = "velora";
        char *arguments[] = {name, nullptr};
        fake_app::run(std::move(script));
        return velora_main(1, arguments);
    }

    struct Wish {
        const char *operation = nullptr, *launch_mode = nullptr, *uri = nullptr;
        std::vector<const char *> paths;
        const char *display_type = nullptr, *sender = "com.example.sender";
    };
    static void request(const Wish &wish)
    {
        app_control_h request = fake_app::receive(wish.operation, wish.sender);
        app_control_set_uri(request, wish.uri);
        for (const auto &[key, value] :
             {std::pair{"launch_mode", wish.launch_mode}, {"display_type", wish.display_type}})
            if (value)
                app_control_add_extra_data(request, key, value);
        const bool is_result = g_strcmp0(wish.operation, APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD_RESULT) == 0;
        std::vector<const char *> paths = wish.paths;
        app_control_add_extra_data_array(request, is_result ? "path" : APP_CONTROL_DATA_PATH, paths.data(),
                                         static_cast<int>(paths.size()));
        fake_app::request(request);
        app_control_destroy(request);
    }
    static void add_account()
    {
        account_h account = nullptr;
        int id = 0;
        account_connect();
        account_create(&account);
        account_set_user_name(account, "ann@example.com");
        account_insert_to_db(account, &id);
        account_destroy(account);
        account_disconnect();
    }
    // "SENDER RESULT EXTRA" of each reply, in the order in which they were sent.
    static std::vector<std::string> replies()
    {
        std::vector<std::string> all;
        for (const fake_app::Reply &reply : fake_app::replies()) {
            char *result = nullptr;
            if (reply.reply)
                app_control_get_extra_data(reply.reply, "result", &result);
            const CString owned(result);
            all.push_back(reply.sender + (reply.result == APP_CONTROL_RESULT_SUCCEEDED ? " succeeded " : " canceled ") +
                          (result ? result : "-"));
        }
        return all;
    }

    TempHome home;
    LogCatcher log;
};

} // namespace

TEST_F(Shell, OpensThePageThatARequestIsFor)
{
    const std::string prefix = APP_CONTROL_OPERATION_PREFIX;
    const struct {
        Wish wish;
        bool has_account;
        const char *page; // null: none
        int mode;
        std::vector<std::string> queue;
    } cases[] = {
        {{}, false, "details", 0, {}},
        {{.launch_mode = "Velora_Details"}, false, "details", 4, {}},
        {{.launch_mode = "whatever"}, false, "details", 4, {}},
        {{.launch_mode = "velora_signin"}, false, "details", 4, {}},
        {{.launch_mode = "Velora_Signin"}, true, "sign-in", 1, {}},
        {{.launch_mode = "Setup_Wizard_Velora_Signin"}, false, "welcome", 2, {}},
        {{.launch_mode = "Setup_Wizard_Velora_Signin2"}, false, "camera upload", 3, {}},
        {{.operation = "http://example.com/other", .launch_mode = "Velora_Signin"}, false, "sign-in", 1, {}},
        {{.operation = APP_CONTROL_OPERATION_ACCOUNT_ADD, .launch_mode = "Velora_Details"}, true, "sign-in", 5, {}},
        {{.operation = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE}, false, "details", 6, {}},
        {{.operation = APP_CONTROL_OPERATION_SHARE, .uri = "file:///a/b.jpg"}, true, "upload", 7, {"/a/b.jpg"}},
        {{.operation = APP_CONTROL_OPERATION_SHARE, .uri = "/a/b 100%.jpg"}, true, "upload", 7, {"/a/b 100%.jpg"}},
        {{.operation = APP_CONTROL_OPERATION_SHARE, .uri = "/a"}, false, "sign-in", 7, {"/a"}},
        {{.operation = APP_CONTROL_OPERATION_SHARE}, true, "upload", 7, {}},
        {{.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .paths = {"/b", "file:///a", "/b"}},
         true,
         "upload",
         7,
         {"/b", "/a", "/b"}},
        {{.operation = APP_CONTROL_OPERATION_MULTI_SHARE}, true, "upload", 7, {}},
        {{.operation = APP_CONTROL_OPERATION_MULTI_SHARE}, false, "sign-in", 7, {}},
        {{.operation = APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD}, true, nullptr, 0, {}},
        {{.operation = APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD_RESULT, .paths = {"/x"}, .display_type = "fail"},
         true,
         "upload",
         8,
         {"/x"}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(testing::Message() << (c.wish.operation ? c.wish.operation : "no operation") << " "
                                        << (c.wish.launch_mode ? c.wish.launch_mode : ""));
        opened.clear();
        std::filesystem::remove(home.path + "/accounts.db");
        if (c.has_account)
            add_account();
        run([&] {
            request(c.wish);
            ASSERT_EQ(opened.size(), c.page ? 1u : 0u);
            _velora_app_exit(app);
        });
        if (!c.page)
            continue;
        EXPECT_EQ(opened[0].page, c.page);
        EXPECT_EQ(opened[0].launch_mode, c.mode);
        EXPECT_EQ(opened[0].queue, c.queue);
    }
}

TEST_F(Shell, ALaterRequestUsesTheSameWindow)
{
    add_account();
    run([&] {
        request({.launch_mode = "Setup_Wizard_Velora_Signin"});
        Evas_Object *window = app->win_main;
        EXPECT_TRUE(app->is_welcome_shown);
        app->exit_on_pause = 1;
        request({.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .paths = {"/a", "/b"}});
        EXPECT_EQ(app->win_main, window);
        EXPECT_EQ(app->exit_on_pause, 0);
        EXPECT_FALSE(app->is_welcome_shown);
        request({.operation = APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD_RESULT,
                 .paths = {"file:///c"},
                 .display_type = "success"});
        ASSERT_EQ(opened.size(), 3u);
        EXPECT_EQ(opened[2].queue, std::vector<std::string>{"/c"}) << "a result takes the queue's place";
        EXPECT_STREQ(app->display_type, "success");
        ASSERT_EQ(app->result_path_count, 1);
        EXPECT_STREQ(app->result_paths[0], "file:///c");
        _velora_app_exit(app);
    });
}

TEST_F(Shell, AnswersThoseWhoWait)
{
    constexpr const char *share = APP_CONTROL_OPERATION_SHARE, *configure = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE,
                         *notification = APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD,
                         *result = APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD_RESULT;
    const struct {
        const char *name;
        std::vector<Wish> wishes;
        const char *reply_result; // what the page stores
        bool is_settings_waiting;
        const char *failing; // a call of the framework
        std::vector<std::string> replies;
    } cases[] = {
        {"share", {{.operation = share, .sender = "a"}}, nullptr, false, nullptr, {"a succeeded -"}},
        {"wizard",
         {{.launch_mode = "Setup_Wizard_Velora_Signin", .sender = "a"}},
         "rbutton_skip",
         false,
         nullptr,
         {"a succeeded rbutton_skip"}},
        {"settings", {{.operation = configure, .sender = "a"}}, "lbutton_click", false, nullptr, {"a canceled -"}},
        {"settings that wait", {{.operation = configure, .sender = "a"}}, nullptr, true, nullptr, {"a succeeded -"}},
        {"two shares",
         {{.operation = share, .sender = "a"}, {.operation = share, .sender = "b"}},
         nullptr,
         false,
         nullptr,
         {"b succeeded -", "a succeeded -"}},
        {"a share and taps on notifications",
         {{.operation = share, .sender = "a"},
          {.operation = notification, .sender = "n"},
          {.operation = result, .sender = "r"}},
         nullptr,
         false,
         nullptr,
         {"n canceled -", "a succeeded -", "r canceled -"}},
        {"no extra data to be had",
         {{.operation = share, .sender = "a"}},
         "x",
         false,
         "app_control_add_extra_data",
         {"a succeeded -"}},
        {"no reply to be had",
         {{.operation = share, .sender = "a"}},
         "x",
         false,
         "app_control_create",
         {"a canceled -"}},
        {"reply refused",
         {{.operation = share, .sender = "a"}},
         "x",
         false,
         "app_control_reply_to_launch_request",
         {"a canceled -"}},
    };
    add_account();
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        fake_app::clear();
        vconf_set_bool("db/private/ug-setting-cloud/is_exist", c.is_settings_waiting);
        run([&] {
            for (const Wish &wish : c.wishes)
                request(wish);
            app->reply_result = g_strdup(c.reply_result);
            driver::exit_requested();
            if (c.failing)
                fake_app::fail(c.failing, 1, APP_CONTROL_ERROR_OUT_OF_MEMORY);
            _velora_app_exit(app);
            _velora_app_exit(app); // a second one finds nothing left to do
            EXPECT_EQ(app->win_main, nullptr);
            EXPECT_EQ(app->pipe, nullptr);
        });
        EXPECT_EQ(replies(), c.replies);
    }
    _velora_app_exit(nullptr);
    EXPECT_TRUE(log.has("app data is NULL"));
}

TEST_F(Shell, AShareWithoutANetworkLeavesAPopupWhoseCancelExits)
{
    vconf_set_str("memory/connection/type", "none");
    add_account();
    run([&] {
        request({.operation = APP_CONTROL_OPERATION_SHARE, .uri = "/a", .sender = "a"});
        EXPECT_TRUE(opened.empty());
        ASSERT_NE(app->popup, nullptr);
        EXPECT_EQ(app->upload_list, nullptr);
        driver::settle();
        EXPECT_TRUE(driver::click(elm_object_part_content_get(app->popup, "button1")));
        EXPECT_EQ(app->win_main, nullptr);
    });
    EXPECT_EQ(replies(), std::vector<std::string>{"a succeeded -"});
}

TEST_F(Shell, PauseAndTerminateTidyUp)
{
    const int codes[] = {0, 1};
    for (const int exit_on_pause : codes) {
        run([&] {
            request({});
            app->exit_on_pause = exit_on_pause;
            notification_h noti = notification_create(NOTIFICATION_TYPE_ONGOING);
            notification_set_pkgname(noti, VELORA_SHARE_PACKAGE);
            notification_insert(noti, &app->noti_priv_id);
            notification_free(noti);
            fake_app::pause();
            fake_app::resume();
            EXPECT_EQ(app->win_main == nullptr, exit_on_pause != 0);
            if (!exit_on_pause)
                _velora_app_exit(app);
            fake_app::resume(); // after the exit
        });
        EXPECT_EQ(app->noti_priv_id, -1);
        int left = 0;
        notification_foreach(
            nullptr,
            [](notification_h, int, void *data) {
                ++*static_cast<int *>(data);
                return true;
            },
            &left);
        EXPECT_EQ(left, 0);
    }
    EXPECT_GE(view_ends, 2);
    EXPECT_EQ(view_abandons, 2);
}

TEST_F(Shell, HearsThatTheTreeIsRefreshed)
{
    run([&] {
        request({});
        app->popup = _velora_common_create_processing_popup(app->win_main, nullptr, nullptr);
        _velora_common_pipe_send_msg(app->pipe, "something else");
        driver::settle();
        EXPECT_NE(app->popup, nullptr);
        _velora_common_pipe_send_msg(app->pipe, "refresh_meta_done");
        EXPECT_TRUE(driver::run_until([] { return view_updates == 1; }));
        EXPECT_EQ(app->popup, nullptr);
        _velora_app_exit(app);
    });
}
