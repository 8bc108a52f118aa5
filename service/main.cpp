// velora-cloud: the command line, and the loop that serves.
#include "http.h"
#include <cerrno>
#include <clocale>
#include <cstring>
#include <fcntl.h>
#include <glib-unix.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>

static const int EXIT_USAGE = 2, EXIT_TROUBLE = 1;

namespace {
struct Options {
    char *root = nullptr, *listen = nullptr, *quota = nullptr, *fail = nullptr;
    char **accounts = nullptr, **tokens = nullptr;
    int delay = 0, lose_reply = 0;

    ~Options()
    {
        for (char *text : {root, listen, quota, fail})
            g_free(text);
        g_strfreev(accounts);
        g_strfreev(tokens);
    }
};
} // namespace

static int complain(int code, const std::string &text)
{
    std::fprintf(stderr, "velora-cloud: %s\n", text.c_str());
    return code;
}

// A number of bytes, with K, M, G or T for powers of 1024. False when it is none.
static bool read_bytes(const char *text, int64_t &bytes)
{
    gchar *end = nullptr;
    errno = 0;
    const gint64 number = g_ascii_strtoll(text, &end, 10);
    static const char suffixes[] = "KMGT";
    const char *suffix = *end ? std::strchr(suffixes, g_ascii_toupper(*end)) : nullptr;
    const int shift = suffix ? 10 * static_cast<int>(suffix - suffixes + 1) : 0;
    if (!g_ascii_isdigit(*text) || errno || (*end && (!suffix || end[1])) || number > (G_MAXINT64 >> shift))
        return false;
    bytes = number << shift;
    return true;
}

// HOST:PORT, where the host is a numeric address or "localhost". Null when it is neither.
static GSocketAddress *read_address(const std::string &text)
{
    const size_t colon = text.rfind(':');
    if (colon == std::string::npos || colon + 1 == text.size() || text.size() - colon > 6 ||
        text.find_first_not_of("0123456789", colon + 1) != std::string::npos)
        return nullptr;
    std::string host = text.substr(0, colon);
    if (host.size() > 2 && host.front() == '[' && host.back() == ']')
        host = host.substr(1, host.size() - 2);
    const int port = std::stoi(text.substr(colon + 1));
    if (host == "localhost")
        host = "127.0.0.1";
    return port > 65535 ? nullptr : g_inet_socket_address_new_from_string(host.c_str(), static_cast<guint>(port));
}

static bool read_faults(const Options &options, Faults &faults)
{
    faults.delay = static_cast<unsigned>(options.delay);
    faults.lose_reply = options.lose_reply;
    int used = 0;
    if (options.fail &&
        (std::sscanf(options.fail, "%d:%d%n", &faults.fail_count, &faults.fail_status, &used) != 2 ||
         options.fail[used] || faults.fail_count < 0 || faults.fail_status < 400 || faults.fail_status > 599))
        return false;
    return options.delay >= 0 && options.lose_reply >= 0;
}

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

static int run(Service &service, const Fd &root_folder, const char *listen_at)
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

    SoupServer *server = soup_server_new("server-header", "velora-cloud", "raw-paths", TRUE, nullptr);
    serve(server, &service);
    GSocketAddress *address = read_address(listen_at);
    GError *error = nullptr;
    const bool listening = soup_server_listen(server, address, static_cast<SoupServerListenOptions>(0), &error);
    g_object_unref(address);
    if (!listening) {
        const int code = complain(EXIT_TROUBLE, std::string("cannot listen on ") + listen_at + ": " + error->message);
        g_error_free(error);
        g_object_unref(server);
        return code;
    }
    GSList *uris = soup_server_get_uris(server);
    char *uri = g_uri_to_string(static_cast<GUri *>(uris->data));
    std::printf("listening on %s\n", uri);
    std::fflush(stdout);
    g_free(uri);
    g_slist_free_full(uris, reinterpret_cast<GDestroyNotify>(g_uri_unref));

    GMainLoop *loop = g_main_loop_new(nullptr, FALSE);
    const auto quit = +[](gpointer data) -> gboolean {
        g_main_loop_quit(static_cast<GMainLoop *>(data));
        return G_SOURCE_CONTINUE;
    };
    g_unix_signal_add(SIGTERM, quit, loop);
    g_unix_signal_add(SIGINT, quit, loop);
    const auto hurry = +[](gpointer data) -> gboolean {
        static_cast<Service *>(data)->faults.delay = 0;
        return G_SOURCE_CONTINUE;
    };
    g_unix_signal_add(SIGUSR1, hurry, &service);
    g_main_loop_run(loop);
    soup_server_disconnect(server);
    g_object_unref(server);
    while (service.workers.busy() || service.painters.busy())
        g_main_context_iteration(nullptr, TRUE);
    g_main_loop_unref(loop);
    remove_temporary_files(service);
    return 0;
}

int main(int argc, char **argv)
{
    Options options;
    const GOptionEntry entries[] = {
        {"root", 0, 0, G_OPTION_ARG_FILENAME, &options.root, "Where everything is kept (required)", "DIR"},
        {"listen", 0, 0, G_OPTION_ARG_STRING, &options.listen,
         "Serve at this address; port 0 lets the system choose (127.0.0.1:8631)", "HOST:PORT"},
        {"add-account", 0, 0, G_OPTION_ARG_STRING_ARRAY, &options.accounts,
         "Add an account unless it exists; serves only when --listen is given too", "EMAIL:PASSWORD"},
        {"quota", 0, 0, G_OPTION_ARG_STRING, &options.quota,
         "Storage of the accounts of --add-account, with K, M, G or T (50G)", "BYTES"},
        {"token", 0, 0, G_OPTION_ARG_STRING_ARRAY, &options.tokens,
         "Print a new bearer token of the account; serves only when --listen is given too", "EMAIL"},
        {"fail", 0, 0, G_OPTION_ARG_STRING, &options.fail, "For tests: answer the next COUNT uploads with STATUS",
         "COUNT:STATUS"},
        {"delay", 0, 0, G_OPTION_ARG_INT, &options.delay,
         "For tests: wait after each 64 KiB of an upload, until a SIGUSR1", "MS"},
        {"lose-reply", 0, 0, G_OPTION_ARG_INT, &options.lose_reply,
         "For tests: store the N-th upload and drop its connection unanswered", "N"},
        {}};
    GOptionContext *context = g_option_context_new("- files of your own, over WebDAV");
    g_option_context_add_main_entries(context, entries, nullptr);
    GError *error = nullptr;
    const bool parsed = g_option_context_parse(context, &argc, &argv, &error);
    g_option_context_free(context);
    if (!parsed) {
        const int code = complain(EXIT_USAGE, error->message);
        g_error_free(error);
        return code;
    }
    Service service;
    int64_t quota = -1;
    const bool serving = options.listen || (!options.accounts && !options.tokens);
    if (!options.listen)
        options.listen = g_strdup("127.0.0.1:8631");
    if (argc > 1)
        return complain(EXIT_USAGE, std::string("what is \"") + argv[1] + "\"? See --help");
    if (!options.root)
        return complain(EXIT_USAGE, "--root DIR is missing");
    if (options.quota && !read_bytes(options.quota, quota))
        return complain(EXIT_USAGE, std::string("--quota: not a number of bytes: ") + options.quota);
    if (!read_faults(options, service.faults))
        return complain(EXIT_USAGE, "--fail wants COUNT:STATUS with a status of 400 to 599, --delay and --lose-reply "
                                    "numbers from 0");
    GSocketAddress *address = read_address(options.listen);
    if (!address)
        return complain(EXIT_USAGE, std::string("--listen: not an address and port: ") + options.listen);
    g_object_unref(address);

    Fd root;
    std::string reason;
    if (!open_service(options.root, service, root, reason))
        return complain(EXIT_TROUBLE, reason);
    for (char **item = options.accounts; item && *item; item++) {
        const char *colon = std::strchr(*item, ':');
        if (!colon)
            return complain(EXIT_USAGE, "--add-account wants EMAIL:PASSWORD");
        const std::string email(static_cast<const char *>(*item), colon);
        if (!service.accounts.add(email, colon + 1, quota, reason))
            return complain(EXIT_USAGE, reason);
        std::printf("account %s\n", email.c_str());
    }
    for (char **item = options.tokens; item && *item; item++) {
        const std::string token = service.accounts.issue_token(*item);
        if (token.empty())
            return complain(EXIT_TROUBLE, std::string("no account ") + *item);
        std::printf("%s\n", token.c_str());
    }
    std::fflush(stdout);
    return serving ? run(service, root, options.listen) : 0;
}
