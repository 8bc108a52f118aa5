// The agent, against a notification daemon and an application that are played here.
#include "bus.h"
#include "posted.h"
#include "support.h"
#include <algorithm>
#include <csignal>
#include <functional>
#include <map>
#include <sys/wait.h>

namespace {

constexpr const char *PACKAGE = "com.example.poster";
constexpr const char *DAEMON = "org.freedesktop.Notifications";

std::vector<pid_t> ongoing_posters;

class Agent : public PlatformTest {
  protected:
    std::unique_ptr<PrivateBus> bus;
    std::unique_ptr<Program> daemon;
    std::map<guint32, std::string> screen; // what the daemon shows: by its id, the arguments of Notify
    int notified = 0;
    guint32 close_at_once = 0; // a reason
    guint32 last = 100;

    void SetUp() override
    {
        bus = std::make_unique<PrivateBus>("DBUS_SESSION_BUS_ADDRESS");
        start_daemon();
    }

    void TearDown() override
    {
        for (const pid_t poster : ongoing_posters) {
            kill(poster, SIGTERM);
            waitpid(poster, nullptr, 0);
        }
        ongoing_posters.clear();
        daemon.reset();
        bus.reset(); // which ends the agent
    }

    void start_daemon()
    {
        screen.clear();
        daemon.reset();
        daemon = std::make_unique<Program>(
            *bus, DAEMON, "/org/freedesktop/Notifications",
            "<node><interface name='org.freedesktop.Notifications'>"
            "<method name='GetCapabilities'><arg type='as' direction='out'/></method>"
            "<method name='Notify'><arg type='s' direction='in'/><arg type='u' direction='in'/><arg type='s' "
            "direction='in'/><arg type='s' direction='in'/><arg type='s' direction='in'/><arg type='as' "
            "direction='in'/><arg type='a{sv}' direction='in'/><arg type='i' direction='in'/>"
            "<arg type='u' direction='out'/></method>"
            "<method name='CloseNotification'><arg type='u' direction='in'/></method></interface></node>",
            [this](const std::string &method, GVariant *arguments) { return answer(method, arguments); });
    }

    std::string answer(const std::string &method, GVariant *arguments)
    {
        if (method == "GetCapabilities")
            return "(['actions', 'body', 'body-markup'],)";
        guint32 id = 0;
        if (method == "CloseNotification") {
            g_variant_get(arguments, "(u)", &id);
            screen.erase(id);
            return "()";
        }
        g_variant_get_child(arguments, 1, "u", &id);
        if (!id)
            id = ++last;
        char *text = g_variant_print(arguments, FALSE);
        screen[id] = text;
        g_free(text);
        notified++;
        if (close_at_once) // the signal overtakes the answer
            close(id, close_at_once);
        return "(uint32 " + std::to_string(id) + ",)";
    }

    void close(guint32 id, guint32 reason)
    {
        screen.erase(id);
        daemon->emit(DAEMON, "NotificationClosed", g_variant_new("(uu)", id, reason));
    }

    bool shows(const std::string &text) const
    {
        for (const auto &[id, shown] : screen)
            if (shown.find(text) != shown.npos)
                return true;
        return false;
    }

    void tap(guint32 id)
    {
        daemon->emit(DAEMON, "ActionInvoked", g_variant_new("(us)", id, "default"));
    }

    bool agent_runs() const
    {
        GDBusConnection *connection = bus->connect();
        GVariant *reply = g_dbus_connection_call_sync(
            connection, "org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "GetNameOwner",
            g_variant_new("(s)", "com.orvant.NotificationAgent"), nullptr, {}, -1, nullptr, nullptr);
        g_object_unref(connection);
        if (reply)
            g_variant_unref(reply);
        return reply;
    }
};

// A process posts and ends, and the id of its notification is all that is left of it. That of an ongoing notification
// stays until the test ends.
int post(notification_type_e type, const char *title, const char *content, int flags)
{
    int ends[2];
    EXPECT_EQ(pipe(ends), 0);
    const pid_t poster = fork();
    if (poster == 0) {
        const std::string number = std::to_string(ends[1]), kind = std::to_string(type), bits = std::to_string(flags);
        execl(POSTER, POSTER, number.c_str(), kind.c_str(), title, content, bits.c_str(), nullptr);
        _exit(127);
    }
    close(ends[1]);
    int id = 0, status = -1;
    EXPECT_EQ(read(ends[0], &id, sizeof id), static_cast<ssize_t>(sizeof id));
    close(ends[0]);
    if (type == NOTIFICATION_TYPE_ONGOING) {
        ongoing_posters.push_back(poster);
        return id;
    }
    waitpid(poster, &status, 0);
    EXPECT_EQ(status, 0);
    return id;
}

bool in_store(int id)
{
    return std::ranges::any_of(read_posted(PACKAGE), [id](const Posted &one) { return one.id == id; });
}

} // namespace

TEST_F(Agent, ShowsUpdatesAndTakesAway)
{
    const int id = post(NOTIFICATION_TYPE_ONGOING, "T & <b>", "1 < 2", 0x104);
    ASSERT_TRUE(run_until([this] { return screen.size() == 1; }));
    for (const char *part : {"'T & <b>'", "'1 &lt; 2'", "'value': <0>", "'urgency': <byte 0x00>", "'resident': <true>",
                             "'desktop-entry': <'com.example.poster'>", "['default', '']"})
        EXPECT_TRUE(shows(part)) << part << screen.begin()->second;

    notified = 0;
    notification_h noti = notification_load(PACKAGE, id);
    const auto start = std::chrono::steady_clock::now();
    for (int i = 0; i <= 1000; i++)
        EXPECT_EQ(notification_update_progress(noti, id, i / 1000.0), 0);
    EXPECT_LT(milliseconds_since(start), 5000); // nothing waits for the bus
    notification_update_content(noti, id, "done");
    EXPECT_TRUE(run_until([this] { return shows("'value': <100>") && shows("'done'"); }));
    EXPECT_EQ(screen.size(), 1u);
    EXPECT_LE(notified, milliseconds_since(start) / 100 + 2); // the daemon gets no more than it can show

    start_daemon(); // a new one gets to know what there is
    EXPECT_TRUE(run_until([this] { return shows("'value': <100>"); }));
    EXPECT_EQ(notification_delete(noti), 0);
    notification_free(noti);
    EXPECT_TRUE(run_until([this] { return screen.empty(); }));
    EXPECT_TRUE(run_until([this] { return !agent_runs(); }));
    post(NOTIFICATION_TYPE_NOTI, "again", "", 0);
    EXPECT_TRUE(run_until([this] { return shows("'again'"); }));
}

TEST_F(Agent, TapSendsTheRequestWhenThePosterHasLeft)
{
    std::vector<std::string> requests;
    const Program application(
        *bus, "com.example.receiver", "/com/example/receiver",
        "<node><interface name='com.orvant.AppControl'><method name='Launch'><arg type='a{sv}' direction='in'/>"
        "<arg type='a{sv}' direction='out'/></method></interface></node>",
        [&requests](const std::string &, GVariant *arguments) {
            GVariant *request = g_variant_get_child_value(arguments, 0);
            const char *operation = "";
            g_variant_lookup(request, "operation", "^&ay", &operation);
            requests.emplace_back(operation);
            g_variant_unref(request);
            return "(@a{sv} {'result': <0>},)";
        });
    const struct {
        notification_type_e type;
        int flags;
        bool stays;
    } cases[] = {{NOTIFICATION_TYPE_NOTI, 0x100, false},
                 {NOTIFICATION_TYPE_NOTI, 0x104, true},
                 {NOTIFICATION_TYPE_ONGOING, 0x104, true}};
    for (const auto &c : cases) {
        const int id = post(c.type, "title", "content", c.flags);
        ASSERT_TRUE(run_until([this] { return screen.count(last) == 1; }));
        requests.clear();
        tap(last);
        EXPECT_TRUE(run_until([&] { return !requests.empty() && in_store(id) == c.stays; })) << c.type << c.flags;
        EXPECT_EQ(requests, std::vector<std::string>{"test/open"});
        EXPECT_TRUE(run_until([&] { return screen.count(last) == (c.stays ? 1u : 0u); }));
        last += 10;
    }
}

TEST_F(Agent, ClosedByTheUser)
{
    enum { EXPIRED = 1, DISMISSED = 2 };
    const struct {
        notification_type_e type;
        guint32 reason;
        bool at_once, stays;
    } cases[] = {{NOTIFICATION_TYPE_NOTI, DISMISSED, false, false},
                 {NOTIFICATION_TYPE_NOTI, EXPIRED, false, true},
                 {NOTIFICATION_TYPE_NOTI, DISMISSED, true, false},
                 {NOTIFICATION_TYPE_ONGOING, DISMISSED, true, true},
                 {NOTIFICATION_TYPE_ONGOING, DISMISSED, false, true}};
    int id = 0;
    for (const auto &c : cases) {
        close_at_once = c.at_once ? c.reason : 0;
        notified = 0;
        id = post(c.type, "title", "content", 0);
        ASSERT_TRUE(run_until([this] { return notified > 0; }));
        if (!c.at_once)
            close(last, c.reason);
        EXPECT_TRUE(run_until([&] { return in_store(id) == c.stays; }));
        last += 10;
    }
    // What the user closed does not come back with its next update; nothing is left to show.
    notification_h noti = notification_load(PACKAGE, id);
    notification_update_progress(noti, id, 0.5);
    notification_free(noti);
    EXPECT_TRUE(run_until([this] { return !agent_runs(); }));
    EXPECT_TRUE(screen.empty());
}

// Whoever deletes it, and however: a bubble that tells of what is over is soon gone.
TEST_F(Agent, DeletedGoesWithinTwoSeconds)
{
    const struct {
        const char *how;
        notification_type_e type;
        std::function<void(int id)> remove;
    } cases[] = {
        {"by its program", NOTIFICATION_TYPE_NOTI,
         [](int id) {
             notification_h noti = notification_load(PACKAGE, id);
             EXPECT_EQ(notification_delete(noti), 0);
             notification_free(noti);
         }},
        {"by type", NOTIFICATION_TYPE_NOTI,
         [](int) { EXPECT_EQ(notification_delete_all_by_type(PACKAGE, NOTIFICATION_TYPE_NOTI), 0); }},
        {"by a program that did not live to tell the bus", NOTIFICATION_TYPE_NOTI,
         [](int id) {
             Db db;
             EXPECT_TRUE(db.open(platform_data_dir() + "/notifications.db", nullptr) &&
                         db.run(("DELETE FROM notification WHERE id = " + std::to_string(id)).c_str()));
         }},
        {"by the death of its poster", NOTIFICATION_TYPE_ONGOING,
         [](int) {
             kill(ongoing_posters.back(), SIGKILL);
             waitpid(ongoing_posters.back(), nullptr, 0);
             ongoing_posters.pop_back();
         }},
    };
    for (const auto &one : cases) {
        const int id = post(one.type, "title", "content", 0);
        ASSERT_TRUE(run_until([this] { return screen.size() == 1; })) << one.how;
        const auto shown = std::chrono::steady_clock::now();
        run_until([shown] { return milliseconds_since(shown) > 500; }); // the agent looks once more at the answer
        one.remove(id);
        EXPECT_TRUE(run_until([this] { return screen.empty(); }, 2)) << one.how;
        // The next one meets an agent that has just begun to look.
        ASSERT_TRUE(run_until([this] { return !agent_runs(); })) << one.how;
    }
}

TEST_F(Agent, StatusMessage)
{
    notification_status_message_post("<No> application");
    ASSERT_TRUE(run_until([this] { return screen.size() == 1; }));
    EXPECT_TRUE(shows("'<No> application', '', [], {'transient': <true>}, 3000")) << screen.begin()->second;
}
