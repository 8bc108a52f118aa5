#include "app/target.h"
#include "app/bus.h"
#include <algorithm>
#include <cstring>
#include <filesystem>
#include <gio/gdesktopappinfo.h>

namespace fs = std::filesystem;

namespace {
constexpr char interface_name[] = "com.orvant.AppControl";

// The pages that ask for a setting, and the entries by which common desktops offer them.
struct SettingsPage {
    const char *name; // an operation or an application id
    const char *entries[5];
};
constexpr SettingsPage settings_pages[] = {
    {APP_CONTROL_OPERATION_SETTING_WIFI,
     {"gnome-wifi-panel", "kcm_networkmanagement", "nm-connection-editor", "connman-gtk", nullptr}},
    {APP_CONTROL_OPERATION_SETTING_MOBILE_NETWORK,
     {"gnome-wwan-panel", "kcm_networkmanagement", "nm-connection-editor", "connman-gtk", nullptr}},
    {"setting-flightmode-efl",
     {"gnome-wifi-panel", "kcm_networkmanagement", "nm-connection-editor", "connman-gtk", nullptr}},
};

AppInfo entry_of_file(const fs::path &file)
{
    std::error_code failed;
    if (!fs::exists(file, failed))
        return {};
    return AppInfo(G_APP_INFO(g_desktop_app_info_new_from_filename(file.c_str())));
}

bool speaks_app_control(GAppInfo *info)
{
    gsize length = 0;
    char **names = g_desktop_app_info_get_string_list(G_DESKTOP_APP_INFO(info), "Implements", &length);
    const bool found = names && g_strv_contains(names, interface_name);
    g_strfreev(names);
    return found;
}

// What a request is about: its URI, else the first entry of a player's list of addresses.
std::string subject(const app_control_s &request)
{
    if (request.uri)
        return *request.uri;
    const Extra *list = request.find("files");
    return list && !list->values.empty() ? list->values.front() : std::string();
}

// "file://" and a path stand for the path as it is; GIO wants percent escapes.
std::string escaped_uri(const std::string &uri)
{
    const std::string path = uri.starts_with("file://") ? uri.substr(7) : uri;
    if (!path.starts_with('/'))
        return uri;
    char *escaped = g_filename_to_uri(path.c_str(), nullptr, nullptr);
    std::string result = escaped ? escaped : uri;
    g_free(escaped);
    return result;
}

std::string content_type(const app_control_s &request)
{
    char *type = nullptr;
    if (request.mime)
        type = g_content_type_from_mime_type(request.mime->c_str());
    else if (std::string name = subject(request); !name.empty()) {
        if (name.find("://") != std::string::npos && !name.starts_with("file://"))
            name.erase(std::min(name.find_first_of("?#"), name.size()));
        gboolean uncertain = TRUE;
        type = g_content_type_guess(fs::path(name).filename().c_str(), nullptr, 0, &uncertain);
        if (uncertain)
            g_clear_pointer(&type, g_free);
    }
    std::string result = type ? type : "";
    g_free(type);
    return result;
}

// An application that takes files of a type to hand them on is no viewer for itself.
bool is_own_entry(GAppInfo *info)
{
    const char *id = g_app_info_get_id(info);
    return id && std::ranges::any_of(bus_own_ids(), [id](const std::string &own) { return own + ".desktop" == id; });
}
} // namespace

AppInfo desktop_entry(const std::string &app_id)
{
    if (app_id.empty() || app_id.find('/') != std::string::npos)
        return {};
    const std::string name = app_id.ends_with(".desktop") ? app_id : app_id + ".desktop";
    if (const char *dir = g_getenv("ORVANT_APPS_DIR"); dir && *dir)
        if (AppInfo info = entry_of_file(fs::path(dir) / name))
            return info;
    std::error_code failed;
    for (fs::path dir = fs::read_symlink("/proc/self/exe", failed).parent_path(); !failed && dir.has_relative_path();
         dir = dir.parent_path())
        if (AppInfo info = entry_of_file(dir / "packaging" / "applications" / name))
            return info;
    return AppInfo(G_APP_INFO(g_desktop_app_info_new(name.c_str())));
}

std::vector<AppInfo> viewers(const app_control_s &request)
{
    std::vector<AppInfo> found;
    const auto is_new = [&found](GAppInfo *info) {
        return !is_own_entry(info) &&
               std::ranges::none_of(found, [info](const AppInfo &have) { return g_app_info_equal(have.get(), info); });
    };
    const std::string type = content_type(request);
    if (!type.empty()) {
        GList *all = g_app_info_get_all_for_type(type.c_str());
        if (GAppInfo *first = g_app_info_get_default_for_type(type.c_str(), FALSE))
            all = g_list_prepend(all, first);
        for (GList *item = all; item; item = item->next)
            if (auto *info = static_cast<GAppInfo *>(item->data); is_new(info))
                found.emplace_back(g_app_info_dup(info));
        g_list_free_full(all, g_object_unref);
    }
    char *scheme = g_uri_parse_scheme(subject(request).c_str());
    if (scheme && found.empty() && strcmp(scheme, "file") != 0)
        if (GAppInfo *info = g_app_info_get_default_for_uri_scheme(scheme))
            found.emplace_back(info);
    g_free(scheme);
    return found;
}

Target find_target(const app_control_s &request)
{
    Target target;
    if (request.app_id) {
        target.app_id = *request.app_id;
        target.info = desktop_entry(target.app_id);
        const bool name = g_dbus_is_name(target.app_id.c_str()) && !g_dbus_is_unique_name(target.app_id.c_str());
        if (target.info)
            target.kind = speaks_app_control(target.info.get()) ? Target::ours : Target::ordinary;
        else if (name && (bus_name_owned(target.app_id) || bus_name_activatable(target.app_id)))
            target.kind = Target::ours;
        if (target.kind != Target::none)
            return target;
    }
    const std::string operation = request.operation.value_or("");
    for (const SettingsPage &page : settings_pages) {
        if (operation != page.name && request.app_id.value_or("") != page.name)
            continue;
        for (const char *const *entry = page.entries; *entry && !target.info; entry++)
            target.info = desktop_entry(*entry);
    }
    if (operation == APP_CONTROL_OPERATION_VIEW)
        if (auto found = viewers(request); !found.empty())
            target.info = std::move(found.front());
    if (target.info)
        target.kind = Target::ordinary;
    return target;
}

bool start_ordinary(GAppInfo *info, const app_control_s &request)
{
    std::vector<std::string> texts;
    if (const std::string one = subject(request); !one.empty())
        texts.push_back(escaped_uri(one));
    else if (const Extra *paths = request.find(APP_CONTROL_DATA_PATH))
        for (const std::string &path : paths->values)
            texts.push_back(escaped_uri(path));
    GList *uris = nullptr;
    for (const std::string &text : texts)
        uris = g_list_prepend(uris, const_cast<char *>(text.c_str()));
    uris = g_list_reverse(uris);
    GError *error = nullptr;
    const bool started = g_app_info_launch_uris(info, uris, nullptr, &error);
    g_list_free(uris);
    if (!started) {
        g_warning("%s: %s", g_app_info_get_id(info), error->message);
        g_error_free(error);
    }
    return started;
}

std::vector<std::string> command_of(GAppInfo *info, const std::vector<std::string> &arguments)
{
    const char *line = g_app_info_get_commandline(info);
    char **words = nullptr;
    if (!line || !g_shell_parse_argv(line, nullptr, &words, nullptr))
        return {};
    std::vector<std::string> command;
    for (char **word = words; *word; word++) {
        std::string text = *word;
        if (text.size() == 2 && text[0] == '%' && text[1] != '%')
            continue;
        for (size_t at = text.find("%%"); at != std::string::npos; at = text.find("%%", at + 1))
            text.erase(at, 1);
        command.push_back(std::move(text));
    }
    g_strfreev(words);
    command.insert(command.end(), arguments.begin(), arguments.end());
    return command;
}

bool environment_has_display()
{
    return std::ranges::any_of(std::initializer_list<const char *>{"DISPLAY", "WAYLAND_DISPLAY", "ELM_ENGINE"},
                               [](const char *name) {
                                   const char *value = g_getenv(name);
                                   return value && *value;
                               });
}
