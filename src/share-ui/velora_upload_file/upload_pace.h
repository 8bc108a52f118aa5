#pragma once
// When the changes of an ongoing notification are written: at most ten of them in any second, two at once, and the last
// of each kind always. Whoever holds a pace sees to it that one thread at a time is in it.
#include <chrono>
#include <optional>
#include <string>
#include <vector>

struct NotiChange {
    int noti_id = 0;
    std::optional<std::string> content; // the text, or else
    double progress = 0;                // the bar, 0.0 to 1.0
};

class NotiPace {
  public:
    using Time = std::chrono::steady_clock::time_point;

    // A change that has come in the place of one of its kind that was not written.
    void offer(NotiChange change);
    // The oldest change, when it may be written now; whoever takes it writes it, and says so.
    std::optional<NotiChange> take(Time now);
    void wrote(Time now);
    // When the next change may be written; nothing when there is none.
    std::optional<Time> due() const;
    // The notification is gone, and its changes with it.
    void forget(int noti_id);

  private:
    std::vector<NotiChange> waiting;       // in the order in which they came
    std::optional<Time> before_last, last; // writes
};
