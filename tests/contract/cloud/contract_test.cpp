// What any cloud client promises, whatever the service behind it.
#include "backend.h"
#include "base/base.h"
#include "relay.h"
#include <atomic>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <set>
#include <sys/stat.h>
#include <unistd.h>

namespace fs = std::filesystem;

static constexpr size_t MEGABYTE = 1 << 20;
using Transfers = OnBackend;
INSTANTIATE_TEST_SUITE_P(All, Transfers, testing::ValuesIn(backend_names()), [](const auto &row) { return row.param; });
using ServerTransfers = OnBackend;
GTEST_ALLOW_UNINSTANTIATED_PARAMETERIZED_TEST(ServerTransfers); // the fake is none
INSTANTIATE_TEST_SUITE_P(All, ServerTransfers, testing::ValuesIn(server_names()),
                         [](const auto &row) { return row.param; });

TEST_P(Transfers, refresh_brings_the_whole_tree_with_odd_names)
{
    ASSERT_TRUE(open());
    Names odd = {"100%.txt",      "a&b;c=d+e.txt",    "<b>bold&lt;.txt", "\"quoted\" 'x'.txt",
                 "%41.txt",       "#1?.txt",          "back\\slash",     "ünïcöde 漢字.txt",
                 "new\nline.txt", "[x]~!$(1)@,*.txt", "\xff\xfe.bin",    " spaces  in "};
    for (const std::string &taboo : backend->taboo)
        odd.erase(std::remove(odd.begin(), odd.end(), taboo), odd.end());
    std::multiset<std::string> expected;
    backend->make_folder("/odd");
    for (const std::string &name : odd) {
        backend->store("/odd/" + name, name);
        expected.insert(name + ":" + std::to_string(name.size()));
        backend->make_folder("/odd/in " + name);
        expected.insert("in " + name + "/");
        backend->store("/odd/in " + name + "/deep", "");
    }
    for (const char *name : {"/img10.jpg", "/Img2.jpg", "/img1.jpg", "/Éclair", "/zoo", "/Dog"})
        backend->store(name, "1");
    bool complete = true;
    EXPECT_EQ(cloud_content_sync_get_is_meta_complete(handle, &complete), 0);
    EXPECT_FALSE(complete);
    ASSERT_EQ(refresh(handle), 0);
    EXPECT_EQ(cloud_content_sync_get_is_meta_complete(handle, &complete), 0);
    EXPECT_TRUE(complete);

    const Names rows = listing(handle, "/odd");
    EXPECT_EQ(std::multiset<std::string>(rows.begin(), rows.end()), expected);
    for (const std::string &name : odd)
        EXPECT_EQ(listing(handle, "/odd/in " + name), Names{"deep:0"}) << name;
    EXPECT_EQ(listing(handle, "/"),
              (Names{"odd/", "Dog:1", "Éclair:1", "img1.jpg:1", "Img2.jpg:1", "img10.jpg:1", "zoo:1"}));

    // What is gone goes; what cannot be asked stays.
    backend->remove("/odd/in 100%.txt");
    backend->remove("/zoo");
    ASSERT_EQ(refresh(handle), 0);
    EXPECT_EQ(listing(handle, "/odd/in 100%.txt"), Names{"no such folder"});
    const Names before = listing(handle, "/");
    EXPECT_EQ(std::count(before.begin(), before.end(), "zoo:1"), 0);
    backend->go_down();
    EXPECT_EQ(refresh(handle), CLOUD_CONTENT_SYNC_ERROR_NETWORK);
    EXPECT_EQ(listing(handle, "/"), before);
}

TEST_P(Transfers, folders_outlive_the_client_and_know_their_place)
{
    ASSERT_TRUE(open());
    backend->make_folder("/A + B");
    backend->make_folder("/A + B/inner");
    ASSERT_EQ(refresh(handle), 0);
    cloud_content_sync_folder_h inner = nullptr, copy = nullptr, parent = nullptr, root = nullptr, none = nullptr;
    ASSERT_EQ(cloud_content_sync_get_folder_by_server_path(handle, "/A + B/inner/", &inner), 0);
    EXPECT_EQ(cloud_content_sync_get_folder_by_server_path(handle, "/A", &none), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
    EXPECT_EQ(cloud_content_sync_get_folder_by_server_path(handle, "A + B", &none),
              CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER);
    ASSERT_EQ(cloud_content_sync_folder_clone(&copy, inner), 0);
    cloud_content_sync_folder_destroy(inner);
    cloud_content_sync_destroy(handle);
    handle = nullptr;
    ASSERT_EQ(cloud_content_sync_folder_get_parent(copy, &parent), 0);
    ASSERT_EQ(cloud_content_sync_folder_get_parent(parent, &root), 0);
    EXPECT_EQ(cloud_content_sync_folder_get_parent(root, &none), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
    char *path = nullptr, *name = nullptr;
    ASSERT_EQ(cloud_content_sync_folder_get_path(parent, &path), 0);
    EXPECT_EQ(taken(path), "/A + B");
    ASSERT_EQ(cloud_content_sync_folder_get_name(root, &name), 0);
    EXPECT_EQ(taken(name), "Test");
    for (cloud_content_sync_folder_h folder : {copy, parent, root})
        cloud_content_sync_folder_destroy(folder);
}

TEST_P(Transfers, upload_stores_the_file_whole_and_tells_once)
{
    ASSERT_TRUE(open());
    backend->make_folder("/to here");
    unsigned seed = 0;
    for (const size_t size : {size_t(0), size_t(1), 20 * MEGABYTE + 7}) {
        const std::string name = "f&%? " + std::to_string(size) + ".bin";
        const std::string bytes = some_bytes(size, ++seed);
        const std::string local = scratch.file("local", bytes);
        Watch watch;
        Names seen;
        watch.hook = [&](const Call &call) {
            if (call.state != 2)
                seen = listing(handle, "/to here");
        };
        if (seed == 1) {
            ASSERT_EQ(refresh(handle), 0);
        }
        const int id = start(handle, local, "/to here/" + name, watch);
        EXPECT_EQ(watch.end(), 0);
        EXPECT_EQ(backend->content("/to here/" + name), bytes);
        EXPECT_EQ(cloud_content_sync_cancel(handle, id), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
        EXPECT_EQ(std::count(seen.begin(), seen.end(), name + ":" + std::to_string(size)), 1)
            << "not in the database by the last callback";

        std::scoped_lock lock(watch.mutex);
        EXPECT_EQ(watch.calls.back().progress, 100);
        for (size_t i = 0; i + 1 < watch.calls.size(); i++) {
            EXPECT_EQ(watch.calls[i].state, 2) << "a second last callback";
            EXPECT_LE(watch.calls[i].progress, watch.calls[i + 1].progress);
            EXPECT_GE(watch.calls[i].progress, 0);
        }
        if (size > MEGABYTE) {
            EXPECT_GT(watch.calls.size(), 3u) << "no progress on the way";
        }
    }
}

TEST_P(Transfers, a_taken_name_is_never_overwritten)
{
    ASSERT_TRUE(open());
    const std::string long_name = std::string(250, 'x') + ".txt"; // the counter takes 3 bytes of it
    struct Row {
        const char *folder; // exists beside the files
        Names files;
        std::string wanted, landed;
    } const rows[] = {
        {nullptr, {"photo.jpg"}, "photo.jpg", "photo(1).jpg"},
        {nullptr, {"a.b.gz", "a.b(1).gz", "a.b(2).gz"}, "a.b.gz", "a.b(3).gz"},
        {nullptr, {"p(9).jpg"}, "p(9).jpg", "p(10).jpg"},
        {nullptr, {"q(0).jpg"}, "q(0).jpg", "q(0)(1).jpg"},
        {nullptr, {"README"}, "README", "README(1)"},
        {nullptr, {long_name}, long_name, std::string(248, 'x') + "(1).txt"},
        {"dir.jpg", {}, "dir.jpg", "dir(1).jpg"},
        {nullptr, {"Case.jpg"}, "case.jpg", "case.jpg"},
    };
    const std::string local = scratch.file("new", "new bytes");
    for (const Row &row : rows) {
        if (std::ranges::count(backend->taboo, row.wanted))
            continue;
        if (row.folder)
            backend->make_folder(std::string("/") + row.folder);
        for (const std::string &file : row.files)
            backend->store("/" + file, "old");
        std::string landed;
        EXPECT_EQ(upload(handle, local, "/" + row.wanted, &landed), 0) << row.wanted;
        EXPECT_EQ(landed, "/" + row.landed);
        EXPECT_EQ(backend->content("/" + row.landed), "new bytes");
        for (const std::string &file : row.files)
            EXPECT_EQ(backend->content("/" + file), "old") << file;
    }
}

TEST_P(Transfers, nothing_calls_back_and_nothing_stays_after_cancel_or_destroy)
{
    ASSERT_TRUE(open());
    const std::string big = scratch.file("big", some_bytes(20 * MEGABYTE, 1)), small = scratch.file("small", "small");
    for (const auto &[by_destroy, from_callback] :
         {std::pair(false, false), std::pair(false, true), std::pair(true, false), std::pair(true, true)}) {
        SCOPED_TRACE(testing::Message() << "destroy " << by_destroy << " from callback " << from_callback);
        Watch watch, queued, refreshed;
        std::atomic<int> id = 0;
        std::atomic<bool> is_inside = false, has_ended = false;
        const auto end = [&, is_destroy = by_destroy] {
            EXPECT_EQ(is_destroy ? cloud_content_sync_destroy(handle) : cloud_content_sync_cancel(handle, id), 0);
            has_ended = true;
        };
        watch.hook = [&, is_last = from_callback](const Call &call) {
            EXPECT_FALSE(has_ended);
            while (id == 0)
                std::this_thread::yield();
            is_inside = call.progress >= 5;
            std::this_thread::sleep_for(std::chrono::milliseconds(is_inside ? 30 : 0));
            is_inside = false;
            if (is_last && call.progress >= 5)
                end();
        };
        refreshed.hook = [&](const Call &) { EXPECT_FALSE(has_ended); };
        id = start(handle, big, "/x.bin", watch);
        const int waiting = start(handle, small, "/queued.bin", queued);
        if (by_destroy)
            cloud_content_sync_refresh_meta(handle, 7, refresh_cb, &refreshed);
        else
            EXPECT_EQ(cloud_content_sync_cancel(handle, waiting), 0);
        ASSERT_TRUE(watch.wait_for_progress(5));
        while (!from_callback && !is_inside)
            std::this_thread::yield();
        if (!from_callback)
            end();
        EXPECT_FALSE(is_inside) << "did not wait for the callback";
        if (by_destroy)
            ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
        else
            EXPECT_EQ(cloud_content_sync_cancel(handle, id), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
        // The next upload's round trip is more time than a late callback would need.
        std::string landed;
        EXPECT_EQ(upload(handle, small, "/x.bin", &landed), 0);
        EXPECT_EQ(landed, "/x.bin") << "the one that was ended is there";
        // What a client that was destroyed could not delete goes with the uploads of later ones.
        for (int i = 0; by_destroy && i < 20 && backend->list("/").size() > 1; i++) {
            std::this_thread::sleep_for(std::chrono::milliseconds(100));
            EXPECT_EQ(upload(handle, small, "/again"), 0);
            backend->remove("/again");
        }
        EXPECT_EQ(backend->list("/"), Names{"x.bin"});
        EXPECT_NE(watch.calls.back().state, 3);
        EXPECT_EQ(queued.count(), 0u);
        backend->remove("/x.bin");
    }
}

TEST_P(Transfers, what_cannot_be_uploaded_is_told_by_the_callback)
{
    ASSERT_TRUE(open());
    const std::string fine = scratch.file("fine", "fine");
    const std::string fifo = scratch.path + "/fifo";
    const std::string closed = scratch.file("closed", "closed");
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    ASSERT_EQ(chmod(closed.c_str(), 0), 0);
    const std::string own = platform_data_dir() + "/cloud/Test.credentials", linked = scratch.path + "/linked",
                      hard_linked = scratch.path + "/hard", foreign = scratch.file("foreign", "x"),
                      open_to_all = scratch.file("open", "x");
    ASSERT_EQ(symlink(own.c_str(), linked.c_str()), 0);
    ASSERT_EQ(link(own.c_str(), hard_linked.c_str()), 0);
    chmod(foreign.c_str(), 0640);
    chmod(open_to_all.c_str(), 0644);
    if (geteuid() == 0) { // nobody else can give files away
        ASSERT_EQ(chown(foreign.c_str(), 1, 0), 0);
        ASSERT_EQ(chown(open_to_all.c_str(), 1, 0), 0);
    }
    const int opened = ::open(fine.c_str(), O_RDONLY | O_CLOEXEC);
    struct Row {
        std::string local, server;
        int error;
    } const rows[] = {
        {scratch.path + "/missing", "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {scratch.path, "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {fifo, "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE},
        {"/dev/null", "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE},
        {"/proc/self/status", "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE},
        {"/sys/kernel/uevent_seqnum", "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE},
        {"/proc/self/fd/" + std::to_string(opened), "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE},
        {own, "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE},
        {linked, "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE},
        {hard_linked, "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE},
        {foreign, "/a", geteuid() == 0 ? CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE : 0},
        {open_to_all, "/a", 0},
        {closed, "/a", access(closed.c_str(), R_OK) == 0 ? 0 : CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {fine, "/", CLOUD_CONTENT_SYNC_ERROR_BAD_NAME},
        {fine, "relative", CLOUD_CONTENT_SYNC_ERROR_BAD_NAME},
        {fine, "/b/../c", CLOUD_CONTENT_SYNC_ERROR_BAD_NAME},
        {fine, "/folder/", CLOUD_CONTENT_SYNC_ERROR_BAD_NAME},
        {fine, "/no such folder/b", CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN},
    };
    for (const Row &row : rows)
        EXPECT_EQ(upload(handle, row.local, row.server), row.error) << row.local << " -> " << row.server;
    close(opened);
    backend->go_down();
    const int error = upload(handle, fine, "/a"); // a kept connection may take the whole body before it is found dead
    EXPECT_TRUE(error == CLOUD_CONTENT_SYNC_ERROR_NETWORK || error == CLOUD_CONTENT_SYNC_ERROR_OUTCOME_UNKNOWN)
        << error;
}

TEST_P(ServerTransfers, a_file_whose_data_change_on_the_way_is_not_kept)
{
    ASSERT_TRUE(open());
    constexpr int CHANGED = CLOUD_CONTENT_SYNC_ERROR_LOCAL_CHANGED;
    const struct {
        const char *name;
        int at; // per cent
        std::function<void(const std::string &file)> change;
        int error;
    } rows[] = {
        {"grows", 0, [](const std::string &file) { std::ofstream(file, std::ios::app) << "more"; }, CHANGED},
        {"shrinks", 0, [](const std::string &file) { fs::resize_file(file, 3 * MEGABYTE); }, CHANGED},
        {"is written to, and its time put back", 50,
         [](const std::string &file) {
             const auto time = fs::last_write_time(file);
             std::fstream(file, std::ios::in | std::ios::out) << "other";
             fs::last_write_time(file, time);
         },
         CHANGED},
        {"gets other permissions", 50, [](const std::string &file) { fs::permissions(file, fs::perms::owner_read); },
         0},
    };
    for (const auto &row : rows) {
        SCOPED_TRACE(row.name);
        const std::string local = scratch.file("changing", some_bytes(20 * MEGABYTE, 1));
        Watch watch;
        std::once_flag once;
        watch.hook = [&](const Call &call) {
            if (call.state == 2 && call.progress >= row.at)
                std::call_once(once, row.change, local);
        };
        start(handle, local, "/changing", watch);
        EXPECT_EQ(watch.end(), row.error);
        EXPECT_EQ(backend->list("/"), row.error ? Names{} : Names{"changing"});
        fs::remove(local);
    }
}

// The service has done what it was asked to, and nobody hears of it.
TEST_P(ServerTransfers, a_lost_answer_neither_loses_nor_doubles_a_file)
{
    backend = start_backend(GetParam());
    ASSERT_TRUE(backend);
    const auto relay = backend->put_relay_between();
    ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
    const std::string local = scratch.file("local", some_bytes(MEGABYTE, 1));
    backend->store("/MOVE", "old");
    ASSERT_EQ(upload(handle, local, "/first"), 0);
    Names all = {"MOVE", "first"};
    for (const char *method : {"PUT", "MOVE", "PROPFIND", "HEAD"}) {
        relay->lost = method;
        std::string landed;
        EXPECT_EQ(upload(handle, local, std::string("/") + method, &landed), 0) << method;
        EXPECT_EQ(landed, method == std::string("MOVE") ? "/MOVE(1)" : std::string("/") + method);
        EXPECT_EQ(backend->content(landed), some_bytes(MEGABYTE, 1)) << method;
        all.push_back(landed.substr(1));
    }
    Names listed = backend->list("/");
    std::ranges::sort(all);
    std::ranges::sort(listed);
    EXPECT_EQ(listed, all);
    EXPECT_EQ(backend->content("/MOVE"), "old");
    cloud_content_sync_destroy(handle); // its connections go before the relay
    handle = nullptr;
}

TEST_P(ServerTransfers, credentials_decide)
{
    ASSERT_TRUE(open());
    const std::string local = scratch.file("local", "x");
    ASSERT_EQ(refresh(handle), 0);
    for (const char *user : {static_cast<const char *>("nobody@example.org"), static_cast<const char *>(nullptr)}) {
        ASSERT_EQ(cloud_content_sync_credentials_set("Test", nullptr, user, "wrong"), 0);
        bool complete = true;
        cloud_content_sync_get_is_meta_complete(handle, &complete);
        EXPECT_FALSE(complete) << "another account's tree";
        EXPECT_EQ(upload(handle, local, "/x"), CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED);
        EXPECT_EQ(refresh(handle), CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED);
    }
    ASSERT_EQ(cloud_content_sync_credentials_set("Test", nullptr, nullptr, nullptr), 0);
    EXPECT_EQ(upload(handle, local, "/x"), CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT);
    EXPECT_EQ(refresh(handle), CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT);
    const char *const malformed[][3] = {
        {nullptr, "a:b", "s"}, {nullptr, "u", "s\nHeader: x"}, {nullptr, "", "s"}, {"", "u", "s"}, {"a\nb", "u", "s"}};
    for (const auto &[email, user, secret] : malformed)
        EXPECT_EQ(cloud_content_sync_credentials_set("Test", email, user, secret),
                  CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER);
    cloud_content_sync_h none = nullptr;
    EXPECT_EQ(cloud_content_sync_create("../Test", &none), CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER);
}
