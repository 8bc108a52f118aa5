// velora-cloud: the folder, and the loop that serves.
#include "options.h"
#include <cerrno>
#include <fcntl.h>
#include <glib-unix.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <systemd/sd-daemon.h>

static const int EXIT_USAGE = 2, EXIT_TROUBLE = 1;
// After a SIGTERM uploads may go on for so long, those that stand still for so long, in seconds.
static const int FAREWELL = 8, STANDSTILL = 2;

static Fd folder_in(int root, const char *name)
{
    mkdirat(root, name, 0777);
    return Fd(openat(root, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
}

static bool open_service(const std::string &root, Service &service, Fd &root_folder, std::string &reason)
{
    if (mkdir(root.c_str(), 0700) != 0 && errno != EEXIST) {
        reason = "cannot make " + root + ": " + g_strerror(errno);
        return false;
    }
    root_folder = Fd(open(root.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    service.files = root_folder ? folder_in(root_folder.fd, "files") : Fd();
    service.temporary = root_folder ? folder_in(root_folder.fd, "tmp") : Fd();
    service.thumbnails = root_folder ? folder_in(root_folder.fd, "thumbnails") : Fd();
    if (!service.files || !service.temporary || !service.thumbnails) {
        reason = "cannot use " + root + ": " + g_strerror(errno);
        return false;
    }
    const std::string database = root + "/velora-cloud.db";
    close(open(database.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600)); // it holds password hashes
    if (service.db.open(database, nullptr) && service.accounts.open(service.db, service.files.fd) &&
        service.metadata.open(service.db) && media_open(service))
        return true;
    reason = "cannot open " + database;
    return false;
}

// What a crash or an unfinished upload has left behind.
static void remove_temporary_files(const Service &service)
{
    for (bool more = true; more;) {
        std::vector<Entry> entries;
        more = false;
        if (list_folder(service.temporary.fd, entries))
            for (const Entry &entry : entries)
                more = remove_tree(service.temporary.fd, entry.name, nullptr) || more;
    }
}

// Tells of each statement when it is first run.
static int log_statement(unsigned, void *, void *statement, void *)
{
    static std::set<std::string> known;
    const char *text = sqlite3_sql(static_cast<sqlite3_stmt *>(statement));
    if (text && known.insert(text).second)
        std::fprintf(stderr, "sql: %s\n", text);
    return 0;
}

namespace {
struct Running {
    Service &service;
    Server &server;
    GMainLoop *loop = g_main_loop_new(nullptr, FALSE);
    gint64 ends_at = 0; // monotonic, once it is to end

    ~Running()
    {
        g_main_loop_unref(loop);
    }
    // Every 50 ms from the signal on.
    static gboolean look(gpointer data)
    {
        auto *self = static_cast<Running *>(data);
        self->server.end_stalled(STANDSTILL);
        if (!self->server.is_empty() && g_get_monotonic_time() < self->ends_at)
            return G_SOURCE_CONTINUE;
        g_main_loop_quit(self->loop);
        return G_SOURCE_REMOVE;
    }
    static gboolean begin_end(gpointer data)
    {
        auto *self = static_cast<Running *>(data);
        if (self->ends_at) // asked twice: at once
            self->ends_at = 1;
        if (self->ends_at)
            return G_SOURCE_CONTINUE;
        sd_notify(0, "STOPPING=1");
        self->ends_at = g_get_monotonic_time() + FAREWELL * G_USEC_PER_SEC;
        self->server.stop();
        g_timeout_add(50, look, self);
        return G_SOURCE_CONTINUE;
    }
    static gboolean hurry(gpointer data)
    {
        static_cast<Running *>(data)->service.faults.delay = 0;
        return G_SOURCE_CONTINUE;
    }
};
} // namespace

// Listens as the options say. The exit code, or 0.
static int start_listening(const Options &options, Server &server)
{
    GError *error = nullptr;
    GTlsCertificate *certificate = nullptr;
    if (!options.certificate.empty()) {
        certificate = g_tls_certificate_new_from_files(options.certificate.c_str(), options.key.c_str(), &error);
        if (!certificate) {
            const int code = complain(EXIT_TROUBLE, std::string("cannot use the certificate: ") + error->message);
            g_error_free(error);
            return code;
        }
    }
    GSocketAddress *address = read_socket_address(options.listen);
    const bool is_listening = server.listen(address, certificate, &error);
    g_object_unref(address);
    g_clear_object(&certificate);
    if (is_listening)
        return 0;
    const int code = complain(EXIT_TROUBLE, "cannot listen on " + options.listen + ": " + error->message);
    g_error_free(error);
    return code;
}

static int run(Service &service, const Fd &root_folder, const Options &options)
{
    const Fd lock(openat(root_folder.fd, "lock", O_RDWR | O_CREAT | O_CLOEXEC, 0600));
    if (!lock || flock(lock.fd, LOCK_EX | LOCK_NB) != 0)
        return complain(EXIT_TROUBLE, "another velora-cloud serves this folder");
    remove_temporary_files(service);
    thumbnails_begin(service);
    struct rlimit files;
    if (getrlimit(RLIMIT_NOFILE, &files) == 0) {
        files.rlim_cur = files.rlim_max;
        setrlimit(RLIMIT_NOFILE, &files);
    }
    {
        Server server([&service] {
            auto request = std::make_shared<Request>();
            request->service = &service;
            return request;
        });
        server.patience = options.patience;
        if (options.logs)
            server.log = [](const std::string &line) { std::fprintf(stderr, "%s\n", line.c_str()); };
        if (const int code = start_listening(options, server))
            return code;
        Running running{service, server};
        const guint signals[] = {g_unix_signal_add(SIGTERM, Running::begin_end, &running),
                                 g_unix_signal_add(SIGINT, Running::begin_end, &running),
                                 g_unix_signal_add(SIGUSR1, Running::hurry, &running)};
        // Whoever reads this may end the service at once.
        std::printf("listening on %s\n", server.address().c_str());
        std::fflush(stdout);
        sd_notify(0, "READY=1");
        g_main_loop_run(running.loop);
        for (const guint source : signals)
            g_source_remove(source);
    }
    while (service.workers.busy() || service.painters.busy() || service.hashers.busy() || service.syncers.busy())
        g_main_context_iteration(nullptr, TRUE);
    remove_temporary_files(service);
    return 0;
}

int main(int argc, char **argv)
{
    Options options;
    if (const int code = read_options(argc, argv, options))
        return code;
    Service service;
    service.faults = options.faults;
    service.site = options.site;
    if (options.token_life)
        service.request_tokens.life = options.token_life;
    Fd root;
    std::string reason;
    if (!open_service(options.root, service, root, reason))
        return complain(EXIT_TROUBLE, reason);
    if (options.logs_sql)
        sqlite3_trace_v2(service.db.handle.get(), SQLITE_TRACE_STMT, log_statement, nullptr);
    for (const std::string &email : options.accounts) {
        std::string password;
        if (!read_password(email, password))
            return complain(EXIT_USAGE, "standard input has no password for " + email);
        if (!service.accounts.add(email, password, options.quota, reason))
            return complain(EXIT_USAGE, reason);
        std::printf("account %s\n", email.c_str());
    }
    for (const std::string &email : options.tokens) {
        const std::string token = service.accounts.issue_token(email, "velora-cloud --token");
        if (token.empty())
            return complain(EXIT_TROUBLE, "no account " + email);
        std::printf("%s\n", token.c_str());
    }
    std::fflush(stdout);
    return options.is_serving ? run(service, root, options) : 0;
}
