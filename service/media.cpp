// Addresses by which a player reads one file without credentials: the path, an expiry, and a signature over both.
#include "http.h"
#include "secrets.h"
#include <cstring>
#include <ctime>

static const long long MINUTES_AT_MOST = 24 * 60;

bool media_open(Service &service)
{
    if (!service.db.run("CREATE TABLE IF NOT EXISTS secrets(name TEXT PRIMARY KEY, value TEXT NOT NULL)"))
        return false;
    Stmt insert(service.db, "INSERT OR IGNORE INTO secrets(name, value) VALUES('media', ?)");
    if (!insert.bind(1, hex(random_bytes(32))).done())
        return false;
    Stmt row(service.db, "SELECT value FROM secrets WHERE name = 'media'");
    if (row.row())
        service.media_secret = row.text(0);
    return !service.media_secret.empty();
}

// The numbers are signed as they are written, so each has one form.
static std::string signature_of(const Service &service, const std::string &account, const std::string &expires,
                                const Path &path)
{
    return hex(hmac_sha256(service.media_secret, account + "\n" + expires + "\n" + path.whole()));
}

void media_address(Request &request)
{
    if (!request.is("POST")) {
        request.set_header("Allow", "POST");
        return request.answer(405);
    }
    Stmt wanted(request.service->db,
                "SELECT json_extract(body, '$.path'), json_extract(body, '$.minutes') FROM (SELECT ?1 AS body) "
                "WHERE json_valid(body) AND json_type(body, '$.path') = 'text' AND json_type(body, '$.minutes') = "
                "'integer'");
    const std::string &body = request.body;
    if (body.find('\0') != std::string::npos || !wanted.bind(1, body).row())
        return request.answer(400);
    if (const int wrong = parse_plain_path(wanted.text(0), request.path))
        return request.answer(wrong);
    const long long minutes = wanted.integer(1);
    if (minutes <= 0)
        return request.answer(400);
    if (request.look_up().kind != Entry::FILE)
        return request.answer(404);
    const long long end = static_cast<long long>(time(nullptr)) + 60 * std::min(minutes, MINUTES_AT_MOST);
    const std::string account = std::to_string(request.account->id), expires = std::to_string(end);
    const std::string url = "/1/media" + request.path.href(false).substr(4) + "?account=" + account +
                            "&expires=" + expires +
                            "&signature=" + signature_of(*request.service, account, expires, request.path);
    Stmt json(request.service->db, "SELECT json_object('url', ?, 'expires', ?)");
    if (!json.bind(1, url).bind(2, end).row())
        return request.answer(500);
    request.set_header("Cache-Control", "no-store");
    request.answer(200, "application/json", json.text(0) + "\n");
}

Account *media_account(Request &request)
{
    const std::string path = "/dav" + request.target_path().substr(std::strlen("/1/media"));
    if (!request.query() || parse_path(path.c_str(), request.path) != 0)
        return nullptr;
    const std::string account = request.query_field("account"), expires = request.query_field("expires");
    if (!equal_in_constant_time(signature_of(*request.service, account, expires, request.path),
                                request.query_field("signature")))
        return nullptr;
    if (g_ascii_strtoll(expires.c_str(), nullptr, 10) < static_cast<gint64>(time(nullptr)))
        return nullptr;
    return request.service->accounts.find(g_ascii_strtoll(account.c_str(), nullptr, 10));
}

void media_get(Request &request)
{
    if (!request.is("GET") && !request.is("HEAD")) {
        request.set_header("Allow", "GET, HEAD");
        return request.answer(405);
    }
    request.set_header("Cache-Control", "private");
    dav_get(request);
}
