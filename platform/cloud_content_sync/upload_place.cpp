// Where an upload is stored so that it replaces nothing: under its name where the service keeps files by itself, else
// under a temporary name from which it is moved; and how what is stored is looked at.
#include "cloud_content_sync/names.h"
#include "cloud_content_sync/upload.h"
#include <algorithm>
#include <utility>

namespace cloud {

static constexpr int MOVES_MAX = 3; // for one name
static constexpr auto DELETE_LIMIT = std::chrono::seconds(15);
static constexpr auto DELETE_AGAIN = std::chrono::milliseconds(300);

// Whether the file may be sent now, to where(). Otherwise put() is called when it may, or the upload ends.
bool Upload::place()
{
    if (!is_prepared) {
        prepare();
        return false;
    }
    if (is_temporary_whole) {
        move();
        return false;
    }
    if (client.http.known.find("way") == static_cast<int>(Way::MOVE) && temporary.empty()) {
        temporary = join(parent_of(target), temporary_name(client.http.known.find("hidden").value_or(1) != 0));
        client.http.known.add_temporary(who, temporary);
    }
    return true;
}

void Upload::prepare()
{
    left_behind = client.http.known.left_behind(who);
    delete_left_behind();
}

void Upload::delete_left_behind()
{
    if (left_behind.empty() || !is_wanted())
        return choose_way();
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "DELETE";
    transfer->path = left_behind.back();
    request(std::move(transfer), &Upload::left_behind_deleted);
}

void Upload::left_behind_deleted(const Transfer &transfer)
{
    if (transfer.result != CURLE_OK || transfer.status == 401)
        left_behind.clear(); // the upload will tell
    else if (transfer.is_success())
        client.http.known.drop_temporary(left_behind.back());
    else if (transfer.status == 404)
        client.http.known.drop_temporary_if_old(left_behind.back());
    if (!left_behind.empty())
        left_behind.pop_back();
    delete_left_behind();
}

void Upload::choose_way()
{
    const auto way = client.http.known.find("way");
    if (!way) {
        probe = std::make_unique<Probe>(client.http, credentials, who, parent_of(target));
        return probe->start([this](int error) {
            probe.reset();
            if (error || !is_wanted())
                return trouble(error);
            choose_way();
        });
    }
    is_prepared = true;
    if (*way != static_cast<int>(Way::NONE))
        return put();
    if (!client.service.looks_first)
        return finish(CLOUD_CONTENT_SYNC_ERROR_UNSAFE);
    look(false, &Upload::next_name_looked_at, target);
}

// Nobody waits for it long: what stays is deleted by a later upload.
void Upload::delete_temporary(std::function<void()> then)
{
    is_removing = true;
    after_deletion = std::move(then);
    send_deletion();
}

void Upload::send_deletion()
{
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "DELETE";
    transfer->path = temporary;
    request(std::move(transfer), &Upload::temporary_deleted);
    transfer_now->stall_limit = std::min<std::chrono::seconds>(transfer_now->stall_limit, DELETE_LIMIT);
}

void Upload::temporary_deleted(const Transfer &transfer)
{
    if (is_broken_off && transfer.result == CURLE_OK) { // some services store then what had come until then
        is_broken_off = false;
        was_broken_off = true;
        delete_again_at = std::chrono::steady_clock::now() + DELETE_AGAIN;
        return;
    }
    Known &known = client.http.known;
    const bool is_absent = transfer.result == CURLE_OK && transfer.status == 404;
    if (transfer.is_success() || (is_absent && !was_broken_off))
        known.drop_temporary(temporary);
    else if (is_absent)
        known.drop_temporary_if_old(temporary);
    else
        known.leave_temporary(temporary);
    temporary.clear();
    is_temporary_whole = is_broken_off = was_broken_off = is_removing = false;
    std::exchange(after_deletion, nullptr)();
}

void Upload::delete_again()
{
    if (!delete_again_at || std::chrono::steady_clock::now() < *delete_again_at)
        return;
    delete_again_at.reset();
    send_deletion();
}

// Another temporary name when what has this one is not what was sent; false when none is in use.
bool Upload::renew_temporary()
{
    if (temporary.empty())
        return false;
    delete_temporary([this] { put(); });
    return true;
}

void Upload::move()
{
    if (!is_wanted() || ++moves > MOVES_MAX)
        return finish(CLOUD_CONTENT_SYNC_ERROR_SERVER);
    is_temporary_whole = true;
    static_cast<void>(client.ledger.sent(who, record, target));
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "MOVE";
    transfer->path = temporary;
    transfer->headers = move_headers(client.http, target);
    is_moving = true;
    request(std::move(transfer), &Upload::moved);
}

void Upload::arrived(const std::string &etag)
{
    is_moving = false;
    stored_etag = etag; // that of the temporary name may have been another
    client.http.known.drop_temporary(temporary);
    temporary.clear();
    is_temporary_whole = false;
    created = true; // nothing was there, so it is this request's
    verified({Found::SAME, 0});
}

void Upload::moved(const Transfer &transfer)
{
    if (transfer.is_success() && transfer.status != 207)
        return arrived(transfer.etag);
    const bool is_refusal = transfer.result == CURLE_OK && transfer.status >= 400 && transfer.status < 500;
    if (is_refusal && (transfer.status == 412 || transfer.status == 405 || transfer.status == 409)) {
        moves = 0;
        is_moving = false;
        if (transfer.status == 412)
            return record.is_inherited ? look(true, &Upload::next_name_looked_at, target) : try_next_name();
        return look(false, &Upload::occupied, target);
    }
    const bool may_have_moved = transfer.status == 403 || transfer.status == 404 || transfer.status == 408;
    if ((is_refusal && !may_have_moved) || (transfer.result == CURLE_OK && transfer.status == 507)) {
        is_moving = false;
        return finish(transfer.error());
    }
    // Looking tells; a service that gets the request again answers that there is nothing to be moved.
    look(false, &Upload::temporary_looked_at);
}

void Upload::temporary_looked_at(const Look &result)
{
    if (result.error || result.found != Found::ABSENT)
        is_moving = false;
    if (result.error) {
        is_unknown = true;
        return trouble(result.error, result.retry_after);
    }
    if (result.found != Found::ABSENT)
        return move();
    look(true, &Upload::target_looked_at, target);
}

void Upload::target_looked_at(const Look &result)
{
    is_moving = false;
    if (result.error) {
        is_unknown = true;
        return trouble(result.error, result.retry_after);
    }
    if (result.found == Found::SAME)
        return arrived("");
    is_unknown = false;
    finish(CLOUD_CONTENT_SYNC_ERROR_CORRUPTED); // somebody has taken it away
}

// Services answer in many ways when the destination folder is missing. False when this is no such answer.
bool Upload::is_folder_in_doubt(long status, int error)
{
    const bool is_vague = status == 500 && client.http.known.find("way") != static_cast<int>(Way::CONDITION);
    if (status != 404 && !is_vague)
        return false;
    folder_error = error;
    look(false, &Upload::folder_looked_at, parent_of(target));
    return true;
}

void Upload::folder_looked_at(const Look &result)
{
    const bool is_absent = !result.error && result.found == Found::ABSENT;
    is_unknown &= !is_absent; // nothing can be stored there
    finish(is_absent ? CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN : folder_error);
}

// Meanwhile the next upload may begin, unless there is more to be done than to look.
void Upload::check_stored()
{
    Known &known = client.http.known;
    const bool has_digests = known.find("digest") != 0, is_sample = known.is_sample();
    const bool is_doubtful = lost_reply || is_unknown;
    is_checking = temporary.empty() && !is_doubtful;
    client.http.wake();
    if (has_digests || is_doubtful || client.service.reads_back || is_sample)
        return look(true, &Upload::checked);
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "HEAD";
    transfer->path = where();
    request(std::move(transfer), &Upload::head_ended);
}

// What comes of an error may take its time, and another upload may have begun.
void Upload::checked(const Look &result)
{
    if (!result.error || !is_checking)
        return verified(result);
    doubt = result;
    client.http.wake();
}

void Upload::go_on()
{
    is_checking = false;
    verified(*std::exchange(doubt, std::nullopt));
}

void Upload::note_digest(bool is_there)
{
    Known &known = client.http.known;
    if (is_there)
        known.doubt("digest");
    else if (!known.find("digest"))
        known.remember("digest", 0);
}

void Upload::head_ended(const Transfer &transfer)
{
    const bool is_etag_same = stored_etag.empty() || transfer.etag.empty() || stored_etag == transfer.etag;
    const bool is_size_same = transfer.content_length == std::to_string(local.st_size);
    if (transfer.result == CURLE_OK && transfer.status == 200 && is_etag_same && is_size_same)
        return verified({Found::SAME, 0});
    look(true, &Upload::checked); // in doubt
}

} // namespace cloud
