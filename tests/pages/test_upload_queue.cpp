// The queue: its order, counters, notifications, failures, cancels, retries, and ends that come too early.
#include "upload_page.h"
#include "velora_upload_file/upload_listed.h"
#include "velora_upload_file/upload_retry.h"

namespace {

constexpr int waiting = UPLOAD_STATE_WAITING, done = UPLOAD_STATE_DONE, canceled = UPLOAD_STATE_CANCELED;

class Queue : public UploadPage {
  protected:
    // Shares the files into the root and presses Done; the cloud is held.
    // A busy client has somebody else's upload before these, so it reports nothing of them.
    void start(const std::vector<std::string> &names, bool is_client_busy = false)
    {
        share(names);
        wait_for([] { return !s_vd->ad->popup; });
        fake_cloud_hold(true);
        int id = 0;
        if (is_client_busy)
            cloud_content_sync_upload(app->sync_handle, locals({"other.bin"})[0].c_str(), "/other.bin", &id, nullptr,
                                      nullptr);
        ASSERT_TRUE(press_done());
        ASSERT_TRUE(wait_for([] { return the_run() && !fake_cloud_upload_log().empty(); }));
    }
    static bool finish_file()
    {
        const int before = ended();
        fake_cloud_let_through(3);
        return wait_for([before] { return ended() == before + 1; });
    }
    static std::string ongoing()
    {
        for (const std::string &text : notifications())
            if (text.starts_with("Velora: "))
                return text.substr(8);
        return "(none)";
    }
    static bool start_of(const std::string &name)
    {
        return wait_for([&name] {
            const Texts log = fake_cloud_upload_log();
            return !log.empty() && log.back().ends_with("/" + name);
        });
    }
};

} // namespace

TEST_F(Queue, RunsInOrderAndCounts)
{
    const Texts paths = locals({"three.txt", "one.jpg", "two.txt"});
    for (const std::string &path : paths) // 1 KB each
        std::ofstream(path, std::ios::app) << std::string(1 << 10, ' ').substr(path.size() - path.rfind('/') - 1);
    run([&] {
        request({.operation = APP_CONTROL_OPERATION_MULTI_SHARE, .paths = paths});
        fake_cloud_hold(true);
        ASSERT_TRUE(press_done());
        ASSERT_TRUE(wait_for([] { return !fake_cloud_upload_log().empty(); }));
        EXPECT_EQ(rows(), (Texts{"queued three.txt", "queued one(1).jpg", "queued two.txt"}));
        EXPECT_EQ(notifications(), Texts{"Velora: 0 / 3"});
        EXPECT_TRUE(shows("one(1).jpg")) << driver::read_texts(window());
        EXPECT_TRUE(shows("0 of 3 · 0\u00a0KB of 3\u00a0KB")) << driver::read_texts(window());
        for (int ended = 1; ended <= 2; ended++) {
            ASSERT_TRUE(finish_file());
            const std::string count = std::to_string(ended);
            EXPECT_TRUE(wait_for([&] { return ongoing() == count + " / 3"; })) << ongoing();
            const std::string words = count + " of 3 · " + count + "\u00a0KB of 3\u00a0KB"; // with the next frame
            EXPECT_TRUE(wait_for([&] { return driver::read_texts(window()).find(words) != std::string::npos; }))
                << driver::read_texts(window());
        }
        EXPECT_TRUE(wait_for([] {
            return rows() == Texts{"uploaded three.txt", "uploaded one(1).jpg", "queued two.txt"};
        }));
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for(is_over));
        EXPECT_EQ(rows(), (Texts{"uploaded three.txt", "uploaded one(1).jpg", "uploaded two.txt"}));
        EXPECT_EQ(notifications(), Texts{"3 files: Upload complete success: three.txt one.jpg two.txt"});
        press_back();
        EXPECT_TRUE(wait_for_exit());
    });
    EXPECT_EQ(uploaded("/three.txt") + uploaded("/one(1).jpg") + uploaded("/two.txt"),
              read_file(paths[0]) + read_file(paths[1]) + read_file(paths[2]));
    EXPECT_EQ(uploaded("/one.jpg"), "was there before");
    EXPECT_EQ(notifications().size(), 1u) << "the result outlives the application";
    EXPECT_TRUE(is_answered());
}

TEST_F(Queue, ReportsOnlyFailuresWhenThereAreAny)
{
    const struct {
        Texts files;
        std::vector<std::pair<int, int>> failures; // nth upload, error
        Texts rows;
        std::string result;
    } cases[] = {
        {{"a.txt"}, {}, {"uploaded a.txt"}, "a.txt: Upload complete success: a.txt"},
        {{"a.txt"}, {{1, CLOUD_CONTENT_SYNC_ERROR_SERVER}}, {"failed a.txt"}, "a.txt: Upload failed fail: a.txt"},
        {{"a.txt", "b.txt", "c.txt"},
         {{2, CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN}},
         {"uploaded a.txt", "failed b.txt", "uploaded c.txt"},
         "b.txt: Upload failed fail: b.txt"},
        {{"a.txt", "b.txt", "c.txt"},
         {{1, CLOUD_CONTENT_SYNC_ERROR_CORRUPTED}, {3, CLOUD_CONTENT_SYNC_ERROR_SERVER}},
         {"failed a.txt", "uploaded b.txt", "failed c.txt"},
         "2 files: Upload failed fail: a.txt c.txt"},
    };
    for (const auto &c : cases) {
        fake_cloud_reset();
        fake_cloud_refresh_now();
        for (const auto &[nth, error] : c.failures)
            fake_cloud_fail_upload(nth, error);
        run([&] {
            start(c.files);
            fake_cloud_hold(false);
            ASSERT_TRUE(wait_for(is_over));
            EXPECT_EQ(rows(), c.rows);
            EXPECT_EQ(notifications(), Texts{c.result});
        });
    }
}

TEST_F(Queue, CancelTakesFilesOut)
{
    const struct {
        const char *name;
        int finished_first;          // files that end before
        std::vector<size_t> cancels; // rows that have a cancel button, by their order at the time
        std::string content;         // of the ongoing notification after the cancels
        std::vector<int> end;        // states
        std::string result;
        bool is_silent = false; // the client has not reported anything of the running file
    } cases[] = {
        {"a silent file",
         0,
         {0},
         "0 / 2",
         {canceled, done, done},
         "2 files: Upload complete success: b.txt c.txt",
         true},
        {"a waiting file", 0, {1}, "0 / 2", {done, canceled, done}, "2 files: Upload complete success: a.txt c.txt"},
        {"the running file", 0, {0}, "0 / 2", {canceled, done, done}, "2 files: Upload complete success: b.txt c.txt"},
        {"in the middle", 1, {0}, "1 / 2", {done, canceled, done}, "2 files: Upload complete success: a.txt c.txt"},
        {"all, from the end", 0, {2, 1, 0}, "(none)", {canceled, canceled, canceled}, ""},
        {"all, from the start", 0, {0, 0, 0}, "(none)", {canceled, canceled, canceled}, ""},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        fake_cloud_reset();
        fake_cloud_refresh_now();
        notification_delete_all_by_type(VELORA_SHARE_PACKAGE, NOTIFICATION_TYPE_NONE);
        run([&] {
            start({"a.txt", "b.txt", "c.txt"}, c.is_silent);
            ASSERT_TRUE(!c.finished_first || finish_file());
            ASSERT_TRUE(start_of(c.finished_first ? "b.txt" : "a.txt"));
            const auto running = static_cast<size_t>(c.finished_first);
            ASSERT_TRUE(c.is_silent || wait_for([&] { return states()[running] != waiting; }));
            for (const size_t nth : c.cancels) {
                const auto before = rows().size();
                ASSERT_TRUE(press_row_cancel(nth)) << nth;
                EXPECT_EQ(rows().size(), before - 1);
            }
            EXPECT_TRUE(wait_for([&] { return ongoing() == c.content; })) << ongoing();
            fake_cloud_hold(false);
            ASSERT_TRUE(wait_for([] { return is_over(); }));
            EXPECT_EQ(states(), c.end);
            EXPECT_EQ(notifications(), c.result.empty() ? Texts{} : Texts{c.result});
            for (const size_t i : {0, 1, 2}) // "/a.txt", "/b.txt", "/c.txt"
                EXPECT_EQ(fake_cloud_content(std::string("/") + "abc"[i] + ".txt").has_value(), c.end[i] == done) << i;
        });
    }
}

TEST_F(Queue, ProgressLeavesTheCancelButtonUnderTheFinger)
{
    run([&] {
        start({"ab.txt"}); // of an even size
        ASSERT_TRUE(wait_for([&] { return the_run()->files[0].item->state == UPLOAD_STATE_UPLOADING; }));
        draw();
        Evas_Object *button = driver::find_widget(s_vd->genlist, "elm_button");
        fake_cloud_let_through(1);
        EXPECT_TRUE(wait_for([&] {
            Evas_Object *bar = driver::find_widget(s_vd->genlist, "elm_progressbar");
            return bar && elm_progressbar_value_get(bar) == 0.5;
        }));
        EXPECT_EQ(driver::find_widget(s_vd->genlist, "elm_button"), button);
    });
}

TEST_F(Queue, ACancelThatComesTooLateIsCountedAlone)
{
    run([&] {
        start({"a.txt", "b.txt"});
        ASSERT_TRUE(finish_file());
        __uploading_file_mutil_cancel(the_run()->files[0].item.get(), s_vd);
        EXPECT_TRUE(log.has("Cann't cancel it"));
        EXPECT_EQ(ongoing(), "1 / 1");
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for(is_over));
        EXPECT_EQ(states(), (std::vector<int>{done, done}));
    });
}

TEST_F(Queue, AFailedFileCanBeSentAgain)
{
    for (const int nth : {1, 2})
        fake_cloud_fail_upload(nth, CLOUD_CONTENT_SYNC_ERROR_SERVER);
    run([&] {
        start({"a.txt", "b.txt"});
        ASSERT_TRUE(finish_file());
        ASSERT_TRUE(wait_for([] { return rows()[0] == "failed a.txt"; }));
        ASSERT_TRUE(driver::click_row(row(0)));
        EXPECT_EQ(s_vd->ad->popup, nullptr) << "not while the queue runs";
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for(is_over));

        ASSERT_TRUE(driver::click_row(row(0)));
        ASSERT_TRUE(press_popup_button(1)); // Cancel
        EXPECT_EQ(s_vd->ad->popup, nullptr);
        EXPECT_EQ(rows()[0], "failed a.txt");

        fake_cloud_hold(true);
        ASSERT_TRUE(driver::click_row(row(0)));
        ASSERT_TRUE(press_popup_button(2)); // Upload
        EXPECT_EQ(rows()[0], "queued a.txt");
        EXPECT_TRUE(wait_for([] { return ongoing() == "0 / 1"; })) << ongoing();
        ASSERT_TRUE(driver::click_row(row(1)));
        EXPECT_EQ(s_vd->ad->popup, nullptr) << "one at a time";
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for([] { return is_over() && rows()[0] == "uploaded a.txt"; }));
        EXPECT_EQ(notifications(), Texts{"a.txt: Upload complete success: a.txt"});

        fake_cloud_fail_upload(1, CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL);
        ASSERT_TRUE(driver::click_row(row(1)));
        ASSERT_TRUE(press_popup_button(2));
        EXPECT_TRUE(wait_for_exit());
    });
    EXPECT_EQ(notifications(), Texts{"b.txt: Upload failed fail:"});
    EXPECT_EQ(uploaded("/a.txt"), "a.txt");
}

TEST_F(Queue, AResultOpenedDuringARunLeavesTheRunAlone)
{
    run([&] {
        start({"a.txt", "b.txt", "c.txt"});
        show_result({"old.txt"}, "success");
        EXPECT_EQ(rows(), Texts{"uploaded old.txt"});
        for (const RunFile &file : the_run()->files)
            EXPECT_EQ(file.item->gen_it, nullptr) << "its row is gone";
        EXPECT_EQ(s_vd->ad->exit_on_pause, 0) << "the run goes on behind";
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for(is_over));
        EXPECT_EQ(states(), (std::vector<int>{done, done, done}));
        EXPECT_EQ(rows(), Texts{"uploaded old.txt"});
        show_result({"new.txt", "more.txt"}, "fail");
        EXPECT_EQ(rows(), (Texts{"failed new.txt", "failed more.txt"}));
        fake_app::pause();
        EXPECT_EQ(app->win_main, nullptr);
    });
    EXPECT_EQ(uploaded("/c.txt"), "c.txt");
}

TEST_F(Queue, ALaterShareIsNextWhenTheViewIsFree)
{
    const struct {
        const char *name;
        bool is_running;
        bool has_result; // a result is opened during the run
    } cases[] = {
        {"during a run", true, false},
        {"during a run, then a result", true, true},
        {"behind the end of a run", false, false},
        {"onto a result", false, true},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        fake_cloud_reset();
        fake_cloud_add_folder("/Alpha");
        fake_cloud_refresh_now();
        run([&] {
            start({"a.txt", "b.txt"});
            if (c.is_running) {
                share({"late.txt"});
                EXPECT_TRUE(wait_for([&] { return log.has("Choose a folder for the new files"); }));
            }
            if (c.has_result)
                show_result({"old.txt", "older.txt", "oldest.txt"}, "fail");
            fake_cloud_hold(false);
            ASSERT_TRUE(wait_for([] { return !s_vd->run; }));
            if (!c.is_running)
                share({"late.txt"});
            EXPECT_EQ(s_vd->ad->exit_on_pause, 0);
            ASSERT_TRUE(wait_for([] { return rows() == Texts({"folder Alpha", "file a.txt", "file b.txt"}); }));
            EXPECT_TRUE(shows("Upload to"));
            ASSERT_TRUE(driver::click_row(row(0)));
            ASSERT_TRUE(press_done());
            ASSERT_TRUE(wait_for([] { return is_over() && rows() == Texts{"uploaded late.txt"}; }));
            press_back();
            EXPECT_TRUE(wait_for_exit());
        });
        EXPECT_EQ(uploaded("/Alpha/late.txt"), "late.txt");
        EXPECT_EQ(fake_cloud_upload_log().size(), 3u) << "nothing goes up twice";
    }
}

TEST_F(Queue, EndsInTheMiddleOfATransfer)
{
    for (const bool is_moving : {false, true}) {
        fake_cloud_reset();
        fake_cloud_refresh_now();
        run([&] {
            start({"a.txt", "b.txt", "c.txt"});
            ASSERT_TRUE(finish_file());
            if (is_moving) { // callbacks come while the view goes
                fake_cloud_set_delay(1);
                fake_cloud_hold(false);
            } else {
                press_back(); // only lowers the window
            }
            _velora_app_exit(s_vd->ad);
        });
        EXPECT_TRUE(notifications().empty() || notifications()[0].find("Velora: ") == std::string::npos)
            << "no progress is left behind";
    }
}

// Files have rows as far as somebody has scrolled; the others are the queue's as well.
TEST_F(Queue, ALongListStandsForFilesWithoutRows)
{
    const size_t count = 150;
    Texts names, old_names;
    for (size_t i = 0; i < count; i++) {
        names.push_back("file" + std::to_string(i) + ".txt");
        old_names.push_back("old " + names.back());
    }
    const auto of_type = [](int type) { return __listed(s_vd, type).size(); };
    const auto without_rows = [] { // as the list's bar tells
        double x = 0, part = 0;
        edje_object_part_drag_value_get(elm_layout_edje_get(s_vd->genlist), "more_vbar", &x, &part);
        return part;
    };
    const auto retry_popup = [this](int nth) {
        return driver::click_row(row(nth)) && press_popup_button(2) && wait_for(is_over);
    };
    const struct {
        const char *name;
        std::function<void()> script;
        size_t stored; // files
    } cases[] = {
        {"they end before they have rows",
         [&] {
             fake_cloud_fail_upload(140, CLOUD_CONTENT_SYNC_ERROR_SERVER);
             fake_cloud_hold(false);
             ASSERT_TRUE(wait_for(is_over));
             EXPECT_LT(rows().size(), 130u);
             EXPECT_NEAR(without_rows(), 1 - static_cast<double>(rows().size()) / count, 0.05);
             EXPECT_EQ(of_type(ITEM_TYPE_UPLOADED), count - 1);
             EXPECT_EQ(of_type(ITEM_TYPE_FAILED), 1u);
             ASSERT_TRUE(wait_for([count] {
                 elm_genlist_item_show(elm_genlist_last_item_get(s_vd->genlist), ELM_GENLIST_ITEM_SCROLLTO_IN);
                 return rows().size() == count;
             })) << rows().size();
             EXPECT_EQ(without_rows(), 0);
             EXPECT_EQ(rows()[139], "failed file139.txt");
             EXPECT_TRUE(retry_popup(139));
             EXPECT_EQ(rows()[139], "uploaded file139.txt");
         },
         count},
        {"all that have rows are taken out",
         [&] {
             std::vector<UploadItem *> seen;
             for (const RunFile &file : the_run()->files)
                 if (file.item->gen_it)
                     seen.push_back(file.item.get());
             __uploads_cancel(s_vd, seen);
             EXPECT_TRUE(wait_for([] { return rows().size() > 20; })) << rows().size();
             fake_cloud_hold(false);
             ASSERT_TRUE(wait_for(is_over));
             EXPECT_EQ(of_type(ITEM_TYPE_UPLOADED), count - seen.size());
             EXPECT_EQ(fake_cloud_list("/").size(), 1 + count - seen.size());
         },
         0},
        {"another share is next",
         [&] {
             share({"late.txt"});
             fake_cloud_hold(false);
             ASSERT_TRUE(wait_for([] { return s_vd->phase == PHASE_BROWSING; }));
             driver::settle();
             EXPECT_EQ(of_type(ITEM_TYPE_UPLOADED) + of_type(ITEM_TYPE_UPLOADING), 0u);
             EXPECT_EQ(rows()[0], "folder Alpha");
         },
         count},
        {"a result is opened, and left", // the list of the run begins anew
         [&] {
             show_result(old_names, "fail");
             EXPECT_EQ(of_type(ITEM_TYPE_FAILED), count);
             press_back();
             EXPECT_EQ(of_type(ITEM_TYPE_UPLOADING), count);
             fake_cloud_hold(false);
             ASSERT_TRUE(wait_for(is_over));
         },
         count},
        {"nobody is signed in any more",
         [&] {
             fake_cloud_revoke_tokens();
             fake_cloud_hold(false);
             ASSERT_TRUE(wait_for(is_over));
             EXPECT_EQ(of_type(ITEM_TYPE_FAILED), count);
             fake_cloud_sign_in("ann@example.com");
             EXPECT_TRUE(__retry_signed_out(s_vd));
             EXPECT_EQ(the_run()->total(), static_cast<int>(count));
             ASSERT_TRUE(wait_for(is_over));
             EXPECT_EQ(of_type(ITEM_TYPE_UPLOADED), count);
         },
         count},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        fake_cloud_reset();
        fake_cloud_sign_in("ann@example.com");
        fake_cloud_add_folder("/Alpha");
        fake_cloud_refresh_now();
        run([&] {
            start(names);
            c.script();
        });
        EXPECT_TRUE(c.stored == 0 || fake_cloud_list("/").size() == c.stored + 1) << fake_cloud_list("/").size();
    }
}

TEST_F(Queue, SurvivesManySmallFiles)
{
    Texts names;
    for (int i = 0; i < 60; i++)
        names.push_back("file" + std::to_string(i) + ".txt");
    run([&] {
        share(names);
        const double start = ecore_time_get();
        ASSERT_TRUE(press_done());
        ASSERT_TRUE(the_run());
        ASSERT_TRUE(wait_for(is_over));
        EXPECT_LT(ecore_time_get() - start, 15.0) << "no file waits for the worker's next look";
        EXPECT_EQ(the_run()->report.success, 60);
    });
    EXPECT_EQ(fake_cloud_list("/").size(), 64u);
}
