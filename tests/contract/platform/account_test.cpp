#include "account/account.h"
#include "support.h"
#include <vector>

namespace {

class Account : public PlatformTest {
  protected:
    void SetUp() override
    {
        PlatformTest::SetUp();
        platform_package_set("com.example.owner");
        ASSERT_EQ(account_connect(), ACCOUNT_ERROR_NONE);
    }

    void TearDown() override
    {
        EXPECT_EQ(account_disconnect(), ACCOUNT_ERROR_NONE);
        PlatformTest::TearDown();
    }
};

account_h record(const char *user)
{
    account_h account = nullptr;
    account_create(&account);
    account_set_domain_name(account, "Cloud");
    account_set_user_name(account, user);
    account_set_capability(account, ACCOUNT_SUPPORTS_CAPABILITY_PHOTO, ACCOUNT_CAPABILITY_ENABLED);
    return account;
}

int insert(const char *user, int *id)
{
    account_h account = record(user);
    const int result = account_insert_to_db(account, id);
    account_destroy(account);
    return result;
}

std::string text(account_h account, int (*get)(account_h, char **))
{
    char *value = nullptr;
    get(account, &value);
    return taken(value);
}

// "id:user:e-mail:photo:video" of each record of a package.
std::vector<std::string> records(const char *package, int expected = ACCOUNT_ERROR_NONE)
{
    std::vector<std::string> all;
    const auto add = [](account_h account, void *data) {
        int id = -1;
        account_capability_state_e photo = ACCOUNT_CAPABILITY_INVALID, video = ACCOUNT_CAPABILITY_INVALID;
        account_get_account_id(account, &id);
        account_get_capability(account, ACCOUNT_SUPPORTS_CAPABILITY_PHOTO, &photo);
        account_get_capability(account, ACCOUNT_SUPPORTS_CAPABILITY_VIDEO, &video);
        static_cast<std::vector<std::string> *>(data)->push_back(
            std::to_string(id) + ":" + text(account, account_get_user_name) + ":" +
            text(account, account_get_email_address) + ":" + std::to_string(photo) + ":" + std::to_string(video));
        return true;
    };
    EXPECT_EQ(account_query_account_by_package_name(add, package, &all), expected);
    return all;
}

using Lines = std::vector<std::string>;

} // namespace

TEST_F(Account, RecordsBelongToTheProcessesPackage)
{
    EXPECT_EQ(records("com.example.owner", ACCOUNT_ERROR_RECORD_NOT_FOUND), Lines());
    int id = 0;
    ASSERT_EQ(insert("a@b", &id), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(id, 1);
    EXPECT_EQ(records("com.example.owner"), Lines{"1:a@b:(null):2:0"});
    EXPECT_EQ(records("com.example", ACCOUNT_ERROR_RECORD_NOT_FOUND), Lines());
    EXPECT_EQ(insert("a@b", &id), ACCOUNT_ERROR_DB_FAILED);
    EXPECT_EQ(insert("c@d", &id), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(records("com.example.owner").size(), 2u);
    EXPECT_EQ(account_delete_from_db_by_package_name("com.example.owner"), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(account_delete_from_db_by_package_name("com.example.owner"), ACCOUNT_ERROR_RECORD_NOT_FOUND);
    EXPECT_EQ(insert("a@b", &id), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(records("com.example.owner"), Lines{"3:a@b:(null):2:0"}); // neither the id nor a capability comes back
}

TEST_F(Account, UpdateWritesOnlyWhatWasSet)
{
    int id = 0;
    insert("a@b", &id);
    // One who read the record earlier must not undo what others wrote since.
    const auto update = [](account_h account, void *data) {
        const int own = *static_cast<int *>(data);
        account_h other = nullptr;
        account_create(&other);
        account_set_user_name(other, "z@b");
        account_set_email_address(other, "new@b");
        account_set_capability(other, ACCOUNT_SUPPORTS_CAPABILITY_PHOTO, ACCOUNT_CAPABILITY_DISABLED);
        EXPECT_EQ(account_update_to_db_by_id(other, own), ACCOUNT_ERROR_NONE);
        account_destroy(other);
        account_set_capability(account, ACCOUNT_SUPPORTS_CAPABILITY_VIDEO, ACCOUNT_CAPABILITY_ENABLED);
        EXPECT_EQ(account_update_to_db_by_id(account, own), ACCOUNT_ERROR_NONE);
        return true;
    };
    EXPECT_EQ(account_query_account_by_package_name(update, "com.example.owner", &id), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(records("com.example.owner"), Lines{"1:z@b:new@b:1:2"});

    account_h account = record("x@y");
    EXPECT_EQ(account_update_to_db_by_id(account, 99), ACCOUNT_ERROR_RECORD_NOT_FOUND);
    account_set_capability(account, ACCOUNT_SUPPORTS_CAPABILITY_PHOTO, ACCOUNT_CAPABILITY_INVALID);
    EXPECT_EQ(account_update_to_db_by_id(account, id), ACCOUNT_ERROR_NONE);
    account_destroy(account);
    EXPECT_EQ(records("com.example.owner"), Lines{"1:x@y:new@b:0:2"});
}

TEST_F(Account, FailedUpdateChangesNothing)
{
    int id = 0;
    account_h account = record("a@b");
    account_set_domain_name(account, "Other");
    EXPECT_EQ(account_insert_to_db(account, &id), ACCOUNT_ERROR_NONE);
    insert("c@d", &id);
    // Its domain can be written, and then its user name is taken there.
    EXPECT_EQ(account_set_user_name(account, "a@b"), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(account_set_domain_name(account, "Other"), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(account_update_to_db_by_id(account, id), ACCOUNT_ERROR_DB_FAILED);
    account_destroy(account);
    EXPECT_EQ(records("com.example.owner"), (Lines{"1:a@b:(null):2:0", "2:c@d:(null):2:0"}));
    EXPECT_EQ(insert("c@d", &id), ACCOUNT_ERROR_DB_FAILED); // it is in its own domain still
}

TEST_F(Account, CallsNeedAConnectionAndArguments)
{
    account_h account = record("a@b");
    int id = 0;
    EXPECT_EQ(account_insert_to_db(nullptr, &id), ACCOUNT_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(account_set_user_name(account, nullptr), ACCOUNT_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(account_get_account_id(account, &id), ACCOUNT_ERROR_RECORD_NOT_FOUND);
    EXPECT_EQ(account_connect(), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(account_disconnect(), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(account_disconnect(), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(account_disconnect(), ACCOUNT_ERROR_DB_NOT_OPENED);
    EXPECT_EQ(account_insert_to_db(account, &id), ACCOUNT_ERROR_DB_NOT_OPENED);
    EXPECT_EQ(records("com.example.owner", ACCOUNT_ERROR_DB_NOT_OPENED), Lines());
    EXPECT_EQ(account_connect(), ACCOUNT_ERROR_NONE);
    account_destroy(account);
}
