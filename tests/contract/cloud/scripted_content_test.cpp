// Requests about single files, against a service that answers wrongly, slowly or not at all.
#include "cloud_content_sync/cache.h"
#include "scripted_server.h"
#include <atomic>

class ScriptedContent : public Scripted {
  protected:
    // The service has `count` pictures p0.jpg, p1.jpg ... of 5 bytes each; `files` answers what is not a PROPFIND.
    void serve_files(ScriptedServer::Script files, int count = 1)
    {
        std::string list = folder("/r%20t/");
        for (int i = 0; i < count; i++)
            list += file("/r%20t/p" + std::to_string(i) + ".jpg", "5", "<d:getetag>\"1\"</d:getetag>");
        serve([all = multistatus(list), files = std::move(files)](
                  const Request &request) { return request.method == "PROPFIND" ? all : files(request); },
              30);
        ASSERT_EQ(refresh(handle), 0);
    }
    Names left_behind() const
    {
        Names names = names_in(scratch.path);
        for (const std::string kind : {"cache", "thumbnails"})
            for (const std::string &name : names_in(home.path + "/cloud/" + kind + "/Test"))
                names.push_back(name);
        return names;
    }
};

TEST_F(ScriptedContent, only_what_is_right_is_taken)
{
    std::atomic<const std::string *> now = nullptr;
    serve_files([&](const Request &) { return *now; });
    const struct {
        std::string answer;
        int error;
    } files[] = {
        {answer("200 OK", "hello", std::string("ETag: \"1\"\r\n") + HELLO_DIGEST), 0},
        {answer("200 OK", "jello", std::string("ETag: \"1\"\r\n") + HELLO_DIGEST), CLOUD_CONTENT_SYNC_ERROR_CORRUPTED},
        {answer("200 OK", "hell", "ETag: \"1\"\r\n"), CLOUD_CONTENT_SYNC_ERROR_CORRUPTED},
        {answer("200 OK", "hell", "ETag: W/\"1\"\r\n"), CLOUD_CONTENT_SYNC_ERROR_CORRUPTED},
        {answer("200 OK", "longer", "ETag: \"2\"\r\n"), 0}, // it changed
        {"HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhel\x01", CLOUD_CONTENT_SYNC_ERROR_NETWORK},
        {answer("206 Partial Content", "hello"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {answer("302 Found", "", "Location: /elsewhere\r\n"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {answer("401 Unauthorized"), CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED},
        {answer("403 Forbidden"), CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN},
        {answer("404 Not Found"), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND},
        {answer("500 Internal Server Error"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
    };
    for (const auto &row : files) {
        now = &row.answer;
        for (const Kind kind : {Kind::DOWNLOAD, Kind::CACHED}) {
            Watch result;
            EXPECT_EQ(fetch(handle, kind, "p0.jpg", result, scratch.path + "/x"), row.error) << row.answer;
            EXPECT_EQ(left_behind().size(), row.error ? 0u : 1u) << row.answer;
            std::filesystem::remove(result.text);
            ASSERT_EQ(refresh(handle), 0);
        }
    }
    const std::string base = server->url;
    const struct {
        std::string answer, url;
    } addresses[] = {
        {answer("200 OK", "{\"url\": \"/m/p?x=%20y\"}"), base + "/m/p?x=%20y"},
        {answer("201 Created", "{\"url\": \"m\"}"), base + "/api/1/m"},
        {answer("200 OK", "{\"url\": \"https://example.org/p\", \"more\": 1}"), "https://example.org/p"},
        {answer("200 OK", "{\"url\": \"file:///etc/passwd\"}"), ""},
        {answer("200 OK", "<html>"), ""},
        {answer("200 OK", std::string(100'000, ' ') + "{\"url\": \"/m\"}"), ""},
        {answer("404 Not Found"), ""},
    };
    for (const auto &row : addresses) {
        now = &row.answer;
        Watch result;
        EXPECT_EQ(fetch(handle, Kind::STREAM, "p0.jpg", result), row.url.empty() ? CLOUD_CONTENT_SYNC_ERROR_SERVER : 0)
            << row.answer;
        EXPECT_EQ(result.text, row.url);
    }
    const Request sent = server->requests().back();
    EXPECT_EQ(sent.method + " " + sent.path, "POST /api/1/media");
    EXPECT_EQ(sent.body, "{\"path\":\"/p0.jpg\",\"minutes\":30}");
    EXPECT_EQ(sent.authorization, "Bearer token");
}

// Of files that keep their size, by the service's entity tag, or by its time where it has none.
TEST_F(ScriptedContent, another_version_of_the_same_size_is_fetched)
{
    const auto version = [](const std::string &tag, const std::string &second) {
        return (tag.empty() ? "" : "<d:getetag>\"" + tag + "\"</d:getetag>") +
               "<d:getlastmodified>Mon, 12 Jan 2026 10:00:" + second + " GMT</d:getlastmodified>";
    };
    const struct {
        std::string before, after;
        bool is_fetched;
    } rows[] = {{version("1", "00"), version("1", "00"), false},
                {version("1", "00"), version("2", "00"), true},
                {version("", "00"), version("", "00"), false},
                {version("", "00"), version("", "01"), true}};
    for (const auto &row : rows) {
        std::atomic<bool> has_changed = false;
        serve(
            [&](const Request &request) {
                const std::string &now = has_changed ? row.after : row.before;
                if (request.method == "PROPFIND")
                    return multistatus(folder("/r%20t/") + file("/r%20t/p0.jpg", "5", now));
                const size_t start = now.find('"'), end = now.find('"', start + 1);
                const std::string tag = start == now.npos ? "" : "ETag: " + now.substr(start, end - start + 1) + "\r\n";
                return answer("200 OK", has_changed ? "jello" : "hello", tag);
            },
            30);
        Watch first, second, arrivals;
        ASSERT_EQ(cloud_content_sync_set_thumbnail_cb(handle, thumbnail_cb, &arrivals), 0);
        ASSERT_EQ(refresh(handle), 0);
        ASSERT_EQ(fetch(handle, Kind::CACHED, "p0.jpg", first), 0);
        EXPECT_FALSE(has_thumbnail(handle, "p0.jpg"));
        EXPECT_TRUE(comes_true([&] { return has_thumbnail(handle, "p0.jpg"); }));
        has_changed = true;
        ASSERT_EQ(refresh(handle), 0);
        EXPECT_EQ(has_thumbnail(handle, "p0.jpg"), !row.is_fetched) << row.after;
        ASSERT_EQ(fetch(handle, Kind::CACHED, "p0.jpg", second), 0);
        EXPECT_EQ(read_file(second.text), row.is_fetched ? "jello" : "hello") << row.after;
        TearDown(); // a thumbnail may be on its way
    }
}

TEST_F(ScriptedContent, nothing_calls_back_and_nothing_is_left_after_cancel_or_destroy)
{
    // Half of the answer, then silence.
    const auto stall = [](const Request &) { return std::string("HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhe"); };
    for (const Kind kind : {Kind::CACHED, Kind::DOWNLOAD, Kind::STREAM}) {
        for (const bool by_destroy : {false, true}) {
            serve_files(stall);
            Watch result, queued[6];
            const int id = ask(handle, kind, "p0.jpg", result, scratch.path + "/x");
            int last = 0;
            for (Watch &other : queued) // more than run at once
                last = ask(handle, kind, "p0.jpg", other, scratch.path + "/y");
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
            for (Watch &other : queued)
                EXPECT_EQ(other.count(), 0u);
        }
    }
    // From within the callback itself.
    serve_files([](const Request &) { return answer("200 OK", "hello"); });
    Watch result;
    std::atomic<bool> is_destroyed = false;
    result.hook = [&](const Call &) {
        cloud_content_sync_destroy(handle);
        is_destroyed = true;
    };
    ask(handle, Kind::CACHED, "p0.jpg", result);
    EXPECT_EQ(result.end(), 0);
    EXPECT_TRUE(is_destroyed);
    handle = nullptr;
}

TEST(CloudCache, forgets_what_was_not_used_for_longest)
{
    const TempFolder scratch;
    const auto add = [&](const char *name, size_t size, int minutes_ago) {
        const std::string path = scratch.file(name, std::string(size, 'x'));
        std::filesystem::last_write_time(path, std::filesystem::file_time_type::clock::now() -
                                                   std::chrono::minutes(minutes_ago));
        return path;
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
