#include "cloud.h"
#include <algorithm>
#include <arpa/inet.h>
#include <csignal>
#include <curl/curl.h>
#include <glib.h>
#include <gtest/gtest.h>
#include <sstream>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>

namespace fs = std::filesystem;

std::string basic_authorization(const std::string &user, const std::string &password)
{
    const std::string text = user + ":" + password;
    g_autofree char *encoded = g_base64_encode(reinterpret_cast<const guchar *>(text.data()), text.size());
    return std::string("Authorization: Basic ") + encoded;
}

static sockaddr_in local_address(int port)
{
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<uint16_t>(port));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    return address;
}

int free_port()
{
    const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address = local_address(0);
    socklen_t size = sizeof address;
    if (bind(fd, reinterpret_cast<sockaddr *>(&address), size) != 0 ||
        getsockname(fd, reinterpret_cast<sockaddr *>(&address), &size) != 0)
        std::abort();
    close(fd);
    return ntohs(address.sin_port);
}

pid_t spawn(std::vector<std::string> words, const fs::path &out, const fs::path &err, unsigned user, const fs::path &in,
            const std::function<void()> &before)
{
    std::vector<char *> argv;
    for (std::string &word : words)
        argv.push_back(word.data());
    argv.push_back(nullptr);
    const pid_t pid = fork();
    if (pid)
        return pid;
    if (user && (setgid(user) != 0 || setuid(user) != 0))
        _exit(126);
    if (before)
        before();
    prctl(PR_SET_PDEATHSIG, SIGKILL); // also when the test crashes; a change of user would clear it
    if (freopen(in.c_str(), "r", stdin) && (out.empty() || freopen(out.c_str(), "w", stdout)) &&
        (err.empty() || freopen(err.c_str(), "w", stderr)))
        execv(argv[0], argv.data());
    _exit(127);
}

int end_of(pid_t pid)
{
    int state = 0;
    waitpid(pid, &state, 0);
    return WIFEXITED(state) ? WEXITSTATUS(state) : -1;
}

Run run_cloud(std::vector<std::string> arguments, const std::string &input)
{
    const TempFolder folder;
    std::replace(arguments.begin(), arguments.end(), std::string("ROOT"), folder.path + "/root");
    arguments.insert(arguments.begin(), std::getenv("VELORA_CLOUD"));
    const int code = end_of(spawn(arguments, folder / "out", folder / "err", 0, folder.file("in", input)));
    return {code, read_file(folder / "out"), read_file(folder / "err")};
}

Cloud::Cloud(Headers more, std::string passwords, std::function<void()> first)
    : options(std::move(more)), input("secret\n" + passwords), before_start(std::move(first))
{
    start();
}

Cloud::~Cloud()
{
    if (pid) {
        EXPECT_EQ(stop(SIGTERM), 0) << read_file(place / "err"); // also what a sanitizer has found
    }
}

void Cloud::start()
{
    std::vector<std::string> words{std::getenv("VELORA_CLOUD"), "--root",   root,         "--add-account",
                                   "ann@example.org",           "--listen", "127.0.0.1:0"};
    words.insert(words.end(), options.begin(), options.end());
    const fs::path out = place / "out";
    write_file(out, "");
    const bool is_sanitized = getenv("ASAN_OPTIONS") || getenv("TSAN_OPTIONS");
    const auto limit = [this, is_sanitized] {
        const rlimit memory = {2LL << 30, 2LL << 30};
        if (!is_sanitized)
            setrlimit(RLIMIT_AS, &memory);
        if (before_start)
            before_start();
    };
    pid = spawn(words, out, place / "err", 0, place.file("in", input), limit);
    const std::string line = "listening on ";
    comes_true([&] { return read_file(out).find(line) != std::string::npos && read_file(out).back() == '\n'; });
    const std::string text = read_file(out);
    url = text.substr(text.find(line) + line.size());
    url.resize(url.find_last_of('/'));
    port = std::stoi(url.substr(url.rfind(':') + 1));
}

int Cloud::stop(int signal)
{
    kill(pid, signal);
    return end_of(std::exchange(pid, 0));
}

static size_t take_body(char *bytes, size_t, size_t size, void *data)
{
    static_cast<Answer *>(data)->body.append(bytes, size);
    return size;
}

static size_t take_header(char *bytes, size_t, size_t size, void *data)
{
    std::string line(bytes, size), name;
    const size_t colon = line.find(": ");
    if (colon == std::string::npos)
        return size;
    for (const char c : line.substr(0, colon))
        name += static_cast<char>(std::tolower(c));
    static_cast<Answer *>(data)->headers.emplace(name, line.substr(colon + 2, line.size() - colon - 4));
    return size;
}

static size_t give_body(char *bytes, size_t, size_t size, void *data)
{
    return static_cast<size_t>(static_cast<std::istringstream *>(data)->readsome(bytes, static_cast<long>(size)));
}

Answer ask_url(const std::string &method, const std::string &url, Headers headers, const std::string &body,
               bool chunked)
{
    Answer answer;
    std::istringstream source(body);
    CURL *curl = curl_easy_init();
    curl_slist *list = nullptr;
    headers.emplace_back("Expect:");
    for (const std::string &header : headers)
        list = curl_slist_append(list, header.c_str());
    curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
    if (const char *authority = getenv("CLOUD_TEST_CA"))
        curl_easy_setopt(curl, CURLOPT_CAINFO, authority);
    curl_easy_setopt(curl, CURLOPT_PATH_AS_IS, 1L);
    curl_easy_setopt(curl, CURLOPT_TIMEOUT, 20L);
    curl_easy_setopt(curl, CURLOPT_CUSTOMREQUEST, method.c_str());
    curl_easy_setopt(curl, CURLOPT_NOBODY, method == "HEAD" ? 1L : 0L);
    if (method == "PUT" || !body.empty()) {
        curl_easy_setopt(curl, CURLOPT_UPLOAD, 1L);
        curl_easy_setopt(curl, CURLOPT_INFILESIZE_LARGE, chunked ? -1 : static_cast<curl_off_t>(body.size()));
    }
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, list);
    curl_easy_setopt(curl, CURLOPT_READFUNCTION, give_body);
    curl_easy_setopt(curl, CURLOPT_READDATA, &source);
    curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, take_body);
    curl_easy_setopt(curl, CURLOPT_WRITEDATA, &answer);
    curl_easy_setopt(curl, CURLOPT_HEADERFUNCTION, take_header);
    curl_easy_setopt(curl, CURLOPT_HEADERDATA, &answer);
    long status = 0;
    if (curl_easy_perform(curl) == CURLE_OK)
        curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &status);
    answer.status = static_cast<int>(status);
    curl_slist_free_all(list);
    curl_easy_cleanup(curl);
    return answer;
}

Answer Cloud::ask(const std::string &method, const std::string &path, Headers headers, const std::string &body,
                  bool chunked) const
{
    if (std::none_of(headers.begin(), headers.end(), [](const auto &h) { return h.starts_with("Authorization:"); }))
        headers.emplace_back(basic_authorization("ann@example.org", "secret"));
    return ask_url(method, url + path, headers, body, chunked);
}

long long Cloud::used() const
{
    const std::string json = ask("GET", "/1/account/info").body, key = "\"used\":";
    const size_t at = json.find(key);
    return at == std::string::npos ? -1 : std::stoll(json.substr(at + key.size()));
}

fs::path Cloud::file(const std::string &name) const
{
    return root / "files" / "ann@example.org" / name;
}

size_t Cloud::temporary_files() const
{
    return static_cast<size_t>(std::distance(fs::directory_iterator(root / "tmp"), {}));
}

size_t Cloud::descriptors() const
{
    return static_cast<size_t>(std::distance(fs::directory_iterator("/proc/" + std::to_string(pid) + "/fd"), {}));
}

static int connected(int fd, int port)
{
    const sockaddr_in address = local_address(port);
    return connect(fd, reinterpret_cast<const sockaddr *>(&address), sizeof address);
}

Connection::Connection(int port) : fd(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)), is_open(connected(fd, port) == 0)
{
    const timeval patience{20, 0};
    setsockopt(fd, SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof patience);
}

Connection::~Connection()
{
    close(fd);
}

void Connection::begin(const std::string &method, const std::string &path, long long length,
                       const std::string &headers) const
{
    send(method + " " + path + " HTTP/1.1\r\nHost: localhost\r\nContent-Length: " + std::to_string(length) + "\r\n" +
         basic_authorization("ann@example.org", "secret") + "\r\n" + headers + "\r\n");
}

void Connection::send(const std::string &bytes) const
{
    ::send(fd, bytes.data(), bytes.size(), MSG_NOSIGNAL);
}

int Connection::status() const
{
    std::string text;
    char block[4096];
    for (ssize_t count; text.find("\r\n") == std::string::npos && (count = recv(fd, block, sizeof block, 0)) > 0;)
        text.append(block, static_cast<size_t>(count));
    return text.starts_with("HTTP/1.1 ") ? std::stoi(text.substr(9, 3)) : 0;
}

bool Connection::has_ended() const
{
    char block[4096];
    ssize_t count = 0;
    while ((count = recv(fd, block, sizeof block, MSG_DONTWAIT)) > 0)
        continue;
    return count == 0 || errno != EAGAIN;
}

std::string Connection::all() const
{
    std::string text;
    char block[4096];
    for (ssize_t count; (count = recv(fd, block, sizeof block, 0)) > 0;)
        text.append(block, static_cast<size_t>(count));
    return text;
}
