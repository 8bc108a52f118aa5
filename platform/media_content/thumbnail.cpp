#include "media_content/thumbnail.h"
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <gdk-pixbuf/gdk-pixbuf.h>
#include <memory>
#include <sys/stat.h>
#include <unistd.h>

namespace fs = std::filesystem;

namespace {

constexpr int SIDE = 256; // of the cache's folder "large"
constexpr long long MOST_PIXELS = 64'000'000;

struct GDrop {
    void operator()(void *p) const
    {
        g_free(p);
    }
    void operator()(GdkPixbuf *p) const
    {
        g_object_unref(p);
    }
    void operator()(GdkPixbufLoader *p) const
    {
        g_object_unref(p);
    }
};
template <typename T> using Owned = std::unique_ptr<T, GDrop>;

std::string file_uri(const std::string &path)
{
    const Owned<char> uri(g_filename_to_uri(path.c_str(), nullptr, nullptr));
    return uri ? uri.get() : "";
}

fs::path cache_file(const std::string &uri, const char *size)
{
    const Owned<char> digest(g_compute_checksum_for_string(G_CHECKSUM_MD5, uri.c_str(), -1));
    // Not g_get_user_cache_dir(), which remembers the environment of its first call.
    const char *xdg = g_getenv("XDG_CACHE_HOME");
    const fs::path cache = xdg && *xdg == '/' ? fs::path(xdg) : fs::path(g_get_home_dir()) / ".cache";
    return cache / "thumbnails" / size / (std::string(digest.get()) + ".png");
}

struct Size {
    int width = 0;
    int height = 0;
    bool too_large = false;
};

void scale(GdkPixbufLoader *loader, int width, int height, gpointer user_data)
{
    auto *size = static_cast<Size *>(user_data);
    size->too_large = width <= 0 || height <= 0 || static_cast<long long>(width) * height > MOST_PIXELS;
    if (size->too_large) {
        gdk_pixbuf_loader_set_size(loader, 0, 0); // makes the decoder give up before it allocates the picture
        return;
    }
    size->width = width;
    size->height = height;
    const int longer = std::max(width, height);
    if (longer > SIDE)
        gdk_pixbuf_loader_set_size(loader, std::max(1, width * SIDE / longer), std::max(1, height * SIDE / longer));
}

// Feeds the decoder in pieces, so that a cancel is seen between two of them.
Owned<GdkPixbuf> decode(const std::string &path, Size &size, const std::atomic<bool> &cancel)
{
    std::ifstream file(path, std::ios::binary);
    const Owned<GdkPixbufLoader> loader(gdk_pixbuf_loader_new());
    g_signal_connect(loader.get(), "size-prepared", G_CALLBACK(scale), &size);
    bool usable = file.is_open();
    char piece[65536];
    while (usable && !cancel && !size.too_large && (file.read(piece, sizeof piece), file.gcount() > 0))
        usable = gdk_pixbuf_loader_write(loader.get(), reinterpret_cast<guchar *>(piece),
                                         static_cast<gsize>(file.gcount()), nullptr);
    const bool whole = gdk_pixbuf_loader_close(loader.get(), nullptr);
    GdkPixbuf *picture = gdk_pixbuf_loader_get_pixbuf(loader.get());
    if (!usable || !whole || cancel || size.too_large || !picture)
        return nullptr;
    return Owned<GdkPixbuf>(gdk_pixbuf_apply_embedded_orientation(picture));
}

bool save(GdkPixbuf *picture, const fs::path &target, const std::string &uri, long long mtime, const Size &size)
{
    const std::string folder = target.parent_path();
    if (g_mkdir_with_parents(folder.c_str(), 0700) != 0)
        return false;
    std::string temporary = folder + "/.new-XXXXXX";
    const int fd = mkstemp(temporary.data()); // with mode 0600, as the standard demands
    if (fd < 0)
        return false;
    close(fd);
    const std::string time = std::to_string(mtime), width = std::to_string(size.width),
                      height = std::to_string(size.height);
    const bool saved =
        gdk_pixbuf_save(picture, temporary.c_str(), "png", nullptr, "tEXt::Thumb::URI", uri.c_str(),
                        "tEXt::Thumb::MTime", time.c_str(), "tEXt::Thumb::Image::Width", width.c_str(),
                        "tEXt::Thumb::Image::Height", height.c_str(), "tEXt::Software", "orvant-platform", nullptr);
    if (saved && std::rename(temporary.c_str(), target.c_str()) == 0)
        return true;
    unlink(temporary.c_str());
    return false;
}

} // namespace

std::string thumbnail_find(const std::string &path, long long mtime)
{
    const std::string uri = file_uri(path);
    if (uri.empty())
        return {};
    for (const char *size : {"large", "x-large", "normal", "xx-large"}) {
        const fs::path file = cache_file(uri, size);
        std::error_code failed;
        if (!fs::is_regular_file(file, failed))
            continue;
        const Owned<GdkPixbuf> picture(gdk_pixbuf_new_from_file(file.c_str(), nullptr));
        const char *of = picture ? gdk_pixbuf_get_option(picture.get(), "tEXt::Thumb::URI") : nullptr;
        const char *time = picture ? gdk_pixbuf_get_option(picture.get(), "tEXt::Thumb::MTime") : nullptr;
        if (of && time && uri == of && std::to_string(mtime) == time)
            return file;
    }
    return {};
}

std::string thumbnail_make(const std::string &path, long long mtime, const std::atomic<bool> &cancel)
{
    const std::string uri = file_uri(path);
    Size size;
    const Owned<GdkPixbuf> picture = uri.empty() ? nullptr : decode(path, size, cancel);
    if (!picture)
        return {};
    const fs::path target = cache_file(uri, "large");
    return save(picture.get(), target, uri, mtime, size) ? target.string() : std::string();
}
