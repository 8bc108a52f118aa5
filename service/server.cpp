#include "server.h"
#include "connection.h"
#include <cerrno>
#include <glib-unix.h>
#include <sys/resource.h>
#include <sys/socket.h>

// Descriptors that requests need besides those of the connections.
static const size_t DESCRIPTORS_KEPT = 128;

Server::~Server()
{
    stop();
    while (!connections.empty())
        connections.front()->end();
    if (sweeper)
        g_source_remove(sweeper);
    g_clear_object(&certificate);
}

bool Server::listen(GSocketAddress *address, GTlsCertificate *tls_certificate, GError **error)
{
    socket = g_socket_new(g_socket_address_get_family(address), G_SOCKET_TYPE_STREAM, G_SOCKET_PROTOCOL_TCP, error);
    if (!socket || !g_socket_bind(socket, address, TRUE, error))
        return false;
    g_socket_set_blocking(socket, FALSE);
    g_socket_set_listen_backlog(socket, SOMAXCONN); // the system lowers it to its own bound
    if (!g_socket_listen(socket, error))
        return false;
    if (tls_certificate)
        certificate = G_TLS_CERTIFICATE(g_object_ref(tls_certificate));
    struct rlimit files;
    most = getrlimit(RLIMIT_NOFILE, &files) == 0 && files.rlim_cur > 2 * DESCRIPTORS_KEPT
               ? static_cast<size_t>(files.rlim_cur) - DESCRIPTORS_KEPT
               : DESCRIPTORS_KEPT;
    const auto ready = +[](gint, GIOCondition, gpointer data) -> gboolean {
        static_cast<Server *>(data)->accept();
        return G_SOURCE_CONTINUE;
    };
    accepting = g_unix_fd_add(g_socket_get_fd(socket), G_IO_IN, ready, this);
    sweeper = g_timeout_add_seconds(
        1,
        [](gpointer data) -> gboolean {
            static_cast<Server *>(data)->sweep();
            return G_SOURCE_CONTINUE;
        },
        this);
    return true;
}

std::string Server::address() const
{
    GSocketAddress *local = g_socket_get_local_address(socket, nullptr);
    char *text = g_socket_connectable_to_string(G_SOCKET_CONNECTABLE(local));
    const std::string url = std::string(certificate ? "https://" : "http://") + text + "/";
    g_free(text);
    g_object_unref(local);
    return url;
}

// Ends the connection that has done nothing for the longest time; false when all are at work.
bool Server::make_room()
{
    Connection *oldest = nullptr;
    for (const auto &connection : connections)
        if (connection->is_idle() && (!oldest || connection->deadline() < oldest->deadline()))
            oldest = connection.get();
    if (oldest)
        oldest->end();
    return oldest;
}

void Server::pause_accepting()
{
    g_source_remove(std::exchange(accepting, 0));
    resume_timer = g_timeout_add(
        100,
        [](gpointer data) -> gboolean {
            auto *self = static_cast<Server *>(data);
            self->resume_timer = 0;
            self->accepting = g_unix_fd_add(
                g_socket_get_fd(self->socket), G_IO_IN,
                [](gint, GIOCondition, gpointer server) -> gboolean {
                    static_cast<Server *>(server)->accept();
                    return G_SOURCE_CONTINUE;
                },
                self);
            return G_SOURCE_REMOVE;
        },
        this);
}

void Server::accept()
{
    // A few at a time: who is connected already has a turn in between.
    for (int i = 0; i < 16; i++) {
        if (connections.size() >= most && !make_room())
            return pause_accepting();
        const int fd = accept4(g_socket_get_fd(socket), nullptr, nullptr, SOCK_NONBLOCK | SOCK_CLOEXEC);
        if (fd >= 0) {
            connections.push_front(std::make_shared<Connection>(*this, fd, certificate));
            connections.front()->place = connections.begin();
            connections.front()->begin();
            continue;
        }
        if (errno == EINTR || errno == ECONNABORTED)
            continue;
        const bool is_out_of_descriptors = errno == EMFILE || errno == ENFILE || errno == ENOBUFS || errno == ENOMEM;
        if (is_out_of_descriptors && !make_room())
            pause_accepting();
        return;
    }
}

void Server::sweep()
{
    const gint64 now = g_get_monotonic_time();
    for (auto next = connections.begin(); next != connections.end();) {
        const std::shared_ptr<Connection> connection = *next++;
        if (connection->deadline() && connection->deadline() < now)
            connection->end();
    }
}

void Server::stop()
{
    is_stopping = true;
    for (guint *source : {&accepting, &resume_timer})
        if (*source)
            g_source_remove(std::exchange(*source, 0));
    g_clear_object(&socket);
    for (auto next = connections.begin(); next != connections.end();) {
        const std::shared_ptr<Connection> connection = *next++;
        if (connection->is_idle())
            connection->end();
    }
}

void Server::end_stalled(int seconds)
{
    const gint64 limit = g_get_monotonic_time() - seconds * G_USEC_PER_SEC;
    for (auto next = connections.begin(); next != connections.end();) {
        const std::shared_ptr<Connection> connection = *next++;
        if (connection->last_activity() < limit && !connection->is_handling())
            connection->end();
    }
}
