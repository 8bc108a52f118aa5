// Small pictures of pictures, made when they are first asked for and kept in DIR/thumbnails.
#include "http.h"
#include "secrets.h"
#include <array>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <gdk-pixbuf/gdk-pixbuf.h>
#include <sys/stat.h>

static const int64_t KEPT_FOR = 30LL * 24 * 3600 * 1000000000; // nanoseconds since the last use
static const int64_t FILE_AT_MOST = 64 << 20;
static const int64_t PIXELS_AT_MOST = 64 << 20; // 256 MiB while it is decoded
static const size_t THUMBNAIL_AT_MOST = 8 << 20;
static const int SIZE_LEAST = 16, SIZE_MOST = 1024;

void thumbnails_begin(const Service &service)
{
    g_slist_free(gdk_pixbuf_get_formats()); // reads the table of decoders before there are threads
    std::vector<Entry> entries;
    list_folder(service.thumbnails.fd, entries);
    const int64_t oldest = static_cast<int64_t>(time(nullptr)) * 1000000000 - KEPT_FOR;
    for (const Entry &entry : entries)
        if (entry.modified < oldest || entry.name.rfind("new-", 0) == 0)
            remove_tree(service.thumbnails.fd, entry.name, nullptr);
}

// The decoder for a file by its first bytes; null when it is no picture of the kinds that are decoded. Vector formats
// are not among them: they may refer to other files.
static const char *decoder_of(const char *bytes, size_t size)
{
    struct Magic {
        const char *bytes;
        size_t size;
        const char *decoder;
    };
    static const Magic magics[] = {
        {"\xff\xd8\xff", 3, "jpeg"}, {"\x89PNG\r\n", 6, "png"}, {"GIF8", 4, "gif"}, {"BM", 2, "bmp"}};
    for (const Magic &magic : magics)
        if (size >= magic.size && std::memcmp(bytes, magic.bytes, magic.size) == 0)
            return magic.decoder;
    return nullptr;
}

// A picture that is too large is told to decode to nothing.
static void size_prepared(GdkPixbufLoader *loader, int width, int height, gpointer data)
{
    const int box = *static_cast<int *>(data);
    if (width <= 0 || height <= 0 || static_cast<int64_t>(width) * height > PIXELS_AT_MOST)
        return gdk_pixbuf_loader_set_size(loader, 0, 0);
    if (width <= box && height <= box)
        return;
    const double scale = static_cast<double>(box) / std::max(width, height);
    gdk_pixbuf_loader_set_size(loader, std::max(1, static_cast<int>(width * scale + 0.5)),
                               std::max(1, static_cast<int>(height * scale + 0.5)));
}

using PixbufPtr = std::unique_ptr<GdkPixbuf, decltype(&g_object_unref)>;

// Null when the file cannot be decoded.
static PixbufPtr decode(int fd, int box)
{
    std::array<char, 1 << 16> block;
    ssize_t count = read(fd, block.data(), block.size());
    const char *decoder = count > 0 ? decoder_of(block.data(), static_cast<size_t>(count)) : nullptr;
    GdkPixbufLoader *loader = decoder ? gdk_pixbuf_loader_new_with_type(decoder, nullptr) : nullptr;
    if (!loader)
        return {nullptr, g_object_unref};
    g_signal_connect(loader, "size-prepared", G_CALLBACK(size_prepared), &box);
    bool good = true;
    for (; good && count > 0; count = read(fd, block.data(), block.size()))
        good = gdk_pixbuf_loader_write(loader, reinterpret_cast<const guchar *>(block.data()),
                                       static_cast<gsize>(count), nullptr);
    good = gdk_pixbuf_loader_close(loader, nullptr) && good && count == 0;
    GdkPixbuf *picture = good ? gdk_pixbuf_loader_get_pixbuf(loader) : nullptr;
    PixbufPtr turned(picture ? gdk_pixbuf_apply_embedded_orientation(picture) : nullptr, g_object_unref);
    g_object_unref(loader);
    return turned;
}

// The encoded thumbnail; empty when the file cannot be decoded.
static std::string make(int fd, int box)
{
    const PixbufPtr picture = decode(fd, box);
    if (!picture)
        return "";
    const bool clear = gdk_pixbuf_get_has_alpha(picture.get());
    char *bytes = nullptr;
    gsize size = 0;
    const bool saved =
        clear ? gdk_pixbuf_save_to_buffer(picture.get(), &bytes, &size, "png", nullptr, nullptr)
              : gdk_pixbuf_save_to_buffer(picture.get(), &bytes, &size, "jpeg", nullptr, "quality", "80", nullptr);
    std::string encoded(saved ? bytes : "", saved ? size : 0);
    g_free(bytes);
    return encoded;
}

static std::string read_kept(int folder, const std::string &name)
{
    const Fd file(openat(folder, name.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
    const Entry entry = file ? look(file.fd, "") : Entry();
    if (entry.kind != Entry::FILE || entry.size > static_cast<int64_t>(THUMBNAIL_AT_MOST))
        return "";
    futimens(file.fd, nullptr);
    std::string bytes(static_cast<size_t>(entry.size), '\0');
    const bool whole = read(file.fd, bytes.data(), bytes.size()) == static_cast<ssize_t>(bytes.size());
    return whole ? bytes : "";
}

// A thumbnail that cannot be kept is made again next time.
static void keep(int folder, const std::string &name, const std::string &temporary, const std::string &bytes)
{
    const Fd file(openat(folder, temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
    if (!file)
        return;
    if (write(file.fd, bytes.data(), bytes.size()) != static_cast<ssize_t>(bytes.size()) ||
        renameat(folder, temporary.c_str(), folder, name.c_str()) != 0)
        unlinkat(folder, temporary.c_str(), 0);
}

static void answer_picture(Request &request, const std::string &bytes)
{
    if (bytes.empty())
        return request.answer(415);
    request.set_header("Cache-Control", "private");
    request.set_header("X-Content-Type-Options", "nosniff");
    request.answer(200, bytes[0] == '\x89' ? "image/png" : "image/jpeg", bytes);
}

namespace {
struct Making {
    Fd file;
    int folder, box;
    std::string name, temporary, bytes;
};
} // namespace

void thumbnail(Request &request)
{
    if (!request.is("GET") && !request.is("HEAD")) {
        request.set_header("Allow", "GET, HEAD");
        return request.answer(405);
    }
    const std::string path = request.query_field("path"), size = request.query_field("size");
    guint64 box = 0;
    if (path.empty() || !g_ascii_string_to_unsigned(size.c_str(), 10, SIZE_LEAST, SIZE_MOST, &box, nullptr))
        return request.answer(400);
    if (const int wrong = parse_plain_path(path, request.path))
        return request.answer(wrong);
    if (request.look_up().kind != Entry::FILE || content_type(request.path.name()).rfind("image/", 0) != 0)
        return request.answer(404);
    const Fd folder = request.parent();
    auto making = std::make_shared<Making>();
    making->file = Fd(
        folder ? openat(folder.fd, request.path.name().c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC) : -1);
    if (!making->file)
        return request.answer(status_of_errno(errno));
    Entry entry = look(making->file.fd, "");
    entry.name = request.path.name();
    if (entry.kind != Entry::FILE)
        return request.answer(404);
    if (entry.size > FILE_AT_MOST)
        return request.answer(415);
    // The same content has the same thumbnail wherever it is.
    const std::string digest = request.service->metadata.digest(*request.account, request.path, entry);
    making->name = hex(sha256((digest.empty() ? entry.etag() : digest) + "\n" + size));
    making->folder = request.service->thumbnails.fd;
    making->box = static_cast<int>(box);
    if (const std::string kept = read_kept(making->folder, making->name); !kept.empty())
        return answer_picture(request, kept);
    making->temporary = temporary_name("new");
    in_thread(
        request,
        [making] {
            making->bytes = make(making->file.fd, making->box);
            if (!making->bytes.empty())
                keep(making->folder, making->name, making->temporary, making->bytes);
        },
        [making, &request] { answer_picture(request, making->bytes); }, &request.service->painters);
}
