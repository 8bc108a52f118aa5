// Choosing the destination, waiting for the folder tree, results, and the languages.
#include "app/language.h"
#include "upload_page.h"

#include <set>

namespace {

class Browser : public UploadPage {
  protected:
    static Evas_Object *bar()
    {
        return driver::find_widget(s_vd->layout, "elm_toolbar");
    }
    static Texts path_bar()
    {
        Texts all;
        for (Elm_Object_Item *item = elm_toolbar_first_item_get(bar()); item; item = elm_toolbar_item_next_get(item))
            all.push_back(elm_object_item_text_get(item));
        return all;
    }
    static bool tap_path(const char *label)
    {
        return driver::click(driver::find_text(bar(), label));
    }
    static bool enter(const std::string &name)
    {
        const Texts all = rows();
        const auto found = std::ranges::find(all, "folder " + name);
        return found != all.end() && driver::click_row(row(static_cast<int>(found - all.begin())));
    }
    static std::string folder()
    {
        return s_vd->folder ? s_vd->ad->folder_path : "(none)";
    }
    static bool jump_over()
    {
        return wait_for([] { return !__path_bar_is_jumping(); });
    }
};

} // namespace

TEST_F(Browser, WalksDownAndBackUp)
{
    run([&] {
        share({"new.txt"});
        EXPECT_EQ(rows(), (Texts{"folder Alpha", "folder R&D <b>", "folder Velora", "file one.jpg"}));
        EXPECT_TRUE(shows("R&D <b>")) << driver::read_texts(window());
        ASSERT_TRUE(enter("R&D <b>"));
        EXPECT_EQ(folder(), "/R&D <b>");
        EXPECT_TRUE(driver::find_text(bar(), "R&D <b>")) << "on the path bar, as it stands";
        EXPECT_TRUE(rows().empty());
        press_back();
        ASSERT_TRUE(enter("Alpha"));
        ASSERT_TRUE(enter("Beta"));
        EXPECT_EQ(path_bar(), (Texts{"Velora", "Alpha", "Beta"}));
        EXPECT_EQ(rows(), (Texts{"folder Gamma"}));
        press_back();
        EXPECT_EQ(folder(), "/Alpha");
        EXPECT_EQ(path_bar(), (Texts{"Velora", "Alpha"}));
        press_back();
        EXPECT_EQ(folder(), "/");
        EXPECT_EQ(path_bar(), (Texts{"Velora"}));
        press_back(); // at the root: the way out
        EXPECT_TRUE(wait_for_exit());
    });
    EXPECT_TRUE(is_answered());
}

TEST_F(Browser, JumpsByThePathBar)
{
    run([&] {
        share({"new.txt"});
        for (const char *name : {"Alpha", "Beta", "Gamma"})
            ASSERT_TRUE(enter(name));
        ASSERT_TRUE(tap_path("Gamma")); // where we are
        EXPECT_FALSE(__path_bar_is_jumping());
        ASSERT_TRUE(tap_path("Beta"));
        EXPECT_EQ(path_bar(), (Texts{"Velora", "Alpha", "Beta"}));
        ASSERT_TRUE(__path_bar_is_jumping());
        ASSERT_TRUE(tap_path("Velora")); // too soon
        EXPECT_EQ(path_bar(), (Texts{"Velora", "Alpha", "Beta"}));
        ASSERT_TRUE(jump_over());
        EXPECT_EQ(folder(), "/Alpha/Beta");
        EXPECT_EQ(rows(), (Texts{"folder Gamma"}));

        ASSERT_TRUE(enter("Gamma"));
        ASSERT_TRUE(tap_path("Velora"));
        EXPECT_EQ(path_bar(), (Texts{"Velora"}));
        ASSERT_TRUE(jump_over());
        EXPECT_EQ(folder(), "/");
        EXPECT_EQ(rows().size(), 4u);

        for (const char *name : {"Alpha", "Beta", "Gamma"})
            ASSERT_TRUE(enter(name));
        fake_cloud_remove("/Alpha/Beta");
        fake_cloud_refresh_now();
        ASSERT_TRUE(tap_path("Beta"));
        ASSERT_TRUE(jump_over());
        EXPECT_EQ(folder(), "(none)");
        EXPECT_TRUE(elm_object_disabled_get(s_vd->done_btn));
        ASSERT_TRUE(tap_path("Alpha"));
        ASSERT_TRUE(jump_over());
        EXPECT_EQ(folder(), "/Alpha");
        EXPECT_FALSE(elm_object_disabled_get(s_vd->done_btn));

        ASSERT_TRUE(tap_path("Velora"));
        _velora_app_exit(s_vd->ad); // with the jump still to come
    });
}

TEST_F(Browser, BackOnTheWaitGivesUpTheShareAndStays)
{
    fake_cloud_reset();
    fake_cloud_hold(true);
    run([&] {
        share({"new.txt"});
        press_back();
        ASSERT_TRUE(s_vd);
        EXPECT_EQ(s_vd->ad->popup, nullptr);
        EXPECT_EQ(__waiting_count(), 0);
        EXPECT_FALSE(driver::exit_requested());
        fake_cloud_hold(false); // the refresh still ends, and there is nothing to upload
        ASSERT_TRUE(wait_for([] { return s_vd->ad->popup != nullptr; }));
        driver::settle();
        EXPECT_TRUE(press_popup_button(1));
        EXPECT_TRUE(wait_for_exit());
    });
}

TEST_F(Browser, ARefreshLeavesTheRowsAloneThatAreStillTrue)
{
    for (const bool is_changed : {false, true}) {
        run([&] {
            fake_cloud_hold(true);
            share({"new.txt"});
            Elm_Object_Item *const first = row(0);
            if (is_changed)
                fake_cloud_add_file("/zebra.txt", "");
            fake_cloud_hold(false);
            EXPECT_EQ(wait_for([] { return rows().back() == "file zebra.txt"; }, is_changed ? 20 : 0.3), is_changed);
            EXPECT_EQ(row(0) == first, !is_changed);
        });
    }
}

TEST_F(Browser, SaysWhatIsWrongAndTriesAgain)
{
    for (const auto &[error, words] :
         {std::pair(CLOUD_CONTENT_SYNC_ERROR_NETWORK, "Velora cannot be reached"), // with Wi-Fi on
          {CLOUD_CONTENT_SYNC_ERROR_SERVER, "Velora cannot be reached"}}) {
        fake_cloud_reset();
        fake_cloud_add_folder("/Fresh");
        fake_cloud_fail_refresh(error);
        run([&, text = words] {
            share({"new.txt"});
            ASSERT_TRUE(wait_for([] { return __state_shown(s_vd) > VIEW_STATE_LOADING && !s_vd->ad->popup; }));
            EXPECT_TRUE(elm_object_disabled_get(s_vd->done_btn)) << "no folder to upload into";
            EXPECT_TRUE(shows(text)) << driver::read_texts(window());
            ASSERT_TRUE(driver::click(driver::find_text(window(), "Try again")));
            EXPECT_TRUE(wait_for([] { return rows() == Texts{"folder Fresh"}; }));
            EXPECT_FALSE(elm_object_disabled_get(s_vd->done_btn));
        });
    }
    fake_cloud_fail_create(CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE);
    run([&] {
        share({"new.txt"});
        ASSERT_TRUE(s_vd->ad->popup);
        EXPECT_TRUE(press_popup_button(1));
        EXPECT_TRUE(wait_for_exit());
    });
}

TEST_F(Browser, SpeaksTheChosenLanguage)
{
    std::set<std::string> all;
    for (const char *language : {"de", "en"}) {
        for (const char *name : {"LANG", "LC_ALL", "LC_MESSAGES", "LANGUAGE"})
            unsetenv(name);
        vconf_set_str("db/menu_widget/language", (std::string(language) + ".UTF-8").c_str());
        language_apply();
        run([&] {
            share({"a.txt"});
            driver::settle();
            const std::string texts = driver::read_texts(window());
            EXPECT_EQ(texts.find("IDS_"), std::string::npos) << texts;
            all.insert(texts);
        });
    }
    EXPECT_EQ(all.size(), 2u);
}
