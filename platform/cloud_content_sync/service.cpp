#include "cloud_content_sync/service.h"
#include "base/base.h"
#include "cloud_content_sync/names.h"
#include <algorithm>
#include <cerrno>
#include <glib.h>
#include <sys/stat.h>

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
    if (const int seconds = g_key_file_get_integer(file, "Service", "WaitLimit", nullptr);
        seconds > 0 || g_key_file_has_key(file, "Service", "WaitLimit", nullptr))
        service.wait_seconds = std::max(seconds, 0);
    service.api = string_of(file, "Service", "Api");
    if (!is_http(service.storage) || (!service.api.empty() && !is_http(service.api)))
        return {};
    service.api.resize(service.api.find_last_not_of('/') + 1);
    service.web = string_of(file, "Service", "Web");
    service.callback = string_of(file, "Service", "Callback");
    service.web.resize(service.web.find_last_not_of('/') + 1);
    if (service.callback.empty())
        service.callback = service.web + "/auth_complete";
    if (!is_http(service.web) || !is_http(service.callback)) {
        service.web.clear();
        service.callback.clear();
    }
    if (const int seconds = g_key_file_get_integer(file, "Service", "AuthTimeout", nullptr); seconds > 0)
        service.auth_seconds = seconds;
    const auto root = path_of_href(service.storage);
    if (!root)
        return {};
    service.root_path = *root;
    service.looks_first = g_key_file_get_boolean(file, "Service", "LookFirst", nullptr) != FALSE;
    service.reads_back = g_key_file_get_boolean(file, "Service", "ReadBack", nullptr) != FALSE;
    service.storage.resize(service.storage.find_last_not_of('/') + 1);
    return service;
}

std::string cloud_data_dir()
{
    const std::string dir = platform_data_dir() + "/cloud";
    if (mkdir(dir.c_str(), 0700) != 0 && errno == ENOENT)
        g_mkdir_with_parents(dir.c_str(), 0700);
    return dir;
}

} // namespace cloud
