#pragma once
// A velora-cloud of a test's own, and requests to it.
#include <filesystem>
#include <map>
#include <string>
#include <sys/types.h>
#include <vector>

struct Answer {
    int status = 0;                                  // 0: no answer
    std::multimap<std::string, std::string> headers; // names in lower case
    std::string body;

    std::string header(const std::string &name) const
    {
        const auto found = headers.find(name);
        return found == headers.end() ? "" : found->second;
    }
};

using Headers = std::vector<std::string>;

struct Run {
    int code = -1;
    std::string out, err;
};
// Runs velora-cloud to its end. Arguments may name the folder "ROOT".
Run run_cloud(std::vector<std::string> arguments);

// Serves a folder of its own until the end of the test. Its account is "ann@example.org" with the password "secret".
class Cloud {
  public:
    explicit Cloud(std::vector<std::string> options = {});
    ~Cloud();
    // Ends the service by the signal; the result is its exit code, or -1 when the signal killed it.
    int stop(int signal);
    void start();

    // `path` is sent as it is. The account's Basic credentials are added unless a header has an Authorization.
    Answer ask(const std::string &method, const std::string &path, Headers headers = {}, const std::string &body = "",
               bool chunked = false) const;
    // The used bytes as the account is told.
    long long used() const;
    // Files of the account's folder, and of the folder for temporary files.
    std::filesystem::path file(const std::string &name) const;
    size_t temporary_files() const;

    std::filesystem::path root;
    std::string url; // without the final slash
    int port = 0;

  private:
    std::vector<std::string> options;
    pid_t pid = 0;
};

// A connection on which a request is sent piece by piece.
class Connection {
  public:
    explicit Connection(const Cloud &cloud);
    ~Connection();
    // A request of the account up to the end of its headers.
    void begin(const std::string &method, const std::string &path, long long length, const std::string &headers = "");
    void put(const std::string &path, long long length, const std::string &headers = "")
    {
        begin("PUT", path, length, headers);
    }
    void send(const std::string &bytes) const;
    // The status of the answer; 0 when the connection ends without one.
    int status() const;

  private:
    int fd;
};

std::string read_file(const std::filesystem::path &path);
void write_file(const std::filesystem::path &path, const std::string &bytes);
// Looks every 10 ms; false when five seconds have not been enough.
template <typename Condition> bool comes_true(Condition condition);
bool wait_a_little(int &rounds);

template <typename Condition> bool comes_true(Condition condition)
{
    for (int rounds = 0; !condition();)
        if (!wait_a_little(rounds))
            return false;
    return true;
}
