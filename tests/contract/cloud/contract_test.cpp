// What any cloud client promises, whatever the service behind it.
#include "backend.h"
#include "transfers.h"
#include <algorithm>
#include <atomic>
#include <fstream>
#include <gtest/gtest.h>
#include <set>
#include <sys/stat.h>
#include <thread>
#include <unistd.h>

static constexpr size_t MEGABYTE = 1 << 20;
using Names = std::vector<std::string>;

class Cloud : public testing::TestWithParam<std::string> {
  protected:
    void TearDown() override
    {
        if (handle)
            cloud_content_sync_destroy(handle);
        handle = nullptr;
    }
    // False when this backend cannot do that; the test has nothing to try then.
    bool open(const Wish &wish = {})
    {
        backend = start_backend(GetParam(), wish);
        if (backend) {
            EXPECT_EQ(cloud_content_sync_create("Test", &handle), 0);
        }
        return backend && handle;
    }
    int start(const std::string &local, const std::string &server, Watch &watch)
    {
        int id = 0;
        EXPECT_EQ(cloud_content_sync_upload(handle, local.c_str(), server.c_str(), &id, transfer_cb, &watch), 0);
        EXPECT_GT(id, 0);
        return id;
    }

    Scratch scratch;
    std::unique_ptr<Backend> backend;
    cloud_content_sync_h handle = nullptr;
};
INSTANTIATE_TEST_SUITE_P(All, Cloud, testing::ValuesIn(backend_names()), [](const auto &row) { return row.param; });
GTEST_ALLOW_UNINSTANTIATED_PARAMETERIZED_TEST(Cloud);

TEST_P(Cloud, refresh_brings_the_whole_tree_with_odd_names)
{
    ASSERT_TRUE(open());
    Names odd = {"100%.txt",      "a&b;c=d+e.txt",    "<b>bold&lt;.txt", "\"quoted\" 'x'.txt",
                 "%41.txt",       "#1?.txt",          "back\\slash",     "ünïcöde 漢字.txt",
                 "new\nline.txt", "[x]~!$(1)@,*.txt", "\xff\xfe.bin",    " spaces  in "};
    for (const std::string &taboo : backend->ability().taboo)
        odd.erase(std::remove(odd.begin(), odd.end(), taboo), odd.end());
    std::multiset<std::string> expected, folders;
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

TEST_P(Cloud, folders_outlive_the_client_and_know_their_place)
{
    ASSERT_TRUE(open());
    backend->make_folder("/A & B");
    backend->make_folder("/A & B/inner");
    backend->store("/A & B/inner/clip.MP4", "12345");
    ASSERT_EQ(refresh(handle), 0);
    cloud_content_sync_folder_h inner = nullptr, copy = nullptr, parent = nullptr, root = nullptr, none = nullptr;
    ASSERT_EQ(cloud_content_sync_get_folder_by_server_path(handle, "/A & B/inner/", &inner), 0);
    EXPECT_EQ(cloud_content_sync_get_folder_by_server_path(handle, "/A", &none), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
    EXPECT_EQ(cloud_content_sync_get_folder_by_server_path(handle, "A & B", &none),
              CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER);
    ASSERT_EQ(cloud_content_sync_folder_clone(&copy, inner), 0);
    cloud_content_sync_folder_destroy(inner);
    cloud_content_sync_destroy(handle);
    handle = nullptr;

    ASSERT_EQ(cloud_content_sync_folder_get_parent(copy, &parent), 0);
    ASSERT_EQ(cloud_content_sync_folder_get_parent(parent, &root), 0);
    EXPECT_EQ(cloud_content_sync_folder_get_parent(root, &none), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
    char *text = nullptr;
    ASSERT_EQ(cloud_content_sync_folder_get_path(parent, &text), 0);
    EXPECT_STREQ(CString(text).get(), "/A & B");
    ASSERT_EQ(cloud_content_sync_folder_get_name(root, &text), 0);
    EXPECT_STREQ(CString(text).get(), "Test");
    cloud_content_sync_content_h kept = nullptr;
    cloud_content_sync_folder_foreach_content_from_db(
        nullptr, copy,
        [](cloud_content_sync_content_h content, int, void *data) {
            return cloud_content_sync_content_clone(static_cast<cloud_content_sync_content_h *>(data), content) == 0;
        },
        &kept);
    for (cloud_content_sync_folder_h folder : {copy, parent, root})
        cloud_content_sync_folder_destroy(folder);
    int type = 0;
    ASSERT_NE(kept, nullptr);
    EXPECT_EQ(cloud_content_sync_content_get_content_type(kept, &type), 0);
    EXPECT_EQ(type, CLOUD_CONTENT_TYPE_VIDEO);
    cloud_content_sync_content_destroy(kept);
}

TEST_P(Cloud, upload_stores_the_file_whole_and_tells_once)
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
        const int id = start(local, "/to here/" + name, watch);
        EXPECT_EQ(watch.end(), 0);
        EXPECT_EQ(backend->content("/to here/" + name), bytes);
        char *landed = nullptr;
        ASSERT_EQ(cloud_content_sync_get_uploaded_path(handle, id, &landed), 0);
        EXPECT_EQ(CString(landed).get(), "/to here/" + name);
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
            EXPECT_GT(watch.calls.size(), 5u) << "no progress on the way";
        }
    }
}

TEST_P(Cloud, a_taken_name_is_never_overwritten)
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

TEST_P(Cloud, uploads_of_one_name_at_once_all_arrive)
{
    ASSERT_TRUE(open());
    constexpr int COUNT = 6;
    std::vector<std::string> bytes, local;
    for (int i = 0; i < COUNT; i++) {
        bytes.push_back(some_bytes(10'000, static_cast<unsigned>(i)));
        local.push_back(scratch.file("same" + std::to_string(i), bytes.back()));
    }
    cloud_content_sync_h other = handle;
    if (backend->ability().atomic_names) {
        ASSERT_EQ(cloud_content_sync_create("Test", &other), 0);
    }
    std::vector<std::thread> threads;
    std::vector<std::string> landed(COUNT);
    for (size_t i = 0; i < COUNT; i++)
        threads.emplace_back(
            [&, i] { EXPECT_EQ(upload(i % 2 ? handle : other, local[i], "/same.bin", &landed[i]), 0); });
    for (std::thread &thread : threads)
        thread.join();
    EXPECT_EQ(std::set<std::string>(landed.begin(), landed.end()).size(), size_t(COUNT));
    for (size_t i = 0; i < COUNT; i++)
        EXPECT_EQ(backend->content(landed[i]), bytes[i]) << landed[i];
    if (other != handle)
        cloud_content_sync_destroy(other);
}

TEST_P(Cloud, a_cancelled_upload_is_silent_and_leaves_nothing)
{
    ASSERT_TRUE(open());
    const std::string big = scratch.file("big", some_bytes(20 * MEGABYTE, 1));
    const std::string small = scratch.file("small", "small");
    for (const bool from_callback : {false, true}) {
        Watch watch, queued;
        std::atomic<int> id = 0, result = -1;
        std::atomic<bool> is_inside = false;
        watch.hook = [&](const Call &call) {
            while (id == 0)
                std::this_thread::yield();
            is_inside = call.progress >= 10;
            std::this_thread::sleep_for(std::chrono::milliseconds(is_inside ? 30 : 0));
            is_inside = false;
            if (from_callback && call.progress >= 10 && result == -1)
                result = cloud_content_sync_cancel(handle, id);
        };
        id = start(big, "/x.bin", watch);
        const int waiting = start(small, "/queued.bin", queued);
        EXPECT_EQ(cloud_content_sync_cancel(handle, waiting), 0);
        ASSERT_TRUE(watch.wait([](const auto &calls) { return !calls.empty() && calls.back().progress >= 10; }));
        while (!from_callback && !is_inside)
            std::this_thread::yield();
        if (!from_callback)
            result = cloud_content_sync_cancel(handle, id);
        EXPECT_FALSE(is_inside) << "the cancel did not wait for the callback";
        const size_t before = from_callback ? 0 : watch.count();
        std::string landed;
        EXPECT_EQ(upload(handle, small, "/x.bin", &landed), 0);
        EXPECT_EQ(landed, "/x.bin") << "the cancelled file was there";
        EXPECT_EQ(result, 0);
        if (!from_callback) {
            EXPECT_EQ(watch.count(), before) << "a callback after the cancel";
        }
        EXPECT_NE(watch.calls.back().state, 3);
        EXPECT_EQ(queued.count(), 0u);
        EXPECT_EQ(cloud_content_sync_cancel(handle, id), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
        EXPECT_EQ(backend->list("/"), Names{"x.bin"});
        backend->remove("/x.bin");
    }
    EXPECT_EQ(cloud_content_sync_cancel(handle, 4711), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
}

TEST_P(Cloud, nothing_calls_back_after_destroy)
{
    ASSERT_TRUE(open());
    const std::string big = scratch.file("big", some_bytes(20 * MEGABYTE, 1));
    for (const bool from_callback : {false, true}) {
        Watch first, second, refreshed;
        std::atomic<bool> is_destroyed = false;
        first.hook = [&](const Call &call) {
            EXPECT_FALSE(is_destroyed);
            if (from_callback && call.progress >= 5) {
                cloud_content_sync_destroy(handle);
                is_destroyed = true;
            }
        };
        second.hook = refreshed.hook = [&](const Call &) { EXPECT_FALSE(is_destroyed); };
        start(big, "/gone.bin", first);
        start(big, "/never.bin", second);
        ASSERT_TRUE(first.wait([](const auto &calls) { return !calls.empty() && calls.back().progress >= 5; }));
        if (!from_callback) {
            cloud_content_sync_refresh_meta(handle, 7, refresh_cb, &refreshed);
            cloud_content_sync_destroy(handle);
            is_destroyed = true;
        }
        while (!is_destroyed)
            std::this_thread::yield();
        handle = nullptr;
        ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
        // A new client's round trip is more time than a late callback would need.
        const std::string small = scratch.file("small", "small");
        std::string landed;
        EXPECT_EQ(upload(handle, small, "/gone.bin", &landed), 0);
        EXPECT_EQ(landed, "/gone.bin");
        EXPECT_EQ(backend->list("/"), Names{"gone.bin"});
        backend->remove("/gone.bin");
    }
}

TEST_P(Cloud, what_cannot_be_uploaded_is_told_by_the_callback)
{
    ASSERT_TRUE(open());
    const std::string fine = scratch.file("fine", "fine");
    const std::string fifo = scratch.path + "/fifo";
    const std::string closed = scratch.file("closed", "closed");
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    ASSERT_EQ(chmod(closed.c_str(), 0), 0);
    struct Row {
        std::string local, server;
        int error;
    } const rows[] = {
        {scratch.path + "/missing", "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {scratch.path, "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {fifo, "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {"/dev/null", "/a", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {closed, "/a", access(closed.c_str(), R_OK) == 0 ? 0 : CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {fine, "/", CLOUD_CONTENT_SYNC_ERROR_BAD_NAME},
        {fine, "relative", CLOUD_CONTENT_SYNC_ERROR_BAD_NAME},
        {fine, "/b/../c", CLOUD_CONTENT_SYNC_ERROR_BAD_NAME},
        {fine, "/folder/", CLOUD_CONTENT_SYNC_ERROR_BAD_NAME},
        {fine, "/no such folder/b", CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN},
        {"", "/a", CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER},
    };
    for (const Row &row : rows)
        EXPECT_EQ(upload(handle, row.local, row.server), row.error) << row.local << " -> " << row.server;
    int id = 0;
    EXPECT_EQ(cloud_content_sync_upload(handle, nullptr, "/a", &id, transfer_cb, nullptr),
              CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER);
    backend->go_down();
    EXPECT_EQ(upload(handle, fine, "/a"), CLOUD_CONTENT_SYNC_ERROR_NETWORK);
}

TEST_P(Cloud, a_file_that_changes_on_the_way_is_not_kept)
{
    ASSERT_TRUE(open());
    if (!backend->ability().real)
        return;
    for (const bool grows : {true, false}) {
        const std::string local = scratch.file("changing", some_bytes(20 * MEGABYTE, 1));
        Watch watch;
        watch.hook = [&](const Call &call) {
            if (call.state != 2 || call.progress != 0)
                return;
            if (grows)
                std::ofstream(local, std::ios::app) << "more";
            else
                EXPECT_EQ(truncate(local.c_str(), 3 * MEGABYTE), 0);
        };
        start(local, "/changing", watch);
        EXPECT_EQ(watch.end(), CLOUD_CONTENT_SYNC_ERROR_LOCAL_CHANGED);
        EXPECT_EQ(backend->list("/"), Names{});
    }
}

TEST_P(Cloud, credentials_decide)
{
    ASSERT_TRUE(open());
    if (!backend->ability().real)
        return;
    const std::string local = scratch.file("local", "x");
    ASSERT_EQ(refresh(handle), 0);
    for (const char *user : {static_cast<const char *>("nobody@example.org"), static_cast<const char *>(nullptr)}) {
        ASSERT_EQ(cloud_content_sync_credentials_set("Test", user, "wrong"), 0);
        bool complete = true;
        cloud_content_sync_get_is_meta_complete(handle, &complete);
        EXPECT_FALSE(complete) << "another account's tree";
        EXPECT_EQ(upload(handle, local, "/x"), CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED);
        EXPECT_EQ(refresh(handle), CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED);
    }
    ASSERT_EQ(cloud_content_sync_credentials_set("Test", nullptr, nullptr), 0);
    EXPECT_EQ(upload(handle, local, "/x"), CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT);
    EXPECT_EQ(refresh(handle), CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT);
    for (const auto &[user, secret] : {std::pair("a:b", "s"), std::pair("u", "s\nHeader: x"), std::pair("", "s")})
        EXPECT_EQ(cloud_content_sync_credentials_set("Test", user, secret), CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER);
    cloud_content_sync_h none = nullptr;
    EXPECT_EQ(cloud_content_sync_create("Unknown", &none), CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE);
    EXPECT_EQ(cloud_content_sync_create("../Test", &none), CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER);
}

TEST_P(Cloud, a_full_storage_and_a_lost_answer)
{
    const std::string local = scratch.file("local", some_bytes(3 * MEGABYTE, 1));
    if (open({.quota = 1 << 20})) {
        EXPECT_EQ(upload(handle, local, "/x"), CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL);
        TearDown();
        backend.reset();
    }
    if (!open({.lose_reply = 2}))
        return;
    std::string landed;
    EXPECT_EQ(upload(handle, local, "/first", &landed), 0);
    EXPECT_EQ(upload(handle, local, "/x", &landed), 0);
    EXPECT_EQ(landed, "/x") << "sent twice";
    EXPECT_EQ(backend->list("/").size(), 2u);
}

TEST_P(Cloud, settings_are_kept)
{
    ASSERT_TRUE(open());
    bool value = false;
    EXPECT_EQ(cloud_content_sync_setting_get_type_activation(handle, CLOUD_CONTENT_TYPE_VIDEO, &value), 0);
    EXPECT_TRUE(value);
    EXPECT_EQ(cloud_content_sync_setting_set_type_activation(handle, CLOUD_CONTENT_TYPE_VIDEO, false), 0);
    cloud_content_sync_destroy(handle);
    ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
    EXPECT_EQ(cloud_content_sync_setting_get_type_activation(handle, CLOUD_CONTENT_TYPE_VIDEO, &value), 0);
    EXPECT_FALSE(value);
    EXPECT_EQ(cloud_content_sync_setting_get_type_activation(handle, CLOUD_CONTENT_TYPE_IMAGE, &value), 0);
    EXPECT_TRUE(value);
    EXPECT_EQ(cloud_content_sync_setting_set_type_activation(handle, 3, false),
              CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER);
}

// Any order of uploads, cancels and refreshes from several threads, then a destroy in their midst.
TEST_P(Cloud, any_order_of_calls_from_any_thread)
{
    ASSERT_TRUE(open());
    const std::string local = scratch.file("local", some_bytes(300'000, 1));
    constexpr int THREADS = 3, ROUNDS = 8;
    std::vector<std::unique_ptr<Watch>> watches(THREADS * ROUNDS);
    for (auto &watch : watches)
        watch = std::make_unique<Watch>();
    Watch refreshes;
    std::atomic<int> finished = 0;
    std::vector<std::thread> threads;
    for (int t = 0; t < THREADS; t++)
        threads.emplace_back([&, t] {
            for (int i = 0; i < ROUNDS; i++) {
                Watch &watch = *watches[static_cast<size_t>(t * ROUNDS + i)];
                const int id = start(local, "/t" + std::to_string(t), watch);
                if (i % 4 == 1) {
                    watch.wait([](const auto &calls) { return !calls.empty(); });
                    const bool cancelled = cloud_content_sync_cancel(handle, id) == 0;
                    const size_t count = watch.count();
                    std::this_thread::sleep_for(std::chrono::milliseconds(5));
                    EXPECT_EQ(watch.count(), count);
                    EXPECT_EQ(cancelled, watch.calls.back().state == 2);
                } else if (i % 4 == 2) {
                    cloud_content_sync_refresh_meta(handle, 1, refresh_cb, &refreshes);
                } else if (i % 4 == 0) {
                    EXPECT_EQ(watch.end(), 0);
                    finished++;
                }
            }
        });
    for (std::thread &thread : threads)
        thread.join();
    cloud_content_sync_destroy(handle);
    handle = nullptr;
    EXPECT_EQ(finished, THREADS * 2);
}
