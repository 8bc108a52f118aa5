// The account interface of the fake: request tokens, access tokens, revocations.
#include "base/base.h"
#include "fake_state.h"

bool is_auth(const cloud::Transfer &transfer)
{
    return transfer.url.find("/1/oauth/") != std::string::npos;
}

static std::string field(const std::string &body, const std::string &path)
{
    Db json;
    json.open(":memory:", nullptr);
    Stmt value(json, "SELECT json_extract(?, ?)");
    return value.bind(1, body).bind(2, path).row() ? value.text(0) : "";
}

static void give_access(cloud::Transfer &transfer)
{
    const auto token = fake().request_tokens.find(field(transfer.body, "$.oauth_token"));
    if (fake().approver.empty() || token == fake().request_tokens.end() ||
        token->second != field(transfer.body, "$.oauth_token_secret"))
        return answer(transfer, 401, "");
    fake().request_tokens.erase(token);
    const std::string access = "access" + std::to_string(++fake().tokens_made);
    fake().access_tokens.insert(access);
    answer(transfer, 200, R"({"access_token": ")" + access + R"(", "email": ")" + fake().approver + "\"}");
}

void answer_auth(cloud::Transfer &transfer, const std::string &bearer)
{
    const auto scripted = fake().auth_errors.find(++fake().auth_requests);
    if (scripted != fake().auth_errors.end())
        return answer_error(transfer, scripted->second);
    if (transfer.url.ends_with("/access_token"))
        return give_access(transfer);
    if (transfer.url.ends_with("/revoke"))
        return answer(transfer, fake().access_tokens.erase(bearer) ? 204 : 401, "");
    const std::string number = std::to_string(++fake().tokens_made);
    fake().request_tokens["request" + number] = "secret" + number;
    answer(transfer, 200,
           R"({"oauth_token": "request)" + number + R"(", "oauth_token_secret": "secret)" + number +
               R"(", "expires_in": 600})");
}
