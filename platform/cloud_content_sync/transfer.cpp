// What a request's answer means.
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/http.h"
#include <glib.h>

namespace cloud {

bool Transfer::never_sent() const
{
    switch (result) {
    case CURLE_COULDNT_RESOLVE_HOST:
    case CURLE_COULDNT_RESOLVE_PROXY:
    case CURLE_COULDNT_CONNECT:
    case CURLE_SSL_CONNECT_ERROR:
    case CURLE_PEER_FAILED_VERIFICATION:
    case CURLE_SSL_CACERT_BADFILE:
    case CURLE_URL_MALFORMAT:
        return true;
    default:
        return false;
    }
}

long long Transfer::asks_to_wait() const
{
    const bool is_busy = status == 429 || (status == 503 && retry_after > 0);
    return result == CURLE_OK && is_busy ? retry_after : -1;
}

bool Transfer::leaves_open() const
{
    return result == CURLE_OK && (status == 408 || (status >= 500 && status <= 504 && status != 501));
}

int Transfer::error() const
{
    if (result == CURLE_WRITE_ERROR || result == CURLE_WEIRD_SERVER_REPLY || result == CURLE_UNSUPPORTED_PROTOCOL)
        return CLOUD_CONTENT_SYNC_ERROR_SERVER;
    if (result != CURLE_OK)
        return CLOUD_CONTENT_SYNC_ERROR_NETWORK;
    switch (status) {
    case 401:
        return CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED;
    case 403:
    case 409:
    case 423:
        return CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN;
    case 400:
    case 414:
        return CLOUD_CONTENT_SYNC_ERROR_BAD_NAME;
    case 507:
        return CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL;
    default:
        return CLOUD_CONTENT_SYNC_ERROR_SERVER;
    }
}

std::string sha256_of(const std::string &repr_digest)
{
    static constexpr char START[] = "sha-256=:";
    const size_t start = repr_digest.find(START);
    if (start == repr_digest.npos)
        return "";
    const size_t begin = start + sizeof START - 1;
    const size_t end = repr_digest.find(':', begin);
    if (end == repr_digest.npos)
        return "";
    gsize size = 0;
    g_autofree guchar *bytes = g_base64_decode(repr_digest.substr(begin, end - begin).c_str(), &size);
    std::string hex;
    for (gsize i = 0; i < size; i++) {
        static constexpr char DIGITS[] = "0123456789abcdef";
        hex.append({DIGITS[bytes[i] >> 4], DIGITS[bytes[i] & 15]});
    }
    return hex;
}

} // namespace cloud
