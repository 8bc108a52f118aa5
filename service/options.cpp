#include "options.h"
#include <cerrno>
#include <cstring>
#include <iostream>
#include <termios.h>
#include <unistd.h>

static const int EXIT_USAGE = 2;

int complain(int code, const std::string &text)
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

GSocketAddress *read_socket_address(const std::string &text)
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

static bool is_loopback(GSocketAddress *address)
{
    return g_inet_address_get_is_loopback(g_inet_socket_address_get_address(G_INET_SOCKET_ADDRESS(address)));
}

static bool read_faults(const char *fail, int delay, int lose_reply, Faults &faults)
{
    faults.delay = static_cast<unsigned>(delay);
    faults.lose_reply = lose_reply;
    int used = 0;
    if (fail && (std::sscanf(fail, "%d:%d%n", &faults.fail_count, &faults.fail_status, &used) != 2 || fail[used] ||
                 faults.fail_count < 0 || faults.fail_status < 400 || faults.fail_status > 599))
        return false;
    return delay >= 0 && lose_reply >= 0;
}

bool read_password(const std::string &email, std::string &password)
{
    struct termios usual;
    const bool is_terminal = isatty(STDIN_FILENO) && tcgetattr(STDIN_FILENO, &usual) == 0;
    if (is_terminal) {
        std::fprintf(stderr, "password of %s: ", email.c_str());
        struct termios silent = usual;
        silent.c_lflag &= ~static_cast<tcflag_t>(ECHO);
        tcsetattr(STDIN_FILENO, TCSAFLUSH, &silent);
    }
    const bool is_there = static_cast<bool>(std::getline(std::cin, password));
    if (is_terminal) {
        tcsetattr(STDIN_FILENO, TCSAFLUSH, &usual);
        std::fprintf(stderr, "\n");
    }
    return is_there;
}

namespace {
// What GLib reads, and frees.
struct Words {
    char *root = nullptr, *listen = nullptr, *quota = nullptr, *fail = nullptr, *certificate = nullptr, *key = nullptr;
    char *base = nullptr, *callback = nullptr;
    char **accounts = nullptr, **tokens = nullptr;
    int delay = 0, lose_reply = 0, patience = 0, token_life = 0;
    gboolean no_registration = FALSE, logs = FALSE, logs_sql = FALSE, plain = FALSE;

    ~Words()
    {
        for (char *text : {root, listen, quota, fail, certificate, key, base, callback})
            g_free(text);
        g_strfreev(accounts);
        g_strfreev(tokens);
    }
};
} // namespace

static bool parse(int &argc, char **&argv, Words &words, std::string &reason)
{
    const GOptionEntry entries[] = {
        {"root", 0, 0, G_OPTION_ARG_FILENAME, &words.root, "Where everything is kept (required)", "DIR"},
        {"listen", 0, 0, G_OPTION_ARG_STRING, &words.listen,
         "Serve at this address; port 0 lets the system choose (127.0.0.1:8631)", "HOST:PORT"},
        {"tls-certificate", 0, 0, G_OPTION_ARG_FILENAME, &words.certificate,
         "Serve over TLS with this certificate and those that vouch for it (PEM)", "FILE"},
        {"tls-key", 0, 0, G_OPTION_ARG_FILENAME, &words.key, "The certificate's private key (PEM)", "FILE"},
        {"plain-http", 0, 0, G_OPTION_ARG_NONE, &words.plain,
         "Allow serving without TLS beyond this machine: everybody on the way can read everything", nullptr},
        {"add-account", 0, 0, G_OPTION_ARG_STRING_ARRAY, &words.accounts,
         "Add an account unless it exists, with a password from standard input (a line for each); serves only when "
         "--listen is given too",
         "EMAIL"},
        {"quota", 0, 0, G_OPTION_ARG_STRING, &words.quota,
         "Storage of the accounts of --add-account, with K, M, G or T (50G)", "BYTES"},
        {"token", 0, 0, G_OPTION_ARG_STRING_ARRAY, &words.tokens,
         "Print a new bearer token of the account; serves only when --listen is given too", "EMAIL"},
        {"base", 0, 0, G_OPTION_ARG_STRING, &words.base,
         "The address at which people reach this service through a proxy, such as https://cloud.example.org", "URL"},
        {"callback", 0, 0, G_OPTION_ARG_STRING, &words.callback,
         "Where a browser goes once a device was approved or declined (the service's own /auth_complete)", "URL"},
        {"no-registration", 0, 0, G_OPTION_ARG_NONE, &words.no_registration,
         "Let nobody make an account with a browser", nullptr},
        {"log", 0, 0, G_OPTION_ARG_NONE, &words.logs, "Write a line per request to standard error", nullptr},
        {"patience", 0, 0, G_OPTION_ARG_INT, &words.patience,
         "For tests: end connections after so long without headers, a request or bytes of a body", "SECONDS"},
        {"token-life", 0, 0, G_OPTION_ARG_INT, &words.token_life,
         "For tests: how long a device may wait for its approval (600)", "SECONDS"},
        {"log-sql", 0, 0, G_OPTION_ARG_NONE, &words.logs_sql,
         "For tests: write each statement for the database once to standard error", nullptr},
        {"fail", 0, 0, G_OPTION_ARG_STRING, &words.fail, "For tests: answer the next COUNT uploads with STATUS",
         "COUNT:STATUS"},
        {"delay", 0, 0, G_OPTION_ARG_INT, &words.delay,
         "For tests: wait after each 64 KiB of an upload, until a SIGUSR1", "MS"},
        {"lose-reply", 0, 0, G_OPTION_ARG_INT, &words.lose_reply,
         "For tests: store the N-th upload and drop its connection unanswered", "N"},
        {}};
    GOptionContext *context = g_option_context_new("- files of your own, over WebDAV");
    g_option_context_add_main_entries(context, entries, nullptr);
    GError *error = nullptr;
    const bool is_parsed = g_option_context_parse(context, &argc, &argv, &error);
    g_option_context_free(context);
    reason = error ? error->message : "";
    g_clear_error(&error);
    return is_parsed;
}

// An http or https address without a query; of `base` without a path, too. Its spelling is compared, so it has to be
// the usual one.
static bool is_web_address(const char *text, bool is_base)
{
    GUri *uri = g_uri_parse(text, G_URI_FLAGS_NONE, nullptr);
    if (!uri)
        return false;
    char *usual = g_uri_to_string(uri);
    const std::string scheme = g_uri_get_scheme(uri), path = g_uri_get_path(uri);
    const char *host = g_uri_get_host(uri);
    const bool is_good = (scheme == "http" || scheme == "https") && host && *host && !g_uri_get_query(uri) &&
                         !g_uri_get_fragment(uri) && !g_uri_get_userinfo(uri) && path.empty() == is_base &&
                         std::strcmp(usual, text) == 0;
    g_free(usual);
    g_uri_unref(uri);
    return is_good;
}

static std::string text_of(const char *text)
{
    return text ? text : "";
}

int read_options(int argc, char **argv, Options &options)
{
    Words words;
    std::string reason;
    if (!parse(argc, argv, words, reason))
        return complain(EXIT_USAGE, reason);
    if (argc > 1)
        return complain(EXIT_USAGE, std::string("what is \"") + argv[1] + "\"? See --help");
    if (!words.root)
        return complain(EXIT_USAGE, "--root DIR is missing");
    if (words.quota && !read_bytes(words.quota, options.quota))
        return complain(EXIT_USAGE, std::string("--quota: not a number of bytes: ") + words.quota);
    if (!read_faults(words.fail, words.delay, words.lose_reply, options.faults))
        return complain(EXIT_USAGE, "--fail wants COUNT:STATUS with a status of 400 to 599, --delay and --lose-reply "
                                    "numbers from 0");
    if (!words.certificate != !words.key)
        return complain(EXIT_USAGE, "--tls-certificate and --tls-key go together");
    if ((words.base && !is_web_address(words.base, true)) || (words.callback && !is_web_address(words.callback, false)))
        return complain(EXIT_USAGE, "--base wants an address such as https://cloud.example.org, --callback one with a "
                                    "path");
    if (words.token_life < 0)
        return complain(EXIT_USAGE, "--token-life: not a number of seconds");
    options.site = {text_of(words.base), text_of(words.callback), !words.no_registration};
    options.token_life = words.token_life;
    options.root = words.root;
    options.listen = words.listen ? words.listen : options.listen;
    options.certificate = text_of(words.certificate);
    options.key = text_of(words.key);
    if (words.patience > 0)
        options.patience = {words.patience, words.patience, words.patience, words.patience};
    options.logs = words.logs;
    options.logs_sql = words.logs_sql;
    options.is_serving = words.listen || (!words.accounts && !words.tokens);
    for (char **item = words.accounts; item && *item; item++)
        options.accounts.emplace_back(*item);
    for (char **item = words.tokens; item && *item; item++)
        options.tokens.emplace_back(*item);
    GSocketAddress *address = read_socket_address(options.listen);
    if (!address)
        return complain(EXIT_USAGE, "--listen: not an address and port: " + options.listen);
    const bool is_bare = options.certificate.empty() && !is_loopback(address) && !words.plain;
    g_object_unref(address);
    if (is_bare)
        return complain(EXIT_USAGE, "beyond this machine passwords and files need --tls-certificate and --tls-key (or "
                                    "--plain-http where a proxy speaks TLS)");
    return 0;
}
