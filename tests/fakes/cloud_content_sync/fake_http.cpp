// Requests of the real client, answered from the fake's tree. A request takes steps: an upload three (half of the body,
// the rest, the answer) or, when it is large, more; any other one.
#include "base/base.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/names.h"
#include "fake_state.h"
#include <algorithm>
#include <glib.h>
#include <utility>

// Here, so that whoever uses the fake takes these requests instead of the library's.
FakeCloud &fake()
{
    static FakeCloud state;
    return state;
}

using cloud::Transfer;

void answer_error(Transfer &transfer, int error)
{
    switch (error) {
    case CLOUD_CONTENT_SYNC_ERROR_NETWORK:
        transfer.result = CURLE_COULDNT_CONNECT;
        return;
    case CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED:
        transfer.status = 401;
        return;
    case CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN:
        transfer.status = 403;
        return;
    case CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL:
        transfer.status = 507;
        return;
    default:
        transfer.status = 500;
    }
}

void answer(Transfer &transfer, long status, const std::string &body)
{
    transfer.status = status;
    if (status / 100 == 2 && transfer.write && !transfer.write(body.data(), body.size()))
        transfer.result = CURLE_WRITE_ERROR;
}

namespace cloud {

Http::Http(const Service &description) : service(description), multi(nullptr, curl_multi_cleanup)
{
    std::scoped_lock lock(fake().mutex);
    fake().clients[this];
}

Http::~Http()
{
    std::scoped_lock lock(fake().mutex);
    fake().clients.erase(this);
    fake().changed.notify_all();
}

Transfer *Http::start(std::unique_ptr<Transfer> owned, const Credentials &credentials)
{
    Transfer *transfer = owned.get();
    transfer->easy.reset(curl_easy_init()); // by which the transfers are kept
    transfers[transfer->easy.get()] = std::move(owned);
    std::scoped_lock lock(fake().mutex);
    fake().clients[this].requests.push_back(transfer);
    if (credentials.user.empty())
        fake().clients[this].bearers[transfer] = credentials.secret;
    return transfer;
}

void Http::abort(Transfer *transfer)
{
    if (!transfer)
        return;
    {
        std::scoped_lock lock(fake().mutex);
        std::erase(fake().clients[this].requests, transfer);
        fake().clients[this].bearers.erase(transfer);
    }
    transfers.erase(transfer->easy.get());
}

void Http::wake()
{
    std::scoped_lock lock(fake().mutex);
    fake().clients[this].is_woken = true;
    fake().changed.notify_all();
}

// The client finds out whether it can upload safely.
static bool is_probe(const Transfer &transfer)
{
    return is_temporary_name(name_of(transfer.path));
}

// Whether its steps are among those that are held and let through. A refresh counts with its first request; nobody
// waits for a thumbnail; looks and removals belong to their uploads.
static bool is_counted(const Transfer &transfer)
{
    if (transfer.method == "PROPFIND")
        return transfer.path == "/";
    return transfer.method != "DELETE" && !is_probe(transfer) && transfer.url.find("/1/thumbnail") == std::string::npos;
}

static bool may_step(const Transfer *transfer)
{
    return !fake().held || fake().permits > 0 || !is_counted(*transfer);
}

static std::string response(const std::string &path)
{
    const auto file = fake().files.find(path);
    const bool is_folder = file == fake().files.end();
    std::string text = "<D:response><D:href>" + percent_encode(path) + "</D:href><D:propstat><D:prop>";
    if (is_folder)
        text += "<D:resourcetype><D:collection/></D:resourcetype>";
    else
        text += "<D:getcontentlength>" + std::to_string(file->second.content.size()) +
                "</D:getcontentlength><D:getetag>" + file->second.etag + "</D:getetag>";
    return text + "</D:prop><D:status>HTTP/1.1 200 OK</D:status></D:propstat></D:response>";
}

static void storage(Transfer &transfer)
{
    if (fake().storage_error)
        return answer_error(transfer, fake().storage_error);
    const unsigned long long total = fake().storage_total;
    unsigned long long used = fake().storage_used;
    for (const auto &[path, file] : fake().files)
        used += file.content.size();
    std::string numbers;
    if (total)
        numbers = "<D:quota-used-bytes>" + std::to_string(used) + "</D:quota-used-bytes><D:quota-available-bytes>" +
                  std::to_string(total - std::min(used, total)) + "</D:quota-available-bytes>";
    answer(transfer, 207,
           "<D:multistatus xmlns:D=\"DAV:\"><D:response><D:href>/</D:href><D:propstat><D:prop>" + numbers +
               "</D:prop><D:status>HTTP/1.1 200 OK</D:status></D:propstat></D:response></D:multistatus>");
}

static void propfind(Transfer &transfer)
{
    if (transfer.body.find("quota") != std::string::npos)
        return storage(transfer);

    const std::string path = transfer.path.size() > 1 && transfer.path.back() == '/'
                                 ? transfer.path.substr(0, transfer.path.size() - 1)
                                 : transfer.path;
    if (path == "/")
        if (const int error = std::exchange(fake().refresh_error, 0))
            return answer_error(transfer, error);
    if (!fake().exists(path))
        return answer(transfer, 404, "");
    std::string text = "<D:multistatus xmlns:D=\"DAV:\">" + response(path);
    const bool is_list = transfer.headers.front() == "Depth: 1";
    const auto add = [&](const std::string &other) {
        if (is_list && other != "/" && parent_of(other) == path)
            text += response(other);
    };
    for (const std::string &folder : fake().folders)
        add(folder);
    for (const auto &[other, file] : fake().files)
        add(other);
    answer(transfer, 207, text + "</D:multistatus>");
}

static void get(Transfer &transfer)
{
    const auto file = fake().files.find(transfer.path);
    if (file == fake().files.end())
        return answer(transfer, 404, "");
    transfer.etag = file->second.etag;
    answer(transfer, 200, file->second.content);
}

static void post(Transfer &transfer)
{
    Db json;
    json.open(":memory:", nullptr);
    Stmt path(json, "SELECT json_extract(?, '$.path')");
    path.bind(1, transfer.body).row();
    answer(transfer, 200, "{\"url\": \"https://media.example.org" + percent_encode(path.text(0)) + "\"}");
}

static void remove(Transfer &transfer)
{
    const auto file = fake().files.find(transfer.path);
    const bool is_same = file != fake().files.end() &&
                         (transfer.headers.empty() || transfer.headers.front() == "If-Match: " + file->second.etag);
    if (is_same)
        fake().files.erase(file);
    answer(transfer, is_same ? 204 : 412, "");
}

static void store(Transfer &transfer, const std::string &body)
{
    const auto scripted = fake().upload_errors.find(fake().uploads_sent += is_probe(transfer) ? 0 : 1);
    if (!is_probe(transfer) && scripted != fake().upload_errors.end())
        return answer_error(transfer, scripted->second);
    if (!fake().folders.count(parent_of(transfer.path)))
        return answer(transfer, 409, "");
    if (fake().exists(transfer.path))
        return answer(transfer, 412, "");
    fake().store(transfer.path, body);
    transfer.etag = fake().files[transfer.path].etag;
    g_autoptr(GChecksum) sum = g_checksum_new(G_CHECKSUM_SHA256);
    g_checksum_update(sum, reinterpret_cast<const guchar *>(body.data()), static_cast<gssize>(body.size()));
    guint8 digest[32];
    gsize size = sizeof digest;
    g_checksum_get_digest(sum, digest, &size);
    g_autofree char *text = g_base64_encode(digest, size);
    transfer.repr_digest = std::string("sha-256=:") + text + ":";
    answer(transfer, 201, "");
}

// One step of an upload; false when it has ended with it. The parts of the body are collected in transfer.body.
static bool put(Transfer &transfer)
{
    static constexpr size_t PIECE_MAX = 1 << 20;
    const auto size = static_cast<size_t>(transfer.body_size);
    std::string &body = transfer.body;
    if (body.size() == size) {
        store(transfer, body);
        return false;
    }
    const size_t piece = body.empty() && size > 1 ? size / 2 : size - body.size();
    const size_t end = body.size() + std::min(piece, PIECE_MAX);
    while (body.size() < end) {
        const size_t before = body.size();
        body.resize(end);
        const size_t got = transfer.read(body.data() + before, end - before);
        body.resize(got == READ_FAILED ? before : before + got);
        if (got == READ_FAILED) {
            transfer.result = CURLE_ABORTED_BY_CALLBACK;
            return false;
        }
    }
    return true;
}

// With the lock held. False when the request has ended.
static bool step_once(Transfer &transfer, const std::string &bearer)
{
    const bool is_content = transfer.method == "GET" || transfer.method == "POST";
    if (!fake().reachable)
        answer_error(transfer, CLOUD_CONTENT_SYNC_ERROR_NETWORK);
    else if (is_auth(transfer))
        answer_auth(transfer, bearer);
    else if (!bearer.empty() && !fake().access_tokens.count(bearer))
        answer(transfer, 401, "");
    else if (transfer.url.find("/1/thumbnail") != std::string::npos)
        answer(transfer, 404, "");
    else if (const int error = is_content ? std::exchange(fake().content_error, 0) : 0)
        answer_error(transfer, error);
    else if (transfer.method == "PROPFIND")
        propfind(transfer);
    else if (transfer.method == "GET")
        get(transfer);
    else if (transfer.method == "POST")
        post(transfer);
    else if (transfer.method == "DELETE")
        remove(transfer);
    else
        return put(transfer);
    return false;
}

bool Http::run(std::chrono::milliseconds wait, int)
{
    std::unique_lock lock(fake().mutex);
    FakeClient &self = fake().clients[this];
    const auto next = [&] { return std::find_if(self.requests.begin(), self.requests.end(), may_step); };
    fake().changed.wait_for(lock, wait, [&] { return self.is_woken || next() != self.requests.end(); });
    if (fake().delay)
        fake().changed.wait_for(lock, std::chrono::milliseconds(fake().delay), [&] { return self.is_woken; });
    self.is_woken = false;
    const auto one = next();
    if (one == self.requests.end())
        return false;
    if (fake().held && is_counted(**one))
        fake().permits--;
    if (step_once(**one, self.bearers[*one]))
        return false;
    self.bearers.erase(*one);
    const auto owned = transfers.extract((*one)->easy.get());
    self.requests.erase(one);
    lock.unlock();
    owned.mapped()->done(*owned.mapped());
    return false;
}

} // namespace cloud
