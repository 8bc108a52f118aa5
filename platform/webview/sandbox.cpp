#include "sandbox.h"
#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <string>
#include <sys/wait.h>
#include <unistd.h>

namespace {
// Where Debian's engine looks for them.
constexpr char bwrap[] = "/usr/bin/bwrap", bus_proxy[] = "/usr/bin/xdg-dbus-proxy";
constexpr int patience_ms = 5000;

// What comes out of it, until it ends. Its exit status is no use: the main loop's own handler may have taken it.
std::string output(int fd)
{
    std::string text;
    char buffer[64];
    pollfd wait = {fd, POLLIN, 0};
    while (poll(&wait, 1, patience_ms) > 0) {
        const ssize_t got = read(fd, buffer, sizeof buffer);
        if (got <= 0)
            break;
        text.append(buffer, static_cast<size_t>(got));
    }
    return text;
}
} // namespace

bool sandbox_works()
{
    if (access(bwrap, X_OK) != 0 || access(bus_proxy, X_OK) != 0)
        return false;
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0)
        return false;
    std::string words[] = {bwrap,
                           "--ro-bind",
                           "/",
                           "/",
                           "--proc",
                           "/proc",
                           "--dev",
                           "/dev",
                           "--unshare-pid",
                           "--unshare-uts",
                           "--unshare-net",
                           "--die-with-parent",
                           "echo",
                           "works"};
    char *arguments[std::size(words) + 1] = {};
    for (size_t i = 0; i < std::size(words); i++)
        arguments[i] = words[i].data();
    posix_spawn_file_actions_t files;
    posix_spawn_file_actions_init(&files);
    posix_spawn_file_actions_addopen(&files, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&files, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
    posix_spawn_file_actions_adddup2(&files, ends[1], STDOUT_FILENO);
    pid_t child = 0;
    const bool started = posix_spawn(&child, bwrap, &files, nullptr, arguments, environ) == 0;
    posix_spawn_file_actions_destroy(&files);
    close(ends[1]);
    const bool works = started && output(ends[0]) == "works\n";
    close(ends[0]);
    if (started)
        waitpid(child, nullptr, works ? 0 : WNOHANG);
    return works;
}
