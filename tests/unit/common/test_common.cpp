// The account record, the local media queries: real libraries in a home of their own.
#include "account/account.h"
#include "base/base.h"
#include "temp_home.h"
#include "velora_common/velora_account.h"
#include "velora_common/velora_local_data.h"
#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <map>
#include <memory>

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

namespace {

// The records of our package, one line each: domain user mail shown icon photo video.
std::string records()
{
    std::string all;
    account_connect();
    account_query_account_by_package_name(
        [](account_h account, void *data) {
            std::string line;
            for (auto *get : {account_get_domain_name, account_get_user_name, account_get_email_address,
                              account_get_display_name, account_get_icon_path}) {
                char *text = nullptr;
                get(account, &text);
                const CString owned(text);
                line += std::string(text ? text : "-") + " ";
            }
            for (const char *type : {ACCOUNT_SUPPORTS_CAPABILITY_PHOTO, ACCOUNT_SUPPORTS_CAPABILITY_VIDEO}) {
                account_capability_state_e state = ACCOUNT_CAPABILITY_INVALID;
                account_get_capability(account, type, &state);
                line += std::to_string(state) + " ";
            }
            static_cast<std::string *>(data)->append(line).back() = '\n';
            return true;
        },
        VELORA_PACKAGE, &all);
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
        const std::string mail = c.mail, all = records();
        EXPECT_TRUE(all.starts_with("Velora " + mail + " " + mail + " " + mail + " /")) << all;
        EXPECT_TRUE(all.ends_with("/res/images/com.orvant.velora.png " + std::string(c.capabilities) + "\n")) << all;
        EXPECT_EQ(std::ranges::count(all, '\n'), 1) << all;
    }
}

TEST_F(Account, IsFoundAndRemoved)
{
    AccountInfo *const untouched = reinterpret_cast<AccountInfo *>(8);
    AccountInfo *info = untouched;
    EXPECT_EQ(__velora_check_account_exist(VELORA_PACKAGE, &info), -1);
    EXPECT_EQ(info, untouched);
    const int nothing_there = _velora_common_account_remove_info_from_db();
    EXPECT_NE(nothing_there, 0);
    EXPECT_NE(nothing_there, -1); // that would mean: the service cannot be reached

    ASSERT_EQ(_velora_common_account_insert(nullptr, "ann@example.com"), 0);
    ASSERT_EQ(__velora_check_account_exist(VELORA_PACKAGE, &info), 0);
    EXPECT_STREQ(info->user_name, "ann@example.com");
    EXPECT_STREQ(info->domain_name, "Velora");
    EXPECT_GE(info->account_id, 1);
    __velora_account_info_free(info);
    EXPECT_EQ(__velora_check_account_exist("com.example.other", &info), -1);

    EXPECT_EQ(_velora_common_account_remove_info_from_db(), 0);
    EXPECT_EQ(records(), "");
}

TEST_F(Account, FailsWhenTheDatabaseCannotBeOpened)
{
    std::filesystem::create_directory(home.path + "/accounts.db");
    AccountInfo *info = nullptr;
    EXPECT_EQ(_velora_common_account_insert(nullptr, "ann@example.com"), -1);
    EXPECT_TRUE(log.has("__velora_account_set_info_to_db failed"));
    EXPECT_EQ(__velora_check_account_exist(VELORA_PACKAGE, &info), -1);
    EXPECT_EQ(_velora_common_account_remove_info_from_db(), -1);
}

TEST(LocalData, FindsExactlyThePictureAtAPath)
{
    const TempHome home;
    LogCatcher log;
    // A picture of one black dot.
    static const unsigned char dot[] = {'P', '5', '\n', '1', ' ', '1', '\n', '2', '5', '5', '\n', 0};
    const auto write = [&home](const std::string &name) {
        const std::string path = home.path + "/" + name;
        std::filesystem::create_directories(std::filesystem::path(path).parent_path());
        std::ofstream(path, std::ios::binary).write(reinterpret_cast<const char *>(dot), sizeof dot);
        return path;
    };
    const std::string too_long = home.path + std::string(500, 'x') + ".pgm";
    const struct {
        std::string path;
        const char *ext; // null: not found
    } cases[] = {
        {write("plain.pgm"), "pgm"},
        {write("it's Ann's.pgm"), "pgm"},
        {write("' OR MEDIA_TYPE=0 OR MEDIA_PATH='x.pgm"), "pgm"},
        {write("100% \"of\" them.pgm"), "pgm"},
        {write("letter.txt"), nullptr},
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
        EXPECT_EQ(item, nullptr);
    }
    EXPECT_EQ(_velora_common_local_data_get_media_by_path(nullptr, &item), -1);
    EXPECT_TRUE(log.has("Invalid path!"));
    EXPECT_EQ(_velora_common_local_data_disconnect(), 0);
    EXPECT_EQ(_velora_common_local_data_disconnect(), -1);
}

TEST(LocalData, TellsTheExtensionOfAFile)
{
    LogCatcher log;
    const struct {
        const char *path, *ext;
    } cases[] = {{"/a/archive.tar.gz", "gz"},   {"/a/README", nullptr}, {"/a.b/README", nullptr}, {".profile", nullptr},
                 {"/home/.profile", "profile"}, {"/a/file.", ""},       {nullptr, nullptr}};
    for (const auto &c : cases) {
        char *ext = nullptr;
        EXPECT_EQ(_velora_common_file_attr_get_file_ext(c.path, &ext), c.ext ? 0 : -1) << (c.path ? c.path : "null");
        EXPECT_STREQ(ext, c.ext);
        g_free(ext);
    }
}
