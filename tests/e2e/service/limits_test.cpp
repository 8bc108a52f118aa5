// What happens to uploads that are many, cut, too large or disturbed.
#include "cloud.h"
#include <chrono>
#include <csignal>
#include <gtest/gtest.h>

namespace fs = std::filesystem;

TEST(Uploads, OnlyOneTakesAFreeName)
{
    Cloud cloud;
    for (const bool guarded : {true, false}) {
        const std::string path = guarded ? "/dav/guarded" : "/dav/plain",
                          header = guarded ? "If-None-Match: *\r\n" : "";
        const Connection one(cloud.port), two(cloud.port);
        for (const Connection *connection : {&one, &two}) {
            connection->put(path, 6, header);
            connection->send(connection == &one ? "one" : "two");
        }
        // Both have found the name free before either may finish.
        ASSERT_TRUE(comes_true([&] { return cloud.temporary_files() == 2; }));
        one.send("one");
        two.send("two");
        const int a = one.status(), b = two.status();
        EXPECT_EQ(std::min(a, b), 201);
        EXPECT_EQ(std::max(a, b), guarded ? 412 : 204);
        const std::string stored = read_file(cloud.file(path.substr(5)));
        EXPECT_EQ(stored, (a == 201) == guarded ? "oneone" : "twotwo");
    }
    EXPECT_EQ(cloud.temporary_files(), 0u);
    EXPECT_EQ(cloud.used(), 12);
}

TEST(Uploads, CutOnesLeaveNothing)
{
    Cloud cloud({"--quota", "100K"});
    const std::string half(40000, 'h');
    {
        Connection cut(cloud.port);
        cut.put("/dav/f", 80000);
        cut.send(half);
        ASSERT_TRUE(comes_true([&] { return cloud.temporary_files() == 1; }));
        // Its room is taken while it lasts.
        EXPECT_EQ(cloud.ask("PUT", "/dav/g", {}, half).status, 507);
    }
    EXPECT_TRUE(comes_true([&] { return cloud.temporary_files() == 0; }));
    EXPECT_EQ(cloud.ask("GET", "/dav/f").status, 404);
    EXPECT_EQ(cloud.ask("PUT", "/dav/g", {}, half).status, 201);

    for (const int signal : {SIGKILL, SIGTERM}) {
        const Connection lost(cloud.port);
        lost.put("/dav/f", 50000);
        lost.send(half);
        ASSERT_TRUE(comes_true([&] { return cloud.temporary_files() == 1; }));
        EXPECT_EQ(cloud.stop(signal), signal == SIGTERM ? 0 : -1);
        EXPECT_EQ(cloud.temporary_files(), signal == SIGTERM ? 0u : 1u);
        cloud.start();
        EXPECT_EQ(cloud.temporary_files(), 0u);
        EXPECT_EQ(cloud.ask("GET", "/dav/f").status, 404);
        EXPECT_EQ(cloud.ask("GET", "/dav/g").body, half);
    }
}

TEST(Uploads, StayWithinTheQuota)
{
    Cloud cloud({"--quota", "100K"});
    const auto bytes = [](size_t kilobytes) { return std::string(kilobytes << 10, 'q'); };
    cloud.ask("MKCOL", "/dav/d/");
    const struct {
        std::string method, path, destination;
        size_t kilobytes;
        bool chunked;
        int status;
        long long used; // kilobytes afterwards
    } steps[] = {
        {"PUT", "/dav/a", "", 101, false, 507, 0},        {"PUT", "/dav/a", "", 101, true, 507, 0},
        {"PUT", "/dav/a", "", 2000, true, 507, 0},        {"PUT", "/dav/a", "", 60, true, 201, 60},
        {"PUT", "/dav/d/b", "", 41, false, 507, 60},      {"PUT", "/dav/d/b", "", 40, false, 201, 100},
        {"PUT", "/dav/a", "", 60, false, 204, 100}, // in its own place
        {"PUT", "/dav/a", "", 61, false, 507, 100},       {"PUT", "/dav/e", "", 0, false, 201, 100},
        {"COPY", "/dav/a", "/dav/c", 0, false, 507, 100}, {"COPY", "/dav/d/", "/dav/c", 0, false, 507, 100},
        {"MOVE", "/dav/a", "/dav/c", 0, false, 201, 100}, {"DELETE", "/dav/c", "", 0, false, 204, 40},
        {"COPY", "/dav/d/", "/dav/c", 0, false, 201, 80}, {"COPY", "/dav/d/", "/dav/c", 0, false, 204, 80},
        {"MOVE", "/dav/d/", "/dav/c", 0, false, 204, 40}, {"PUT", "/dav/c/b", "", 10, false, 204, 10},
        {"DELETE", "/dav/c/", "", 0, false, 204, 0},      {"PUT", "/dav/all", "", 100, false, 201, 100},
        {"DELETE", "/dav/all", "", 0, false, 204, 0},
    };
    for (const auto &step : steps) {
        SCOPED_TRACE(step.method + " " + step.path + " " + std::to_string(step.kilobytes));
        const Headers headers{step.destination.empty() ? "X-None: 1" : "Destination: " + step.destination};
        EXPECT_EQ(cloud.ask(step.method, step.path, headers, bytes(step.kilobytes), step.chunked).status, step.status);
        EXPECT_EQ(cloud.used(), step.used << 10);
        EXPECT_EQ(cloud.temporary_files(), 0u);
    }
    // Said before a body is sent that would take hours.
    Connection patient(cloud.port);
    patient.put("/dav/huge", 1LL << 40);
    EXPECT_EQ(patient.status(), 507);

    cloud.stop(SIGTERM);
    write_file(cloud.file("by hand"), bytes(70));
    cloud.start();
    EXPECT_EQ(cloud.used(), 70 << 10);
    const std::string wanted = "<propfind xmlns='DAV:'><prop><quota-available-bytes/></prop></propfind>";
    const std::string quota = cloud.ask("PROPFIND", "/dav/", {"Depth: 0"}, wanted).body;
    EXPECT_NE(quota.find("<D:quota-available-bytes>30720<"), std::string::npos) << quota;
}

// Large bodies take other ways through the service: they wait for the disk on another thread and take turns.
TEST(Uploads, MayBeLarge)
{
    Cloud cloud;
    std::string content;
    for (int i = 0; content.size() < 20 << 20; i++)
        content += std::to_string(i) + " ";
    EXPECT_EQ(cloud.ask("PUT", "/dav/f", {}, content).status, 201);
    EXPECT_EQ(cloud.ask("COPY", "/dav/f", {"Destination: /dav/g"}).status, 201);
    EXPECT_TRUE(cloud.ask("GET", "/dav/g").body == content);
    EXPECT_EQ(cloud.ask("HEAD", "/dav/g").header("repr-digest"), cloud.ask("HEAD", "/dav/f").header("repr-digest"));
    Connection refused(cloud.port);
    refused.put("/dav/f", static_cast<long long>(content.size()), "If-None-Match: *\r\n");
    refused.send(content);
    EXPECT_EQ(refused.status(), 412);
    for (int i = 0; i < 10; i++) { // clients that do not wait for what they asked for
        Connection impatient(cloud.port);
        impatient.put("/dav/h", static_cast<long long>(content.size()));
        impatient.send(content);
        Connection copying(cloud.port);
        copying.begin("COPY", "/dav/f", 0, "Destination: /dav/i" + std::to_string(i) + "\r\n");
        EXPECT_TRUE(comes_true([&] { return fs::exists(cloud.file("i0")) || cloud.temporary_files() > 0; }));
    }
    EXPECT_TRUE(comes_true([&] { return cloud.temporary_files() == 0; }));
    EXPECT_EQ(cloud.ask("DELETE", "/dav/f").status, 204);
}
