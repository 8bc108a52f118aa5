// The client and services that would replace files.
#include "cloud_content_sync/credentials.h"
#include "cloud_content_sync/names.h"
#include "scripted_server.h"

namespace {

// What it does not look at.
struct Manners {
    bool keeps_by_condition, keeps_by_overwrite;
    bool has_hidden = true;
    size_t room = 100;           // files
    bool has_other_name = false; // than the client's address of it
};

class Safety : public Scripted {
  protected:
    void serve_tree(const Manners &manners, bool looks_first = false)
    {
        way = {};
        files = {{"/x", "old"}};
        methods.clear();
        serve([this, manners](const Request &request) { return act(manners, request); });
        if (looks_first) {
            cloud_content_sync_destroy(std::exchange(handle, nullptr));
            std::ofstream(home / "Test.conf", std::ios::app) << "LookFirst=true\n";
            ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
        }
    }

    std::string act(const Manners &manners, const Request &request)
    {
        const std::string path = below(request.path);
        const auto found = files.find(path);
        const bool is_there = found != files.end();
        methods += request.method == "PROPFIND" ? "L" : request.method == "PUT" ? "U" : request.method.substr(0, 1);
        if (request.method == "PUT") {
            if (is_there && manners.keeps_by_condition)
                return answer("412 Taken");
            if (!manners.has_hidden && cloud::name_of(path).starts_with("."))
                return answer("403 Forbidden");
            if (!is_there && files.size() >= manners.room)
                return answer("507 Full");
            files[path] = request.body;
            return answer(is_there ? "204 Replaced" : "201 Created");
        }
        if (!is_there)
            return answer("404 Not Found");
        if (request.method == "PROPFIND")
            return multistatus(file(request.path, std::to_string(found->second.size())));
        if (request.method == "MOVE") {
            const bool is_address = request.destination.starts_with(server->url);
            if (is_address && manners.has_other_name)
                return answer("502 Another server");
            const std::string target = below(request.destination.substr(is_address ? server->url.size() : 0));
            const bool is_taken = files.count(target) > 0;
            if (is_taken && manners.keeps_by_overwrite)
                return answer("412 Taken");
            files[target] = std::exchange(found->second, "");
            files.erase(path);
            return answer(is_taken ? "204 Replaced" : "201 Created");
        }
        const std::string body = found->second;
        if (request.method == "HEAD")
            return "HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n";
        if (request.method == "DELETE")
            files.erase(found);
        return answer("200 OK", request.method == "GET" ? body : "");
    }

    static std::string below(const std::string &path)
    {
        return cloud::path_of_href(path)->substr(4); // "/r t"
    }

    std::map<std::string, std::string> files; // the server's, under its lock
    std::string methods;
};

} // namespace

TEST_F(Safety, what_is_there_stays_or_nothing_is_uploaded)
{
    constexpr int UNSAFE = CLOUD_CONTENT_SYNC_ERROR_UNSAFE, FULL = CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL;
    const std::string local = scratch.file("hello", "hello");
    const struct {
        const char *what;
        Manners manners;
        bool looks_first;
        int error;
        std::string methods; // of two uploads
    } rows[] = {
        {"condition", {true, false}, false, 0, "UUDULULGULLUH"},
        {"move", {false, true}, false, 0, "UUUMDDULGMLMUHMLLM"},
        {"neither", {false, false}, false, UNSAFE, "UUUMDD"},
        {"neither, and a look will do", {false, false}, true, 0, ""},
        {"no hidden names", {false, true, false}, false, 0, ""},
        {"behind a proxy", {false, true, true, 100, true}, false, 0, "UUUMMDDULGMLMUHMLLM"},
        {"full", {true, true, true, 1}, false, FULL, ""},
        {"full for the second", {false, true, true, 2}, false, FULL, ""},
    };
    for (const auto &row : rows) {
        SCOPED_TRACE(row.what);
        serve_tree(row.manners, row.looks_first);
        std::string landed;
        for (const std::string next : {"/x(1)", "/x(2)"}) {
            EXPECT_EQ(upload(handle, local, "/x", &landed), row.error);
            EXPECT_EQ(landed, row.error ? "" : next);
        }
        TearDown();
        const std::map<std::string, std::string> kept = {{"/x", "old"}},
                                                 all = {{"/x", "old"}, {"/x(1)", "hello"}, {"/x(2)", "hello"}};
        EXPECT_EQ(files, row.error ? kept : all);
        if (!row.methods.empty()) {
            EXPECT_EQ(methods, row.methods);
        }
    }
}

// Whenever it comes, and whatever has been made by then.
TEST_F(Safety, a_cancel_leaves_nothing)
{
    const std::string local = scratch.file("hello", "hello"), other = scratch.file("other", "hello");
    for (const bool keeps_by_condition : {true, false}) {
        size_t requests = 0;
        for (bool has_ended = false; !has_ended; requests++) {
            SCOPED_TRACE(requests);
            serve_tree({keeps_by_condition, true});
            std::atomic<size_t> seen = 0; // of two connections
            std::atomic<int> id = 0;
            server->set_hook([&](const Request &) {
                while (id == 0)
                    std::this_thread::yield();
                if (seen++ == requests)
                    cloud_content_sync_cancel(handle, id);
            });
            Watch watch;
            id = start(handle, local, "/x", watch);
            // The next upload of its name comes after all that it still does.
            EXPECT_EQ(upload(handle, other, "/x"), 0);
            has_ended = !watch.calls.empty() && watch.calls.back().state == CLOUD_CONTENT_SYNC_STATE_DONE;
            TearDown();
            EXPECT_EQ(files.size(), has_ended ? 3u : 2u);
            EXPECT_EQ(files["/x"], "old");
        }
        EXPECT_GT(requests, 6u);
    }
}

TEST_F(Safety, what_a_killed_process_has_left_goes_and_nothing_else_does)
{
    serve_tree({true, true});
    const cloud::Service service = *cloud::service_find("Test");
    cloud::Credentials credentials;
    ASSERT_EQ(cloud::credentials_load("Test", credentials), 0);
    const std::string mine = "/" + cloud::temporary_name(true), others = "/" + cloud::temporary_name(true);
    cloud::Known known(service);
    known.add_temporary(cloud::account_identity(service, credentials), mine);
    known.leave_temporary(mine);
    files[mine] = files[others] = "part";
    EXPECT_EQ(upload(handle, scratch.file("hello", "hello"), "/y"), 0);
    TearDown();
    EXPECT_EQ(files, (std::map<std::string, std::string>{{"/x", "old"}, {"/y", "hello"}, {others, "part"}}));
}
