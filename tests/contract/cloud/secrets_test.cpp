// Secrets in a real Secret Service, which the test starts on a session bus of its own: see secrets_bus.sh.
#include "cloud_content_sync/credentials.h"
#include "cloud_content_sync/secrets.h"
#include "scripted_server.h"
#include <csignal>
#include <gio/gio.h>

// The items that a keyring has of this library.
static size_t items()
{
    g_autoptr(GDBusConnection) bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
    g_autoptr(GVariant) found = g_dbus_connection_call_sync(
        bus, "org.freedesktop.secrets", "/org/freedesktop/secrets", "org.freedesktop.Secret.Service", "SearchItems",
        g_variant_new_parsed("({'xdg:schema': 'com.orvant.CloudContentSync'},)"), nullptr, G_DBUS_CALL_FLAGS_NONE, 5000,
        nullptr, nullptr);
    g_autoptr(GVariant) open = found ? g_variant_get_child_value(found, 0) : nullptr;
    return open ? g_variant_n_children(open) : 99;
}

static std::string secret_of_test()
{
    cloud::Credentials credentials;
    const int error = cloud::credentials_load("Test", credentials);
    return error ? std::to_string(error) : credentials.secret;
}

TEST_F(Scripted, secrets_move_between_keyring_and_file)
{
    serve([](const Request &request) {
        return request.authorization == "Bearer in keyring" ? multistatus(folder("/r%20t/")) : answer("401 No");
    });
    const std::string file = cloud::credentials_file("Test");
    const auto set = [](const char *secret) {
        return cloud_content_sync_credentials_set("Test", nullptr, nullptr, secret);
    };
    EXPECT_NE(read_file(file).find("Secret=token"), std::string::npos); // stored without a keyring
    setenv("CLOUD_SECRETS", "", 1);
    EXPECT_EQ(secret_of_test(), "token");

    ASSERT_EQ(set("in keyring"), 0);
    EXPECT_EQ(read_file(file).find("in keyring"), std::string::npos);
    EXPECT_EQ(items(), 1u);
    cloud_content_sync_destroy(handle);
    ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
    EXPECT_EQ(refresh(handle), 0);
    bool is_whole = false;
    EXPECT_EQ(cloud_content_sync_get_is_meta_complete(handle, &is_whole), 0); // known without the secret
    EXPECT_TRUE(is_whole);
    ASSERT_EQ(set("another"), 0);
    EXPECT_EQ(secret_of_test(), "another");
    EXPECT_EQ(items(), 1u);

    // Another process, to which this one's memory is nothing.
    cloud::secret_remove(file, "nothing");
    setenv("CLOUD_SECRETS", "file", 1);
    ASSERT_EQ(set("in file"), 0);
    EXPECT_NE(read_file(file).find("Secret=in file"), std::string::npos);
    setenv("CLOUD_SECRETS", "", 1);
    ASSERT_EQ(set("in keyring"), 0); // and back
    ASSERT_EQ(set(nullptr), 0);
    EXPECT_EQ(items(), 0u); // that which the file did not name any more, too
    EXPECT_EQ(secret_of_test(), std::to_string(CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT));
    for (int i = 0; i < 10; i++)
        ASSERT_EQ(set(i % 3 ? std::to_string(i).c_str() : nullptr), 0);
    EXPECT_EQ(set(nullptr), 0);
    EXPECT_EQ(items(), 0u);
}

// What another process reads is what this one reads of an item that it has not in memory.
static std::string read_afresh(const std::string &file, const std::string &item)
{
    write_file(file, "[Credentials]\nSecretItem=" + item + "\nEmail=a@b.example\n");
    return secret_of_test();
}

TEST_F(Scripted, a_keyring_that_is_locked_or_silent_asks_nobody)
{
    serve([](const Request &) { return answer("401 No"); });
    setenv("CLOUD_SECRETS", "", 1);
    const std::string file = cloud::credentials_file("Test");
    const std::string item = cloud::secret_store(file, "Test", "a@b.example", "first");
    const std::string second = cloud::secret_store(file, "Test", "a@b.example", "second"); // is in memory now
    ASSERT_NE(item, "");
    EXPECT_EQ(read_afresh(file, item), "first");
    cloud::secret_store(file, "Test", "a@b.example", "third");
    const auto in_collection = [](const char *method) {
        g_autoptr(GDBusConnection) bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
        g_autoptr(GVariant) done = g_dbus_connection_call_sync(
            bus, "org.freedesktop.secrets", "/org/freedesktop/secrets", "org.freedesktop.Secret.Service", method,
            g_variant_new_parsed("([objectpath '/org/freedesktop/secrets/collection/login'],)"), nullptr,
            G_DBUS_CALL_FLAGS_NONE, 5000, nullptr, nullptr);
        return done != nullptr;
    };
    ASSERT_TRUE(in_collection("Lock"));
    EXPECT_EQ(read_afresh(file, second), std::to_string(CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED));
    EXPECT_EQ(refresh(handle), CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED);
    char *email = nullptr;
    EXPECT_EQ(cloud_content_sync_account_get_email("Test", &email), 0);
    EXPECT_EQ(taken(email), "a@b.example");
    EXPECT_EQ(cloud_content_sync_credentials_set("Test", "a@b.example", nullptr, "again"), 0);
    EXPECT_NE(read_file(file).find("Secret=again"), std::string::npos);

    const pid_t daemon = std::stoi(std::getenv("KEYRING_PID"));
    ASSERT_EQ(kill(daemon, SIGSTOP), 0);
    const auto begun = std::chrono::steady_clock::now();
    EXPECT_EQ(read_afresh(file, second), std::to_string(CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED));
    EXPECT_LT(std::chrono::steady_clock::now() - begun, std::chrono::seconds(5));
    EXPECT_EQ(cloud_content_sync_credentials_set("Test", "a@b.example", nullptr, "again"), 0);
    EXPECT_LT(std::chrono::steady_clock::now() - begun, std::chrono::seconds(5)); // it is left alone for a while
    kill(daemon, SIGCONT);
}
