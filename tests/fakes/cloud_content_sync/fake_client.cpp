// The client behind the real library's functions: its jobs run one after the other, in the order they came in.
#include "cloud_content_sync/cache.h"
#include "cloud_content_sync/content.h"
#include "cloud_content_sync/names.h"
#include "cloud_content_sync/thumbnails.h"
#include "fake_state.h"
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#undef cloud_content_sync_create
int real_cloud_content_sync_create(const char *service_name, cloud_content_sync_h *handle);

int cloud_content_sync_create(const char *service_name, cloud_content_sync_h *handle)
{
    std::unique_lock lock(fake().mutex);
    if (const int error = std::exchange(fake().create_error, 0))
        return error;
    lock.unlock();
    return real_cloud_content_sync_create(service_name, handle);
}

namespace cloud {

// The real client's parts have no counterpart here.
class Upload {};
class Refresh {};
class ContentTask {};
struct Thumbnails::Running {};

Client::Client(Service description, std::shared_ptr<Account> database)
    : contents(std::make_unique<Contents>(*this)), thumbnails(std::make_unique<Thumbnails>(*this)),
      service(std::move(description)), account(std::move(database)), http(service)
{
}

Client::~Client()
{
    std::scoped_lock lock(fake().mutex);
    fake().jobs.erase(this);
}

void Client::start()
{
    std::scoped_lock lock(fake().mutex);
    fake().handles++;
    thread = std::thread([self = shared_from_this()] { self->loop(); });
    thread_id = thread.get_id();
}

void Client::stop()
{
    {
        std::scoped_lock lock(fake().mutex);
        fake().handles--;
        stopping = true;
    }
    fake().changed.notify_all();
    if (on_own_thread())
        thread.detach();
    else
        thread.join();
}

void Client::loop()
{
    std::unique_lock lock(fake().mutex);
    for (;;) {
        auto &jobs = fake().jobs[this];
        fake().changed.wait(lock, [&] { return stopping || !jobs.empty(); });
        if (stopping)
            return;
        const auto job = std::move(jobs.front());
        jobs.pop_front();
        lock.unlock();
        job();
        lock.lock();
    }
}

// With the lock held.
static void add_job(const Client &client, std::function<void()> job)
{
    fake().jobs[&client].push_back(std::move(job));
    fake().changed.notify_all();
}

int Client::new_request()
{
    std::scoped_lock lock(fake().mutex);
    live.insert(++last_id);
    return last_id;
}

// With the lock held. What has no id cannot be cancelled.
bool Client::is_wanted(int id)
{
    return !stopping && (!id || live.count(id));
}

bool Client::cancel(int id)
{
    std::unique_lock lock(fake().mutex);
    const bool was_live = live.erase(id) > 0;
    fake().changed.notify_all();
    if (!on_own_thread())
        fake().changed.wait(lock, [&] { return calling != id; });
    return was_live;
}

bool Client::begin_callback(int id, bool is_last)
{
    std::unique_lock lock(fake().mutex);
    const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(fake().delay);
    fake().changed.wait_until(lock, end, [&] { return !is_wanted(id); });
    fake().changed.wait(lock, [&] { return !is_wanted(id) || !fake().held || fake().permits > 0; });
    if (!is_wanted(id))
        return false;
    if (fake().held)
        fake().permits--;
    if (is_last)
        live.erase(id);
    calling = id;
    return true;
}

void Client::end_callback()
{
    {
        std::scoped_lock lock(fake().mutex);
        calling = 0;
    }
    fake().changed.notify_all();
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
        std::ifstream file(path, std::ios::binary);
        content.emplace(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
    }
    close(fd);
    return content;
}

// Why the service cannot be asked, or 0. With the lock held.
static int unreachable(const Client &client)
{
    if (!credentials_load(client.service.name))
        return CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
    return fake().reachable ? 0 : CLOUD_CONTENT_SYNC_ERROR_NETWORK;
}

// What stops an upload before anything is sent, or 0. With the lock held.
static int obstacle(const Client &client, const UploadRequest &request, std::optional<std::string> &content)
{
    if (!path_is_valid(request.server_path) || request.server_path == "/")
        return CLOUD_CONTENT_SYNC_ERROR_BAD_NAME;
    content = read_local(request.local_path);
    if (!content)
        return CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
    if (const int error = unreachable(client))
        return error;
    return fake().folders.count(parent_of(request.server_path)) ? 0 : CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN;
}

static void run_upload(Client &client, const UploadRequest &request)
{
    std::unique_lock lock(fake().mutex);
    std::optional<std::string> content;
    int error = obstacle(client, request, content);
    const bool is_sent = !error;
    if (const auto scripted = fake().upload_errors.find(is_sent ? ++fake().uploads_sent : 0);
        scripted != fake().upload_errors.end())
        error = scripted->second;
    lock.unlock();
    const auto call = [&](int state, int progress) {
        if (request.cb)
            request.cb(state, 1, progress, state == CLOUD_CONTENT_SYNC_STATE_FAILED ? error : 0, request.user_data);
        client.end_callback();
    };
    if (is_sent)
        for (const int progress : {0, 50, 100})
            if (client.begin_callback(request.id, false))
                call(CLOUD_CONTENT_SYNC_STATE_RUNNING, progress);
    if (!client.begin_callback(request.id, true))
        return;
    if (error)
        return call(CLOUD_CONTENT_SYNC_STATE_FAILED, 0);
    lock.lock();
    std::string path = request.server_path;
    while (fake().files.count(path) || fake().folders.count(path))
        path = join(parent_of(path), next_free_name(name_of(path)));
    client.account->insert({parent_of(path), name_of(path), static_cast<long long>(content->size()), 0, ""},
                           client.account->identity());
    fake().files[path] = *content;
    fake().landed[{&client, request.id}] = path;
    lock.unlock();
    call(CLOUD_CONTENT_SYNC_STATE_DONE, 100);
}

void Client::upload(UploadRequest request, int *id)
{
    std::scoped_lock lock(fake().mutex);
    *id = request.id = ++last_id;
    live.insert(request.id);
    fake().log.push_back(request.local_path + " -> " + request.server_path);
    add_job(*this, [this, request] { run_upload(*this, request); });
}

std::optional<std::string> Client::uploaded_path(int id)
{
    std::scoped_lock lock(fake().mutex);
    const auto found = fake().landed.find({this, id});
    return found == fake().landed.end() ? std::nullopt : std::optional(found->second);
}

void Client::refresh(RefreshRequest request)
{
    std::scoped_lock lock(fake().mutex);
    add_job(*this, [this, request] {
        std::unique_lock running(fake().mutex);
        const int scripted = std::exchange(fake().refresh_error, 0), error = scripted ? scripted : unreachable(*this);
        running.unlock();
        if (!begin_callback(0, true))
            return;
        running.lock();
        if (!error)
            fake().refresh(*account);
        running.unlock();
        if (request.cb)
            request.cb(error ? CLOUD_CONTENT_SYNC_STATE_FAILED : CLOUD_CONTENT_SYNC_STATE_DONE, error,
                       request.user_data);
        end_callback();
    });
}

Contents::Contents(Client &owner) : client(owner) {}

Contents::~Contents() = default;

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

static void run_content(Client &client, const ContentRequest &request)
{
    const bool is_cached = request.kind == ContentRequest::CACHED_FILE;
    const std::string path = join(request.row.parent, request.row.name);
    std::string text = is_cached ? cache_file(Kept::CONTENT, client.service.name, "", request.row) : request.local_path,
                content;
    int status = 0;
    std::unique_lock lock(fake().mutex);
    int error = std::exchange(fake().content_error, 0);
    const auto file = fake().files.find(path), kept = fake().cached.find(path);
    const bool is_there = file != fake().files.end();
    const bool is_kept = is_cached && is_there && kept != fake().cached.end() && kept->second == file->second;
    if (!error && !is_kept)
        error = unreachable(client);
    if (!error && !is_kept) {
        status = is_there ? 200 : 404;
        error = is_there ? 0 : CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND;
    }
    if (!error)
        content = file->second;
    lock.unlock();
    if (request.kind == ContentRequest::STREAMING_ADDRESS)
        text = "https://media.example.org" + percent_encode(path);
    if (!client.begin_callback(request.id, true))
        return;
    if (request.kind != ContentRequest::STREAMING_ADDRESS && !error && !write_file(text, content))
        error = CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
    lock.lock();
    if (is_cached && !error)
        fake().cached[path] = content;
    lock.unlock();
    if (request.cb)
        request.cb(error ? CLOUD_CONTENT_SYNC_STATE_FAILED : CLOUD_CONTENT_SYNC_STATE_DONE,
                   error ? nullptr : text.c_str(), status, error, request.user_data);
    client.end_callback();
}

void Contents::add(ContentRequest request)
{
    std::scoped_lock lock(fake().mutex);
    add_job(client, [this, request = std::move(request)] { run_content(client, request); });
}

Thumbnails::Thumbnails(Client &owner) : client(owner) {}

Thumbnails::~Thumbnails() = default;

// There are none.
std::optional<std::string> Thumbnails::find(const ContentRow &)
{
    return std::nullopt;
}

void Thumbnails::want(const ContentRow &) {}

void Thumbnails::set_cb(cloud_content_sync_thumbnail_cb, void *) {}

} // namespace cloud
