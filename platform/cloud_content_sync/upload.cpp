#include "cloud_content_sync/upload.h"
#include "cloud_content_sync/local_file.h"
#include "cloud_content_sync/names.h"
#include <algorithm>
#include <cerrno>
#include <unistd.h>
#include <utility>
#include <vector>

namespace cloud {

static constexpr int NAMES_MAX = 1000;
static constexpr int PUTS_MAX = 20; // each sends the whole body
static constexpr int LOOKS_MAX = 2, BREAKS_MAX = 3;
// After the last byte the service may need time to store a large file.
static constexpr auto ANSWER_LIMIT = std::chrono::seconds(300);
// A cancelled upload waits this long for the answer that says whether there is something to remove.
static constexpr auto CANCELLED_LIMIT = std::chrono::seconds(15);

Upload::Upload(Client &owner, UploadRequest request) : client(owner), wanted(std::move(request)) {}

Upload::~Upload()
{
    client.http.abort(transfer_now);
    if (!temporary.empty())
        client.http.known.leave_temporary(temporary);
    if (fd >= 0)
        close(fd);
}

void Upload::start()
{
    if (const int error = credentials_load(client.service.name, credentials))
        return finish(error);
    who = account_identity(client.service, credentials);
    record = client.ledger.begin(who, wanted.local_path, wanted.server_path);
    target = wanted.server_path;
    if (!path_is_valid(target) || target == "/")
        return finish(CLOUD_CONTENT_SYNC_ERROR_BAD_NAME);
    if (const int error = open_local())
        return finish(error);
    percent = 0;
    client.report_progress(wanted, percent);
    if (record.target.empty())
        return put();
    // An earlier attempt has sent it there, and nobody knows what came of it.
    is_unknown = true;
    resume();
}

// Is what an earlier attempt has sent the file, and is it there? A look costs less than a second copy in the cloud.
void Upload::resume()
{
    if (path_is_valid(record.target))
        target = record.target;
    lost_reply = false;
    begin_body();
    hash(&Upload::resumed);
}

// What is not read yet, then a look at where().
void Upload::hash(LookDone then)
{
    is_hashing = true;
    after_hash = then;
    client.http.wake();
}

// In pieces, so that a cancel need not wait for the end of a long file.
void Upload::hash_some()
{
    static constexpr long long PIECE = 16LL << 20;
    std::vector<char> buffer(256 * 1024);
    const long long until = std::min<long long>(local.st_size, sent + PIECE);
    while (sent < until)
        if (read(buffer.data(), buffer.size()) == READ_FAILED)
            return finish(read_error);
    if (!whole_file_read())
        return client.http.wake();
    is_hashing = false;
    if (digest.empty())
        digest = checksum->hex();
    look(true, after_hash);
}

void Upload::resumed(const Look &result)
{
    if (result.error)
        return trouble(result.error, result.retry_after);
    if (result.found == Found::SAME)
        return verified(result);
    is_unknown = is_seen_absent = result.found == Found::ABSENT; // it may still be on its way
    target = wanted.server_path;
    put();
}

// Ends with the error, or waits for what it comes from to pass.
void Upload::trouble(int error, long long retry_after)
{
    if (!is_wanted() || (error != CLOUD_CONTENT_SYNC_ERROR_NETWORK && retry_after < 0))
        return finish(error);
    wait = client.wait_begin(retry_after);
    if (!wait.is_under_way())
        return finish(error);
    client.report_progress(wanted, std::max(percent, 0)); // who looks at the request now learns why nothing moves
}

void Upload::wait_step()
{
    const auto now = Wait::Clock::now();
    if (now < wait.until && !client.has_network_changed()) {
        if (wait.reason == CLOUD_CONTENT_SYNC_WAIT_SERVICE_BUSY && now >= wait.told_until) {
            wait.told_until = now + std::chrono::seconds(1);
            client.report_progress(wanted, std::max(percent, 0));
        }
        return;
    }
    wait = {};
    client.wait_end();
    close(std::exchange(fd, -1)); // it may have become another one meanwhile
    if (const int error = open_local())
        return finish(error);
    read_error = 0;
    if (is_temporary_whole) { // what is open is the move
        is_moving = true;
        return look(false, &Upload::temporary_looked_at);
    }
    return is_unknown ? resume() : put();
}

std::optional<Wait::Clock::time_point> Upload::due() const
{
    if (!wait.is_under_way())
        return delete_again_at;
    return wait.reason == CLOUD_CONTENT_SYNC_WAIT_SERVICE_BUSY ? std::min(wait.until, wait.told_until) : wait.until;
}

int Upload::open_local()
{
    int error = CLOUD_CONTENT_SYNC_ERROR_NONE;
    fd = local_file_open(wanted.local_path, &local, &error);
    char more = 0; // what the system makes up as it is read has no size to go by
    if (!error && local.st_size == 0 && pread(fd, &more, 1, 0) != 0)
        return CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
    return error;
}

// The whole file once more, by which a change of its data is told from one of its name or its permissions.
bool Upload::local_is_what_was_sent() const
{
    Sha256 again;
    std::vector<char> buffer(256 * 1024);
    long long at = 0;
    while (is_wanted()) {
        const ssize_t got = pread(fd, buffer.data(), buffer.size(), at);
        if (got < 0 && errno == EINTR)
            continue;
        if (got <= 0)
            return got == 0 && at == local.st_size && again.hex() == digest;
        again.add(buffer.data(), static_cast<size_t>(got));
        at += got;
    }
    return false;
}

bool Upload::local_changed() const
{
    struct stat now = {};
    const auto differ = [](const timespec &one, const timespec &other) {
        return one.tv_sec != other.tv_sec || one.tv_nsec != other.tv_nsec;
    };
    if (fstat(fd, &now) != 0 || now.st_size != local.st_size || differ(now.st_mtim, local.st_mtim))
        return true;
    // A program can put the time of its change back, but not the time at which it did.
    return differ(now.st_ctim, local.st_ctim) && !local_is_what_was_sent();
}

void Upload::step()
{
    if (ended || is_removing)
        return delete_again();
    if (!is_wanted()) {
        if (probe)
            return probe->cancel();
        if (transfer_now && (is_moving || (is_putting && whole_file_read()))) {
            // The service may have stored it already; its answer tells.
            transfer_now->stall_limit = std::min<std::chrono::seconds>(transfer_now->stall_limit, CANCELLED_LIMIT);
            return;
        }
        is_broken_off |= is_putting && transfer_now;
        client.http.abort(transfer_now);
        transfer_now = nullptr;
        return created ? remove_stored(0) : finish(0);
    }
    if (wait.is_under_way())
        return wait_step();
    if (is_hashing)
        return hash_some();
    const int now = local.st_size > 0 ? static_cast<int>(sent * 100 / local.st_size) : 0;
    if (is_putting && now > percent) {
        percent = now;
        client.report_progress(wanted, percent);
    }
}

void Upload::end(int error)
{
    client.http.abort(transfer_now);
    transfer_now = nullptr;
    probe.reset();
    if (!temporary.empty())
        client.http.known.leave_temporary(temporary); // there is no time to delete it
    temporary.clear();
    if (!ended)
        finish(error);
}

size_t Upload::read(char *buffer, size_t size)
{
    const auto left = static_cast<size_t>(local.st_size - sent);
    ssize_t got = 0;
    do
        got = ::pread(fd, buffer, std::min(size, left), sent);
    while (got < 0 && errno == EINTR);
    if (got < 0 || (got == 0 && left > 0)) {
        read_error = got < 0 ? CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE : CLOUD_CONTENT_SYNC_ERROR_LOCAL_CHANGED;
        return READ_FAILED;
    }
    checksum->add(buffer, static_cast<size_t>(got));
    sent += got;
    if (whole_file_read() && transfer_now)
        transfer_now->stall_limit = std::max<std::chrono::seconds>(transfer_now->stall_limit, ANSWER_LIMIT);
    return static_cast<size_t>(got);
}

void Upload::request(std::unique_ptr<Transfer> transfer, void (Upload::*then)(const Transfer &))
{
    transfer->done = [this, then](Transfer &done) {
        transfer_now = nullptr;
        (this->*then)(done);
    };
    transfer_now = client.http.start(std::move(transfer), credentials);
}

bool Upload::begin_body()
{
    checksum.emplace();
    digest.clear();
    sent = 0;
    return true;
}

void Upload::put()
{
    if (!place())
        return;
    if (++puts > PUTS_MAX)
        return finish(CLOUD_CONTENT_SYNC_ERROR_SERVER);
    begin_body();
    // A database that cannot be written costs this knowledge, not the upload.
    static_cast<void>(client.ledger.sent(who, record, target));
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "PUT";
    transfer->path = where();
    // RFC 9110, 13.1.2: nothing of that name may exist. RFC 9530, 4: the digest of what is stored is welcome.
    transfer->headers = {"If-None-Match: *", "Content-Type: application/octet-stream", "Want-Repr-Digest: sha-256=10"};
    transfer->body_size = local.st_size;
    transfer->read = [this](char *buffer, size_t size) { return read(buffer, size); };
    transfer->rewind = [this] { return begin_body(); };
    is_putting = true;
    request(std::move(transfer), &Upload::put_ended);
}

void Upload::put_ended(const Transfer &transfer)
{
    is_putting = false;
    put_status = transfer.status;
    is_broken_off |= transfer.result != CURLE_OK && !transfer.never_sent();
    if (whole_file_read())
        digest = checksum->hex();
    if (transfer.is_success())
        return stored(transfer);
    if (read_error)
        return finish(read_error);
    if (transfer.result != CURLE_OK)
        return put_unanswered(transfer);
    if (transfer.asks_to_wait() >= 0) {
        is_unknown |= whole_file_read(); // it should not be there; a look is cheap
        is_seen_absent = true;
        return trouble(transfer.error(), transfer.asks_to_wait());
    }
    if (transfer.leaves_open() && whole_file_read()) {
        is_unknown = true;
        is_seen_absent = false;
        put_error = transfer.error();
        return look(true, &Upload::refused);
    }
    // A refusal may come before the end of the body.
    if (transfer.status == 412 && (lost_reply || is_unknown || (record.is_inherited && temporary.empty())))
        return hash(&Upload::settled);
    if (transfer.status == 412 && renew_temporary())
        return;
    if (transfer.status == 412)
        return try_next_name();
    if (transfer.status == 405 || transfer.status == 409)
        return look(false, &Upload::occupied);
    if (!is_folder_in_doubt(transfer.status, transfer.error()))
        finish(transfer.error());
}

void Upload::put_unanswered(const Transfer &transfer)
{
    if (transfer.never_sent())
        puts--;
    const bool stalled_midway = transfer.result == CURLE_OPERATION_TIMEDOUT && !whole_file_read();
    if (!is_wanted())
        return finish(transfer.error());
    if (transfer.never_sent() || stalled_midway)
        return trouble(transfer.error());
    is_unknown = true;
    is_seen_absent = !whole_file_read(); // hardly
    put_error = transfer.error();
    // A connection that ends in the middle of a body says less than one that ends behind it.
    const bool is_last = whole_file_read() ? lost_reply : ++breaks >= BREAKS_MAX;
    lost_reply |= whole_file_read();
    look(true, is_last ? &Upload::refused : &Upload::settled);
}

// After an attempt without an answer: is it there?
void Upload::settled(const Look &result)
{
    if (result.error)
        return trouble(result.error, result.retry_after);
    if (result.found == Found::SAME)
        return verified(result);
    is_unknown = is_seen_absent = result.found == Found::ABSENT;
    if (is_seen_absent)
        return put();
    if (!renew_temporary())
        try_next_name();
}

// After an attempt that is not worth another one at once: is it there all the same?
void Upload::refused(const Look &result)
{
    if (result.error)
        return trouble(result.error, result.retry_after);
    if (result.found == Found::SAME)
        return verified(result);
    is_unknown = is_seen_absent = result.found == Found::ABSENT;
    if (!is_unknown || !is_folder_in_doubt(put_status, put_error))
        trouble(put_error);
}

// After a refusal that a folder of that name explains.
void Upload::occupied(const Look &result)
{
    if (!result.error && result.found != Found::ABSENT)
        return try_next_name();
    // The destination folder is missing, or the service forbids the name.
    finish(CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN);
}

void Upload::try_next_name()
{
    if (++names_tried > NAMES_MAX)
        return finish(CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN);
    target = join(parent_of(target), next_free_name(name_of(target)));
    lost_reply = is_unknown = false;
    // Looking costs less than sending a body in vain.
    look(record.is_inherited, &Upload::next_name_looked_at, target);
}

void Upload::next_name_looked_at(const Look &result)
{
    if (result.error)
        return trouble(result.error, result.retry_after);
    if (result.found == Found::ABSENT)
        return put();
    if (result.found == Found::SAME)
        return is_there_already();
    try_next_name();
}

// A process that is gone has stored it under its name.
void Upload::is_there_already()
{
    if (!temporary.empty())
        return delete_temporary([this] { is_there_already(); });
    stored_etag.clear();
    verified({Found::SAME, 0});
}

void Upload::stored(const Transfer &transfer)
{
    // 201: made by this request; 200 and 204 would mean that something was there and the condition was ignored.
    created = transfer.status == 201;
    if (!created && temporary.empty())
        client.http.known.doubt("way");
    stored_etag = transfer.etag;
    if (!is_wanted())
        return created ? remove_stored(0) : finish(0);
    if (local_changed())
        return remove_stored(CLOUD_CONTENT_SYNC_ERROR_LOCAL_CHANGED);
    if (!whole_file_read())
        return remove_stored(CLOUD_CONTENT_SYNC_ERROR_CORRUPTED);
    const std::string answered = sha256_of(transfer.repr_digest);
    if (answered.empty())
        return check_stored();
    verified({.found = answered == digest ? Found::SAME : Found::DIFFERENT});
}

void Upload::verified(const Look &result)
{
    if (result.error) { // it is stored, and nobody has seen how
        is_unknown = true;
        is_seen_absent = false;
        return trouble(result.error, result.retry_after);
    }
    // What differs may be another client's by now, so it stays.
    is_unknown = false;
    if (result.found != Found::SAME)
        return finish(CLOUD_CONTENT_SYNC_ERROR_CORRUPTED);
    client.patience.over();
    if (local_changed())
        return remove_stored(CLOUD_CONTENT_SYNC_ERROR_LOCAL_CHANGED);
    if (!temporary.empty())
        return move();
    const ContentRow row{parent_of(target), name_of(target), local.st_size, time(nullptr), stored_etag};
    if (!client.report_done(wanted, row, who, record))
        return remove_stored(0); // cancelled in the last moment
    ended = true;
}

void Upload::look(bool by_digest, LookDone then, const std::string &path)
{
    look_path = path.empty() ? where() : path;
    look_by_digest = by_digest;
    look_done = then;
    look_attempts++;
    auto reader = std::make_shared<MultistatusReader>(client.service.root_path);
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "PROPFIND";
    transfer->path = look_path;
    transfer->headers = {"Depth: 0", "Content-Type: application/xml; charset=utf-8"};
    transfer->body = propfind_body(by_digest);
    transfer->write = [reader](const char *data, size_t size) { return reader->feed(data, size); };
    transfer->done = [this, reader](Transfer &done) {
        transfer_now = nullptr;
        looked(done, *reader);
    };
    transfer_now = client.http.start(std::move(transfer), credentials);
}

void Upload::finish_look(const Look &result)
{
    look_attempts = 0;
    (this->*look_done)(result);
}

void Upload::looked(const Transfer &transfer, MultistatusReader &reader)
{
    if (transfer.result != CURLE_OK && look_attempts < LOOKS_MAX)
        return look(look_by_digest, look_done, std::string(look_path));
    if (transfer.result == CURLE_OK && transfer.status == 404)
        return finish_look({.found = Found::ABSENT});
    // Services redirect the path of a folder that lacks its final "/".
    if (transfer.result == CURLE_OK && transfer.status >= 300 && transfer.status < 400)
        return finish_look({.found = Found::DIFFERENT});
    if (transfer.result != CURLE_OK || transfer.status != 207)
        return finish_look({.error = transfer.error(), .retry_after = transfer.asks_to_wait()});
    if (!reader.finish() || reader.entries.empty())
        return finish_look({.error = CLOUD_CONTENT_SYNC_ERROR_SERVER});
    const DavEntry &entry = reader.entries.front();
    const bool may_be_same = !entry.is_folder && whole_file_read() && (entry.size < 0 || entry.size == local.st_size);
    if (!look_by_digest || !may_be_same)
        return finish_look({.found = Found::DIFFERENT});
    note_digest(!entry.sha256.empty());
    if (entry.sha256.empty())
        return read_back();
    finish_look({.found = entry.sha256 == digest ? Found::SAME : Found::DIFFERENT});
}

// The service knows no digests: the file is read back.
void Upload::read_back()
{
    struct Sum {
        Sha256 checksum;
        long long size = 0;
    };
    auto sum = std::make_shared<Sum>();
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "GET";
    transfer->path = look_path;
    transfer->write = [this, sum](const char *data, size_t size) {
        sum->size += static_cast<long long>(size);
        sum->checksum.add(data, size);
        return sum->size <= local.st_size;
    };
    transfer->done = [this, sum](Transfer &done) {
        transfer_now = nullptr;
        if (sum->size > local.st_size)
            return finish_look({.found = Found::DIFFERENT});
        if (done.result == CURLE_OK && done.status == 404)
            return finish_look({.found = Found::ABSENT});
        if (done.result != CURLE_OK || done.status != 200)
            return finish_look({.error = done.error(), .retry_after = done.asks_to_wait()});
        const bool same = digest == sum->checksum.hex();
        finish_look({.found = same ? Found::SAME : Found::DIFFERENT});
    };
    transfer_now = client.http.start(std::move(transfer), credentials);
}

// Takes back what this request has stored, then ends with `error` (0: cancelled, nobody is told).
void Upload::remove_stored(int error)
{
    if (!created || !temporary.empty())
        return finish(error);
    is_removing = true;
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "DELETE";
    transfer->path = target;
    // A weak validator never matches (RFC 9110, 13.1.1).
    if (!stored_etag.empty() && stored_etag.compare(0, 2, "W/") != 0)
        transfer->headers = {"If-Match: " + stored_etag};
    transfer->done = [this, error](Transfer &) {
        transfer_now = nullptr;
        finish(error);
    };
    transfer_now = client.http.start(std::move(transfer), credentials);
}

void Upload::finish(int error)
{
    if (!temporary.empty())
        return delete_temporary([this, error] { finish(error); });
    ended = true;
    if (wait.is_under_way())
        client.wait_end();
    if (error != 0 && is_unknown)
        client.ledger.give_up(who, record);
    else if (error != 0 || !client.is_kept(wanted.id))
        client.ledger.close(who, record);
    // After a cancel nobody is there to be told.
    const bool may_be_open = error == CLOUD_CONTENT_SYNC_ERROR_NETWORK || error == CLOUD_CONTENT_SYNC_ERROR_SERVER;
    const bool is_open = may_be_open && is_unknown && !is_seen_absent;
    client.report_failed(wanted, is_open ? CLOUD_CONTENT_SYNC_ERROR_OUTCOME_UNKNOWN : error);
}

} // namespace cloud
