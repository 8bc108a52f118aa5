#include "media_content/condition.h"
#include "media_content/media_content.h"
#include "support.h"
#include <fcntl.h>
#include <gdk-pixbuf/gdk-pixbuf.h>
#include <sys/stat.h>

namespace fs = std::filesystem;

namespace {

class Media : public PlatformTest {
  protected:
    void SetUp() override
    {
        ASSERT_EQ(media_content_connect(), MEDIA_CONTENT_ERROR_NONE);
    }

    void TearDown() override
    {
        EXPECT_EQ(media_content_disconnect(), MEDIA_CONTENT_ERROR_NONE);
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

// "PATH THUMBNAIL" of each record.
using Records = std::vector<std::pair<std::string, std::string>>;

Records query(const std::string &condition, media_content_order_e order = MEDIA_CONTENT_ORDER_ASC)
{
    filter_h filter = nullptr;
    media_filter_create(&filter);
    const auto collate = MEDIA_CONTENT_COLLATE_NOCASE;
    EXPECT_EQ(media_filter_set_condition(filter, condition.c_str(), collate), MEDIA_CONTENT_ERROR_NONE) << condition;
    EXPECT_EQ(media_filter_set_order(filter, order, "MEDIA_PATH", collate), MEDIA_CONTENT_ERROR_NONE);
    Records found;
    const auto add = [](media_info_h media, void *data) {
        char *path = nullptr, *thumbnail = nullptr;
        EXPECT_EQ(media_info_get_file_path(media, &path), MEDIA_CONTENT_ERROR_NONE);
        EXPECT_EQ(media_info_get_thumbnail_path(media, &thumbnail), MEDIA_CONTENT_ERROR_NONE);
        static_cast<Records *>(data)->emplace_back(taken(path), taken(thumbnail));
        return true;
    };
    EXPECT_EQ(media_info_foreach_media_from_db_with_media_mode(filter, add, &found, true), MEDIA_CONTENT_ERROR_NONE);
    media_filter_destroy(filter);
    return found;
}

std::vector<std::string> paths(const std::string &condition, media_content_order_e order = MEDIA_CONTENT_ORDER_ASC)
{
    std::vector<std::string> all;
    for (const auto &[path, thumbnail] : query(condition, order))
        all.push_back(path);
    return all;
}

std::string by_path(const std::string &path)
{
    return "(MEDIA_TYPE=0 OR MEDIA_TYPE=1) AND MEDIA_PATH='" + path + "'";
}

using Paths = std::vector<std::string>;

// The thumbnail of a path, once it is there; a query may be too early for it.
std::string thumbnail_soon(const std::string &path)
{
    std::string thumbnail;
    comes_true([&] {
        const Records found = query(by_path(path));
        thumbnail = found.empty() ? "no record" : found[0].second;
        return thumbnail != "(null)";
    });
    return thumbnail;
}

} // namespace

TEST(MediaCondition, Grammar)
{
    const struct {
        const char *text, *sql, *path;
    } cases[] = {
        {" ( MEDIA_TYPE = 0 or MEDIA_TYPE=1 ) ", "(type = ?1 OR type = ?2)", ""},
        {"(MEDIA_TYPE=0 OR MEDIA_TYPE=1) AND MEDIA_PATH='/a/b.jpg'", "(type = ?1 OR type = ?2) AND path = ?3",
         "/a/b.jpg"},
        {"MEDIA_PATH='/it's'", "path = ?1", "/it's"},
        {"MEDIA_PATH='/x' OR MEDIA_PATH='/y'", "path = ?1", "/x' OR MEDIA_PATH='/y"},
        {"MEDIA_PATH='/x') OR (MEDIA_TYPE=0 OR MEDIA_PATH=''", "path = ?1", "/x') OR (MEDIA_TYPE=0 OR MEDIA_PATH='"},
        {"MEDIA_PATH='/x'; DROP TABLE media; --'", "path = ?1", "/x'; DROP TABLE media; --"},
        {"MEDIA_DISPLAY_NAME='a' ", "name = ?1 COLLATE NOCASE", ""},
        // a path that a short buffer cut off behind a quote of its own
        {"MEDIA_PATH='/x' OR MEDIA_TYPE=0", nullptr, nullptr},
        {"MEDIA_PATH='/x", nullptr, nullptr},
        {"(MEDIA_PATH='/x'))", nullptr, nullptr},
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
    home.file("note.txt", "text");
    home.file("clip.mp4", "not really");
    EXPECT_EQ(paths("MEDIA_TYPE=0"), Paths());
    EXPECT_EQ(paths(by_path(plain)), Paths{plain});
    EXPECT_EQ(paths(by_path(quoted)), Paths{quoted});
    for (const std::string none : {home / "A.JPG", home / "note.txt", home / "gone.jpg", home / "", fs::path("a.jpg")})
        EXPECT_EQ(paths(by_path(none)), Paths()) << none;
    EXPECT_EQ(paths(by_path(home / "clip.mp4")), Paths{home / "clip.mp4"});
    EXPECT_EQ(paths("MEDIA_TYPE=1"), Paths{home / "clip.mp4"});
    EXPECT_EQ(paths("MEDIA_DISPLAY_NAME='A.JPG'"), Paths{plain});
    EXPECT_EQ(paths("MEDIA_TYPE=0", MEDIA_CONTENT_ORDER_DESC), (Paths{quoted, plain}));
    fs::remove(plain);
    EXPECT_EQ(paths("MEDIA_TYPE=0"), Paths{quoted});
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
    EXPECT_STREQ(gdk_pixbuf_get_option(pixbuf, "tEXt::Thumb::URI"), ("file://" + home.path + "/a%20b.jpg").c_str());
    EXPECT_STREQ(gdk_pixbuf_get_option(pixbuf, "tEXt::Thumb::MTime"), std::to_string(file.st_mtime).c_str());
    g_object_unref(pixbuf);
    stat(thumbnail.c_str(), &file);
    EXPECT_EQ(file.st_mode & 0777, 0600u);

    // One that another program put there is used, also for a video; a stale one is not.
    const auto written = fs::last_write_time(thumbnail);
    fs::remove(home / "media.db");
    EXPECT_EQ(thumbnail_soon(path), thumbnail);
    EXPECT_EQ(fs::last_write_time(thumbnail), written);
    picture("a b.jpg", 300, 300);
    const timespec times[2] = {{1, 0}, {1, 0}};
    utimensat(AT_FDCWD, path.c_str(), times, 0);
    EXPECT_EQ(media_content_scan_file(path.c_str()), MEDIA_CONTENT_ERROR_NONE);
    EXPECT_NE(fs::last_write_time(thumbnail), written);
    fs::remove(thumbnail);
    EXPECT_EQ(thumbnail_soon(path), thumbnail);
}

TEST_F(Media, UnusablePicturesStayWithoutThumbnail)
{
    const std::string whole = picture("whole.png");
    home.file("cut.png", read_file(whole).substr(0, 40));
    home.file("empty.png", "");
    home.file("lies.jpg", "\xff\xd8 no picture");
    home.file("large.pbm", "P4\n8200 8200\n" + std::string(8200 / 8 * 8200, '\0')); // whole, but too large
    for (const char *name : {"cut.png", "empty.png", "lies.jpg", "large.pbm"}) {
        EXPECT_EQ(media_content_scan_file((home / name).c_str()), MEDIA_CONTENT_ERROR_NONE) << name;
        EXPECT_EQ(query(by_path(home / name)), (Records{{home / name, "(null)"}}));
    }
    EXPECT_FALSE(fs::exists(home / "cache/thumbnails"));
}

TEST_F(Media, LargePhotosDoNotHoldUpQueriesOrTheEnd)
{
    const std::string large = picture("large.png", 5000, 4000);
    std::string path;
    for (int i = 0; i < 4; i++) {
        path = home / (std::to_string(i) + ".png");
        fs::create_hard_link(large, path);
        const auto start = std::chrono::steady_clock::now();
        query(by_path(path));
        EXPECT_LT(milliseconds_since(start), i ? 400 : 600); // the picture alone takes longer
    }
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(media_content_disconnect(), MEDIA_CONTENT_ERROR_NONE);
    EXPECT_LT(milliseconds_since(start), 400);
    EXPECT_EQ(media_content_connect(), MEDIA_CONTENT_ERROR_NONE);
    EXPECT_NE(thumbnail_soon(path), "(null)"); // work that was given up is taken up again
}
