#include "attempts.h"
#include <algorithm>
#include <cmath>
#include <gio/gio.h>

// So many at once, and one more after so many seconds. A person mistypes; a program that guesses does not get far.
static const double ACCOUNT_MOST = 10, ACCOUNT_SECONDS = 12, ADDRESS_MOST = 20, ADDRESS_SECONDS = 3;
static const size_t BUCKETS_MOST = 20000;

Attempts::Bucket &Attempts::bucket(const std::string &key, double most, double per_second, int64_t now)
{
    const auto [found, is_new] = buckets.try_emplace(key);
    Bucket &one = found->second;
    const double passed = static_cast<double>(now - one.moment) / G_USEC_PER_SEC;
    one.left = is_new ? most : std::min(most, one.left + passed * per_second);
    one.moment = now;
    one.full = now + static_cast<int64_t>(most / per_second * G_USEC_PER_SEC);
    return one;
}

void Attempts::forget_full(int64_t now)
{
    std::erase_if(buckets, [&](const auto &one) { return now > one.second.full; });
    if (buckets.size() >= BUCKETS_MOST)
        buckets.clear(); // somebody invents accounts: their own address still bounds them
}

int Attempts::begin(const std::string &account, const std::string &address)
{
    const int64_t now = g_get_monotonic_time();
    if (buckets.size() >= BUCKETS_MOST)
        forget_full(now);
    Bucket &of_address = bucket("a" + address, ADDRESS_MOST, 1 / ADDRESS_SECONDS, now);
    Bucket &of_account = bucket("u" + account, ACCOUNT_MOST, 1 / ACCOUNT_SECONDS, now);
    const double wait = std::max((1 - of_address.left) * ADDRESS_SECONDS, (1 - of_account.left) * ACCOUNT_SECONDS);
    if (wait > 0)
        return static_cast<int>(std::ceil(wait));
    of_address.left--;
    of_account.left--;
    return 0;
}

void Attempts::succeeded(const std::string &account, const std::string &address)
{
    const int64_t now = g_get_monotonic_time();
    bucket("a" + address, ADDRESS_MOST, 1 / ADDRESS_SECONDS, now).left++;
    bucket("u" + account, ACCOUNT_MOST, 1 / ACCOUNT_SECONDS, now).left++;
}

int Attempts::take(const std::string &what, double most, double seconds)
{
    const int64_t now = g_get_monotonic_time();
    if (buckets.size() >= BUCKETS_MOST)
        forget_full(now);
    Bucket &one = bucket("t" + what, most, 1 / seconds, now);
    if (one.left < 1)
        return static_cast<int>(std::ceil((1 - one.left) * seconds));
    one.left--;
    return 0;
}

std::string network_of(const std::string &peer)
{
    static const size_t NETWORK_BYTES = 8;
    static const std::string MAPPED = "::ffff:"; // IPv4 on a socket for both
    if (peer.starts_with(MAPPED))
        return peer.substr(MAPPED.size());
    GInetAddress *address = g_inet_address_new_from_string(peer.c_str());
    if (!address)
        return peer;
    std::string network = peer;
    if (g_inet_address_get_family(address) == G_SOCKET_FAMILY_IPV6) {
        network = "network ";
        for (size_t i = 0; i < NETWORK_BYTES; i++)
            network += std::to_string(g_inet_address_to_bytes(address)[i]) + ".";
    }
    g_object_unref(address);
    return network;
}
