#pragma once
// An HTTP server that says what a test tells it to, whole or broken.
#include <algorithm>
#include <atomic>
#include <functional>
#include <gio/gio.h>
#include <mutex>
#include <string>
#include <vector>

struct Request {
    std::string method, path, body, authorization;
    int connection; // counts from 1
};

class ScriptedServer {
  public:
    // Gives the whole answer, header and body; "" closes the connection without one. "\x01" at the end of an answer
    // closes the connection after it.
    using Script = std::function<std::string(const Request &)>;

    explicit ScriptedServer(Script answers) : script(std::move(answers))
    {
        service = g_threaded_socket_service_new(8);
        GSocketAddress *address = g_inet_socket_address_new_from_string("127.0.0.1", 0);
        GSocketAddress *bound = nullptr;
        g_socket_listener_add_address(G_SOCKET_LISTENER(service), address, G_SOCKET_TYPE_STREAM, G_SOCKET_PROTOCOL_TCP,
                                      nullptr, &bound, nullptr);
        port = g_inet_socket_address_get_port(G_INET_SOCKET_ADDRESS(bound));
        g_object_unref(address);
        g_object_unref(bound);
        g_signal_connect(service, "run", G_CALLBACK(run), this);
        g_socket_service_start(service);
        loop = g_main_loop_new(nullptr, FALSE);
        thread = g_thread_new(
            "server", [](void *data) -> void * { return g_main_loop_run(static_cast<GMainLoop *>(data)), nullptr; },
            loop);
    }
    // To be called when no client holds a connection any more.
    ~ScriptedServer()
    {
        g_socket_service_stop(service);
        g_socket_listener_close(G_SOCKET_LISTENER(service));
        while (open_connections > 0)
            g_usleep(1000);
        g_main_loop_quit(loop);
        g_thread_join(thread);
        g_main_loop_unref(loop);
        g_object_unref(service);
    }
    ScriptedServer(const ScriptedServer &) = delete;
    ScriptedServer &operator=(const ScriptedServer &) = delete;

    std::string url() const
    {
        return "http://127.0.0.1:" + std::to_string(port);
    }
    // "PUT /x", "PROPFIND /x", ...
    std::vector<std::string> log()
    {
        std::scoped_lock lock(mutex);
        return lines;
    }
    std::vector<Request> requests;

  private:
    static std::string field(const std::string &head, const char *name)
    {
        const size_t at = head.find(std::string("\r\n") + name + ": ");
        if (at == head.npos)
            return "";
        const size_t begin = at + std::string(name).size() + 4;
        return head.substr(begin, head.find("\r\n", begin) - begin);
    }

    static gboolean run(GThreadedSocketService *, GSocketConnection *connection, GObject *, gpointer data)
    {
        auto *self = static_cast<ScriptedServer *>(data);
        self->open_connections++;
        const int number = ++self->connections;
        GInputStream *in = g_io_stream_get_input_stream(G_IO_STREAM(connection));
        GOutputStream *out = g_io_stream_get_output_stream(G_IO_STREAM(connection));
        std::string bytes;
        char buffer[65536];
        const auto more = [&] {
            const gssize got = g_input_stream_read(in, buffer, sizeof buffer, nullptr, nullptr);
            if (got > 0)
                bytes.append(buffer, static_cast<size_t>(got));
            return got > 0;
        };
        for (bool goes_on = true; goes_on;) {
            size_t end = bytes.npos;
            while (goes_on && (end = bytes.find("\r\n\r\n")) == bytes.npos)
                goes_on = more();
            if (!goes_on)
                break;
            const std::string head = bytes.substr(0, end + 2);
            const auto length =
                static_cast<size_t>(g_ascii_strtoull(field(head, "Content-Length").c_str(), nullptr, 10));
            while (goes_on && bytes.size() < end + 4 + length)
                goes_on = more();
            Request request;
            request.method = head.substr(0, head.find(' '));
            request.path = head.substr(request.method.size() + 1);
            request.path.resize(request.path.find(' '));
            request.body = bytes.substr(end + 4, length);
            request.authorization = field(head, "Authorization");
            request.connection = number;
            bytes.erase(0, std::min(bytes.size(), end + 4 + length));
            {
                std::scoped_lock lock(self->mutex);
                self->lines.push_back(request.method + " " + request.path);
                self->requests.push_back(request);
            }
            std::string answer = self->script(request);
            goes_on = goes_on && !answer.empty() && answer.back() != '\x01';
            if (!answer.empty() && answer.back() == '\x01')
                answer.pop_back();
            goes_on =
                g_output_stream_write_all(out, answer.data(), answer.size(), nullptr, nullptr, nullptr) && goes_on;
        }
        g_io_stream_close(G_IO_STREAM(connection), nullptr, nullptr);
        self->open_connections--;
        return TRUE;
    }

    Script script;
    GSocketService *service;
    GMainLoop *loop;
    GThread *thread;
    guint16 port;
    std::atomic<int> connections = 0, open_connections = 0;
    std::mutex mutex;
    std::vector<std::string> lines;
};

inline std::string answer(const std::string &status, const std::string &body = "", const std::string &fields = "")
{
    return "HTTP/1.1 " + status + "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n" + fields + "\r\n" +
           body;
}
