#include "sessions.h"
#include "secrets.h"
#include <glib.h>

static const int64_t LIFE = 3600LL * G_USEC_PER_SEC;
static const size_t SESSIONS_MOST = 4000, OF_ACCOUNT_MOST = 20;
static const size_t ID_SIZE = 64;

Sessions::Sessions() : key(random_bytes(32)) {}

std::string Sessions::new_id()
{
    return hex(random_bytes(ID_SIZE / 2));
}

bool Sessions::is_id(const std::string &text)
{
    return text.size() == ID_SIZE && text.find_first_not_of("0123456789abcdef") == std::string::npos;
}

// Those that are over go, then the account's own that would end first, and only then somebody else's.
void Sessions::make_room(long long account)
{
    const int64_t now = g_get_monotonic_time();
    std::erase_if(signed_in, [now](const auto &one) { return one.second.ends <= now; });
    size_t own = 0;
    auto first_own = signed_in.end(), first = signed_in.end();
    for (auto one = signed_in.begin(); one != signed_in.end(); ++one) {
        const bool is_own = one->second.account == account;
        own += is_own;
        if (is_own && (first_own == signed_in.end() || one->second.ends < first_own->second.ends))
            first_own = one;
        if (first == signed_in.end() || one->second.ends < first->second.ends)
            first = one;
    }
    if (own >= OF_ACCOUNT_MOST)
        signed_in.erase(first_own);
    else if (signed_in.size() >= SESSIONS_MOST)
        signed_in.erase(first);
}

std::string Sessions::begin(long long account, const std::string &language)
{
    make_room(account);
    std::string id = new_id();
    signed_in[sha256(id)] = {account, language, g_get_monotonic_time() + LIFE};
    return id;
}

long long Sessions::account_of(const std::string &id, std::string &language)
{
    const auto found = id.empty() ? signed_in.end() : signed_in.find(sha256(id));
    if (found == signed_in.end() || found->second.ends <= g_get_monotonic_time())
        return 0;
    language = found->second.language;
    return found->second.account;
}

void Sessions::end(const std::string &id)
{
    signed_in.erase(sha256(id));
}

std::string Sessions::form_token(const std::string &id) const
{
    return hex(hmac_sha256(key, "form\n" + id));
}
