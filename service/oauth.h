#pragma once
// How a device is signed in: it gets a request token, a person approves that with a browser, and the device exchanges
// it for an access token of its own. Main thread only.
#include <cstdint>
#include <map>
#include <string>

struct Request;

struct RequestToken {
    std::string secret, device;
    std::string network;   // from which it was asked for
    long long account = 0; // that has approved it; 0 until then
    int64_t ends = 0;      // monotonic, microseconds
};

// Those that wait for a person, or for their device. They are not kept over a restart.
class RequestTokens {
  public:
    // A new token; empty when too many wait already.
    std::string add(RequestToken token);
    // A token that nobody has approved, declined or used yet; null when there is none. Valid until the next call.
    RequestToken *find_waiting(const std::string &token);
    // The token with this secret, if somebody has approved it; null when not.
    RequestToken *find_approved(const std::string &token, const std::string &secret);
    void remove(const std::string &token);

    int life = 600; // seconds

  private:
    RequestToken *find(const std::string &token);

    std::map<std::string, RequestToken> tokens;
};

bool is_oauth_path(const std::string &path);
// A refusal that needs no body, or 0.
int oauth_refusal(Request &request);
// Answers a request to one of these addresses, once its body is there.
void oauth_request(Request &request);
