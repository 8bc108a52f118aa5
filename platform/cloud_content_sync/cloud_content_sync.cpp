#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/cache.h"
#include "cloud_content_sync/content.h"
#include "cloud_content_sync/handle.h"
#include "cloud_content_sync/names.h"
#include "cloud_content_sync/storage.h"
#include "cloud_content_sync/thumbnails.h"
#include <cstring>

using cloud::Account;
using cloud::give;

// Folders and contents hold the account, so they outlive the client's handle.
struct cloud_content_sync_folder_s {
    std::shared_ptr<Account> account;
    std::weak_ptr<cloud::Client> client;
    std::string path;
    std::string name;
};

struct cloud_content_sync_content_s {
    std::weak_ptr<cloud::Client> client;
    cloud::ContentRow row;
};

static constexpr int DONE = CLOUD_CONTENT_SYNC_ERROR_NONE;
static constexpr int INVALID = CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER;
static constexpr int NOT_FOUND = CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND;

int cloud_content_sync_create(const char *service_name, cloud_content_sync_h *handle)
{
    if (!service_name || !handle || !cloud::service_name_is_valid(service_name))
        return INVALID;
    auto service = cloud::service_find(service_name);
    if (!service)
        return CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE;
    auto account = std::make_shared<Account>(*service);
    if (!account->open())
        return CLOUD_CONTENT_SYNC_ERROR_DB_FAILED;
    auto client = std::make_shared<cloud::Client>(std::move(*service), std::move(account));
    client->start();
    *handle = new cloud_content_sync_s{std::move(client)};
    return DONE;
}

int cloud_content_sync_destroy(cloud_content_sync_h handle)
{
    if (!handle)
        return INVALID;
    handle->client->stop();
    delete handle;
    return DONE;
}

static bool is_one_type(int type)
{
    return type == CLOUD_CONTENT_TYPE_IMAGE || type == CLOUD_CONTENT_TYPE_VIDEO || type == CLOUD_CONTENT_TYPE_CAMERA;
}

static std::string key_of(const char *setting, int content_type)
{
    return setting + std::to_string(content_type);
}

static constexpr char ACTIVATION[] = "activation.", WIFI_ONLY[] = "wifi_only.", CAMERA_UPLOAD[] = "camera_upload";

int cloud_content_sync_setting_get_type_activation(cloud_content_sync_h handle, int content_type, bool *value)
{
    if (!handle || !value || !is_one_type(content_type))
        return INVALID;
    *value = handle->client->account->setting(key_of(ACTIVATION, content_type), 1) != 0;
    return DONE;
}

int cloud_content_sync_setting_set_type_activation(cloud_content_sync_h handle, int content_type, bool value)
{
    if (!handle || !is_one_type(content_type))
        return INVALID;
    return handle->client->account->set_setting(key_of(ACTIVATION, content_type), value);
}

int cloud_content_sync_setting_get_camera_upload(cloud_content_sync_h handle, bool *value)
{
    if (!handle || !value)
        return INVALID;
    *value = handle->client->account->setting(CAMERA_UPLOAD, 0) != 0;
    return DONE;
}

int cloud_content_sync_setting_set_camera_upload(cloud_content_sync_h handle, bool value)
{
    return handle ? handle->client->account->set_setting(CAMERA_UPLOAD, value) : INVALID;
}

int cloud_content_sync_setting_get_wifi_only_type(cloud_content_sync_h handle, int content_type, bool *value)
{
    if (!handle || !value || !is_one_type(content_type))
        return INVALID;
    *value = handle->client->account->setting(key_of(WIFI_ONLY, content_type), 0) != 0;
    return DONE;
}

int cloud_content_sync_setting_set_wifi_only_type(cloud_content_sync_h handle, int content_type, bool value)
{
    if (!handle || !is_one_type(content_type))
        return INVALID;
    return handle->client->account->set_setting(key_of(WIFI_ONLY, content_type), value);
}

int cloud_content_sync_get_server_storage_info(cloud_content_sync_h handle, cloud_content_sync_storage_cb cb,
                                               void *user_data)
{
    if (!handle || !cb)
        return INVALID;
    handle->client->storage->ask(cb, user_data);
    return DONE;
}

int cloud_content_sync_cancel_server_storage_info(cloud_content_sync_h handle, void *user_data)
{
    if (!handle)
        return INVALID;
    return handle->client->storage->cancel(user_data) ? DONE : CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND;
}

int cloud_content_sync_get_wait(cloud_content_sync_h handle, cloud_content_sync_wait_e *reason, int *seconds)
{
    if (!handle || !reason || !seconds)
        return INVALID;
    *reason = handle->client->waiting_for(seconds);
    return DONE;
}

int cloud_content_sync_get_is_persistent(cloud_content_sync_h handle, bool *persistent)
{
    if (!handle || !persistent)
        return INVALID;
    *persistent = handle->client->account->is_persistent();
    return DONE;
}

// A change of the book for the account that is signed in.
static int change_queue(cloud_content_sync_h handle, const char *const *local_paths, const char *const *server_paths,
                        int count, bool (cloud::Ledger::*change)(const std::string &, const cloud::LedgerPaths &))
{
    if (!handle || !local_paths || !server_paths || count < 0)
        return INVALID;
    cloud::LedgerPaths files;
    files.reserve(static_cast<size_t>(count));
    for (int i = 0; i < count; i++) {
        if (!local_paths[i] || !server_paths[i])
            return INVALID;
        files.emplace_back(local_paths[i], server_paths[i]);
    }
    const std::string who = handle->client->account->identity();
    if (who.empty())
        return CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
    return (handle->client->ledger.*change)(who, files) ? DONE : CLOUD_CONTENT_SYNC_ERROR_DB_FAILED;
}

int cloud_content_sync_queue_add(cloud_content_sync_h handle, const char *const *local_paths,
                                 const char *const *server_paths, int count)
{
    return change_queue(handle, local_paths, server_paths, count, &cloud::Ledger::add);
}

int cloud_content_sync_queue_remove(cloud_content_sync_h handle, const char *const *local_paths,
                                    const char *const *server_paths, int count)
{
    return change_queue(handle, local_paths, server_paths, count, &cloud::Ledger::remove);
}

int cloud_content_sync_queue_foreach(cloud_content_sync_h handle, cloud_content_sync_queue_cb cb, void *user_data)
{
    if (!handle || !cb)
        return INVALID;
    const std::string who = handle->client->account->identity();
    if (who.empty())
        return CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
    for (const cloud::LedgerRow &row : handle->client->ledger.waiting(who))
        if (!cb(row.local_path.c_str(), row.server_path.c_str(), user_data))
            break;
    return DONE;
}

int cloud_content_sync_refresh_meta(cloud_content_sync_h handle, int content_types, cloud_content_sync_refresh_cb cb,
                                    void *user_data)
{
    constexpr int ALL = CLOUD_CONTENT_TYPE_IMAGE | CLOUD_CONTENT_TYPE_VIDEO | CLOUD_CONTENT_TYPE_CAMERA;
    if (!handle || content_types == 0 || (content_types & ~ALL))
        return INVALID;
    handle->client->refresh({cb, user_data});
    return DONE;
}

int cloud_content_sync_get_is_meta_complete(cloud_content_sync_h handle, bool *complete)
{
    if (!handle || !complete)
        return INVALID;
    const std::string who = handle->client->account->identity();
    *complete = !who.empty() && handle->client->account->complete_for() == who;
    return DONE;
}

static cloud_content_sync_folder_h folder_at(const std::shared_ptr<Account> &account,
                                             const std::weak_ptr<cloud::Client> &client, const std::string &path)
{
    return new cloud_content_sync_folder_s{account, client, path,
                                           path == "/" ? account->service.name : cloud::name_of(path)};
}

int cloud_content_sync_folder_get_root(cloud_content_sync_h handle, cloud_content_sync_folder_h *folder)
{
    if (!handle || !folder)
        return INVALID;
    *folder = folder_at(handle->client->account, handle->client, "/");
    return DONE;
}

int cloud_content_sync_get_folder_by_server_path(cloud_content_sync_h handle, const char *path,
                                                 cloud_content_sync_folder_h *folder)
{
    if (!handle || !path || !folder)
        return INVALID;
    std::string plain = path;
    if (plain.size() > 1 && plain.back() == '/')
        plain.pop_back();
    if (!cloud::path_is_valid(plain))
        return INVALID;
    if (!handle->client->account->folder_exists(plain))
        return NOT_FOUND;
    *folder = folder_at(handle->client->account, handle->client, plain);
    return DONE;
}

int cloud_content_sync_folder_get_parent(cloud_content_sync_folder_h folder, cloud_content_sync_folder_h *parent)
{
    if (!folder || !parent)
        return INVALID;
    const std::string path = cloud::parent_of(folder->path);
    if (folder->path == "/" || !folder->account->folder_exists(path))
        return NOT_FOUND;
    *parent = folder_at(folder->account, folder->client, path);
    return DONE;
}

int cloud_content_sync_folder_clone(cloud_content_sync_folder_h *copy, cloud_content_sync_folder_h folder)
{
    if (!copy || !folder)
        return INVALID;
    *copy = new cloud_content_sync_folder_s(*folder);
    return DONE;
}

int cloud_content_sync_folder_destroy(cloud_content_sync_folder_h folder)
{
    delete folder;
    return folder ? DONE : INVALID;
}

int cloud_content_sync_folder_get_path(cloud_content_sync_folder_h folder, char **path)
{
    return folder && path ? give(folder->path, path) : INVALID;
}

int cloud_content_sync_folder_get_name(cloud_content_sync_folder_h folder, char **name)
{
    return folder && name ? give(folder->name, name) : INVALID;
}

int cloud_content_sync_folder_foreach_children_folder(cloud_content_sync_h, cloud_content_sync_folder_h folder,
                                                      cloud_content_sync_folder_cb cb, void *user_data)
{
    if (!folder || !cb)
        return INVALID;
    if (!folder->account->folder_exists(folder->path))
        return NOT_FOUND;
    // The callback may destroy `folder`, and no lock is held while it runs.
    const std::shared_ptr<Account> account = folder->account;
    const std::weak_ptr<cloud::Client> client = folder->client;
    for (cloud::FolderRow &row : account->folders_of(folder->path)) {
        cloud_content_sync_folder_s child{account, client, std::move(row.path), std::move(row.name)};
        if (!cb(&child, DONE, user_data))
            break;
    }
    return DONE;
}

int cloud_content_sync_folder_foreach_content_from_db(cloud_content_sync_h, cloud_content_sync_folder_h folder,
                                                      cloud_content_sync_content_cb cb, void *user_data)
{
    if (!folder || !cb)
        return INVALID;
    if (!folder->account->folder_exists(folder->path))
        return NOT_FOUND;
    const std::weak_ptr<cloud::Client> client = folder->client;
    for (cloud::ContentRow &row : folder->account->contents_of(folder->path)) {
        cloud_content_sync_content_s content{client, std::move(row)};
        if (!cb(&content, DONE, user_data))
            break;
    }
    return DONE;
}

int cloud_content_sync_content_clone(cloud_content_sync_content_h *copy, cloud_content_sync_content_h content)
{
    if (!copy || !content)
        return INVALID;
    *copy = new cloud_content_sync_content_s(*content);
    return DONE;
}

int cloud_content_sync_content_destroy(cloud_content_sync_content_h content)
{
    delete content;
    return content ? DONE : INVALID;
}

int cloud_content_sync_content_get_name(cloud_content_sync_content_h content, char **name)
{
    return content && name ? give(content->row.name, name) : INVALID;
}

int cloud_content_sync_content_get_size(cloud_content_sync_content_h content, long long *size)
{
    if (!content || !size)
        return INVALID;
    *size = content->row.size;
    return DONE;
}

int cloud_content_sync_content_get_content_type(cloud_content_sync_content_h content, int *type)
{
    if (!content || !type)
        return INVALID;
    *type = cloud::content_type_of(content->row.name);
    return DONE;
}

int cloud_content_sync_content_get_is_thumbnail_exist(cloud_content_sync_content_h content, bool *exists)
{
    if (!content || !exists)
        return INVALID;
    const auto client = content->client.lock();
    *exists = client && client->thumbnails->find(content->row);
    if (client && !*exists)
        client->thumbnails->want(content->row);
    return DONE;
}

int cloud_content_sync_content_get_thumbnail_path(cloud_content_sync_content_h content, char **path)
{
    if (!content || !path)
        return INVALID;
    const auto client = content->client.lock();
    const auto file = client ? client->thumbnails->find(content->row) : std::nullopt;
    return file ? give(*file, path) : NOT_FOUND;
}

int cloud_content_sync_set_thumbnail_cb(cloud_content_sync_h handle, cloud_content_sync_thumbnail_cb cb,
                                        void *user_data)
{
    if (!handle)
        return INVALID;
    handle->client->thumbnails->set_cb(cb, user_data);
    return DONE;
}

static int ask(cloud_content_sync_content_h content, cloud::ContentRequest request, int *request_id)
{
    const auto client = content->client.lock();
    const int id = client ? client->new_request() : 0;
    if (!id)
        return NOT_FOUND;
    *request_id = id;
    request.id = id;
    request.row = content->row;
    client->contents->add(std::move(request));
    return DONE;
}

int cloud_content_sync_content_get_cached_file(cloud_content_sync_content_h content, int *request_id,
                                               cloud_content_sync_result_cb cb, void *user_data)
{
    if (!content || !request_id)
        return INVALID;
    return ask(content, {.kind = cloud::ContentRequest::CACHED_FILE, .cb = cb, .user_data = user_data}, request_id);
}

int cloud_content_sync_content_get_streaming_url(cloud_content_sync_content_h content, int *request_id,
                                                 cloud_content_sync_result_cb cb, void *user_data, int minutes)
{
    if (!content || !request_id || minutes <= 0)
        return INVALID;
    return ask(content,
               {.kind = cloud::ContentRequest::STREAMING_ADDRESS, .cb = cb, .user_data = user_data, .minutes = minutes},
               request_id);
}

int cloud_content_sync_content_download(cloud_content_sync_content_h content, const char *local_path, int *request_id,
                                        cloud_content_sync_result_cb cb, void *user_data)
{
    if (!content || !local_path || !*local_path || !request_id)
        return INVALID;
    return ask(content,
               {.kind = cloud::ContentRequest::DOWNLOAD, .cb = cb, .user_data = user_data, .local_path = local_path},
               request_id);
}

int cloud_content_sync_upload(cloud_content_sync_h handle, const char *local_path, const char *server_path, int *req_id,
                              cloud_content_sync_transfer_cb cb, void *user_data)
{
    if (!handle || !local_path || !*local_path || !server_path || !*server_path || !req_id)
        return INVALID;
    handle->client->upload({0, local_path, server_path, cb, user_data}, req_id);
    return DONE;
}

int cloud_content_sync_get_uploaded_path(cloud_content_sync_h handle, int req_id, char **server_path)
{
    if (!handle || !server_path)
        return INVALID;
    const auto path = handle->client->uploaded_path(req_id);
    return path ? give(*path, server_path) : NOT_FOUND;
}

int cloud_content_sync_cancel(cloud_content_sync_h handle, int req_id)
{
    if (!handle)
        return INVALID;
    return handle->client->cancel(req_id) ? DONE : NOT_FOUND;
}

int cloud_content_sync_suspend(cloud_content_sync_h handle, int req_id)
{
    if (!handle)
        return INVALID;
    return handle->client->cancel(req_id, true) ? DONE : NOT_FOUND;
}

int cloud_content_sync_credentials_set(const char *service_name, const char *email, const char *user,
                                       const char *secret)
{
    if (!service_name || !cloud::service_name_is_valid(service_name))
        return INVALID;
    const auto service = cloud::service_find(service_name);
    if (!service)
        return CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE;
    const cloud::Credentials credentials{user ? user : "", secret ? secret : "", email ? email : ""};
    // A colon would end the user's name early (RFC 7617, 2).
    const bool bad_user = user && (!*user || cloud::has_control_characters(credentials.user) || std::strchr(user, ':'));
    const bool bad_email = email && !cloud::email_is_valid(credentials.email);
    if (bad_user || bad_email || (secret && !*secret) || cloud::has_control_characters(credentials.secret))
        return INVALID;
    Account account(*service);
    return account.open() && account.sign_in(secret ? &credentials : nullptr) ? DONE
                                                                              : CLOUD_CONTENT_SYNC_ERROR_DB_FAILED;
}
