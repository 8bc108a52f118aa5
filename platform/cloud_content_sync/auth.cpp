#include "cloud_content_sync/auth.h"
#include "base/base.h"
#include "cloud_content_sync/client.h"
#include <algorithm>
#include <fstream>
#include <glib.h>
#include <utility>

namespace cloud {

static constexpr size_t ANSWER_BYTES = 64 << 10;
static constexpr size_t TEXT_BYTES = 1024;
static constexpr size_t DEVICE_BYTES = 64;
static constexpr auto LAST_WAIT = std::chrono::seconds(3);

Auth::Auth(Client &owner) : client(owner) {}

Auth::~Auth() = default;

void Auth::ask(AuthRequest request)
{
    int former = 0;
    {
        std::scoped_lock lock(mutex);
        former = latest;
        request.id = latest = client.new_request();
        if (request.kind == AuthRequest::REQUEST_TOKEN)
            under_way = request.id;
        request.sign_in = under_way;
        waiting = request;
    }
    if (former)
        client.cancel(former);
    client.http.wake();
}

bool Auth::cancel()
{
    std::unique_lock lock(mutex);
    const int id = latest;
    lock.unlock();
    return id && client.cancel(id);
}

void Auth::step()
{
    std::optional<AuthRequest> next;
    int now = 0;
    {
        std::scoped_lock lock(mutex);
        next.swap(waiting);
        now = under_way;
    }
    if (running && (next || !client.is_wanted(running->id))) {
        client.http.abort(asking);
        asking = nullptr;
        running.reset();
    }
    if (current && current->id != now)
        revoke_access(std::exchange(current, nullptr), [](int) {});
    // A deactivation is done also when nobody waits for it any more: whoever asked for it may be gone.
    if (!next || (next->kind != AuthRequest::DEACTIVATE && !client.is_wanted(next->id)))
        return;
    running = next;
    switch (running->kind) {
    case AuthRequest::REQUEST_TOKEN:
        return begin_sign_in();
    case AuthRequest::EMAIL:
        return ask_for_access();
    case AuthRequest::ACTIVATE:
        return activate();
    case AuthRequest::DEACTIVATE:
        return deactivate();
    }
}

Transfer *Auth::post(const char *path, const std::string &body, const Credentials &credentials, Answered then)
{
    auto answer = std::make_shared<std::string>();
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "POST";
    transfer->url = client.service.api + path;
    transfer->headers = {body.empty() ? "Content-Type:" : "Content-Type: application/json", "Accept: application/json"};
    transfer->body = body;
    transfer->time_limit = std::chrono::seconds(client.service.auth_seconds);
    transfer->write = [answer](const char *data, size_t size) {
        answer->append(data, size);
        return answer->size() <= ANSWER_BYTES;
    };
    transfer->done = [this, answer, then = std::move(then)](Transfer &done) {
        background.erase(&done);
        int error = done.is_success() ? 0 : done.error();
        if (done.result == CURLE_PEER_FAILED_VERIFICATION)
            error = CLOUD_CONTENT_SYNC_ERROR_CERTIFICATE;
        else if (error && error != CLOUD_CONTENT_SYNC_ERROR_NETWORK && error != CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED)
            error = CLOUD_CONTENT_SYNC_ERROR_SERVER;
        then(error, *answer);
        client.http.wake();
    };
    return client.http.start(std::move(transfer), credentials);
}

// A text of a JSON object that may stand in a header field or an address; "" when there is none.
static std::string text_in(const std::string &answer, const char *path)
{
    // SQLite's texts end at a NUL, whether it is written out or not.
    if (answer.find('\0') != answer.npos || answer.find("\\u0000") != answer.npos)
        return "";
    Db json;
    json.open(":memory:", nullptr);
    Stmt field(json, "SELECT json_extract(?1, ?2) WHERE json_valid(?1) AND json_type(?1, ?2) = 'text'");
    std::string text = field.bind(1, answer).bind(2, path).row() ? field.text(0) : "";
    const bool is_good = text.size() <= TEXT_BYTES && !has_control_characters(text) &&
                         g_utf8_validate(text.data(), static_cast<gssize>(text.size()), nullptr);
    return is_good ? text : "";
}

// The same without spaces, and in ASCII.
static std::string token_in(const std::string &answer, const char *path)
{
    std::string token = text_in(answer, path);
    return std::all_of(token.begin(), token.end(), [](char c) { return c > 0x20 && c < 0x7F; }) ? token : "";
}

static std::string json_object(const std::string &key, const std::string &value, const std::string &second_key = "",
                               const std::string &second = "")
{
    Db json;
    json.open(":memory:", nullptr);
    Stmt object(json, second_key.empty() ? "SELECT json_object(?1, ?2)" : "SELECT json_object(?1, ?2, ?3, ?4)");
    object.bind(1, key).bind(2, value);
    if (!second_key.empty())
        object.bind(3, second_key).bind(4, second);
    return object.row() ? object.text(0) : "";
}

// What a person calls this machine, see machine-info(5).
static std::string device_name()
{
    std::ifstream info("/etc/machine-info");
    std::string name, line;
    while (std::getline(info, line)) {
        static constexpr char KEY[] = "PRETTY_HOSTNAME=";
        if (!line.starts_with(KEY))
            continue;
        g_autofree char *value = g_shell_unquote(line.c_str() + sizeof KEY - 1, nullptr);
        name = value ? value : "";
    }
    if (name.empty() || has_control_characters(name) || !g_utf8_validate(name.c_str(), -1, nullptr))
        name = g_get_host_name();
    g_autofree char *valid = g_utf8_make_valid(name.c_str(), -1);
    name = valid;
    if (name.size() > DEVICE_BYTES)
        name.resize(
            static_cast<size_t>(g_utf8_find_prev_char(name.c_str(), name.c_str() + DEVICE_BYTES + 1) - name.c_str()));
    return name;
}

void Auth::begin_sign_in()
{
    current = std::make_shared<SignIn>();
    current->id = running->id;
    const int id = running->id;
    asking =
        post("/1/oauth/request_token", json_object("device", device_name()), {},
             [this, id](int error, const std::string &answer) {
                 asking = nullptr;
                 if (error)
                     return finish(id, error == CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED ? CLOUD_CONTENT_SYNC_ERROR_SERVER
                                                                                      : error);
                 const std::string token = token_in(answer, "$.oauth_token");
                 const std::string secret = token_in(answer, "$.oauth_token_secret");
                 if (token.empty() || secret.empty())
                     return finish(id, CLOUD_CONTENT_SYNC_ERROR_SERVER);
                 // It may be another's by now; then nobody is told either.
                 if (current && current->id == id) {
                     current->token = token;
                     current->secret = secret;
                 }
                 finish(id, 0, token, secret);
             });
}

void Auth::ask_for_access()
{
    const std::shared_ptr<SignIn> one = current;
    if (!one || one->token.empty())
        return finish(running->id, CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT);
    if (one->access)
        return finish(running->id, 0, one->access->email);
    if (std::exchange(one->is_exchanging, true))
        return; // what a cancelled request has asked for is not there yet
    background.insert(post("/1/oauth/access_token",
                           json_object("oauth_token", one->token, "oauth_token_secret", one->secret), {},
                           [this, one](int error, const std::string &answer) { take_access(one, error, answer); }));
}

void Auth::take_access(const std::shared_ptr<SignIn> &one, int error, const std::string &answer)
{
    one->is_exchanging = false;
    Credentials access;
    access.secret = error ? "" : token_in(answer, "$.access_token");
    access.email = error ? "" : text_in(answer, "$.email");
    if (!error && (access.secret.empty() || !email_is_valid(access.email))) {
        revoke(access, [](int) {}); // a token without an address is of no use
        error = CLOUD_CONTENT_SYNC_ERROR_SERVER;
    }
    if (one != current) {
        if (!error)
            revoke(access, [](int) {});
        return;
    }
    if (!error)
        one->access = access;
    if (running && running->kind == AuthRequest::EMAIL)
        finish(running->id, error, access.email);
}

void Auth::forget_sign_in(int id)
{
    current.reset();
    std::scoped_lock lock(mutex);
    if (under_way == id)
        under_way = 0;
}

void Auth::activate()
{
    const AuthRequest request = *running;
    if (!current || !current->access)
        return finish(request.id, CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT);
    const Credentials access = *current->access;
    std::optional<Credentials> former;
    if (!client.account->sign_in(&access, &former))
        return finish(request.id, CLOUD_CONTENT_SYNC_ERROR_DB_FAILED);
    forget_sign_in(request.sign_in);
    if (former && former->secret != access.secret)
        revoke(*former, [](int) {});
    finish(request.id, 0);
}

void Auth::deactivate()
{
    const AuthRequest request = *running;
    const auto then = [this, id = request.id](int error) { finish(id, error); };
    if (request.sign_in) {
        const std::shared_ptr<SignIn> one = current;
        forget_sign_in(request.sign_in);
        return revoke_access(one, then);
    }
    if (request.is_sign_in_only)
        return then(CLOUD_CONTENT_SYNC_ERROR_NONE);
    client.end_requests(CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT);
    // What is on this device goes first: a process that is killed in between leaves a token that the person can still
    // revoke at the service, and not an account that the service refuses.
    std::optional<Credentials> former;
    if (!client.account->sign_in(nullptr, &former))
        return finish(request.id, CLOUD_CONTENT_SYNC_ERROR_DB_FAILED);
    if (former && former->secret.empty())
        return finish(request.id, CLOUD_CONTENT_SYNC_ERROR_NETWORK); // it cannot be named to the service
    revoke(former.value_or(Credentials()), then);
}

void Auth::revoke_access(const std::shared_ptr<SignIn> &one, const std::function<void(int)> &then)
{
    revoke(one && one->access ? *one->access : Credentials(), then);
}

// A password stays what it is.
void Auth::revoke(const Credentials &credentials, const std::function<void(int)> &then)
{
    if (!credentials.user.empty() || credentials.secret.empty() || client.service.api.empty())
        return then(0);
    background.insert(post("/1/oauth/revoke", "", credentials, [then](int error, const std::string &) {
        // Unauthorized: it is gone already.
        then(error == CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED ? 0 : error);
    }));
}

// The last, and only, callback of the request, if it still runs.
void Auth::finish(int id, int error, const std::string &text, const std::string &secret)
{
    if (!running || running->id != id)
        return;
    const AuthRequest request = *std::exchange(running, std::nullopt);
    if (!client.begin_callback(id, true))
        return;
    const bool is_device_clear = request.kind == AuthRequest::DEACTIVATE && error != CLOUD_CONTENT_SYNC_ERROR_DB_FAILED;
    const int status = !error || is_device_clear ? CLOUD_CONTENT_SYNC_STATE_DONE : CLOUD_CONTENT_SYNC_STATE_FAILED;
    const char *const given = error ? nullptr : text.c_str();
    switch (request.kind) {
    case AuthRequest::REQUEST_TOKEN:
        request.token_cb(status, given, error ? nullptr : secret.c_str(), error, request.user_data);
        break;
    case AuthRequest::EMAIL:
        request.email_cb(status, given, error, request.user_data);
        break;
    case AuthRequest::ACTIVATE:
    case AuthRequest::DEACTIVATE:
        request.status_cb(status, error, request.user_data);
    }
    client.end_callback();
}

void Auth::end()
{
    running.reset();
    client.http.abort(asking);
    asking = nullptr;
    revoke_access(std::exchange(current, nullptr), [](int) {});
    const auto deadline = std::chrono::steady_clock::now() + LAST_WAIT;
    while (!background.empty() && std::chrono::steady_clock::now() < deadline)
        client.http.run(std::chrono::milliseconds(100));
    for (Transfer *transfer : background)
        client.http.abort(transfer);
    background.clear();
}

} // namespace cloud
