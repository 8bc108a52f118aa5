// Requests about single files, against a service that answers wrongly, slowly or not at all.
#include "backend.h"
#include "cloud_content_sync/cache.h"
#include "contents.h"
#include "scripted_server.h"
#include <sys/stat.h>

using Names = std::vector<std::string>;

class ScriptedContent : public testing::Test {
  protected:
    // The service has `count` pictures p0.jpg, p1.jpg ... of 5 bytes each; `files` answers what is not a PROPFIND.
    void serve(ScriptedServer::Script files, int count = 1)
    {
        TearDown();
        std::string list = "<d:response><d:href>/r/</d:href><d:propstat><d:prop><d:resourcetype><d:collection/>"
                           "</d:resourcetype></d:prop><d:status>HTTP/1.1 200 OK</d:status></d:propstat></d:response>";
        for (int i = 0; i < count; i++)
            list += "<d:response><d:href>/r/p" + std::to_string(i) +
                    ".jpg</d:href><d:propstat><d:prop><d:resourcetype/><d:getcontentlength>5</d:getcontentlength>"
                    "<d:getetag>\"1\"</d:getetag></d:prop><d:status>HTTP/1.1 200 OK</d:status></d:propstat>"
                    "</d:response>";
        const std::string all =
            answer("207 Multi-Status", "<d:multistatus xmlns:d=\"DAV:\">" + list + "</d:multistatus>");
        server = std::make_unique<ScriptedServer>([all, files = std::move(files)](const Request &request) {
            return request.method == "PROPFIND" ? all : files(request);
        });
        std::ofstream(scratch.path + "/Test.conf")
            << "[Service]\nStorage=" << server->url() << "/r/\nApi=" << server->url() << "/api/\nStallTimeout=30\n";
        setenv("CLOUD_SERVICES_DIR", scratch.path.c_str(), 1);
        setenv("PLATFORM_DATA_DIR", (scratch.path + "/data").c_str(), 1);
        mkdir((scratch.path + "/data").c_str(), 0700);
        mkdir(target().c_str(), 0700);
        ASSERT_EQ(cloud_content_sync_credentials_set("Test", nullptr, "token"), 0);
        ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
        ASSERT_EQ(refresh(handle), 0);
    }
    void TearDown() override
    {
        if (handle)
            cloud_content_sync_destroy(handle);
        handle = nullptr;
        server.reset();
    }
    // The folder that downloads go to.
    std::string target() const
    {
        return scratch.path + "/target";
    }
    Names left_behind() const
    {
        Names names = names_in(target());
        for (const char *kind : {"cache", "thumbnails"})
            for (const std::string &name : names_in(scratch.path + "/data/cloud/" + kind + "/Test"))
                names.push_back(name);
        return names;
    }

    Scratch scratch;
    std::unique_ptr<ScriptedServer> server;
    cloud_content_sync_h handle = nullptr;
};

TEST_F(ScriptedContent, only_what_is_right_is_taken)
{
    const std::string right = "Repr-Digest: sha-256=:LPJNul+wow4m6DsqxbninhsWHlwfp0JecwQzYpOLmCQ=:\r\n"; // of "hello"
    std::string now;
    serve([&](const Request &) { return now; });
    const struct {
        std::string answer;
        int error;
    } files[] = {
        {answer("200 OK", "hello", "ETag: \"1\"\r\n" + right), 0},
        {answer("200 OK", "jello", "ETag: \"1\"\r\n" + right), CLOUD_CONTENT_SYNC_ERROR_CORRUPTED},
        {answer("200 OK", "hell", "ETag: \"1\"\r\n"), CLOUD_CONTENT_SYNC_ERROR_CORRUPTED},
        {answer("200 OK", "hell", "ETag: W/\"1\"\r\n"), CLOUD_CONTENT_SYNC_ERROR_CORRUPTED},
        {answer("200 OK", "longer", "ETag: \"2\"\r\n"), 0}, // it changed
        {"HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhel\x01", CLOUD_CONTENT_SYNC_ERROR_NETWORK},
        {answer("206 Partial Content", "hello"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {answer("204 No Content"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {answer("302 Found", "", "Location: /elsewhere\r\n"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {answer("400 Bad Request"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {answer("401 Unauthorized"), CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED},
        {answer("403 Forbidden"), CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN},
        {answer("404 Not Found"), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND},
        {answer("500 Internal Server Error"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
    };
    for (const auto &row : files) {
        {
            std::scoped_lock lock(server->mutex);
            now = row.answer;
        }
        for (const Kind kind : {Kind::DOWNLOAD, Kind::CACHED}) {
            Result result;
            EXPECT_EQ(fetch(handle, kind, "p0.jpg", result, target() + "/x"), row.error) << now;
            EXPECT_EQ(left_behind().size(), row.error ? 0u : 1u) << now;
            std::filesystem::remove(result.text);
            ASSERT_EQ(refresh(handle), 0);
        }
    }
    const std::string base = server->url();
    const struct {
        std::string answer, url;
    } addresses[] = {
        {answer("200 OK", "{\"url\": \"/m/p?x=%20y\"}"), base + "/m/p?x=%20y"},
        {answer("201 Created", "{\"url\": \"m\"}"), base + "/api/1/m"},
        {answer("200 OK", "{\"url\": \"https://example.org/p\", \"more\": 1}"), "https://example.org/p"},
        {answer("200 OK", "{\"url\": \"file:///etc/passwd\"}"), ""},
        {answer("200 OK", "{\"address\": \"/m\"}"), ""},
        {answer("200 OK", "<html>"), ""},
        {answer("200 OK", std::string(100'000, ' ') + "{\"url\": \"/m\"}"), ""},
        {answer("404 Not Found"), ""},
        {answer("405 Method Not Allowed"), ""},
        {answer("501 Not Implemented"), ""},
    };
    for (const auto &row : addresses) {
        {
            std::scoped_lock lock(server->mutex);
            now = row.answer;
        }
        Result result;
        EXPECT_EQ(fetch(handle, Kind::STREAM, "p0.jpg", result), row.url.empty() ? CLOUD_CONTENT_SYNC_ERROR_SERVER : 0)
            << now;
        EXPECT_EQ(result.text, row.url);
    }
    const Request sent = server->requests().back();
    EXPECT_EQ(sent.method + " " + sent.path, "POST /api/1/media");
    EXPECT_EQ(sent.body, "{\"path\":\"/p0.jpg\",\"minutes\":30}");
    EXPECT_EQ(sent.authorization, "Bearer token");

    // The client asks nobody when nobody is signed in.
    ASSERT_EQ(cloud_content_sync_credentials_set("Test", nullptr, nullptr), 0);
}

TEST_F(ScriptedContent, nothing_calls_back_and_nothing_is_left_after_cancel_or_destroy)
{
    // Half of the answer, then silence.
    const auto stall = [](const Request &) { return std::string("HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhe"); };
    for (const Kind kind : {Kind::CACHED, Kind::DOWNLOAD, Kind::STREAM}) {
        for (const bool by_destroy : {false, true}) {
            serve(stall);
            Result result, queued[6];
            int id = 0, last = 0;
            ASSERT_EQ(ask(handle, kind, "p0.jpg", result, target() + "/x", &id), 0);
            for (Result &other : queued) // more than run at once
                ASSERT_EQ(ask(handle, kind, "p0.jpg", other, target() + "/y", &last), 0);
            EXPECT_TRUE(comes_true([&] { return server->requests().size() >= 5; }));
            EXPECT_EQ(cloud_content_sync_cancel(handle, last), 0);
            EXPECT_EQ(cloud_content_sync_cancel(handle, last), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
            EXPECT_EQ(cloud_content_sync_cancel(handle, id), 0);
            // The room that it leaves is the next one's.
            EXPECT_TRUE(comes_true([&] { return server->requests().size() >= 6; }));
            if (by_destroy) {
                cloud_content_sync_destroy(handle);
                handle = nullptr;
            } else {
                for (int other = id + 1; other < last; other++)
                    EXPECT_EQ(cloud_content_sync_cancel(handle, other), 0);
            }
            EXPECT_TRUE(comes_true([&] { return left_behind().empty(); }));
            EXPECT_EQ(result.count(), 0u);
            for (Result &other : queued)
                EXPECT_EQ(other.count(), 0u);
        }
    }
    // From within the callback itself.
    serve([](const Request &) { return answer("200 OK", "hello"); });
    Result result, second;
    std::atomic<bool> is_destroyed = false;
    result.hook = [&](const Call &) {
        cloud_content_sync_destroy(handle);
        is_destroyed = true;
    };
    ASSERT_EQ(ask(handle, Kind::CACHED, "p0.jpg", result), 0);
    EXPECT_EQ(result.end(), 0);
    EXPECT_TRUE(is_destroyed);
    handle = nullptr;
}

TEST_F(ScriptedContent, thumbnails_wait_for_everybody_and_the_last_comes_first)
{
    const auto is_thumbnail = [](const Request &request) {
        return request.path.find("/thumbnail") != request.path.npos;
    };
    const auto asked = [&] {
        Names names;
        for (const Request &request : server->requests())
            if (is_thumbnail(request))
                names.push_back(request.path.substr(request.path.rfind('/') + 1));
        return names;
    };
    serve(
        [&](const Request &request) -> std::string {
            if (!is_thumbnail(request)) // never comes to an end
                return "HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhe";
            return request.path.find("p3.jpg") != request.path.npos ? answer("415 Unsupported Media Type")
                                                                    : answer("200 OK", "thumb");
        },
        250);
    Result result;
    int id = 0;
    ASSERT_EQ(ask(handle, Kind::CACHED, "p0.jpg", result, "", &id), 0);
    EXPECT_TRUE(comes_true([&] { return server->requests().size() >= 2; }));
    for (int i = 0; i < 250; i++)
        EXPECT_FALSE(has_thumbnail(handle, "p" + std::to_string(i) + ".jpg"));
    EXPECT_FALSE(has_thumbnail(handle, "p100.jpg")); // came into sight again
    EXPECT_EQ(asked(), Names{}) << "before a person's request";
    EXPECT_EQ(cloud_content_sync_cancel(handle, id), 0);
    EXPECT_TRUE(comes_true([&] { return asked().size() >= 200; }));
    Names names = asked();
    EXPECT_EQ(std::count(names.begin(), names.end(), "p50.jpg"), 1);
    EXPECT_EQ(std::count(names.begin(), names.end(), "p49.jpg"), 0) << "too many wait";
    // Two run at once, so neighbours may change places.
    const auto place_of = [&](const char *name) { return std::find(names.begin(), names.end(), name) - names.begin(); };
    EXPECT_LT(place_of("p100.jpg"), 4);
    EXPECT_LT(place_of("p249.jpg"), 6);
    EXPECT_LT(place_of("p240.jpg"), place_of("p60.jpg"));
    EXPECT_EQ(std::count(names.begin(), names.end(), "p50.jpg"), 1);
    EXPECT_EQ(std::count(names.begin(), names.end(), "p49.jpg"), 0) << "too many wait";
    std::sort(names.begin(), names.begin() + 2); // two at once
    EXPECT_EQ(names[0], "p100.jpg");
    EXPECT_EQ(names[1], "p249.jpg");

    // A refusal is remembered.
    for (int i = 0; i < 2; i++) {
        EXPECT_FALSE(has_thumbnail(handle, "p3.jpg"));
        EXPECT_FALSE(has_thumbnail(handle, "p" + std::to_string(i) + ".jpg"));
        EXPECT_TRUE(comes_true([&] { return has_thumbnail(handle, "p" + std::to_string(i) + ".jpg"); }));
    }
    names = asked();
    EXPECT_EQ(std::count(names.begin(), names.end(), "p3.jpg"), 1);
}

TEST_F(ScriptedContent, no_thumbnail_is_told_of_after_the_callback_was_taken_away)
{
    serve([](const Request &) { return answer("200 OK", "thumb"); }, 60);
    struct Slow {
        std::atomic<int> running = 0, calls = 0;
    } slow;
    const auto cb = [](const char *, void *data) {
        auto *self = static_cast<Slow *>(data);
        self->running++;
        self->calls++;
        usleep(3000);
        self->running--;
    };
    for (int round = 0; round < 2; round++) {
        cloud_content_sync_set_thumbnail_cb(handle, cb, &slow);
        for (int i = 30 * round; i < 30 * (round + 1); i++)
            has_thumbnail(handle, "p" + std::to_string(i) + ".jpg");
        const int before = slow.calls;
        ASSERT_TRUE(comes_true([&] { return slow.calls > before + 2; }));
        if (round == 0) {
            cloud_content_sync_set_thumbnail_cb(handle, nullptr, nullptr);
        } else {
            cloud_content_sync_destroy(handle);
            handle = nullptr;
        }
        EXPECT_EQ(slow.running, 0);
        const int after = slow.calls;
        usleep(30'000);
        EXPECT_EQ(slow.calls, after);
    }
}

TEST(CloudCache, forgets_what_was_not_used_for_longest)
{
    const Scratch scratch;
    const auto add = [&](const char *name, size_t size, int minutes_ago) {
        const std::string file = scratch.file(name, std::string(size, 'x'));
        std::filesystem::last_write_time(file, std::filesystem::file_time_type::clock::now() -
                                                   std::chrono::minutes(minutes_ago));
        return file;
    };
    const std::string oldest = add("oldest", 100, 50), old = add("old", 100, 40);
    add("middle", 100, 30);
    add("recent", 100, 20);
    add(".download-a.part", 500, 60);
    add(".download-b.part", 500, 25 * 60);
    cloud::cache_trim(scratch.path, 400, "");
    EXPECT_EQ(names_in(scratch.path), (Names{".download-a.part", "middle", "old", "oldest", "recent"}));
    EXPECT_TRUE(cloud::cache_use(oldest, 100));
    cloud::cache_trim(scratch.path, 250, old);
    EXPECT_EQ(names_in(scratch.path), (Names{".download-a.part", "old", "oldest"}));
}
