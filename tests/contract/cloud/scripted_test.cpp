// The client against a service that answers wrongly, incompletely or with ill will.
#include "backend.h"
#include "cloud_content_sync/names.h"
#include "scripted_server.h"
#include "transfers.h"
#include <fstream>
#include <glib.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

using Names = std::vector<std::string>;

static std::string multistatus(const std::string &responses)
{
    return answer("207 Multi-Status",
                  "<?xml version=\"1.0\"?><d:multistatus xmlns:d=\"DAV:\" xmlns:v=\"urn:velora:dav\">" + responses +
                      "</d:multistatus>");
}

static std::string response(const std::string &href, const std::string &properties)
{
    return "<d:response><d:href>" + href + "</d:href><d:propstat><d:prop>" + properties +
           "</d:prop><d:status>HTTP/1.1 200 OK</d:status></d:propstat></d:response>";
}

static std::string folder(const std::string &href)
{
    return response(href, "<d:resourcetype><d:collection/></d:resourcetype>");
}

static std::string file(const std::string &href, const std::string &size = "5", const std::string &more = "")
{
    return response(href, "<d:resourcetype/><d:getcontentlength>" + size + "</d:getcontentlength>" + more);
}

class Scripted : public testing::Test {
  protected:
    void serve(ScriptedServer::Script script)
    {
        TearDown();
        server = std::make_unique<ScriptedServer>(std::move(script));
        std::ofstream(scratch.path + "/Test.conf")
            << "[Service]\nStorage=" << server->url() << "/r%20t/\nStallTimeout=1\n";
        setenv("CLOUD_SERVICES_DIR", scratch.path.c_str(), 1);
        setenv("PLATFORM_DATA_DIR", (scratch.path + "/data").c_str(), 1);
        mkdir((scratch.path + "/data").c_str(), 0700);
        ASSERT_EQ(cloud_content_sync_credentials_set("Test", nullptr, "token"), 0);
        ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
    }
    void TearDown() override
    {
        if (handle)
            cloud_content_sync_destroy(handle);
        handle = nullptr;
        server.reset();
    }

    Scratch scratch;
    std::unique_ptr<ScriptedServer> server;
    cloud_content_sync_h handle = nullptr;
};

TEST_F(Scripted, refused_lists_change_nothing)
{
    const std::string self = folder("/r%20t/");
    std::string reply = multistatus(self + file("/r%20t/kept.txt"));
    serve([&](const Request &) { return reply; });
    ASSERT_EQ(refresh(handle), 0);
    std::string bomb = "<!DOCTYPE d [<!ENTITY a \"aaaaaaaaaa\">";
    for (char c = 'b'; c < 'k'; c++)
        bomb += std::string("<!ENTITY ") + c + " \"" + [&] {
            std::string ten;
            for (int i = 0; i < 10; i++)
                ten += std::string("&") + static_cast<char>(c - 1) + ";";
            return ten;
        }() + "\">";
    bomb += "]><d:multistatus xmlns:d=\"DAV:\">" + self + file("/r%20t/&j;") + "</d:multistatus>";
    const std::string outside = "<!DOCTYPE d SYSTEM \"" + server->url() +
                                "/fetched.dtd\"><d:multistatus xmlns:d=\"DAV:\">" + self + "</d:multistatus>";
    const std::string elsewhere = "<d:multistatus xmlns:d=\"DAV:\"><d:response/></d:multistatus>";
    struct Row {
        const char *what;
        std::string reply;
        int error;
    } const rows[] = {
        {"garbage", answer("207 Multi-Status", "\x01\x02<<<>"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"no body", answer("207 Multi-Status"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"unfinished", answer("207 Multi-Status", "<d:multistatus xmlns:d=\"DAV:\">" + self),
         CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"another document", answer("207 Multi-Status", "<html><body/></html>"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"no hrefs", answer("207 Multi-Status", elsewhere), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"not the folder itself", multistatus(file("/r%20t/x")), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"another tree", multistatus(folder("/other/") + file("/r%20tail/x")), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"entity bomb", answer("207 Multi-Status", bomb), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"external subset", answer("207 Multi-Status", outside), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"no list", answer("200 OK", "fine"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"redirect to itself", answer("301 Moved", "", "Location: " + server->url() + "/r%20t/\r\n"),
         CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"not found", answer("404 Not Found"), CLOUD_CONTENT_SYNC_ERROR_SERVER},
        {"no HTTP", "SSH-2.0-server\r\n\r\n\x01", CLOUD_CONTENT_SYNC_ERROR_NETWORK},
        {"closed", "", CLOUD_CONTENT_SYNC_ERROR_NETWORK},
        {"less than announced",
         "HTTP/1.1 207 M\r\nContent-Length: 99999999999999\r\n\r\n<d:multistatus xmlns:d=\"DAV:\">\x01",
         CLOUD_CONTENT_SYNC_ERROR_NETWORK},
        {"stalled", "HTTP/1.1 207 M\r\nContent-Length: 999\r\n\r\n<d:multistatus", CLOUD_CONTENT_SYNC_ERROR_NETWORK},
    };
    for (const Row &row : rows) {
        {
            std::scoped_lock lock(server->mutex);
            reply = row.reply;
        }
        const int error = refresh(handle);
        // What is no HTTP may count as either.
        EXPECT_TRUE(error == row.error || (std::string(row.what) == "no HTTP" && error)) << row.what << " " << error;
        EXPECT_EQ(listing(handle, "/"), Names{"kept.txt:5"}) << row.what;
    }
    for (const Request &request : server->requests())
        EXPECT_EQ(request.method + request.path, "PROPFIND/r%20t/");
}

TEST_F(Scripted, hrefs_in_every_form)
{
    serve([&](const Request &request) {
        if (request.path != "/r%20t/")
            return multistatus(folder(request.path));
        return multistatus(folder("/r%20t") + folder(server->url() + "/r%20t/absolute%20url/") +
                           folder("/r%20t/noslash") + file("http://elsewhere.example/r%20t/b.txt") +
                           file("\n /r%20t/c%ffd \n") + file("/r%20t/&#37;41") + file("/r%20t/..") +
                           file("/r%20t/%2e%2e") + file("/r%20t/a%2Fb") + file("/r%20t/nul%00x") +
                           file("/r%20t/deeper/down") + file("relative") + file("") + file("/r%20t//slashes") +
                           file("/r%20t/huge", "99999999999999999999999") + file("/r%20t/b.txt") +
                           "<d:response><d:href>/r%20t/gone</d:href>"
                           "<d:propstat><d:prop><d:getcontentlength>7</d:getcontentlength></d:prop>"
                           "<d:status>HTTP/1.1 404 Not Found</d:status></d:propstat></d:response>");
    });
    ASSERT_EQ(refresh(handle), 0);
    EXPECT_EQ(listing(handle, "/"), (Names{"absolute url/", "noslash/", "A:5", "b.txt:5",
                                           "c\xff"
                                           "d:5",
                                           "gone:0", "huge:0", "slashes:5"}));
    EXPECT_EQ(server->requests().at(0).authorization, "Bearer token");
}

TEST_F(Scripted, a_folder_of_ten_thousand_files)
{
    std::string rows = folder("/r%20t/");
    for (int i = 0; i < 10'000; i++)
        rows += file("/r%20t/IMG_" + std::to_string(i) + ".jpg", std::to_string(i));
    serve([&](const Request &) { return multistatus(rows); });
    const auto start = std::chrono::steady_clock::now();
    ASSERT_EQ(refresh(handle), 0);
    const std::chrono::duration<double> took = std::chrono::steady_clock::now() - start;
    const Names listed = listing(handle, "/");
    ASSERT_EQ(listed.size(), 10'000u);
    EXPECT_EQ(listed[999], "IMG_999.jpg:999");
    EXPECT_LT(took.count(), 20) << "seconds; a sanitizer's build takes a few of them";
    RecordProperty("milliseconds", static_cast<int>(took.count() * 1000));
}

// What becomes of an upload of "hello", by the answers that the service gives to it one after the other.
TEST_F(Scripted, an_upload_and_its_answers)
{
    static constexpr char HELLO[] = "sha-256=:LPJNul+wow4m6DsqxbninhsWHlwfp0JecwQzYpOLmCQ=:";
    static constexpr char HEX[] = "2cf24dba5fb0a30e26e83b2ac5b9e29e1b161e5c1fa7425e73043362938b9824";
    const std::string local = scratch.file("hello", "hello");
    const std::string repr = std::string("Repr-Digest: ") + HELLO + "\r\n";
    const std::string wrong = "Repr-Digest: sha-256=:AAAAul+wow4m6DsqxbninhsWHlwfp0JecwQzYpOLmCQ=:\r\n";
    const std::string created = answer("201 Created");
    const std::string none = answer("404 Not Found");
    const std::string taken = answer("412 Precondition Failed");
    const auto found = [](const std::string &size, const std::string &hex) {
        const std::string digest = hex.empty() ? "" : "<v:sha256>" + hex + "</v:sha256>";
        return multistatus(file("/r%20t/x.txt", size, digest));
    };
    struct Row {
        const char *what;
        Names answers;
        int error;
        std::string requests; // first letters of the methods
        std::string landed = "/x.txt";
    } const rows[] = {
        {"digest in the answer", {answer("201 Created", "", repr)}, 0, "U"},
        {"wrong digest", {answer("201 Created", "", wrong)}, CLOUD_CONTENT_SYNC_ERROR_CORRUPTED, "U"},
        {"digest as property", {created, found("5", HEX)}, 0, "UL"},
        {"wrong property", {created, found("5", "00")}, CLOUD_CONTENT_SYNC_ERROR_CORRUPTED, "UL"},
        {"wrong size", {created, found("4", "")}, CLOUD_CONTENT_SYNC_ERROR_CORRUPTED, "UL"},
        {"read back", {created, found("5", ""), answer("200 OK", "hello")}, 0, "ULG"},
        {"reads back wrong",
         {created, found("5", ""), answer("200 OK", "jello")},
         CLOUD_CONTENT_SYNC_ERROR_CORRUPTED,
         "ULG"},
        {"reads back more",
         {created, found("5", ""), answer("200 OK", "hello!")},
         CLOUD_CONTENT_SYNC_ERROR_CORRUPTED,
         "ULG"},
        {"vanished", {created, none}, CLOUD_CONTENT_SYNC_ERROR_CORRUPTED, "UL"},
        {"lost, stored", {"", found("5", HEX)}, 0, "UL"},
        {"lost, stored, no digests", {"", found("5", ""), answer("200 OK", "hello")}, 0, "ULG"},
        {"lost, nothing there", {"", none, answer("201 Created", "", repr)}, 0, "ULU"},
        {"lost twice", {"", none, ""}, CLOUD_CONTENT_SYNC_ERROR_NETWORK, "ULU"},
        {"lost, then stored late", {"", none, taken, found("5", HEX)}, 0, "ULUL"},
        {"lost, another's file", {"", found("9", "00"), none, answer("201 Created", "", repr)}, 0, "ULLU", "/x(1).txt"},
        {"lost, nobody to ask", {"", "", ""}, CLOUD_CONTENT_SYNC_ERROR_NETWORK, "ULL"},
        {"never answered", {"HTTP/1.1 100 Continue\r\n\r\n\x01", none, answer("201 Created", "", repr)}, 0, "ULU"},
        {"taken twice", {taken, found("1", ""), none, answer("201 Created", "", repr)}, 0, "ULLU", "/x(2).txt"},
        {"folder of that name",
         {answer("405 No"), multistatus(folder("/r%20t/x.txt/")), none, answer("201 Created", "", repr)},
         0,
         "ULLU",
         "/x(1).txt"},
        {"no destination", {answer("409 Conflict"), none}, CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN, "UL"},
        {"400", {answer("400 Bad Request")}, CLOUD_CONTENT_SYNC_ERROR_BAD_NAME, "U"},
        {"414", {answer("414 Too Long")}, CLOUD_CONTENT_SYNC_ERROR_BAD_NAME, "U"},
        {"401", {answer("401 Unauthorized")}, CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED, "U"},
        {"403", {answer("403 Forbidden")}, CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN, "U"},
        {"423", {answer("423 Locked")}, CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN, "U"},
        {"500", {answer("500 Broken")}, CLOUD_CONTENT_SYNC_ERROR_SERVER, "U"},
        {"307", {answer("307 Moved", "", "Location: http://127.0.0.1:1/\r\n")}, CLOUD_CONTENT_SYNC_ERROR_SERVER, "U"},
        {"507", {answer("507 Full")}, CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL, "U"},
    };
    for (const Row &row : rows) {
        // Before the row's answers an upload succeeds, so that they come on a connection that was used already.
        Names answers = row.answers;
        answers.insert(answers.begin(), answer("201 Created", "", repr));
        size_t next = 0;
        serve(
            [&](const Request &) { return next < answers.size() ? answers[next++] : answer("500 Too many requests"); });
        ASSERT_EQ(upload(handle, local, "/before"), 0) << row.what;
        std::string landed;
        EXPECT_EQ(upload(handle, local, "/x.txt", &landed), row.error) << row.what;
        EXPECT_EQ(landed, row.error ? "" : row.landed) << row.what;
        std::string requests;
        for (const Request &request : server->requests())
            requests += request.method == "PUT"        ? "U"
                        : request.method == "PROPFIND" ? "L"
                                                       : request.method.substr(0, 1);
        EXPECT_EQ(requests, "U" + row.requests) << row.what;
        EXPECT_EQ(server->requests().at(1).connection, 1) << row.what << ": the connection was not kept";
    }
}

// An empty body needs no rewinding, so nothing but a fresh connection keeps libcurl from sending it twice.
TEST_F(Scripted, an_empty_file_is_not_sent_twice)
{
    static constexpr char HEX[] = "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855";
    const std::string local = scratch.file("empty", "");
    const std::string there = multistatus(file("/r%20t/x", "0", std::string("<v:sha256>") + HEX + "</v:sha256>"));
    std::string methods;
    serve([&](const Request &request) {
        methods += request.method + " ";
        return methods == "PUT PROPFIND PUT " ? "" : request.method == "PUT" ? answer("201 Created") : there;
    });
    ASSERT_EQ(upload(handle, local, "/before"), 0);
    EXPECT_EQ(upload(handle, local, "/x"), 0);
    std::scoped_lock lock(server->mutex);
    EXPECT_EQ(methods, "PUT PROPFIND PUT PROPFIND ");
}

TEST(Names, next_free_name_stays_within_255_bytes_and_whole_characters)
{
    std::string wide = "x"; // then two-byte characters, of which one would be cut
    while (wide.size() < 251)
        wide += "ü";
    const std::string next = cloud::next_free_name(wide + ".txt");
    EXPECT_LE(next.size(), 255u);
    EXPECT_TRUE(g_utf8_validate(next.data(), static_cast<gssize>(next.size()), nullptr)) << next;
    EXPECT_EQ(next.substr(next.size() - 7), "(1).txt");
    EXPECT_EQ(cloud::next_free_name("a(999999999).b"), "a(1000000000).b");
    EXPECT_EQ(cloud::next_free_name("a(99999999999).b"), "a(99999999999)(1).b");
    EXPECT_LE(cloud::next_free_name("." + std::string(254, 'e')).size(), 255u);
}
