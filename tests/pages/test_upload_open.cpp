// Opening a file of the open folder: which application gets which request, and what happens when it cannot be had.
#include "upload_page.h"

#include <filesystem>
#include <unistd.h>

namespace {

class Opening : public UploadPage {
  protected:
    std::string media = home.path + "/media";
    std::string scratch = media + "/Downloads/.com.orvant.docshelf/files/scratch/";

    void SetUp() override
    {
        UploadPage::SetUp();
        setenv("VELORA_MEDIA_ROOT", media.c_str(), 1);
        fake_app::install_viewer("application/pdf", "reader");
        fake_app::install_viewer("audio/mpeg", "music");
    }
    // Shares something, to be where the files are. Each file holds its own path.
    void browse(const std::vector<std::string> &names)
    {
        fake_cloud_reset();
        for (const std::string &name : names)
            fake_cloud_add_file("/" + name, "/" + name);
        fake_cloud_refresh_now();
        share({"new.txt"});
        draw(); // a row knows its kind from its icon on
    }
    static bool wait_for_launch()
    {
        return wait_for([] { return !fake_app::sent().empty() && !s_vd->ad->popup; });
    }
    static void forget()
    {
        for (const fake_app::Sent &sent : fake_app::sent())
            app_control_destroy(sent.request);
        fake_app::sent().clear();
    }
    // Everything an application is told, "file:" standing for what is in the local file that is meant.
    static std::string told()
    {
        std::string all;
        for (const fake_app::Sent &sent : fake_app::sent()) {
            char *app = nullptr, *uri = nullptr, *operation = nullptr;
            app_control_get_app_id(sent.request, &app);
            app_control_get_uri(sent.request, &uri);
            app_control_get_operation(sent.request, &operation);
            all += last_part(taken(operation)) + (app ? std::string(" ") + app : "");
            if (std::ifstream file(uri ? uri : ""); uri && file)
                all += " file:" + std::string(std::istreambuf_iterator<char>(file), {});
            else if (uri)
                all += std::string(" ") + uri;
            for (const char *key : {"request_type", "files", "filecount"}) {
                char *value = nullptr;
                if (app_control_get_extra_data(sent.request, key, &value) == 0 && value)
                    all += std::string(" ") + key + "=" + value;
                free(value);
            }
            free(app);
            free(uri);
        }
        forget();
        return all;
    }
};

} // namespace

TEST_F(Opening, GivesEachKindToItsApplication)
{
    const struct {
        const char *name, *told;
        bool is_in_scratch = false;
    } cases[] = {
        {"photo.PNG", "view file:/photo.PNG"},
        {"clip.mp4", "view com.orvant.video-player-lite https://media.example.org/clip.mp4"},
        {"tone.wav",
         "view com.orvant.sound-player-lite request_type=files files=https://media.example.org/tone.wav filecount=1"},
        {"song.mp3", "view file:/song.mp3", true},
        {"a <b>&.pdf", "view file:/a <b>&.pdf", true},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        run([&] {
            browse({c.name});
            fake_cloud_hold(true);
            ASSERT_TRUE(driver::click_row(row(0)));
            EXPECT_TRUE(shows("Processing…"));
            fake_cloud_hold(false);
            ASSERT_TRUE(wait_for_launch());
            EXPECT_EQ(told(), c.told);
            EXPECT_EQ(std::filesystem::exists(scratch + c.name), c.is_in_scratch);
            fake_cloud_set_reachable(false); // what is here already needs no service
            ASSERT_TRUE(driver::click_row(row(0)));
            EXPECT_TRUE(wait_for_launch());
            EXPECT_EQ(told(), c.told);
            vconf_set_str("memory/connection/type", "none");
            ASSERT_TRUE(driver::click_row(row(0)));
            EXPECT_EQ(fake_app::sent().empty(), c.is_in_scratch);
            EXPECT_EQ(shows("Wi-Fi connection required. Connect to a Wi-Fi network and try again."), c.is_in_scratch);
            forget();
            vconf_set_str("memory/connection/type", "wifi");
        });
    }
}

TEST_F(Opening, AnswersWhenNothingCanBeOpened)
{
    const struct {
        const char *name, *message;
    } cases[] = {
        {"odd.qqq", "No application can perform this action!"},
        {"README", "No application can perform this action!"},
        {"line\nbreak.pdf", "No application can perform this action!"}, // a name that is none in the scratch folder
        {"gone.pdf", "No connection"},
        {"gone.jpg", "No connection"},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        run([&] {
            browse({c.name});
            fake_cloud_fail_content(CLOUD_CONTENT_SYNC_ERROR_NETWORK);
            ASSERT_TRUE(driver::click_row(row(0)));
            EXPECT_TRUE(wait_for([&] { return log.has(c.message); }));
            EXPECT_TRUE(wait_for([] { return !s_vd->ad->popup; })) << "no wait for what will not come";
            EXPECT_EQ(told(), "");
        });
    }
    ASSERT_TRUE(std::filesystem::exists(scratch));
    for (const auto &left : std::filesystem::directory_iterator(scratch))
        ADD_FAILURE() << "left behind: " << left.path();
}

TEST_F(Opening, DropsTheAnswerOfACancelledRequestAndOfARowThatIsGone)
{
    for (const bool is_cancelled : {true, false}) {
        run([&] {
            browse({"paper.pdf"});
            fake_cloud_hold(true);
            ASSERT_TRUE(driver::click_row(row(0)));
            fake_cloud_let_through(1);
            usleep(100'000); // the answer lies in the pipe, unread
            if (is_cancelled)
                evas_object_smart_callback_call(elm_object_part_content_get(s_vd->ad->popup, "button1"), "clicked",
                                                nullptr);
            else
                _velora_upload_view_update(); // new rows, the old ones' requests with them
            driver::settle();
            EXPECT_EQ(s_vd->ad->popup, nullptr);
            EXPECT_EQ(told(), "");
            fake_cloud_hold(false);
            fake_cloud_refresh_now();
            ASSERT_TRUE(driver::click_row(row(0))); // its answer comes behind any that is late
            ASSERT_TRUE(wait_for_launch());
            EXPECT_EQ(told(), "view file:/paper.pdf");
        });
        std::filesystem::remove_all(media);
    }
}

TEST_F(Opening, DoesNotTakeAnotherFoldersCopy)
{
    run([&] {
        browse({"paper.pdf"});
        std::filesystem::create_directories(scratch);
        std::ofstream(scratch + "paper.pdf") << "of some other folder";
        ASSERT_TRUE(driver::click_row(row(0)));
        ASSERT_TRUE(wait_for_launch());
        EXPECT_EQ(told(), "view file:/paper.pdf");
    });
}
