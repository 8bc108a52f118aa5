// Single files of a service: cached, downloaded, streamed, and their thumbnails.
#include "backend.h"
#include "contents.h"
#include <atomic>
#include <curl/curl.h>
#include <gdk-pixbuf/gdk-pixbuf.h>
#include <set>
#include <sys/resource.h>
#include <sys/stat.h>

namespace fs = std::filesystem;
using Names = std::vector<std::string>;

class CloudContent : public testing::TestWithParam<std::string> {
  protected:
    void SetUp() override
    {
        backend = start_backend(GetParam(), {});
        if (is_real()) {
            const std::string description = std::string(getenv("CLOUD_SERVICES_DIR")) + "/Test.conf";
            const std::string text = bytes_of(description);
            const size_t url = text.find("http://");
            api = text.substr(url, text.find("/dav/") - url);
            std::ofstream(description, std::ios::app) << "Api=" << api << "\n";
        } else {
            setenv("PLATFORM_DATA_DIR", scratch.path.c_str(), 1);
        }
        ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
    }
    void TearDown() override
    {
        if (handle)
            cloud_content_sync_destroy(handle);
    }
    bool is_real() const
    {
        return backend->ability().real;
    }
    bool makes_media() const
    {
        return GetParam() == "VeloraCloud";
    }
    std::string data(const std::string &name) const
    {
        return std::string(getenv("PLATFORM_DATA_DIR")) + "/cloud/" + name;
    }
    // Stores a file and lets the client know.
    void publish(const std::string &name, const std::string &bytes)
    {
        backend->store("/" + name, bytes);
        ASSERT_EQ(refresh(handle), 0);
    }

    Scratch scratch, folder;
    std::unique_ptr<Backend> backend;
    std::string api;
    cloud_content_sync_h handle = nullptr;
};
INSTANTIATE_TEST_SUITE_P(All, CloudContent, testing::ValuesIn(backend_names()),
                         [](const auto &row) { return row.param; });
GTEST_ALLOW_UNINSTANTIATED_PARAMETERIZED_TEST(CloudContent);

TEST_P(CloudContent, files_come_whole_and_the_cache_needs_no_service)
{
    const std::pair<std::string, std::string> files[] = {{"empty.JPG", ""},
                                                         {"a b&%41#?.png", "x"},
                                                         {"no extension", some_bytes(70'000, 1)},
                                                         {"big.tar.gz", some_bytes(20 << 20, 2)},
                                                         {"name.long extension", "y"}};
    const std::string extensions[] = {".JPG", ".png", "", ".gz", ""};
    for (const auto &[name, bytes] : files)
        backend->store("/" + name, bytes);
    ASSERT_EQ(refresh(handle), 0);
    Names cached;
    for (size_t i = 0; i < std::size(files); i++) {
        const auto &[name, bytes] = files[i];
        Result kept, loaded;
        EXPECT_EQ(fetch(handle, Kind::CACHED, name, kept), 0) << name;
        EXPECT_EQ(bytes_of(kept.text), bytes) << name;
        EXPECT_EQ(fs::path(kept.text).extension(), extensions[i]) << name;
        EXPECT_EQ(kept.text.find(data("cache/")), 0u) << kept.text;
        EXPECT_EQ(kept.status, 200);
        cached.push_back(kept.text);
        EXPECT_EQ(fetch(handle, Kind::DOWNLOAD, name, loaded, folder.path + "/" + name), 0) << name;
        EXPECT_EQ(loaded.text, folder.path + "/" + name);
        EXPECT_EQ(bytes_of(loaded.text), bytes) << name;
        EXPECT_EQ(kept.count() + loaded.count(), 2u);
    }
    EXPECT_EQ(names_in(folder.path).size(), std::size(files));
    backend->go_down();
    for (size_t i = 0; i < std::size(files); i++) {
        Result kept;
        EXPECT_EQ(fetch(handle, Kind::CACHED, files[i].first, kept), 0);
        EXPECT_EQ(kept.text, cached[i]);
    }
    for (const Kind kind : {Kind::DOWNLOAD, Kind::STREAM}) {
        Result failed;
        EXPECT_EQ(fetch(handle, kind, "empty.JPG", failed, folder.path + "/none"), CLOUD_CONTENT_SYNC_ERROR_NETWORK);
        EXPECT_EQ(failed.text, "");
    }
    EXPECT_EQ(names_in(folder.path).size(), std::size(files));
    if (!is_real())
        return;
    // Nobody else may have them.
    ASSERT_EQ(cloud_content_sync_credentials_set("Test", "other@example.org", "x"), 0);
    EXPECT_EQ(names_in(data("cache/Test")), Names{});
}

TEST_P(CloudContent, what_changed_or_is_damaged_is_fetched_again)
{
    publish("a.jpg", "one");
    Result first, second, third, again;
    ASSERT_EQ(fetch(handle, Kind::CACHED, "a.jpg", first), 0);
    const Content old = content_at(handle, "/", "a.jpg");
    std::this_thread::sleep_for(std::chrono::milliseconds(1100)); // Apache's entity tags may count in seconds
    publish("a.jpg", "two");
    ASSERT_EQ(fetch(handle, Kind::CACHED, "a.jpg", second), 0);
    EXPECT_EQ(bytes_of(second.text), "two");
    int id = 0;
    EXPECT_EQ(cloud_content_sync_content_get_cached_file(old.get(), &id, result_cb, &again), 0);
    EXPECT_EQ(again.end(), 0);
    EXPECT_EQ(bytes_of(again.text), "two") << "an old handle";
    std::ofstream(second.text) << "short";
    ASSERT_EQ(fetch(handle, Kind::CACHED, "a.jpg", third), 0);
    EXPECT_EQ(bytes_of(third.text), "two");
    backend->remove("/a.jpg");
    fs::remove(third.text);
    Result gone;
    EXPECT_EQ(fetch(handle, Kind::CACHED, "a.jpg", gone), CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
    EXPECT_EQ(gone.status, 404);
    // Larger than it was, without a refresh.
    publish("b.jpg", "small");
    backend->store("/b.jpg", "larger than before");
    for (int i = 0; i < 2; i++) {
        Result grown;
        ASSERT_EQ(fetch(handle, Kind::CACHED, "b.jpg", grown), 0);
        EXPECT_EQ(bytes_of(grown.text), "larger than before");
        EXPECT_EQ(grown.status, i == 0 ? 200 : 0) << "asked again for what is known";
    }
}

TEST_P(CloudContent, a_download_replaces_a_file_or_leaves_everything_as_it_was)
{
    if (!is_real())
        return;
    publish("doc.txt", "new");
    publish("large.bin", some_bytes(3 << 20, 1));
    const std::string place = scratch.path + "/";
    const std::string other = scratch.file("other", "other");
    ASSERT_EQ(symlink(other.c_str(), (place + "link").c_str()), 0);
    ASSERT_EQ(symlink("nowhere", (place + "dangling").c_str()), 0);
    ASSERT_EQ(mkfifo((place + "fifo").c_str(), 0600), 0);
    ASSERT_EQ(mkdir((place + "dir").c_str(), 0700), 0);
    scratch.file("file", "old");
    scratch.file("kept", "old");
    const Names before = names_in(place);
    const struct {
        const char *name, *target;
        int error;
    } rows[] = {
        {"doc.txt", "link", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {"doc.txt", "dangling", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {"doc.txt", "fifo", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {"doc.txt", "dir", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {"doc.txt", "dir/", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {"doc.txt", "missing/x", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {"doc.txt", "file/x", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE},
        {"large.bin", "kept", CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE}, // no room
        {"doc.txt", "file", 0},
    };
    rlimit unlimited;
    getrlimit(RLIMIT_FSIZE, &unlimited);
    const rlimit little = {1 << 20, unlimited.rlim_max};
    setrlimit(RLIMIT_FSIZE, &little);
    for (const auto &row : rows) {
        Result result;
        EXPECT_EQ(fetch(handle, Kind::DOWNLOAD, row.name, result, place + row.target), row.error) << row.target;
        EXPECT_EQ(names_in(place), before) << row.target;
    }
    Result no_room;
    EXPECT_EQ(fetch(handle, Kind::CACHED, "large.bin", no_room), CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE);
    EXPECT_EQ(names_in(data("cache/Test")), Names{});
    setrlimit(RLIMIT_FSIZE, &unlimited);
    EXPECT_EQ(bytes_of(other), "other");
    EXPECT_EQ(bytes_of(place + "kept"), "old");
    EXPECT_EQ(bytes_of(place + "file"), "new");
}

static long get(const std::string &url, std::string &answer, const char *range = nullptr, const char *method = "GET",
                std::string *type = nullptr, const std::string &login = "")
{
    answer.clear();
    std::unique_ptr<CURL, decltype(&curl_easy_cleanup)> easy(curl_easy_init(), curl_easy_cleanup);
    curl_easy_setopt(easy.get(), CURLOPT_URL, url.c_str());
    curl_easy_setopt(easy.get(), CURLOPT_RANGE, range);
    if (!login.empty())
        curl_easy_setopt(easy.get(), CURLOPT_USERPWD, login.c_str());
    if (std::string(method) == "HEAD")
        curl_easy_setopt(easy.get(), CURLOPT_NOBODY, 1L);
    else
        curl_easy_setopt(easy.get(), CURLOPT_CUSTOMREQUEST, method);
    curl_easy_setopt(easy.get(), CURLOPT_WRITEDATA, &answer);
    curl_easy_setopt(
        easy.get(), CURLOPT_WRITEFUNCTION, +[](char *bytes, size_t size, size_t count, void *to) {
            static_cast<std::string *>(to)->append(bytes, size * count);
            return size * count;
        });
    curl_easy_perform(easy.get());
    long status = 0;
    curl_easy_getinfo(easy.get(), CURLINFO_RESPONSE_CODE, &status);
    char *content_type = nullptr;
    curl_easy_getinfo(easy.get(), CURLINFO_CONTENT_TYPE, &content_type);
    if (type)
        *type = content_type ? content_type : "";
    return status;
}

TEST_P(CloudContent, an_address_opens_one_file_for_a_time)
{
    if (!is_real())
        return;
    const std::string bytes = some_bytes(300'000, 1);
    backend->store("/other.mp4", "secret");
    publish("cl?p & 100%.mp4", bytes);
    Result result;
    const int error = fetch(handle, Kind::STREAM, "cl?p & 100%.mp4", result);
    if (!makes_media()) {
        EXPECT_EQ(error, CLOUD_CONTENT_SYNC_ERROR_SERVER);
        return;
    }
    ASSERT_EQ(error, 0);
    const std::string url = result.text;
    std::string answer, type;
    EXPECT_EQ(get(url, answer, nullptr, "GET", &type), 200);
    EXPECT_TRUE(answer == bytes);
    EXPECT_EQ(type, "video/mp4");
    EXPECT_EQ(get(url, answer, "100-299"), 206);
    EXPECT_TRUE(answer == bytes.substr(100, 200));
    EXPECT_EQ(get(url, answer, nullptr, "HEAD"), 200);
    EXPECT_EQ(url.find("example.org"), url.npos) << "names the account";

    const auto with = [&](const std::string &what, const std::string &instead) {
        std::string changed = url;
        return changed.replace(changed.find(what), what.size(), instead);
    };
    // The key as the service keeps it: what it signs for a time that is over.
    Db db;
    ASSERT_TRUE(db.open(std::string(getenv("PLATFORM_DATA_DIR")) + "/../root/velora-cloud.db", nullptr));
    Stmt row(db, "SELECT value FROM secrets WHERE name = 'media'");
    ASSERT_TRUE(row.row());
    const std::string key = row.text(0);
    const auto signed_until = [&](const std::string &end) {
        const std::string text = "1\n" + end + "\ncl?p & 100%.mp4";
        g_autofree char *mac =
            g_compute_hmac_for_string(G_CHECKSUM_SHA256, reinterpret_cast<const guchar *>(key.data()), key.size(),
                                      text.data(), static_cast<gssize>(text.size()));
        return url.substr(0, url.find('?')) + "?account=1&expires=" + end + "&signature=" + mac;
    };
    const struct {
        std::string url;
        long status;
        const char *method;
    } rows[] = {
        {signed_until(std::to_string(time(nullptr) + 60)), 200, "GET"},
        {signed_until(std::to_string(time(nullptr) - 1)), 403, "GET"},
        {with("cl%3Fp%20%26%20100%25.mp4", "other.mp4"), 403, "GET"},
        {with("expires=", "expires=9"), 403, "GET"},
        {with("account=1", "account=2"), 403, "GET"},
        {with("signature=", "signature=0"), 403, "GET"},
        {url.substr(0, url.size() - 1), 403, "GET"},
        {url.substr(0, url.find('?')), 403, "GET"},
        {api + "/1/media/other.mp4", 403, "GET"},
        {url, 405, "DELETE"},
        {api + "/1/media", 401, "POST"},
        {api + "/1/thumbnail?path=/other.mp4&size=64", 401, "GET"},
    };
    for (const auto &one : rows)
        EXPECT_EQ(get(one.url, answer, nullptr, one.method), one.status) << one.method << " " << one.url;
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

TEST_P(CloudContent, thumbnails_arrive_and_are_told_of)
{
    if (!is_real())
        return;
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
        {"text.png", "no picture at all", 0, 0},
        {"huge.bmp", huge, 0, 0},
        {"film.mp4", picture(100, 100, "jpeg"), 0, 0},
    };
    for (const auto &row : rows)
        backend->store(std::string("/") + row.name, row.bytes);
    ASSERT_EQ(refresh(handle), 0);
    Arrivals arrivals;
    ASSERT_EQ(cloud_content_sync_set_thumbnail_cb(handle, Arrivals::cb, &arrivals), 0);
    std::set<std::string> expected;
    for (const auto &row : rows) {
        EXPECT_FALSE(has_thumbnail(handle, row.name)) << row.name;
        if (row.width && makes_media())
            expected.insert(std::string("/") + row.name);
    }
    EXPECT_TRUE(comes_true([&] { return arrivals.all().size() >= expected.size(); }));
    for (const auto &row : rows) {
        const bool is_expected = row.width && makes_media();
        const Content content = content_at(handle, "/", row.name);
        char *path = nullptr;
        EXPECT_EQ(cloud_content_sync_content_get_thumbnail_path(content.get(), &path),
                  is_expected ? 0 : CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND)
            << row.name;
        EXPECT_EQ(has_thumbnail(handle, row.name), is_expected) << row.name;
        const CString owned(path);
        int width = 0, height = 0;
        if (path)
            gdk_pixbuf_get_file_info(path, &width, &height);
        EXPECT_EQ(std::make_pair(width, height),
                  is_expected ? std::make_pair(row.width, row.height) : std::make_pair(0, 0))
            << row.name;
    }
    // An upload later, all that was asked for has been tried; what was told of was told once.
    EXPECT_EQ(upload(handle, scratch.file("x", "x"), "/x"), 0);
    const Names told = arrivals.all();
    EXPECT_EQ(std::multiset<std::string>(told.begin(), told.end()),
              std::multiset<std::string>(expected.begin(), expected.end()));
    if (!makes_media())
        return;

    const std::string file = bytes_of(data("Test.credentials"));
    const auto field = [&](const std::string &name) {
        const size_t at = file.find(name) + name.size();
        return file.substr(at, file.find('\n', at) - at);
    };
    const struct {
        const char *query;
        long status;
    } queries[] = {
        {"path=/small.bmp&size=16", 200}, {"path=/small.bmp&size=15", 400},    {"path=/small.bmp", 400},
        {"path=/none.bmp&size=64", 404},  {"path=/../small.bmp&size=64", 400}, {"path=/film.mp4&size=64", 404},
        {"path=/huge.bmp&size=64", 415},  {"path=/broken.jpg&size=64", 415},   {"path=/text.png&size=64", 415},
    };
    std::string answer;
    for (const auto &one : queries)
        EXPECT_EQ(get(api + "/1/thumbnail?" + one.query, answer, nullptr, "GET", nullptr,
                      field("User=") + ":" + field("Secret=")),
                  one.status)
            << one.query;

    // Another version is another picture; without a callback it comes as well.
    ASSERT_EQ(cloud_content_sync_set_thumbnail_cb(handle, nullptr, nullptr), 0);
    publish("small.bmp", picture(10, 20, "bmp"));
    EXPECT_FALSE(has_thumbnail(handle, "small.bmp"));
    EXPECT_TRUE(comes_true([&] { return has_thumbnail(handle, "small.bmp"); }));
    EXPECT_EQ(arrivals.all(), told);
}

// Any order of requests, cancels and thumbnails from several threads, then a destroy in their midst.
TEST_P(CloudContent, any_order_of_calls_from_any_thread)
{
    const std::string bytes = some_bytes(2 << 20, 1), shot = picture(400, 400, "jpeg");
    backend->store("/clip.mp4", bytes);
    for (int i = 0; i < 6; i++)
        backend->store("/p" + std::to_string(i) + ".jpg", shot);
    ASSERT_EQ(refresh(handle), 0);
    Arrivals arrivals;
    constexpr size_t THREADS = 3, ROUNDS = 12;
    std::vector<std::unique_ptr<Result>> results(THREADS * ROUNDS);
    for (auto &result : results)
        result = std::make_unique<Result>();
    std::atomic<int> good = 0;
    std::vector<std::thread> threads;
    for (size_t t = 0; t < THREADS; t++)
        threads.emplace_back([&, t] {
            for (size_t i = 0; i < ROUNDS; i++) {
                Result &result = *results[t * ROUNDS + i];
                const Kind kind = i % 2 ? Kind::DOWNLOAD : Kind::CACHED;
                has_thumbnail(handle, "p" + std::to_string(i % 6) + ".jpg");
                cloud_content_sync_set_thumbnail_cb(handle, i % 3 ? Arrivals::cb : nullptr, &arrivals);
                int id = 0;
                EXPECT_EQ(ask(handle, kind, "clip.mp4", result, folder.path + "/" + std::to_string(t), &id), 0);
                if (i % 4 == 0) {
                    EXPECT_EQ(result.end(), 0);
                    good += bytes_of(result.text) == bytes;
                } else if (i % 4 == 1) {
                    const bool cancelled = cloud_content_sync_cancel(handle, id) == 0;
                    const size_t count = result.count();
                    EXPECT_EQ(count, cancelled ? 0u : 1u);
                    std::this_thread::sleep_for(std::chrono::milliseconds(5));
                    EXPECT_EQ(result.count(), count) << "a callback after the cancel";
                }
            }
        });
    for (std::thread &thread : threads)
        thread.join();
    const Content content = content_at(handle, "/", "clip.mp4");
    cloud_content_sync_destroy(handle);
    handle = nullptr;
    EXPECT_EQ(good, static_cast<int>(THREADS * ROUNDS / 4));
    for (const std::string &name : names_in(folder.path))
        EXPECT_NE(name[0], '.') << "left behind";
    // The content outlives the client, but can ask nobody.
    Result late;
    int id = 0;
    bool exists = true;
    EXPECT_EQ(cloud_content_sync_content_get_cached_file(content.get(), &id, result_cb, &late),
              CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND);
    EXPECT_EQ(cloud_content_sync_content_get_is_thumbnail_exist(content.get(), &exists), 0);
    EXPECT_FALSE(exists);
}
