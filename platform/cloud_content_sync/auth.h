#pragma once
// Signing in and out: request token, access token, activation, deactivation, and the revocations behind them.
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/http.h"
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <set>

namespace cloud {

class Client;

struct AuthRequest {
    enum Kind { REQUEST_TOKEN, EMAIL, ACTIVATE, DEACTIVATE };
    Kind kind = REQUEST_TOKEN;
    cloud_content_sync_request_token_cb token_cb = nullptr;
    cloud_content_sync_email_cb email_cb = nullptr;
    cloud_content_sync_status_cb status_cb = nullptr;
    void *user_data = nullptr;
    bool is_sign_in_only = false; // of a deactivation: it leaves an account alone
    int id = 0;
    int sign_in = 0; // the one that was under way when it was asked for
};

// One request at a time. What the service is asked for on the way belongs to the sign-in and not to the request: a
// token that comes although its request was cancelled is kept, or revoked.
class Auth {
  public:
    explicit Auth(Client &client);
    ~Auth();
    Auth(const Auth &) = delete;
    Auth &operator=(const Auth &) = delete;

    // Any thread.
    // Ends the request before as cancel() does.
    void ask(AuthRequest request);
    // False when none is queued or running. No callback of one runs any more on return, but for the one from within
    // which this is called.
    bool cancel();

    // The client thread only. Starts what waits and takes note of cancels.
    void step();
    // Revokes what is provisional, for as long as a person would wait, and breaks off the rest.
    void end();

  private:
    using Answered = std::function<void(int error, const std::string &answer)>;

    // From a request token to the activation of its account, or its end.
    struct SignIn {
        int id = 0; // of the request that began it
        std::string token, secret;
        bool is_exchanging = false;
        std::optional<Credentials> access; // provisional
    };

    void begin_sign_in();
    void ask_for_access();
    void take_access(const std::shared_ptr<SignIn> &one, int error, const std::string &answer);
    void activate();
    void deactivate();
    void revoke_access(const std::shared_ptr<SignIn> &one, const std::function<void(int)> &then);
    void forget_sign_in(int id);
    void revoke(const Credentials &credentials, const std::function<void(int)> &then);
    Transfer *post(const char *path, const std::string &body, const Credentials &credentials, Answered then);
    void finish(int id, int error, const std::string &text = "", const std::string &secret = "");

    Client &client;
    std::mutex mutex;                   // guards all up to the empty line
    std::optional<AuthRequest> waiting; // the next one
    int latest = 0;                     // the request that was asked for last
    int under_way = 0;                  // the sign-in

    std::optional<AuthRequest> running; // client thread, like all that follows
    std::shared_ptr<SignIn> current;
    Transfer *asking = nullptr;      // for a request token
    std::set<Transfer *> background; // what goes on when its request was cancelled
};

} // namespace cloud
