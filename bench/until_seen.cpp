// Waits until the application shows all the texts, asking it over the session bus (com.orvant.Inspect, which is there
// when ORVANT_INSPECT is set), and prints its process id and the monotonic time in seconds. Prints "ready" before.
//
// usage: until_seen BUS_NAME TEXT...
#include <cstdio>
#include <gio/gio.h>
#include <set>
#include <string>

namespace {
constexpr gint64 LIMIT = 30 * G_USEC_PER_SEC;
constexpr gulong PAUSE = 4000; // microseconds

GVariant *ask(GDBusConnection *bus, const char *name, const char *path, const char *interface, const char *method,
              GVariant *arguments)
{
    return g_dbus_connection_call_sync(bus, name, path, interface, method, arguments, nullptr,
                                       G_DBUS_CALL_FLAGS_NO_AUTO_START, 20000, nullptr, nullptr);
}

bool is_shown(GDBusConnection *bus, const char *name, std::set<std::string> texts)
{
    GVariant *shown = ask(bus, name, "/com/orvant/Inspect", "com.orvant.Inspect", "Visible", nullptr);
    if (!shown)
        return false;
    GVariantIter *entries = nullptr;
    const char *text = nullptr;
    g_variant_get(shown, "(a(ssiiii))", &entries);
    while (g_variant_iter_next(entries, "(&s&siiii)", nullptr, &text, nullptr, nullptr, nullptr, nullptr))
        texts.erase(text);
    g_variant_iter_free(entries);
    g_variant_unref(shown);
    return texts.empty();
}
} // namespace

int main(int argc, char **argv)
{
    GDBusConnection *bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
    if (argc < 3 || !bus) {
        std::fprintf(stderr, "usage: until_seen BUS_NAME TEXT..., with a session bus\n");
        return 2;
    }
    std::puts("ready");
    std::fflush(stdout);
    const gint64 end = g_get_monotonic_time() + LIMIT;
    while (!is_shown(bus, argv[1], {argv + 2, argv + argc})) {
        if (g_get_monotonic_time() > end)
            return 1;
        g_usleep(PAUSE);
    }
    const double seconds = static_cast<double>(g_get_monotonic_time()) / G_USEC_PER_SEC;
    guint32 pid = 0;
    GVariant *found = ask(bus, "org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus",
                          "GetConnectionUnixProcessID", g_variant_new("(s)", argv[1]));
    if (found) {
        g_variant_get(found, "(u)", &pid);
        g_variant_unref(found);
    }
    std::printf("%u %.6f\n", pid, seconds);
    g_object_unref(bus);
    return pid ? 0 : 1;
}
