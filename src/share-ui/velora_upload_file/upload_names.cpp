#include "velora_upload_file/upload_names.h"
#include "velora_common/velora_log.h"
#include <Ecore_File.h>
#include <cstdlib>
#include <cstring>
#include <utility>

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
    char *name = strdup(ecore_file_file_get(local_path));
    while (taken.contains(name)) {
        char *next = nullptr; // by the rule that the client itself uses when a name is taken in the last moment
        cloud_content_sync_name_get_next(name, &next);
        std::swap(name, next);
        std::free(next);
    }
    const char *folder = folder_path ? folder_path : "/";
    char *destination = g_strdup_printf(std::strcmp(folder, "/") == 0 ? "%s%s" : "%s/%s", folder, name);
    std::free(name);
    return destination;
}

char *__get_upload_server_path(UploadViewData *vd, const char *local_path)
{
    return __get_server_path(TakenNames(vd->folder), vd->ad->folder_path, local_path);
}
