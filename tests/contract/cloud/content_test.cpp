// Single files of a service: cached, downloaded, streamed, and their thumbnails.
#include "backend.h"
#include "cloud.h"
#include "cloud_content_sync/account.h"
#include <atomic>
#include <gdk-pixbuf/gdk-pixbuf.h>
#include <sys/resource.h>
#include <sys/stat.h>

namespace fs = std::filesystem;

class Files : public OnBackend {
  protected:
    void SetUp() override
    {
        ASSERT_TRUE(open());
    }
    std::string data(const std::string &name) const
    {
        return home.path + "/cloud/" + name;
    }
    // Stores a file and lets the client know.
    void publish(const std::string &name, const std::string &bytes)
    {
        backend->store("/" + name, bytes);
        ASSERT_EQ(refresh(handle), 0);
    }
};
INSTANTIATE_TEST_SUITE_P(All, Files, testing::ValuesIn(backend_names()), [](const auto &row) { return row.param; });
using ServerFiles = Files;
GTEST_ALLOW_UNINSTANTIATED_PARAMETERIZED_TEST(ServerFiles); // the fake is none
INSTANTIATE_TEST_SUITE_P(All, ServerFiles, testing::ValuesIn(server_names()),
                         [](const auto &row) { return row.param; });

TEST_P(Files, files_come_whole_and_the_cache_needs_no_service)
{
    const struct {
        std::string name, extension, bytes;
    } files[] = {{"empty.JPG", ".JPG", ""},
                 {"a b&%41#?.png", ".png", "x"},
                 {"no extension", "", some_bytes(70'000, 1)},
                 {"big.tar.gz", ".gz", some_bytes(20 << 20, 2)},
                 {"name.long extension", "", "y"}};
    Names cached;
    for (const auto &[name, extension, bytes] : files) {
        publish(name, bytes);
        Watch kept, loaded;
        EXPECT_EQ(fetch(handle, Kind::CACHED, name, kept), 0) << name;
        EXPECT_EQ(read_file(kept.text), bytes) << name;
        EXPECT_EQ(fs::path(kept.text).extension(), extension) << name;
        EXPECT_EQ(kept.text.find(data("cache/")), 0u) << kept.text;
        EXPECT_EQ(kept.status, 200);
        cached.push_back(kept.text);
        EXPECT_EQ(fetch(handle, Kind::DOWNLOAD, name, loaded, scratch.path + "/" + name), 0) << name;
        EXPECT_EQ(loaded.text, scratch.path + "/" + name);
        EXPECT_EQ(read_file(loaded.text), bytes) << name;
        EXPECT_EQ(kept.count() + loaded.count(), 2u);
    }
    EXPECT_EQ(names_in(scratch.path).size(), std::size(files));
    backend->go_down();
    for (size_t i = 0; i < std::size(files); i++) {
        Watch kept;
        EXPECT_EQ(fetch(handle, Kind::CACHED, files[i].name, kept), 0);
        EXPECT_EQ(kept.text, cached[i]);
    }
    for (const Kind kind : {Kind::DOWNLOAD, Kind::STREAM}) {
        Watch failed;
        EXPECT_EQ(fetch(handle, kind, "empty.JPG", failed, scratch.path + "/none"), CLOUD_CONTENT_SYNC_ERROR_NETWORK);
        EXPECT_EQ(failed.text, "");
    }
    EXPECT_EQ(names_in(scratch.path).size(), std::size(files));
}

TEST_P(Files, what_changed_or_is_damaged_is_fetched_again)
{
    publish("a.jpg", "one");
    Watch first, second, third, again;
    ASSERT_EQ(fetch(handle, Kind::CACHED, "a.jpg", first), 0);
    const Content old = content_at(handle, "a.jpg");
    std::this_thread::sleep_for(std::chrono::milliseconds(1100)); // Apache's entity tags may count in seconds
    publish("a.jpg", "two");
    ASSERT_EQ(fetch(handle, Kind::CACHED, "a.jpg", second), 0);
    EXPECT_EQ(read_file(second.text), "two");
    int id = 0;
    cloud_content_sync_content_get_cached_file(old.get(), &id, result_cb, &again);
    EXPECT_EQ(again.end(), 0);
    EXPECT_EQ(read_file(again.text), "two") << "an old handle";
    std::ofstream(second.text) << "short";
    ASSERT_EQ(fetch(handle, Kind::CACHED, "a.jpg", third), 0);
    EXPECT_EQ(read_file(third.text), "two");
    backend->remove("/a.jpg");
    fs::remove(third.text);
    Watch gone;
    EXPECT_EQ(fetch(handle, Kind::CACHED, "a.jpg", gone), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
    EXPECT_EQ(gone.status, 404);
    // Larger than it was, without a refresh.
    publish("b.jpg", "small");
    backend->store("/b.jpg", "larger than before");
    for (int i = 0; i < 2; i++) {
        Watch grown;
        ASSERT_EQ(fetch(handle, Kind::CACHED, "b.jpg", grown), 0);
        EXPECT_EQ(read_file(grown.text), "larger than before");
        EXPECT_EQ(grown.status, i == 0 ? 200 : 0) << "asked again for what is known";
    }
    // Of the same size as it was, likewise; the next refresh brings what is known by then.
    publish("c.jpg", "one");
    backend->store("/c.jpg", "two");
    for (int i = 0; i < 2; i++) {
        Watch changed;
        ASSERT_EQ(fetch(handle, Kind::CACHED, "c.jpg", changed), 0);
        EXPECT_EQ(read_file(changed.text), "two");
        EXPECT_EQ(changed.status, i == 0 ? 200 : 0) << "asked again for what is known";
        ASSERT_EQ(refresh(handle), 0);
    }
}

// What the client keeps belongs to an e-mail address, or to the user or the token where none is known.
TEST_P(Files, a_new_token_of_the_same_address_keeps_everything)
{
    constexpr const char *NO = nullptr, *OTHER = "other@example.org";
    const struct {
        const char *email, *user; // of who is signed in
        struct Next {
            const char *email, *user, *secret;
            bool is_same;
        } next[2];
    } rows[] = {
        {USER, USER, {{USER, NO, "new token", true}, {USER, USER, "new password", true}}},
        {USER, USER, {{USER, NO, "new token", true}, {OTHER, NO, "new token", false}}},
        {USER, USER, {{OTHER, USER, PASSWORD, false}, {USER, USER, PASSWORD, false}}},
        {NO, USER, {{NO, USER, "new password", true}, {NO, OTHER, "new password", false}}},
        {NO, USER, {{USER, USER, PASSWORD, false}, {NO, USER, PASSWORD, false}}},
        {USER, USER, {{NO, NO, "token", false}, {NO, NO, "new token", false}}},
        {USER, USER, {{NO, NO, NO, false}, {USER, USER, PASSWORD, false}}},
    };
    backend->store("/kept.jpg", "kept");
    for (const auto &row : rows) {
        ASSERT_EQ(cloud_content_sync_credentials_set("Test", row.email, row.user, PASSWORD), 0);
        ASSERT_EQ(refresh(handle), 0);
        Watch cached;
        ASSERT_EQ(fetch(handle, Kind::CACHED, "kept.jpg", cached), 0);
        for (const auto &next : row.next) {
            SCOPED_TRACE(testing::Message() << &row - rows << " " << &next - row.next);
            ASSERT_EQ(cloud_content_sync_credentials_set("Test", next.email, next.user, next.secret), 0);
            bool complete = !next.is_same;
            cloud_content_sync_get_is_meta_complete(handle, &complete);
            EXPECT_EQ(complete, next.is_same);
            EXPECT_EQ(listing(handle, "/"), next.is_same ? Names{"kept.jpg:4"} : Names{});
            EXPECT_EQ(fs::exists(cached.text), next.is_same);
            Watch again;
            if (next.is_same) {
                EXPECT_EQ(fetch(handle, Kind::CACHED, "kept.jpg", again), 0);
                EXPECT_EQ(again.text, cached.text);
            }
        }
    }
}

TEST_P(Files, settings_are_the_accounts_own)
{
    constexpr int NO_ACCOUNT = CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
    const struct {
        const char *email, *secret; // null: nobody
        bool seen;                  // of the images; of the videos it is always the default
        int set;                    // to false
        long long number;           // seen before it is set to the row's own
    } rows[] = {
        {"a@example.org", "one", true, 0, -1},         {"b@example.org", "one", true, 0, -1},
        {"a@example.org", "two", false, 0, 0},         {nullptr, nullptr, true, NO_ACCOUNT, -1},
        {"b@example.org", "two", false, 0, 1LL << 40}, {"a@example.org", "three", true, 0, -1}}; // it was signed out
    cloud::Account account(*cloud::service_find("Test"));
    ASSERT_TRUE(account.open());
    for (const auto &row : rows) {
        SCOPED_TRACE(&row - rows);
        ASSERT_EQ(cloud_content_sync_credentials_set("Test", row.email, nullptr, row.secret), 0);
        bool images = !row.seen, videos = false;
        EXPECT_EQ(cloud_content_sync_setting_get_type_activation(handle, CLOUD_CONTENT_TYPE_IMAGE, &images), 0);
        EXPECT_EQ(cloud_content_sync_setting_get_type_activation(handle, CLOUD_CONTENT_TYPE_VIDEO, &videos), 0);
        EXPECT_EQ(std::pair(images, videos), std::pair(row.seen, true));
        EXPECT_EQ(cloud_content_sync_setting_set_type_activation(handle, CLOUD_CONTENT_TYPE_IMAGE, false), row.set);
        EXPECT_EQ(account.setting("number", -1), row.number);
        EXPECT_EQ(account.set_setting("number", (&row - rows) << 40), row.set);
    }
}

static void storage_cb(int status, unsigned long long total, unsigned long long used, int error, void *data)
{
    auto *result = static_cast<Watch *>(data);
    result->text = std::to_string(used) + " of " + std::to_string(total);
    result->add({status, 0, error});
}

TEST_P(Files, storage_is_what_the_service_says)
{
    const auto ask_storage = [&](Watch &result) {
        EXPECT_EQ(cloud_content_sync_get_server_storage_info(handle, storage_cb, &result), 0);
    };
    Watch before, after, gone, dropped;
    ask_storage(before);
    EXPECT_EQ(before.end(), 0);
    publish("a.jpg", std::string(5'000, 'x'));
    ask_storage(after);
    EXPECT_EQ(after.end(), 0);
    const bool is_bounded = GetParam() != "Apache";
    EXPECT_EQ(after.text.starts_with("5000 of "), is_bounded) << after.text;
    EXPECT_EQ(after.text.ends_with(" of 0"), !is_bounded) << after.text;
    for (int i = 0; i < 50; i++) { // at every moment of its life
        ask_storage(dropped);
        g_usleep(static_cast<gulong>(i) * 100);
        cloud_content_sync_cancel_server_storage_info(handle, &dropped);
        const size_t calls = dropped.count();
        g_usleep(1'000);
        ASSERT_EQ(dropped.count(), calls);
    }
    EXPECT_EQ(cloud_content_sync_cancel_server_storage_info(handle, &dropped), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
    backend->go_down();
    ask_storage(gone);
    EXPECT_EQ(gone.end(), CLOUD_CONTENT_SYNC_ERROR_NETWORK);
}

// At every moment of a download: after its cancel nothing arrives, unless its last callback has run.
TEST_P(Files, a_cancelled_download_leaves_nothing)
{
    publish("a.jpg", "content");
    const std::string local = scratch.path + "/a.jpg";
    int cancelled = 0;
    for (int i = 0; i < 200; i++) {
        Watch result;
        const int id = ask(handle, Kind::DOWNLOAD, "a.jpg", result, local);
        std::this_thread::sleep_for(std::chrono::microseconds(i * 25));
        const bool is_cancelled = cloud_content_sync_cancel(handle, id) == 0;
        // Another request's round trip is more time than a late file or callback would need.
        Watch next;
        ASSERT_EQ(fetch(handle, Kind::DOWNLOAD, "a.jpg", next, scratch.path + "/next"), 0);
        EXPECT_EQ(result.count(), is_cancelled ? 0u : 1u) << i;
        EXPECT_EQ(fs::exists(local), !is_cancelled) << i;
        fs::remove(local);
        cancelled += is_cancelled;
    }
    EXPECT_GT(cancelled, 0);
}

TEST_P(ServerFiles, a_download_replaces_a_file_or_leaves_everything_as_it_was)
{
    publish("doc.txt", "new");
    publish("large.bin", some_bytes(3 << 20, 1));
    const std::string place = scratch.path + "/";
    const std::string other = scratch.file("other", "other");
    ASSERT_EQ(symlink(other.c_str(), (place + "link").c_str()), 0);
    ASSERT_EQ(mkfifo((place + "fifo").c_str(), 0600), 0);
    ASSERT_EQ(mkdir((place + "dir").c_str(), 0700), 0);
    scratch.file("file", "old");
    scratch.file("kept", "old");
    const Names before = names_in(place);
    constexpr int LOCAL = CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
    const struct {
        const char *name, *target;
        int error;
    } rows[] = {
        {"doc.txt", "link", LOCAL}, {"doc.txt", "fifo", LOCAL},      {"doc.txt", "dir", LOCAL},
        {"doc.txt", "dir/", LOCAL}, {"doc.txt", "missing/x", LOCAL}, {"large.bin", "kept", LOCAL}, // no room
        {"doc.txt", "file", 0},
    };
    rlimit unlimited;
    getrlimit(RLIMIT_FSIZE, &unlimited);
    const rlimit little = {1 << 20, unlimited.rlim_max};
    setrlimit(RLIMIT_FSIZE, &little);
    for (const auto &row : rows) {
        Watch result;
        EXPECT_EQ(fetch(handle, Kind::DOWNLOAD, row.name, result, place + row.target), row.error) << row.target;
        EXPECT_EQ(names_in(place), before) << row.target;
    }
    Watch no_room;
    EXPECT_EQ(fetch(handle, Kind::CACHED, "large.bin", no_room), CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE);
    EXPECT_EQ(names_in(data("cache/Test")), Names{});
    setrlimit(RLIMIT_FSIZE, &unlimited);
    EXPECT_EQ(read_file(other), "other");
    EXPECT_EQ(read_file(place + "kept"), "old");
    EXPECT_EQ(read_file(place + "file"), "new");
}

TEST_P(ServerFiles, an_address_opens_one_file)
{
    const std::string bytes = some_bytes(300'000, 1);
    backend->store("/other.mp4", "secret");
    publish("cl?p & 100%.mp4", bytes);
    Watch result;
    const int error = fetch(handle, Kind::STREAM, "cl?p & 100%.mp4", result);
    if (backend->media_url.empty()) {
        EXPECT_EQ(error, CLOUD_CONTENT_SYNC_ERROR_SERVER);
        return;
    }
    ASSERT_EQ(error, 0);
    const std::string url = result.text, base = backend->media_url;
    const Answer whole = ask_url("GET", url), part = ask_url("GET", url, {"Range: bytes=100-299"});
    EXPECT_EQ(whole.status, 200);
    EXPECT_TRUE(whole.body == bytes);
    EXPECT_EQ(whole.header("content-type"), "video/mp4");
    EXPECT_EQ(part.status, 206);
    EXPECT_TRUE(part.body == bytes.substr(100, 200));
    EXPECT_EQ(url.find("example.org"), url.npos) << "names the account";

    const auto with = [&](const std::string &what, const std::string &instead) {
        std::string changed = url;
        return changed.replace(changed.find(what), what.size(), instead);
    };
    const struct {
        std::string url;
        int status;
        const char *method = "GET";
    } rows[] = {
        {with("cl%3Fp%20%26%20100%25.mp4", "other.mp4"), 403},
        {with("expires=", "expires=9"), 403},
        {url.substr(0, url.size() - 1), 403},
        {url, 405, "DELETE"},
        {base + "/1/media", 401, "POST"},
        {base + "/1/thumbnail?path=/other.mp4&size=64", 401},
    };
    for (const auto &one : rows)
        EXPECT_EQ(ask_url(one.method, one.url).status, one.status) << one.method << " " << one.url;
}

// A picture of one colour, in an encoding of gdk-pixbuf.
static std::string picture(int width, int height, const char *encoding, bool clear = false)
{
    GdkPixbuf *pixbuf = gdk_pixbuf_new(GDK_COLORSPACE_RGB, clear, 8, width, height);
    gdk_pixbuf_fill(pixbuf, 0x20a04080);
    char *bytes = nullptr;
    gsize size = 0;
    gdk_pixbuf_save_to_buffer(pixbuf, &bytes, &size, encoding, nullptr, nullptr);
    const std::string text(bytes, size);
    g_free(bytes);
    g_object_unref(pixbuf);
    return text;
}

TEST_P(ServerFiles, thumbnails_arrive_and_are_told_of)
{
    // A bitmap of 8512 x 8000 black points, in 8 MB: too many to be decoded for anybody.
    std::string huge("BM\0\0\0\0\0\0\0\0\x3e\0\0\0\x28\0\0\0\x40\x21\0\0\x40\x1f\0\0\x01\0\x01", 29);
    huge.resize(62 + 1064 * 8000);
    const struct {
        const char *name;
        std::string bytes;
        int width, height; // of the thumbnail; 0: there is none
    } rows[] = {
        {"wide & 100%.jpg", picture(2000, 1000, "jpeg"), 256, 128},
        {"clear.png", picture(300, 600, "png", true), 128, 256},
        {"small.bmp", picture(20, 10, "bmp"), 20, 10},
        {"broken.jpg", picture(2000, 1000, "jpeg").substr(0, 400), 0, 0},
        {"huge.bmp", huge, 0, 0},
        {"film.mp4", picture(100, 100, "jpeg"), 0, 0},
    };
    for (const auto &row : rows)
        backend->store(std::string("/") + row.name, row.bytes);
    ASSERT_EQ(refresh(handle), 0);
    Watch arrivals;
    ASSERT_EQ(cloud_content_sync_set_thumbnail_cb(handle, thumbnail_cb, &arrivals), 0);
    const bool makes_media = !backend->media_url.empty();
    Names expected;
    for (const auto &row : rows) {
        EXPECT_FALSE(has_thumbnail(handle, row.name)) << row.name;
        if (row.width && makes_media)
            expected.push_back(std::string("/") + row.name);
    }
    EXPECT_TRUE(comes_true([&] { return arrivals.count() >= expected.size(); }));
    for (const auto &row : rows) {
        char *path = nullptr;
        cloud_content_sync_content_get_thumbnail_path(content_at(handle, row.name).get(), &path);
        int width = 0, height = 0;
        gdk_pixbuf_get_file_info(taken(path).c_str(), &width, &height);
        EXPECT_EQ(std::pair(width, height), makes_media ? std::pair(row.width, row.height) : std::pair(0, 0))
            << row.name;
    }
    // An upload later, all that was asked for has been tried; what was told of was told once.
    EXPECT_EQ(upload(handle, scratch.file("x", "x"), "/x"), 0);
    EXPECT_EQ(arrivals.count(), expected.size());
    for (const std::string &path : expected)
        EXPECT_NE(arrivals.text.find(path + "\n"), std::string::npos) << path;
    if (!makes_media)
        return;

    const struct {
        const char *query;
        int status;
    } queries[] = {
        {"path=/small.bmp&size=16", 200},    {"path=/small.bmp&size=15", 400}, {"path=/none.bmp&size=64", 404},
        {"path=/../small.bmp&size=64", 400}, {"path=/film.mp4&size=64", 404},  {"path=/huge.bmp&size=64", 415},
        {"path=/broken.jpg&size=64", 415},
    };
    for (const auto &one : queries)
        EXPECT_EQ(
            ask_url("GET", backend->media_url + "/1/thumbnail?" + one.query, {basic_authorization(USER, PASSWORD)})
                .status,
            one.status)
            << one.query;

    // Another version is another picture; without a callback it comes as well.
    ASSERT_EQ(cloud_content_sync_set_thumbnail_cb(handle, nullptr, nullptr), 0);
    std::string other = rows[2].bytes; // of the same size
    other.back() ^= 0x7f;
    publish("small.bmp", other);
    EXPECT_FALSE(has_thumbnail(handle, "small.bmp"));
    EXPECT_TRUE(comes_true([&] { return has_thumbnail(handle, "small.bmp"); }));
    EXPECT_EQ(arrivals.count(), expected.size());
}

// Any order of uploads, requests, cancels, refreshes and thumbnails from several threads, then a destroy in their
// midst.
TEST_P(Files, any_order_of_calls_from_any_thread)
{
    const std::string bytes = some_bytes(2 << 20, 1), local = scratch.file("local", bytes);
    backend->store("/clip.mp4", bytes);
    publish("shot.jpg", picture(400, 400, "jpeg"));
    Watch arrivals;
    constexpr size_t THREADS = 3, ROUNDS = 12;
    std::vector<std::unique_ptr<Watch>> watches(THREADS * ROUNDS);
    for (auto &watch : watches)
        watch = std::make_unique<Watch>();
    Watch refreshes;
    std::atomic<int> finished = 0;
    std::vector<std::thread> threads;
    for (size_t t = 0; t < THREADS; t++)
        threads.emplace_back([&, t] {
            for (size_t i = 0; i < ROUNDS; i++) {
                Watch &watch = *watches[t * ROUNDS + i];
                has_thumbnail(handle, "shot.jpg");
                cloud_content_sync_set_thumbnail_cb(handle, i % 3 ? thumbnail_cb : nullptr, &arrivals);
                cloud_content_sync_refresh_meta(handle, 1, refresh_cb, &refreshes);
                const std::string place = "/t" + std::to_string(t);
                const int id =
                    i % 2 ? start(handle, local, place, watch)
                          : ask(handle, i % 3 ? Kind::DOWNLOAD : Kind::CACHED, "clip.mp4", watch, scratch.path + place);
                if (i % 4 < 2) {
                    EXPECT_EQ(watch.end(), 0);
                    finished++;
                } else if (i % 4 == 3) {
                    const bool cancelled = cloud_content_sync_cancel(handle, id) == 0;
                    const size_t count = watch.count();
                    std::this_thread::sleep_for(std::chrono::milliseconds(5));
                    EXPECT_EQ(watch.count(), count) << "a callback after the cancel";
                    EXPECT_EQ(cancelled, watch.calls.empty() || watch.calls.back().state == 2);
                }
            }
        });
    for (std::thread &thread : threads)
        thread.join();
    const Content content = content_at(handle, "clip.mp4");
    cloud_content_sync_destroy(handle);
    handle = nullptr;
    EXPECT_EQ(finished, static_cast<int>(THREADS * ROUNDS / 2));
    for (const std::string &name : names_in(scratch.path))
        EXPECT_NE(name[0], '.') << "left behind";
    // The content outlives the client, but can ask nobody.
    Watch late;
    int id = 0;
    bool exists = true;
    EXPECT_EQ(cloud_content_sync_content_get_cached_file(content.get(), &id, result_cb, &late),
              CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
    EXPECT_EQ(cloud_content_sync_content_get_is_thumbnail_exist(content.get(), &exists), 0);
    EXPECT_FALSE(exists);
}
