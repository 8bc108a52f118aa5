// The account record, the local media queries: real libraries in a home of their own.
#include "accounts.h"
#include "base/base.h"
#include "velora_common/velora_account.h"
#include "velora_common/velora_local_data.h"
#include <gtest/gtest.h>

#include <map>

namespace {
// What the cloud client says of a content type's activation; a type that is not here cannot be read.
std::map<int, bool> activation;
} // namespace

int cloud_content_sync_setting_get_type_activation(cloud_content_sync_h, int content_type, bool *value)
{
    const auto found = activation.find(content_type);
    if (found == activation.end())
        return CLOUD_CONTENT_SYNC_ERROR_DB_FAILED;
    *value = found->second;
    return CLOUD_CONTENT_SYNC_ERROR_NONE;
}

void _velora_app_exit(AppData *) {}

namespace {

// The records of our package.
std::vector<std::string> records()
{
    account_connect();
    const auto all = read_accounts(VELORA_PACKAGE);
    account_disconnect();
    return all;
}

class Account : public testing::Test {
  protected:
    void SetUp() override
    {
        platform_package_set(VELORA_PACKAGE);
        activation = {{CLOUD_CONTENT_TYPE_IMAGE, true}, {CLOUD_CONTENT_TYPE_VIDEO, true}};
    }
    TempHome home;
    LogCatcher log;
};

} // namespace

TEST_F(Account, IsWrittenOnceAndUpdatedByTheNextSignIn)
{
    const struct {
        const char *mail;
        std::map<int, bool> activation;
        const char *capabilities; // photo, video
    } sign_ins[] = {
        {"ann@example.com", {{CLOUD_CONTENT_TYPE_IMAGE, true}, {CLOUD_CONTENT_TYPE_VIDEO, false}}, "2 1"},
        {"bob@example.com", {{CLOUD_CONTENT_TYPE_IMAGE, false}, {CLOUD_CONTENT_TYPE_VIDEO, true}}, "1 2"},
        {"bob@example.com", {}, "2 2"}, // unreadable counts as on
    };
    for (const auto &c : sign_ins) {
        activation = c.activation;
        ASSERT_EQ(_velora_common_account_insert(nullptr, c.mail), 0);
        const std::vector<std::string> all = records();
        ASSERT_EQ(all.size(), 1u);
        const std::string mail = c.mail, icon = "/res/images/com.orvant.velora.png ";
        EXPECT_TRUE(all[0].starts_with("1 Velora " + mail + " " + mail + " " + mail + " /")) << all[0];
        EXPECT_TRUE(all[0].ends_with(icon + c.capabilities)) << all[0];
    }
}

TEST_F(Account, IsFoundAndRemoved)
{
    AccountInfo *info = nullptr;
    EXPECT_EQ(__velora_check_account_exist(VELORA_PACKAGE, &info), -1);
    const int nothing_there = _velora_common_account_remove_info_from_db();
    EXPECT_NE(nothing_there, 0);
    EXPECT_NE(nothing_there, -1); // that would mean: the service cannot be reached

    ASSERT_EQ(_velora_common_account_insert(nullptr, "ann@example.com"), 0);
    EXPECT_EQ(__velora_check_account_exist("com.example.other", &info), -1);
    ASSERT_EQ(__velora_check_account_exist(VELORA_PACKAGE, &info), 0);
    EXPECT_STREQ(info->user_name, "ann@example.com");
    __velora_account_info_free(info);
    EXPECT_EQ(_velora_common_account_remove_info_from_db(), 0);
    EXPECT_TRUE(records().empty());

    std::filesystem::remove(home.path + "/accounts.db");
    std::filesystem::create_directory(home.path + "/accounts.db"); // which cannot be opened
    EXPECT_EQ(_velora_common_account_insert(nullptr, "ann@example.com"), -1);
    EXPECT_EQ(__velora_check_account_exist(VELORA_PACKAGE, &info), -1);
    EXPECT_EQ(_velora_common_account_remove_info_from_db(), -1);
}

TEST(LocalData, FindsExactlyThePictureAtAPath)
{
    const TempHome home;
    LogCatcher log;
    const std::string dot("P5\n1 1\n255\n\0", 12); // a picture of one black dot
    const std::string too_long = home.path + std::string(500, 'x') + ".pgm";
    const struct {
        std::string path;
        const char *ext; // null: not found
    } cases[] = {
        {home.file("plain.pgm", dot), "pgm"},
        {home.file("it's Ann's.pgm", dot), "pgm"},
        {home.file("' OR MEDIA_TYPE=0 OR MEDIA_PATH='x.pgm", dot), "pgm"},
        {home.file("letter.txt", dot), nullptr},
        {home.path + "/missing.pgm", nullptr},
        {home.path + "/missing' OR MEDIA_TYPE=0 OR MEDIA_PATH='", nullptr},
        {too_long, nullptr},
        {"", nullptr},
    };
    LocalMediaItem *item = nullptr;
    EXPECT_EQ(_velora_common_local_data_get_media_by_path(cases[0].path.c_str(), &item), -1) << "not connected";
    ASSERT_EQ(_velora_common_local_data_connect(), 0);
    for (const auto &c : cases) {
        item = nullptr;
        EXPECT_EQ(_velora_common_local_data_get_media_by_path(c.path.c_str(), &item), c.ext ? 0 : -1) << c.path;
        if (!item)
            continue;
        EXPECT_EQ(item->file_path, c.path);
        EXPECT_STREQ(item->ext, c.ext);
        __velora_local_data_free_media_item(&item);
    }
    EXPECT_EQ(_velora_common_local_data_disconnect(), 0);
    EXPECT_EQ(_velora_common_local_data_disconnect(), -1);
}
