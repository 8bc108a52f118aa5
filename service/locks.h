#pragma once
// Write locks (RFC 4918, 6 and 7). They live in memory: a restart forgets them, as clients must expect. Main thread
// only.
#include "path.h"
#include <cstdint>

struct Lock {
    std::string token; // urn:uuid:...
    long long account = 0;
    Path path;         // what was locked
    bool deep = false; // and all below it
    bool exclusive = true;
    std::string owner;   // the owner element as the client sent it, or empty
    int64_t seconds = 0; // how long after a refresh it ends
    int64_t ends = 0;    // monotonic microseconds

    bool covers(long long of_account, const Path &other) const
    {
        return account == of_account && (path.parts == other.parts || (deep && path.holds(other)));
    }
};

class Locks {
  public:
    // Adds a lock and gives it its token. Null when another lock stands against it. The result is valid until the next
    // call.
    const Lock *add(Lock lock);
    // The lock of that token when it covers the path, else null.
    Lock *find(long long account, const Path &path, const std::string &token);
    void refresh(Lock &lock);
    void remove(const std::string &token);
    // The path and what is below it is no longer there.
    void forget(long long account, const Path &path);
    // Whether somebody who knows these tokens may change what is at the path, and what is below it if `below`.
    bool may_change(long long account, const Path &path, bool below, const std::vector<std::string> &tokens);
    // The value of the lockdiscovery property.
    std::string discovery(long long account, const Path &path);
    bool empty() const
    {
        return locks.empty();
    }

  private:
    void expire();
    std::vector<Lock> locks;
};

// An If header (RFC 4918, 10.4).
struct IfHeader {
    struct Condition {
        bool negated = false, is_etag = false;
        std::string value;
    };
    struct List {
        std::string resource; // the tag's URI; empty for the request's own
        std::vector<Condition> conditions;
    };
    std::vector<List> lists;
    std::vector<std::string> tokens; // all that appear

    // False when the header cannot be read.
    bool read(const char *text);
};

// The seconds that a Timeout header asks for, within what we grant; null is allowed.
int64_t lock_seconds(const char *timeout);
