// The client against a service that answers wrongly, incompletely or with ill will.
#include "cloud_content_sync/names.h"
#include "scripted_server.h"
#include <future>
#include <glib.h>

TEST_F(Scripted, refused_lists_change_nothing)
{
    const std::string self = folder("/r%20t/");
    serve([&](const Request &) { return multistatus(self + file("/r%20t/kept.txt")); });
    ASSERT_EQ(refresh(handle), 0);
    std::string bomb = "<!DOCTYPE d [<!ENTITY a \"aaaaaaaaaa\">";
    for (char c = 'b'; c < 'k'; c++) {
        bomb += std::string("<!ENTITY ") + c + " \"";
        for (int i = 0; i < 10; i++)
            bomb += std::string("&") + static_cast<char>(c - 1) + ";";
        bomb += "\">";
    }
    bomb += "]><d:multistatus xmlns:d=\"DAV:\">" + self + file("/r%20t/&j;") + "</d:multistatus>";
    const std::string outside = "<!DOCTYPE d SYSTEM \"" + server->url +
                                "/fetched.dtd\"><d:multistatus xmlns:d=\"DAV:\">" + self + "</d:multistatus>";
    std::string attributes = "<d:multistatus xmlns:d=\"DAV:\"><d:response", levels = "<d:multistatus xmlns:d=\"DAV:\">";
    for (int i = 0; i < 400'000; i++) { // they kept a parser busy for a minute and a half
        attributes += " a" + std::to_string(i) + "='<!--'";
        levels += "<d>";
    }
    attributes += "/>" + self + "</d:multistatus>";
    g_autofree char *wide = nullptr;
    gsize wide_size = 0;
    const std::string narrow = "<d:multistatus xmlns:d=\"DAV:\">" + self + "</d:multistatus>";
    wide =
        g_convert(narrow.data(), static_cast<gssize>(narrow.size()), "UTF-16", "UTF-8", nullptr, &wide_size, nullptr);
    struct Row {
        const char *what;
        std::string reply;
        int error = CLOUD_CONTENT_SYNC_ERROR_SERVER;
    } const rows[] = {
        {"garbage", answer("207 Multi-Status", "\x01\x02<<<>")},
        {"no body", answer("207 Multi-Status")},
        {"unfinished", answer("207 Multi-Status", "<d:multistatus xmlns:d=\"DAV:\">" + self)},
        {"another document", answer("207 Multi-Status", "<html><body/></html>")},
        {"no hrefs", multistatus("<d:response/>")},
        {"not the folder itself", multistatus(file("/r%20t/x"))},
        {"another tree", multistatus(folder("/other/") + file("/r%20tail/x"))},
        {"entity bomb", answer("207 Multi-Status", bomb)},
        {"external subset", answer("207 Multi-Status", outside)},
        {"attributes", answer("207 Multi-Status", attributes)},
        {"levels", answer("207 Multi-Status", levels)},
        {"a wide encoding", answer("207 Multi-Status", std::string(wide, wide_size))},
        {"an encoding that hides",
         answer("207 Multi-Status", "<?xml version='1.0' encoding='UTF-7'?>+ADw-d:multistatus/+AD4-")},
        {"no list", answer("200 OK", "fine")},
        {"redirect to itself", answer("301 Moved", "", "Location: " + server->url + "/r%20t/\r\n")},
        {"not found", answer("404 Not Found")},
        {"closed", "", CLOUD_CONTENT_SYNC_ERROR_NETWORK},
        {"less than announced",
         "HTTP/1.1 207 M\r\nContent-Length: 99999999999999\r\n\r\n<d:multistatus xmlns:d=\"DAV:\">\x01",
         CLOUD_CONTENT_SYNC_ERROR_NETWORK},
        {"stalled", "HTTP/1.1 207 M\r\nContent-Length: 999\r\n\r\n<d:multistatus", CLOUD_CONTENT_SYNC_ERROR_NETWORK},
    };
    for (const Row &row : rows) {
        server->say(row.reply);
        EXPECT_EQ(refresh(handle), row.error) << row.what;
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
        return multistatus(folder("/r%20t") + folder(server->url + "/r%20t/absolute%20url/") +
                           folder("/r%20t/noslash") + file("http://elsewhere.example/r%20t/b.txt") +
                           file("\n /r%20t/c%ffd \n") + file("/r%20t/&#37;41") + file("/r%20t/..") +
                           file("/r%20t/%2e%2e") + file("/r%20t/a%2Fb") + file("/r%20t/nul%00x") +
                           file("/r%20t/deeper/down") + file("relative") + file("") + file("/r%20t//slashes") +
                           file("/r%20t/huge", "99999999999999999999999") + file("/r%20t/b.txt") +
                           file("HTTPS://Other.Example:8443/%72%20t/port%2d1") +
                           "<d:response><d:href>/r%20t/gone</d:href>"
                           "<d:propstat><d:prop><d:getcontentlength>7</d:getcontentlength></d:prop>"
                           "<d:status>HTTP/1.1 404 Not Found</d:status></d:propstat></d:response>");
    });
    ASSERT_EQ(refresh(handle), 0);
    EXPECT_EQ(listing(handle, "/"), (Names{"absolute url/", "noslash/", "A:5", "b.txt:5",
                                           "c\xff"
                                           "d:5",
                                           "gone:0", "huge:0", "port-1:5", "slashes:5"}));
    EXPECT_EQ(server->requests().at(0).authorization, "Bearer token");
}

TEST_F(Scripted, one_folder_that_is_closed_costs_nothing_but_itself)
{
    const struct {
        const char *reply;
        int error;
    } rows[] = {{"403 Forbidden", 0}, {"404 Not Found", 0}, {"500 Broken", CLOUD_CONTENT_SYNC_ERROR_SERVER}};
    const std::string self = folder("/r%20t/");
    for (const auto &row : rows) {
        serve([&](const Request &request) {
            if (request.path == "/r%20t/closed/")
                return answer(row.reply);
            return request.path == "/r%20t/" ? multistatus(self + folder("/r%20t/closed/") + folder("/r%20t/open/"))
                                             : multistatus(folder(request.path) + file(request.path + "in.txt"));
        });
        EXPECT_EQ(refresh(handle), row.error) << row.reply;
        EXPECT_EQ(listing(handle, "/"), row.error ? Names{} : (Names{"closed/", "open/"})) << row.reply;
        EXPECT_EQ(listing(handle, "/open"), row.error ? Names{"no such folder"} : Names{"in.txt:5"}) << row.reply;
    }
}

// While the service is asked for the tree, a file is stored, or somebody else signs in; and while a file is stored.
TEST_F(Scripted, what_happens_in_the_middle)
{
    const std::string local = scratch.file("hello", "hello"), old = multistatus(folder("/r%20t/") + file("/r%20t/old"));
    const struct {
        std::string held; // method of the request in whose middle it happens
        bool is_upload, is_sign_in;
        int error;
        Names rows;
    } cases[] = {
        {"PROPFIND", true, false, 0, {"new:5", "old:5"}},
        {"PROPFIND", false, true, CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED, {}},
        {"PROPFIND", true, true, CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED, {}},
        {"PUT", false, true, 0, {}},
    };
    for (const auto &row : cases) {
        SCOPED_TRACE(&row - cases);
        serve(
            [&](const Request &request) {
                return request.method == "PUT" ? answer("201 Created", "", HELLO_DIGEST) : old;
            },
            30);
        ASSERT_EQ(cloud_content_sync_credentials_set("Test", "first@example.org", nullptr, "token"), 0);
        std::promise<void> reached, goes_on;
        server->set_hook([&](const Request &request) {
            if (request.method != row.held)
                return;
            reached.set_value();
            goes_on.get_future().wait();
        });
        Watch watch;
        if (row.held == "PUT")
            start(handle, local, "/new", watch);
        else
            cloud_content_sync_refresh_meta(handle, 7, refresh_cb, &watch);
        reached.get_future().wait();
        if (row.is_upload) {
            EXPECT_EQ(upload(handle, local, "/new"), 0);
        }
        if (row.is_sign_in) {
            EXPECT_EQ(cloud_content_sync_credentials_set("Test", "second@example.org", nullptr, "token"), 0);
        }
        goes_on.set_value();
        EXPECT_EQ(watch.end(), row.error);
        EXPECT_EQ(listing(handle, "/"), row.rows);
    }
}

// What becomes of an upload of "hello", by the answers that the service gives to it one after the other.
TEST_F(Scripted, an_upload_and_its_answers)
{
    constexpr int BAD = CLOUD_CONTENT_SYNC_ERROR_CORRUPTED, NETWORK = CLOUD_CONTENT_SYNC_ERROR_NETWORK,
                  SERVER = CLOUD_CONTENT_SYNC_ERROR_SERVER, OPEN = CLOUD_CONTENT_SYNC_ERROR_OUTCOME_UNKNOWN;
    const std::string local = scratch.file("hello", "hello"), repr = HELLO_DIGEST, wrong = WRONG_DIGEST;
    const std::string created = answer("201 Created"), none = answer("404 Not Found"), taken = answer("412 Taken");
    const std::string stored = answer("201 Created", "", repr), bad = answer("502 Bad Gateway");
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
        Names again = {}; // the answers to another try after the failure, which succeeds
        std::string requests_again;
        int wait_seconds = 0;
    } const rows[] = {
        {"digest in the answer", {stored}, 0, "U"},
        {"wrong digest", {answer("201 Created", "", wrong)}, BAD, "U"},
        {"digest as property", {created, found("5", HELLO_HEX)}, 0, "UL"},
        {"wrong property", {created, found("5", "00")}, BAD, "UL"},
        {"wrong size", {created, found("4", "")}, BAD, "UL"},
        {"read back", {created, found("5", ""), answer("200 OK", "hello")}, 0, "ULG"},
        {"reads back wrong", {created, found("5", ""), answer("200 OK", "jello")}, BAD, "ULG"},
        {"vanished", {created, none}, BAD, "UL"},
        {"lost, stored", {"", found("5", HELLO_HEX)}, 0, "UL"},
        {"rubbish, stored", {"rubbish\n\x01", found("5", HELLO_HEX)}, 0, "UL"},
        {"lost, nothing there", {"", none, stored}, 0, "ULU"},
        {"lost twice, stored", {"", none, "", found("5", HELLO_HEX)}, 0, "ULUL"},
        {"lost twice", {"", none, "", none}, NETWORK, "ULUL", "/x.txt", {none, stored}, "LU"},
        {"lost, then stored late", {"", none, taken, found("5", HELLO_HEX)}, 0, "ULUL"},
        {"lost, another's file", {"", found("9", "00"), none, stored}, 0, "ULLU", "/x(1).txt"},
        {"lost, nobody to ask", {"", "", ""}, OPEN, "ULL", "/x.txt", {found("5", HELLO_HEX)}, "L"},
        {"lost and waited for", {"", "", "", found("5", HELLO_HEX)}, 0, "ULLL", "/x.txt", {}, "", 5},
        {"never answered", {"HTTP/1.1 100 Continue\r\n\r\n\x01", none, stored}, 0, "ULU"},
        {"taken twice", {taken, found("1", ""), none, stored}, 0, "ULLU", "/x(2).txt"},
        {"folder of that name",
         {answer("405 No"), multistatus(folder("/r%20t/x.txt/")), none, stored},
         0,
         "ULLU",
         "/x(1).txt"},
        {"no destination", {answer("409 Conflict"), none}, CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN, "UL"},
        {"400", {answer("400 Bad Request")}, CLOUD_CONTENT_SYNC_ERROR_BAD_NAME, "U"},
        {"401", {answer("401 Unauthorized")}, CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED, "U"},
        {"403", {answer("403 Forbidden")}, CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN, "U"},
        {"500, stored", {answer("500 Broken"), found("5", HELLO_HEX)}, 0, "UL"},
        {"500, not stored", {answer("500 Broken"), none}, SERVER, "UL", "/x.txt", {none, stored}, "LU"},
        {"502 to all", {bad, bad}, OPEN, "UL", "/x.txt", {found("5", HELLO_HEX)}, "L"},
        {"504, another's", {answer("504 Late"), found("9", "00")}, SERVER, "UL", "/x.txt", {stored}, "U"},
        {"verified by nobody", {created, bad}, OPEN, "UL", "/x.txt", {found("5", HELLO_HEX)}, "L"},
        {"another's name, 502", {taken, none, bad, bad}, OPEN, "ULUL", "/x(1).txt", {found("5", HELLO_HEX)}, "L"},
        {"busy", {answer("429 Busy", "", "Retry-After: 1\r\n"), none, stored}, 0, "ULU", "/x.txt", {}, "", 5},
        {"busy for too long",
         {answer("503 Busy", "", "Retry-After: 60\r\n")},
         SERVER,
         "U",
         "/x.txt",
         {found("5", HELLO_HEX)},
         "L",
         5},
        {"307", {answer("307 Moved", "", "Location: http://127.0.0.1:1/\r\n")}, CLOUD_CONTENT_SYNC_ERROR_SERVER, "U"},
        {"507", {answer("507 Full")}, CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL, "U"},
    };
    for (const Row &row : rows) {
        // Before the row's answers an upload succeeds, so that they come on a connection that was used already.
        Names answers = row.answers;
        answers.insert(answers.begin(), stored);
        answers.insert(answers.end(), row.again.begin(), row.again.end());
        answers.push_back(answer("500 Too many requests"));
        size_t next = 0;
        serve([&](const Request &) { return answers[std::min(next++, answers.size() - 1)]; }, 1, row.wait_seconds);
        ASSERT_EQ(upload(handle, local, "/before"), 0) << row.what;
        std::string landed;
        EXPECT_EQ(upload(handle, local, "/x.txt", &landed), row.error) << row.what;
        EXPECT_EQ(landed, row.error ? "" : row.landed) << row.what;
        if (!row.again.empty()) {
            EXPECT_EQ(upload(handle, local, "/x.txt", &landed), 0) << row.what;
            EXPECT_EQ(landed, row.landed) << row.what;
        }
        std::string requests;
        for (const Request &request : server->requests())
            requests += request.method == "PUT"        ? "U"
                        : request.method == "PROPFIND" ? "L"
                                                       : request.method.substr(0, 1);
        EXPECT_EQ(requests, "U" + row.requests + row.requests_again) << row.what;
        EXPECT_EQ(server->requests().at(1).connection, 1) << row.what << ": the connection was not kept";
    }
}

// While the first file is looked at the second one is sent; a look that fails is made up for when nothing else is sent.
TEST_F(Scripted, a_look_at_what_is_stored_does_not_hold_up_the_next_upload)
{
    const std::string local = scratch.file("hello", "hello");
    std::promise<void> is_sent;
    std::atomic<int> looks = 0;
    serve(
        [&](const Request &request) -> std::string {
            if (request.method == "PUT")
                return answer("201 Created", "", request.path.ends_with("/second") ? HELLO_DIGEST : "");
            return ++looks < 3
                       ? ""
                       : multistatus(file("/r%20t/first", "5", "<v:sha256>" + std::string(HELLO_HEX) + "</v:sha256>"));
        },
        30, 60);
    server->set_hook([&](const Request &request) {
        if (request.method == "PUT" && request.path.ends_with("/second"))
            return is_sent.set_value();
        if (request.method == "PROPFIND" && looks == 0) {
            EXPECT_EQ(is_sent.get_future().wait_for(std::chrono::seconds(20)), std::future_status::ready);
        }
    });
    Watch first, second;
    start(handle, local, "/first", first);
    start(handle, local, "/second", second);
    EXPECT_EQ(second.end(), 0);
    EXPECT_EQ(first.end(), 0);
    EXPECT_EQ(looks, 3);
}

// An empty body needs no rewinding, so nothing but a fresh connection keeps libcurl from sending it twice.
TEST_F(Scripted, an_empty_file_is_not_sent_twice)
{
    const std::string local = scratch.file("empty", "");
    const std::string there = multistatus(
        file("/r%20t/x", "0", "<v:sha256>e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855</v:sha256>"));
    std::string methods;
    serve([&](const Request &request) {
        methods += request.method + " ";
        return methods == "PUT PROPFIND PUT " ? "" : request.method == "PUT" ? answer("201 Created") : there;
    });
    ASSERT_EQ(upload(handle, local, "/before"), 0);
    EXPECT_EQ(upload(handle, local, "/x"), 0);
    TearDown();
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
}
