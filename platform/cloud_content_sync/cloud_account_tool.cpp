// cloud-account: leaves an account's credentials for the cloud client, and shows what its database holds.
#include "base/base.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include <cstdio>
#include <cstring>
#include <future>
#include <glib.h>
#include <iostream>
#include <string>
#include <vector>

static constexpr char USAGE[] =
    "usage: cloud-account set SERVICE [--email ADDRESS] [--user USER] | refresh SERVICE | list SERVICE PATH\n";
static constexpr char HELP[] =
    "  set       store the credentials of SERVICE; the secret is one line on standard input:\n"
    "            the password of --user USER, or without --user a bearer token;\n"
    "            what is kept on this device stays when the ADDRESS is the same\n"
    "  refresh   fetch the account's folder tree into the local database\n"
    "  list      print what the local database holds of the folder PATH; folders end in \"/\"\n"
    "A service is described by SERVICE.conf in $CLOUD_SERVICES_DIR, or else in\n"
    "~/.config/cloud-services or in the system's folder of cloud services.\n";

static const char *error_text(int error)
{
    switch (error) {
    case CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER:
        return "an argument is not usable";
    case CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE:
        return "no service of that name is described";
    case CLOUD_CONTENT_SYNC_ERROR_DB_FAILED:
        return "the local database cannot be used";
    case CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND:
        return "there is no such folder";
    case CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT:
        return "nobody is signed in";
    case CLOUD_CONTENT_SYNC_ERROR_NETWORK:
        return "the service cannot be reached";
    case CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED:
        return "the service refuses the credentials";
    case CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN:
        return "the service refuses the operation";
    default:
        return "the service answered with an error";
    }
}

static int failed(int error)
{
    std::fprintf(stderr, "cloud-account: %s (%d)\n", error_text(error), error);
    return 1;
}

static int bad_arguments()
{
    std::fputs(USAGE, stderr);
    return 2;
}

// Names come from a server: what a terminal would act upon is shown as \xNN or \uNNNN.
static std::string escaped(const std::string &name)
{
    std::string shown;
    char buffer[16];
    for (size_t i = 0; i < name.size();) {
        const gunichar c = g_utf8_get_char_validated(name.data() + i, static_cast<gssize>(name.size() - i));
        if (static_cast<gint32>(c) < 0) {
            g_snprintf(buffer, sizeof buffer, "\\x%02x", static_cast<unsigned char>(name[i]));
            shown += buffer;
            i++;
            continue;
        }
        const auto length = static_cast<size_t>(g_unichar_to_utf8(c, nullptr));
        if (c == '\\') {
            shown += "\\\\";
        } else if (g_unichar_isprint(c)) {
            shown.append(name, i, length);
        } else {
            g_snprintf(buffer, sizeof buffer, c < 0x80 ? "\\x%02x" : "\\u%04x", c);
            shown += buffer;
        }
        i += length;
    }
    return shown;
}

// The options are pairs of a name and a value.
static int set(const char *service, const std::vector<std::string> &options)
{
    const char *email = nullptr, *user = nullptr;
    for (size_t i = 0; i + 1 < options.size(); i += 2) {
        if (options[i] != "--email" && options[i] != "--user")
            return bad_arguments();
        (options[i] == "--email" ? email : user) = options[i + 1].c_str();
    }
    std::string secret;
    if (!std::getline(std::cin, secret) || secret.empty()) {
        std::fputs("cloud-account: no secret on standard input\n", stderr);
        return 2;
    }
    const int error = cloud_content_sync_credentials_set(service, email, user, secret.c_str());
    return error ? failed(error) : 0;
}

static void refreshed(int status, int error, void *data)
{
    if (status >= CLOUD_CONTENT_SYNC_STATE_DONE)
        static_cast<std::promise<int> *>(data)->set_value(error);
}

static int refresh(cloud_content_sync_h handle)
{
    std::promise<int> result;
    auto ready = result.get_future();
    const int error = cloud_content_sync_refresh_meta(handle, 7, refreshed, &result);
    return error ? error : ready.get();
}

static bool print_folder(cloud_content_sync_folder_h folder, int, void *)
{
    char *name = nullptr;
    if (cloud_content_sync_folder_get_name(folder, &name) == 0)
        std::printf("%12s  %s/\n", "", escaped(CString(name).get()).c_str());
    return true;
}

static bool print_content(cloud_content_sync_content_h content, int, void *)
{
    char *name = nullptr;
    long long size = 0;
    cloud_content_sync_content_get_size(content, &size);
    if (cloud_content_sync_content_get_name(content, &name) == 0)
        std::printf("%12lld  %s\n", size, escaped(CString(name).get()).c_str());
    return true;
}

static int list(cloud_content_sync_h handle, const char *path)
{
    cloud_content_sync_folder_h folder = nullptr;
    if (const int error = cloud_content_sync_get_folder_by_server_path(handle, path, &folder))
        return error;
    int error = cloud_content_sync_folder_foreach_children_folder(handle, folder, print_folder, nullptr);
    if (!error)
        error = cloud_content_sync_folder_foreach_content_from_db(handle, folder, print_content, nullptr);
    cloud_content_sync_folder_destroy(folder);
    return error;
}

int main(int argc, char **argv)
{
    const std::vector<std::string> args(argv + 1, argv + argc);
    if (args.size() == 1 && (args[0] == "--help" || args[0] == "-h")) {
        std::fputs(USAGE, stdout);
        std::fputs(HELP, stdout);
        return 0;
    }
    if (args.size() < 2 || args[1].empty() || args[1][0] == '-')
        return bad_arguments();
    const std::string &command = args[0];
    const char *service = args[1].c_str();
    if (command == "set" && args.size() % 2 == 0)
        return set(service, {args.begin() + 2, args.end()});
    if (!(command == "refresh" && args.size() == 2) && !(command == "list" && args.size() == 3))
        return bad_arguments();
    cloud_content_sync_h handle = nullptr;
    int error = cloud_content_sync_create(service, &handle);
    if (error)
        return failed(error);
    error = command == "refresh" ? refresh(handle) : list(handle, args[2].c_str());
    cloud_content_sync_destroy(handle);
    return error ? failed(error) : 0;
}
