// The shell: which page a request opens, and who is answered at the end. Each case is a whole run of the application;
// the pages are stand-ins that write down that they were opened.
#include "application.h"
#include "posted.h"
#include "velora_add_account_content_sync_setup_wizard/velora_signin_setupwizard.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_requests.h"
#include "velora_common/velora_upload_item.h"
#include "velora_details_content_sync/velora_details.h"
#include "velora_setup_wizard/velora_setupwizard.h"
#include "velora_upload_file/velora_upload_view.h"
#include "velora_upload_file/velora_uploads.h"

#include <algorithm>

namespace {
struct Opened {
    std::string page;
    int launch_mode;
    std::vector<std::string> queue;
    bool is_welcome_shown;
};
std::vector<Opened> opened;
AppData *app; // the application's one record
int page_ends, page_abandons;
bool is_something_left; // by an earlier process
char pages[16];         // stand for pages by their addresses

void page_opened(const char *page, AppData *ad)
{
    app = ad;
    Opened one = {page, ad->launch_mode, {}, ad->is_welcome_shown};
    for (GList *entry = ad->upload_list; entry; entry = entry->next)
        one.queue.push_back(static_cast<UploadItem *>(entry->data)->path);
    void *stands_for = &pages[opened.size()];
    opened.push_back(one);
    _velora_pages_add(ad, stands_for,
                      {[](void *ended) {
                           page_ends++;
                           _velora_pages_remove(ended);
                       },
                       [](void *) { page_abandons++; }});
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
bool _velora_upload_view_has_left(AppData *)
{
    return is_something_left;
}
void _velora_upload_view_go_on(AppData *ad, void (*later)(AppData *ad))
{
    page_opened(later ? "asks to go on" : "goes on", ad);
}
void _velora_details_create(AppData *ad)
{
    page_opened("details", ad);
}
void _velora_upload_view_create(AppData *ad)
{
    page_opened("upload", ad);
}
void _velora_upload_view_keep_waiting(AppData *) {}
void _velora_upload_view_meta_done() {}

namespace {

constexpr const char *add = APP_CONTROL_OPERATION_ACCOUNT_ADD, *configure = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE,
                     *share = APP_CONTROL_OPERATION_SHARE, *shares = APP_CONTROL_OPERATION_MULTI_SHARE,
                     *tap = APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD,
                     *result_tap = APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD_RESULT;
constexpr const char *wizard = "Setup_Wizard_Velora_Signin";

class Shell : public Application {
  protected:
    Shell()
    {
        opened.clear();
        page_ends = page_abandons = 0;
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
            char **refused = nullptr;
            int count = 0;
            if (reply.reply)
                app_control_get_extra_data_array(reply.reply, "refused", &refused, &count);
            all.push_back(reply.sender +
                          (reply.result == APP_CONTROL_RESULT_SUCCEEDED  ? " succeeded "
                           : reply.result == APP_CONTROL_RESULT_CANCELED ? " canceled "
                                                                         : " failed ") +
                          (count    ? refused[0]
                           : result ? result
                                    : "-"));
            g_strfreev(refused);
        }
        return all;
    }
};

} // namespace

TEST_F(Shell, OpensThePageThatARequestIsFor)
{
    const struct {
        Wish wish;
        bool has_account;
        const char *page; // null: none
        int mode;
        std::vector<std::string> queue;
        bool is_left = false;
    } cases[] = {
        {{}, true, "details", 0, {}},
        {{}, false, "sign-in", 1, {}},
        {{}, true, "asks to go on", 0, {}, true},
        {{}, false, "sign-in", 1, {}, true},
        {{.operation = tap}, true, "goes on", 4, {}, true},
        {{.launch_mode = "velora_signin"}, true, "details", 4, {}},
        {{.launch_mode = "Velora_Signin"}, true, "sign-in", 1, {}},
        {{.launch_mode = wizard}, false, "welcome", 2, {}},
        {{.launch_mode = "Setup_Wizard_Velora_Signin2"}, false, "camera upload", 3, {}},
        {{.operation = "http://example.com/other", .launch_mode = "Velora_Signin"}, false, "sign-in", 1, {}},
        {{.operation = add, .launch_mode = "Velora_Details"}, true, "sign-in", 5, {}},
        {{.operation = configure}, true, "details", 6, {}},
        {{.operation = configure}, false, "sign-in", 1, {}},
        {{.operation = share, .uri = "file:///a/b.jpg"}, true, "upload", 7, {"/a/b.jpg"}},
        {{.operation = share, .uri = "/a/b 100%.jpg"}, true, "upload", 7, {"/a/b 100%.jpg"}},
        {{.operation = share, .uri = "/a"}, false, "sign-in", 7, {"/a"}},
        {{.operation = shares, .paths = {"/b", "file:///a", "/b"}}, true, "upload", 7, {"/b", "/a", "/b"}},
        {{.operation = shares, .paths = {"/b", "/dev/null"}}, true, "upload", 7, {"/b"}},
        {{.operation = shares, .paths = {"/dev/null"}}, true, nullptr, 0, {}},
        {{.operation = tap}, true, nullptr, 0, {}},
        {{.operation = result_tap, .paths = {"/x"}, .display_type = "fail"}, true, "upload", 8, {"/x"}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(testing::Message() << (c.wish.operation ? c.wish.operation : "no operation") << " "
                                        << (c.wish.launch_mode ? c.wish.launch_mode : ""));
        opened.clear();
        is_something_left = c.is_left;
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
        request({.launch_mode = wizard});
        Evas_Object *window = app->win_main;
        EXPECT_TRUE(app->is_welcome_shown);
        app->exit_on_pause = 1;
        request({.operation = shares, .paths = {"/a", "/b"}});
        EXPECT_EQ(app->win_main, window);
        EXPECT_EQ(app->exit_on_pause, 0);
        EXPECT_FALSE(app->is_welcome_shown);
        request({.operation = result_tap, .paths = {"file:///c"}, .display_type = "success"});
        ASSERT_EQ(opened.size(), 3u);
        EXPECT_EQ(opened[2].queue, std::vector<std::string>{"/c"}) << "a result takes the queue's place";
        EXPECT_STREQ(app->display_type, "success");
        ASSERT_EQ(app->result_path_count, 1);
        EXPECT_STREQ(app->result_paths[0], "file:///c");
        _velora_app_exit(app);
    });
}

// So many paths are looked at bit by bit, while the page is there already.
TEST_F(Shell, TellsTheSenderOfALongShareWhatIsRefused)
{
    add_account();
    Wish wish{.operation = shares, .paths = std::vector<std::string>(1100, "/a"), .sender = "a"};
    wish.paths.push_back("/dev/null");
    run([&] {
        request(wish);
        const double end = ecore_time_get() + 0.5; // far more than the looks take, and nothing shows when they are over
        driver::run_until([end] { return ecore_time_get() > end; });
        _velora_app_exit(app);
    });
    EXPECT_EQ(replies(), std::vector<std::string>{"a succeeded /dev/null"});
}

TEST_F(Shell, AnswersThoseWhoWait)
{
    const struct {
        const char *name;
        std::vector<Wish> wishes;
        std::vector<std::string> replies;
        const char *reply_result = nullptr; // what the page stores
        bool is_settings_waiting = false;
    } cases[] = {
        {"share", {{.operation = share, .sender = "a"}}, {"a succeeded -"}},
        {"all refused", {{.operation = share, .uri = "/dev/null", .sender = "a"}}, {"a failed /dev/null"}},
        {"one refused",
         {{.operation = shares, .paths = {"/dev/null", "/a"}, .sender = "a"}},
         {"a succeeded /dev/null"}},
        {"wizard", {{.launch_mode = wizard, .sender = "a"}}, {"a succeeded rbutton_skip"}, "rbutton_skip"},
        {"settings", {{.operation = configure, .sender = "a"}}, {"a canceled -"}, "lbutton_click"},
        {"settings that wait", {{.operation = configure, .sender = "a"}}, {"a succeeded -"}, nullptr, true},
        {"two", {{.operation = share, .sender = "a"}, {.operation = share}}, {"b succeeded -", "a succeeded -"}},
        {"a share, and taps",
         {{.operation = share, .sender = "a"}, {.operation = tap}, {.operation = result_tap, .sender = "r"}},
         {"b canceled -", "r canceled -", "a succeeded -"}},
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
            _velora_app_exit(app);
            _velora_app_exit(app); // a second one finds nothing left to do
            EXPECT_EQ(app->win_main, nullptr);
            EXPECT_EQ(app->pipe, nullptr);
        });
        EXPECT_EQ(replies(), c.replies);
    }
}

TEST_F(Shell, WithoutANetworkAPopupLeadsToTheSettings)
{
    const struct {
        const char *connection;
        int button;                                         // 0: the back key
        const char *operation = nullptr, *app_id = nullptr; // of what is launched
    } cases[] = {
        {"none:out_of_service", 0},
        {"none:available", 1},
        {"none", 2, APP_CONTROL_OPERATION_SETTING_WIFI},
        {"none:flight_mode", 3, nullptr, "setting-flightmode-efl"},
        {"none:roaming_off", 3, APP_CONTROL_OPERATION_SETTING_MOBILE_NETWORK, "setting-network-efl"},
    };
    add_account();
    for (const auto &c : cases) {
        SCOPED_TRACE(testing::Message() << c.connection << " button " << c.button);
        fake_app::clear();
        run([&] {
            vconf_set_str("memory/connection/type", "wifi");
            request({});
            vconf_set_str("memory/connection/type", c.connection);
            request({.operation = share, .uri = "/a", .sender = "a"});
            EXPECT_EQ(opened.back().page, "details");
            ASSERT_NE(app->popup, nullptr);
            EXPECT_EQ(app->upload_list, nullptr);
            driver::settle();
            if (c.button)
                EXPECT_TRUE(driver::click(
                    elm_object_part_content_get(app->popup, ("button" + std::to_string(c.button)).c_str())));
            else
                driver::press(app->win_main, "XF86Back");
            EXPECT_EQ(app->win_main, nullptr);
        });
        EXPECT_EQ(std::ranges::count(replies(), "a succeeded -"), 1);
        char *operation = nullptr, *app_id = nullptr;
        ASSERT_EQ(fake_app::sent().size(), c.operation || c.app_id ? 1u : 0u);
        if (fake_app::sent().empty())
            continue;
        app_control_get_operation(fake_app::sent()[0].request, &operation);
        app_control_get_app_id(fake_app::sent()[0].request, &app_id);
        EXPECT_EQ(taken(operation), c.operation ? c.operation : "(null)");
        EXPECT_EQ(taken(app_id), c.app_id ? c.app_id : "(null)");
    }
}

TEST_F(Shell, PauseAndTerminateTidyUp)
{
    for (const bool exit_on_pause : {false, true}) {
        run([&] {
            request({});
            app->exit_on_pause = exit_on_pause;
            notification_h noti = notification_create(NOTIFICATION_TYPE_ONGOING);
            notification_set_pkgname(noti, VELORA_SHARE_PACKAGE);
            notification_insert(noti, &app->noti_priv_id);
            notification_free(noti);
            fake_app::pause();
            EXPECT_EQ(app->win_main == nullptr, exit_on_pause);
            _velora_app_exit(app);
            fake_app::resume(); // after the exit
        });
        EXPECT_EQ(app->noti_priv_id, -1);
        EXPECT_TRUE(read_posted(nullptr).empty());
    }
}
