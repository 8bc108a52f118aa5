#include "accounts.h"
#include "support.h"

namespace {

class Account : public PlatformTest {
  protected:
    void SetUp() override
    {
        platform_package_set("com.example.owner");
        ASSERT_EQ(account_connect(), ACCOUNT_ERROR_NONE);
    }

    void TearDown() override
    {
        EXPECT_EQ(account_disconnect(), ACCOUNT_ERROR_NONE);
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

std::vector<std::string> records(const char *package, int expected = ACCOUNT_ERROR_NONE)
{
    int result = -1;
    const auto all = read_accounts(package, &result);
    EXPECT_EQ(result, expected);
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
    EXPECT_EQ(records("com.example.owner"), Lines{"1 Cloud a@b - - - 2 0"});
    EXPECT_EQ(records("com.example", ACCOUNT_ERROR_RECORD_NOT_FOUND), Lines());
    EXPECT_EQ(insert("a@b", &id), ACCOUNT_ERROR_DB_FAILED);
    EXPECT_EQ(account_delete_from_db_by_package_name("com.example.owner"), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(insert("a@b", &id), ACCOUNT_ERROR_NONE);
    EXPECT_EQ(records("com.example.owner"),
              Lines{"2 Cloud a@b - - - 2 0"}); // neither the id nor a capability comes back
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
    EXPECT_EQ(records("com.example.owner"), Lines{"1 Cloud z@b new@b - - 1 2"});

    account_h account = record("x@y");
    EXPECT_EQ(account_update_to_db_by_id(account, 99), ACCOUNT_ERROR_RECORD_NOT_FOUND);
    account_destroy(account);
}
