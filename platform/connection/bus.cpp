#include "connection/system.h"
#include <condition_variable>
#include <cstring>
#include <gio/gio.h>
#include <memory>
#include <mutex>
#include <thread>

namespace {

struct GFree {
    void operator()(void *p) const
    {
        g_free(p);
    }
    void operator()(GVariant *v) const
    {
        g_variant_unref(v);
    }
    void operator()(GDBusConnection *c) const
    {
        g_object_unref(c);
    }
};
template <typename T> using Owned = std::unique_ptr<T, GFree>;

constexpr const char *NETWORK = "org.freedesktop.NetworkManager";
constexpr const char *MODEMS = "org.freedesktop.ModemManager1";

Owned<GVariant> call(GDBusConnection *bus, const char *name, const char *path, const char *interface,
                     const char *method, GVariant *arguments, const char *answer, int milliseconds)
{
    return Owned<GVariant>(g_dbus_connection_call_sync(bus, name, path, interface, method, arguments,
                                                       G_VARIANT_TYPE(answer), G_DBUS_CALL_FLAGS_NO_AUTO_START,
                                                       milliseconds, nullptr, nullptr));
}

// NMState of NetworkManager's D-Bus interface: connected to a site or to the world.
constexpr guint32 STATE_CONNECTED_SITE = 60;

void read_network_manager(GVariant *properties, BusAnswer &answer)
{
    guint32 state = 0;
    const char *kind = "";
    gboolean wireless = TRUE, wwan = TRUE;
    g_variant_lookup(properties, "State", "u", &state);
    g_variant_lookup(properties, "PrimaryConnectionType", "&s", &kind);
    if (g_variant_lookup(properties, "WirelessEnabled", "b", &wireless) &&
        g_variant_lookup(properties, "WwanEnabled", "b", &wwan))
        answer.radios_off = !wireless && !wwan;
    if (state < STATE_CONNECTED_SITE)
        return;
    if (std::strcmp(kind, "802-11-wireless") == 0)
        answer.type = CONNECTION_TYPE_WIFI;
    else if (std::strcmp(kind, "gsm") == 0 || std::strcmp(kind, "cdma") == 0)
        answer.type = CONNECTION_TYPE_CELLULAR;
    else if (std::strcmp(kind, "802-3-ethernet") == 0)
        answer.type = CONNECTION_TYPE_ETHERNET;
    else if (std::strcmp(kind, "bluetooth") == 0)
        answer.type = CONNECTION_TYPE_BT;
}

// By MMModemState, MMModem3gppRegistrationState and MMModem3gppPacketServiceState of ModemManager.
connection_cellular_state_e modem_state(GVariant *modem, GVariant *gsm)
{
    enum { REGISTERED = 8, CONNECTED = 11 };
    enum { ROAMING = 5, HOME_SMS = 6, ROAMING_SMS = 7, EMERGENCY = 8, ROAMING_CSFB = 10 };
    enum { DETACHED = 1 };
    gint32 state = 0;
    guint32 registration = 0, packet_service = 0;
    g_variant_lookup(modem, "State", "i", &state);
    if (gsm) {
        g_variant_lookup(gsm, "RegistrationState", "u", &registration);
        g_variant_lookup(gsm, "PacketServiceState", "u", &packet_service);
    }
    if (state == CONNECTED)
        return CONNECTION_CELLULAR_STATE_CONNECTED;
    if (registration == HOME_SMS || registration == ROAMING_SMS || registration == EMERGENCY)
        return CONNECTION_CELLULAR_STATE_CALL_ONLY_AVAILABLE;
    if (state < REGISTERED)
        return CONNECTION_CELLULAR_STATE_OUT_OF_SERVICE;
    if (registration == ROAMING || registration == ROAMING_CSFB)
        return CONNECTION_CELLULAR_STATE_ROAMING_OFF;
    return packet_service == DETACHED ? CONNECTION_CELLULAR_STATE_CALL_ONLY_AVAILABLE
                                      : CONNECTION_CELLULAR_STATE_AVAILABLE;
}

void read_modems(GVariant *objects, BusAnswer &answer)
{
    GVariantIter modems;
    g_variant_iter_init(&modems, objects);
    GVariant *raw = nullptr;
    while (g_variant_iter_next(&modems, "{&o@a{sa{sv}}}", nullptr, &raw)) {
        const Owned<GVariant> interfaces(raw);
        const Owned<GVariant> modem(
            g_variant_lookup_value(raw, "org.freedesktop.ModemManager1.Modem", G_VARIANT_TYPE_VARDICT));
        const Owned<GVariant> gsm(
            g_variant_lookup_value(raw, "org.freedesktop.ModemManager1.Modem.Modem3gpp", G_VARIANT_TYPE_VARDICT));
        if (modem)
            answer.modem = std::max(answer.modem, modem_state(modem.get(), gsm.get()));
    }
}

BusAnswer ask(const char *address, int milliseconds)
{
    BusAnswer answer;
    // A connection of its own: the shared one would end the process when the bus closes it.
    const auto flags = static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                                         G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION);
    const Owned<GDBusConnection> bus(g_dbus_connection_new_for_address_sync(address, flags, nullptr, nullptr, nullptr));
    if (!bus)
        return answer;
    if (const auto reply =
            call(bus.get(), NETWORK, "/org/freedesktop/NetworkManager", "org.freedesktop.DBus.Properties", "GetAll",
                 g_variant_new("(s)", NETWORK), "(a{sv})", milliseconds / 2)) {
        const Owned<GVariant> properties(g_variant_get_child_value(reply.get(), 0));
        read_network_manager(properties.get(), answer);
    }
    if (const auto reply =
            call(bus.get(), MODEMS, "/org/freedesktop/ModemManager1", "org.freedesktop.DBus.ObjectManager",
                 "GetManagedObjects", nullptr, "(a{oa{sa{sv}}})", milliseconds / 2)) {
        const Owned<GVariant> objects(g_variant_get_child_value(reply.get(), 0));
        read_modems(objects.get(), answer);
    }
    g_dbus_connection_close_sync(bus.get(), nullptr, nullptr);
    return answer;
}

constexpr int QUESTIONS_AT_ONCE = 4;

struct Question {
    bool is_answered = false;
    bool is_given_up = false; // nobody waits for it any more
    BusAnswer answer;
};

// It is never freed: a thread that was left behind may come back when the process ends.
struct Questions {
    std::mutex lock; // guards everything here, and what is asked
    std::condition_variable changed;
    int asked = 0; // threads that have not answered yet
    int given_up = 0;
};

Questions &questions()
{
    static auto *const all = new Questions;
    return *all;
}

} // namespace

// Everyone asks for themselves: what somebody else asked may have been answered before the network changed.
BusAnswer connection_ask_bus(int milliseconds)
{
    const Owned<char> address(g_dbus_address_get_for_bus_sync(G_BUS_TYPE_SYSTEM, nullptr, nullptr));
    if (!address)
        return {};
    const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(milliseconds);
    Questions &all = questions();
    std::unique_lock hold(all.lock);
    // Connecting to a bus that hangs cannot be bounded, so a thread does it and may be left behind; it owns nothing but
    // its question. While one is stuck no other is started.
    if (!all.changed.wait_until(hold, end, [&] { return all.asked < QUESTIONS_AT_ONCE && all.given_up == 0; }))
        return {};
    const auto question = std::make_shared<Question>();
    all.asked++;
    std::thread([question, &all, bus = std::string(address.get()), milliseconds] {
        const BusAnswer answer = ask(bus.c_str(), milliseconds);
        const std::lock_guard set(all.lock);
        question->answer = answer;
        question->is_answered = true;
        all.asked--;
        all.given_up -= question->is_given_up;
        all.changed.notify_all();
    }).detach();
    if (!all.changed.wait_until(hold, end, [&] { return question->is_answered; })) {
        question->is_given_up = true;
        all.given_up++;
    }
    return question->answer;
}
