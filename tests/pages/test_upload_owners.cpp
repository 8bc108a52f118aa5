// A second request, a cancel, an end or a lost network in the middle of something else: what belongs to one page, run
// or request is not touched by another.
#include "upload_page.h"
#include "velora_common/velora_pipe.h"
#include "velora_common/velora_popup.h"

namespace {

class Owners : public UploadPage {
  protected:
    void share_from(const char *sender, const Texts &names)
    {
        request({.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .paths = locals(names), .sender = sender});
    }
    // The files are under way, with the cloud held.
    void start(const Texts &names)
    {
        share_from("first", names);
        fake_cloud_hold(true);
        ASSERT_TRUE(press_done());
        ASSERT_TRUE(wait_for([] { return the_run() && !fake_cloud_upload_log().empty(); }));
    }
    static void network(const char *state)
    {
        vconf_set_str("memory/connection/type", state);
    }
    static bool is_browsing()
    {
        return s_vd && s_vd->phase == PHASE_BROWSING && !s_vd->ad->popup && s_vd->done_btn &&
               !elm_object_disabled_get(s_vd->done_btn);
    }
    static bool finish()
    {
        fake_cloud_hold(false);
        return wait_for(is_over);
    }
};

} // namespace

TEST_F(Owners, TheNetworkPopupGoesWithItsCauseAndNothingIsLost)
{
    network("none:flight_mode");
    run([&] {
        Application::request(
            {.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .paths = locals({"a.txt"}), .sender = "a"});
        driver::settle();
        EXPECT_EQ(s_vd, nullptr);
        network("wifi");
        share_from("b", {"b.txt"});
        ASSERT_TRUE(wait_for(is_browsing));
        ASSERT_TRUE(press_done());
        ASSERT_TRUE(wait_for(is_over));
        EXPECT_EQ(rows(), (Texts{"uploaded a.txt", "uploaded b.txt"}));
    });
    EXPECT_EQ(answers(), (Texts{"a succeeded", "b succeeded"}));
}

TEST_F(Owners, OtherRequestsLeaveARunAlone)
{
    const struct {
        const char *name, *popup; // that shows meanwhile
        std::function<void()> disturb;
        Texts answers;
    } cases[] = {
        {"a tap on the icon", "", [] { request({.sender = "icon"}); }, {"first succeeded", "icon canceled"}},
        {"a share without a network",
         "network",
         [this] {
             network("none");
             share_from("late", {"late.txt"});
         },
         {"first succeeded", "late canceled"}},
        {"a tap on the notification",
         "",
         [] { request({.operation = APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD, .sender = "tap"}); },
         {"first succeeded", "tap canceled"}},
    };
    for (const bool is_back : {true, false}) {
        for (const auto &c : cases) {
            SCOPED_TRACE(std::string(c.name) + (is_back ? ", Back" : ", the first button"));
            fake_cloud_reset();
            fake_cloud_refresh_now();
            fake_app::clear();
            run([&] {
                start({"a.txt", "b.txt"});
                c.disturb();
                EXPECT_EQ(*c.popup != 0, s_vd->ad->popup && popup_is(c.popup));
                if (*c.popup && is_back) {
                    press_back();
                } else if (*c.popup) {
                    EXPECT_TRUE(press_popup_button(1));
                }
                network("wifi");
                ASSERT_TRUE(s_vd && s_vd->run) << "the uploads have ended";
                EXPECT_EQ(s_vd->ad->popup, nullptr);
                ASSERT_TRUE(finish());
                EXPECT_EQ(rows(), (Texts{"uploaded a.txt", "uploaded b.txt"}));
            });
            EXPECT_EQ(answers(), c.answers);
        }
    }
}

TEST_F(Owners, TheEndOfARunIsNotThatOfTheNextOne)
{
    const struct {
        const char *name;
        std::function<bool()> cancel;
    } cases[] = {
        {"by its x", [this] { return press_row_cancel(0); }},
        {"by Select All and Stop",
         [] {
             __ctx_delete_cb(s_vd, nullptr, nullptr);
             driver::settle();
             return driver::click_row(__select_all_row()) && driver::click(s_vd->done_btn) && press_popup_button(2);
         }},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        fake_cloud_reset();
        fake_cloud_refresh_now();
        fake_app::clear();
        run([&] {
            start({"large.bin"});
            const int ended = the_run()->number;
            share_from("second", {"b.txt"});
            share_from("third", {"c.txt"});
            ASSERT_TRUE(wait_for([] { return states()[0] == UPLOAD_STATE_UPLOADING; }));
            ASSERT_TRUE(c.cancel());
            fake_cloud_hold(false);
            ASSERT_TRUE(wait_for(is_browsing));
            const auto late_end = [ended] {
                for (const char *verb : {"end.", "storage_full.", "store.0.", "selection."})
                    _velora_common_pipe_send_msg(s_vd->pipe, (verb + std::to_string(ended)).c_str());
                driver::settle();
            };
            late_end();
            EXPECT_TRUE(is_browsing());
            fake_cloud_hold(true);
            ASSERT_TRUE(press_done());
            ASSERT_TRUE(wait_for([] { return fake_cloud_upload_log().size() == 2; }));
            late_end();
            EXPECT_TRUE(the_run() && s_vd->run);
            ASSERT_TRUE(finish());
            EXPECT_EQ(rows(), (Texts{"uploaded b.txt", "uploaded c.txt"})) << "in the order of the shares";
        });
        EXPECT_EQ(answers(), (Texts{"first succeeded", "second succeeded", "third succeeded"}));
    }
}

TEST_F(Owners, AFullStorageDoesNotDropWhatWaits)
{
    fake_cloud_fail_upload(2, CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL);
    run([&] {
        start({"a.txt", "b.txt", "c.txt"});
        share_from("late", {"late.txt"});
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for(is_browsing));
        EXPECT_TRUE(wait_for([&] { return log.has("Unable to upload, not enough memory"); }));
        EXPECT_EQ(notifications(), Texts{"2 files: Upload failed fail:"});
        ASSERT_TRUE(press_done());
        ASSERT_TRUE(wait_for(is_over));
        EXPECT_EQ(rows(), Texts{"uploaded late.txt"});
    });
}

TEST_F(Owners, TheWaitStaysUntilItsRefreshHasEnded)
{
    fake_cloud_reset();
    fake_cloud_add_folder("/Fresh");
    fake_cloud_hold(true);
    run([&] {
        share_from("a", {"a.txt"});
        EXPECT_TRUE(popup_is("wait"));
        EXPECT_TRUE(elm_object_disabled_get(s_vd->done_btn));
        EXPECT_TRUE(shows("Loading your folders…"));
        share_from("b", {"b.txt"});
        EXPECT_TRUE(popup_is("wait")) << "a second share";
        request({.sender = "icon"});
        EXPECT_TRUE(popup_is("wait")) << "a tap on the icon";
        EXPECT_TRUE(wait_for([&] { return log.has("The new files go along with these"); }));
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for(is_browsing));
        EXPECT_EQ(rows(), Texts{"folder Fresh"});
        EXPECT_TRUE(shows("2 files · 1\u00a0KB")) << driver::read_texts(window());
    });
    fake_cloud_reset();
    fake_cloud_hold(true);
    run([&] { // the wait is Cancel's as well as Back's
        share_from("a", {"a.txt"});
        ASSERT_TRUE(press_popup_button(1));
        EXPECT_EQ(s_vd->ad->popup, nullptr);
        EXPECT_TRUE(elm_object_disabled_get(s_vd->done_btn)) << "nothing to upload";
        share_from("b", {"b.txt"}); // and at once the next
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for(is_browsing));
        EXPECT_EQ(__waiting_count(), 1);
        EXPECT_TRUE(shows("b.txt · 1\u00a0KB")) << driver::read_texts(window());
    });
}

TEST_F(Owners, ARefreshThatEndsDuringAQueueOrBehindItLeavesTheRows)
{
    run([&] {
        fake_cloud_hold(true); // the refresh that comes with the view
        share_from("a", {"a.txt", "b.txt"});
        fake_cloud_add_file("/new.txt", "");
        ASSERT_TRUE(press_done());
        const Texts queue = rows();
        fake_cloud_let_through(1);
        for (const char *message : {"meta_changed", "update.99", "store.", "store", "thumb"})
            _velora_common_pipe_send_msg(s_vd->pipe, message);
        _velora_upload_view_meta_done();
        driver::settle();
        EXPECT_EQ(rows(), queue);
        ASSERT_TRUE(wait_for([] { return the_run() != nullptr; }));
        ASSERT_TRUE(finish());
        _velora_upload_view_meta_done();
        _velora_upload_view_update();
        EXPECT_EQ(rows(), (Texts{"uploaded a.txt", "uploaded b.txt"}));
        EXPECT_TRUE(shows("2 files uploaded"));
    });
}

TEST_F(Owners, AResultOverARunKeepsItsFolderAndGivesTheQueueBack)
{
    run([&] {
        start({"a.txt", "b.txt"});
        show_result({"old.txt"}, "fail", "/Alpha/Beta");
        EXPECT_EQ(rows(), Texts{"failed old.txt"});
        ASSERT_TRUE(driver::click_row(row(0)));
        EXPECT_EQ(s_vd->ad->popup, nullptr) << "one run at a time";
        press_back(); // lowers the window, behind which the queue is to be seen again
        EXPECT_EQ(rows(), (Texts{"queued a.txt", "queued b.txt"}));
        show_result({"old.txt"}, "fail", "/Alpha/Beta");
        ASSERT_TRUE(finish());
        fake_cloud_hold(true);
        ASSERT_TRUE(driver::click_row(row(0)));
        ASSERT_TRUE(press_popup_button(2));
        ASSERT_TRUE(wait_for([] { return the_run() && s_vd->run && fake_cloud_upload_log().size() == 3; }));
        fake_app::pause();
        ASSERT_TRUE(s_vd) << "what is tried again is not only looked at";
        share_from("late", {"late.txt"});
        EXPECT_EQ(rows(), Texts{"queued old.txt"});
        ASSERT_TRUE(wait_for([] { return states()[0] == UPLOAD_STATE_UPLOADING; }));
        EXPECT_NE(read_posted(VELORA_SHARE_PACKAGE)[0].looks.find(" 5 0 "), std::string::npos)
            << "another try starts at nothing: " << read_posted(VELORA_SHARE_PACKAGE)[0].looks;
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for(is_browsing)) << "the late share is next";
    });
    EXPECT_EQ(uploaded("/Alpha/Beta/old.txt"), "old.txt");
}

TEST_F(Owners, AQuestionGoesWithWhatItIsAbout)
{
    fake_cloud_fail_upload(1, CLOUD_CONTENT_SYNC_ERROR_SERVER);
    run([&] {
        start({"a.txt", "b.txt", "c.txt"});
        fake_cloud_let_through(3);
        ASSERT_TRUE(wait_for([] { return rows()[0] == "failed a.txt" && the_run()->report.current == 1; }));
        __ctx_delete_cb(s_vd, nullptr, nullptr);
        driver::settle();
        draw();
        ASSERT_TRUE(driver::click_row(__select_all_row()));
        EXPECT_TRUE(shows("2 Selected")) << "the failed one is not in the queue";
        ASSERT_TRUE(driver::click(s_vd->done_btn));
        EXPECT_TRUE(shows("Stop 2 uploads?"));
        ASSERT_TRUE(finish());
        EXPECT_EQ(s_vd->ad->popup, nullptr) << "there is nothing left to stop";
        EXPECT_EQ(rows(), (Texts{"failed a.txt", "uploaded b.txt", "uploaded c.txt"}));

        ASSERT_TRUE(driver::click_row(row(0)));
        ASSERT_TRUE(popup_is("retry"));
        share_from("late", {"late.txt"});
        ASSERT_TRUE(wait_for(is_browsing)) << "the row that the question was about is gone";
    });
}

TEST_F(Owners, TheQuestionAboutWhatWasLeftTakesNothingFromAShare)
{
    for (const int button : {2, 1}) { // the first one is not asked again in this process
        SCOPED_TRACE(button == 1 ? "Later" : "Upload");
        fake_cloud_reset();
        fake_cloud_refresh_now();
        const std::string left = locals({"left.txt"})[0];
        const char *const path = left.c_str(), *const destination = "/left.txt";
        cloud_content_sync_h client = nullptr;
        ASSERT_EQ(cloud_content_sync_create("Velora", &client), 0);
        EXPECT_EQ(cloud_content_sync_queue_add(client, &path, &destination, 1), 0);
        cloud_content_sync_destroy(client);
        fake_app::clear();
        run([&] {
            request({.sender = "icon"});
            ASSERT_TRUE(wait_for([] { return s_vd && popup_is("left"); }));
            share_from("late", {"late.txt"});
            ASSERT_TRUE(popup_is("left"));
            ASSERT_TRUE(press_popup_button(button));
            if (button == 2) {
                ASSERT_TRUE(wait_for([] { return uploaded("/left.txt") == "left.txt"; }));
            }
            ASSERT_TRUE(wait_for(is_browsing));
            ASSERT_TRUE(press_done());
            ASSERT_TRUE(wait_for([] { return is_over() && uploaded("/late.txt") != "(missing)"; }));
            EXPECT_EQ(uploaded("/late.txt"), "late.txt");
        });
        EXPECT_EQ(answers(), (Texts{"icon canceled", "late succeeded"}));
    }
}

TEST_F(Owners, APopupKeepsTheBackKeyAndDismissesItselfAlone)
{
    run([&] {
        share_from("a", {"a.txt"});
        driver::click_row(row(0)); // into a folder, so that Back has somewhere to go
        const std::string folder = s_vd->ad->folder_path;
        int replaced = 0;
        const auto count = [](void *data) { ++*static_cast<int *>(data); };
        const char page = 0;
        _velora_popup_show(app, {&page, "one"},
                           _velora_common_create_processing_popup_with_cancel(
                               app->win_main, "IDS_CLOUD_BODY_PROCESSING_ING", nullptr, nullptr),
                           count, &replaced);
        driver::settle();
        press_back();
        EXPECT_TRUE(popup_is("one")) << "it has no Cancel";
        EXPECT_EQ(s_vd->ad->folder_path, folder);
        EXPECT_FALSE(_velora_popup_take_away(app, {&page, "two"}));
        EXPECT_FALSE(_velora_popup_take_away(app, {s_vd, ""}));
        Evas_Object *notice = _velora_common_create_one_text_popup_with_timer(app->win_main, app);
        _velora_popup_show(app, {&page, "two"}, notice);
        EXPECT_EQ(replaced, 1);
        driver::settle();
        press_back();
        EXPECT_EQ(app->popup, nullptr) << "Back takes the notice away";
        EXPECT_EQ(s_vd->ad->folder_path, folder);
        notice = _velora_common_create_one_text_popup_with_timer(app->win_main, app);
        _velora_popup_show(app, {&page, "two"}, notice);
        Evas_Object *other = _velora_common_create_processing_popup(app->win_main, nullptr, nullptr);
        _velora_popup_show(app, {&page, "three"}, other);
        EXPECT_FALSE(wait_for([] { return !app->popup; }, 3.5)) << "the notice's time takes nothing of others away";
        EXPECT_TRUE(_velora_popup_take_away(app, {&page, ""}));
    });
}
