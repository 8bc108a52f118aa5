#include "velora_upload_file/upload_names.h"
#include "velora_common/velora_log.h"
#include <Ecore_File.h>
#include <cstdlib>
#include <cstring>

// The last dot of the name's last component, or null.
static const char *__find_last_dot(const char *name)
{
    for (const char *c = name + std::strlen(name); c > name;) {
        --c;
        if (*c == '.')
            return c;
        if (*c == '/')
            return nullptr;
    }
    return nullptr;
}

char *__get_file_ext_name(const char *name)
{
    if (!name) {
        VELORA_LOGE("Invalid argument");
        return nullptr;
    }
    const char *dot = __find_last_dot(name);
    return dot ? g_strdup(dot + 1) : nullptr;
}

char *__get_file_base_name(const char *name)
{
    if (!name) {
        VELORA_LOGE("Invalid argument");
        return nullptr;
    }
    const char *dot = __find_last_dot(name);
    return dot ? g_strndup(name, static_cast<gsize>(dot - name)) : nullptr;
}

// A base such as "photo(3)" with a counter of 1 or more: its stem, and the counter. 0 when it has none.
static long __get_counter(const std::string &base, std::string *stem)
{
    if (base.empty() || base.back() != ')')
        return 0;
    const size_t open = base.rfind('(', base.size() - 1);
    if (open == std::string::npos)
        return 0;
    const long counter = std::strtol(base.c_str() + open + 1, nullptr, 10);
    if (counter < 1 || counter >= INT32_MAX) // the next number must be one that can be written
        return 0;
    *stem = base.substr(0, open);
    return counter;
}

// The name that follows `base`.`ext`; a name without a dot has no ext and keeps none.
static char *__check_file_name_postfix(const char *base, const char *ext)
{
    std::string stem;
    const long counter = __get_counter(base, &stem);
    const std::string tail = ext ? std::string(".") + ext : std::string();
    std::string head = counter ? stem : std::string(base);
    const std::string number = "(" + std::to_string(counter + 1) + ")";
    // No file system takes more than 255 bytes: the head gives way, by whole characters.
    constexpr size_t most = 255;
    while (head.size() + number.size() + tail.size() > most && !head.empty()) {
        size_t cut = head.size() - 1;
        while (cut > 0 && (static_cast<unsigned char>(head[cut]) & 0xC0) == 0x80)
            cut--;
        head.resize(cut);
    }
    return g_strdup((head + number + tail).c_str());
}

static bool __check_same_file_cb(cloud_content_sync_content_h content, int error, void *data)
{
    auto *taken = static_cast<std::unordered_set<std::string> *>(data);
    if (error != 0) {
        VELORA_LOGE("__content_info_cb failed");
        return true;
    }
    if (!content || !taken) {
        VELORA_LOGE("Invalid argument");
        return true;
    }
    char *name = nullptr;
    cloud_content_sync_content_get_name(content, &name);
    if (name)
        taken->insert(name);
    std::free(name);
    return true;
}

TakenNames::TakenNames(cloud_content_sync_folder_h folder)
{
    if (folder)
        cloud_content_sync_folder_foreach_content_from_db(nullptr, folder, __check_same_file_cb, &names);
}

char *__get_server_path(const TakenNames &taken, const char *folder_path, const char *local_path)
{
    char *name = g_strdup(ecore_file_file_get(local_path));
    while (taken.contains(name)) {
        char *base = __get_file_base_name(name);
        char *ext = __get_file_ext_name(name);
        char *next = __check_file_name_postfix(base ? base : name, base ? ext : nullptr);
        g_free(base);
        g_free(ext);
        g_free(name);
        name = next;
    }
    const char *folder = folder_path ? folder_path : "/";
    char *destination = g_strdup_printf(std::strcmp(folder, "/") == 0 ? "%s%s" : "%s/%s", folder, name);
    g_free(name);
    return destination;
}

char *__get_upload_server_path(UploadViewData *vd, const char *local_path)
{
    return __get_server_path(TakenNames(vd->folder), vd->ad->folder_path, local_path);
}
