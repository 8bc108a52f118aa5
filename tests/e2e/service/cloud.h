#pragma once
// Servers of a test's own, velora-cloud above all, and requests to them.
#include "temp_home.h"
#include <functional>
#include <map>
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

// The address is sent as it is.
Answer ask_url(const std::string &method, const std::string &url, Headers headers = {}, const std::string &body = "",
               bool chunked = false);
// "Authorization: Basic ..." of RFC 7617.
std::string basic_authorization(const std::string &user, const std::string &password);
// A port of 127.0.0.1 that nobody has now.
int free_port();

// Runs a program whose output and messages go to files, and whose input comes from one; gives its process, in which
// `before` was called first.
pid_t spawn(std::vector<std::string> words, const std::filesystem::path &out, const std::filesystem::path &err,
            unsigned user = 0, const std::filesystem::path &in = "/dev/null", const std::function<void()> &before = {});
// Waits for its end: the exit code, or -1 when a signal killed it.
int end_of(pid_t pid);

struct Run {
    int code = -1;
    std::string out, err;
};
// Runs velora-cloud to its end. Arguments may name the folder "ROOT".
Run run_cloud(std::vector<std::string> arguments, const std::string &input = "");

// Serves a folder of its own until the end of the test, with 2 GiB of address space unless a sanitizer needs more. Its
// account is "ann@example.org" with the password "secret"; the input has the passwords of further ones.
class Cloud {
  public:
    explicit Cloud(Headers options = {}, std::string input = "", std::function<void()> before = {});
    ~Cloud();
    // Ends the service by the signal; the result is its exit code, or -1 when the signal killed it.
    int stop(int signal);
    void start();

    // A request of the account, unless a header has another Authorization.
    Answer ask(const std::string &method, const std::string &path, Headers headers = {}, const std::string &body = "",
               bool chunked = false) const;
    // The used bytes as the account is told.
    long long used() const;
    // Files of the account's folder, and of the folder for temporary files.
    std::filesystem::path file(const std::string &name) const;
    size_t temporary_files() const;
    // How many the service has open.
    size_t descriptors() const;

    TempFolder place;
    std::filesystem::path root = place / "root";
    std::string url; // without the final slash
    int port = 0;

  private:
    Headers options;
    std::string input;
    std::function<void()> before_start;
    pid_t pid = 0;
};

// Checks that no statement that the service has told of (--log-sql) reads a table from end to end, and that there were
// so many at least.
void expect_no_scans(const Cloud &cloud, int least);

// A connection on which a request is sent piece by piece.
class Connection {
  public:
    explicit Connection(int port);
    ~Connection();
    // A request of the account up to the end of its headers.
    void begin(const std::string &method, const std::string &path, long long length,
               const std::string &headers = "") const;
    void put(const std::string &path, long long length, const std::string &headers = "") const
    {
        begin("PUT", path, length, headers);
    }
    void send(const std::string &bytes) const;
    // The status of the answer; 0 when the connection ends without one.
    int status() const;
    // Whether the other side has closed it; what has come before is lost.
    bool has_ended() const;
    // All that comes until its end.
    std::string all() const;

  private:
    const int fd;

  public:
    const bool is_open;
};
