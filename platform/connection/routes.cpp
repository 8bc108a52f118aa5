#include "connection/system.h"
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <functional>
#include <sstream>

namespace fs = std::filesystem;

namespace {

// Route flags of <linux/route.h>, which both tables use.
constexpr unsigned ROUTE_UP = 0x1, ROUTE_REJECT = 0x200;

std::string read_file(const fs::path &path)
{
    std::ifstream file(path);
    return {std::istreambuf_iterator<char>(file), {}};
}

// Routes through bridges and dummies reach only what runs on this machine; a bridge that leads outside carries the
// default route.
bool leads_outside(const std::string &root, const std::string &interface)
{
    const fs::path dir = root + "/sys/class/net/" + interface;
    std::error_code failed;
    if (fs::exists(dir / "bridge", failed) || interface.rfind("dummy", 0) == 0)
        return false;
    const std::string state = read_file(dir / "operstate");
    return state.rfind("down", 0) != 0 && state.rfind("lowerlayerdown", 0) != 0;
}

connection_type_e interface_type(const std::string &root, const std::string &interface)
{
    const fs::path dir = root + "/sys/class/net/" + interface;
    const std::string event = read_file(dir / "uevent");
    const auto starts = [&interface](const char *prefix) { return interface.rfind(prefix, 0) == 0; };
    std::error_code failed;
    if (fs::exists(dir / "wireless", failed) || fs::exists(dir / "phy80211", failed) ||
        event.find("DEVTYPE=wlan") != event.npos)
        return CONNECTION_TYPE_WIFI;
    if (event.find("DEVTYPE=wwan") != event.npos || starts("wwan") || starts("ppp") || starts("rmnet"))
        return CONNECTION_TYPE_CELLULAR;
    if (event.find("DEVTYPE=bluetooth") != event.npos || starts("bnep"))
        return CONNECTION_TYPE_BT;
    return CONNECTION_TYPE_ETHERNET;
}

using RouteFound = std::function<void(const std::string &interface, bool is_default, long metric)>;

void read_routes(const std::string &root, const RouteFound &found)
{
    std::string line;
    std::ifstream v4(root + "/proc/net/route");
    std::getline(v4, line); // the heading
    while (std::getline(v4, line)) {
        char interface[32];
        unsigned long destination = 0, mask = 0;
        unsigned flags = 0;
        long metric = 0;
        if (std::sscanf(line.c_str(), "%31s %lx %*x %x %*d %*d %ld %lx", interface, &destination, &flags, &metric,
                        &mask) != 5 ||
            !(flags & ROUTE_UP) || (flags & ROUTE_REJECT))
            continue;
        const unsigned long link_local = 0x0000fea9; // 169.254.0.0, in the machine's byte order as the kernel prints it
        if ((destination & 0xffff) != link_local && (destination & 0xff) != 127 && (destination & 0xf0) != 0xe0)
            found(interface, destination == 0 && mask == 0, metric);
    }
    std::ifstream v6(root + "/proc/net/ipv6_route");
    while (std::getline(v6, line)) {
        char destination[33], interface[32];
        unsigned prefix = 0, flags = 0, metric = 0;
        if (std::sscanf(line.c_str(), "%32s %x %*s %*x %*s %x %*x %*x %x %31s", destination, &prefix, &metric, &flags,
                        interface) != 5 ||
            !(flags & ROUTE_UP) || (flags & ROUTE_REJECT) || prefix > 64)
            continue;
        const std::string address = destination;
        const bool link_local = address.rfind("fe8", 0) == 0 || address.rfind("ff", 0) == 0;
        if (!link_local)
            found(interface, prefix == 0, metric);
    }
}

} // namespace

connection_type_e connection_type_by_routes(const std::string &root)
{
    std::string by_default, other;
    long least = 0;
    read_routes(root, [&](const std::string &interface, bool is_default, long metric) {
        if (interface == "lo")
            return;
        if (is_default && (by_default.empty() || metric < least)) {
            by_default = interface;
            least = metric;
        }
        if (other.empty() && leads_outside(root, interface))
            other = interface;
    });
    const std::string &interface = by_default.empty() ? other : by_default;
    return interface.empty() ? CONNECTION_TYPE_DISCONNECTED : interface_type(root, interface);
}

bool connection_radios_blocked(const std::string &root)
{
    bool any = false;
    std::error_code failed;
    for (const auto &entry : fs::directory_iterator(root + "/sys/class/rfkill", failed)) {
        const std::string type = read_file(entry.path() / "type");
        if (type.rfind("wlan", 0) != 0 && type.rfind("wwan", 0) != 0)
            continue;
        const auto is_on = [&entry](const char *name) { return read_file(entry.path() / name).rfind("1", 0) == 0; };
        if (!is_on("soft") && !is_on("hard"))
            return false;
        any = true;
    }
    return any;
}
