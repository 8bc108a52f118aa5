// What a crowd, a broken network or somebody with bad intentions does to the service.
#include "base/base.h"
#include "cloud.h"
#include <chrono>
#include <csignal>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <thread>

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

static double seconds_since(Clock::time_point start)
{
    return std::chrono::duration<double>(Clock::now() - start).count();
}

static const std::string ANN = basic_authorization("ann@example.org", "secret") + "\r\n";

// A request as bytes; the account's unless `headers` begin otherwise.
static std::string raw(const std::string &line, const std::string &headers, const std::string &body = "")
{
    return line + " HTTP/1.1\r\nHost: localhost\r\n" + ANN + headers + "\r\n" + body;
}

TEST(Strain, ConnectionsLeaveNothingOpen)
{
    Cloud cloud;
    cloud.ask("PUT", "/dav/x", {}, "abc");
    const struct {
        std::string bytes;
        int status; // 0: nothing is answered
    } kinds[] = {
        {raw("PUT /dav/x", "Content-Length: 3\r\n", "abc"), 204},
        {raw("GET /dav/x", ""), 200},
        {raw("PROPFIND /dav/", "Depth: 1\r\n"), 207},
        {"GET /dav/x HTTP/1.1\r\nHost: localhost\r\n\r\n", 401},
        {"GET /dav/x HTTP/1.1\r\nHo", 0},
        {raw("PUT /dav/y", "Content-Length: 30\r\n", "abc"), 0},
        {raw("PUT /dav/y", "Transfer-Encoding: chunked\r\n", "3\r\nabc\r\n"), 0},
        {"", 0},
    };
    const size_t before = cloud.descriptors();
    std::vector<std::unique_ptr<Connection>> idle; // kept, while the others come and go
    for (int i = 0; i < 10'000 / 8; i++)
        for (const auto &kind : kinds) {
            auto connection = std::make_unique<Connection>(cloud.port);
            connection->send(kind.bytes);
            if (kind.status) {
                ASSERT_EQ(connection->status(), kind.status) << kind.bytes;
            }
            if (kind.status == 200 && idle.size() < 20)
                idle.push_back(std::move(connection));
        }
    EXPECT_TRUE(comes_true([&] { return cloud.descriptors() <= before + idle.size(); })) << cloud.descriptors();
    idle.clear();
    EXPECT_TRUE(comes_true([&] { return cloud.descriptors() <= before; })) << cloud.descriptors();
    EXPECT_EQ(cloud.temporary_files(), 0u);
    EXPECT_EQ(cloud.ask("GET", "/dav/x").body, "abc");
}

TEST(Strain, WhoKeepsUsWaitingIsLetGo)
{
    Cloud cloud({"--patience", "2"});
    cloud.ask("PUT", "/dav/x", {}, "abc");
    const std::string half = "GET /dav/x HTTP/1.1\r\nHost: h\r\n";
    const struct {
        const char *what;
        std::string bytes, again; // what is sent at first, and each half second
        bool is_kept;
    } rows[] = {
        {"nothing", "", "", false},
        {"half the headers", half, "", false},
        {"headers by the letter", half, "X", false},
        {"an idle connection", raw("GET /dav/x", ""), "", false},
        {"a body that stands still", raw("PUT /dav/y", "Content-Length: 30\r\n", "abc"), "", false},
        {"a slow body", raw("PUT /dav/y", "Content-Length: 30\r\n", "abc"), "x", true},
    };
    std::vector<std::unique_ptr<Connection>> connections;
    for (const auto &row : rows) {
        connections.push_back(std::make_unique<Connection>(cloud.port));
        connections.back()->send(row.bytes);
    }
    for (int i = 0; i < 9; i++) {
        std::this_thread::sleep_for(std::chrono::milliseconds(500));
        for (size_t nth = 0; nth < std::size(rows); nth++)
            connections[nth]->send(rows[nth].again);
    }
    for (size_t nth = 0; nth < std::size(rows); nth++)
        EXPECT_EQ(connections[nth]->has_ended(), !rows[nth].is_kept) << rows[nth].what;
}

// With few descriptors those that do nothing make room for those that come.
TEST(Strain, MoreConnectionsThanDescriptors)
{
    rlimit usual;
    getrlimit(RLIMIT_NOFILE, &usual);
    rlimit few = usual;
    few.rlim_cur = few.rlim_max = 300;
    Cloud cloud({}, "", [few] { setrlimit(RLIMIT_NOFILE, &few); });
    cloud.ask("PUT", "/dav/x", {}, "abc");
    std::vector<std::unique_ptr<Connection>> crowd;
    for (int i = 0; i < 600; i++)
        crowd.push_back(std::make_unique<Connection>(cloud.port));
    for (int i = 0; i < 3; i++)
        EXPECT_EQ(cloud.ask("GET", "/dav/x").body, "abc");
}

TEST(Strain, ABodyCountsOnlyWhenItsEndWasSeen)
{
    Cloud cloud;
    cloud.ask("PUT", "/dav/x", {}, "kept");
    for (const char *half : {"3\r\nabc\r\n", "3\r\nabc\r\n0\r\n", "3\r\nab", "5"}) {
        const Connection cut(cloud.port);
        cut.send(raw("PUT /dav/x", "Transfer-Encoding: chunked\r\n", half));
    }
    const std::string next = raw("DELETE /dav/x", "");
    const struct {
        const char *headers, *body;
    } malformed[] = {
        {"Content-Length: 3\r\nContent-Length: 3\r\n", "abc"},
        {"Content-Length: 3\r\nContent-Length: 5\r\n", "abc"},
        {"Content-Length: 3, 3\r\n", "abc"},
        {"Content-Length: 3\r\nTransfer-Encoding: chunked\r\n", "3\r\nabc\r\n0\r\n\r\n"},
        {"Transfer-Encoding: chunked\r\nContent-Length: 3\r\n", "3\r\nabc\r\n0\r\n\r\n"},
        {"Transfer-Encoding: gzip, chunked\r\n", "3\r\nabc\r\n0\r\n\r\n"},
        {"Transfer-Encoding: identity\r\n", "abc"},
        {"Content-Length: +5\r\n", "abcde"},
        {"Content-Length: -1\r\n", ""},
        {"Content-Length: zz\r\n", "abc"},
        {"Transfer-Encoding: chunked\r\n", "-1\r\nabc\r\n0\r\n\r\n"},
        {"Transfer-Encoding: chunked\r\n", "zz\r\nabc\r\n0\r\n\r\n"},
        {"Host: elsewhere\r\nContent-Length: 3\r\n", "abc"},
    };
    for (const auto &one : malformed) {
        SCOPED_TRACE(one.headers + std::string(one.body));
        const Connection connection(cloud.port);
        connection.send(raw("PUT /dav/x", one.headers, one.body + next));
        const std::string answer = connection.all();
        EXPECT_EQ(answer.substr(0, 12), "HTTP/1.1 400");
        EXPECT_EQ(answer.find("HTTP/1.1", 1), answer.npos) << "what follows was taken for a request";
    }
    const Connection pipelined(cloud.port);
    pipelined.send(raw("PUT /dav/a", "Transfer-Encoding: chunked\r\n", "1;x=y\r\na\r\n2\r\nbc\r\n0\r\nX: y\r\n\r\n") +
                   raw("GET /dav/a", "") + raw("DELETE /dav/a", "Connection: close\r\n"));
    const std::string answers = pipelined.all();
    for (const char *part : {"HTTP/1.1 201", "\r\n\r\nabcHTTP/1.1 204", "Connection: close"})
        EXPECT_NE(answers.find(part), answers.npos) << answers;
    EXPECT_EQ(cloud.ask("GET", "/dav/x").body, "kept");
    EXPECT_TRUE(comes_true([&] { return cloud.temporary_files() == 0; }));
}

// While others are answered at once; like all of this within the memory that the Cloud allows.
TEST(Strain, OneRequestDoesNotStarveTheOthers)
{
    Cloud cloud;
    for (int i = 0; i < 300; i++)
        write_file(cloud.file("f" + std::to_string(i)), "");
    const auto many = [](const std::string &before, const std::string &one, int count, const std::string &after) {
        std::string text = before;
        for (int i = 0; i < count; i++)
            text += one + std::to_string(i) + (one.back() == 'a' ? "='x'" : one.back() == 'p' ? "/>" : ">");
        return text + after;
    };
    const std::string propfind = "<propfind xmlns='DAV:'><prop>", end = "</prop></propfind>";
    const struct {
        const char *method;
        std::string body;
        int status;
    } rows[] = {
        {"PROPFIND", many(propfind, "<p", 60'000, end), 413},
        {"PROPFIND", many("<propfind xmlns='DAV:' ", " a", 95'000, "><allprop/></propfind>"), 400},
        {"PROPFIND", many(propfind, "<d", 10'000, end), 400},
        {"PROPFIND", propfind + "<" + std::string(900'000, 'n') + "/>" + end, 400},
        {"PROPFIND", propfind + "<n a='" + std::string(900'000, 'n') + "'/>" + end, 400},
        {"PROPPATCH",
         many("<propertyupdate xmlns='DAV:'><remove><prop>", "<p", 60'000, "</prop></remove></propertyupdate>"), 413},
        {"LOCK", many("<lockinfo xmlns='DAV:' ", " a", 95'000, "/>"), 400},
        {"PROPFIND", many(propfind, "<p", 200, end), 207},
        {"PROPFIND", std::string(2 << 20, ' '), 413},
    };
    for (const auto &row : rows) {
        double longest = 0;
        std::atomic<bool> is_done = false;
        std::thread other([&] {
            while (!is_done) {
                const auto start = Clock::now();
                EXPECT_EQ(cloud.ask("HEAD", "/dav/f0").status, 200);
                longest = std::max(longest, seconds_since(start));
            }
        });
        EXPECT_EQ(cloud.ask(row.method, "/dav/", {"Depth: 1"}, row.body).status, row.status)
            << row.method << " " << row.body.substr(0, 60);
        is_done = true;
        other.join();
        EXPECT_LT(longest, 2) << row.body.substr(0, 60);
    }
}

TEST(Strain, PasswordsAreTriedSoOften)
{
    Cloud cloud;
    ASSERT_EQ(cloud.ask("PUT", "/dav/x", {}, "x").status, 201);
    std::vector<Answer> answers[2];
    for (const bool exists : {true, false})
        for (int i = 0; i < 11; i++)
            answers[exists].push_back(cloud.ask(
                "GET", "/dav/x",
                {basic_authorization(exists ? "ann@example.org" : "eve@example.org", "guess" + std::to_string(i))}));
    for (int i = 0; i < 11; i++) {
        EXPECT_EQ(answers[true][i].status, i < 10 ? 401 : 429) << i;
        EXPECT_EQ(answers[false][i].status, i < 10 ? 401 : 429) << "tells which accounts exist: " << i;
    }
    EXPECT_GT(std::stoi(answers[true][10].header("retry-after")), 0);
    EXPECT_EQ(cloud.ask("GET", "/dav/x").status, 200) << "who has signed in is not locked out";

    // Strangers at the same time do not make others wait.
    std::vector<std::thread> strangers;
    for (int i = 0; i < 16; i++)
        strangers.emplace_back(
            [&] { cloud.ask("GET", "/dav/x", {basic_authorization("other@example.org", "guess")}); });
    for (int i = 0; i < 50; i++) {
        const auto start = Clock::now();
        EXPECT_EQ(cloud.ask("GET", "/dav/x").status, 200);
        EXPECT_LT(seconds_since(start), 0.5);
    }
    for (std::thread &stranger : strangers)
        stranger.join();
}

TEST(Strain, PropertiesCountAndDeepTreesGo)
{
    Cloud cloud({"--quota", "10K"});
    cloud.ask("PUT", "/dav/f", {}, std::string(1000, 'x'));
    const auto patch = [&](size_t bytes) {
        return cloud
            .ask("PROPPATCH", "/dav/f", {},
                 "<propertyupdate xmlns='DAV:'><set><prop><n xmlns='urn:t'>" + std::string(bytes, 'v') +
                     "</n></prop></set></propertyupdate>")
            .status;
    };
    EXPECT_EQ(patch(20'000), 507);
    EXPECT_EQ(cloud.used(), 1000);
    EXPECT_EQ(patch(5000), 207);
    const long long used = cloud.used();
    EXPECT_GT(used, 6000);
    EXPECT_EQ(patch(5000), 207);
    EXPECT_EQ(cloud.used(), used) << "in its own place";
    EXPECT_EQ(cloud.ask("COPY", "/dav/f", {"Destination: /dav/g"}).status, 507);
    cloud.stop(SIGTERM);
    cloud.start();
    EXPECT_EQ(cloud.used(), used);
    EXPECT_EQ(cloud.ask("DELETE", "/dav/f").status, 204);
    EXPECT_EQ(cloud.used(), 0);

    // Each move puts what is there one level deeper: an address could not.
    for (int round = 0; round < 32; round++) {
        std::string made = "/dav/new/";
        ASSERT_EQ(cloud.ask("MKCOL", made).status, 201);
        for (int i = 0; i < 20; i++)
            ASSERT_EQ(cloud.ask("MKCOL", made += "d/").status, 201);
        if (round == 0)
            cloud.ask("PUT", made + "deep", {}, "deep");
        else
            ASSERT_EQ(cloud.ask("MOVE", "/dav/old/", {"Destination: " + made + "old"}).status, 201);
        ASSERT_EQ(cloud.ask("MOVE", "/dav/new/", {"Destination: /dav/old"}).status, 201);
    }
    EXPECT_EQ(cloud.used(), 4);
    EXPECT_EQ(cloud.ask("DELETE", "/dav/old/").status, 204);
    EXPECT_EQ(cloud.used(), 0);
    EXPECT_EQ(cloud.temporary_files(), 0u);
}

void expect_no_scans(const Cloud &cloud, int least)
{
    Db db;
    ASSERT_TRUE(db.open(cloud.root / "velora-cloud.db", nullptr));
    std::istringstream log(read_file(cloud.place / "err"));
    int count = 0;
    for (std::string line; std::getline(log, line);) {
        const std::string sql = line.starts_with("sql: ") ? line.substr(5) : "";
        if (sql.find(" FROM ") == sql.npos && sql.find("UPDATE") == sql.npos)
            continue;
        Stmt plan(db, ("EXPLAIN QUERY PLAN " + sql).c_str());
        for (count++; plan.row();)
            EXPECT_TRUE(plan.text(3).find("SCAN ") == std::string::npos || plan.text(3).find("SCAN (") == 0 ||
                        plan.text(3).find("CONSTANT ROW") != std::string::npos)
                << sql << ": " << plan.text(3);
    }
    EXPECT_GT(count, least);
}

// No statement reads a table from end to end, whatever it holds.
TEST(Strain, NoStatementScansWhatGrows)
{
    Cloud cloud({"--log-sql"});
    cloud.ask("MKCOL", "/dav/d/");
    cloud.ask("PUT", "/dav/d/f", {}, "x");
    cloud.ask("PUT", "/dav/d/f", {}, "y");
    cloud.ask("PROPPATCH", "/dav/d/f", {},
              "<propertyupdate xmlns='DAV:'><set><prop><n xmlns='u'>v</n></prop></set><remove><prop><m xmlns='u'/>"
              "</prop></remove></propertyupdate>");
    cloud.ask("PROPFIND", "/dav/", {"Depth: infinity"});
    cloud.ask("GET", "/dav/d/f");
    cloud.ask("GET", "/1/account/info", {"Authorization: Bearer none"});
    cloud.ask("POST", "/1/media", {}, "{\"path\":\"/d/f\",\"minutes\":1}");
    cloud.ask("COPY", "/dav/d/", {"Destination: /dav/e"});
    cloud.ask("MOVE", "/dav/e/", {"Destination: /dav/d"});
    cloud.ask("DELETE", "/dav/d/");
    expect_no_scans(cloud, 20);
}

TEST(Strain, ServesOverTlsAndSaysWhatItDid)
{
    const TempFolder place;
    const std::string key = place / "key.pem", certificate = place / "certificate.pem";
    ASSERT_EQ(end_of(spawn({"/usr/bin/openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-keyout", key, "-out",
                            certificate, "-days", "2", "-subj", "/CN=velora", "-addext", "subjectAltName=IP:127.0.0.1"},
                           place / "out", place / "err")),
              0);
    Cloud cloud({"--tls-certificate", certificate, "--tls-key", key, "--log"});
    ASSERT_EQ(cloud.url.substr(0, 8), "https://");
    setenv("CLOUD_TEST_CA", certificate.c_str(), 1);
    const std::string bytes(3 << 20, 'b');
    EXPECT_EQ(cloud.ask("PUT", "/dav/large", {}, bytes).status, 201);
    EXPECT_TRUE(cloud.ask("GET", "/dav/large").body == bytes);
    EXPECT_EQ(cloud.ask("GET", "/dav/none?secret=1").status, 404);
    const std::string cookie = cloud.ask("GET", "/m").header("set-cookie");
    EXPECT_TRUE(cookie.starts_with("__Host-velora=") && cookie.ends_with("; HttpOnly; SameSite=Lax; Secure")) << cookie;
    unsetenv("CLOUD_TEST_CA");
    EXPECT_EQ(cloud.ask("GET", "/dav/large").status, 0) << "trusted without a reason";
    const Connection plain(cloud.port);
    plain.send(raw("GET /dav/large", ""));
    EXPECT_EQ(plain.status(), 0);
    const std::string log = read_file(cloud.place / "err");
    for (const char *part : {"127.0.0.1 PUT /dav/large 201 0 ", "GET /dav/large 200 3145728 ", "GET /dav/none 404 0 "})
        EXPECT_NE(log.find(part), log.npos) << log;
    for (const char *part : {"secret", ANN.c_str() + 21})
        EXPECT_EQ(log.find(part), log.npos) << log;
    for (const Headers &options : {Headers{"--listen", "0.0.0.0:0"}, Headers{"--tls-key", key}}) {
        Headers words{"--root", "ROOT"};
        words.insert(words.end(), options.begin(), options.end());
        EXPECT_EQ(run_cloud(words).code, 2) << options.back();
    }
}

TEST(Strain, AnUploadUnderWayEndsBeforeTheService)
{
    Cloud cloud;
    const Connection slow(cloud.port);
    slow.put("/dav/slow", 20);
    ASSERT_TRUE(comes_true([&] { return cloud.temporary_files() == 1; }));
    std::thread sender([&] {
        for (int i = 0; i < 20; i++) {
            slow.send("x");
            std::this_thread::sleep_for(std::chrono::milliseconds(100));
        }
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(300));
    const auto start = Clock::now();
    EXPECT_EQ(cloud.stop(SIGTERM), 0);
    EXPECT_LT(seconds_since(start), 10);
    sender.join();
    EXPECT_EQ(slow.status(), 201);
    EXPECT_EQ(read_file(cloud.file("slow")), std::string(20, 'x'));
    cloud.start();
}
