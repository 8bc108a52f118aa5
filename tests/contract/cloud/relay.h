#pragma once
// Stands between a client and a server, and keeps an answer for itself when it is told to.
#include "cloud.h"
#include <atomic>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

class Relay {
  public:
    explicit Relay(int server_port) : to(server_port)
    {
        listener = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockaddr_in address = local(0);
        socklen_t size = sizeof address;
        if (bind(listener, reinterpret_cast<sockaddr *>(&address), size) != 0 || listen(listener, 16) != 0 ||
            getsockname(listener, reinterpret_cast<sockaddr *>(&address), &size) != 0)
            std::abort();
        port = ntohs(address.sin_port);
        acceptor = std::thread([this] {
            for (int fd = 0; (fd = accept4(listener, nullptr, nullptr, SOCK_CLOEXEC)) >= 0;)
                workers.emplace_back([this, fd] { run(fd); });
        });
    }
    // To be called when neither side holds a connection any more.
    ~Relay()
    {
        shutdown(listener, SHUT_RDWR);
        acceptor.join();
        close(listener);
        for (std::thread &worker : workers)
            worker.join();
    }
    Relay(const Relay &) = delete;
    Relay &operator=(const Relay &) = delete;

    int port = 0;
    // The next answer to a request of this method is lost, with its connection. Null: none is.
    std::atomic<const char *> lost = nullptr;

  private:
    static sockaddr_in local(int number)
    {
        sockaddr_in address = {};
        address.sin_family = AF_INET;
        address.sin_port = htons(static_cast<uint16_t>(number));
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        return address;
    }

    void run(int client)
    {
        const int server = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
        const sockaddr_in address = local(to);
        pollfd ends[] = {{client, POLLIN, 0}, {server, POLLIN, 0}};
        bool goes_on = connect(server, reinterpret_cast<const sockaddr *>(&address), sizeof address) == 0;
        std::vector<char> bytes(64 << 10);
        std::string method;
        bool is_asking = false; // what comes from the client goes on with a request
        while (goes_on && poll(ends, 2, -1) > 0) {
            for (int from = 0; from < 2 && goes_on; from++) {
                if (!ends[from].revents)
                    continue;
                const ssize_t got = read(ends[from].fd, bytes.data(), bytes.size());
                const std::string_view text(bytes.data(), static_cast<size_t>(std::max<ssize_t>(got, 0)));
                if (from == 0 && !std::exchange(is_asking, true))
                    method = text.substr(0, text.find(' '));
                if (from == 1)
                    is_asking = false;
                const char *wanted = lost;
                const bool is_lost = from == 1 && wanted && method == wanted && lost.exchange(nullptr);
                goes_on = got > 0 && !is_lost && send(ends[1 - from].fd, text.data(), text.size(), MSG_NOSIGNAL) == got;
            }
        }
        close(server);
        close(client);
    }

    const int to;
    int listener = -1;
    std::thread acceptor;
    std::vector<std::thread> workers; // the acceptor's until it has ended
};
