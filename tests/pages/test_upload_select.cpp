// The selection mode: what is counted, what Done does, and what an upload's end changes in it.
#include "upload_page.h"

namespace {

class Selecting : public UploadPage {
  protected:
    // A queue of files with the cloud held, and the selection mode on.
    void start(const std::vector<std::string> &names)
    {
        share(names);
        fake_cloud_hold(true);
        ASSERT_TRUE(press_done());
        ASSERT_TRUE(wait_for([] { return !fake_cloud_upload_log().empty(); }));
        select();
    }
    void select()
    {
        driver::press(window(), "Menu");
        ASSERT_TRUE(popup_is("more menu"));
        driver::press(window(), "Menu"); // closes it
        ASSERT_TRUE(wait_for([] { return !s_vd->ad->popup; }));
        __ctx_delete_cb(s_vd, nullptr, nullptr);
        driver::settle();
        draw();
    }
    static bool tap(int nth)
    {
        return driver::click_row(row(nth));
    }
    static bool tap_all()
    {
        return driver::click_row(__select_all_row());
    }
    static bool done()
    {
        return driver::click(s_vd->done_btn);
    }
    // "N Selected" with an "all" for the check of the select-all row and a "!" when Done cannot be pressed.
    static std::string state()
    {
        if (!s_vd->is_select_mode)
            return "off";
        std::string title = elm_object_item_part_text_get(s_vd->nf_item, "elm.text.title");
        Evas_Object *check = driver::find_widget(elm_object_item_widget_get(__select_all_row()), "elm_check");
        return title + (check && elm_check_state_get(check) ? " all" : "") +
               (elm_object_disabled_get(s_vd->done_btn) ? "!" : "");
    }
};

} // namespace

TEST_F(Selecting, CountsWhatIsStillInTheQueue)
{
    run([&] {
        start({"a.txt", "b.txt", "c.txt"});
        EXPECT_EQ(state(), "0 Selected!");
        const struct {
            int row; // -1: all
            const char *state;
        } taps[] = {{1, "1 Selected"},      {0, "2 Selected"},   {2, "3 Selected all"}, {0, "2 Selected"},
                    {-1, "3 Selected all"}, {-1, "0 Selected!"}, {0, "1 Selected"}};
        for (const auto &one : taps) {
            ASSERT_TRUE(one.row < 0 ? tap_all() : tap(one.row));
            EXPECT_EQ(state(), one.state) << one.row;
        }
        fake_cloud_let_through(3); // the first file ends, and with it its flag
        ASSERT_TRUE(wait_for([] { return rows()[0] == "uploaded a.txt" && state() == "0 Selected!"; })) << state();
        ASSERT_TRUE(tap_all());
        EXPECT_EQ(state(), "2 Selected all");
        press_back();
        EXPECT_EQ(state(), "off");
        EXPECT_EQ(rows().size(), 3u) << "nothing left the queue";
        select();
        EXPECT_EQ(state(), "0 Selected!") << "nothing is remembered";
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for(is_over));
        EXPECT_EQ(state(), "off") << "with the end of the queue";
    });
}

TEST_F(Selecting, DoneTakesTheSelectedOutAndAsksForTheRunningOne)
{
    const struct {
        const char *name;
        std::vector<int> taps;
        int button; // of the popup; 0: there is none
        Texts rows; // in the end
    } cases[] = {
        {"waiting ones", {1, 2}, 0, {"uploaded a.txt"}},
        {"the running one, after all not", {0, 1}, 1, {"uploaded a.txt", "uploaded b.txt", "uploaded c.txt"}},
        {"the running one", {0, 2}, 2, {"uploaded b.txt"}},
        {"all", {-1}, 2, {}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        fake_cloud_reset();
        fake_cloud_refresh_now();
        run([&] {
            start({"a.txt", "b.txt", "c.txt"});
            for (const int nth : c.taps)
                ASSERT_TRUE(nth < 0 ? tap_all() : tap(nth));
            ASSERT_TRUE(done());
            EXPECT_EQ(state(), "off");
            EXPECT_EQ(s_vd->ad->popup != nullptr, c.button != 0);
            EXPECT_TRUE(c.button == 0 || press_popup_button(c.button));
            fake_cloud_hold(false);
            ASSERT_TRUE(wait_for(is_over));
            EXPECT_EQ(rows(), c.rows);
            EXPECT_EQ(shows("Nothing left to upload"), c.rows.empty());
        });
    }
}

TEST_F(Selecting, StopsAQueueLongerThanAnOldTableOfFlags)
{
    Texts names;
    for (int i = 0; i < 1010; i++)
        names.push_back("file" + std::to_string(i) + ".txt");
    run([&] {
        start(names);
        ASSERT_TRUE(tap_all());
        EXPECT_EQ(state(), "1010 Selected all");
        ASSERT_TRUE(tap(0));
        EXPECT_EQ(state(), "1009 Selected");
        ASSERT_TRUE(tap(0));
        ASSERT_TRUE(done());
        ASSERT_TRUE(press_popup_button(2));
        fake_cloud_hold(false);
        ASSERT_TRUE(wait_for(is_over));
        EXPECT_EQ(fake_cloud_upload_log().size(), 1u) << "none slips through while the others are taken out";
    });
}
