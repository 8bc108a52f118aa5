#pragma once
// Control of the fake service. The cloud client is the real one; its requests are answered from a tree in memory. What
// a test calls is this. All functions but the reset may be called from any thread. The services "Velora" and "Test" are
// known, and share one tree.
#include <optional>
#include <string>
#include <vector>

// Empty tree, empty database without a whole refresh, somebody signed in, the service reachable, nothing scripted and
// no waiting. To be called while no handle is open, with a data folder of the test's own.
void fake_cloud_reset();

// The tree of the service. Parents must exist; content is replaced when it is there. The database of the client knows
// of it after the next refresh.
void fake_cloud_add_folder(const std::string &path);
void fake_cloud_add_file(const std::string &path, const std::string &content);
// With everything below it.
void fake_cloud_remove(const std::string &path);
std::optional<std::string> fake_cloud_content(const std::string &path);
// Names of the folders and files directly below a folder.
std::vector<std::string> fake_cloud_list(const std::string &folder);
// Makes the database of "Velora" what a refresh would, at once: for tests that begin with a refreshed account.
void fake_cloud_refresh_now();

// false: requests end with NETWORK.
void fake_cloud_set_reachable(bool reachable);

// The nth upload whose body reaches the service from now on (1: the next one) ends with this error.
void fake_cloud_fail_upload(int nth, int error);
// The next refresh ends with this error; the next cloud_content_sync_create answers it; the next request about a single
// file ends with it.
void fake_cloud_fail_refresh(int error);
void fake_cloud_fail_create(int error);
void fake_cloud_fail_content(int error);

// How much storage there is, at first 15 GiB, and how much of it is used besides the files of the tree, in bytes; a
// total of 0: the service does not say. An error: every question about it ends with that.
void fake_cloud_set_storage(unsigned long long total, unsigned long long used, int error = 0);

// Signing in and out. The service has pages, which nobody sees: the person's decision is made here. From now on the
// account of this address allows every request token; "": they are not allowed, as in the beginning.
void fake_cloud_approve(const std::string &email);
// Makes this account the device's, with an access token that is alive at the service; "": nobody is signed in. What the
// database holds stays. To be called while no request runs.
void fake_cloud_sign_in(const std::string &email);
// The person ends all access tokens at the service: requests with one are UNAUTHORIZED from now on.
void fake_cloud_revoke_tokens();
// Access tokens that were given out and not revoked.
int fake_cloud_live_tokens();
bool fake_cloud_token_is_alive(const std::string &token);
// The nth request of a sign-in or sign-out from now on (1: the next one) ends with this error. Counted are request
// tokens, access tokens and revocations.
void fake_cloud_fail_auth(int nth, int error);

// A pause before each step of a request, in milliseconds. An upload takes three steps: half of its body, the rest
// and the answer (more when it is large); a refresh one, and any other request one.
void fake_cloud_set_delay(int milliseconds);
// While held, no step is taken, except for as many as are let through. A client that is destroyed meanwhile, and has a
// token to revoke, waits three seconds for nothing.
void fake_cloud_hold(bool hold);
void fake_cloud_let_through(int steps);

// Handles that are created and not yet destroyed; uploads asked for since the reset, as "LOCAL -> SERVER".
int fake_cloud_open_handles();
std::vector<std::string> fake_cloud_upload_log();
