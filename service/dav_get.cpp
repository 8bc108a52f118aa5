// GET and HEAD: files are read from the disk as the connection takes them.
#include "http.h"
#include <cerrno>
#include <cstring>
#include <fcntl.h>

static const int64_t BLOCK = 256 << 10;

// A receiver on a fast line would keep the loop for itself: after so many bytes it has to queue again.
static const int64_t TURN = 4 << 20;

namespace {
struct Download {
    Fd file;
    int64_t left = 0;
    guint pause_timer = 0;

    ~Download()
    {
        if (pause_timer)
            g_source_remove(pause_timer);
    }
};
} // namespace

// Appends the next block. When the file has become shorter the promised length cannot be kept, and the connection is
// cut so that the client notices.
static void send_block(SoupServerMessage *message, Download &download)
{
    SoupMessageBody *body = soup_server_message_get_response_body(message);
    if (download.left == 0)
        return soup_message_body_complete(body);
    const auto size = static_cast<size_t>(std::min(download.left, BLOCK));
    char *block = static_cast<char *>(g_malloc(size));
    const ssize_t count = read(download.file.fd, block, size);
    if (count <= 0) {
        g_free(block);
        g_socket_shutdown(soup_server_message_get_socket(message), TRUE, TRUE, nullptr);
        return soup_message_body_complete(body);
    }
    download.left -= count;
    soup_message_body_append(body, SOUP_MEMORY_TAKE, block, static_cast<gsize>(count));
}

static gboolean go_on(gpointer data)
{
    auto *message = static_cast<SoupServerMessage *>(data);
    static_cast<Download *>(g_object_get_data(G_OBJECT(message), "download"))->pause_timer = 0;
    soup_server_message_unpause(message);
    return G_SOURCE_REMOVE;
}

static void wrote_chunk(SoupServerMessage *message, gpointer data)
{
    Download &download = *static_cast<Download *>(data);
    const int64_t before = download.left;
    send_block(message, download);
    if (before / TURN != download.left / TURN && !download.pause_timer) {
        soup_server_message_pause(message);
        download.pause_timer = g_idle_add(go_on, message);
    }
}

// The one range of the Range header; the whole file when there is none, or several, or If-Range names another version.
// False when it lies outside the file.
static bool chosen_range(const Request &request, const Entry &entry, int64_t &start, int64_t &end, bool &partial)
{
    start = 0;
    end = entry.size - 1;
    partial = false;
    const char *if_range = request.header("If-Range");
    if (if_range && entry.etag() != if_range && http_date(entry.modified) != if_range)
        return true;
    SoupRange *ranges = nullptr;
    int count = 0;
    SoupMessageHeaders *headers = soup_server_message_get_request_headers(request.message);
    if (!request.header("Range") || !soup_message_headers_get_ranges(headers, entry.size, &ranges, &count))
        return true;
    if (count == 1) {
        partial = true;
        start = ranges[0].start;
        end = std::min<int64_t>(ranges[0].end, entry.size - 1);
    }
    soup_message_headers_free_ranges(headers, ranges);
    return !partial || (start >= 0 && start < entry.size && start <= end);
}

void dav_get(Request &request)
{
    Entry entry = request.look_up();
    if (entry.kind == Entry::FOLDER) {
        request.set_header("Allow", "OPTIONS, DELETE, COPY, MOVE, PROPFIND, PROPPATCH, LOCK, UNLOCK");
        return request.answer(405);
    }
    if (entry.kind != Entry::FILE)
        return request.answer(404);
    const Fd folder = request.parent();
    auto download = std::make_unique<Download>();
    download->file = Fd(
        folder ? openat(folder.fd, request.path.name().c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC) : -1);
    if (!download->file)
        return request.answer(status_of_errno(errno));
    // What was opened counts, not what stood there a moment ago.
    entry = look(download->file.fd, "");
    entry.name = request.path.name();
    if (entry.kind != Entry::FILE)
        return request.answer(404);

    request.set_header("ETag", entry.etag());
    request.set_header("Last-Modified", http_date(entry.modified));
    request.set_header("Accept-Ranges", "bytes");
    if (const std::string digest = request.service->metadata.digest(*request.account, request.path, entry);
        !digest.empty())
        request.set_header("Repr-Digest", repr_digest(digest));
    if (const int status = check_conditions(request, entry))
        return request.answer(status);
    request.set_header("Content-Type", content_type(entry.name));
    request.set_header("X-Content-Type-Options", "nosniff");
    request.set_header("Content-Security-Policy", "sandbox");

    int64_t start, end;
    bool partial;
    if (!chosen_range(request, entry, start, end, partial)) {
        request.set_header("Content-Range", "bytes */" + std::to_string(entry.size));
        return request.answer(416);
    }
    SoupMessageHeaders *headers = soup_server_message_get_response_headers(request.message);
    if (partial)
        soup_message_headers_set_content_range(headers, start, end, entry.size);
    request.answer(partial ? 206 : 200);
    download->left = end - start + 1;
    soup_message_headers_set_content_length(headers, download->left);
    if (std::strcmp(request.method(), "HEAD") == 0)
        return;
    lseek(download->file.fd, start, SEEK_SET);
    soup_message_body_set_accumulate(soup_server_message_get_response_body(request.message), FALSE);
    Download *raw = download.release();
    g_object_set_data_full(G_OBJECT(request.message), "download", raw,
                           [](gpointer data) { delete static_cast<Download *>(data); });
    g_signal_connect(request.message, "wrote-chunk", G_CALLBACK(wrote_chunk), raw);
    send_block(request.message, *raw);
}
