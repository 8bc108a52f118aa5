#pragma once
// An HTTP server that says what a test tells it to, whole or broken.
#include <algorithm>
#include <cstdlib>
#include <functional>
#include <mutex>
#include <netinet/in.h>
#include <string>
#include <sys/socket.h>
#include <thread>
#include <unistd.h>
#include <vector>

struct Request {
    std::string method, path, body, authorization;
    int connection; // counts from 1
};

class ScriptedServer {
  public:
    // Gives the whole answer, header and body; "" closes the connection without one. "\x01" at the end of an answer
    // closes the connection after it. Called under the lock below.
    using Script = std::function<std::string(const Request &)>;

    explicit ScriptedServer(Script answers) : script(std::move(answers))
    {
        listener = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockaddr_in address = {};
        socklen_t size = sizeof address;
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        if (bind(listener, reinterpret_cast<sockaddr *>(&address), size) != 0 || listen(listener, 16) != 0 ||
            getsockname(listener, reinterpret_cast<sockaddr *>(&address), &size) != 0)
            std::abort();
        port = ntohs(address.sin_port);
        acceptor = std::thread([this] {
            for (int fd = 0; (fd = accept4(listener, nullptr, nullptr, SOCK_CLOEXEC)) >= 0;)
                workers.emplace_back([this, fd, number = static_cast<int>(workers.size()) + 1] { run(fd, number); });
        });
    }
    // To be called when no client holds a connection any more.
    ~ScriptedServer()
    {
        shutdown(listener, SHUT_RDWR);
        acceptor.join();
        close(listener);
        for (std::thread &worker : workers)
            worker.join();
    }
    ScriptedServer(const ScriptedServer &) = delete;
    ScriptedServer &operator=(const ScriptedServer &) = delete;

    std::string url() const
    {
        return "http://127.0.0.1:" + std::to_string(port);
    }
    std::vector<Request> requests()
    {
        std::scoped_lock lock(mutex);
        return seen;
    }
    // What the script reads is changed under this.
    std::mutex mutex;

  private:
    static std::string field(const std::string &head, const std::string &name)
    {
        const size_t at = head.find("\r\n" + name + ": ");
        if (at == head.npos)
            return "";
        const size_t begin = at + name.size() + 4;
        return head.substr(begin, head.find("\r\n", begin) - begin);
    }

    static bool send_all(int fd, const std::string &bytes)
    {
        for (size_t sent = 0; sent < bytes.size();) {
            const ssize_t count = send(fd, bytes.data() + sent, bytes.size() - sent, MSG_NOSIGNAL);
            if (count < 0)
                return false;
            sent += static_cast<size_t>(count);
        }
        return true;
    }

    // Appends what comes until there are `size` bytes.
    static bool receive(int fd, std::string &bytes, size_t size)
    {
        char buffer[65536];
        while (bytes.size() < size) {
            const ssize_t got = read(fd, buffer, sizeof buffer);
            if (got <= 0)
                return false;
            bytes.append(buffer, static_cast<size_t>(got));
        }
        return true;
    }

    bool read_request(int fd, std::string &bytes, Request &request)
    {
        size_t end = 0;
        while ((end = bytes.find("\r\n\r\n")) == bytes.npos)
            if (!receive(fd, bytes, bytes.size() + 1))
                return false;
        const std::string head = bytes.substr(0, end + 2);
        const size_t length = std::strtoull(field(head, "Content-Length").c_str(), nullptr, 10);
        if (!receive(fd, bytes, end + 4 + length))
            return false;
        request.method = head.substr(0, head.find(' '));
        request.path = head.substr(request.method.size() + 1);
        request.path.resize(request.path.find(' '));
        request.body = bytes.substr(end + 4, length);
        request.authorization = field(head, "Authorization");
        bytes.erase(0, end + 4 + length);
        return true;
    }

    void run(int fd, int number)
    {
        std::string bytes;
        Request request;
        request.connection = number;
        for (bool goes_on = true; goes_on && read_request(fd, bytes, request);) {
            std::string answer;
            {
                std::scoped_lock lock(mutex);
                seen.push_back(request);
                answer = script(request);
            }
            goes_on = !answer.empty() && answer.back() != '\x01';
            if (!goes_on && !answer.empty())
                answer.pop_back();
            goes_on = send_all(fd, answer) && goes_on;
        }
        close(fd);
    }

    Script script;
    int listener = -1;
    int port = 0;
    std::thread acceptor;
    std::vector<std::thread> workers; // the acceptor's until it has ended
    std::vector<Request> seen;
};

inline std::string answer(const std::string &status, const std::string &body = "", const std::string &fields = "")
{
    return "HTTP/1.1 " + status + "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n" + fields + "\r\n" +
           body;
}
