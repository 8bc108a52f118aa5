#include "http.h"
#include <cstring>
#include <gio/gio.h>
#include <netinet/in.h>
#include <netinet/tcp.h>

static const int64_t BODY_AT_MOST = 1 << 20;    // of requests that are not uploads
static const int64_t WORTH_READING = 256 << 10; // what is read to the end to keep a connection alive
static const char *const ALLOWED =
    "OPTIONS, GET, HEAD, PUT, DELETE, MKCOL, COPY, MOVE, PROPFIND, PROPPATCH, LOCK, UNLOCK";

void Request::answer(int status, const char *type, const std::string &body) const
{
    answer(status);
    soup_server_message_set_response(message, type, SOUP_MEMORY_COPY, body.data(), body.size());
}

std::string Request::body() const
{
    GBytes *bytes = soup_message_body_flatten(soup_server_message_get_request_body(message));
    gsize size = 0;
    const auto *data = static_cast<const char *>(g_bytes_get_data(bytes, &size));
    const std::string text(data ? data : "", size);
    g_bytes_unref(bytes);
    return text;
}

Entry Request::look_up() const
{
    if (path.root())
        return look(account->folder.fd, "");
    const Fd folder = parent();
    Entry entry = folder ? look(folder.fd, path.name()) : Entry();
    if (path.slash && entry.kind == Entry::FILE)
        entry.kind = Entry::NONE;
    return entry;
}

std::string http_date(int64_t nanoseconds)
{
    const time_t seconds = nanoseconds / 1000000000;
    struct tm parts;
    char text[64];
    gmtime_r(&seconds, &parts);
    std::strftime(text, sizeof text, "%a, %d %b %Y %H:%M:%S GMT", &parts); // the locale is always "C" here
    return text;
}

std::string content_type(const std::string &name)
{
    const std::unique_ptr<char, decltype(&g_free)> type(g_content_type_guess(name.c_str(), nullptr, 0, nullptr),
                                                        g_free);
    const std::unique_ptr<char, decltype(&g_free)> mime(g_content_type_get_mime_type(type.get()), g_free);
    return mime ? mime.get() : "application/octet-stream";
}

std::string repr_digest(const std::string &sha256_hex)
{
    std::string bytes;
    for (size_t i = 0; i + 1 < sha256_hex.size(); i += 2)
        bytes += static_cast<char>(g_ascii_xdigit_value(sha256_hex[i]) * 16 + g_ascii_xdigit_value(sha256_hex[i + 1]));
    const std::unique_ptr<char, decltype(&g_free)> text(
        g_base64_encode(reinterpret_cast<const guchar *>(bytes.data()), bytes.size()), g_free);
    return std::string("sha-256=:") + text.get() + ":";
}

// Whether a list of entity tags names the entry's. Weak tags never match: ours are strong.
static bool names_etag(const char *list, const Entry &entry)
{
    const std::string etag = entry.etag();
    GSList *tags = soup_header_parse_list(list);
    bool found = false;
    for (const GSList *tag = tags; tag; tag = tag->next) {
        const char *text = static_cast<const char *>(tag->data);
        found = found || etag == text || std::strcmp(text, "*") == 0;
    }
    soup_header_free_list(tags);
    return found;
}

// The date of a header in seconds since 1970, or -1.
static int64_t date_of(const char *text)
{
    GDateTime *date = text ? soup_date_time_new_from_http_string(text) : nullptr;
    const int64_t seconds = date ? g_date_time_to_unix(date) : -1;
    if (date)
        g_date_time_unref(date);
    return seconds;
}

int check_conditions(const Request &request, const Entry &entry)
{
    const bool exists = entry.kind != Entry::NONE,
               reading = !std::strcmp(request.method(), "GET") || !std::strcmp(request.method(), "HEAD");
    const int64_t modified = entry.modified / 1000000000;
    if (const char *match = request.header("If-Match")) {
        if (!exists || !names_etag(match, entry))
            return 412;
    } else if (const int64_t date = date_of(request.header("If-Unmodified-Since")); date >= 0 && exists) {
        if (modified > date)
            return 412;
    }
    if (const char *none = request.header("If-None-Match")) {
        if (exists && names_etag(none, entry))
            return reading ? 304 : 412;
    } else if (const int64_t date = date_of(request.header("If-Modified-Since")); date >= 0 && exists && reading) {
        if (modified <= date)
            return 304;
    }
    return 0;
}

namespace {
// A connection that was answered before its request was read. Closing it with unread input would reset it, and the
// answer could be lost on its way; so what arrives is thrown away until the peer has closed or the time is over.
struct Lingering {
    static constexpr unsigned SECONDS = 10;
    GIOStream *stream;
    GCancellable *cancellable = g_cancellable_new();
    guint timer = 0;

    void read_on()
    {
        g_input_stream_skip_async(g_io_stream_get_input_stream(stream), 1 << 20, G_PRIORITY_LOW, cancellable, skipped,
                                  this);
    }
    static void skipped(GObject *source, GAsyncResult *result, gpointer data)
    {
        auto *self = static_cast<Lingering *>(data);
        if (g_input_stream_skip_finish(G_INPUT_STREAM(source), result, nullptr) > 0)
            return self->read_on();
        if (self->timer)
            g_source_remove(self->timer);
        g_io_stream_close(self->stream, nullptr, nullptr);
        g_object_unref(self->cancellable);
        g_object_unref(self->stream);
        delete self;
    }
    static gboolean time_over(gpointer data)
    {
        auto *self = static_cast<Lingering *>(data);
        self->timer = 0;
        g_cancellable_cancel(self->cancellable);
        return G_SOURCE_REMOVE;
    }
};
} // namespace

void refuse(Request &request, int status)
{
    request.answer(status);
    put_drop(request);
    SoupMessageHeaders *headers = soup_server_message_get_request_headers(request.message);
    const SoupEncoding encoding = soup_message_headers_get_encoding(headers);
    const bool little =
        encoding == SOUP_ENCODING_NONE ||
        (encoding == SOUP_ENCODING_CONTENT_LENGTH && soup_message_headers_get_content_length(headers) <= WORTH_READING);
    // A client that expects "100 Continue" sends nothing once it has read another status.
    if (little || soup_message_headers_get_expectations(headers) & SOUP_EXPECTATION_CONTINUE)
        return;
    std::string text = "HTTP/1.1 " + std::to_string(status) + " " + soup_status_get_phrase(static_cast<guint>(status)) +
                       "\r\nConnection: close\r\n"
                       "Content-Length: 0\r\n";
    SoupMessageHeadersIter iterator;
    const char *name, *value;
    soup_message_headers_iter_init(&iterator, soup_server_message_get_response_headers(request.message));
    while (soup_message_headers_iter_next(&iterator, &name, &value))
        text += std::string(name) + ": " + value + "\r\n";
    text += "Date: " + http_date(static_cast<int64_t>(time(nullptr)) * 1000000000) + "\r\n\r\n";
    GSocket *socket = soup_server_message_get_socket(request.message);
    g_object_ref(socket);
    auto *lingering = new Lingering{soup_server_message_steal_connection(request.message)};
    g_socket_send(socket, text.data(), text.size(), nullptr, nullptr);
    g_socket_shutdown(socket, FALSE, TRUE, nullptr);
    g_object_unref(socket);
    lingering->timer = g_timeout_add_seconds(Lingering::SECONDS, Lingering::time_over, lingering);
    lingering->read_on();
}

void in_thread(Request &request, std::function<void()> work, std::function<void()> done, Workers *workers)
{
    request.jobs++;
    soup_server_message_pause(request.message);
    // The message, and the request with it, outlives its connection until the job is done.
    g_object_ref(request.message);
    Workers &those = workers ? *workers : request.service->workers;
    those.run(std::move(work), [&request, done = std::move(done)] {
        SoupServerMessage *message = request.message;
        request.jobs--;
        done();
        if (request.jobs == 0)
            soup_server_message_unpause(message);
        g_object_unref(message);
    });
}

void dav_options(Request &request)
{
    request.set_header("DAV", "1, 2");
    request.set_header("Allow", ALLOWED);
    request.answer(200);
}

static void account_info(Request &request)
{
    if (std::strcmp(request.method(), "GET") != 0 && std::strcmp(request.method(), "HEAD") != 0) {
        request.set_header("Allow", "GET, HEAD");
        return request.answer(405);
    }
    const Account &account = *request.account;
    Stmt json(request.service->db, "SELECT json_object('email', ?, 'display_name', ?, 'used', ?, 'total', ?)");
    json.bind(1, account.email).bind(2, account.display_name);
    json.bind(3, static_cast<long long>(account.used)).bind(4, static_cast<long long>(account.quota));
    if (!json.row())
        return request.answer(500);
    request.set_header("Cache-Control", "no-store");
    request.answer(200, "application/json", json.text(0) + "\n");
}

static Area area_of(const char *path)
{
    if (std::strcmp(path, "/1/account/info") == 0)
        return Area::ACCOUNT_INFO;
    if (std::strcmp(path, "/1/media") == 0)
        return Area::MEDIA_ADDRESS;
    if (std::strcmp(path, "/1/thumbnail") == 0)
        return Area::THUMBNAIL;
    return std::strncmp(path, "/1/media/", 9) == 0 ? Area::MEDIA : Area::DAV;
}

static void handle_dav(Request &request)
{
    const std::string method = request.method();
    if (method == "PUT")
        return put_finish(request);
    if (method == "OPTIONS")
        return dav_options(request);
    if (method == "GET" || method == "HEAD")
        return dav_get(request);
    if (method == "DELETE")
        return dav_delete(request);
    if (method == "MKCOL")
        return dav_mkcol(request);
    if (method == "COPY" || method == "MOVE")
        return dav_copy_move(request, method == "MOVE");
    if (method == "PROPFIND")
        return dav_propfind(request);
    if (method == "PROPPATCH")
        return dav_proppatch(request);
    if (method == "LOCK")
        return dav_lock(request);
    if (method == "UNLOCK")
        return dav_unlock(request);
    request.set_header("Allow", ALLOWED);
    request.answer(405);
}

static void handle(Request &request)
{
    switch (request.area) {
    case Area::DAV:
        return handle_dav(request);
    case Area::ACCOUNT_INFO:
        return account_info(request);
    case Area::MEDIA_ADDRESS:
        return media_address(request);
    case Area::MEDIA:
        return media_get(request);
    case Area::THUMBNAIL:
        return thumbnail(request);
    }
}

static Request &request_of(SoupServerMessage *message)
{
    return *static_cast<Request *>(g_object_get_data(G_OBJECT(message), "request"));
}

static void got_chunk(SoupServerMessage *message, GBytes *chunk, gpointer)
{
    Request &request = request_of(message);
    if (soup_server_message_get_status(message) >= 200)
        return; // refused: the rest is only read
    if (request.upload)
        return put_chunk(request, chunk);
    request.body_bytes += static_cast<int64_t>(g_bytes_get_size(chunk));
    if (request.body_bytes > BODY_AT_MOST)
        refuse(request, 413);
}

static void free_request(gpointer data)
{
    auto *request = static_cast<Request *>(data);
    put_drop(*request);
    delete request;
}

// The headers are there, the body is not: who asks, for what, and may it be sent?
static void on_headers(SoupServer *, SoupServerMessage *message, const char *, GHashTable *, gpointer data)
{
    auto *request = new Request;
    request->service = static_cast<Service *>(data);
    request->message = message;
    g_object_set_data_full(G_OBJECT(message), "request", request, free_request);
    g_signal_connect(message, "got-chunk", G_CALLBACK(got_chunk), nullptr);
    // Of a connection that broke the message may live on for a while, but its upload must not.
    g_signal_connect(message, "finished", G_CALLBACK(+[](SoupServerMessage *m, gpointer) { put_drop(request_of(m)); }),
                     nullptr);

    // A peer that vanished without a word keeps its connection, and the room of its upload, for two minutes at most.
    GSocket *socket = soup_server_message_get_socket(message);
    g_socket_set_keepalive(socket, TRUE);
    g_socket_set_option(socket, IPPROTO_TCP, TCP_KEEPIDLE, 60, nullptr);
    g_socket_set_option(socket, IPPROTO_TCP, TCP_KEEPINTVL, 15, nullptr);
    g_socket_set_option(socket, IPPROTO_TCP, TCP_KEEPCNT, 4, nullptr);

    const char *path = g_uri_get_path(soup_server_message_get_uri(message));
    request->area = area_of(path);
    const bool is_dav = request->area == Area::DAV;
    const int wrong = is_dav ? parse_path(path, request->path) : 0;
    if (g_uri_get_fragment(soup_server_message_get_uri(message)))
        return refuse(*request, 400);
    if (wrong == 404)
        return refuse(*request, 404);
    if (request->area == Area::MEDIA) {
        request->account = media_account(*request);
        if (!request->account)
            refuse(*request, 403);
        return;
    }
    request->account = request->service->accounts.authorize(request->header("Authorization"));
    if (!request->account) {
        soup_message_headers_append(soup_server_message_get_response_headers(message), "WWW-Authenticate",
                                    "Bearer realm=\"velora-cloud\"");
        soup_message_headers_append(soup_server_message_get_response_headers(message), "WWW-Authenticate",
                                    "Basic realm=\"velora-cloud\", charset=\"UTF-8\"");
        return refuse(*request, 401);
    }
    if (wrong)
        return refuse(*request, wrong);
    if (const int status = is_dav ? check_if_header(*request) : 0)
        return refuse(*request, status);
    if (is_dav && std::strcmp(request->method(), "PUT") == 0)
        return put_begin(*request);
    if (soup_message_headers_get_content_length(soup_server_message_get_request_headers(message)) > BODY_AT_MOST)
        refuse(*request, 413);
}

static void on_request(SoupServer *, SoupServerMessage *message, const char *, GHashTable *, gpointer)
{
    if (soup_server_message_get_status(message) < 200)
        handle(request_of(message));
}

void serve(SoupServer *server, Service *service)
{
    soup_server_add_early_handler(server, nullptr, on_headers, service, nullptr);
    soup_server_add_handler(server, nullptr, on_request, service, nullptr);
}
