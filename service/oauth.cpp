#include "http.h"
#include "secrets.h"
#include <glib.h>
#include <strings.h>

static const size_t WAITING_MOST = 10000;
static const long DEVICE_CHARACTERS = 100;
static const size_t TEXT_AT_MOST = 200;                         // bytes of a token or a secret
static const double TOKENS_AT_ONCE = 30, SECONDS_PER_TOKEN = 4; // of one address

std::string RequestTokens::add(RequestToken token)
{
    const int64_t now = g_get_monotonic_time();
    std::erase_if(tokens, [now](const auto &one) { return one.second.ends <= now; });
    if (tokens.size() >= WAITING_MOST)
        return "";
    token.ends = now + static_cast<int64_t>(life) * G_USEC_PER_SEC;
    std::string name = hex(random_bytes(16));
    tokens[name] = std::move(token);
    return name;
}

RequestToken *RequestTokens::find(const std::string &token)
{
    const auto found = tokens.find(token);
    return found == tokens.end() || found->second.ends <= g_get_monotonic_time() ? nullptr : &found->second;
}

RequestToken *RequestTokens::find_waiting(const std::string &token)
{
    RequestToken *found = find(token);
    return found && !found->account ? found : nullptr;
}

RequestToken *RequestTokens::find_approved(const std::string &token, const std::string &secret)
{
    RequestToken *found = find(token);
    return found && equal_in_constant_time(found->secret, secret) && found->account ? found : nullptr;
}

void RequestTokens::remove(const std::string &token)
{
    tokens.erase(token);
}

// A text of the JSON body; false when there is none.
static bool text_in(const Request &request, const char *path, std::string &text)
{
    if (request.body.find('\0') != std::string::npos)
        return false;
    Stmt field(request.service->db, "SELECT json_extract(body, ?2) FROM (SELECT ?1 AS body) WHERE json_valid(body) AND "
                                    "json_type(body, ?2) = 'text'");
    if (!field.bind(1, request.body).bind(2, path).row())
        return false;
    text = field.text(0);
    return true;
}

// Answers with an object of texts, of which the third may be a number.
static void answer_object(Request &request, const char *sql, const std::string &first, const std::string &second,
                          int number)
{
    Stmt json(request.service->db, sql);
    json.bind(1, first).bind(2, second).bind(3, static_cast<long long>(number));
    if (!json.row())
        return request.answer(500);
    request.set_header("Cache-Control", "no-store");
    request.answer(200, "application/json", json.text(0) + "\n");
}

static void request_token(Request &request)
{
    Service &service = *request.service;
    std::string device;
    if (!text_in(request, "$.device", device))
        return request.answer(400);
    const std::string network = network_of(request.peer());
    if (const int seconds = service.attempts.take("token " + network, TOKENS_AT_ONCE, SECONDS_PER_TOKEN))
        return refuse_for(request, seconds);
    const std::string secret = hex(random_bytes(32));
    const std::string token = service.request_tokens.add({secret, plain_text(device, DEVICE_CHARACTERS), network});
    if (token.empty())
        return refuse_for(request, service.request_tokens.life);
    answer_object(request, "SELECT json_object('oauth_token', ?1, 'oauth_token_secret', ?2, 'expires_in', ?3)", token,
                  secret, service.request_tokens.life);
}

static void access_token(Request &request)
{
    Service &service = *request.service;
    std::string token, secret;
    if (!text_in(request, "$.oauth_token", token) || !text_in(request, "$.oauth_token_secret", secret) ||
        token.size() > TEXT_AT_MOST || secret.size() > TEXT_AT_MOST)
        return request.answer(400);
    const RequestToken *approved = service.request_tokens.find_approved(token, secret);
    const Account *account = approved ? service.accounts.find(approved->account) : nullptr;
    if (!account)
        return request.answer(401);
    const std::string access = service.accounts.issue_token(account->email, approved->device);
    if (access.empty())
        return request.answer(500); // it can be tried again
    service.request_tokens.remove(token);
    answer_object(request, "SELECT json_object('access_token', ?1, 'email', ?2)", access, account->email, 0);
}

static void revoke(Request &request)
{
    const char *header = request.header("Authorization");
    const bool is_bearer = header && strncasecmp(header, "Bearer ", 7) == 0;
    if (is_bearer && request.service->accounts.revoke_token(header + 7))
        return request.answer(204);
    request.add_header("WWW-Authenticate", "Bearer realm=\"velora-cloud\"");
    request.answer(401);
}

static const struct {
    const char *path;
    void (*answer)(Request &request);
} CALLS[] = {
    {"/1/oauth/request_token", request_token}, {"/1/oauth/access_token", access_token}, {"/1/oauth/revoke", revoke}};

bool is_oauth_path(const std::string &path)
{
    return std::any_of(std::begin(CALLS), std::end(CALLS), [&path](const auto &call) { return path == call.path; });
}

int oauth_refusal(Request &request)
{
    if (!request.is("POST")) {
        request.set_header("Allow", "POST");
        return 405;
    }
    return request.body_length() > static_cast<int64_t>(FORM_AT_MOST) ? 413 : 0;
}

void oauth_request(Request &request)
{
    for (const auto &call : CALLS)
        if (request.target_path() == call.path)
            return call.answer(request);
}
