// Apache's mod_dav and velora-cloud, each a process of its own on a port of 127.0.0.1.
#include "backend.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/dav.h"
#include "cloud_content_sync/names.h"
#include <arpa/inet.h>
#include <chrono>
#include <csignal>
#include <curl/curl.h>
#include <fstream>
#include <glib.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

static constexpr unsigned NOBODY = 65534;
static constexpr char USER[] = "someone@example.org";
static constexpr char PASSWORD[] = "a secret: with colon";

namespace {

class Server : public Backend {
  public:
    ~Server() override
    {
        go_down();
    }

    void go_down() override
    {
        if (pid > 0) {
            kill(pid, SIGTERM);
            waitpid(pid, nullptr, 0);
        }
        pid = -1;
    }
    void make_folder(const std::string &path) override
    {
        EXPECT_EQ(ask("MKCOL", path, ""), 201) << path;
    }
    void store(const std::string &path, const std::string &bytes) override
    {
        const long status = ask("PUT", path, bytes);
        EXPECT_TRUE(status == 201 || status == 204) << path << " " << status;
    }
    void remove(const std::string &path) override
    {
        EXPECT_EQ(ask("DELETE", path, ""), 204) << path;
    }
    std::optional<std::string> content(const std::string &path) override
    {
        return ask("GET", path, "") == 200 ? std::optional(answer) : std::nullopt;
    }
    std::vector<std::string> list(const std::string &folder) override
    {
        EXPECT_EQ(ask("PROPFIND", folder, cloud::propfind_body(false)), 207);
        cloud::MultistatusReader reader("/dav");
        EXPECT_TRUE(reader.feed(answer.data(), answer.size()) && reader.finish());
        std::vector<std::string> names;
        for (const cloud::DavEntry &entry : reader.entries)
            if (entry.path != folder)
                names.push_back(cloud::name_of(entry.path));
        return names;
    }

  protected:
    // Signs in, once the address is known.
    void introduce(const std::string &address)
    {
        url = address;
        std::ofstream(scratch.path + "/Test.conf") << "[Service]\nStorage=" << url << "/dav/\n";
        setenv("CLOUD_SERVICES_DIR", scratch.path.c_str(), 1);
        setenv("PLATFORM_DATA_DIR", (scratch.path + "/data").c_str(), 1);
        mkdir((scratch.path + "/data").c_str(), 0700);
        EXPECT_EQ(cloud_content_sync_credentials_set("Test", USER, PASSWORD), 0);
    }

    long ask(const char *method, const std::string &path, const std::string &body)
    {
        answer.clear();
        std::unique_ptr<CURL, decltype(&curl_easy_cleanup)> easy(curl_easy_init(), curl_easy_cleanup);
        curl_easy_setopt(easy.get(), CURLOPT_URL, (url + "/dav" + cloud::percent_encode(path)).c_str());
        curl_easy_setopt(easy.get(), CURLOPT_CUSTOMREQUEST, method);
        curl_easy_setopt(easy.get(), CURLOPT_USERNAME, USER);
        curl_easy_setopt(easy.get(), CURLOPT_PASSWORD, PASSWORD);
        if (!body.empty() || std::string(method) == "PUT") {
            curl_easy_setopt(easy.get(), CURLOPT_POSTFIELDSIZE, static_cast<long>(body.size()));
            curl_easy_setopt(easy.get(), CURLOPT_POSTFIELDS, body.data());
        }
        curl_slist *headers = curl_slist_append(nullptr, "Expect:");
        if (std::string(method) == "PROPFIND")
            headers = curl_slist_append(headers, "Depth: 1");
        curl_easy_setopt(easy.get(), CURLOPT_HTTPHEADER, headers);
        curl_easy_setopt(easy.get(), CURLOPT_WRITEDATA, &answer);
        curl_easy_setopt(
            easy.get(), CURLOPT_WRITEFUNCTION, +[](char *data, size_t size, size_t count, void *to) {
                static_cast<std::string *>(to)->append(data, size * count);
                return size * count;
            });
        long status = 0;
        curl_easy_perform(easy.get());
        curl_easy_getinfo(easy.get(), CURLINFO_RESPONSE_CODE, &status);
        curl_slist_free_all(headers);
        return status;
    }

    // Starts the program with its standard output on `out`.
    void spawn(std::vector<std::string> args, int out, bool as_nobody)
    {
        std::vector<char *> argv;
        for (std::string &arg : args)
            argv.push_back(arg.data());
        argv.push_back(nullptr);
        pid = fork();
        if (pid == 0) {
            if (as_nobody && (setgid(NOBODY) != 0 || setuid(NOBODY) != 0))
                _exit(126);
            prctl(PR_SET_PDEATHSIG, SIGKILL); // also when the test crashes; a change of user would clear it
            if (out >= 0)
                dup2(out, STDOUT_FILENO);
            execv(argv[0], argv.data());
            _exit(127);
        }
    }

    Scratch scratch;
    std::string url, answer;
    pid_t pid = -1;
};

class VeloraCloud : public Server {
  public:
    explicit VeloraCloud(const Wish &wish)
    {
        std::vector<std::string> args = {getenv("VELORA_CLOUD"),
                                         "--root",
                                         scratch.path + "/root",
                                         "--listen",
                                         "127.0.0.1:0",
                                         "--add-account",
                                         std::string(USER) + ":" + PASSWORD};
        if (wish.quota)
            args.insert(args.end(), {"--quota", std::to_string(wish.quota)});
        if (wish.fail_status)
            args.insert(args.end(), {"--fail", "1:" + std::to_string(wish.fail_status)});
        if (wish.lose_reply)
            args.insert(args.end(), {"--lose-reply", std::to_string(wish.lose_reply)});
        int ends[2];
        if (pipe(ends) != 0)
            abort();
        spawn(args, ends[1], false);
        close(ends[1]);
        std::string said;
        char buffer[512];
        for (ssize_t got = 1; got > 0 && said.find("/\n") == said.npos;
             said.append(buffer, static_cast<size_t>(std::max<ssize_t>(got, 0))))
            got = read(ends[0], buffer, sizeof buffer);
        close(ends[0]);
        const size_t start = said.find("http://");
        const size_t end = said.find("/\n");
        EXPECT_TRUE(start != said.npos && end != said.npos) << said;
        if (start != said.npos && end != said.npos)
            introduce(said.substr(start, end - start));
    }
    Ability ability() const override
    {
        return {true, true, {"new\nline.txt", "\xff\xfe.bin"}};
    }
};

class Apache : public Server {
  public:
    Apache()
    {
        for (const char *folder : {"", "/dav", "/lock"}) {
            const std::string path = scratch.path + folder;
            mkdir(path.c_str(), 0700);
            // Apache refuses to serve as root.
            if (geteuid() == 0 && chown(path.c_str(), NOBODY, NOBODY) != 0)
                abort();
        }
        write_users();
        for (int attempt = 0; attempt < 5 && url.empty(); attempt++) {
            const int port = free_port();
            write_config(port);
            spawn({"/usr/sbin/apache2", "-X", "-f", scratch.path + "/httpd.conf"}, -1, geteuid() == 0);
            if (answers(port))
                introduce("http://127.0.0.1:" + std::to_string(port));
            else
                go_down(); // somebody else took the port
        }
        EXPECT_FALSE(url.empty()) << "Apache does not start";
    }
    Ability ability() const override
    {
        return {true, false, {}};
    }

  private:
    void write_users() const
    {
        guint8 digest[20];
        gsize size = sizeof digest;
        GChecksum *sum = g_checksum_new(G_CHECKSUM_SHA1);
        g_checksum_update(sum, reinterpret_cast<const guchar *>(PASSWORD), -1);
        g_checksum_get_digest(sum, digest, &size);
        g_checksum_free(sum);
        g_autofree char *hash = g_base64_encode(digest, size);
        std::ofstream(scratch.path + "/users") << USER << ":{SHA}" << hash << "\n";
    }

    void write_config(int port) const
    {
        std::ofstream config(scratch.path + "/httpd.conf");
        config << "ServerRoot " << scratch.path << "\nServerName 127.0.0.1\nListen 127.0.0.1:" << port << "\nPidFile "
               << scratch.path << "/pid\nErrorLog " << scratch.path << "/error.log\n";
        for (const char *module :
             {"mpm_event", "authn_core", "authn_file", "authz_core", "authz_user", "auth_basic", "dav", "dav_fs"})
            config << "LoadModule " << module << "_module /usr/lib/apache2/modules/mod_" << module << ".so\n";
        config << "DocumentRoot " << scratch.path << "\nDavLockDB " << scratch.path << "/lock/db\n<Directory "
               << scratch.path << "/dav>\nDav On\nAuthType Basic\nAuthName test\nAuthUserFile " << scratch.path
               << "/users\nRequire valid-user\n</Directory>\n";
    }

    static int free_port()
    {
        const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockaddr_in address = {};
        socklen_t size = sizeof address;
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        if (bind(fd, reinterpret_cast<sockaddr *>(&address), size) != 0 ||
            getsockname(fd, reinterpret_cast<sockaddr *>(&address), &size) != 0)
            abort();
        close(fd);
        return ntohs(address.sin_port);
    }

    bool answers(int port)
    {
        sockaddr_in address = {};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        address.sin_port = htons(static_cast<uint16_t>(port));
        const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(20);
        while (std::chrono::steady_clock::now() < end && waitpid(pid, nullptr, WNOHANG) == 0) {
            const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
            const bool is_open = connect(fd, reinterpret_cast<sockaddr *>(&address), sizeof address) == 0;
            close(fd);
            if (is_open)
                return true;
            std::this_thread::sleep_for(std::chrono::milliseconds(10));
        }
        return false;
    }
};

} // namespace

std::vector<std::string> backend_names()
{
    std::vector<std::string> names;
    if (access("/usr/sbin/apache2", X_OK) == 0)
        names.emplace_back("Apache");
    if (const char *program = getenv("VELORA_CLOUD"); program && access(program, X_OK) == 0)
        names.emplace_back("VeloraCloud");
    return names;
}

std::unique_ptr<Backend> start_backend(const std::string &name, const Wish &wish)
{
    if (name == "VeloraCloud")
        return std::make_unique<VeloraCloud>(wish);
    if (wish.lose_reply || wish.fail_status || wish.quota)
        return nullptr;
    return std::make_unique<Apache>();
}
