#include "cloud_content_sync/content.h"
#include "cloud_content_sync/cache.h"
#include "cloud_content_sync/client.h"
#include "cloud_content_sync/fetch.h"
#include "cloud_content_sync/names.h"
#include <cerrno>
#include <glib.h>
#include <limits>
#include <sys/stat.h>
#include <utility>

namespace cloud {

static constexpr size_t TASKS_AT_ONCE = 4;
static constexpr long long CACHE_BYTES = 512LL << 20;
static constexpr size_t ANSWER_BYTES = 64 << 10; // of the account interface
static constexpr long long ANY_SIZE = std::numeric_limits<long long>::max();

// One request, from its start to its last callback. Client thread only.
class ContentTask {
  public:
    ContentTask(Client &owner, ContentRequest request) : client(owner), wanted(std::move(request)), row(wanted.row) {}
    ~ContentTask()
    {
        client.http.abort(asking);
    }
    ContentTask(const ContentTask &) = delete;
    ContentTask &operator=(const ContentTask &) = delete;

    void start();
    void step();
    void break_off(int error);
    bool has_ended() const
    {
        return ended;
    }

  private:
    void look_into_cache();
    void keep_in_cache();
    void download();
    void store_download();
    void get(const std::string &folder, mode_t mode, void (ContentTask::*then)());
    void ask_for_address();
    void take_address(const Transfer &transfer, const std::string &answer);
    void finish(int error, const std::string &text, long status);
    bool begin_last_callback();
    void tell(int error, const std::string &text, long status);

    Client &client;
    const ContentRequest wanted;
    ContentRow row; // as the database knows it
    Credentials credentials;
    std::unique_ptr<Fetch> fetch;
    Transfer *asking = nullptr;
    bool ended = false;
};

void ContentTask::start()
{
    if (const int error = credentials_load(client.service.name, credentials))
        return finish(error, "", 0);
    switch (wanted.kind) {
    case ContentRequest::CACHED_FILE:
        return look_into_cache();
    case ContentRequest::DOWNLOAD:
        return download();
    case ContentRequest::STREAMING_ADDRESS:
        return ask_for_address();
    }
}

void ContentTask::step()
{
    if (ended || client.is_wanted(wanted.id))
        return;
    fetch.reset();
    client.http.abort(asking);
    asking = nullptr;
    ended = true;
}

void ContentTask::break_off(int error)
{
    fetch.reset();
    client.http.abort(asking);
    asking = nullptr;
    finish(error, "", 0);
}

void ContentTask::get(const std::string &folder, mode_t mode, void (ContentTask::*then)())
{
    fetch = std::make_unique<Fetch>(client.http, folder, mode, ANY_SIZE);
    auto transfer = std::make_unique<Transfer>();
    transfer->path = join(row.parent, row.name);
    const auto done = [this, then] {
        if (!client.is_wanted(wanted.id))
            return; // step() ends it
        // Of one version of a file there is only one size.
        const bool is_same = !row.etag.empty() && opaque_tag(fetch->etag) == opaque_tag(row.etag);
        if (!fetch->error && is_same && row.size > 0 && fetch->size != row.size)
            fetch->error = CLOUD_CONTENT_SYNC_ERROR_CORRUPTED;
        if (fetch->error)
            return finish(fetch->error, "", fetch->status);
        (this->*then)();
    };
    if (!fetch->start(std::move(transfer), credentials, done))
        finish(fetch->error, "", 0);
}

void ContentTask::look_into_cache()
{
    // The handle may be older than the last refresh.
    row = client.account->content_at(row.parent, row.name).value_or(row);
    const std::string &service = client.service.name;
    const std::string file = cache_file(Kept::CONTENT, service, account_identity(client.service, credentials), row);
    if (cache_use(file, row.size))
        return finish(0, file, 0);
    get(cache_folder(Kept::CONTENT, service), 0600, &ContentTask::keep_in_cache);
}

void ContentTask::keep_in_cache()
{
    const std::string identity = account_identity(client.service, credentials);
    // The file may have changed since the last refresh; the database learns of it, so that the next request finds the
    // new version in the cache.
    const bool has_changed = opaque_tag(fetch->etag) != opaque_tag(row.etag) || fetch->size != row.size;
    row.size = fetch->size;
    if (has_changed) {
        row.etag = fetch->etag;
        client.account->update(row, identity);
    }
    const std::string file = cache_file(Kept::CONTENT, client.service.name, identity, row);
    if (!client.account->while_signed_in(identity, [&] { return fetch->store(file); })) {
        // Somebody else may have signed in meanwhile, and what was kept of this account was removed.
        const bool is_same = client.account->identity() == identity;
        return finish(is_same ? CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE : CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED, "",
                      fetch->status);
    }
    cache_trim(cache_folder(Kept::CONTENT, client.service.name), CACHE_BYTES, file);
    finish(0, file, fetch->status);
}

// Whether a download may take this place: nothing is there, or a regular file that it may replace.
static bool is_free_or_file(const std::string &path)
{
    struct stat info = {};
    return lstat(path.c_str(), &info) == 0 ? S_ISREG(info.st_mode) : errno == ENOENT;
}

void ContentTask::download()
{
    const size_t slash = wanted.local_path.rfind('/');
    if (!is_free_or_file(wanted.local_path) || slash + 1 == wanted.local_path.size())
        return finish(CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE, "", 0);
    const std::string folder = slash == std::string::npos ? "." : wanted.local_path.substr(0, slash + 1);
    get(folder, 0666, &ContentTask::store_download);
}

void ContentTask::store_download()
{
    // From here on it cannot be cancelled: a cancel leaves no file.
    if (!begin_last_callback())
        return;
    const bool is_stored = is_free_or_file(wanted.local_path) && fetch->store(wanted.local_path);
    tell(is_stored ? 0 : CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE, wanted.local_path, fetch->status);
}

void ContentTask::ask_for_address()
{
    const std::string path = join(row.parent, row.name);
    Db json;
    json.open(":memory:", nullptr);
    Stmt body(json, "SELECT json_object('path', ?, 'minutes', ?)");
    body.bind(1, path).bind(2, static_cast<long long>(wanted.minutes));
    // JSON is UTF-8; a service without an account interface has no such addresses.
    if (client.service.api.empty() || !g_utf8_validate(path.c_str(), -1, nullptr) || !body.row())
        return finish(CLOUD_CONTENT_SYNC_ERROR_SERVER, "", 0);
    auto answer = std::make_shared<std::string>();
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "POST";
    transfer->url = client.service.api + "/1/media";
    transfer->headers = {"Content-Type: application/json", "Accept: application/json"};
    transfer->body = body.text(0);
    transfer->write = [answer](const char *data, size_t size) {
        answer->append(data, size);
        return answer->size() <= ANSWER_BYTES;
    };
    transfer->done = [this, answer](Transfer &done) {
        asking = nullptr;
        take_address(done, *answer);
    };
    asking = client.http.start(std::move(transfer), credentials);
}

// The "url" of the answer, which may be relative to the interface's own address (RFC 3986, 5); empty when there is
// none.
static std::string address_in(const std::string &answer, const std::string &base)
{
    Db json;
    json.open(":memory:", nullptr);
    Stmt field(json, "SELECT CASE WHEN json_valid(?1) THEN json_extract(?1, '$.url') END");
    if (!field.bind(1, answer).row() || field.null(0))
        return "";
    g_autofree char *url = g_uri_resolve_relative(base.c_str(), field.text(0).c_str(), G_URI_FLAGS_ENCODED, nullptr);
    const bool is_http = url && (g_str_has_prefix(url, "http://") || g_str_has_prefix(url, "https://"));
    return is_http ? url : "";
}

void ContentTask::take_address(const Transfer &transfer, const std::string &answer)
{
    if (!transfer.is_success()) {
        const int error = transfer.error();
        return finish(error == CLOUD_CONTENT_SYNC_ERROR_BAD_NAME ? CLOUD_CONTENT_SYNC_ERROR_SERVER : error, "",
                      transfer.status);
    }
    const std::string url = address_in(answer, client.service.api + "/1/media");
    finish(url.empty() ? CLOUD_CONTENT_SYNC_ERROR_SERVER : 0, url, transfer.status);
}

void ContentTask::finish(int error, const std::string &text, long status)
{
    if (begin_last_callback())
        tell(error, text, status);
}

// False when nobody is to be told any more.
bool ContentTask::begin_last_callback()
{
    ended = true;
    if (client.begin_callback(wanted.id, true))
        return true;
    if (fetch)
        fetch->discard();
    client.http.wake();
    return false;
}

void ContentTask::tell(int error, const std::string &text, long status)
{
    if (fetch)
        fetch->discard();
    if (wanted.cb)
        wanted.cb(error ? CLOUD_CONTENT_SYNC_STATE_FAILED : CLOUD_CONTENT_SYNC_STATE_DONE,
                  error ? nullptr : text.c_str(), static_cast<int>(status), error, wanted.user_data);
    client.end_callback();
}

Contents::Contents(Client &owner) : client(owner) {}

Contents::~Contents() = default;

void Contents::add(ContentRequest request)
{
    {
        std::scoped_lock lock(mutex);
        waiting.push_back(std::move(request));
    }
    client.http.wake();
}

void Contents::step()
{
    for (const auto &task : running)
        task->step();
    for (;;) {
        std::erase_if(running, [](const auto &task) { return task->has_ended(); });
        ContentRequest next;
        {
            std::scoped_lock lock(mutex);
            if (waiting.empty() || running.size() >= TASKS_AT_ONCE)
                return;
            next = std::move(waiting.front());
            waiting.pop_front();
        }
        if (!client.is_wanted(next.id))
            continue;
        running.push_back(std::make_unique<ContentTask>(client, std::move(next)));
        running.back()->start();
    }
}

void Contents::end(int error)
{
    auto all = std::exchange(running, {});
    {
        std::scoped_lock lock(mutex);
        for (; !waiting.empty(); waiting.pop_front())
            all.push_back(std::make_unique<ContentTask>(client, std::move(waiting.front())));
    }
    for (const auto &task : all)
        if (error && !task->has_ended())
            task->break_off(error);
}

} // namespace cloud
