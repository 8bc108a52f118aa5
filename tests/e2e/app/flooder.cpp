// Floods an application with launch requests, for measures: `flooder APP COUNT PATHS [OPERATION]` sends COUNT requests
// of PATHS paths each, as fast as the bus takes them, and asks the application something every 20 ms meanwhile, on
// another connection: on its bus thread (Ping) and on its main loop (com.orvant.Inspect.Keys, $ORVANT_INSPECT). One
// line says what became of the requests within three seconds of the last one, and how long the longest answers took.
#include <algorithm>
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <gio/gio.h>
#include <string>
#include <thread>

static std::atomic<int> s_refused, s_answered, s_failed, s_left;
static std::atomic<bool> s_over;

static GDBusConnection *own_connection()
{
    g_autofree char *address = g_dbus_address_get_for_bus_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
    constexpr auto flags = static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                                             G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION);
    return g_dbus_connection_new_for_address_sync(address, flags, nullptr, nullptr, nullptr);
}

static void ask(const char *app, const char *path, const char *interface, const char *method, double *longest)
{
    GDBusConnection *bus = own_connection();
    while (!s_over) {
        const gint64 begun = g_get_monotonic_time();
        GError *error = nullptr;
        GVariant *answer = g_dbus_connection_call_sync(bus, app, path, interface, method, nullptr, nullptr,
                                                       G_DBUS_CALL_FLAGS_NO_AUTO_START, 120'000, nullptr, &error);
        if (!answer)
            std::fprintf(stderr, "%s: %s\n", method, error->message);
        g_clear_error(&error);
        g_clear_pointer(&answer, g_variant_unref);
        *longest = std::max(*longest, static_cast<double>(g_get_monotonic_time() - begun) / 1000);
        g_usleep(20'000);
    }
    g_object_unref(bus);
}

static void called(GObject *bus, GAsyncResult *outcome, gpointer)
{
    GError *error = nullptr;
    GVariant *answer = g_dbus_connection_call_finish(G_DBUS_CONNECTION(bus), outcome, &error);
    if (answer)
        s_answered++;
    else if (g_error_matches(error, G_DBUS_ERROR, G_DBUS_ERROR_LIMITS_EXCEEDED))
        s_refused++;
    else if (s_failed++ == 0)
        std::fprintf(stderr, "Launch: %s\n", error->message);
    s_left--;
    g_clear_pointer(&answer, g_variant_unref);
    g_clear_error(&error);
}

static GVariant *request(const char *operation, int paths, int number)
{
    GVariantBuilder values, extra, record;
    g_variant_builder_init(&values, G_VARIANT_TYPE_BYTESTRING_ARRAY);
    for (int i = 0; i < paths; i++)
        g_variant_builder_add_value(&values,
                                    g_variant_new_bytestring(("/home/somebody/Pictures/2026/" + std::to_string(number) +
                                                              "/IMG_" + std::to_string(i) + ".jpg")
                                                                 .c_str()));
    g_variant_builder_init(&extra, G_VARIANT_TYPE("a(aybaay)"));
    g_variant_builder_add(&extra, "(^aybaay)", "http://orvant.com/appcontrol/data/path", TRUE, &values);
    g_variant_builder_init(&record, G_VARIANT_TYPE_VARDICT);
    const std::string whole = std::string("http://orvant.com/appcontrol/operation/") + operation;
    g_variant_builder_add(&record, "{sv}", "operation", g_variant_new_bytestring(whole.c_str()));
    g_variant_builder_add(&record, "{sv}", "extra", g_variant_builder_end(&extra));
    return g_variant_new("(@a{sv})", g_variant_builder_end(&record));
}

int main(int argc, char **argv)
{
    if (argc < 4)
        return 2;
    const std::string app = argv[1];
    std::string path = "/" + app;
    std::ranges::replace(path, '.', '/');
    const int count = std::atoi(argv[2]), paths = std::atoi(argv[3]);
    GDBusConnection *bus = own_connection();
    if (!bus)
        return 1;
    double daemon = 0, ping = 0, loop = 0;
    std::thread idler(ask, "org.freedesktop.DBus", "/", "org.freedesktop.DBus.Peer", "Ping", &daemon);
    std::thread pinger(ask, argv[1], "/", "org.freedesktop.DBus.Peer", "Ping", &ping);
    std::thread looper(ask, argv[1], "/com/orvant/Inspect", "com.orvant.Inspect", "Keys", &loop);
    g_usleep(200'000);
    const gint64 begun = g_get_monotonic_time();
    for (int i = 0; i < count; i++) {
        s_left++;
        g_dbus_connection_call(bus, argv[1], path.c_str(), "com.orvant.AppControl", "Launch",
                               request(argc > 4 ? argv[4] : "multi_share", paths, i), nullptr,
                               G_DBUS_CALL_FLAGS_NO_AUTO_START, G_MAXINT, nullptr, called, nullptr);
        while (g_main_context_iteration(nullptr, FALSE))
            ;
    }
    const double sent = static_cast<double>(g_get_monotonic_time() - begun) / 1e6;
    const gint64 end = g_get_monotonic_time() + 3'000'000;
    g_timeout_add(
        50, [](gpointer) -> gboolean { return G_SOURCE_CONTINUE; }, nullptr);
    while (s_left > 0 && g_get_monotonic_time() < end)
        g_main_context_iteration(nullptr, TRUE);
    s_over = true;
    idler.join();
    pinger.join();
    looper.join();
    std::printf("answered %d, refused %d, failed %d, waiting %d; sent in %.1f s; longest answers: the bus %.0f ms, bus "
                "thread %.0f ms, main loop %.0f ms\n",
                s_answered.load(), s_refused.load(), s_failed.load(), s_left.load(), sent, daemon, ping, loop);
    return 0;
}
