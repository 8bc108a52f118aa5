// Destination names, file types and sizes, and what the notifications of an upload hold.
#include "fake_app.h"
#include "posted.h"
#include "temp_home.h"
#include "velora_upload_file/upload_names.h"
#include "velora_upload_file/upload_notification.h"
#include "velora_upload_file/upload_pace.h"
#include "velora_upload_file/upload_text.h"
#include "velora_upload_file/upload_types.h"
#include <gtest/gtest.h>
#include <map>
#include <sstream>

namespace {
std::vector<std::string> folder_files; // of the open folder, in the database's order
int folder_error;                      // what the enumeration reports with each of them
} // namespace

int cloud_content_sync_folder_foreach_content_from_db(cloud_content_sync_h, cloud_content_sync_folder_h,
                                                      cloud_content_sync_content_cb cb, void *user_data)
{
    for (std::string &name : folder_files)
        if (!cb(reinterpret_cast<cloud_content_sync_content_h>(&name), folder_error, user_data))
            break;
    return CLOUD_CONTENT_SYNC_ERROR_NONE;
}

int cloud_content_sync_content_get_name(cloud_content_sync_content_h content, char **name)
{
    *name = strdup(reinterpret_cast<std::string *>(content)->c_str());
    return CLOUD_CONTENT_SYNC_ERROR_NONE;
}

int cloud_content_sync_content_get_is_thumbnail_exist(cloud_content_sync_content_h, bool *)
{
    return CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND;
}

int cloud_content_sync_content_get_thumbnail_path(cloud_content_sync_content_h, char **)
{
    return CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND;
}

TEST(Names, TakeTheNextFreeCounter)
{
    const std::string e = "\xc3\xa9"; // two bytes, one character
    std::string accents;
    for (int i = 0; i < 125; i++)
        accents += e;
    const struct {
        std::string wanted;
        std::vector<std::string> present;
        std::string result;
    } cases[] = {
        {"photo.jpg", {"photo.jpg", "photo(1).jpg", "photo(2).jpg"}, "photo(3).jpg"},
        {"photo.jpg", {"photo(2).jpg", "photo(1).jpg", "photo.jpg"}, "photo(3).jpg"}, // takes several walks
        {"photo(3).jpg", {"photo(3).jpg"}, "photo(4).jpg"},
        {".profile", {".profile"}, "(1).profile"},
        {"a(0).txt", {"a(0).txt"}, "a(0)(1).txt"},
        {"a(2b).txt", {"a(2b).txt"}, "a(3).txt"},
        {"plan(2024 draft).doc", {"plan(2024 draft).doc"}, "plan(2025).doc"},
        {"file.", {"file."}, "file(1)."},
        {"a(2147483647).txt", {"a(2147483647).txt"}, "a(2147483647)(1).txt"},
        {"README", {"README", "README(1)"}, "README(2)"},
        // what a file system can hold: 255 bytes, cut between characters
        {accents + ".jpeg", {accents + ".jpeg"}, accents.substr(4) + "(1).jpeg"},
    };
    for (const auto &c : cases) {
        for (const char *folder : {"/", "/My Photos"}) {
            AppData ad;
            UploadViewData vd;
            vd.ad = &ad;
            ad.folder_path = const_cast<char *>(folder);
            folder_files = c.present;
            vd.folder = reinterpret_cast<cloud_content_sync_folder_h>(&folder_files);
            const std::string prefix = std::string(folder) == "/" ? "/" : "/My Photos/";
            EXPECT_EQ(taken(__get_upload_server_path(&vd, ("/local/dir.d/" + c.wanted).c_str())), prefix + c.result);
        }
    }
}

TEST(Names, StandWhenTheFolderCannotBeRead)
{
    AppData ad;
    UploadViewData vd;
    LogCatcher log;
    vd.ad = &ad;
    folder_files = {"photo.jpg"};
    EXPECT_EQ(taken(__get_upload_server_path(&vd, "/local/photo.jpg")), "/photo.jpg") << "no folder is open";
    vd.folder = reinterpret_cast<cloud_content_sync_folder_h>(&folder_files);
    folder_error = CLOUD_CONTENT_SYNC_ERROR_DB_FAILED;
    EXPECT_EQ(taken(__get_upload_server_path(&vd, "/local/photo.jpg")), "/photo.jpg");
    folder_error = 0;
}

TEST(Types, FollowTheExtensionAlone)
{
    LogCatcher log;
    const struct {
        const char *name;
        int type;
        const char *ext; // null: none
    } cases[] = {
        {"photo.JPG", 3, "JPG"},  {"clip.Mp4", 4, "Mp4"}, {"feed.OPML", 26, "OPML"},  {"a.tar.gz", 35, "gz"},
        {"ends.", 35, ""},        {"README", 0, nullptr}, {"dir.d/file", 0, nullptr}, {".jpg", 3, "jpg"},
        {"x.jpeg2", 35, "jpeg2"}, {nullptr, 32, nullptr},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name ? c.name : "null");
        EXPECT_EQ(__get_file_type(c.name), c.type);
        EXPECT_EQ(taken(__get_file_ext_name(c.name)), c.ext ? c.ext : "(null)");
    }
}

TEST(Sizes, AreShortInAList)
{
    const std::pair<gint64, const char *> cases[] = {{0, "0\u00a0KB"},           {1, "1\u00a0KB"},
                                                     {600 << 10, "600\u00a0KB"}, {1500 << 10, "1.5\u00a0MB"},
                                                     {12 << 20, "12\u00a0MB"},   {1023 << 10, "1.0\u00a0MB"}};
    for (const auto &[bytes, text] : cases)
        EXPECT_EQ(__short_size(bytes), text) << bytes;
}

TEST(Sizes, HaveTwoDecimalsAndTheFittingUnit)
{
    const struct {
        gint64 bytes;
        const char *text;
    } cases[] = {{0, "0.00KB"},       {1004, "0.98KB"},          {1048575, "1024.00KB"},
                 {1048576, "1.00MB"}, {1073741823, "1024.00MB"}, {1073741824, "1.00GB"},
                 {-2048, "-2.00KB"}};
    for (const auto &c : cases)
        EXPECT_EQ(taken(__get_formatted_size(c.bytes)), c.text) << c.bytes;
}

namespace {

class Notifications : public testing::Test {
  protected:
    void SetUp() override
    {
        fake_app::clear();
    }

    static std::vector<Posted> all()
    {
        return read_posted(VELORA_SHARE_PACKAGE);
    }

    TempHome home;
    LogCatcher log;
};

} // namespace

TEST_F(Notifications, TheOngoingOneFollowsTheQueue)
{
    int id = -1;
    ASSERT_EQ(__progress_noti_new("0 / 5", &id), 0);
    EXPECT_EQ(__progress_noti_set_content(id, "2 / 5"), 0);
    EXPECT_EQ(__progress_noti_set_progress(id, 0.5), 0);
    ASSERT_EQ(all().size(), 1u);
    EXPECT_EQ(all()[0].id, id);
    EXPECT_EQ(all()[0].text, "Velora: 2 / 5");
    EXPECT_EQ(all()[0].looks, "1 260 9 5 50 (null) com.orvant.velora.png B03_velora.png upload com.orvant.velora-share "
                              "Activate");
    EXPECT_EQ(__progress_noti_delete(id), 0);
    EXPECT_TRUE(all().empty());
    for (const int gone : {id, 0, -1})
        EXPECT_EQ(__progress_noti_set_content(gone, "x") + __progress_noti_set_progress(gone, 0.5), -2);
}

TEST_F(Notifications, ChangeTenTimesASecondAndTheLastOneAlways)
{
    // Offers as "MILLISECOND TEXT", a bar's as "MILLISECOND =PERCENT", writes the same; "x" takes the notification
    // away.
    const struct {
        const char *offers, *writes;
    } cases[] = {
        {"0 a, 0 =1, 5 b, 6 c, 150 =2, 160 d, 900 e", "0 a, 0 =1, 200 d, 200 =2, 900 e"},
        {"0 a, 50 b, 60 c, 61 =1, 62 d", "0 a, 50 b, 200 d, 250 =1"},
        {"0 a, 1 b, 2 c, 3 x, 4 d", "0 a, 1 b, 4 d"},
        {"0 a, 300 b, 350 c, 360 d", "0 a, 300 b, 350 c, 500 d"},
    };
    for (const auto &c : cases) {
        std::map<int, std::vector<std::string>> offers;
        for (std::istringstream all(c.offers); !all.eof();) {
            int time = 0;
            std::string word;
            all >> time >> word;
            offers[time].push_back(word.substr(0, word.find(',')));
        }
        NotiPace pace;
        std::string writes;
        for (int ms = 0; ms < 2000; ms++) {
            const NotiPace::Time now{std::chrono::milliseconds(ms + 5000)};
            for (const std::string &word : offers[ms]) {
                if (word == "x")
                    pace.forget(7);
                else if (word[0] == '=')
                    pace.offer({.noti_id = 7, .progress = std::stod(word.substr(1))});
                else
                    pace.offer({.noti_id = 7, .content = word});
            }
            while (const auto change = pace.take(now)) {
                pace.wrote(now);
                const std::string bar = "=" + std::to_string(static_cast<int>(change->progress));
                writes += (writes.empty() ? "" : ", ") + std::to_string(ms) + " " + change->content.value_or(bar);
            }
        }
        EXPECT_EQ(writes, c.writes) << c.offers;
    }
    // From several threads at once, and nothing comes after the end.
    int id = -1, other = -1;
    ASSERT_EQ(__progress_noti_new("0 / 1000", &id), 0);
    std::thread client([id] {
        for (int i = 1; i <= 1000; i++)
            __progress_noti_set_progress(id, i / 1000.0);
    });
    for (int i = 1; i <= 1000; i++)
        __progress_noti_set_count(id, i, 1000);
    client.join();
    EXPECT_TRUE(comes_true(
        [] { return all()[0].text == "Velora: 1000 / 1000" && all()[0].looks.starts_with("1 260 9 5 100"); }));
    __progress_noti_set_content(id, "late");
    __progress_noti_set_content(id, "later");
    __progress_noti_set_content(id, "latest");
    EXPECT_EQ(__progress_noti_delete(id), 0);
    ASSERT_EQ(__progress_noti_new("0 / 2", &other), 0);
    std::this_thread::sleep_for(std::chrono::milliseconds(300));
    ASSERT_EQ(all().size(), 1u);
    EXPECT_EQ(all()[0].text, "Velora: 0 / 2");
}

TEST_F(Notifications, AResultCarriesItsFilesAndTakesTheLastOnesPlace)
{
    char one[] = "/local/a<b>&.jpg", two[] = "/local/it's.txt";
    char *paths[] = {one, two, nullptr};
    int id = -1;
    ASSERT_EQ(__box_noti_new("old", "old", "fail", paths, 1), 0);
    // A full storage counts five files, of which two were tried.
    ASSERT_EQ(__box_noti_new("5 files", "Failed", "fail", paths, 5), 0);
    ASSERT_EQ(all().size(), 1u);
    EXPECT_EQ(all()[0].text, "5 files: Failed fail: a<b>&.jpg it's.txt");
    EXPECT_EQ(all()[0].looks, "0 256 1 2 0 Failed com.orvant.velora.png B03_velora.png upload_result "
                              "com.orvant.velora-share Activate");
    ASSERT_EQ(__progress_noti_new("0 / 1", &id), 0);
    ASSERT_EQ(all().size(), 1u) << "a new run takes the last result away";
    ASSERT_EQ(__box_noti_new("x", "y", "success", nullptr, 0), 0);
    EXPECT_EQ(all().size(), 2u) << "and its end leaves the ongoing one";
}
