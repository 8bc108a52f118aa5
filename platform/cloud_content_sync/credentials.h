#pragma once
// Who the device's user is at a service, and the secret that proves it. They are kept in cloud/SERVICE.credentials of
// the platform's data folder, readable by its owner alone; the secret is in the session's Secret Service instead where
// there is one that works. Any thread. Account::sign_in() alone changes them.
#include "cloud_content_sync/service.h"

namespace cloud {

struct Credentials {
    std::string user = {}; // empty: bearer token
    std::string secret = {};
    std::string email = {};    // the account's address; empty: not known
    std::string item = {};     // of the Secret Service, see secrets.h; empty: the secret is in the file
    std::string identity = {}; // the account's, where the secret is not in the file and nothing else tells it
};

bool has_control_characters(const std::string &text);
// Whether an account may be known by it.
bool email_is_valid(const std::string &email);

std::string credentials_file(const std::string &service_name);
// Who is signed in, by the file alone: the secret may be missing. Nothing when nobody is.
std::optional<Credentials> credentials_known(const std::string &service_name);
// The same with the secret, for which it may have to ask the Secret Service (see secret_find). One of
// cloud_content_sync_error_e: NO_ACCOUNT when nobody is signed in, UNAUTHORIZED when the secret is not to be had now.
int credentials_load(const std::string &service_name, Credentials &credentials);
// Replaces the file of the service as a whole; it has the secret unless an item is given. Null removes it.
bool credentials_store(const std::string &service_name, const Credentials *credentials);
// A digest that tells accounts of a storage apart: by the e-mail address, or by the user where none is known, or by the
// token where neither is.
std::string account_identity(const Service &service, const Credentials &credentials);

} // namespace cloud
