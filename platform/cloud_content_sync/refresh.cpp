#include "cloud_content_sync/refresh.h"
#include "cloud_content_sync/names.h"
#include <algorithm>

namespace cloud {

static constexpr size_t REQUESTS_AT_ONCE = 4;
// Bounds against a service that invents folders without end.
static constexpr long DEPTH_MAX = 128;
static constexpr size_t ENTRIES_MAX = 2'000'000;

Refresh::Refresh(Client &owner, std::vector<RefreshRequest> wanted) : client(owner), requests(std::move(wanted)) {}

Refresh::~Refresh()
{
    for (Transfer *transfer : running)
        client.http.abort(transfer);
}

void Refresh::start()
{
    if (const int error = credentials_load(client.service.name, credentials))
        return finish(error);
    waiting.push_back("/");
    list_next();
}

void Refresh::list_next()
{
    while (!waiting.empty() && running.size() < REQUESTS_AT_ONCE) {
        const std::string folder = std::move(waiting.front());
        waiting.pop_front();
        list(folder);
    }
    if (!running.empty())
        return;
    const std::string identity = account_identity(client.service, credentials);
    if (client.account->replace(folders, contents, client.stored_meanwhile, identity))
        return finish(CLOUD_CONTENT_SYNC_ERROR_NONE);
    // Somebody else may have signed in meanwhile: what was found is not theirs.
    finish(client.account->identity() == identity ? CLOUD_CONTENT_SYNC_ERROR_DB_FAILED
                                                  : CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED);
}

void Refresh::list(const std::string &folder)
{
    auto transfer = std::make_unique<Transfer>();
    auto reader = std::make_shared<MultistatusReader>(client.service.root_path);
    transfer->method = "PROPFIND";
    transfer->path = folder == "/" ? folder : folder + "/";
    transfer->headers = {"Depth: 1", "Content-Type: application/xml; charset=utf-8"};
    transfer->body = propfind_body(false);
    transfer->write = [reader](const char *data, size_t size) { return reader->feed(data, size); };
    transfer->done = [this, reader, folder](Transfer &ended_one) {
        running.erase(&ended_one);
        listed(folder, ended_one, *reader);
    };
    running.insert(client.http.start(std::move(transfer), credentials));
}

void Refresh::listed(const std::string &folder, const Transfer &transfer, MultistatusReader &reader)
{
    const bool answered = transfer.result == CURLE_OK;
    // A folder below the root may have been removed since it was seen, or be closed to this account, or have a name
    // that the service lists and then refuses.
    const bool is_refused = transfer.status == 404 || transfer.status == 403 || transfer.status == 400;
    const bool is_skipped = folder != "/" && answered && is_refused;
    if (is_skipped)
        return list_next();
    if (transfer.result != CURLE_OK || transfer.status != 207) {
        const int error = transfer.error();
        // A folder's name was the service's own, so a refusal of it is the service's failure.
        return finish(error == CLOUD_CONTENT_SYNC_ERROR_BAD_NAME ? CLOUD_CONTENT_SYNC_ERROR_SERVER : error);
    }
    const bool is_whole = reader.finish();
    // There is a service that cannot write the paths of some folders; the rest of the tree is there nevertheless.
    if (folder != "/" && is_whole && reader.entries.empty())
        return list_next();
    if (!is_whole || !take(folder, reader))
        return finish(CLOUD_CONTENT_SYNC_ERROR_SERVER);
    list_next();
}

bool Refresh::take(const std::string &folder, MultistatusReader &reader)
{
    bool has_itself = false;
    for (DavEntry &entry : reader.entries) {
        if (entry.path == folder) {
            has_itself = true;
            continue;
        }
        if (parent_of(entry.path) != folder || !seen.insert(entry.path).second)
            continue;
        const std::string name = name_of(entry.path);
        if (is_temporary_name(name))
            continue;
        if (!entry.is_folder) {
            contents.push_back({folder, name, std::max(entry.size, 0LL), entry.mtime, std::move(entry.etag)});
            continue;
        }
        folders.push_back({entry.path, name});
        if (std::count(entry.path.begin(), entry.path.end(), '/') < DEPTH_MAX)
            waiting.push_back(entry.path);
    }
    // RFC 4918, 9.1: the folder itself is a member of the answer. Without it this is no list of the folder.
    return has_itself && seen.size() <= ENTRIES_MAX;
}

void Refresh::finish(int error)
{
    if (ended)
        return;
    ended = true;
    for (Transfer *transfer : running)
        client.http.abort(transfer);
    running.clear();
    for (const RefreshRequest &request : requests)
        client.report_refreshed(request, error);
}

} // namespace cloud
