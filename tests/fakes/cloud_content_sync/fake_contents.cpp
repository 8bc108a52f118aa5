// The fake's single files: their requests and thumbnails.
#include "base/base.h"
#include "cloud_content_sync/names.h"
#include "fake_cloud_state.h"
#include <filesystem>
#include <fstream>
#include <functional>
#include <utility>

using namespace cloud;

static constexpr int INVALID = CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER;
static constexpr int NOT_FOUND = CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND;

// What stops a request, or 0. With the lock held.
static int obstacle(Job &job)
{
    FakeCloud &cloud = fake();
    job.status = 0;
    if (const int error = std::exchange(cloud.content_error, 0))
        return error;
    if (!cloud.signed_in)
        return CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
    const auto file = cloud.files.find(job.server);
    const auto cached = cloud.cached.find(job.server);
    const bool is_kept = job.kind == Job::CACHED_FILE && cached != cloud.cached.end() && file != cloud.files.end() &&
                         cached->second == file->second;
    if (is_kept)
        return 0;
    if (!cloud.reachable)
        return CLOUD_CONTENT_SYNC_ERROR_NETWORK;
    job.status = file == cloud.files.end() ? 404 : 200;
    return file == cloud.files.end() ? NOT_FOUND : 0;
}

// As a whole or not at all.
static bool write_file(const std::string &path, const std::string &bytes)
{
    const std::string part = path + ".part";
    std::error_code error;
    if (!(std::ofstream(part, std::ios::binary) << bytes))
        return false;
    std::filesystem::rename(part, path, error);
    return !error;
}

static std::string cached_file(const std::string &server)
{
    const std::string folder = platform_data_dir() + "/cloud/cache/fake";
    std::filesystem::create_directories(folder);
    std::string extension = std::filesystem::path(server).extension();
    if (extension.find(' ') != extension.npos)
        extension.clear();
    return folder + "/" + std::to_string(std::hash<std::string>()(server)) + extension;
}

void FakeClient::run_content(Job job)
{
    std::string content;
    int error = 0;
    {
        std::scoped_lock lock(fake().mutex);
        error = obstacle(job);
        if (!error)
            content = fake().files[job.server];
    }
    if (job.kind == Job::CACHED_FILE)
        job.local = cached_file(job.server);
    if (job.kind == Job::STREAMING_ADDRESS)
        job.local = "https://media.example.org" + percent_encode(job.server);
    else if (!error && !write_file(job.local, content))
        error = CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
    call(job, error ? CLOUD_CONTENT_SYNC_STATE_FAILED : CLOUD_CONTENT_SYNC_STATE_DONE, 0, error, [&] {
        if (job.kind == Job::CACHED_FILE && !error)
            fake().cached[job.server] = content;
    });
}

void FakeClient::run_thumbnail(const Job &job)
{
    call(job, CLOUD_CONTENT_SYNC_STATE_DONE, 0, 0, [&] { fake().fetched_thumbnails.insert(job.server); });
}

void FakeClient::set_thumbnail_cb(cloud_content_sync_thumbnail_cb cb, void *user_data)
{
    std::unique_lock lock(fake().mutex);
    thumbnail_cb = cb;
    thumbnail_data = user_data;
    if (std::this_thread::get_id() != thread_id)
        fake().changed.wait(lock, [&] { return calling != -1; });
}

int cloud_content_sync_content_clone(cloud_content_sync_content_h *copy, cloud_content_sync_content_h content)
{
    if (!copy || !content)
        return INVALID;
    *copy = new cloud_content_sync_content_s(*content);
    return 0;
}

int cloud_content_sync_content_destroy(cloud_content_sync_content_h content)
{
    delete content;
    return content ? 0 : INVALID;
}

int cloud_content_sync_content_get_name(cloud_content_sync_content_h content, char **name)
{
    return content && name ? give(name_of(content->path), name) : INVALID;
}

int cloud_content_sync_content_get_size(cloud_content_sync_content_h content, long long *size)
{
    if (!content || !size)
        return INVALID;
    *size = content->size;
    return 0;
}

int cloud_content_sync_content_get_content_type(cloud_content_sync_content_h content, int *type)
{
    if (!content || !type)
        return INVALID;
    *type = content_type_of(name_of(content->path));
    return 0;
}

// The file of a thumbnail that was fetched; otherwise empty, and `is_made` tells whether the service has one.
static std::string fetched_thumbnail(const std::string &path, bool &is_made)
{
    std::scoped_lock lock(fake().mutex);
    const auto found = fake().thumbnails.find(path);
    is_made = found != fake().thumbnails.end() && fake().signed_in && fake().reachable;
    return is_made && fake().fetched_thumbnails.count(path) ? found->second : "";
}

int cloud_content_sync_content_get_is_thumbnail_exist(cloud_content_sync_content_h content, bool *exists)
{
    if (!content || !exists)
        return INVALID;
    bool is_made = false;
    const auto client = content->client.lock();
    *exists = client && !fetched_thumbnail(content->path, is_made).empty();
    if (is_made && !*exists)
        client->add({.server = content->path, .kind = Job::THUMBNAIL});
    return 0;
}

int cloud_content_sync_content_get_thumbnail_path(cloud_content_sync_content_h content, char **path)
{
    if (!content || !path)
        return INVALID;
    bool is_made = false;
    const std::string file = content->client.lock() ? fetched_thumbnail(content->path, is_made) : "";
    return file.empty() ? NOT_FOUND : give(file, path);
}

int cloud_content_sync_set_thumbnail_cb(cloud_content_sync_h handle, cloud_content_sync_thumbnail_cb cb,
                                        void *user_data)
{
    if (!handle)
        return INVALID;
    handle->client->set_thumbnail_cb(cb, user_data);
    return 0;
}

static int ask(cloud_content_sync_content_h content, Job::Kind kind, const char *local_path, int *request_id,
               cloud_content_sync_result_cb cb, void *user_data)
{
    const auto client = content->client.lock();
    if (!client)
        return NOT_FOUND;
    client->add({-1, local_path, content->path, nullptr, nullptr, user_data, kind, cb}, request_id);
    return 0;
}

int cloud_content_sync_content_get_cached_file(cloud_content_sync_content_h content, int *request_id,
                                               cloud_content_sync_result_cb cb, void *user_data)
{
    return content && request_id ? ask(content, Job::CACHED_FILE, "", request_id, cb, user_data) : INVALID;
}

int cloud_content_sync_content_get_streaming_url(cloud_content_sync_content_h content, int *request_id,
                                                 cloud_content_sync_result_cb cb, void *user_data, int minutes)
{
    return content && request_id && minutes > 0 ? ask(content, Job::STREAMING_ADDRESS, "", request_id, cb, user_data)
                                                : INVALID;
}

int cloud_content_sync_content_download(cloud_content_sync_content_h content, const char *local_path, int *request_id,
                                        cloud_content_sync_result_cb cb, void *user_data)
{
    return content && local_path && *local_path && request_id
               ? ask(content, Job::DOWNLOAD, local_path, request_id, cb, user_data)
               : INVALID;
}
