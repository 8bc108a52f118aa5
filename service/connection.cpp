#include "connection.h"
#include "http_date.h"
#include <boost/beast/http/basic_parser.hpp>
#include <boost/beast/http/status.hpp>
#include <cerrno>
#include <cstring>
#include <limits>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/sendfile.h>
#include <sys/socket.h>

namespace beast = boost::beast;
namespace http = boost::beast::http;

static const size_t READ_AT_MOST = 256 << 10;
static const int64_t WRITE_AT_MOST = 4 << 20; // in one turn: a receiver on a fast line must not keep the loop
static const size_t BLOCK = 256 << 10;        // of a file that goes over TLS
static const uint32_t HEADERS_AT_MOST = 64 << 10;
static const size_t FIELDS_AT_MOST = 100;
static const int64_t WORTH_READING = 256 << 10; // what is read to the end to keep a connection alive

// Writes what it reads into a message.
struct Parser : http::basic_parser<true> {
    bool is_old = false; // HTTP/1.0
    std::function<void(std::string &&method, std::string &&target)> got_line;
    std::function<bool(beast::string_view name, beast::string_view value)> got_field;
    std::function<void(const char *bytes, size_t size)> got_body;

    Parser()
    {
        header_limit(HEADERS_AT_MOST);
        body_limit(std::numeric_limits<std::uint64_t>::max()); // who may send how much is decided by its owner
    }
    void on_request_impl(http::verb, beast::string_view method, beast::string_view target, int version,
                         beast::error_code &ec) override
    {
        ec = {};
        is_old = version < 11;
        got_line(std::string(method), std::string(target));
    }
    void on_response_impl(int, beast::string_view, int, beast::error_code &ec) override
    {
        ec = http::error::bad_method;
    }
    void on_field_impl(http::field, beast::string_view name, beast::string_view value, beast::error_code &ec) override
    {
        ec = {};
        if (!got_field(name, value))
            ec = http::error::bad_field;
    }
    void on_header_impl(beast::error_code &ec) override
    {
        ec = {};
    }
    void on_body_init_impl(const boost::optional<std::uint64_t> &, beast::error_code &ec) override
    {
        ec = {};
    }
    size_t on_body_impl(beast::string_view body, beast::error_code &ec) override
    {
        ec = {};
        got_body(body.data(), body.size());
        return body.size();
    }
    void on_chunk_header_impl(std::uint64_t, beast::string_view, beast::error_code &ec) override
    {
        ec = {};
    }
    size_t on_chunk_body_impl(std::uint64_t, beast::string_view body, beast::error_code &ec) override
    {
        return on_body_impl(body, ec);
    }
    void on_finish_impl(beast::error_code &ec) override
    {
        ec = {};
    }
};

// What the loop waits for on a plain socket.
struct Connection::Source {
    GSource base;
    Connection *connection;

    static gboolean dispatch(GSource *source, GSourceFunc, gpointer)
    {
        Connection *self = reinterpret_cast<Source *>(source)->connection;
        if (self && self->source_tag)
            self->ready(g_source_query_unix_fd(source, self->source_tag));
        return G_SOURCE_CONTINUE;
    }
};

Connection::Connection(Server &owner, int socket_fd, GTlsCertificate *certificate) : server(owner), fd(socket_fd)
{
    // Answers are written in one piece, so nothing is gained by waiting for more. A peer that vanished without a word
    // is found out within two minutes.
    const int one = 1, idle = 60, interval = 15, count = 4;
    setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &one, sizeof one);
    setsockopt(fd, SOL_SOCKET, SO_KEEPALIVE, &one, sizeof one);
    setsockopt(fd, IPPROTO_TCP, TCP_KEEPIDLE, &idle, sizeof idle);
    setsockopt(fd, IPPROTO_TCP, TCP_KEEPINTVL, &interval, sizeof interval);
    setsockopt(fd, IPPROTO_TCP, TCP_KEEPCNT, &count, sizeof count);
    if (certificate) {
        GSocket *socket = g_socket_new_from_fd(fd, nullptr);
        g_socket_set_blocking(socket, FALSE);
        plain = g_socket_connection_factory_create_connection(socket);
        g_object_unref(socket);
        tls = g_tls_server_connection_new(G_IO_STREAM(plain), certificate, nullptr);
    } else {
        static GSourceFuncs functions = {nullptr, nullptr, Source::dispatch, nullptr, nullptr, nullptr};
        source = g_source_new(&functions, sizeof(Source));
        reinterpret_cast<Source *>(source)->connection = this;
        g_source_attach(source, nullptr);
    }
}

Connection::~Connection() = default;

void Connection::begin()
{
    move_to(State::IDLE);
    watch();
}

void Connection::end()
{
    if (state == State::ENDED)
        return;
    const std::shared_ptr<Connection> self = shared_from_this();
    move_to(State::ENDED);
    watch();
    if (source) {
        reinterpret_cast<Source *>(source)->connection = nullptr;
        g_source_destroy(source);
        g_source_unref(std::exchange(source, nullptr));
    }
    if (tls) {
        // Without the farewell of TLS, for which a deaf peer could make us wait: every answer tells its length.
        g_socket_close(g_socket_connection_get_socket(plain), nullptr);
        g_object_unref(tls);
        g_object_unref(plain);
    } else {
        close(fd);
    }
    fd = -1;
    if (message) {
        message->connection = nullptr;
        std::exchange(message, nullptr)->ended();
    }
    server.connections.erase(place);
}

std::string Connection::peer() const
{
    sockaddr_storage storage{};
    socklen_t size = sizeof storage;
    if (getpeername(fd, reinterpret_cast<sockaddr *>(&storage), &size) != 0)
        return "";
    GSocketAddress *address = g_socket_address_new_from_native(&storage, size);
    std::string text;
    if (G_IS_INET_SOCKET_ADDRESS(address)) {
        char *host = g_inet_address_to_string(g_inet_socket_address_get_address(G_INET_SOCKET_ADDRESS(address)));
        text = host;
        g_free(host);
    }
    g_clear_object(&address);
    return text;
}

void Connection::move_to(State next)
{
    state = next;
    still_active();
}

void Connection::still_active()
{
    const Patience &patience = server.patience;
    int seconds = 0;
    switch (state) {
    case State::IDLE:
        seconds = is_first ? patience.headers : patience.idle;
        break;
    case State::HEADERS:
        seconds = patience.headers;
        break;
    case State::BODY:
        seconds = message && message->pauses ? 0 : patience.transfer;
        break;
    case State::WRITING:
        seconds = patience.transfer;
        break;
    case State::LINGERING:
        seconds = patience.lingering;
        break;
    case State::HANDLING:
    case State::ENDED:
        break;
    }
    active_at = g_get_monotonic_time();
    ends_at = seconds ? active_at + seconds * G_USEC_PER_SEC : 0;
}

// Waits for what the state needs.
void Connection::watch()
{
    const bool is_paused = message && message->pauses > 0;
    const bool reads = state == State::IDLE || state == State::HEADERS || state == State::LINGERING ||
                       (state == State::BODY && !is_paused);
    const bool writes = state != State::ENDED && output_at < output.size() + (message && message->file_left > 0);
    const bool wanted[] = {reads, writes && (state == State::WRITING || state == State::BODY)};
    if (source) {
        const auto condition = static_cast<GIOCondition>((wanted[0] ? G_IO_IN : 0) | (wanted[1] ? G_IO_OUT : 0));
        if (condition && source_tag)
            g_source_modify_unix_fd(source, source_tag, condition);
        else if (condition)
            source_tag = g_source_add_unix_fd(source, fd, condition);
        else if (source_tag) // the end of a connection is always told: not while nothing would be done about it
            g_source_remove_unix_fd(source, std::exchange(source_tag, nullptr));
        return;
    }
    for (const int direction : {0, 1}) {
        GSource *&one = tls_sources[direction];
        if (wanted[direction] == (one != nullptr))
            continue;
        if (one) {
            g_source_destroy(one);
            g_source_unref(std::exchange(one, nullptr));
            continue;
        }
        const auto ready_cb = +[](GObject *, gpointer data) -> gboolean {
            static_cast<Connection *>(data)->ready(static_cast<GIOCondition>(G_IO_IN | G_IO_OUT));
            return G_SOURCE_CONTINUE;
        };
        one = direction == 0
                  ? g_pollable_input_stream_create_source(G_POLLABLE_INPUT_STREAM(g_io_stream_get_input_stream(tls)),
                                                          nullptr)
                  : g_pollable_output_stream_create_source(G_POLLABLE_OUTPUT_STREAM(g_io_stream_get_output_stream(tls)),
                                                           nullptr);
        g_source_set_callback(one, reinterpret_cast<GSourceFunc>(reinterpret_cast<void (*)()>(ready_cb)), this,
                              nullptr);
        g_source_attach(one, nullptr);
    }
}

void Connection::ready(GIOCondition condition)
{
    const std::shared_ptr<Connection> self = shared_from_this();
    if (output_at < output.size() || state == State::WRITING)
        write_some();
    const bool reads =
        state == State::IDLE || state == State::HEADERS || state == State::BODY || state == State::LINGERING;
    if (reads && (condition & (G_IO_IN | G_IO_HUP | G_IO_ERR)))
        read_some();
    watch();
}

void Connection::go_on()
{
    const std::shared_ptr<Connection> self = shared_from_this();
    if (state == State::BODY) {
        still_active();
        process();
    } else if (state == State::HANDLING && message->is_answered()) {
        begin_answer();
        process();
    }
    watch();
}

// What recv() and send() answer; errno is EAGAIN when there is nothing to do yet.
static ssize_t from_glib(gssize count, GError *error)
{
    if (count >= 0)
        return count;
    errno = g_error_matches(error, G_IO_ERROR, G_IO_ERROR_WOULD_BLOCK) ? EAGAIN : EIO;
    g_clear_error(&error);
    return -1;
}

ssize_t Connection::receive(char *bytes, size_t size)
{
    if (!tls)
        return recv(fd, bytes, size, 0);
    GError *error = nullptr;
    const gssize count = g_pollable_input_stream_read_nonblocking(
        G_POLLABLE_INPUT_STREAM(g_io_stream_get_input_stream(tls)), bytes, size, nullptr, &error);
    return from_glib(count, error);
}

ssize_t Connection::send(const char *bytes, size_t size)
{
    if (!tls)
        return ::send(fd, bytes, size, MSG_NOSIGNAL);
    GError *error = nullptr;
    const gssize count = g_pollable_output_stream_write_nonblocking(
        G_POLLABLE_OUTPUT_STREAM(g_io_stream_get_output_stream(tls)), bytes, size, nullptr, &error);
    return from_glib(count, error);
}

static bool is_for_later()
{
    return errno == EAGAIN || errno == EWOULDBLOCK || errno == EINTR;
}

void Connection::read_some()
{
    static char block[READ_AT_MOST];
    const ssize_t count = receive(block, sizeof block);
    if (count < 0 && is_for_later())
        return;
    if (count <= 0)
        return end(); // also in the middle of a body: it is not whole, and nothing of it is kept
    if (state == State::LINGERING)
        return;
    if (state != State::HEADERS) // those have their time in all
        still_active();
    input.append(block, static_cast<size_t>(count));
    process();
}

void Connection::begin_message()
{
    message = server.make();
    message->connection = this;
    message->begun = g_get_monotonic_time();
    parser = std::make_unique<Parser>();
    parser->got_line = [this](std::string &&method, std::string &&target) {
        message->verb = std::move(method);
        message->whole_target = std::move(target);
    };
    parser->got_field = [this](beast::string_view name, beast::string_view value) {
        message->request_fields.push_back({std::string(name), std::string(value)});
        return message->request_fields.size() <= FIELDS_AT_MOST;
    };
    parser->got_body = [this](const char *bytes, size_t size) {
        if (message && !message->is_answered())
            message->got_body(bytes, size);
    };
    is_first = closes = owes_continue = false;
    sent = 0;
    move_to(State::HEADERS);
}

// Parses the next piece of what is there. False when there is none, or it makes no sense and is answered.
bool Connection::parse()
{
    if (input.empty())
        return false;
    beast::error_code error;
    const size_t used = parser->put(boost::asio::buffer(input), error);
    input.erase(0, used);
    if (!error)
        return true;
    if (error != http::error::need_more && state != State::ENDED)
        answer_malformed(error == http::error::header_limit || error == http::error::bad_field ? 431 : 400);
    return false;
}

// Goes on with what is there, as far as the message lets it.
void Connection::process()
{
    if (std::exchange(is_processing, true))
        return;
    for (bool has_progress = true; has_progress;) {
        if (state == State::IDLE && !input.empty())
            begin_message();
        if ((state != State::HEADERS && state != State::BODY) || message->pauses)
            break;
        has_progress = !parser->is_done() && parse();
        if (state == State::HEADERS && parser->is_header_done()) {
            move_to(State::BODY);
            headers_are_there();
        }
        if (state == State::BODY && !message->pauses)
            has_progress = go_on_with_body() || has_progress;
    }
    is_processing = false;
}

// True when that has ended the request.
bool Connection::go_on_with_body()
{
    if (message->is_answered() && !parser->is_done()) {
        if (!closes && !parser->chunked() && message->length <= WORTH_READING)
            return false; // little is left: the connection lives on
        closes = true;
        begin_answer();
        return true;
    }
    if (!parser->is_done()) {
        if (std::exchange(owes_continue, false)) {
            closes = !parser->keep_alive() || server.is_stopping;
            output = "HTTP/1.1 100 Continue\r\n\r\n";
            output_at = 0;
            write_some();
        }
        return false;
    }
    move_to(State::HANDLING);
    if (!message->is_answered())
        message->got_request();
    if (state == State::HANDLING && message->is_answered() && !message->pauses)
        begin_answer();
    return true;
}

// Whether fields that have to be alone are, and nothing frames the body in a way that others on the way to us may have
// understood differently.
bool Connection::is_sound() const
{
    int lengths = 0, codings = 0, hosts = 0, credentials = 0;
    for (const Message::Field &field : message->request_fields) {
        const auto is = [&field](const char *name) { return g_ascii_strcasecmp(field.name.c_str(), name) == 0; };
        lengths += is("Content-Length");
        codings += is("Transfer-Encoding");
        hosts += is("Host");
        credentials += is("Authorization");
        if (is("Content-Length") && field.value.find_first_not_of("0123456789") != std::string::npos)
            return false;
        // Others than this one would have to be undone.
        if (is("Transfer-Encoding") && g_ascii_strcasecmp(field.value.c_str(), "chunked") != 0)
            return false;
    }
    return lengths <= 1 && codings <= 1 && hosts <= 1 && credentials <= 1 && (parser->is_old || hosts == 1);
}

void Connection::headers_are_there()
{
    closes = !parser->keep_alive() || server.is_stopping;
    const auto length = parser->content_length();
    message->length = parser->chunked() ? -1
                      : length          ? static_cast<int64_t>(std::min<uint64_t>(*length, G_MAXINT64))
                                        : 0;
    // RFC 9112, 3.2: an absolute address is to be accepted, and "*" asks about the server as a whole.
    std::string &target = message->whole_target;
    if (g_ascii_strncasecmp(target.c_str(), "http://", 7) == 0 ||
        g_ascii_strncasecmp(target.c_str(), "https://", 8) == 0) {
        const size_t slash = target.find('/', target.find("//") + 2);
        target = slash == std::string::npos ? "/" : target.substr(slash);
    }
    if (target == "*")
        target = "/dav/";
    message->query_at = target.find('?');
    message->target = target.substr(0, std::min(message->query_at, target.find('#')));
    if (message->query_at != std::string::npos)
        message->query_at++;
    if (target.front() != '/' || !is_sound())
        return answer_malformed(400);
    const char *expect = message->header("Expect");
    owes_continue = expect && g_ascii_strcasecmp(expect, "100-continue") == 0;
    closes =
        closes || (owes_continue &&
                   !parser->is_done()); // unless it is told to go on, nobody knows whether the body comes after all
    message->got_headers();
}

// What follows in the connection cannot be trusted.
void Connection::answer_malformed(int status)
{
    closes = true;
    message->answer_status = 0;
    message->pauses = 0;
    message->answer_fields.clear();
    message->answer(status);
    begin_answer();
}

// Neither has a body nor tells its length (RFC 9110, 6.4.1).
static bool has_no_length(int status)
{
    return status == 204 || status == 304;
}

void Connection::begin_answer()
{
    Message &answer = *message;
    const auto status = static_cast<unsigned>(answer.answer_status);
    output = output.substr(output_at) + "HTTP/1.1 " + std::to_string(status) + " " +
             std::string(http::obsolete_reason(http::int_to_status(status))) + "\r\nDate: " + http_date_now() +
             "\r\nServer: velora-cloud\r\n";
    for (const Message::Field &field : answer.answer_fields)
        output += field.name + ": " + field.value + "\r\n";
    if (closes)
        output += "Connection: close\r\n";
    if (!has_no_length(answer.answer_status))
        output += "Content-Length: " +
                  std::to_string(answer.is_file ? answer.file_left : static_cast<int64_t>(answer.content.size())) +
                  "\r\n";
    output += "\r\n";
    if (answer.verb == "HEAD" || has_no_length(answer.answer_status)) {
        answer.content.clear();
        answer.file_left = 0;
        answer.file = Fd();
    }
    sent = answer.file_left + static_cast<int64_t>(answer.content.size());
    output += answer.content;
    answer.content.clear();
    output_at = 0;
    move_to(State::WRITING);
    write_some();
}

// Reads the next block of the file into the output; false when it has become shorter than was promised.
bool Connection::refill()
{
    output.resize(static_cast<size_t>(std::min<int64_t>(message->file_left, BLOCK)));
    const ssize_t count = pread(message->file.fd, output.data(), output.size(), message->file_at);
    if (count <= 0)
        return false;
    output.resize(static_cast<size_t>(count));
    output_at = 0;
    message->file_at += count;
    message->file_left -= count;
    return true;
}

void Connection::write_some()
{
    int64_t left = WRITE_AT_MOST;
    while (left > 0) {
        ssize_t count = 0;
        if (output_at < output.size()) {
            count = send(output.data() + output_at, output.size() - output_at);
            output_at += count > 0 ? static_cast<size_t>(count) : 0;
        } else if (state == State::WRITING && message->file_left > 0 && tls) {
            if (!refill())
                return end();
            continue;
        } else if (state == State::WRITING && message->file_left > 0) {
            off_t at = message->file_at;
            count = sendfile(fd, message->file.fd, &at, static_cast<size_t>(std::min(message->file_left, left)));
            if (count == 0)
                return end(); // the file has become shorter: the client is to notice
            message->file_at += std::max<ssize_t>(count, 0);
            message->file_left -= std::max<ssize_t>(count, 0);
        } else {
            return state == State::WRITING ? answer_is_sent() : void();
        }
        if (count < 0 && is_for_later())
            return;
        if (count <= 0)
            return end();
        left -= count;
        still_active();
    }
}

void Connection::answer_is_sent()
{
    const std::shared_ptr<Connection> self = shared_from_this();
    const bool has_more_to_come = !parser->is_done();
    if (server.log) {
        const gint64 milliseconds = (g_get_monotonic_time() - message->begun) / 1000;
        server.log(peer() + " " + message->verb + " " + message->target + " " + std::to_string(message->answer_status) +
                   " " + std::to_string(sent) + " " + std::to_string(milliseconds) + " ms");
    }
    message->connection = nullptr;
    std::exchange(message, nullptr)->ended();
    output.clear();
    output_at = 0;
    parser.reset();
    if (state == State::ENDED)
        return;
    if (!closes && !server.is_stopping)
        return move_to(State::IDLE); // process() goes on with what has come already
    if (!has_more_to_come)
        return end();
    // Closing a connection with unread input would reset it, and the answer could be lost on its way: what arrives is
    // thrown away until the peer has closed or the time is over.
    input.clear();
    move_to(State::LINGERING);
    shutdown(fd, SHUT_WR);
}
