// Certificates to trust instead of the system's: the engine knows the system's only, and single ones that it is given.
#include "trust.h"
#include "view.h"

namespace {
struct Asked {
    Ref<GTlsDatabase> authorities;
    Ref<GCancellable> cancellable;
    TrustFunction done;
    void *data;
};

void connected(GObject *client, GAsyncResult *result, gpointer data)
{
    const std::unique_ptr<Asked> asked(static_cast<Asked *>(data));
    GError *error = nullptr;
    const Ref<GSocketConnection> connection(
        g_socket_client_connect_to_host_finish(G_SOCKET_CLIENT(client), result, &error));
    if (g_cancellable_is_cancelled(asked->cancellable.get())) {
        g_clear_error(&error);
        asked->done(Trust::cancelled, nullptr, "cancelled", asked->data);
        return;
    }
    if (!connection) {
        const bool is_bad = g_error_matches(error, G_TLS_ERROR, G_TLS_ERROR_BAD_CERTIFICATE);
        asked->done(is_bad ? Trust::bad : Trust::unreachable, nullptr, error->message, asked->data);
        g_error_free(error);
        return;
    }
    GIOStream *stream = g_tcp_wrapper_connection_get_base_io_stream(G_TCP_WRAPPER_CONNECTION(connection.get()));
    asked->done(Trust::good, g_tls_connection_get_peer_certificate(G_TLS_CONNECTION(stream)), "", asked->data);
}
} // namespace

void trust_ask(const Origin &origin, const std::string &ca_file, GCancellable *cancellable, TrustFunction done,
               void *data)
{
    auto *asked = new Asked{Ref<GTlsDatabase>(g_tls_file_database_new(ca_file.c_str(), nullptr)),
                            Ref<GCancellable>(G_CANCELLABLE(g_object_ref(cancellable))), done, data};
    if (!asked->authorities)
        log_error("no certificates in %s", ca_file.c_str());
    const Ref<GSocketClient> client(g_socket_client_new());
    g_socket_client_set_tls(client.get(), TRUE);
    g_socket_client_set_timeout(client.get(), 60);
    g_signal_connect_data(
        client.get(), "event",
        G_CALLBACK(+[](GSocketClient *, GSocketClientEvent event, GSocketConnectable *, GIOStream *connection,
                       gpointer authorities) {
            // without a database nothing is trusted
            if (event == G_SOCKET_CLIENT_TLS_HANDSHAKING)
                g_tls_connection_set_database(G_TLS_CONNECTION(connection), static_cast<GTlsDatabase *>(authorities));
        }),
        asked->authorities ? g_object_ref(asked->authorities.get()) : nullptr,
        [](gpointer authorities, GClosure *) { g_clear_object(&authorities); }, GConnectFlags{});
    g_socket_client_connect_to_host_async(client.get(), origin.host.c_str(), static_cast<guint16>(origin.port),
                                          cancellable, connected, asked);
}

bool trust_check(GTlsCertificate *certificate, const Origin &origin, const std::string &ca_file)
{
    const Ref<GTlsDatabase> authorities(g_tls_file_database_new(ca_file.c_str(), nullptr));
    if (!authorities)
        return false;
    const Ref<GSocketConnectable> identity(
        g_network_address_new(origin.host.c_str(), static_cast<guint16>(origin.port)));
    return g_tls_database_verify_chain(authorities.get(), certificate, G_TLS_DATABASE_PURPOSE_AUTHENTICATE_SERVER,
                                       identity.get(), nullptr, G_TLS_DATABASE_VERIFY_NONE, nullptr, nullptr) == 0;
}
