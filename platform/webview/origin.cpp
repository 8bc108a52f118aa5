#include "origin.h"
#include <glib.h>

Origin origin_of(const std::string &address)
{
    Origin origin;
    GUri *uri =
        g_uri_parse(address.c_str(), static_cast<GUriFlags>(G_URI_FLAGS_ENCODED | G_URI_FLAGS_PARSE_RELAXED), nullptr);
    if (!uri)
        return origin;
    const std::string scheme = g_uri_get_scheme(uri); // in lower case
    const char *name = g_uri_get_host(uri);
    if ((scheme == "http" || scheme == "https") && name && *name && !g_uri_get_userinfo(uri)) {
        char *lower = g_ascii_strdown(name, -1);
        const int port = g_uri_get_port(uri);
        origin = {scheme, lower, port > 0 ? port : scheme == "https" ? 443 : 80};
        g_free(lower);
    }
    g_uri_unref(uri);
    return origin;
}

std::string Origin::text() const
{
    if (host.empty())
        return "an address without a host";
    const bool is_v6 = host.find(':') != std::string::npos;
    return scheme + "://" + (is_v6 ? "[" + host + "]" : host) + ":" + std::to_string(port);
}
