#include "velora_upload_file/upload_pace.h"
#include <algorithm>

// Two writes in 200 ms are ten in a second, wherever it begins; a text and a bar that change together need not wait.
static constexpr std::chrono::milliseconds s_span(200);

void NotiPace::offer(NotiChange change)
{
    const auto same = std::ranges::find_if(waiting, [&change](const NotiChange &one) {
        return one.noti_id == change.noti_id && one.content.has_value() == change.content.has_value();
    });
    if (same != waiting.end())
        *same = std::move(change);
    else
        waiting.push_back(std::move(change));
}

std::optional<NotiPace::Time> NotiPace::due() const
{
    if (waiting.empty())
        return std::nullopt;
    return before_last ? *before_last + s_span : Time::min();
}

std::optional<NotiChange> NotiPace::take(Time now)
{
    if (const std::optional<Time> time = due(); !time || now < *time)
        return std::nullopt;
    NotiChange first = std::move(waiting.front());
    waiting.erase(waiting.begin());
    return first;
}

void NotiPace::wrote(Time now)
{
    before_last = last;
    last = now;
}

void NotiPace::forget(int noti_id)
{
    std::erase_if(waiting, [noti_id](const NotiChange &one) { return one.noti_id == noti_id; });
    before_last = last = std::nullopt;
}
