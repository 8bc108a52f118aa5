#include "locks.h"
#include "xml.h"
#include <algorithm>
#include <cstring>
#include <glib.h>

static const int64_t SECONDS_AT_MOST = 3600;
static const size_t LOCKS_AT_MOST = 10000; // of all accounts

void Locks::expire()
{
    const int64_t now = g_get_monotonic_time();
    std::erase_if(locks, [now](const Lock &lock) { return lock.ends <= now; });
}

void Locks::refresh(Lock &lock)
{
    lock.ends = g_get_monotonic_time() + lock.seconds * G_USEC_PER_SEC;
}

const Lock *Locks::add(Lock lock)
{
    expire();
    for (const Lock &other : locks)
        if ((lock.exclusive || other.exclusive) &&
            (other.covers(lock.account, lock.path) || lock.covers(other.account, other.path)))
            return nullptr;
    if (locks.size() >= LOCKS_AT_MOST)
        return nullptr;
    char *uuid = g_uuid_string_random();
    lock.token = std::string("urn:uuid:") + uuid;
    g_free(uuid);
    refresh(lock);
    locks.push_back(std::move(lock));
    return &locks.back();
}

Lock *Locks::find(long long account, const Path &path, const std::string &token)
{
    expire();
    for (Lock &lock : locks)
        if (lock.token == token && lock.covers(account, path))
            return &lock;
    return nullptr;
}

void Locks::remove(const std::string &token)
{
    std::erase_if(locks, [&token](const Lock &lock) { return lock.token == token; });
}

void Locks::forget(long long account, const Path &path)
{
    std::erase_if(locks, [&](const Lock &lock) {
        return lock.account == account && (lock.path.parts == path.parts || path.holds(lock.path));
    });
}

bool Locks::may_change(long long account, const Path &path, bool below, const std::vector<std::string> &tokens)
{
    expire();
    const auto known = [&tokens](const Lock &lock) {
        return std::find(tokens.begin(), tokens.end(), lock.token) != tokens.end();
    };
    for (const Lock &lock : locks) {
        const bool matters = lock.covers(account, path) || (below && lock.account == account && path.holds(lock.path));
        // Of several shared locks of one resource it is enough to hold one.
        if (matters && std::none_of(locks.begin(), locks.end(), [&](const Lock &other) {
                return other.account == account && other.path.parts == lock.path.parts && known(other);
            }))
            return false;
    }
    return true;
}

std::string Locks::discovery(long long account, const Path &path)
{
    expire();
    std::string out;
    for (const Lock &lock : locks) {
        if (!lock.covers(account, path))
            continue;
        const int64_t left = (lock.ends - g_get_monotonic_time()) / G_USEC_PER_SEC;
        out += std::string("<D:activelock><D:locktype><D:write/></D:locktype><D:lockscope><D:") +
               (lock.exclusive ? "exclusive" : "shared") + "/></D:lockscope><D:depth>" +
               (lock.deep ? "infinity" : "0") + "</D:depth>" + lock.owner + "<D:timeout>Second-" +
               std::to_string(left) + "</D:timeout><D:locktoken><D:href>" + lock.token +
               "</D:href></D:locktoken><D:lockroot><D:href>" + lock.path.href(lock.path.slash) +
               "</D:href></D:lockroot></D:activelock>";
    }
    return out;
}

// Reads what stands between the bracket at *text and its end, and moves *text behind it.
static bool read_until(const char *&text, char end, std::string &value)
{
    const char *close = std::strchr(text + 1, end);
    if (!close)
        return false;
    value.assign(text + 1, close);
    text = close + 1;
    return true;
}

bool IfHeader::read(const char *text)
{
    std::string resource;
    const auto skip = [&text] { text += std::strspn(text, " \t"); };
    for (skip(); *text; skip()) {
        if (*text == '<') {
            if (!read_until(text, '>', resource))
                return false;
            continue;
        }
        if (*text != '(')
            return false;
        List list{resource, {}};
        for (text++, skip(); *text != ')'; skip()) {
            Condition condition;
            if (g_ascii_strncasecmp(text, "Not", 3) == 0) {
                condition.negated = true;
                text += 3;
                skip();
            }
            condition.is_etag = *text == '[';
            if ((*text != '<' && *text != '[') || !read_until(text, *text == '<' ? '>' : ']', condition.value))
                return false;
            if (!condition.is_etag)
                tokens.push_back(condition.value);
            list.conditions.push_back(condition);
        }
        text++;
        if (list.conditions.empty())
            return false;
        lists.push_back(std::move(list));
    }
    return !lists.empty();
}

int64_t lock_seconds(const char *timeout)
{
    const char *number = timeout ? std::strstr(timeout, "Second-") : nullptr;
    const int64_t asked = number ? g_ascii_strtoll(number + 7, nullptr, 10) : SECONDS_AT_MOST;
    return std::clamp<int64_t>(asked, 1, SECONDS_AT_MOST);
}
