// The fake's service, and its transfers and refreshes.
#include "fake_cloud.h"
#include "cloud_content_sync/names.h"
#include "fake_cloud_state.h"
#include <chrono>
#include <cstdlib>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

using namespace cloud;

FakeCloud &fake()
{
    static FakeCloud state;
    return state;
}

void FakeCloud::refresh()
{
    known_folders = folders;
    known_files.clear();
    for (const auto &[path, content] : files)
        known_files[path] = static_cast<long long>(content.size());
    complete = true;
}

// The content of a local file, or nothing when it is no readable regular file.
static std::optional<std::string> read_local(const std::string &path)
{
    const int fd = open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0)
        return {};
    struct stat info = {};
    std::optional<std::string> content;
    if (fstat(fd, &info) == 0 && S_ISREG(info.st_mode)) {
        content.emplace();
        char buffer[65536];
        for (ssize_t got = 0; (got = read(fd, buffer, sizeof buffer)) > 0;)
            content->append(buffer, static_cast<size_t>(got));
    }
    close(fd);
    return content;
}

bool FakeClient::call(const Job &job, int state, int progress, int error, const std::function<void()> &commit)
{
    FakeCloud &cloud = fake();
    std::unique_lock lock(cloud.mutex);
    const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(cloud.delay);
    cloud.changed.wait_until(lock, end, [&] { return !is_wanted(job); });
    cloud.changed.wait(lock, [&] { return !is_wanted(job) || !cloud.held || cloud.permits > 0; });
    if (!is_wanted(job))
        return false;
    if (cloud.held)
        cloud.permits--;
    if (state != CLOUD_CONTENT_SYNC_STATE_RUNNING)
        live.erase(job.id);
    calling = job.kind == Job::THUMBNAIL ? -1 : job.id;
    const auto told = job.kind == Job::THUMBNAIL ? thumbnail_cb : nullptr;
    void *const told_data = thumbnail_data;
    if (commit)
        commit();
    lock.unlock();
    if (job.transfer_cb)
        job.transfer_cb(state, 1, progress, error, job.user_data);
    if (job.refresh_cb)
        job.refresh_cb(state, error, job.user_data);
    if (job.result_cb)
        job.result_cb(state, error ? nullptr : job.local.c_str(), job.status, error, job.user_data);
    if (told)
        told(job.server.c_str(), told_data);
    lock.lock();
    calling = 0;
    cloud.changed.notify_all();
    return true;
}

// What stops an upload before anything is sent, or 0.
static int obstacle(const Job &job, std::optional<std::string> &content)
{
    const FakeCloud &cloud = fake();
    if (!cloud.signed_in)
        return CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
    if (!path_is_valid(job.server) || job.server == "/")
        return CLOUD_CONTENT_SYNC_ERROR_BAD_NAME;
    content = read_local(job.local);
    if (!content)
        return CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
    if (!cloud.reachable)
        return CLOUD_CONTENT_SYNC_ERROR_NETWORK;
    return cloud.folders.count(parent_of(job.server)) ? 0 : CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN;
}

void FakeClient::run_upload(const Job &job)
{
    FakeCloud &cloud = fake();
    std::optional<std::string> content;
    std::vector<int> percentages;
    int error = 0;
    {
        std::scoped_lock lock(cloud.mutex);
        error = obstacle(job, content);
        if (!error) {
            percentages = cloud.percentages;
            const auto scripted = cloud.upload_errors.find(++cloud.uploads_sent);
            error = scripted == cloud.upload_errors.end() ? 0 : scripted->second;
        }
    }
    for (const int percentage : percentages)
        if (!call(job, CLOUD_CONTENT_SYNC_STATE_RUNNING, percentage, 0))
            return;
    if (error) {
        call(job, CLOUD_CONTENT_SYNC_STATE_FAILED, 0, error);
        return;
    }
    call(job, CLOUD_CONTENT_SYNC_STATE_DONE, 100, 0, [&] {
        std::string path = job.server;
        while (cloud.files.count(path) || cloud.folders.count(path))
            path = join(parent_of(path), next_free_name(name_of(path)));
        cloud.known_files[path] = static_cast<long long>(content->size());
        cloud.files[path] = std::move(*content);
        landed[job.id] = path;
    });
}

void FakeClient::run_refresh(const Job &job)
{
    FakeCloud &cloud = fake();
    int error = 0;
    {
        std::scoped_lock lock(cloud.mutex);
        error = std::exchange(cloud.refresh_error, 0);
        if (!cloud.signed_in)
            error = CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
        else if (!cloud.reachable)
            error = CLOUD_CONTENT_SYNC_ERROR_NETWORK;
    }
    if (error)
        call(job, CLOUD_CONTENT_SYNC_STATE_FAILED, 0, error);
    else
        call(job, CLOUD_CONTENT_SYNC_STATE_DONE, 0, 0, [&] { cloud.refresh(); });
}

void FakeClient::loop()
{
    FakeCloud &cloud = fake();
    for (;;) {
        Job job;
        {
            std::unique_lock lock(cloud.mutex);
            cloud.changed.wait(lock, [&] { return stopping || !jobs.empty(); });
            if (stopping)
                return;
            job = std::move(jobs.front());
            jobs.pop_front();
            if (!is_wanted(job))
                continue;
        }
        if (job.kind == Job::THUMBNAIL)
            run_thumbnail(job);
        else if (job.kind != Job::TRANSFER)
            run_content(std::move(job));
        else
            job.id ? run_upload(job) : run_refresh(job);
    }
}

void FakeClient::start()
{
    std::scoped_lock lock(fake().mutex);
    thread = std::thread([self = shared_from_this()] { self->loop(); });
    thread_id = thread.get_id();
}

void FakeClient::stop()
{
    {
        std::scoped_lock lock(fake().mutex);
        stopping = true;
    }
    fake().changed.notify_all();
    if (std::this_thread::get_id() == thread_id)
        thread.detach();
    else
        thread.join();
}

void FakeClient::add(Job job, int *id)
{
    std::scoped_lock lock(fake().mutex);
    if (job.id) {
        *id = job.id = ++last_id;
        live.insert(job.id);
        if (job.kind == Job::TRANSFER)
            fake().log.push_back(job.local + " -> " + job.server);
    }
    jobs.push_back(job);
    fake().changed.notify_all();
}

bool FakeClient::cancel(int id)
{
    std::unique_lock lock(fake().mutex);
    const bool was_live = live.erase(id) > 0;
    fake().changed.notify_all();
    if (std::this_thread::get_id() != thread_id)
        fake().changed.wait(lock, [&] { return calling != id; });
    return was_live;
}

// The control of the tests.

template <class Change> static void change(Change apply)
{
    {
        std::scoped_lock lock(fake().mutex);
        apply(fake());
    }
    fake().changed.notify_all();
}

void fake_cloud_reset()
{
    change([](FakeCloud &cloud) {
        if (cloud.handles)
            std::abort(); // a handle that was not destroyed
        const FakeCloud fresh;
        cloud.folders = fresh.folders;
        cloud.files.clear();
        cloud.known_folders = fresh.known_folders;
        cloud.known_files.clear();
        cloud.activation.clear();
        cloud.complete = cloud.held = false;
        cloud.reachable = cloud.signed_in = true;
        cloud.permits = cloud.delay = cloud.uploads_sent = cloud.refresh_error = cloud.create_error = 0;
        cloud.content_error = 0;
        cloud.cached.clear();
        cloud.thumbnails.clear();
        cloud.fetched_thumbnails.clear();
        cloud.upload_errors.clear();
        cloud.percentages = fresh.percentages;
        cloud.log.clear();
    });
}

void fake_cloud_fail_content(int error)
{
    change([&](FakeCloud &cloud) { cloud.content_error = error; });
}

void fake_cloud_add_thumbnail(const std::string &path, const std::string &picture)
{
    change([&](FakeCloud &cloud) { cloud.thumbnails[path] = picture; });
}

void fake_cloud_add_folder(const std::string &path)
{
    change([&](FakeCloud &cloud) { cloud.folders.insert(path); });
}

void fake_cloud_add_file(const std::string &path, const std::string &content)
{
    change([&](FakeCloud &cloud) { cloud.files[path] = content; });
}

void fake_cloud_remove(const std::string &path)
{
    const auto is_below = [&](const std::string &other) {
        return other == path || other.compare(0, path.size() + 1, path + "/") == 0;
    };
    change([&](FakeCloud &cloud) {
        std::erase_if(cloud.folders, is_below);
        std::erase_if(cloud.files, [&](const auto &file) { return is_below(file.first); });
    });
}

std::optional<std::string> fake_cloud_content(const std::string &path)
{
    std::scoped_lock lock(fake().mutex);
    const auto found = fake().files.find(path);
    return found == fake().files.end() ? std::nullopt : std::optional(found->second);
}

std::vector<std::string> fake_cloud_list(const std::string &folder)
{
    std::scoped_lock lock(fake().mutex);
    std::vector<std::string> names;
    for (const std::string &path : fake().folders)
        if (path != "/" && parent_of(path) == folder)
            names.push_back(name_of(path));
    for (const auto &[path, content] : fake().files)
        if (parent_of(path) == folder)
            names.push_back(name_of(path));
    return names;
}

void fake_cloud_refresh_now()
{
    change([](FakeCloud &cloud) { cloud.refresh(); });
}

void fake_cloud_set_reachable(bool reachable)
{
    change([&](FakeCloud &cloud) { cloud.reachable = reachable; });
}

void fake_cloud_set_signed_in(bool signed_in)
{
    change([&](FakeCloud &cloud) { cloud.signed_in = signed_in; });
}

void fake_cloud_fail_upload(int nth, int error)
{
    change([&](FakeCloud &cloud) { cloud.upload_errors[cloud.uploads_sent + nth] = error; });
}

void fake_cloud_fail_refresh(int error)
{
    change([&](FakeCloud &cloud) { cloud.refresh_error = error; });
}

void fake_cloud_fail_create(int error)
{
    change([&](FakeCloud &cloud) { cloud.create_error = error; });
}

void fake_cloud_set_percentages(const std::vector<int> &percentages)
{
    change([&](FakeCloud &cloud) { cloud.percentages = percentages; });
}

void fake_cloud_set_delay(int milliseconds)
{
    change([&](FakeCloud &cloud) { cloud.delay = milliseconds; });
}

void fake_cloud_hold(bool hold)
{
    change([&](FakeCloud &cloud) {
        cloud.held = hold;
        cloud.permits = 0;
    });
}

void fake_cloud_let_through(int callbacks)
{
    change([&](FakeCloud &cloud) { cloud.permits += callbacks; });
}

int fake_cloud_open_handles()
{
    std::scoped_lock lock(fake().mutex);
    return fake().handles;
}

std::vector<std::string> fake_cloud_upload_log()
{
    std::scoped_lock lock(fake().mutex);
    return fake().log;
}
