#include "cloud_content_sync/service.h"
#include "base/base.h"
#include "cloud_content_sync/names.h"
#include <algorithm>
#include <cerrno>
#include <glib.h>
#include <glib/gstdio.h>
#include <sys/stat.h>
#include <unistd.h>

namespace cloud {

bool service_name_is_valid(const std::string &name)
{
    return name_is_valid(name) && name.front() != '.' && name.size() <= 100;
}

static std::string string_of(GKeyFile *file, const char *group, const char *key)
{
    g_autofree char *value = g_key_file_get_string(file, group, key, nullptr);
    return value ? value : "";
}

static std::string services_dir()
{
    if (const char *dir = g_getenv("CLOUD_SERVICES_DIR"); dir && *dir)
        return dir;
    return "";
}

static bool load_description(GKeyFile *file, const std::string &name)
{
    const std::string leaf = "/" + name + ".conf";
    const auto load = [&](const std::string &dir) {
        return g_key_file_load_from_file(file, (dir + leaf).c_str(), G_KEY_FILE_NONE, nullptr) != FALSE;
    };
    if (const std::string dir = services_dir(); !dir.empty())
        return load(dir);
    const char *config = g_getenv("XDG_CONFIG_HOME");
    const std::string config_home = config && *config == '/' ? config : std::string(g_get_home_dir()) + "/.config";
    return load(config_home + "/cloud-services") || load(CLOUD_SERVICES_DIR);
}

static bool is_http(const std::string &url)
{
    return g_str_has_prefix(url.c_str(), "http://") || g_str_has_prefix(url.c_str(), "https://");
}

std::optional<Service> service_find(const std::string &name)
{
    g_autoptr(GKeyFile) file = g_key_file_new();
    if (!service_name_is_valid(name) || !load_description(file, name))
        return {};
    Service service;
    service.name = name;
    service.storage = string_of(file, "Service", "Storage");
    service.ca_file = string_of(file, "Service", "CAFile");
    if (const int seconds = g_key_file_get_integer(file, "Service", "StallTimeout", nullptr); seconds > 0)
        service.stall_seconds = seconds;
    service.api = string_of(file, "Service", "Api");
    if (!is_http(service.storage) || (!service.api.empty() && !is_http(service.api)))
        return {};
    service.api.resize(service.api.find_last_not_of('/') + 1);
    const auto root = path_of_href(service.storage);
    if (!root)
        return {};
    service.root_path = *root;
    service.storage.resize(service.storage.find_last_not_of('/') + 1);
    return service;
}

std::string cloud_data_dir()
{
    const std::string dir = platform_data_dir() + "/cloud";
    g_mkdir_with_parents(dir.c_str(), 0700);
    return dir;
}

static std::string credentials_file(const std::string &service_name)
{
    return cloud_data_dir() + "/" + service_name + ".credentials";
}

std::optional<Credentials> credentials_load(const std::string &service_name)
{
    g_autoptr(GKeyFile) file = g_key_file_new();
    if (!g_key_file_load_from_file(file, credentials_file(service_name).c_str(), G_KEY_FILE_NONE, nullptr))
        return {};
    Credentials credentials{string_of(file, "Credentials", "User"), string_of(file, "Credentials", "Secret"),
                            string_of(file, "Credentials", "Email")};
    if (credentials.secret.empty())
        return {};
    return credentials;
}

bool credentials_store(const std::string &service_name, const Credentials *credentials)
{
    const std::string path = credentials_file(service_name);
    if (!credentials)
        return g_unlink(path.c_str()) == 0 || errno == ENOENT;
    g_autoptr(GKeyFile) file = g_key_file_new();
    if (!credentials->user.empty())
        g_key_file_set_string(file, "Credentials", "User", credentials->user.c_str());
    g_key_file_set_string(file, "Credentials", "Secret", credentials->secret.c_str());
    if (!credentials->email.empty())
        g_key_file_set_string(file, "Credentials", "Email", credentials->email.c_str());
    gsize size = 0;
    g_autofree char *data = g_key_file_to_data(file, &size, nullptr);
    // The mode is that of a new file; an existing one is replaced by a new one.
    return g_file_set_contents_full(
               path.c_str(), data, static_cast<gssize>(size),
               static_cast<GFileSetContentsFlags>(G_FILE_SET_CONTENTS_CONSISTENT | G_FILE_SET_CONTENTS_DURABLE), 0600,
               nullptr) != FALSE;
}

std::string account_identity(const Service &service, const Credentials &credentials)
{
    // A bearer token says nothing about its user: where it is all that is known, another token is another account.
    const std::string who = !credentials.email.empty()  ? "email\n" + credentials.email
                            : !credentials.user.empty() ? "user\n" + credentials.user
                                                        : "bearer\n" + credentials.secret;
    const std::string text = service.storage + "\n" + who;
    g_autofree char *digest =
        g_compute_checksum_for_string(G_CHECKSUM_SHA256, text.data(), static_cast<gssize>(text.size()));
    return digest;
}

} // namespace cloud
