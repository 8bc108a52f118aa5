#include "cloud_content_sync/client.h"
#include "cloud_content_sync/auth.h"
#include "cloud_content_sync/content.h"
#include "cloud_content_sync/names.h"
#include "cloud_content_sync/refresh.h"
#include "cloud_content_sync/storage.h"
#include "cloud_content_sync/thumbnails.h"
#include "cloud_content_sync/upload.h"
#include <algorithm>
#include <csignal>
#include <utility>

namespace cloud {

// Uploads that are looked after while others run; with more of them the next one waits.
static constexpr size_t BESIDE_MAX = 8;
// Until what has been told of a change can be seen.
static constexpr auto SETTLE = std::chrono::milliseconds(300);
// How often stalled transfers are looked for; with none under way there is nothing to look for.
static constexpr auto TICK = std::chrono::milliseconds(1000), IDLE_TICK = std::chrono::milliseconds(60'000);

Client::Client(Service description, std::shared_ptr<Account> database)
    : auth(std::make_unique<Auth>(*this)), contents(std::make_unique<Contents>(*this)),
      storage(std::make_unique<Storage>(*this)), thumbnails(std::make_unique<Thumbnails>(*this)),
      service(std::move(description)), account(std::move(database)), ledger(*account), http(service),
      patience(service.wait_seconds)
{
}

Client::~Client() = default;

void Client::start()
{
    std::scoped_lock lock(mutex);
    // The thread holds the client, so that stop() may be called from within a callback.
    thread = std::thread([self = shared_from_this()] {
        {
            // start() has stored the thread's id when it lets go of the lock.
            std::scoped_lock ready(self->mutex);
        }
        self->loop();
    });
    thread_id = thread.get_id();
}

void Client::stop()
{
    {
        std::scoped_lock lock(mutex);
        stopping = true;
        live.clear();
    }
    http.wake();
    if (on_own_thread())
        thread.detach();
    else
        thread.join();
}

void Client::upload(UploadRequest request, int *id)
{
    {
        std::scoped_lock lock(mutex);
        request.id = ++last_id;
        *id = request.id;
        live.insert(request.id);
        upload_queue.push_back(std::move(request));
    }
    http.wake();
}

int Client::new_request()
{
    std::scoped_lock lock(mutex);
    if (stopping)
        return 0;
    live.insert(++last_id);
    return last_id;
}

bool Client::is_kept(int id)
{
    std::scoped_lock lock(mutex);
    return kept.count(id) > 0;
}

bool Client::cancel(int id, bool keeps_entry)
{
    bool was_live = false;
    {
        std::unique_lock lock(mutex);
        if (keeps_entry)
            kept.insert(id);
        was_live = live.erase(id) > 0;
        if (!on_own_thread())
            callback_ended.wait(lock, [&] { return calling != id; });
    }
    if (was_live)
        http.wake();
    return was_live;
}

void Client::refresh(RefreshRequest request)
{
    {
        std::scoped_lock lock(mutex);
        refresh_queue.push_back(request);
    }
    http.wake();
}

std::optional<std::string> Client::uploaded_path(int id)
{
    std::scoped_lock lock(mutex);
    const auto found = landed.find(id);
    return found == landed.end() ? std::nullopt : std::optional(found->second);
}

bool Client::is_wanted(int id)
{
    std::scoped_lock lock(mutex);
    return live.count(id) > 0;
}

bool Client::is_stopping()
{
    std::scoped_lock lock(mutex);
    return stopping;
}

bool Client::begin_callback(int id, bool is_last)
{
    std::scoped_lock lock(mutex);
    if (!live.count(id))
        return false;
    if (is_last)
        live.erase(id);
    calling = id;
    return true;
}

// The loop wakes to start what waits for its turn.
void Client::end_callback()
{
    {
        std::scoped_lock lock(mutex);
        calling = 0;
    }
    callback_ended.notify_all();
    http.wake();
}

void Client::report_progress(const UploadRequest &request, int percent)
{
    if (!begin_callback(request.id, false))
        return;
    if (request.cb)
        request.cb(CLOUD_CONTENT_SYNC_STATE_RUNNING, 1, percent, CLOUD_CONTENT_SYNC_ERROR_NONE, request.user_data);
    end_callback();
}

bool Client::report_done(const UploadRequest &request, const ContentRow &stored, const std::string &who,
                         const LedgerRow &record)
{
    if (!begin_callback(request.id, true))
        return false;
    // A failure costs nothing but the row until the next refresh.
    if (account->insert(stored, who, [&](Db &db) { return ledger_close(db, record); }))
        stored_meanwhile.push_back(stored);
    {
        std::scoped_lock lock(mutex);
        landed[request.id] = join(stored.parent, stored.name);
    }
    if (request.cb)
        request.cb(CLOUD_CONTENT_SYNC_STATE_DONE, 1, 100, CLOUD_CONTENT_SYNC_ERROR_NONE, request.user_data);
    end_callback();
    return true;
}

void Client::report_failed(const UploadRequest &request, int error)
{
    if (!begin_callback(request.id, true))
        return http.wake();
    if (request.cb)
        request.cb(CLOUD_CONTENT_SYNC_STATE_FAILED, 1, 0, error, request.user_data);
    end_callback();
}

void Client::report_refreshed(const RefreshRequest &request, int error)
{
    // Refreshes have no id to be cancelled by; stop() waits for this thread.
    if (request.cb && !is_stopping())
        request.cb(error ? CLOUD_CONTENT_SYNC_STATE_FAILED : CLOUD_CONTENT_SYNC_STATE_DONE, error, request.user_data);
    http.wake();
}

void Client::end_requests(int error)
{
    std::deque<UploadRequest> uploads;
    std::vector<RefreshRequest> refreshes;
    {
        std::scoped_lock lock(mutex);
        uploads.swap(upload_queue);
        refreshes.swap(refresh_queue);
    }
    thumbnails->end();
    for (const auto &upload : beside)
        upload->end(error);
    if (running_upload)
        running_upload->end(error);
    for (const UploadRequest &request : uploads)
        report_failed(request, error);
    if (running_refresh)
        running_refresh->finish(error);
    for (const RefreshRequest &request : refreshes)
        report_refreshed(request, error);
    contents->end(error);
    storage->end(error);
}

// False when there is none, or when it must wait for one of its name.
bool Client::begin_next_upload()
{
    const auto deferred = std::ranges::find_if(beside, [](const auto &upload) { return upload->is_deferred(); });
    if (deferred != beside.end()) {
        running_upload = std::move(*deferred);
        beside.erase(deferred);
        running_upload->go_on();
        return true;
    }
    UploadRequest next;
    {
        std::scoped_lock lock(mutex);
        while (!upload_queue.empty() && !live.count(upload_queue.front().id))
            upload_queue.pop_front();
        if (stopping || upload_queue.empty())
            return false;
        next = upload_queue.front();
    }
    if (std::ranges::any_of(beside, [&](const auto &upload) { return upload->concerns(next.server_path); }))
        return false;
    {
        std::scoped_lock lock(mutex);
        upload_queue.pop_front(); // this thread alone does
    }
    running_upload = std::make_unique<Upload>(*this, std::move(next));
    running_upload->start();
    return true;
}

// Uploads run one after the other, so that two of one name never race for it.
void Client::step_upload()
{
    for (const auto &upload : beside)
        upload->step();
    std::erase_if(beside, [](const auto &upload) { return upload->has_ended(); });
    if (running_upload)
        running_upload->step();
    for (;;) {
        if (running_upload && !running_upload->has_ended()) {
            if (beside.size() >= BESIDE_MAX || !running_upload->may_step_aside())
                return;
            beside.push_back(std::move(running_upload));
        }
        running_upload.reset();
        if (!begin_next_upload())
            return;
    }
}

void Client::step_refresh()
{
    if (running_refresh && !running_refresh->has_ended())
        return;
    running_refresh.reset();
    std::vector<RefreshRequest> requests;
    {
        std::scoped_lock lock(mutex);
        if (stopping || refresh_queue.empty())
            return;
        requests.swap(refresh_queue);
    }
    stored_meanwhile.clear();
    running_refresh = std::make_unique<Refresh>(*this, std::move(requests));
    running_refresh->start();
}

cloud_content_sync_wait_e Client::waiting_for(int *seconds)
{
    std::scoped_lock lock(mutex);
    const auto left = wait.is_under_way() ? wait.until - Wait::Clock::now() : Wait::Clock::duration::zero();
    *seconds = std::max(0, static_cast<int>(std::chrono::ceil<std::chrono::seconds>(left).count()));
    return wait.reason;
}

static bool has_network()
{
    connection_h connection = nullptr;
    connection_type_e type = CONNECTION_TYPE_WIFI;
    if (connection_create(&connection) == CONNECTION_ERROR_NONE) {
        connection_get_type(connection, &type); // what cannot be asked counts as there
        connection_destroy(connection);
    }
    return type != CONNECTION_TYPE_DISCONNECTED;
}

Wait Client::wait_begin(long long retry_after)
{
    const bool is_reachable = retry_after >= 0;
    if (!is_reachable && !network)
        connection_watch_create(&network); // before the look, or a change in between would go unseen
    const bool was_change = std::exchange(network_changed, false);
    Wait next = patience.next(is_reachable, is_reachable || has_network(), retry_after);
    if (!next.is_under_way())
        wait_end();
    else if (was_change) // the settings store tells of a change while it makes it, so the answer may be that of before
        next.until = std::min(next.until, Wait::Clock::now() + SETTLE);
    std::scoped_lock lock(mutex);
    wait = next;
    return next;
}

void Client::wait_end()
{
    if (network)
        connection_watch_destroy(network);
    network = nullptr;
    std::scoped_lock lock(mutex);
    wait = {};
}

// Until there is more to do.
void Client::rest()
{
    std::chrono::milliseconds pause = http.is_idle() ? IDLE_TICK : TICK;
    const auto wait_for = [&pause](const Upload &upload) {
        if (const auto due = upload.due())
            pause = std::clamp(std::chrono::ceil<std::chrono::milliseconds>(*due - Wait::Clock::now()),
                               std::chrono::milliseconds(0), pause);
    };
    if (running_upload)
        wait_for(*running_upload);
    for (const auto &upload : beside)
        wait_for(*upload);
    int fd = -1;
    if (network)
        connection_watch_get_fd(network, &fd);
    if (http.run(pause, fd))
        network_changed = connection_watch_read(network) == CONNECTION_ERROR_NONE || network_changed;
}

void Client::loop()
{
    // Signals are the program's to handle, on its own threads; a connection that breaks must not raise SIGPIPE.
    sigset_t all;
    sigfillset(&all);
    pthread_sigmask(SIG_BLOCK, &all, nullptr);
    while (!is_stopping()) {
        auth->step();
        storage->step();
        step_refresh();
        step_upload();
        contents->step();
        // Nobody waits for a thumbnail, so it waits for everybody.
        thumbnails->step(!running_upload && beside.empty() && contents->is_idle());
        rest();
    }
    wait_end();
    beside.clear();
    running_upload.reset();
    running_refresh.reset();
    contents->end(0);
    storage->end(0);
    thumbnails->end();
    auth->end();
}

} // namespace cloud
