#pragma once
// An HTTP server that says what a test tells it to, whole or broken, and a client of it.
#include "cloud_content_sync/known.h"
#include "transfers.h"
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

struct Request {
    std::string method, path, body, authorization, destination;
    int connection; // counts from 1
};

class ScriptedServer {
  public:
    // Gives the whole answer, header and body; "" closes the connection without one. "\x01" at the end of an answer
    // closes the connection after it. Called under the lock.
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
        url = "http://127.0.0.1:" + std::to_string(ntohs(address.sin_port));
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

    std::string url;
    // Called before the script and without the lock, so that it may wait.
    void set_hook(std::function<void(const Request &)> on_request)
    {
        std::scoped_lock lock(mutex);
        hook = std::move(on_request);
    }
    // The same before the body is read.
    void set_head_hook(std::function<void(const Request &)> on_head)
    {
        std::scoped_lock lock(mutex);
        head_hook = std::move(on_head);
    }
    std::vector<Request> requests()
    {
        std::scoped_lock lock(mutex);
        return seen;
    }
    // From now on this is the answer to everything.
    void say(const std::string &answer)
    {
        std::scoped_lock lock(mutex);
        script = [answer](const Request &) { return answer; };
    }

  private:
    // False when the connection ends.
    bool read_request(FILE *stream, Request &request)
    {
        char line[4096], method[16], path[2048];
        if (!fgets(line, sizeof line, stream) || sscanf(line, "%15s %2047s", method, path) != 2)
            return false;
        size_t length = 0;
        request = {method, path, "", "", "", request.connection};
        while (fgets(line, sizeof line, stream) && line[0] != '\r') {
            const std::string field(line, std::strlen(line) - 2);
            if (field.starts_with("Authorization: "))
                request.authorization = field.substr(15);
            if (field.starts_with("Destination: "))
                request.destination = field.substr(13);
            if (field.starts_with("Content-Length: "))
                length = std::stoul(field.substr(16));
        }
        std::unique_lock lock(mutex);
        const auto before_body = head_hook;
        lock.unlock();
        before_body(request);
        request.body.resize(length);
        return fread(request.body.data(), 1, length, stream) == length;
    }

    void run(int fd, int number)
    {
        FILE *stream = fdopen(fd, "r");
        Request request{"", "", "", "", "", number};
        for (bool goes_on = true; goes_on && read_request(stream, request);) {
            std::unique_lock lock(mutex);
            const auto before = hook;
            lock.unlock();
            before(request);
            lock.lock();
            seen.push_back(request);
            std::string answer = script(request);
            lock.unlock();
            goes_on = !answer.empty() && answer.back() != '\x01';
            if (!goes_on && !answer.empty())
                answer.pop_back();
            goes_on = send(fd, answer.data(), answer.size(), MSG_NOSIGNAL) >= 0 && goes_on;
        }
        fclose(stream);
    }

    std::mutex mutex;
    Script script;
    std::function<void(const Request &)> hook = [](const Request &) {};
    std::function<void(const Request &)> head_hook = hook;
    int listener = -1;
    std::thread acceptor;
    std::vector<std::thread> workers; // the acceptor's until it has ended
    std::vector<Request> seen;
};

inline std::string answer(const std::string &status, const std::string &body = "", const std::string &fields = "")
{
    return "HTTP/1.1 " + status + "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n" + fields + "\r\n" +
           body;
}

inline std::string multistatus(const std::string &responses)
{
    return answer("207 Multi-Status",
                  "<?xml version=\"1.0\"?><d:multistatus xmlns:d=\"DAV:\" xmlns:v=\"urn:velora:dav\">" + responses +
                      "</d:multistatus>");
}

inline std::string folder(const std::string &href)
{
    return "<d:response><d:href>" + href + "</d:href><d:propstat><d:prop><d:resourcetype><d:collection/>" +
           "</d:resourcetype></d:prop><d:status>HTTP/1.1 200 OK</d:status></d:propstat></d:response>";
}

inline std::string file(const std::string &href, const std::string &size = "5", const std::string &more = "")
{
    return "<d:response><d:href>" + href + "</d:href><d:propstat><d:prop><d:resourcetype/><d:getcontentlength>" + size +
           "</d:getcontentlength>" + more + "</d:prop><d:status>HTTP/1.1 200 OK</d:status></d:propstat></d:response>";
}

// SHA-256 of "hello".
inline constexpr char HELLO_HEX[] = "2cf24dba5fb0a30e26e83b2ac5b9e29e1b161e5c1fa7425e73043362938b9824";
inline constexpr char HELLO_DIGEST[] = "Repr-Digest: sha-256=:LPJNul+wow4m6DsqxbninhsWHlwfp0JecwQzYpOLmCQ=:\r\n";
inline constexpr char WRONG_DIGEST[] = "Repr-Digest: sha-256=:AAAAul+wow4m6DsqxbninhsWHlwfp0JecwQzYpOLmCQ=:\r\n";

class Scripted : public testing::Test {
  protected:
    void serve(ScriptedServer::Script script, int stall_seconds = 1, int wait_seconds = 0)
    {
        TearDown();
        setenv("CLOUD_SECRETS", "file", 1); // no keyring of whoever runs the tests
        server = std::make_unique<ScriptedServer>(std::move(script));
        home.file("Test.conf", "[Service]\nStorage=" + server->url + "/r%20t/\nApi=" + server->url + "/api/\nWeb=" +
                                   server->url + "\nAuthTimeout=1\nStallTimeout=" + std::to_string(stall_seconds) +
                                   "\nWaitLimit=" + std::to_string(wait_seconds) + "\n");
        setenv("CLOUD_SERVICES_DIR", home.path.c_str(), 1);
        ASSERT_EQ(cloud_content_sync_credentials_set("Test", nullptr, nullptr, "token"), 0);
        cloud::Known known(*cloud::service_find("Test"));
        for (const char *key : {"way", "destination", "digest", "auth"})
            known.doubt(key); // an earlier server may have had this port
        if (way)
            known.remember("way", static_cast<int>(*way));
        ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
    }
    void TearDown() override
    {
        if (handle)
            cloud_content_sync_destroy(handle);
        handle = nullptr;
        server.reset();
    }

    std::optional<cloud::Way> way = cloud::Way::CONDITION; // what the client has found out of the server before
    TempHome home;
    TempFolder scratch; // for local files
    std::unique_ptr<ScriptedServer> server;
    cloud_content_sync_h handle = nullptr;
};
