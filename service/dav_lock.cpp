// LOCK, UNLOCK and the If header (RFC 4918, 9.10, 9.11 and 10.4).
#include "http.h"
#include "xml.h"
#include <cerrno>
#include <cstring>
#include <fcntl.h>

// Whether one condition of an If header holds for the resource at the path.
static bool holds(Request &request, const IfHeader::Condition &condition, const Path &path)
{
    bool true_of_it;
    if (condition.is_etag) {
        Request other;
        other.account = request.account;
        other.path = path;
        const Entry entry = other.look_up();
        true_of_it = entry.kind != Entry::NONE && entry.etag() == condition.value;
    } else {
        true_of_it = request.service->locks.find(request.account->id, path, condition.value) != nullptr;
    }
    return true_of_it != condition.negated;
}

int check_if_header(Request &request)
{
    const char *text = request.header("If");
    if (!text)
        return 0;
    IfHeader header;
    if (!header.read(text))
        return 400;
    request.tokens = header.tokens;
    for (const IfHeader::List &list : header.lists) {
        Path path = request.path;
        if (!list.resource.empty()) {
            const auto uri = read_address(request, list.resource.c_str());
            const bool readable = uri && parse_path(g_uri_get_path(uri.get()), path) == 0;
            if (!readable)
                continue;
        }
        bool all = true;
        for (const IfHeader::Condition &condition : list.conditions)
            all = all && holds(request, condition, path);
        if (all)
            return 0;
    }
    return 412;
}

bool may_change(Request &request, const Path &path, Reach reach)
{
    Locks &locks = request.service->locks;
    if (locks.empty())
        return true;
    if (!locks.may_change(request.account->id, path, reach == Reach::NAME_AND_BELOW, request.tokens))
        return false;
    if (reach == Reach::CONTENT || path.root())
        return true;
    Path folder = path;
    folder.parts.pop_back();
    return locks.may_change(request.account->id, folder, false, request.tokens);
}

static void answer_lock(Request &request, int status)
{
    const std::string discovery = request.service->locks.discovery(request.account->id, request.path);
    request.answer(status, "application/xml; charset=\"utf-8\"",
                   "<?xml version=\"1.0\" encoding=\"utf-8\"?>\n<D:prop xmlns:D=\"DAV:\"><D:lockdiscovery>" +
                       discovery + "</D:lockdiscovery></D:prop>\n");
}

static void refresh_lock(Request &request)
{
    for (const std::string &token : request.tokens)
        if (Lock *lock = request.service->locks.find(request.account->id, request.path, token)) {
            lock->seconds = lock_seconds(request.header("Timeout"));
            request.service->locks.refresh(*lock);
            return answer_lock(request, 200);
        }
    request.answer(request.tokens.empty() ? 400 : 412);
}

void dav_lock(Request &request)
{
    const std::string &body = request.body;
    if (body.empty())
        return refresh_lock(request);
    Lock lock;
    if (!read_lockinfo(body, lock.exclusive, lock.owner))
        return request.answer(400);
    const char *depth = request.header("Depth");
    lock.deep = !depth || g_ascii_strcasecmp(depth, "infinity") == 0;
    if (!lock.deep && std::strcmp(depth, "0") != 0)
        return request.answer(400);
    lock.account = request.account->id;
    lock.path = request.path;
    lock.seconds = lock_seconds(request.header("Timeout"));
    const Entry entry = request.look_up();
    if (entry.kind == Entry::ODD)
        return request.answer(403);
    if (const int status = check_conditions(request, entry))
        return request.answer(status);
    lock.path.slash = entry.kind == Entry::FOLDER;
    const bool is_new = entry.kind == Entry::NONE;
    Fd folder;
    if (is_new) {
        folder = request.parent();
        if (!folder || request.path.slash)
            return request.answer(folder || errno == ENOENT || errno == ENOTDIR ? 409 : status_of_errno(errno));
        if (!may_change(request, request.path, Reach::NAME))
            return request.answer(423);
    }
    const Lock *added = request.service->locks.add(std::move(lock));
    if (!added)
        return request.answer(423);
    const std::string token = added->token;
    // A lock on a free name takes it with an empty file.
    if (is_new) {
        const Fd file(openat(folder.fd, request.path.name().c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666));
        if (!file) {
            request.service->locks.remove(token);
            return request.answer(status_of_errno(errno));
        }
        request.service->metadata.forget_file(*request.account, request.path);
    }
    request.set_header("Lock-Token", "<" + token + ">");
    answer_lock(request, is_new ? 201 : 200);
}

void dav_unlock(Request &request)
{
    const char *header = request.header("Lock-Token");
    std::string token = header ? header : "";
    if (token.size() < 2 || token.front() != '<' || token.back() != '>')
        return request.answer(400);
    token = token.substr(1, token.size() - 2);
    if (!request.service->locks.find(request.account->id, request.path, token))
        return request.answer(409);
    request.service->locks.remove(token);
    request.answer(204);
}
