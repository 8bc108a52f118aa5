#include "bus.h"
#include "connection/connection.h"
#include "connection/system.h"
#include "support.h"
#include "vconf/vconf.h"
#include <atomic>
#include <sys/socket.h>
#include <sys/un.h>
#include <thread>

namespace {

class Connection : public PlatformTest {
  protected:
    connection_h connection = nullptr;

    void SetUp() override
    {
        setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + (home / "no-bus").string()).c_str(), 1);
        connection_create(&connection);
    }

    void TearDown() override
    {
        connection_destroy(connection);
    }

    // "type state", or the result of a read that fails.
    std::string read() const
    {
        connection_type_e type = CONNECTION_TYPE_DISCONNECTED;
        connection_cellular_state_e state = CONNECTION_CELLULAR_STATE_OUT_OF_SERVICE;
        const int result = connection_get_type(connection, &type);
        EXPECT_EQ(connection_get_cellular_state(connection, &state), result);
        return result ? std::to_string(result) : std::to_string(type) + " " + std::to_string(state);
    }
};

constexpr const char *HEADING = "Iface\tDestination\tGateway \tFlags\tRefCnt\tUse\tMetric\tMask\n";

// What NetworkManager and ModemManager say, on a bus of their own.
struct Managers {
    std::string network, modem;
    std::function<void()> on_modem = [] {}; // runs before it answers

    const PrivateBus bus{"DBUS_SYSTEM_BUS_ADDRESS"};
    const Program network_manager{
        bus, "org.freedesktop.NetworkManager", "/org/freedesktop/NetworkManager",
        "<node><interface name='org.freedesktop.DBus.Properties'><method name='GetAll'><arg type='s' direction='in'/>"
        "<arg type='a{sv}' direction='out'/></method></interface></node>",
        [this](const std::string &, GVariant *) { return "(" + network + ",)"; }};
    const Program modem_manager{
        bus, "org.freedesktop.ModemManager1", "/org/freedesktop/ModemManager1",
        "<node><interface name='org.freedesktop.DBus.ObjectManager'><method name='GetManagedObjects'>"
        "<arg type='a{oa{sa{sv}}}' direction='out'/></method></interface></node>",
        [this](const std::string &, GVariant *) {
            on_modem();
            return "({objectpath '/m': {'org.freedesktop.ModemManager1.Modem': " + modem + "}},)";
        }};

    void set(const std::string &type, const std::string &radios, const std::string &modem_state)
    {
        network = "{'State': <uint32 70>, 'PrimaryConnectionType': <'" + type + "'>, 'WirelessEnabled': <" + radios +
                  ">, 'WwanEnabled': <" + radios + ">}";
        modem = "{'State': <" + modem_state + ">}";
    }
};

} // namespace

TEST_F(Connection, StateSetByHandIsSeenAtOnce)
{
    const std::pair<const char *, const char *> cases[] = {
        {"wifi", "1 0"},   {"cellular", "2 5"},         {"ethernet", "3 0"},       {"none", "0 0"},
        {"", "-3001"},     {"none:flight_mode", "0 1"}, {"none:call_only", "0 3"}, {"wifi:flight_mode", "1 1"},
        {"Wifi", "-3001"}, {"wifi:", "-3001"},
    };
    for (const auto &[value, state] : cases) {
        vconf_set_str("memory/connection/type", value);
        EXPECT_EQ(read(), state) << value;
    }
}

TEST_F(Connection, CountsByRoutesWithoutNetworkManager)
{
    const std::string v4_default = "eth0\t00000000\t0102A8C0\t0003\t0\t0\t100\t00000000\t0\t0\t0\n";
    const std::string wifi_default = "wl0\t00000000\t0102A8C0\t0003\t0\t0\t50\t00000000\t0\t0\t0\n";
    const std::string containers = "br0\t000011AC\t00000000\t0001\t0\t0\t0\t0000FFFF\t0\t0\t0\n";
    const std::string none(32, '0'), rest = " 00 " + none + " 00 " + none + " 00000400 00000002 00000000 ";
    const std::string v6_default = none + rest + "00000003 wl0\n", v6_unreachable = none + rest + "00200200 lo\n";
    const struct {
        std::string v4, v6;
        connection_type_e type;
    } cases[] = {{v4_default + wifi_default, "", CONNECTION_TYPE_WIFI}, // the less costly one
                 {containers, v6_unreachable, CONNECTION_TYPE_DISCONNECTED},
                 {"", v6_default, CONNECTION_TYPE_WIFI},
                 {"garbage\n\n", "garbage\n", CONNECTION_TYPE_DISCONNECTED}};
    std::filesystem::create_directories(home / "sys/class/net/wl0/wireless");
    std::filesystem::create_directories(home / "sys/class/net/br0/bridge");
    home.file("sys/class/net/eth0/operstate", "up\n");
    for (const auto &c : cases) {
        home.file("proc/net/route", HEADING + c.v4);
        home.file("proc/net/ipv6_route", c.v6);
        EXPECT_EQ(connection_type_by_routes(home.path), c.type) << c.v4 << c.v6;
    }
    EXPECT_FALSE(connection_radios_blocked(home.path));
    home.file("sys/class/rfkill/rfkill1/type", "wlan\n");
    home.file("sys/class/rfkill/rfkill1/soft", "1\n");
    EXPECT_TRUE(connection_radios_blocked(home.path));
}

TEST_F(Connection, AsksNetworkAndModemManagers)
{
    Managers managers;
    const std::string gpp = "}, 'org.freedesktop.ModemManager1.Modem.Modem3gpp': {'RegistrationState': ";
    const struct {
        std::string type, radios, modem, state;
    } cases[] = {
        {"802-11-wireless", "true", "8", "1 4"},
        {"gsm", "true", "11", "2 5"},
        {"bluetooth", "false", "11", "4 1"},
        {"802-11-wireless", "true", "8>" + gpp + "<uint32 5", "1 2"},
        {"802-11-wireless", "true", "7>" + gpp + "<uint32 6", "1 3"},
    };
    for (const auto &c : cases) {
        managers.set(c.type, c.radios, c.modem);
        std::string state;
        std::atomic<bool> done = false;
        std::thread reader([&] {
            state = read();
            done = true;
        });
        run_until([&done] { return done.load(); }); // the managers answer here
        reader.join();
        EXPECT_EQ(state, c.state) << managers.network << managers.modem;
    }
}

TEST_F(Connection, BusThatNeverAnswersDoesNotHoldUsUp)
{
    const int listener = socket(AF_UNIX, SOCK_STREAM, 0);
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    const std::string path = home / "no-bus";
    path.copy(address.sun_path, sizeof address.sun_path - 1);
    ASSERT_EQ(bind(listener, reinterpret_cast<sockaddr *>(&address), sizeof address), 0);
    ASSERT_EQ(listen(listener, 5), 0);
    const auto threads = [] { return std::distance(std::filesystem::directory_iterator("/proc/self/task"), {}); };
    long after_first = 0;
    for (int i = 0; i < 3; i++) {
        const auto start = std::chrono::steady_clock::now();
        EXPECT_EQ(read()[0] - '0', connection_type_by_routes(""));
        EXPECT_LT(milliseconds_since(start), 1000); // of two calls
        after_first = i ? after_first : threads();
        EXPECT_EQ(threads(), after_first) << "left behind";
    }
    close(listener);
    // What was stuck is over, and the next one is asked.
    Managers managers;
    managers.set("bluetooth", "true", "8");
    std::atomic<bool> done = false;
    BusAnswer answer;
    std::thread reader([&] {
        answer = connection_ask_bus(10'000);
        done = true;
    });
    run_until([&done] { return done.load(); }, 20);
    reader.join();
    EXPECT_EQ(answer.type, CONNECTION_TYPE_BT);
}

TEST_F(Connection, NobodyGetsAnAnswerOlderThanTheQuestion)
{
    Managers managers;
    std::atomic<bool> first_done = false, second_done = false;
    BusAnswer first, second;
    std::thread late;
    bool has_changed = false;
    // The network changes when the first question has been answered in part, and then somebody else asks.
    managers.on_modem = [&] {
        if (std::exchange(has_changed, true))
            return;
        managers.set("gsm", "true", "8");
        late = std::thread([&] {
            second = connection_ask_bus(10'000);
            second_done = true;
        });
        run_until([&second_done] { return second_done.load(); }, 2);
    };
    managers.set("802-11-wireless", "true", "8");
    std::thread early([&] {
        first = connection_ask_bus(10'000);
        first_done = true;
    });
    run_until([&] { return first_done && second_done; }, 20);
    early.join();
    late.join();
    EXPECT_EQ(first.type, CONNECTION_TYPE_WIFI);
    EXPECT_EQ(second.type, CONNECTION_TYPE_CELLULAR);
    // One after the other, as fast as they go.
    for (int i = 0; i < 50; i++) {
        const bool is_wifi = i % 2;
        managers.set(is_wifi ? "802-11-wireless" : "gsm", "true", "8");
        std::atomic<bool> done = false;
        std::thread reader([&] {
            first = connection_ask_bus(10'000);
            done = true;
        });
        run_until([&done] { return done.load(); });
        reader.join();
        EXPECT_EQ(first.type, is_wifi ? CONNECTION_TYPE_WIFI : CONNECTION_TYPE_CELLULAR) << i;
    }
}
