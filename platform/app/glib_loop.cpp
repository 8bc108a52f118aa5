#include "app/glib_loop.h"
#include <Ecore.h>
#include <algorithm>
#include <cerrno>
#include <glib.h>
#include <optional>
#include <poll.h>
#include <sys/select.h>
#include <utility>
#include <vector>

namespace {
Ecore_Select_Function own_select = nullptr;
std::vector<GPollFD> spare; // memory to use again; a nested loop finds it empty and takes its own

// What Ecore asks for, as poll events, and back.
struct Sets {
    fd_set *read, *write, *except;

    short wanted(int fd) const
    {
        return static_cast<short>((read && FD_ISSET(fd, read) ? POLLIN : 0) |
                                  (write && FD_ISSET(fd, write) ? POLLOUT : 0) |
                                  (except && FD_ISSET(fd, except) ? POLLPRI : 0));
    }
    void clear() const
    {
        for (fd_set *set : {read, write, except})
            if (set)
                FD_ZERO(set);
    }
    int add(const pollfd &ready) const
    {
        const auto put = [&ready](fd_set *set, int wanted, int events) {
            if (!(ready.events & wanted) || !(ready.revents & events))
                return 0;
            FD_SET(ready.fd, set);
            return 1;
        };
        return put(read, POLLIN, POLLIN | POLLHUP | POLLERR) + put(write, POLLOUT, POLLOUT | POLLERR) +
               put(except, POLLPRI, POLLPRI);
    }
};

// Until the earlier of Ecore's and GLib's next timers; nothing means for ever. Microseconds stay what they are: rounded
// down a near timer would make the loop spin, rounded up it would come late.
std::optional<timespec> earlier(const timeval *ecore, int glib_ms)
{
    std::optional<timespec> wait;
    if (ecore)
        wait = timespec{ecore->tv_sec, ecore->tv_usec * 1000};
    if (glib_ms < 0)
        return wait;
    const timespec glib{glib_ms / 1000, glib_ms % 1000 * 1'000'000L};
    if (!wait || std::pair(glib.tv_sec, glib.tv_nsec) < std::pair(wait->tv_sec, wait->tv_nsec))
        wait = glib;
    return wait;
}

int wait_for_both(int count, fd_set *read, fd_set *write, fd_set *except, timeval *timeout)
{
    static_assert(sizeof(GPollFD) == sizeof(pollfd));
    GMainContext *context = g_main_context_default();
    if (!g_main_context_acquire(context))
        return own_select(count, read, write, except, timeout);

    int priority = 0;
    int glib_ms = -1;
    g_main_context_prepare(context, &priority); // with a source ready at once, the query says 0 milliseconds
    std::vector<GPollFD> fds = std::exchange(spare, {});
    fds.resize(std::max<size_t>(fds.capacity(), 16));
    int have = 0;
    while ((have = g_main_context_query(context, priority, &glib_ms, fds.data(), static_cast<int>(fds.size()))) >
           static_cast<int>(fds.size()))
        fds.resize(static_cast<size_t>(have));
    const auto glib_count = static_cast<size_t>(have);
    fds.resize(glib_count);

    const Sets sets{read, write, except};
    for (int fd = 0; fd < count; fd++)
        if (const short events = sets.wanted(fd))
            fds.push_back({fd, static_cast<gushort>(events), 0});

    const auto wait = earlier(timeout, glib_ms);
    auto *polled = reinterpret_cast<pollfd *>(fds.data());
    const int found = ppoll(polled, fds.size(), wait ? &*wait : nullptr, nullptr);
    const int error = errno;
    if (found < 0)
        for (GPollFD &fd : fds)
            fd.revents = 0;

    sets.clear();
    int hits = 0;
    for (size_t i = glib_count; i < fds.size(); i++)
        hits += sets.add(polled[i]);
    // last, as a source may run a loop of its own
    if (g_main_context_check(context, priority, fds.data(), static_cast<int>(glib_count)))
        g_main_context_dispatch(context);
    g_main_context_release(context);
    fds.clear();
    spare = std::move(fds);
    errno = error;
    return found < 0 ? -1 : hits;
}
} // namespace

void glib_loop_start()
{
    if (own_select)
        return;
    own_select = ecore_main_loop_select_func_get();
    ecore_main_loop_select_func_set(wait_for_both);
}

void glib_loop_stop()
{
    if (own_select)
        ecore_main_loop_select_func_set(own_select);
    own_select = nullptr;
}
