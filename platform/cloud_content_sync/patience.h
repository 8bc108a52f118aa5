#pragma once
// What an upload waits for before it is tried again: the network, a service that cannot be reached, or the time that a
// busy service has named (Retry-After, RFC 9110, 10.2.3).
#include "cloud_content_sync/cloud_content_sync.h"
#include <chrono>

namespace cloud {

// A wait that may be under way. To be used by one thread.
struct Wait {
    using Clock = std::chrono::steady_clock;

    cloud_content_sync_wait_e reason = CLOUD_CONTENT_SYNC_WAIT_NONE;
    Clock::time_point until;      // when the next attempt is made
    Clock::time_point told_until; // when the person is to be told again how long it takes

    bool is_under_way() const
    {
        return reason != CLOUD_CONTENT_SYNC_WAIT_NONE;
    }
};

// How long to wait for what. One for all uploads of a client, for they meet the same trouble; its thread alone.
class Patience {
  public:
    // After limit_seconds of trouble uploads fail; 0: at once.
    explicit Patience(int limit_seconds) : limit(limit_seconds) {}

    // An attempt has met trouble: the wait before the next one, or none when it has lasted too long. retry_after: the
    // seconds that the service has asked for, -1 when it has not. A device without a network waits as long as it takes.
    Wait next(bool is_reachable, bool has_network, long long retry_after);
    // The service has answered as it should.
    void over()
    {
        attempts = 0;
    }

  private:
    const std::chrono::seconds limit;
    int attempts = 0; // since the trouble began
    Wait::Clock::time_point began;
};

} // namespace cloud
