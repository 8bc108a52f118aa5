#include "bus.h"

PrivateBus::PrivateBus(const char *variable) : bus(g_test_dbus_new(G_TEST_DBUS_NONE)), name(variable)
{
    g_test_dbus_up(bus);
    g_unsetenv("DBUS_SESSION_BUS_ADDRESS");
    g_setenv(variable, g_test_dbus_get_bus_address(bus), TRUE);
}

PrivateBus::~PrivateBus()
{
    g_unsetenv(name.c_str());
    g_test_dbus_stop(bus);
    g_object_unref(bus);
}

GDBusConnection *PrivateBus::connect() const
{
    return g_dbus_connection_new_for_address_sync(
        g_test_dbus_get_bus_address(bus),
        static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                          G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION),
        nullptr, nullptr, nullptr);
}

Program::Program(const PrivateBus &bus, const char *name, const char *path, const char *introspection, Answer answer)
    : connection(bus.connect()), object(path), answer_call(std::move(answer))
{
    GDBusNodeInfo *node = g_dbus_node_info_new_for_xml(introspection, nullptr);
    static const GDBusInterfaceVTable table = {called, nullptr, nullptr, {}};
    for (GDBusInterfaceInfo **info = node->interfaces; *info; info++)
        registrations.push_back(
            g_dbus_connection_register_object(connection, path, *info, &table, this, nullptr, nullptr));
    g_dbus_node_info_unref(node);
    g_variant_unref(g_dbus_connection_call_sync(connection, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                "org.freedesktop.DBus", "RequestName", g_variant_new("(su)", name, 4u),
                                                nullptr, G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr));
}

Program::~Program()
{
    for (const guint registration : registrations) // a call may lie in the main context already
        g_dbus_connection_unregister_object(connection, registration);
    g_dbus_connection_close_sync(connection, nullptr, nullptr);
    g_object_unref(connection);
}

void Program::emit(const char *interface, const char *signal, GVariant *arguments)
{
    g_dbus_connection_emit_signal(connection, nullptr, object.c_str(), interface, signal, arguments, nullptr);
}

void Program::called(GDBusConnection *, const char *, const char *, const char *, const char *method,
                     GVariant *arguments, GDBusMethodInvocation *invocation, gpointer self)
{
    const std::string answer = static_cast<Program *>(self)->answer_call(method, arguments);
    g_dbus_method_invocation_return_value(invocation, g_variant_new_parsed(answer.c_str()));
}

bool run_until(const std::function<bool()> &condition, int seconds)
{
    const gint64 limit = g_get_monotonic_time() + seconds * G_USEC_PER_SEC;
    const guint tick = g_timeout_add(
        20, [](gpointer) -> gboolean { return G_SOURCE_CONTINUE; }, nullptr);
    while (!condition() && g_get_monotonic_time() < limit)
        g_main_context_iteration(nullptr, TRUE);
    g_source_remove(tick);
    return condition();
}
