#include "notification/courier.h"
#include "base/base.h"
#include "dlog/dlog.h"
#include <chrono>
#include <condition_variable>
#include <gio/gio.h>
#include <mutex>
#include <thread>
#include <unistd.h>
#include <utility>
#include <vector>

using namespace std::chrono_literals;

namespace {

constexpr auto PACE = 50ms;           // between two messages to the agent
constexpr auto START_AGAIN = 5s;      // between two attempts to start it
constexpr auto LAST_MESSAGES = 500ms; // what the end of the process waits for at most
constexpr int CALL_MILLISECONDS = 1000;
constexpr int STATUS_MILLISECONDS = 3000; // a status message stays

// The session bus by its address. GLib would start one where there is none.
std::string bus_address()
{
    if (const char *address = g_getenv("DBUS_SESSION_BUS_ADDRESS"); address && *address)
        return address;
    const char *runtime = g_getenv("XDG_RUNTIME_DIR");
    const std::string path = runtime ? std::string(runtime) + "/bus" : "";
    return runtime && access(path.c_str(), F_OK) == 0 ? "unix:path=" + path : "";
}

void show_in_log(const std::string &message)
{
    __dlog_print(DLOG_WARN, "NOTIFICATION", "%s", message.c_str());
}

struct State {
    std::mutex lock;
    std::condition_variable wake, idle;
    bool changed = false, busy = false, running = false;
    std::vector<std::string> messages;
};

// It is left behind when the process ends while the bus hangs, so it is never freed.
State &state()
{
    static State *the = new State;
    return *the;
}

class Bus {
  public:
    ~Bus()
    {
        drop();
    }

    bool connected()
    {
        const std::string address = bus_address();
        if (connection && (address != connected_to || g_dbus_connection_is_closed(connection)))
            drop();
        if (!connection && !address.empty()) {
            // Of our own: the shared connection ends the process when the bus goes.
            connection = g_dbus_connection_new_for_address_sync(
                address.c_str(),
                static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                                  G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION),
                nullptr, nullptr, nullptr);
            connected_to = address;
        }
        return connection != nullptr;
    }

    void tell_agent()
    {
        if (!owned(NOTIFICATION_AGENT)) {
            start_agent();
            return;
        }
        g_dbus_connection_call(connection, NOTIFICATION_AGENT, NOTIFICATION_AGENT_PATH, NOTIFICATION_AGENT, "Changed",
                               nullptr, nullptr, G_DBUS_CALL_FLAGS_NO_AUTO_START, -1, nullptr, nullptr, nullptr);
        g_dbus_connection_flush_sync(connection, nullptr, nullptr);
    }

    bool post(const std::string &message)
    {
        GVariantBuilder hints;
        g_variant_builder_init(&hints, G_VARIANT_TYPE_VARDICT);
        g_variant_builder_add(&hints, "{sv}", "transient", g_variant_new_boolean(TRUE));
        char *valid = g_utf8_make_valid(message.c_str(), -1);
        // The text is the summary, which is never read as markup.
        GVariant *reply = g_dbus_connection_call_sync(
            connection, NOTIFICATION_DAEMON, NOTIFICATION_DAEMON_PATH, NOTIFICATION_DAEMON, "Notify",
            g_variant_new("(susss@asa{sv}i)", platform_package(), 0u, "", valid, "", g_variant_new_strv(nullptr, 0),
                          &hints, STATUS_MILLISECONDS),
            G_VARIANT_TYPE("(u)"), G_DBUS_CALL_FLAGS_NONE, CALL_MILLISECONDS, nullptr, nullptr);
        g_free(valid);
        if (reply)
            g_variant_unref(reply);
        return reply != nullptr;
    }

  private:
    GDBusConnection *connection = nullptr;
    std::string connected_to;
    std::chrono::steady_clock::time_point started{};

    void drop()
    {
        if (connection)
            g_object_unref(connection);
        connection = nullptr;
    }

    bool owned(const char *name)
    {
        GVariant *reply = g_dbus_connection_call_sync(connection, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                      "org.freedesktop.DBus", "NameHasOwner",
                                                      g_variant_new("(s)", name), G_VARIANT_TYPE("(b)"),
                                                      G_DBUS_CALL_FLAGS_NONE, CALL_MILLISECONDS, nullptr, nullptr);
        gboolean has = FALSE;
        if (reply) {
            g_variant_get(reply, "(b)", &has);
            g_variant_unref(reply);
        }
        return has;
    }

    // The agent reads the store when it starts, and ends at once when another one has come first.
    void start_agent()
    {
        const auto now = std::chrono::steady_clock::now();
        if (started != decltype(started){} && now - started < START_AGAIN)
            return;
        started = now;
        std::string program = platform_data_file("notification/notification-agent");
        if (program.empty())
            program = INSTALLED_AGENT;
        char *arguments[] = {program.data(), nullptr};
        const auto own_session = [](gpointer) { setsid(); };
        // Its output must not hold a pipe of ours open.
        g_spawn_async("/", arguments, nullptr,
                      static_cast<GSpawnFlags>(G_SPAWN_STDOUT_TO_DEV_NULL | G_SPAWN_STDERR_TO_DEV_NULL), own_session,
                      nullptr, nullptr, nullptr);
    }
};

void work()
{
    State &s = state();
    Bus bus;
    std::unique_lock hold(s.lock);
    for (;;) {
        s.wake.wait(hold, [&s] { return s.changed || !s.messages.empty(); });
        s.busy = true;
        const bool tell = std::exchange(s.changed, false);
        const auto messages = std::exchange(s.messages, {});
        hold.unlock();
        const bool connected = bus.connected();
        for (const std::string &message : messages)
            if (!connected || !bus.post(message))
                show_in_log(message);
        if (tell && connected)
            bus.tell_agent();
        if (tell)
            std::this_thread::sleep_for(PACE);
        hold.lock();
        s.busy = false;
        s.idle.notify_all();
    }
}

// A program may post its result and leave at once.
struct AtExit {
    ~AtExit()
    {
        State &s = state();
        std::unique_lock hold(s.lock);
        s.idle.wait_for(hold, LAST_MESSAGES, [&s] { return !s.busy && !s.changed && s.messages.empty(); });
    }
};

void wake_up(State &s)
{
    static AtExit at_exit;
    if (!s.running)
        std::thread(work).detach();
    s.running = true;
    s.wake.notify_one();
}

} // namespace

void courier_changed()
{
    if (bus_address().empty())
        return;
    State &s = state();
    const std::lock_guard hold(s.lock);
    s.changed = true;
    wake_up(s);
}

void courier_post(const char *message)
{
    if (bus_address().empty()) {
        show_in_log(message);
        return;
    }
    State &s = state();
    const std::lock_guard hold(s.lock);
    s.messages.emplace_back(message);
    wake_up(s);
}
