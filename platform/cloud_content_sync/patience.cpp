#include "cloud_content_sync/patience.h"
#include <algorithm>

namespace cloud {

static constexpr std::chrono::seconds FIRST_PAUSE{1}, LONGEST_PAUSE{30};
static constexpr int DOUBLINGS_MAX = 5;

Wait Patience::next(bool is_reachable, bool has_network, long long retry_after)
{
    Wait wait;
    const auto now = Wait::Clock::now();
    if (attempts == 0)
        began = now;
    std::chrono::seconds pause = std::min(LONGEST_PAUSE, FIRST_PAUSE * (1 << std::min(attempts, DOUBLINGS_MAX)));
    if (retry_after >= 0)
        pause = std::chrono::seconds(std::clamp(retry_after, 1LL, static_cast<long long>(limit.count()) + 1));
    if (limit.count() == 0 || (has_network && now + pause > began + limit))
        return wait;
    attempts++;
    wait.reason = is_reachable  ? CLOUD_CONTENT_SYNC_WAIT_SERVICE_BUSY
                  : has_network ? CLOUD_CONTENT_SYNC_WAIT_NOT_REACHABLE
                                : CLOUD_CONTENT_SYNC_WAIT_NO_NETWORK;
    wait.until = wait.told_until = now + pause;
    return wait;
}

} // namespace cloud
