#include "bus.h"
#include "connection/connection.h"
#include "connection/system.h"
#include "support.h"
#include "vconf/vconf.h"
#include <sys/socket.h>
#include <sys/un.h>
#include <thread>

namespace {

class Connection : public PlatformTest {
  protected:
    connection_h connection = nullptr;

    void SetUp() override
    {
        PlatformTest::SetUp();
        setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + (home / "no-bus").string()).c_str(), 1);
        connection_create(&connection);
    }

    void TearDown() override
    {
        connection_destroy(connection);
        PlatformTest::TearDown();
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

} // namespace

TEST_F(Connection, StateSetByHandIsSeenAtOnce)
{
    const struct {
        const char *value, *state;
    } cases[] = {{"wifi", "1 0"},
                 {"cellular", "2 5"},
                 {"ethernet", "3 0"},
                 {"bluetooth", "4 0"},
                 {"none", "0 0"},
                 {"none:flight_mode", "0 1"},
                 {"none:roaming_off", "0 2"},
                 {"none:call_only", "0 3"},
                 {"none:available", "0 4"},
                 {"wifi:flight_mode", "1 1"},
                 {"none:out_of_service", "0 0"},
                 {"", "-3001"},
                 {"wifi:", "-3001"},
                 {"none:sunshine", "-3001"},
                 {"Wifi", "-3001"}};
    for (const auto &c : cases) {
        vconf_set_str("memory/connection/type", c.value);
        EXPECT_EQ(read(), c.state) << c.value;
    }
    connection_type_e type = CONNECTION_TYPE_WIFI;
    EXPECT_EQ(connection_get_type(nullptr, &type), CONNECTION_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(connection_get_type(connection, nullptr), CONNECTION_ERROR_INVALID_PARAMETER);
}

TEST_F(Connection, CountsByRoutesWithoutNetworkManager)
{
    const std::string v4_default = "eth0\t00000000\t0102A8C0\t0003\t0\t0\t100\t00000000\t0\t0\t0\n";
    const std::string wifi_default = "wl0\t00000000\t0102A8C0\t0003\t0\t0\t50\t00000000\t0\t0\t0\n";
    const std::string modem_default = "wwan0\t00000000\t00000000\t0001\t0\t0\t700\t00000000\t0\t0\t0\n";
    const std::string local_net = "eth0\t0002A8C0\t00000000\t0001\t0\t0\t0\t00FFFFFF\t0\t0\t0\n";
    const std::string link_local = "eth0\t0000FEA9\t00000000\t0001\t0\t0\t0\t0000FFFF\t0\t0\t0\n";
    const std::string containers = "br0\t000011AC\t00000000\t0001\t0\t0\t0\t0000FFFF\t0\t0\t0\n";
    const std::string unplugged = "eth1\t0003A8C0\t00000000\t0001\t0\t0\t0\t00FFFFFF\t0\t0\t0\n";
    const std::string rejected = "eth0\t00000000\t00000000\t0201\t0\t0\t0\t00000000\t0\t0\t0\n";
    const std::string none(32, '0'), rest = " 00 " + none + " 00 " + none + " 00000400 00000002 00000000 ";
    const std::string v6_default = none + rest + "00000003 wl0\n";
    const std::string v6_unreachable = none + rest + "00200200 lo\n";
    const std::string v6_link =
        "fe800000000000000000000000000000 40 " + none + " 00 " + none + " 00000100 00000001 00000000 00000001 eth0\n";
    const struct {
        std::string v4, v6;
        connection_type_e type;
    } cases[] = {{"", "", CONNECTION_TYPE_DISCONNECTED},
                 {v4_default, "", CONNECTION_TYPE_ETHERNET},
                 {v4_default + wifi_default, "", CONNECTION_TYPE_WIFI}, // the less costly one
                 {local_net + wifi_default, "", CONNECTION_TYPE_WIFI},
                 {modem_default, "", CONNECTION_TYPE_CELLULAR},
                 {local_net, "", CONNECTION_TYPE_ETHERNET},
                 {link_local, v6_link, CONNECTION_TYPE_DISCONNECTED},
                 {containers + unplugged + rejected, v6_unreachable, CONNECTION_TYPE_DISCONNECTED},
                 {"", v6_default, CONNECTION_TYPE_WIFI},
                 {"garbage\n\n", "garbage\n", CONNECTION_TYPE_DISCONNECTED}};
    std::filesystem::create_directories(home / "sys/class/net/wl0/wireless");
    std::filesystem::create_directories(home / "sys/class/net/br0/bridge");
    write("sys/class/net/eth1/operstate", "down\n");
    write("sys/class/net/eth0/operstate", "up\n");
    for (const auto &c : cases) {
        write("proc/net/route", HEADING + c.v4);
        write("proc/net/ipv6_route", c.v6);
        EXPECT_EQ(connection_type_by_routes(home), c.type) << c.v4 << c.v6;
    }
    EXPECT_FALSE(connection_radios_blocked(home));
    write("sys/class/rfkill/rfkill0/type", "bluetooth\n");
    EXPECT_FALSE(connection_radios_blocked(home));
    write("sys/class/rfkill/rfkill1/type", "wlan\n");
    write("sys/class/rfkill/rfkill1/soft", "1\n");
    write("sys/class/rfkill/rfkill1/hard", "0\n");
    EXPECT_TRUE(connection_radios_blocked(home));
    write("sys/class/rfkill/rfkill2/type", "wwan\n");
    write("sys/class/rfkill/rfkill2/soft", "0\n");
    EXPECT_FALSE(connection_radios_blocked(home));
}

TEST_F(Connection, AsksNetworkAndModemManagers)
{
    const PrivateBus bus("DBUS_SYSTEM_BUS_ADDRESS");
    std::string network, modem;
    const Program network_manager(
        bus, "org.freedesktop.NetworkManager", "/org/freedesktop/NetworkManager",
        "<node><interface name='org.freedesktop.DBus.Properties'><method name='GetAll'><arg type='s' direction='in'/>"
        "<arg type='a{sv}' direction='out'/></method></interface></node>",
        [&network](const std::string &, GVariant *) { return "(" + network + ",)"; });
    const Program modem_manager(
        bus, "org.freedesktop.ModemManager1", "/org/freedesktop/ModemManager1",
        "<node><interface name='org.freedesktop.DBus.ObjectManager'><method name='GetManagedObjects'>"
        "<arg type='a{oa{sa{sv}}}' direction='out'/></method></interface></node>",
        [&modem](const std::string &, GVariant *) {
            return "({objectpath '/m': {'org.freedesktop.ModemManager1.Modem': " + modem + "}},)";
        });
    const std::string on = "'WirelessEnabled': <true>, 'WwanEnabled': <true>}";
    const struct {
        std::string network, modem, state;
    } cases[] = {
        {"{'State': <uint32 70>, 'PrimaryConnectionType': <'802-11-wireless'>, " + on, "{'State': <8>}", "1 4"},
        {"{'State': <uint32 70>, 'PrimaryConnectionType': <'gsm'>, " + on, "{'State': <11>}", "2 5"},
        {"{'State': <uint32 70>, 'PrimaryConnectionType': <'802-3-ethernet'>, " + on, "{'State': <3>}", "3 0"},
        {"{'State': <uint32 70>, 'PrimaryConnectionType': <'bluetooth'>, 'WirelessEnabled': <false>, "
         "'WwanEnabled': <false>}",
         "{'State': <11>}", "4 1"},
        {"{'State': <uint32 70>, 'PrimaryConnectionType': <'802-11-wireless'>, " + on,
         "{'State': <8>}, 'org.freedesktop.ModemManager1.Modem.Modem3gpp': {'RegistrationState': <uint32 5>}", "1 2"},
        {"{'State': <uint32 70>, 'PrimaryConnectionType': <'802-11-wireless'>, " + on,
         "{'State': <7>}, 'org.freedesktop.ModemManager1.Modem.Modem3gpp': {'RegistrationState': <uint32 6>}", "1 3"},
    };
    for (const auto &c : cases) {
        network = c.network;
        modem = c.modem;
        std::string state;
        bool done = false;
        std::thread reader([&] {
            state = read();
            g_idle_add([](gpointer flag) -> gboolean { return *static_cast<bool *>(flag) = true, G_SOURCE_REMOVE; },
                       &done);
        });
        run_until([&done] { return done; });
        reader.join();
        EXPECT_EQ(state, c.state) << c.network << c.modem;
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
    for (int i = 0; i < 2; i++) {
        const auto start = std::chrono::steady_clock::now();
        connection_type_e type = CONNECTION_TYPE_BT;
        EXPECT_EQ(connection_get_type(connection, &type), CONNECTION_ERROR_NONE);
        EXPECT_LT(milliseconds_since(start), 500);
        EXPECT_EQ(type, connection_type_by_routes(""));
    }
    close(listener);
}
