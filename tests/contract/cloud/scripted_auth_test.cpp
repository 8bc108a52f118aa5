// Signing in to a service that answers late, wrongly or not at all.
#include "auth_watch.h"
#include "scripted_server.h"
#include <algorithm>
#include <atomic>

static constexpr int NETWORK = CLOUD_CONTENT_SYNC_ERROR_NETWORK;
static constexpr int SERVER = CLOUD_CONTENT_SYNC_ERROR_SERVER;
static constexpr int UNAUTHORIZED = CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED;
static const std::string TOKEN = answer("200 OK", R"({"oauth_token": "t1", "oauth_token_secret": "s1"})");

class ScriptedSignIn : public Scripted {
  protected:
    // Answers as a service should, with the access tokens a1, a2 and so on; a request of `special` gets `reply`.
    void serve_well()
    {
        serve([this](const Request &request) {
            if (request.path == special)
                return reply;
            if (request.path == "/api/1/oauth/request_token")
                return TOKEN;
            if (request.path == "/api/1/oauth/access_token")
                return answer("200 OK",
                              R"({"access_token": "a)" + std::to_string(++given) + R"(", "email": "ann@example.org"})");
            return answer("204 No Content");
        });
    }
    void come()
    {
        ASSERT_EQ(run(handle, Step::REQUEST_TOKEN), 0);
        ASSERT_EQ(run(handle, Step::EMAIL), 0);
    }
    // The tokens that the service was told to revoke.
    Names revoked()
    {
        Names tokens;
        for (const Request &request : server->requests())
            if (request.path == "/api/1/oauth/revoke")
                tokens.push_back(request.authorization);
        return tokens;
    }
    size_t asked(const std::string &path)
    {
        const auto all = server->requests();
        return static_cast<size_t>(
            std::count_if(all.begin(), all.end(), [&](const Request &one) { return one.path == path; }));
    }

    std::string special, reply; // to be changed while nothing runs
    int given = 0;
};

TEST_F(ScriptedSignIn, ill_answers_are_errors_and_what_they_bring_is_revoked)
{
    const std::string access = "/api/1/oauth/access_token", request = "/api/1/oauth/request_token";
    const auto token = [](const std::string &text) {
        return answer("200 OK", "{\"oauth_token\": " + text + ", \"oauth_token_secret\": \"s\"}");
    };
    const auto email = [](const std::string &text) {
        return answer("200 OK", "{\"access_token\": \"a\", \"email\": " + text + "}");
    };
    const struct {
        const char *what;
        std::string path, reply;
        int error = SERVER;
        Names revoked = {};
    } rows[] = {
        {"no JSON", request, answer("200 OK", "<html>")},
        {"nothing", request, answer("200 OK")},
        {"half of it", request, answer("200 OK", R"({"oauth_token": "t"})")},
        {"a number", request, token("5")},
        {"empty", request, token("\"\"")},
        {"a line break", request, token("\"a\\nb\"")},
        {"NUL", request, token("\"a\\u0000b\"")},
        {"a space", request, token("\"a b\"")},
        {"long", request, token("\"" + std::string(1025, 'a') + "\"")},
        {"huge", request, answer("200 OK", "\"" + std::string(1 << 20, 'a') + "\"")},
        {"unauthorized", request, answer("401 Unauthorized")},
        {"too many", request, answer("429 Too Many Requests", "", "Retry-After: 5\r\n")},
        {"elsewhere", request, answer("302 Found", "", "Location: " + std::string("http://127.0.0.1:1/\r\n"))},
        {"closed", request, "", NETWORK},
        {"stalled", request, "HTTP/1.1 200 OK\r\nContent-Length: 99\r\n\r\n{", NETWORK},
        {"not allowed", access, answer("401 Unauthorized"), UNAUTHORIZED},
        {"unknown path", access, answer("404 Not Found")},
        {"forbidden", access, answer("403 Forbidden")},
        {"no JSON", access, answer("200 OK", "email=a")},
        {"no address", access, answer("200 OK", R"({"access_token": "a"})"), SERVER, {"Bearer a"}},
        {"an empty address", access, email("\"\""), SERVER, {"Bearer a"}},
        {"an address of two lines", access, email("\"a\\nb\""), SERVER, {"Bearer a"}},
        {"an address of no text", access, email("\"\xff\""), SERVER, {"Bearer a"}},
        {"huge", access, answer("200 OK", std::string(1 << 20, ' ')), SERVER},
        {"closed", access, "", NETWORK},
    };
    for (const auto &row : rows) {
        serve_well();
        special = row.path;
        reply = row.reply;
        int status = 0;
        const bool is_token = row.path == request;
        if (!is_token) {
            EXPECT_EQ(run(handle, Step::REQUEST_TOKEN), 0);
        }
        const auto begun = std::chrono::steady_clock::now();
        EXPECT_EQ(run(handle, is_token ? Step::REQUEST_TOKEN : Step::EMAIL, nullptr, &status), row.error)
            << row.what << row.path;
        EXPECT_EQ(status, CLOUD_CONTENT_SYNC_STATE_FAILED);
        EXPECT_LT(std::chrono::steady_clock::now() - begun, std::chrono::seconds(10));
        EXPECT_EQ(asked(row.path), 1u) << row.what; // never sent again
        EXPECT_EQ(run(handle, Step::ACTIVATE), CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT);
        cloud_content_sync_destroy(std::exchange(handle, nullptr));
        EXPECT_EQ(revoked(), row.revoked) << row.what << row.path;
    }
}

TEST_F(ScriptedSignIn, tokens_that_nobody_keeps_are_revoked)
{
    serve_well();
    come();                                                     // a1
    come();                                                     // a2: a1 goes
    EXPECT_EQ(run(handle, Step::ACTIVATE), 0);                  // "token", of before, goes
    come();                                                     // a3
    EXPECT_EQ(run(handle, Step::DEACTIVATE), 0);                // a3 goes
    come();                                                     // a4
    cloud_content_sync_destroy(std::exchange(handle, nullptr)); // a4 goes, a2 is the account's
    Names gone = revoked();                                     // behind the back of what follows, so in any order
    std::ranges::sort(gone);
    EXPECT_EQ(gone, (Names{"Bearer a1", "Bearer a3", "Bearer a4", "Bearer token"}));
    EXPECT_EQ(who(), "ann@example.org");

    // A revocation that fails, or is refused because the token is gone already, changes nothing on the device.
    const std::pair<std::string, int> rows[] = {
        {answer("401 Unauthorized"), 0}, {answer("500 Broken"), SERVER}, {"", NETWORK}};
    for (const auto &[refusal, error] : rows) {
        serve_well();
        special = "/api/1/oauth/revoke";
        reply = refusal;
        int status = 0;
        EXPECT_EQ(run(handle, Step::DEACTIVATE, nullptr, &status), error);
        EXPECT_EQ(status, CLOUD_CONTENT_SYNC_STATE_DONE);
        EXPECT_EQ(who(), "(null)");
        EXPECT_EQ(revoked(), Names{"Bearer token"});
    }
    // A password is not revoked.
    serve_well();
    ASSERT_EQ(cloud_content_sync_credentials_set("Test", nullptr, "ann", "password"), 0);
    EXPECT_EQ(run(handle, Step::DEACTIVATE), 0);
    EXPECT_EQ(server->requests().size(), 0u);
}

// Holds the exchange at the service until it is opened.
struct Gate {
    std::atomic<bool> is_there = false, is_open = false;

    void operator()(const Request &request)
    {
        if (!request.path.ends_with("/access_token"))
            return;
        is_there = true;
        comes_true([&] { return is_open.load(); });
    }
};

TEST_F(ScriptedSignIn, an_exchange_goes_on_when_its_request_is_cancelled)
{
    for (const bool is_kept : {true, false}) {
        Gate gate;
        serve_well();
        server->set_hook(std::ref(gate));
        ASSERT_EQ(run(handle, Step::REQUEST_TOKEN), 0);
        Watch cancelled, again;
        begin(handle, Step::EMAIL, cancelled);
        ASSERT_TRUE(comes_true([&] { return gate.is_there.load(); }));
        EXPECT_EQ(cloud_content_sync_auth_cancel(handle), 0);
        if (is_kept)
            begin(handle, Step::EMAIL, again);
        else
            EXPECT_EQ(run(handle, Step::DEACTIVATE), 0);
        gate.is_open = true;
        if (is_kept) {
            EXPECT_EQ(again.end(), 0);
        }
        cloud_content_sync_destroy(std::exchange(handle, nullptr));
        EXPECT_EQ(cancelled.count(), 0u);
        EXPECT_EQ(asked("/api/1/oauth/access_token"), 1u);
        EXPECT_EQ(revoked(), Names{"Bearer a" + std::to_string(given)});
    }
}

TEST_F(ScriptedSignIn, a_service_that_says_nothing_holds_up_nobody)
{
    std::atomic<bool> is_over = false;
    for (const int limit : {1, 60}) {
        serve_well();
        std::string description = read_file(home / "Test.conf");
        description.replace(description.find("AuthTimeout=1"), 13, "AuthTimeout=" + std::to_string(limit));
        home.file("Test.conf", description);
        cloud_content_sync_destroy(handle);
        ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
        come();
        server->set_hook([&](const Request &) { comes_true([&] { return is_over.load(); }); });
        const auto begun = std::chrono::steady_clock::now();
        if (limit == 1) {
            EXPECT_EQ(run(handle, Step::REQUEST_TOKEN), NETWORK);
        }
        cloud_content_sync_destroy(std::exchange(handle, nullptr)); // the token is to be revoked
        EXPECT_LT(std::chrono::steady_clock::now() - begun, std::chrono::seconds(limit == 1 ? 3 : 5));
        is_over = true;
        server.reset();
        is_over = false;
    }
}

TEST_F(ScriptedSignIn, services_without_pages)
{
    serve_well();
    const char *const known = "[Service]\nStorage=http://127.0.0.1:1/\n";
    const struct {
        std::string more, pages;
        bool has_pages;
    } rows[] = {
        {"", "", false},
        {"Web=ftp://a.example\nApi=http://a.example\n", "", false},
        {"Web=https://a.example/\nApi=http://a.example\nCAFile=/ca\n",
         "https://a.example https://a.example/auth_complete /ca", true},
        {"Web=https://a.example\nApi=http://a.example\nCallback=https://b.example/c\n",
         "https://a.example https://b.example/c ", true},
    };
    for (const auto &row : rows) {
        home.file("Test.conf", known + row.more);
        char *web = nullptr, *callback = nullptr, *ca_file = nullptr;
        EXPECT_EQ(cloud_content_sync_service_get_pages("Test", &web, &callback, &ca_file),
                  row.has_pages ? 0 : CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE);
        if (row.has_pages) {
            EXPECT_EQ(taken(web) + " " + taken(callback) + " " + taken(ca_file), row.pages);
        }
        cloud_content_sync_h other = nullptr;
        ASSERT_EQ(cloud_content_sync_create("Test", &other), 0);
        const auto cb = [](int, const char *, int, void *) {};
        EXPECT_EQ(cloud_content_sync_auth_get_email(other, cb, nullptr),
                  row.has_pages ? 0 : CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE);
        EXPECT_EQ(cloud_content_sync_auth_get_email(other, nullptr, nullptr),
                  CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER);
        cloud_content_sync_destroy(other);
    }
}
