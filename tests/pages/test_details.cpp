// The settings of the account: what is stored is what is shown, and the ways in and out.
#include "fake_ewk.h"
#include "upload_page.h"
#include "velora_add_account_content_sync/signin_record.h"
#include "velora_common/velora_account.h"
#include "velora_details_content_sync/details_record.h"
#include "velora_upload_file/velora_uploads.h"

namespace {

class Details : public UploadPage {
  protected:
    void SetUp() override
    {
        UploadPage::SetUp();
        fake_ewk::clear();
        _velora_common_account_remove_info_from_db();
        fake_cloud_sign_in("ann@example.com");
        _velora_common_account_settle();
        fake_cloud_refresh_now();
        fake_cloud_set_storage(15ULL << 30, (5ULL << 30) - 16);
    }
    void TearDown() override
    {
        EXPECT_EQ(page(), nullptr);
        UploadPage::TearDown();
    }
    static DetailsViewData *page()
    {
        return details::s_vd;
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
        app = page() ? page()->ad : signin::s_vd ? signin::s_vd->ad : s_vd ? s_vd->ad : app;
        driver::settle();
    }
    static void speak(const char *language)
    {
        setenv("LANGUAGE", language, 1);
        setlocale(LC_ALL, "C"); // gettext looks again when it is another one
        setlocale(LC_ALL, "C.UTF-8");
    }
    // The page for an account that is there, and what it asks for at first.
    static void open(const Wish &wish = {.operation = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE, .sender = "settings"})
    {
        request(wish);
        ASSERT_TRUE(wait_for([] { return page() && page()->is_storage_received; }));
        ASSERT_TRUE(is_in_place());
    }
    // The page behind a sign-in.
    void sign_in(Wish wish)
    {
        fake_cloud_sign_in("");
        fake_cloud_revoke_tokens();
        _velora_common_account_remove_info_from_db();
        request(wish);
        ASSERT_TRUE(wait_for([] { return signin::s_vd && !fake_ewk::seen().address.empty(); }));
        fake_cloud_approve("ann@example.com");
        fake_ewk::navigate("https://velora.example.org/auth_complete");
        ASSERT_TRUE(wait_for([] { return page() && page()->is_storage_received; }));
        ASSERT_TRUE(is_in_place());
    }
    static bool is_in_place() // a page on its way in takes no clicks
    {
        return wait_for([] {
            int x = 1;
            evas_object_geometry_get(page()->genlist, &x, nullptr, nullptr, nullptr);
            return x == 0;
        });
    }
    static Elm_Object_Item *item(int nth, Evas_Object *list = page()->genlist)
    {
        Elm_Object_Item *one = elm_genlist_first_item_get(list);
        while (one && nth-- > 0)
            one = elm_genlist_item_next_get(one);
        return one;
    }
    static DetailsItemData *record(Elm_Object_Item *one)
    {
        return static_cast<DetailsItemData *>(elm_object_item_data_get(one));
    }
    static Elm_Object_Item *item_of(int kind)
    {
        for (int i = 0; Elm_Object_Item *one = item(i); i++)
            if (record(one)->kind == kind)
                return one;
        return nullptr;
    }
    static bool tap(Elm_Object_Item *one)
    {
        return driver::click_row(one);
    }
    static std::string words(const char *id)
    {
        return __details_text(id);
    }
    static std::string storage()
    {
        return words(record(page()->storage_item)->text2);
    }
    static std::string schedule()
    {
        return words(record(page()->schedule_item)->text2);
    }
    // What the client stores of each switch, what is shown, and which rows are disabled ("1!" for on and disabled).
    static std::string stored()
    {
        std::string all;
        bool value = false;
        CloudSyncHandle handle = page()->client.get();
        cloud_content_sync_setting_get_camera_upload(handle, &value);
        all += value ? "1" : "0";
        for (const int type : {CLOUD_CONTENT_TYPE_IMAGE, CLOUD_CONTENT_TYPE_VIDEO}) {
            cloud_content_sync_setting_get_type_activation(handle, type, &value);
            all += value ? "1" : "0";
        }
        for (const int type : {CLOUD_CONTENT_TYPE_CAMERA, CLOUD_CONTENT_TYPE_IMAGE, CLOUD_CONTENT_TYPE_VIDEO}) {
            cloud_content_sync_setting_get_wifi_only_type(handle, type, &value);
            all += value ? "1" : "0";
        }
        return all;
    }
    static std::string shown()
    {
        std::string all, disabled;
        for (int kind = DETAIL_ITEM_CAMERA_UPLOAD; kind <= DETAIL_ITEM_VIDEOS_WIFI_ONLY; kind++) {
            elm_genlist_item_show(item_of(kind), ELM_GENLIST_ITEM_SCROLLTO_IN);
            driver::settle();
            Evas_Object *check = record(item_of(kind))->check;
            all += !check ? "?" : elm_check_state_get(check) ? "1" : "0";
            disabled += elm_object_item_disabled_get(item_of(kind)) ? "!" : ".";
        }
        return all + " " + disabled;
    }
    static int seconds()
    {
        int type = 0, value = 0;
        cloud_content_sync_setting_get_refresh_type(page()->client.get(), &type, &value);
        return type == CLOUD_CONTENT_SYNC_REFRESH_TYPE_PERIODIC ? value : -1;
    }
    // Every write of the settings fails from now on, or no longer.
    void break_writes(bool is_broken)
    {
        Db db;
        ASSERT_TRUE(db.open(home.path + "/cloud/Velora.db", nullptr));
        for (const std::string change : {"INSERT", "UPDATE"})
            ASSERT_TRUE(db.run((is_broken ? "CREATE TRIGGER no_" + change + " BEFORE " + change +
                                                " ON account_setting BEGIN SELECT RAISE(ABORT, 'no'); END"
                                          : "DROP TRIGGER no_" + change)
                                   .c_str()));
    }
    static bool popup_is(const char *topic)
    {
        return app->popup && std::string(app->popup_owner.topic) == topic;
    }
    static bool press_button(int number)
    {
        return app->popup &&
               driver::click(elm_object_part_content_get(app->popup, ("button" + std::to_string(number)).c_str()));
    }
    static void press_back()
    {
        driver::press(app->win_main, "XF86Back");
    }
    static bool press(const char *text)
    {
        Evas_Object *found = driver::find_text(app->win_main, text);
        return found && driver::click(found);
    }
    // Menu, Remove.
    static bool ask_to_remove()
    {
        driver::press(app->win_main, "Menu");
        if (!popup_is("more menu"))
            return false;
        for (int i = 0; i < 20; i++) { // it takes no clicks until it has come into sight
            Evas_Object *entry = driver::find_text(app->popup, "Remove");
            if (entry && driver::click(entry) && wait_for([] { return popup_is("remove account"); }, 0.2))
                return true;
        }
        return false;
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

const std::string nobody = "- - 0", ann = "ann@example.com ann@example.com 1";
constexpr const char *signed_out =
    "You have been signed out of your Velora account. Sign in again to use Velora services.";

} // namespace

TEST_F(Details, EachWayInHasItsEdgesAndItsWaysOut)
{
    const struct {
        const char *name;
        Wish wish;
        bool signs_in, has_back, has_menu;
        const char *out; // "back", or a button
        std::string left;
        const char *next = nullptr; // what is on screen then; null: nothing
    } cases[] = {
        {"configure", {.operation = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE}, false, true, true, "back", ann},
        {"details", {.launch_mode = "Velora_Details"}, false, true, true, "back", ann},
        {"icon, done", {}, false, true, false, "Done", ann},
        {"icon, cancel", {}, false, true, false, "Cancel", ann},
        {"add, done", {.operation = APP_CONTROL_OPERATION_ACCOUNT_ADD}, true, false, false, "Done", ann},
        {"add, cancel", {.operation = APP_CONTROL_OPERATION_ACCOUNT_ADD}, true, false, false, "Cancel", nobody},
        {"sign-in, back", {.launch_mode = "Velora_Signin"}, true, false, false, "back", nobody},
        {"share, done",
         {.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .paths = {"a"}},
         true,
         false,
         false,
         "Done",
         ann,
         "Upload to"},
        {"share, back",
         {.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .paths = {"a"}},
         true,
         false,
         false,
         "back",
         nobody},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        SetUp();
        fake_app::clear();
        run([&] {
            Wish wish = c.wish;
            wish.paths = locals(wish.paths);
            if (c.signs_in)
                sign_in(wish);
            else
                open(wish);
            ASSERT_TRUE(page());
            Elm_Object_Item *nf_item = page()->nf_item;
            EXPECT_EQ(elm_object_item_part_content_get(nf_item, "prev_btn") != nullptr, c.has_back);
            EXPECT_EQ(elm_object_item_part_content_get(nf_item, "toolbar_more_btn") != nullptr, c.has_menu);
            EXPECT_EQ(elm_object_item_part_content_get(nf_item, "toolbar") == nullptr, c.has_menu);
            if (std::string(c.out) == "back")
                press_back();
            else
                ASSERT_TRUE(press(c.out));
            if (!c.next) {
                EXPECT_TRUE(is_left());
            } else {
                ASSERT_TRUE(wait_for([] { return !page() && s_vd; }));
                EXPECT_TRUE(wait_for([&] { return driver::find_text(app->win_main, c.next) != nullptr; }));
                EXPECT_EQ(_velora_upload_view_unfinished(), 1);
            }
        });
        EXPECT_EQ(accounts(), c.left);
        EXPECT_EQ(answers(), Texts{c.wish.paths.empty() ? "b canceled" : "b succeeded"});
    }
}

TEST_F(Details, ASwitchStoresAndShowsWhatIsStored)
{
    run([&] {
        open();
        EXPECT_EQ(stored(), "011000");
        EXPECT_EQ(shown(), "011000 ...!..");
        const struct {
            int kind;
            bool on_check, is_broken;
            const char *stored, *shown;
        } cases[] = {
            {DETAIL_ITEM_CAMERA_WIFI_ONLY, false, false, "011000", "011000 ...!.."}, // disabled
            {DETAIL_ITEM_CAMERA_UPLOAD, false, false, "111000", "111000 ......"},
            {DETAIL_ITEM_CAMERA_WIFI_ONLY, true, false, "111100", "111100 ......"},
            {DETAIL_ITEM_CAMERA_UPLOAD, true, true, "111100", "111100 ......"},
            {DETAIL_ITEM_VIDEOS_WIFI_ONLY, false, true, "111100", "111100 ......"},
            {DETAIL_ITEM_CAMERA_UPLOAD, true, false, "011100", "011100 ...!.."},
            {DETAIL_ITEM_SYNC_IMAGES, true, false, "001100", "001100 ...!!."},
            {DETAIL_ITEM_SYNC_VIDEOS, false, false, "000100", "000100 ...!!!"},
            {DETAIL_ITEM_SYNC_IMAGES, false, true, "000100", "000100 ...!!!"},
            {DETAIL_ITEM_SYNC_IMAGES, false, false, "010100", "010100 ...!.!"},
            {DETAIL_ITEM_IMAGES_WIFI_ONLY, false, false, "010110", "010110 ...!.!"},
        };
        int said = 0;
        for (const auto &c : cases) {
            SCOPED_TRACE(std::string(c.shown) + " " + std::to_string(c.kind));
            if (c.is_broken)
                break_writes(true);
            elm_genlist_item_show(item_of(c.kind), ELM_GENLIST_ITEM_SCROLLTO_IN);
            driver::settle();
            ASSERT_TRUE(c.on_check ? driver::click(record(item_of(c.kind))->check) : tap(item_of(c.kind)));
            EXPECT_EQ(stored(), c.stored);
            EXPECT_EQ(shown(), c.shown);
            EXPECT_EQ(app->popup, nullptr);
            said += c.is_broken;
            if (c.is_broken)
                break_writes(false);
        }
        EXPECT_TRUE(comes_true([&] { return log.has(words("IDS_VELORA_BODY_SETTING_NOT_SAVED")); }));
        // Behind the page's back: it looks again when it is in front, for whatever reason.
        CloudSyncHandle handle = page()->client.get();
        cloud_content_sync_setting_set_camera_upload(handle, true);
        open();
        EXPECT_EQ(shown(), "110110 .....!");
        cloud_content_sync_setting_set_type_activation(handle, CLOUD_CONTENT_TYPE_IMAGE, false);
        evas_focus_out(evas_object_evas_get(app->win_main));
        evas_focus_in(evas_object_evas_get(app->win_main));
        EXPECT_EQ(shown(), "100110 ....!!");
        fake_cloud_sign_in("bob@example.com");
        open();
        EXPECT_EQ(shown(), "011000 ...!..");
        fake_cloud_sign_in("");
        ASSERT_TRUE(tap(item_of(DETAIL_ITEM_CAMERA_UPLOAD)));
        EXPECT_EQ(shown(), "000000 !!!!!!");
        EXPECT_NE(driver::read_texts(app->popup).find(signed_out), std::string::npos);
        ASSERT_TRUE(press_button(1));
        EXPECT_TRUE(is_left());
    });
}

TEST_F(Details, TheScheduleIsStoredByRowAndByRadio)
{
    run([&] {
        open();
        ASSERT_EQ(cloud_content_sync_setting_set_refresh_type(page()->client.get(),
                                                              CLOUD_CONTENT_SYNC_REFRESH_TYPE_PERIODIC, 21600),
                  0);
        open();
        EXPECT_EQ(schedule(), "Every 6 hours");
        speak("de");
        evas_object_smart_callback_call(page()->genlist, "language,changed", nullptr);
        EXPECT_EQ(schedule(), "Alle 6 Stunden");
        EXPECT_EQ(storage(), "5,00GB / 15,00GB");
        speak("en");
        evas_object_smart_callback_call(page()->genlist, "language,changed", nullptr);
        const struct {
            int choice;
            const char *by;
            bool is_broken;
            int marked, seconds;
            const char *shown;
        } cases[] = {
            {4, "row", false, 2, 86400, "Every day"},    {0, "radio", false, 4, 3600, "Every hour"},
            {3, "radio", true, 0, 3600, "Every hour"},   {1, "row", false, 0, 10800, "Every 3 hours"},
            {2, "row", true, 1, 10800, "Every 3 hours"}, {0, "back", false, 1, 10800, "Every 3 hours"},
        };
        for (const auto &c : cases) {
            SCOPED_TRACE(std::string(c.by) + " " + std::to_string(c.choice));
            ASSERT_TRUE(tap(page()->schedule_item));
            ASSERT_TRUE(wait_for([] { return popup_is("schedule"); }));
            Evas_Object *list = driver::find_widget(app->popup, "elm_genlist");
            ASSERT_TRUE(list);
            elm_genlist_item_show(item(c.marked, list), ELM_GENLIST_ITEM_SCROLLTO_IN);
            driver::settle();
            EXPECT_EQ(elm_radio_value_get(record(item(c.marked, list))->radio), c.marked + 1);
            if (c.is_broken)
                break_writes(true);
            elm_genlist_item_show(item(c.choice, list), ELM_GENLIST_ITEM_SCROLLTO_IN);
            driver::settle();
            const std::string by = c.by;
            if (by == "row")
                ASSERT_TRUE(tap(item(c.choice, list)));
            else if (by == "radio")
                ASSERT_TRUE(driver::click(record(item(c.choice, list))->radio));
            else
                press_back();
            EXPECT_TRUE(wait_for([] { return !app->popup; }));
            EXPECT_EQ(seconds(), c.seconds);
            EXPECT_EQ(schedule(), c.shown);
            if (c.is_broken)
                break_writes(false);
        }
        ASSERT_EQ(cloud_content_sync_setting_set_refresh_type(page()->client.get(),
                                                              CLOUD_CONTENT_SYNC_REFRESH_TYPE_PERIODIC, 7),
                  0);
        open();
        EXPECT_EQ(schedule(), "Every hour");
    });
}

TEST_F(Details, SizesAreWrittenToTheByte)
{
    const struct {
        const char *language;
        unsigned long long bytes;
        const char *text;
    } cases[] = {
        {"en", 0, "0.00KB"},
        {"en", 500, "0.49KB"},
        {"en", 1048575, "1024.00KB"},
        {"en", 1048576, "1.00MB"},
        {"en", 1073741823, "1024.00MB"},
        {"en", 1073741824, "1.00GB"},
        {"en", 5ULL << 30, "5.00GB"},
        {"en", ~0ULL, "17179869184.00GB"},
        {"de", 1048575, "1024,00KB"},
        {"fr", 1610612736, "1,50Go"},
        {"ko", 1610612736, "1.50GB"},
    };
    for (const auto &c : cases) {
        speak(c.language);
        char text[30] = "";
        EXPECT_EQ(__contentsync_storage_status_size_transition(c.bytes, text), 0);
        EXPECT_STREQ(text, c.text);
    }
}

TEST_F(Details, TheStorageIsWhatTheServiceSays)
{
    run([&] {
        fake_cloud_hold(true);
        request({.operation = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE});
        ASSERT_TRUE(page());
        EXPECT_EQ(storage(), words("IDS_CLOUD_OPT_LOADING_ING_ABB"));
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for([] { return page()->is_storage_received; }));
        ASSERT_TRUE(is_in_place());
        const struct {
            unsigned long long total, used;
            int error;
            const char *text;
            int percent; // of the bar; -1: none
        } cases[] = {
            {10000, 1024 - 16, 0, "1.00KB / 9.77KB", 10},
            {10000, 9500, CLOUD_CONTENT_SYNC_ERROR_NETWORK, "1.00KB / 9.77KB", 10},
            {10000, 8999 - 16, 0, "8.79KB / 9.77KB", 89},
            {10000, 9000 - 16, 0, "8.79KB / 9.77KB", 90}, // little is left
            {10000, 12000 - 16, 0, "11.72KB / 11.72KB", 100},
            {0, 0, 0, "0KB / 0KB", -1},
            {15ULL << 30, (5ULL << 30) - 16, 0, "5.00GB / 15.00GB", 33},
        };
        for (const auto &c : cases) {
            SCOPED_TRACE(c.text);
            fake_cloud_set_storage(c.total, c.used, c.error);
            request({.operation = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE});
            ASSERT_TRUE(wait_for([] { return !page()->is_asking; }));
            EXPECT_EQ(storage(), c.text);
            driver::settle();
            Evas_Object *bar = driver::find_widget(page()->genlist, "elm_progressbar");
            ASSERT_EQ(bar ? static_cast<int>(elm_progressbar_value_get(bar) * 100 + 1e-6) : -1, c.percent);
            const char *state = bar ? edje_object_part_state_get(elm_layout_edje_get(bar), "bar", nullptr) : "default";
            EXPECT_STREQ(state, c.percent >= 90 ? "warning" : "default");
        }
        fake_cloud_set_storage(15ULL << 30, 0, CLOUD_CONTENT_SYNC_ERROR_SERVER);
        fake_cloud_sign_in("bob@example.com"); // whose figures nobody knows
        open();
        EXPECT_EQ(storage(), "0KB / 0KB");
        fake_cloud_hold(true);
        request({.operation = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE});
        ASSERT_TRUE(page()->is_asking);
    }); // the page goes, and the answer comes to nobody
    fake_cloud_hold(false);
}

TEST_F(Details, AnAccountIsRemovedWithEverythingThatIsUnderWay)
{
    const char *const all_data = "All data related to this account will be deleted from the device.";
    const struct {
        const char *name;
        Texts files;    // under way
        bool is_chosen; // and a folder is chosen for them
        bool is_reachable;
        const char *uploading; // what the question says of them
    } cases[] = {
        {"alone", {}, false, true, ""},
        {"uploading", {"a.txt", "b.txt"}, true, true, "2 files are still being uploaded."},
        {"waiting", {"a.txt"}, false, true, "1 file is still being uploaded."},
        {"offline", {}, false, false, ""},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        SetUp();
        fake_app::clear();
        run([&] {
            if (!c.files.empty()) {
                UploadPage::request(
                    {.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .paths = locals(c.files), .sender = "gallery"});
                ASSERT_TRUE(s_vd);
            }
            if (c.is_chosen) {
                fake_cloud_hold(true);
                ASSERT_TRUE(press_done());
                ASSERT_TRUE(wait_for([] { return the_run() && !fake_cloud_upload_log().empty(); }));
            }
            request({.operation = APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE, .sender = "settings"});
            ASSERT_TRUE(page() && is_in_place());
            for (const char *way : {"cancel", "back", "outside"}) {
                SCOPED_TRACE(way);
                ASSERT_TRUE(ask_to_remove());
                const std::string question = driver::read_texts(app->popup);
                EXPECT_NE(question.find(all_data), std::string::npos) << question;
                EXPECT_NE(question.find(c.uploading), std::string::npos) << question;
                EXPECT_EQ(question.find("uploaded.") != std::string::npos, *c.uploading != '\0');
                if (*way == 'c')
                    ASSERT_TRUE(press_button(1));
                else if (*way == 'b')
                    press_back();
                else
                    evas_object_smart_callback_call(app->popup, "block,clicked", nullptr);
                EXPECT_TRUE(wait_for([] { return !app->popup; }));
            }
            EXPECT_EQ(accounts(), ann);
            fake_cloud_set_reachable(c.is_reachable);
            ASSERT_TRUE(ask_to_remove());
            ASSERT_TRUE(press_button(2));
            EXPECT_EQ(s_vd, nullptr);
            EXPECT_EQ(notifications(), Texts{});
            fake_cloud_hold(false);
            ASSERT_TRUE(wait_for([] { return driver::read_texts(app->popup).find(signed_out) != std::string::npos; }));
            ASSERT_TRUE(press_button(1));
            EXPECT_TRUE(is_left());
        });
        EXPECT_EQ(accounts(), c.is_reachable ? nobody : "- - 1");
        EXPECT_EQ(uploaded("/a.txt"), "(missing)");
        EXPECT_EQ(answers(),
                  (c.files.empty() ? Texts{"settings canceled"} : Texts{"gallery succeeded", "settings canceled"}));
        fake_cloud_set_reachable(true);
    }
}
