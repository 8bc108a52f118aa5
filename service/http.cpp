#include "http.h"
#include "pages.h"
#include <cstring>
#include <gio/gio.h>

static const size_t BODY_AT_MOST = 1 << 20; // of requests that are not uploads
static const char *const ALLOWED =
    "OPTIONS, GET, HEAD, PUT, DELETE, MKCOL, COPY, MOVE, PROPFIND, PROPPATCH, LOCK, UNLOCK";

static std::string field_of(const char *fields_text, gssize size, const char *name)
{
    GHashTable *fields =
        fields_text ? g_uri_parse_params(fields_text, size, "&", G_URI_PARAMS_WWW_FORM, nullptr) : nullptr;
    const auto *value = fields ? static_cast<const char *>(g_hash_table_lookup(fields, name)) : nullptr;
    std::string text = value ? value : "";
    if (fields)
        g_hash_table_unref(fields);
    return text;
}

std::string Request::query_field(const char *name) const
{
    return field_of(query(), -1, name);
}

std::string Request::form_field(const char *name) const
{
    return field_of(body.data(), static_cast<gssize>(body.size()), name);
}

std::unique_ptr<GUri, decltype(&g_uri_unref)> read_address(const Request &request, const char *text)
{
    static constexpr auto FLAGS = static_cast<GUriFlags>(G_URI_FLAGS_ENCODED_PATH | G_URI_FLAGS_ENCODED_QUERY |
                                                         G_URI_FLAGS_ENCODED_FRAGMENT | G_URI_FLAGS_SCHEME_NORMALIZE);
    const char *host = request.header("Host");
    const std::string base =
        std::string(request.is_secure() ? "https://" : "http://") + (host ? host : "localhost") + "/";
    const std::unique_ptr<GUri, decltype(&g_uri_unref)> own(g_uri_parse(base.c_str(), FLAGS, nullptr), g_uri_unref);
    return {own ? g_uri_parse_relative(own.get(), text, FLAGS, nullptr) : nullptr, g_uri_unref};
}

Entry Request::look_up() const
{
    if (path.root())
        return look(account->folder.fd, "");
    const Fd folder = parent();
    Entry entry = folder ? look(folder.fd, path.name()) : Entry();
    if (path.slash && entry.kind == Entry::FILE)
        entry.kind = Entry::NONE;
    return entry;
}

std::string content_type(const std::string &name)
{
    const std::unique_ptr<char, decltype(&g_free)> type(g_content_type_guess(name.c_str(), nullptr, 0, nullptr),
                                                        g_free);
    const std::unique_ptr<char, decltype(&g_free)> mime(g_content_type_get_mime_type(type.get()), g_free);
    return mime ? mime.get() : "application/octet-stream";
}

std::string repr_digest(const std::string &sha256_hex)
{
    std::string bytes;
    for (size_t i = 0; i + 1 < sha256_hex.size(); i += 2)
        bytes += static_cast<char>(g_ascii_xdigit_value(sha256_hex[i]) * 16 + g_ascii_xdigit_value(sha256_hex[i + 1]));
    const std::unique_ptr<char, decltype(&g_free)> text(
        g_base64_encode(reinterpret_cast<const guchar *>(bytes.data()), bytes.size()), g_free);
    return std::string("sha-256=:") + text.get() + ":";
}

// Whether a list of entity tags names the entry's. Weak tags never match: ours are strong.
static bool names_etag(std::string_view list, const Entry &entry)
{
    const std::string etag = entry.etag();
    while (!list.empty()) {
        const bool is_weak = list.substr(0, 2) == "W/";
        list.remove_prefix(is_weak ? 2 : 0);
        const size_t quote = list.front() == '"' ? list.find('"', 1) : list.npos;
        const size_t end = std::min(quote != list.npos ? quote + 1 : list.find(','), list.size());
        const std::string_view tag = list.substr(0, list.front() == '"' ? end : list.find_first_of(", \t"));
        if (!is_weak && (tag == etag || tag == "*"))
            return true;
        list.remove_prefix(end);
        list.remove_prefix(std::min(list.find_first_not_of(", \t"), list.size()));
    }
    return false;
}

int check_conditions(const Request &request, const Entry &entry)
{
    const bool exists = entry.kind != Entry::NONE, reading = request.is("GET") || request.is("HEAD");
    const int64_t modified = entry.modified / 1000000000;
    if (const char *match = request.header("If-Match")) {
        if (!exists || !names_etag(match, entry))
            return 412;
    } else if (const int64_t date = http_date_read(request.header("If-Unmodified-Since")); date >= 0 && exists) {
        if (modified > date)
            return 412;
    }
    if (const char *none = request.header("If-None-Match")) {
        if (exists && names_etag(none, entry))
            return reading ? 304 : 412;
    } else if (const int64_t date = http_date_read(request.header("If-Modified-Since"));
               date >= 0 && exists && reading) {
        if (modified <= date)
            return 304;
    }
    return 0;
}

void refuse(Request &request, int status)
{
    request.answer(status);
    put_drop(request);
}

void refuse_for(Request &request, int seconds)
{
    request.set_header("Retry-After", std::to_string(seconds));
    refuse(request, 429);
}

void in_thread(Request &request, std::function<void()> work, std::function<void()> done, Workers *workers)
{
    request.jobs++;
    request.pause();
    Workers &those = workers ? *workers : request.service->workers;
    // The request outlives its connection until the job is done.
    those.run(std::move(work), [&request, kept = request.shared_from_this(), done = std::move(done)] {
        request.jobs--;
        done();
        request.unpause();
    });
}

void dav_options(Request &request)
{
    request.set_header("DAV", "1, 2");
    request.set_header("Allow", ALLOWED);
    request.answer(200);
}

static void account_info(Request &request)
{
    if (!request.is("GET") && !request.is("HEAD")) {
        request.set_header("Allow", "GET, HEAD");
        return request.answer(405);
    }
    const Account &account = *request.account;
    Stmt json(request.service->db, "SELECT json_object('email', ?, 'display_name', ?, 'used', ?, 'total', ?)");
    json.bind(1, account.email).bind(2, account.display_name);
    json.bind(3, static_cast<long long>(account.stored())).bind(4, static_cast<long long>(account.quota));
    if (!json.row())
        return request.answer(500);
    request.set_header("Cache-Control", "no-store");
    request.answer(200, "application/json", json.text(0) + "\n");
}

static Area area_of(const Request &request)
{
    const char *path = request.target_path().c_str();
    if (std::strcmp(path, "/1/account/info") == 0)
        return Area::ACCOUNT_INFO;
    if (std::strcmp(path, "/1/media") == 0)
        return Area::MEDIA_ADDRESS;
    if (std::strcmp(path, "/1/thumbnail") == 0)
        return Area::THUMBNAIL;
    if (is_oauth_path(path))
        return Area::OAUTH;
    if (is_page(request))
        return Area::PAGE;
    return std::strncmp(path, "/1/media/", 9) == 0 ? Area::MEDIA : Area::DAV;
}

static void handle_dav(Request &request)
{
    const std::string method = request.method();
    if (method == "PUT")
        return put_finish(request);
    if (method == "OPTIONS")
        return dav_options(request);
    if (method == "GET" || method == "HEAD")
        return dav_get(request);
    if (method == "DELETE")
        return dav_delete(request);
    if (method == "MKCOL")
        return dav_mkcol(request);
    if (method == "COPY" || method == "MOVE")
        return dav_copy_move(request, method == "MOVE");
    if (method == "PROPFIND")
        return dav_propfind(request);
    if (method == "PROPPATCH")
        return dav_proppatch(request);
    if (method == "LOCK")
        return dav_lock(request);
    if (method == "UNLOCK")
        return dav_unlock(request);
    request.set_header("Allow", ALLOWED);
    request.answer(405);
}

Request::~Request()
{
    put_drop(*this);
}

void Request::ended()
{
    put_drop(*this);
    large_answer.reset();
}

void Request::got_body(const char *bytes, size_t size)
{
    if (upload)
        return put_chunk(*this, bytes, size);
    body.append(bytes, size);
    if (body.size() > (area == Area::PAGE || area == Area::OAUTH ? FORM_AT_MOST : BODY_AT_MOST))
        refuse(*this, 413);
}

void Request::got_request()
{
    switch (area) {
    case Area::DAV:
        return handle_dav(*this);
    case Area::ACCOUNT_INFO:
        return account_info(*this);
    case Area::MEDIA_ADDRESS:
        return media_address(*this);
    case Area::MEDIA:
        return media_get(*this);
    case Area::THUMBNAIL:
        return thumbnail(*this);
    case Area::OAUTH:
        return oauth_request(*this);
    case Area::PAGE:
        return page_request(*this);
    }
}

// The headers are there, the body is not: who asks, for what, and may it be sent?
void Request::got_headers()
{
    area = area_of(*this);
    if (has_fragment())
        return refuse(*this, 400);
    if (area == Area::OAUTH || area == Area::PAGE) {
        if (const int status = area == Area::OAUTH ? oauth_refusal(*this) : page_refusal(*this))
            refuse(*this, status);
        return;
    }
    if (area == Area::DAV && parse_path(target_path().c_str(), path) == 404) {
        if (wants_page(*this))
            return page_missing(*this);
        return refuse(*this, 404);
    }
    if (area != Area::MEDIA)
        return authorize();
    account = media_account(*this);
    if (!account)
        refuse(*this, 403);
}

static void ask_for_credentials(Request &request)
{
    request.add_header("WWW-Authenticate", "Bearer realm=\"velora-cloud\"");
    request.add_header("WWW-Authenticate", "Basic realm=\"velora-cloud\", charset=\"UTF-8\"");
    refuse(request, 401);
}

void Request::authorize()
{
    auto check = std::make_shared<PasswordCheck>();
    account = service->accounts.authorize(header("Authorization"), *check);
    if (account)
        return authorized();
    if (check->password.empty())
        return ask_for_credentials(*this);
    // Whether there is such an account makes no difference to anybody who tries.
    const std::string who = "account " + check->email, where = "address " + network_of(peer());
    if (const int seconds = service->attempts.begin(who, where))
        return refuse_for(*this, seconds);
    in_thread(
        *this, [check] { check->run(); },
        [this, check, who, where] {
            account = service->accounts.settle(*check);
            if (!account)
                return ask_for_credentials(*this);
            service->attempts.succeeded(who, where);
            authorized();
        },
        &service->hashers);
}

void Request::authorized()
{
    const bool is_dav = area == Area::DAV;
    Path again;
    if (const int wrong = is_dav ? parse_path(target_path().c_str(), again) : 0)
        return refuse(*this, wrong);
    if (const int status = is_dav ? check_if_header(*this) : 0)
        return refuse(*this, status);
    if (is_dav && is("PUT"))
        return put_begin(*this);
    if (body_length() > static_cast<int64_t>(BODY_AT_MOST))
        refuse(*this, 413);
}
