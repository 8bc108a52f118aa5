#include "media_content/condition.h"
#include "media_content/media_content.h"
#include "support.h"
#include <fcntl.h>
#include <gdk-pixbuf/gdk-pixbuf.h>
#include <sys/stat.h>
#include <thread>

namespace {

class Media : public PlatformTest {
  protected:
    void SetUp() override
    {
        PlatformTest::SetUp();
        ASSERT_EQ(media_content_connect(), MEDIA_CONTENT_ERROR_NONE);
    }

    void TearDown() override
    {
        EXPECT_EQ(media_content_disconnect(), MEDIA_CONTENT_ERROR_NONE);
        PlatformTest::TearDown();
    }

    std::string picture(const std::string &name, int width = 400, int height = 300) const
    {
        GdkPixbuf *pixbuf = gdk_pixbuf_new(GDK_COLORSPACE_RGB, FALSE, 8, width, height);
        gdk_pixbuf_fill(pixbuf, 0x3366ccff);
        const std::string path = home / name;
        const bool jpeg = name.ends_with(".jpg");
        EXPECT_TRUE(gdk_pixbuf_save(pixbuf, path.c_str(), jpeg ? "jpeg" : "png", nullptr, nullptr));
        g_object_unref(pixbuf);
        return path;
    }
};

struct Found {
    std::vector<std::string> paths, thumbnails;
};

Found query(const std::string &condition, media_content_order_e order = MEDIA_CONTENT_ORDER_ASC,
            const char *keywords = "MEDIA_PATH", media_content_collation_e collate = MEDIA_CONTENT_COLLATE_NOCASE)
{
    filter_h filter = nullptr;
    media_filter_create(&filter);
    EXPECT_EQ(media_filter_set_condition(filter, condition.c_str(), collate), MEDIA_CONTENT_ERROR_NONE) << condition;
    EXPECT_EQ(media_filter_set_order(filter, order, keywords, collate), MEDIA_CONTENT_ERROR_NONE);
    Found found;
    const auto add = [](media_info_h media, void *data) {
        media_info_h copy = nullptr;
        media_info_clone(&copy, media);
        char *path = nullptr, *thumbnail = nullptr;
        EXPECT_EQ(media_info_get_file_path(copy, &path), MEDIA_CONTENT_ERROR_NONE);
        EXPECT_EQ(media_info_get_thumbnail_path(copy, &thumbnail), MEDIA_CONTENT_ERROR_NONE);
        media_info_destroy(copy);
        static_cast<Found *>(data)->paths.push_back(taken(path));
        static_cast<Found *>(data)->thumbnails.push_back(taken(thumbnail));
        return true;
    };
    EXPECT_EQ(media_info_foreach_media_from_db_with_media_mode(filter, add, &found, true), MEDIA_CONTENT_ERROR_NONE);
    media_filter_destroy(filter);
    return found;
}

std::string by_path(const std::string &path)
{
    return "(MEDIA_TYPE=0 OR MEDIA_TYPE=1) AND MEDIA_PATH='" + path + "'";
}

using Paths = std::vector<std::string>;

// The thumbnail of a path, once it is there; a query may be too early for it.
std::string thumbnail_soon(const std::string &path)
{
    const auto start = std::chrono::steady_clock::now();
    for (;;) {
        const Found found = query(by_path(path));
        if (found.thumbnails.size() != 1 || found.thumbnails[0] != "(null)" || milliseconds_since(start) > 10000)
            return found.thumbnails.empty() ? "no record" : found.thumbnails[0];
        std::this_thread::yield();
    }
}

} // namespace

TEST(MediaCondition, Grammar)
{
    const struct {
        const char *text, *sql, *path;
    } cases[] = {
        {"MEDIA_TYPE=0", "type = ?1", ""},
        {" ( MEDIA_TYPE = 0 or MEDIA_TYPE=1 ) ", "(type = ?1 OR type = ?2)", ""},
        {"(MEDIA_TYPE=0 OR MEDIA_TYPE=1) AND MEDIA_PATH='/a/b.jpg'", "(type = ?1 OR type = ?2) AND path = ?3",
         "/a/b.jpg"},
        {"MEDIA_PATH='/it's'", "path = ?1", "/it's"},
        {"(MEDIA_TYPE=0 AND (MEDIA_PATH='/x'))", "(type = ?1 AND (path = ?2))", "/x"},
        {"MEDIA_PATH='/x' OR MEDIA_PATH='/y'", "path = ?1", "/x' OR MEDIA_PATH='/y"},
        {"MEDIA_PATH='/x') OR (MEDIA_TYPE=0 OR MEDIA_PATH=''", "path = ?1", "/x') OR (MEDIA_TYPE=0 OR MEDIA_PATH='"},
        {"MEDIA_PATH='/x'; DROP TABLE media; --'", "path = ?1", "/x'; DROP TABLE media; --"},
        {"MEDIA_DISPLAY_NAME='a' ", "name = ?1 COLLATE NOCASE", ""},
        {"MEDIA_TIMELINE=-5", "timeline = ?1", ""},
        // a path that a short buffer cut off behind a quote of its own
        {"MEDIA_PATH='/x' OR MEDIA_TYPE=0", nullptr, nullptr},
        {"MEDIA_PATH='/x", nullptr, nullptr},
        {"(MEDIA_PATH='/x'))", nullptr, nullptr},
        {"", nullptr, nullptr},
        {"MEDIA_TYPE", nullptr, nullptr},
        {"MEDIA_TYPE=", nullptr, nullptr},
        {"MEDIA_TYPE='0'", nullptr, nullptr},
        {"MEDIA_TYPE=0x1", nullptr, nullptr},
        {"MEDIA_TYPE=99999999999999999999", nullptr, nullptr},
        {"MEDIA_PATH=1", nullptr, nullptr},
        {"type=0", nullptr, nullptr},
        {"MEDIA_TYPE=0 MEDIA_TYPE=1", nullptr, nullptr},
        {"MEDIA_TYPE=0 AND", nullptr, nullptr},
        {"(MEDIA_TYPE=0", nullptr, nullptr},
        {"1=1", nullptr, nullptr},
    };
    for (const auto &c : cases) {
        const auto parsed = media_parse_condition(c.text, MEDIA_CONTENT_COLLATE_NOCASE);
        EXPECT_EQ(parsed.has_value(), c.sql != nullptr) << c.text;
        if (parsed && c.sql) {
            EXPECT_EQ(parsed->sql, c.sql) << c.text;
            EXPECT_EQ(parsed->path, c.path) << c.text;
        }
    }
    EXPECT_FALSE(media_parse_condition((std::string(100000, '(') + "MEDIA_TYPE=0").c_str(), {}));
    EXPECT_EQ(
        media_parse_order("MEDIA_TIMELINE, MEDIA_DISPLAY_NAME", MEDIA_CONTENT_ORDER_DESC, MEDIA_CONTENT_COLLATE_NOCASE),
        "timeline DESC, name COLLATE NOCASE DESC");
    for (const char *broken : {"", ",", "MEDIA_PATH,", "path", "MEDIA_PATH DESC", "MEDIA_PATH; DROP TABLE media"})
        EXPECT_FALSE(media_parse_order(broken, MEDIA_CONTENT_ORDER_ASC, MEDIA_CONTENT_COLLATE_DEFAULT)) << broken;
}

TEST_F(Media, QueryByPathLearnsTheFile)
{
    const std::string plain = picture("a.jpg"), quoted = picture("it's ' OR MEDIA_TYPE=0.jpg");
    write("note.txt", "text");
    write("clip.mp4", "not really");
    EXPECT_EQ(query("MEDIA_TYPE=0").paths, Paths());
    EXPECT_EQ(query(by_path(plain)).paths, Paths{plain});
    EXPECT_EQ(query(by_path(quoted)).paths, Paths{quoted});
    EXPECT_EQ(query(by_path(home / "A.JPG")).paths, Paths());
    EXPECT_EQ(query(by_path(home / "note.txt")).paths, Paths());
    EXPECT_EQ(query(by_path(home / "gone.jpg")).paths, Paths());
    EXPECT_EQ(query(by_path(home)).paths, Paths());
    EXPECT_EQ(query(by_path("a.jpg")).paths, Paths());
    EXPECT_EQ(query(by_path(home / "clip.mp4")).paths, Paths{home / "clip.mp4"});
    EXPECT_EQ(query("MEDIA_TYPE=1").paths, Paths{home / "clip.mp4"});
    EXPECT_EQ(query("MEDIA_DISPLAY_NAME='A.JPG'").paths, Paths{plain});
    EXPECT_EQ(query("MEDIA_DISPLAY_NAME='A.JPG'", {}, "MEDIA_PATH", MEDIA_CONTENT_COLLATE_DEFAULT).paths, Paths());
    EXPECT_EQ(query("MEDIA_TYPE=0", MEDIA_CONTENT_ORDER_DESC).paths, (Paths{quoted, plain}));
    std::filesystem::remove(plain);
    EXPECT_EQ(query("MEDIA_TYPE=0").paths, Paths{quoted});
}

TEST_F(Media, ThumbnailsOfTheCache)
{
    const std::string path = picture("a b.jpg", 1200, 300);
    const std::string thumbnail = thumbnail_soon(path);
    EXPECT_EQ(thumbnail.rfind((home / "cache/thumbnails/large/").string(), 0), 0u) << thumbnail;
    GdkPixbuf *pixbuf = gdk_pixbuf_new_from_file(thumbnail.c_str(), nullptr);
    ASSERT_NE(pixbuf, nullptr);
    EXPECT_EQ(gdk_pixbuf_get_width(pixbuf), 256);
    EXPECT_EQ(gdk_pixbuf_get_height(pixbuf), 64);
    struct stat file = {};
    stat(path.c_str(), &file);
    EXPECT_STREQ(gdk_pixbuf_get_option(pixbuf, "tEXt::Thumb::URI"), ("file://" + home.string() + "/a%20b.jpg").c_str());
    EXPECT_STREQ(gdk_pixbuf_get_option(pixbuf, "tEXt::Thumb::MTime"), std::to_string(file.st_mtime).c_str());
    g_object_unref(pixbuf);
    stat(thumbnail.c_str(), &file);
    EXPECT_EQ(file.st_mode & 0777, 0600u);

    // One that another program put there is used, also for a video; a stale one is not.
    const auto written = std::filesystem::last_write_time(thumbnail);
    std::filesystem::remove_all(home / "data");
    EXPECT_EQ(thumbnail_soon(path), thumbnail);
    EXPECT_EQ(std::filesystem::last_write_time(thumbnail), written);
    picture("a b.jpg", 300, 300);
    const timespec times[2] = {{1, 0}, {1, 0}};
    utimensat(AT_FDCWD, path.c_str(), times, 0);
    EXPECT_EQ(media_content_scan_file(path.c_str()), MEDIA_CONTENT_ERROR_NONE);
    EXPECT_NE(std::filesystem::last_write_time(thumbnail), written);
    std::filesystem::remove(thumbnail);
    EXPECT_EQ(thumbnail_soon(path), thumbnail);
}

TEST_F(Media, UnusablePicturesStayWithoutThumbnail)
{
    const std::string whole = picture("whole.png");
    std::string bytes;
    {
        std::ifstream file(whole, std::ios::binary);
        bytes.assign(std::istreambuf_iterator<char>(file), {});
    }
    write("cut.png", bytes.substr(0, 40));
    write("empty.png", "");
    write("lies.jpg", "\xff\xd8 no picture");
    write("large.pbm", "P4\n8200 8200\n" + std::string(8200 / 8 * 8200, '\0')); // whole, but too large
    for (const char *name : {"cut.png", "empty.png", "lies.jpg", "large.pbm"}) {
        EXPECT_EQ(media_content_scan_file((home / name).c_str()), MEDIA_CONTENT_ERROR_NONE) << name;
        EXPECT_EQ(query(by_path(home / name)).thumbnails, Paths{"(null)"}) << name;
    }
    EXPECT_FALSE(std::filesystem::exists(home / "cache/thumbnails"));
    write("note.txt", "text");
    EXPECT_EQ(media_content_scan_file((home / "note.txt").c_str()), MEDIA_CONTENT_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(media_content_scan_file("whole.png"), MEDIA_CONTENT_ERROR_INVALID_PARAMETER);
}

TEST_F(Media, LargePhotosDoNotHoldUpQueriesOrTheEnd)
{
    const std::string large = picture("large.png", 5000, 4000);
    std::string path;
    for (int i = 0; i < 4; i++) {
        path = home / (std::to_string(i) + ".png");
        std::filesystem::create_hard_link(large, path);
        const auto start = std::chrono::steady_clock::now();
        query(by_path(path));
        EXPECT_LT(milliseconds_since(start), i ? 100 : 250); // of which at most 40 are spent waiting
    }
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(media_content_disconnect(), MEDIA_CONTENT_ERROR_NONE);
    EXPECT_LT(milliseconds_since(start), 100);
    EXPECT_EQ(media_info_foreach_media_from_db_with_media_mode(
                  nullptr, [](media_info_h, void *) { return true; }, nullptr, true),
              MEDIA_CONTENT_ERROR_INVALID_OPERATION);
    EXPECT_EQ(media_content_connect(), MEDIA_CONTENT_ERROR_NONE);
    EXPECT_NE(thumbnail_soon(path), "(null)"); // work that was given up is taken up again
}
