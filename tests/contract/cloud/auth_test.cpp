// Signing in and out, with any service that has pages for it.
#include "auth_watch.h"
#include "backend.h"
#include "cloud_content_sync/account.h"
#include "cloud_content_sync/cache.h"
#include <csignal>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

static constexpr int NO_ACCOUNT = CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
static constexpr int DB_FAILED = CLOUD_CONTENT_SYNC_ERROR_DB_FAILED;
static constexpr int NETWORK = CLOUD_CONTENT_SYNC_ERROR_NETWORK;
static constexpr int UNAUTHORIZED = CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED;

class SignIn : public OnBackend {
  protected:
    // Up to the provisional account.
    void come()
    {
        std::string token, email;
        ASSERT_EQ(run(handle, Step::REQUEST_TOKEN, &token), 0);
        backend->approve(token);
        ASSERT_EQ(run(handle, Step::EMAIL, &email), 0);
        EXPECT_EQ(email, USER);
    }
    static std::string access_token()
    {
        return cloud::credentials_known("Test").value_or(cloud::Credentials()).secret;
    }
    // Names of all files of the client's home, but for the database's.
    Names kept() const
    {
        Names all;
        for (const auto &entry : std::filesystem::recursive_directory_iterator(home.path))
            if (const std::string name = entry.path().filename();
                entry.is_regular_file() && !name.starts_with("Test.db") && !name.starts_with("Velora.") &&
                entry.path().extension() != ".conf")
                all.push_back(name);
        return all;
    }
};
GTEST_ALLOW_UNINSTANTIATED_PARAMETERIZED_TEST(SignIn);
INSTANTIATE_TEST_SUITE_P(All, SignIn, testing::ValuesIn(page_names()), [](const auto &row) { return row.param; });

TEST_P(SignIn, from_request_token_to_signed_out)
{
    ASSERT_TRUE(open());
    backend->store("/a.jpg", "12345");
    ASSERT_EQ(refresh(handle), 0);
    ASSERT_EQ(cloud_content_sync_setting_set_refresh_type(handle, 3, 3600), 0);
    const std::string former = access_token();
    std::string token, email;
    EXPECT_EQ(run(handle, Step::EMAIL), NO_ACCOUNT);
    EXPECT_EQ(run(handle, Step::ACTIVATE), NO_ACCOUNT);
    ASSERT_EQ(run(handle, Step::REQUEST_TOKEN, &token), 0);
    EXPECT_EQ(run(handle, Step::EMAIL), UNAUTHORIZED); // not allowed yet
    EXPECT_EQ(run(handle, Step::ACTIVATE), NO_ACCOUNT);
    backend->approve(token);
    for (int i = 0; i < 2; i++) { // the second time from memory: the exchange works once
        EXPECT_EQ(run(handle, Step::EMAIL, &email), 0);
        EXPECT_EQ(email, USER);
    }
    EXPECT_EQ(access_token(), former);
    EXPECT_EQ(run(handle, Step::ACTIVATE), 0);
    const std::string first = access_token();
    EXPECT_TRUE(backend->is_alive(first));
    EXPECT_EQ(run(handle, Step::ACTIVATE), NO_ACCOUNT);
    EXPECT_EQ(run(handle, Step::EMAIL), NO_ACCOUNT);

    // The same account keeps all; its former token goes.
    EXPECT_EQ(listing(handle, "/"), Names{"a.jpg:5"});
    come();
    EXPECT_EQ(run(handle, Step::ACTIVATE), 0);
    const std::string second = access_token();
    EXPECT_TRUE(comes_true([&] { return !backend->is_alive(first); }));
    EXPECT_TRUE(backend->is_alive(second));
    EXPECT_EQ(listing(handle, "/"), Names{"a.jpg:5"});
    EXPECT_EQ(refresh(handle), 0);
    Watch result;
    EXPECT_EQ(fetch(handle, Kind::CACHED, "a.jpg", result), 0);

    // Ending a sign-in that is under way leaves who is signed in alone.
    come();
    int status = 0;
    EXPECT_EQ(run(handle, Step::DEACTIVATE, nullptr, &status), 0);
    EXPECT_EQ(status, CLOUD_CONTENT_SYNC_STATE_DONE);
    EXPECT_EQ(run(handle, Step::ACTIVATE), NO_ACCOUNT);
    EXPECT_EQ(access_token(), second);
    EXPECT_EQ(listing(handle, "/"), Names{"a.jpg:5"});

    EXPECT_EQ(run(handle, Step::DEACTIVATE, nullptr, &status), 0);
    EXPECT_EQ(status, CLOUD_CONTENT_SYNC_STATE_DONE);
    EXPECT_FALSE(backend->is_alive(second));
    EXPECT_EQ(who(), "(null)");
    EXPECT_EQ(listing(handle, "/"), Names());
    EXPECT_EQ(kept(), Names());
    EXPECT_EQ(refresh(handle), NO_ACCOUNT);
    int type = 0, seconds = 0;
    EXPECT_EQ(cloud_content_sync_setting_get_refresh_type(handle, &type, &seconds), 0);
    EXPECT_EQ(type + seconds, 1);
    EXPECT_EQ(cloud_content_sync_setting_set_refresh_type(handle, 1, 0), NO_ACCOUNT);

    come();
    EXPECT_EQ(run(handle, Step::ACTIVATE), 0);
    EXPECT_EQ(cloud_content_sync_setting_get_refresh_type(handle, &type, &seconds), 0);
    EXPECT_EQ(type + seconds, 1); // who comes back begins anew
    EXPECT_EQ(run(handle, Step::DEACTIVATE), 0);
}

TEST_P(SignIn, signing_out_ends_all_requests_and_works_without_the_service)
{
    ASSERT_TRUE(open());
    backend->store("/a.jpg", "1");
    come();
    ASSERT_EQ(run(handle, Step::ACTIVATE), 0);
    ASSERT_EQ(refresh(handle), 0);
    const std::string local = scratch.file("local", some_bytes(64 << 20, 1));
    Watch uploads[3], again, content, out;
    for (Watch &upload : uploads)
        start(handle, local, "/up", upload);
    ASSERT_TRUE(uploads[0].wait_for_progress(1));
    ask(handle, Kind::CACHED, "a.jpg", content);
    cloud_content_sync_refresh_meta(handle, 7, refresh_cb, &again);
    begin(handle, Step::DEACTIVATE, out);
    for (Watch *watch : {&uploads[0], &again, &content}) { // they may have been done just before
        const int error = watch->end();
        EXPECT_TRUE(error == NO_ACCOUNT || error == 0) << error;
    }
    EXPECT_EQ(uploads[1].end(), NO_ACCOUNT);
    EXPECT_EQ(uploads[2].end(), NO_ACCOUNT);
    EXPECT_EQ(out.end(), 0);

    come();
    ASSERT_EQ(run(handle, Step::ACTIVATE), 0);
    ASSERT_EQ(refresh(handle), 0);
    backend->go_down();
    int status = 0;
    EXPECT_EQ(run(handle, Step::DEACTIVATE, nullptr, &status), NETWORK);
    EXPECT_EQ(status, CLOUD_CONTENT_SYNC_STATE_DONE);
    EXPECT_EQ(who(), "(null)");
    EXPECT_EQ(kept(), Names());
    EXPECT_EQ(listing(handle, "/"), Names());
}

TEST_P(SignIn, a_cancel_leaves_no_callback_and_everything_else_one)
{
    ASSERT_TRUE(open());
    for (int round = 0; round < 3; round++)
        for (const Step step : ALL_STEPS) {
            Watch cancelled, replaced, last;
            begin(handle, step, cancelled);
            std::this_thread::sleep_for(std::chrono::milliseconds(round * 3));
            const bool was_there = cloud_content_sync_auth_cancel(handle) == 0;
            EXPECT_EQ(cancelled.count(), was_there ? 0 : 1);
            begin(handle, Step::EMAIL, replaced);
            begin(handle, Step::REQUEST_TOKEN, last);
            const size_t before = replaced.count();
            EXPECT_EQ(last.end(), 0);
            EXPECT_EQ(replaced.count(), before);
            EXPECT_EQ(cancelled.count(), was_there ? 0 : 1);
            EXPECT_EQ(cloud_content_sync_auth_cancel(handle), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
        }
    Watch within;
    within.hook = [&](const Call &) {
        EXPECT_EQ(cloud_content_sync_auth_cancel(handle), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
        EXPECT_EQ(cloud_content_sync_destroy(handle), 0);
        handle = nullptr;
    };
    begin(handle, Step::REQUEST_TOKEN, within);
    EXPECT_EQ(within.end(), 0);
}

TEST_P(SignIn, what_cannot_be_stored_leaves_the_former_account)
{
    ASSERT_TRUE(open());
    const std::string former = access_token();
    come();
    std::signal(SIGXFSZ, SIG_IGN);
    rlimit limit = {}, none = {};
    getrlimit(RLIMIT_FSIZE, &limit);
    none.rlim_max = limit.rlim_max;
    setrlimit(RLIMIT_FSIZE, &none); // the disk is full
    const int activated = run(handle, Step::ACTIVATE);
    setrlimit(RLIMIT_FSIZE, &limit);
    EXPECT_EQ(activated, DB_FAILED);
    EXPECT_EQ(access_token(), former);
    EXPECT_EQ(refresh(handle), 0);
    EXPECT_EQ(run(handle, Step::ACTIVATE), 0); // the sign-in is under way still
    EXPECT_TRUE(backend->is_alive(access_token()));
}

TEST_P(SignIn, many_rounds_leave_nothing_behind)
{
    ASSERT_TRUE(open());
    const auto count = [](const char *folder) { return names_in(folder).size(); };
    size_t files = 0, descriptors = 0, threads = 0;
    const int rounds = backend->media_url.empty() ? 31 : 6; // a service limits how many may come from one address
    for (int round = 0; round < rounds; round++) {
        come();
        ASSERT_EQ(run(handle, Step::ACTIVATE), 0);
        ASSERT_EQ(run(handle, Step::DEACTIVATE), 0);
        if (round == 0) {
            files = kept().size();
            descriptors = count("/proc/self/fd");
            threads = count("/proc/self/task");
        }
    }
    EXPECT_EQ(kept().size(), files);
    EXPECT_LE(count("/proc/self/fd"), descriptors);
    EXPECT_LE(count("/proc/self/task"), threads);
}

// Each account's rows and files bear its name.
TEST(Account, is_whole_or_not_there_whenever_the_process_is_killed)
{
    setenv("CLOUD_SECRETS", "file", 1);
    const TempHome home;
    const cloud::Service service{.name = "Test", .storage = "http://127.0.0.1:1"};
    int seen[3] = {};
    for (int round = 0; round < 40; round++) {
        const pid_t child = fork();
        if (child == 0) {
            cloud::Account account(service);
            for (bool goes_on = account.open(); goes_on;)
                for (const char *name : {"ann", "bob"}) {
                    const cloud::Credentials credentials{.secret = "s", .email = name};
                    const std::string who = cloud::account_identity(service, credentials);
                    const cloud::ContentRow row{"/", name};
                    account.sign_in(&credentials);
                    account.replace({}, {row}, {}, who);
                    write_file(cloud::cache_file(cloud::Kept::CONTENT, "Test", who, row), "1");
                    account.sign_in(nullptr);
                }
            _exit(0);
        }
        usleep(static_cast<useconds_t>(10'000 + round * 731));
        kill(child, SIGKILL);
        waitpid(child, nullptr, 0);
        cloud::Account account(service);
        ASSERT_TRUE(account.open());
        const auto known = cloud::credentials_known("Test");
        seen[!known ? 0 : known->email == "ann" ? 1 : 2]++;
        for (const cloud::ContentRow &row : account.contents_of("/"))
            EXPECT_EQ(row.name, known ? known->email : "nobody's");
        if (known) {
            EXPECT_EQ(known->secret, "s");
        } else {
            EXPECT_EQ(names_in(cloud::cache_folder(cloud::Kept::CONTENT, "Test")), Names());
        }
    }
    EXPECT_GT(seen[1] + seen[2], 0);
}
