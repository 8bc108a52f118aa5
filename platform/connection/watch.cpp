// When the network may have changed: the kernel's words, and the settings store's file.
#include "base/base.h"
#include "connection/connection.h"
#include <linux/rtnetlink.h>
#include <string_view>
#include <sys/epoll.h>
#include <sys/inotify.h>
#include <sys/socket.h>
#include <unistd.h>

struct connection_watch_s {
    int kernel = -1, store = -1, both = -1;

    bool open()
    {
        kernel = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_ROUTE);
        sockaddr_nl groups = {};
        groups.nl_family = AF_NETLINK;
        groups.nl_groups =
            RTMGRP_LINK | RTMGRP_IPV4_IFADDR | RTMGRP_IPV6_IFADDR | RTMGRP_IPV4_ROUTE | RTMGRP_IPV6_ROUTE;
        if (kernel >= 0 && bind(kernel, reinterpret_cast<sockaddr *>(&groups), sizeof groups) != 0)
            return false;
        // The folder, for the database's journal is another file, which may not be there yet.
        store = inotify_init1(IN_CLOEXEC | IN_NONBLOCK);
        if (store >= 0)
            inotify_add_watch(store, platform_data_dir().c_str(), IN_MODIFY | IN_CREATE);
        both = epoll_create1(EPOLL_CLOEXEC);
        bool is_any = false;
        for (const int fd : {kernel, store}) {
            epoll_event readable = {};
            readable.events = EPOLLIN;
            is_any = (fd >= 0 && epoll_ctl(both, EPOLL_CTL_ADD, fd, &readable) == 0) || is_any;
        }
        return both >= 0 && is_any;
    }
    ~connection_watch_s()
    {
        for (const int fd : {both, store, kernel})
            if (fd >= 0)
                close(fd);
    }
};

// Whether an event is of the store's database or its journal: others keep theirs in the same folder, and one that is
// written because of a change must not pass for another change.
static bool is_of_store(const char *events, ssize_t size)
{
    for (ssize_t at = 0; at < size;) {
        const auto *event = reinterpret_cast<const inotify_event *>(events + at);
        if (event->mask & IN_Q_OVERFLOW || (event->len > 0 && std::string_view(event->name).starts_with("settings.db")))
            return true;
        at += static_cast<ssize_t>(sizeof *event + event->len);
    }
    return false;
}

int connection_watch_create(connection_watch_h *watch)
{
    if (!watch)
        return CONNECTION_ERROR_INVALID_PARAMETER;
    auto *made = new connection_watch_s;
    if (!made->open()) {
        delete made;
        return CONNECTION_ERROR_OPERATION_FAILED;
    }
    *watch = made;
    return CONNECTION_ERROR_NONE;
}

int connection_watch_destroy(connection_watch_h watch)
{
    if (!watch)
        return CONNECTION_ERROR_INVALID_PARAMETER;
    delete watch;
    return CONNECTION_ERROR_NONE;
}

int connection_watch_get_fd(connection_watch_h watch, int *fd)
{
    if (!watch || !fd)
        return CONNECTION_ERROR_INVALID_PARAMETER;
    *fd = watch->both;
    return CONNECTION_ERROR_NONE;
}

int connection_watch_read(connection_watch_h watch)
{
    if (!watch)
        return CONNECTION_ERROR_INVALID_PARAMETER;
    bool is_any = false;
    alignas(inotify_event) char buffer[4096];
    while (watch->kernel >= 0 && read(watch->kernel, buffer, sizeof buffer) > 0)
        is_any = true;
    for (ssize_t size = 0; watch->store >= 0 && (size = read(watch->store, buffer, sizeof buffer)) > 0;)
        is_any = is_of_store(buffer, size) || is_any;
    return is_any ? CONNECTION_ERROR_NONE : CONNECTION_ERROR_OPERATION_FAILED;
}
