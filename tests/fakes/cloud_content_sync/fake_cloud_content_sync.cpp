// cloud_content_sync.h for tests: the same promises, kept by a tree in memory.
#include "cloud_content_sync/names.h"
#include "fake_cloud_state.h"
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <utility>

using namespace cloud;

struct cloud_content_sync_folder_s {
    std::string service, path;
    std::weak_ptr<FakeClient> client;
};

static constexpr int INVALID = CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER;
static constexpr int NOT_FOUND = CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND;

int give(const std::string &text, char **out)
{
    *out = strdup(text.c_str());
    return 0;
}

static bool is_known_folder(const std::string &path)
{
    std::scoped_lock lock(fake().mutex);
    return fake().known_folders.count(path) > 0;
}

int cloud_content_sync_create(const char *service_name, cloud_content_sync_h *handle)
{
    if (!service_name || !handle || !name_is_valid(service_name))
        return INVALID;
    {
        std::scoped_lock lock(fake().mutex);
        if (const int error = std::exchange(fake().create_error, 0))
            return error;
        fake().handles++;
    }
    *handle = new cloud_content_sync_s{std::make_shared<FakeClient>(), service_name};
    (*handle)->client->start();
    return 0;
}

int cloud_content_sync_destroy(cloud_content_sync_h handle)
{
    if (!handle)
        return INVALID;
    handle->client->stop();
    delete handle;
    std::scoped_lock lock(fake().mutex);
    fake().handles--;
    return 0;
}

static bool is_one_type(int type)
{
    return type == CLOUD_CONTENT_TYPE_IMAGE || type == CLOUD_CONTENT_TYPE_VIDEO || type == CLOUD_CONTENT_TYPE_CAMERA;
}

int cloud_content_sync_setting_get_type_activation(cloud_content_sync_h handle, int content_type, bool *value)
{
    if (!handle || !value || !is_one_type(content_type))
        return INVALID;
    std::scoped_lock lock(fake().mutex);
    const auto found = fake().activation.find(content_type);
    *value = found == fake().activation.end() || found->second;
    return 0;
}

int cloud_content_sync_setting_set_type_activation(cloud_content_sync_h handle, int content_type, bool value)
{
    if (!handle || !is_one_type(content_type))
        return INVALID;
    std::scoped_lock lock(fake().mutex);
    fake().activation[content_type] = value;
    return 0;
}

int cloud_content_sync_refresh_meta(cloud_content_sync_h handle, int content_types, cloud_content_sync_refresh_cb cb,
                                    void *user_data)
{
    if (!handle || content_types < 1 || content_types > 7)
        return INVALID;
    Job job;
    job.refresh_cb = cb;
    job.user_data = user_data;
    handle->client->add(std::move(job));
    return 0;
}

int cloud_content_sync_get_is_meta_complete(cloud_content_sync_h handle, bool *complete)
{
    if (!handle || !complete)
        return INVALID;
    std::scoped_lock lock(fake().mutex);
    *complete = fake().complete && fake().signed_in;
    return 0;
}

int cloud_content_sync_folder_get_root(cloud_content_sync_h handle, cloud_content_sync_folder_h *folder)
{
    if (!handle || !folder)
        return INVALID;
    *folder = new cloud_content_sync_folder_s{handle->service, "/", handle->client};
    return 0;
}

int cloud_content_sync_get_folder_by_server_path(cloud_content_sync_h handle, const char *path,
                                                 cloud_content_sync_folder_h *folder)
{
    if (!handle || !path || !folder)
        return INVALID;
    std::string plain = path;
    if (plain.size() > 1 && plain.back() == '/')
        plain.pop_back();
    if (!path_is_valid(plain))
        return INVALID;
    if (!is_known_folder(plain))
        return NOT_FOUND;
    *folder = new cloud_content_sync_folder_s{handle->service, plain, handle->client};
    return 0;
}

int cloud_content_sync_folder_get_parent(cloud_content_sync_folder_h folder, cloud_content_sync_folder_h *parent)
{
    if (!folder || !parent)
        return INVALID;
    if (folder->path == "/" || !is_known_folder(parent_of(folder->path)))
        return NOT_FOUND;
    *parent = new cloud_content_sync_folder_s{folder->service, parent_of(folder->path), folder->client};
    return 0;
}

int cloud_content_sync_folder_clone(cloud_content_sync_folder_h *copy, cloud_content_sync_folder_h folder)
{
    if (!copy || !folder)
        return INVALID;
    *copy = new cloud_content_sync_folder_s(*folder);
    return 0;
}

int cloud_content_sync_folder_destroy(cloud_content_sync_folder_h folder)
{
    delete folder;
    return folder ? 0 : INVALID;
}

int cloud_content_sync_folder_get_path(cloud_content_sync_folder_h folder, char **path)
{
    return folder && path ? give(folder->path, path) : INVALID;
}

int cloud_content_sync_folder_get_name(cloud_content_sync_folder_h folder, char **name)
{
    if (!folder || !name)
        return INVALID;
    return give(folder->path == "/" ? folder->service : name_of(folder->path), name);
}

template <class Row, class Name> static void sort_by_name(std::vector<Row> &rows, Name name)
{
    std::sort(rows.begin(), rows.end(),
              [&](const Row &a, const Row &b) { return sort_key(name(a)) < sort_key(name(b)); });
}

int cloud_content_sync_folder_foreach_children_folder(cloud_content_sync_h, cloud_content_sync_folder_h folder,
                                                      cloud_content_sync_folder_cb cb, void *user_data)
{
    if (!folder || !cb)
        return INVALID;
    if (!is_known_folder(folder->path))
        return NOT_FOUND;
    std::vector<cloud_content_sync_folder_s> rows;
    {
        std::scoped_lock lock(fake().mutex);
        for (const std::string &path : fake().known_folders)
            if (path != "/" && parent_of(path) == folder->path)
                rows.push_back({folder->service, path, folder->client});
    }
    sort_by_name(rows, [](const auto &row) { return name_of(row.path); });
    for (auto &row : rows)
        if (!cb(&row, 0, user_data))
            break;
    return 0;
}

int cloud_content_sync_folder_foreach_content_from_db(cloud_content_sync_h, cloud_content_sync_folder_h folder,
                                                      cloud_content_sync_content_cb cb, void *user_data)
{
    if (!folder || !cb)
        return INVALID;
    if (!is_known_folder(folder->path))
        return NOT_FOUND;
    std::vector<cloud_content_sync_content_s> rows;
    {
        std::scoped_lock lock(fake().mutex);
        for (const auto &[path, size] : fake().known_files)
            if (parent_of(path) == folder->path)
                rows.push_back({path, size, folder->client});
    }
    sort_by_name(rows, [](const auto &row) { return name_of(row.path); });
    for (auto &row : rows)
        if (!cb(&row, 0, user_data))
            break;
    return 0;
}

int cloud_content_sync_upload(cloud_content_sync_h handle, const char *local_path, const char *server_path, int *req_id,
                              cloud_content_sync_transfer_cb cb, void *user_data)
{
    if (!handle || !local_path || !*local_path || !server_path || !*server_path || !req_id)
        return INVALID;
    handle->client->add({-1, local_path, server_path, cb, nullptr, user_data}, req_id);
    return 0;
}

int cloud_content_sync_get_uploaded_path(cloud_content_sync_h handle, int req_id, char **server_path)
{
    if (!handle || !server_path)
        return INVALID;
    std::scoped_lock lock(fake().mutex);
    const auto found = handle->client->landed.find(req_id);
    return found == handle->client->landed.end() ? NOT_FOUND : give(found->second, server_path);
}

int cloud_content_sync_cancel(cloud_content_sync_h handle, int req_id)
{
    if (!handle)
        return INVALID;
    return handle->client->cancel(req_id) ? 0 : NOT_FOUND;
}

int cloud_content_sync_credentials_set(const char *service_name, const char *user, const char *secret)
{
    const bool bad_user = user && (!*user || std::strpbrk(user, ":\r\n"));
    if (!service_name || !name_is_valid(service_name) || bad_user || (secret && !*secret))
        return INVALID;
    std::scoped_lock lock(fake().mutex);
    fake().signed_in = secret != nullptr;
    return 0;
}
