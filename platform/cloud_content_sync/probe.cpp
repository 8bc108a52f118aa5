#include "cloud_content_sync/probe.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/names.h"
#include <algorithm>
#include <cstring>
#include <utility>

namespace cloud {

// For whoever finds it.
static constexpr char BODY[] = "Velora finds out whether this server keeps files from being replaced. "
                               "This one may be deleted.\n";
static constexpr auto CLEAN_LIMIT = std::chrono::seconds(15);

static constexpr char BY_PATH[] = "destination"; // of the known

std::vector<std::string> move_headers(Http &http, const std::string &target)
{
    const std::string &storage = http.storage();
    const size_t root = http.known.find(BY_PATH) == 1 ? storage.find('/', storage.find("://") + 3) : 0;
    return {"Destination: " + (root < storage.size() ? storage.substr(root) : "") + percent_encode(target),
            "Overwrite: F"};
}

Probe::Probe(Http &owner, Credentials account, std::string identity, std::string destination)
    : http(owner), credentials(std::move(account)), who(std::move(identity)), folder(std::move(destination))
{
}

Probe::~Probe()
{
    http.abort(transfer_now);
    for (const std::string &path : made)
        http.known.leave_temporary(path);
}

void Probe::start(std::function<void(int)> done)
{
    ended = std::move(done);
    first = join(folder, temporary_name(is_hidden));
    put(first, &Probe::first_stored);
}

void Probe::cancel()
{
    is_cancelled = true;
    if (!is_cleaning && transfer_now) // its answer tells what is there
        transfer_now->stall_limit = std::min<std::chrono::seconds>(transfer_now->stall_limit, CLEAN_LIMIT);
}

void Probe::send(std::unique_ptr<Transfer> transfer, Next next)
{
    transfer->done = [this, next](Transfer &done) {
        transfer_now = nullptr;
        if (is_cancelled && !is_cleaning)
            return clean(0);
        (this->*next)(done);
    };
    transfer_now = http.start(std::move(transfer), credentials);
}

void Probe::put(const std::string &path, Next next)
{
    if (std::ranges::find(made, path) == made.end()) {
        http.known.add_temporary(who, path);
        made.push_back(path);
    }
    sent = 0;
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "PUT";
    transfer->path = path;
    transfer->headers = {"If-None-Match: *", "Content-Type: application/octet-stream"};
    transfer->body_size = sizeof BODY - 1;
    transfer->read = [this](char *buffer, size_t size) {
        const size_t piece = std::min(size, sizeof BODY - 1 - sent);
        std::memcpy(buffer, BODY + sent, piece);
        sent += piece;
        return piece;
    };
    transfer->rewind = [this] {
        sent = 0;
        return true;
    };
    send(std::move(transfer), next);
}

// What an answer refuses is not there, and neither is what was never sent.
void Probe::not_stored(const Transfer &transfer)
{
    if (transfer.result != CURLE_OK && !transfer.never_sent())
        return;
    http.known.drop_temporary(made.back());
    made.pop_back();
}

void Probe::first_stored(const Transfer &transfer)
{
    if (transfer.is_success())
        return put(first, &Probe::tried_again);
    not_stored(transfer);
    error = transfer.error();
    if (transfer.result != CURLE_OK)
        return clean(error);
    // Web servers are often set up to refuse names that begin with a dot.
    if ((transfer.status == 400 || transfer.status == 403) && is_hidden) {
        is_hidden = false;
        return start(std::move(ended));
    }
    if (transfer.status < 404 || transfer.status == 507)
        return clean(error);
    // Services answer in many ways when the folder is not there.
    auto look = std::make_unique<Transfer>();
    look->method = "PROPFIND";
    look->path = folder == "/" ? folder : folder + "/";
    look->headers = {"Depth: 0"};
    send(std::move(look), &Probe::folder_looked_at);
}

void Probe::folder_looked_at(const Transfer &transfer)
{
    const bool is_absent = transfer.result == CURLE_OK && transfer.status == 404;
    clean(is_absent ? CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN : error);
}

void Probe::tried_again(const Transfer &transfer)
{
    const bool is_refused = transfer.status == 412 || transfer.status == 405 || transfer.status == 409;
    if (transfer.result == CURLE_OK && is_refused)
        return decide(Way::CONDITION);
    if (!transfer.is_success())
        return clean(transfer.error());
    second = join(folder, temporary_name(is_hidden));
    put(second, &Probe::second_stored);
}

void Probe::second_stored(const Transfer &transfer)
{
    if (!transfer.is_success()) {
        not_stored(transfer);
        return clean(transfer.error());
    }
    move();
}

void Probe::move()
{
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "MOVE";
    transfer->path = second;
    transfer->headers = move_headers(http, first);
    send(std::move(transfer), &Probe::moved);
}

void Probe::moved(const Transfer &transfer)
{
    if (transfer.result != CURLE_OK || transfer.status == 401)
        return clean(transfer.error());
    // A service behind a proxy may know itself by another name, and take the address for another server's.
    if ((transfer.status == 502 || transfer.status == 400) && http.known.find(BY_PATH) != 1) {
        http.known.remember(BY_PATH, 1);
        return move();
    }
    decide(transfer.status == 412 ? Way::MOVE : Way::NONE);
}

void Probe::decide(Way way)
{
    http.known.remember("way", static_cast<int>(way));
    http.known.remember("hidden", is_hidden);
    clean(0);
}

void Probe::clean(int result)
{
    is_cleaning = true;
    error = result;
    if (made.empty())
        return std::exchange(ended, nullptr)(error);
    auto removal = std::make_unique<Transfer>();
    removal->method = "DELETE";
    removal->path = made.back();
    send(std::move(removal), &Probe::deleted);
    transfer_now->stall_limit = std::min<std::chrono::seconds>(transfer_now->stall_limit, CLEAN_LIMIT);
}

void Probe::deleted(const Transfer &transfer)
{
    if (transfer.is_success() || (transfer.result == CURLE_OK && transfer.status == 404))
        http.known.drop_temporary(made.back());
    else
        http.known.leave_temporary(made.back());
    made.pop_back();
    clean(error);
}

} // namespace cloud
