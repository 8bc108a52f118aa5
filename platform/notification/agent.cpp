// notification-agent: shows the notifications of the store at the session's notification daemon and acts on taps, also
// when the program that posted one has left. It ends when nothing is left to show, or with the bus.
#include "app/target.h"
#include "base/base.h"
#include "notification/courier.h"
#include "notification/tap.h"
#include <algorithm>
#include <gio/gio.h>
#include <map>
#include <unistd.h>
#include <utility>
#include <vector>

namespace {

constexpr gint64 PACE = 100 * 1000;       // microseconds between two updates of one notification
constexpr guint ORPHAN_LOOK = 1000;       // milliseconds; nobody tells that the poster of an ongoing one has died
constexpr guint STORE_LOOK = 5000;        // the same with none of those, where the store's file cannot be watched
constexpr int WATCH_MILLISECONDS = 200;   // between two looks at a file that changes all the time
constexpr guint QUIT_MILLISECONDS = 1000; // with nothing to show
constexpr int CALL_MILLISECONDS = 5000;

struct Shown {
    guint32 daemon_id = 0; // 0 until the daemon has answered
    bool asked = false;    // a Notify is under way
    bool wanted = true;    // still in the store
    gint64 sent_at = 0;
    std::string sent; // what the daemon was told
};

enum class Event { tap, expired, dismissed };

struct DaemonSignal {
    guint32 daemon_id;
    Event event;
};

struct Agent {
    GMainLoop *loop = nullptr;
    GDBusConnection *bus = nullptr;
    bool daemon = false, markup = false, actions = false;
    std::map<int, Shown> shown; // by private id
    long long version = -1;
    guint sync_timer = 0, quit_timer = 0, look_timer = 0, look_pace = 0;
    std::vector<DaemonSignal> early; // about ids that an answer under way will name
};

Agent agent;

void sync_store();
void take_signal(const DaemonSignal &signal);

void sync_after(gint64 microseconds)
{
    if (agent.sync_timer)
        return;
    agent.sync_timer = g_timeout_add(
        static_cast<guint>(microseconds / 1000 + 1),
        [](gpointer) -> gboolean {
            agent.sync_timer = 0;
            sync_store();
            return G_SOURCE_REMOVE;
        },
        nullptr);
}

void call_daemon(const char *method, GVariant *arguments, GAsyncReadyCallback answered, gpointer data)
{
    g_dbus_connection_call(agent.bus, NOTIFICATION_DAEMON, NOTIFICATION_DAEMON_PATH, NOTIFICATION_DAEMON, method,
                           arguments, nullptr, G_DBUS_CALL_FLAGS_NONE, CALL_MILLISECONDS, nullptr, answered, data);
}

// A text that D-Bus takes, markup escaped when the daemon reads markup.
std::string body_text(const std::string &text)
{
    char *valid = g_utf8_make_valid(text.c_str(), static_cast<gssize>(text.size()));
    char *escaped = agent.markup ? g_markup_escape_text(valid, -1) : g_strdup(valid);
    std::string result = escaped;
    g_free(escaped);
    g_free(valid);
    return result;
}

std::string body(const notification_s &noti)
{
    std::string text;
    for (const int type :
         {NOTIFICATION_TEXT_TYPE_CONTENT, NOTIFICATION_TEXT_TYPE_INFO_1, NOTIFICATION_TEXT_TYPE_INFO_SUB_2}) {
        const auto &part = noti.texts[text_index(type)];
        // The first line of information often says what the content says.
        if (!part || part->empty() ||
            (type == NOTIFICATION_TEXT_TYPE_INFO_1 && part == noti.texts[text_index(NOTIFICATION_TEXT_TYPE_CONTENT)]))
            continue;
        text += text.empty() ? "" : "\n";
        text += body_text(*part);
    }
    return text;
}

std::string app_name(const std::string &package)
{
    const AppInfo info = desktop_entry(package);
    return info ? g_app_info_get_name(info.get()) : package;
}

// The arguments of Notify, as desktop notifications 1.2 have them.
GVariant *notify_arguments(const notification_s &noti, guint32 replaces)
{
    const bool ongoing = noti.type == NOTIFICATION_TYPE_ONGOING;
    GVariantBuilder hints;
    g_variant_builder_init(&hints, G_VARIANT_TYPE_VARDICT);
    const auto add = [&hints](const char *name, GVariant *value) {
        g_variant_builder_add(&hints, "{sv}", name, value);
    };
    add("desktop-entry", g_variant_new_string(noti.package.c_str()));
    add("urgency", g_variant_new_byte(ongoing ? 0 : 1));
    if (ongoing || (noti.flags & NOTIFICATION_PROP_DISABLE_AUTO_DELETE))
        add("resident", g_variant_new_boolean(TRUE));
    if (noti.layout == NOTIFICATION_LY_ONGOING_PROGRESS)
        add("value", g_variant_new_int32(static_cast<int>(noti.progress * 100.0 + 0.5)));
    const auto &icon = noti.images[NOTIFICATION_IMAGE_TYPE_ICON];
    if (icon && access(icon->c_str(), R_OK) == 0)
        if (char *uri = g_filename_to_uri(icon->c_str(), nullptr, nullptr))
            add("image-path", g_variant_new_take_string(uri));

    const char *default_action[] = {"default", ""};
    const auto &title = noti.texts[text_index(NOTIFICATION_TEXT_TYPE_TITLE)];
    char *summary = g_utf8_make_valid(title ? title->c_str() : "", -1);
    GVariant *arguments = g_variant_new(
        "(susss@asa{sv}i)", app_name(noti.package).c_str(), replaces, "", summary, body(noti).c_str(),
        g_variant_new_strv(default_action, noti.launch && agent.actions ? 2 : 0), &hints, ongoing ? 0 : -1);
    g_free(summary);
    return arguments;
}

void notify_answered(GObject *bus, GAsyncResult *outcome, gpointer data)
{
    GVariant *reply = g_dbus_connection_call_finish(G_DBUS_CONNECTION(bus), outcome, nullptr);
    const auto found = agent.shown.find(GPOINTER_TO_INT(data));
    if (found != agent.shown.end()) {
        found->second.asked = false;
        if (reply && g_variant_is_of_type(reply, G_VARIANT_TYPE("(u)")))
            g_variant_get(reply, "(u)", &found->second.daemon_id);
    }
    if (reply)
        g_variant_unref(reply);
    for (const DaemonSignal &signal : std::exchange(agent.early, {}))
        take_signal(signal);
    sync_store();
}

void show(const notification_s &noti)
{
    Shown &shown = agent.shown[noti.id];
    shown.wanted = true;
    if (shown.asked)
        return; // its answer makes us look again
    GVariant *looks = g_variant_ref_sink(notify_arguments(noti, 0));
    char *print = g_variant_print(looks, FALSE);
    g_variant_unref(looks);
    const std::string text = print;
    g_free(print);
    if (text == shown.sent)
        return;
    const gint64 now = g_get_monotonic_time();
    if (shown.sent_at && now - shown.sent_at < PACE) {
        sync_after(PACE - (now - shown.sent_at));
        return;
    }
    shown.asked = true;
    shown.sent = text;
    shown.sent_at = now;
    call_daemon("Notify", notify_arguments(noti, shown.daemon_id), notify_answered, GINT_TO_POINTER(noti.id));
}

gboolean nothing_left(gpointer)
{
    agent.quit_timer = 0;
    g_main_loop_quit(agent.loop);
    return G_SOURCE_REMOVE;
}

gboolean look(gpointer)
{
    if (store_forget_orphans() || store_version() != agent.version)
        sync_store();
    return G_SOURCE_CONTINUE;
}

void look_every(guint milliseconds)
{
    if (agent.look_pace == milliseconds)
        return;
    if (agent.look_timer)
        g_source_remove(agent.look_timer);
    agent.look_pace = milliseconds;
    agent.look_timer = g_timeout_add(milliseconds, look, nullptr);
}

// A program may change the store and die before it tells us. Every change goes through the log of SQLite's WAL mode.
GFileMonitor *watch_store()
{
    GFile *log = g_file_new_for_path((platform_data_dir() + "/notifications.db-wal").c_str());
    GFileMonitor *monitor = g_file_monitor_file(log, G_FILE_MONITOR_NONE, nullptr, nullptr);
    g_object_unref(log);
    if (!monitor)
        return nullptr;
    g_file_monitor_set_rate_limit(monitor, WATCH_MILLISECONDS);
    g_signal_connect_swapped(monitor, "changed", G_CALLBACK(look), nullptr);
    return monitor;
}

bool is_for_daemon(const notification_s &noti)
{
    return !noti.closed && (noti.places & NOTIFICATION_DISPLAY_APP_NOTIFICATION_TRAY);
}

// Brings what the daemon shows in line with the store.
void sync_store()
{
    agent.version = store_version();
    for (auto &[id, shown] : agent.shown)
        shown.wanted = false;
    bool any = false, ongoing = false;
    for (const notification_s &noti : store_list(nullptr)) {
        if (!is_for_daemon(noti))
            continue;
        any = true;
        ongoing = ongoing || noti.type == NOTIFICATION_TYPE_ONGOING;
        if (agent.daemon)
            show(noti);
    }
    for (auto it = agent.shown.begin(); it != agent.shown.end();) {
        const Shown &shown = it->second;
        if (shown.wanted || shown.asked) {
            ++it;
            any = true;
            continue;
        }
        if (shown.daemon_id && agent.daemon)
            call_daemon("CloseNotification", g_variant_new("(u)", shown.daemon_id), nullptr, nullptr);
        it = agent.shown.erase(it);
    }
    look_every(ongoing ? ORPHAN_LOOK : STORE_LOOK);
    if (any && agent.quit_timer) {
        g_source_remove(agent.quit_timer);
        agent.quit_timer = 0;
    } else if (!any && !agent.quit_timer) {
        agent.quit_timer = g_timeout_add(QUIT_MILLISECONDS, nothing_left, nullptr);
    }
}

// The private id of a notification that the daemon knows as `daemon_id`, or 0.
int private_id(guint32 daemon_id)
{
    for (const auto &[id, shown] : agent.shown)
        if (shown.daemon_id == daemon_id)
            return id;
    return 0;
}

// A signal may overtake the answer to Notify that names its id; then it waits for that answer.
void take_signal(const DaemonSignal &signal)
{
    const int id = private_id(signal.daemon_id);
    if (!id) {
        const auto asked = [](const auto &entry) { return entry.second.asked; };
        if (std::any_of(agent.shown.begin(), agent.shown.end(), asked))
            agent.early.push_back(signal);
        return;
    }
    const auto noti = store_list(nullptr, id);
    if (noti.empty())
        return;
    bool failed = false;
    if (signal.event == Event::tap) {
        tap(noti.front());
        return;
    }
    agent.shown.erase(id);
    if (signal.event == Event::dismissed && noti.front().type == NOTIFICATION_TYPE_NOTI)
        store_delete(noti.front().package, id, failed);
    else
        store_set_closed(id);
}

void daemon_signal(GDBusConnection *, const char *, const char *, const char *, const char *name, GVariant *parameters,
                   gpointer)
{
    enum { DISMISSED = 2, CLOSED_BY_US = 3 };
    guint32 daemon_id = 0, reason = 0;
    const char *action = "";
    if (g_str_equal(name, "ActionInvoked") && g_variant_is_of_type(parameters, G_VARIANT_TYPE("(us)"))) {
        g_variant_get(parameters, "(u&s)", &daemon_id, &action);
        if (g_str_equal(action, "default"))
            take_signal({daemon_id, Event::tap});
    } else if (g_str_equal(name, "NotificationClosed") && g_variant_is_of_type(parameters, G_VARIANT_TYPE("(uu)"))) {
        g_variant_get(parameters, "(uu)", &daemon_id, &reason);
        if (reason != CLOSED_BY_US)
            take_signal({daemon_id, reason == DISMISSED ? Event::dismissed : Event::expired});
    }
    sync_store();
}

void capabilities_answered(GObject *bus, GAsyncResult *outcome, gpointer)
{
    GVariant *reply = g_dbus_connection_call_finish(G_DBUS_CONNECTION(bus), outcome, nullptr);
    agent.markup = agent.actions = false;
    if (reply && g_variant_is_of_type(reply, G_VARIANT_TYPE("(as)"))) {
        const char **names = nullptr;
        g_variant_get(reply, "(^a&s)", &names);
        agent.markup = g_strv_contains(names, "body-markup");
        agent.actions = g_strv_contains(names, "actions");
        g_free(names);
    }
    if (reply)
        g_variant_unref(reply);
    agent.daemon = true;
    sync_store();
}

void daemon_appeared(GDBusConnection *, const char *, const char *, gpointer)
{
    call_daemon("GetCapabilities", nullptr, capabilities_answered, nullptr);
}

void daemon_vanished(GDBusConnection *, const char *, gpointer)
{
    agent.daemon = false;
    std::erase_if(agent.shown, [](const auto &entry) { return !entry.second.asked; });
    for (auto &[id, shown] : agent.shown)
        shown = Shown{0, true, true, 0, {}};
}

void called(GDBusConnection *, const char *, const char *, const char *, const char *, GVariant *,
            GDBusMethodInvocation *invocation, gpointer)
{
    sync_store();
    g_dbus_method_invocation_return_value(invocation, nullptr);
}

guint32 bus_number(const char *method, GVariant *arguments)
{
    guint32 result = 0;
    GVariant *reply = g_dbus_connection_call_sync(agent.bus, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                  "org.freedesktop.DBus", method, arguments, G_VARIANT_TYPE("(u)"),
                                                  G_DBUS_CALL_FLAGS_NONE, CALL_MILLISECONDS, nullptr, nullptr);
    if (reply) {
        g_variant_get(reply, "(u)", &result);
        g_variant_unref(reply);
    }
    return result;
}

bool take_name()
{
    enum : guint32 { DO_NOT_QUEUE = 4, PRIMARY_OWNER = 1 }; // as D-Bus numbers them for RequestName
    return bus_number("RequestName", g_variant_new("(su)", NOTIFICATION_AGENT, static_cast<guint32>(DO_NOT_QUEUE))) ==
           PRIMARY_OWNER;
}

bool anything_left()
{
    const auto list = store_list(nullptr);
    return std::any_of(list.begin(), list.end(), is_for_daemon);
}

bool export_object()
{
    static const char *const introspection = "<node><interface name='" NOTIFICATION_AGENT "'>"
                                             "<method name='Changed'/></interface></node>";
    GDBusNodeInfo *node = g_dbus_node_info_new_for_xml(introspection, nullptr);
    static const GDBusInterfaceVTable table = {called, nullptr, nullptr, {}};
    const guint id = g_dbus_connection_register_object(agent.bus, NOTIFICATION_AGENT_PATH, node->interfaces[0], &table,
                                                       nullptr, nullptr, nullptr);
    g_dbus_node_info_unref(node);
    return id != 0;
}

} // namespace

int main()
{
    char *address = g_dbus_address_get_for_bus_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
    if (!address)
        return 1;
    // Of our own, so that the end of the bus ends the loop and not the process.
    agent.bus = g_dbus_connection_new_for_address_sync(
        address,
        static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                          G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION),
        nullptr, nullptr, nullptr);
    g_free(address);
    if (!agent.bus || !export_object())
        return 1;
    if (!take_name())
        return 0; // another one works already
    agent.loop = g_main_loop_new(nullptr, FALSE);
    g_signal_connect_swapped(agent.bus, "closed", G_CALLBACK(g_main_loop_quit), agent.loop);
    g_dbus_connection_signal_subscribe(agent.bus, NOTIFICATION_DAEMON, NOTIFICATION_DAEMON, nullptr,
                                       NOTIFICATION_DAEMON_PATH, nullptr, G_DBUS_SIGNAL_FLAGS_NONE, daemon_signal,
                                       nullptr, nullptr);
    g_bus_watch_name_on_connection(agent.bus, NOTIFICATION_DAEMON, G_BUS_NAME_WATCHER_FLAGS_AUTO_START, daemon_appeared,
                                   daemon_vanished, nullptr, nullptr);
    sync_store();
    GFileMonitor *store = watch_store();
    // A program that found us on the bus wrote its notification before we gave the name back.
    do {
        g_main_loop_run(agent.loop);
        if (!g_dbus_connection_is_closed(agent.bus))
            bus_number("ReleaseName", g_variant_new("(s)", NOTIFICATION_AGENT));
    } while (!g_dbus_connection_is_closed(agent.bus) && anything_left() && take_name() && (sync_store(), true));
    g_clear_object(&store);
    tap_finish();
    return 0;
}
