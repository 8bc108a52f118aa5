#pragma once
// What is known about a cloud service and about the device's user there. Any thread.
#include <optional>
#include <string>

namespace cloud {

struct Service {
    std::string name;
    std::string storage;   // root URL of the WebDAV tree, without a final "/"
    std::string api;       // base URL of the account interface, without a final "/"; empty when there is none
    std::string root_path; // path of that URL as a server path
    std::string ca_file;   // certificates to trust instead of the system's, or empty
    int stall_seconds = 60;
};

struct Credentials {
    std::string user; // empty: bearer token
    std::string secret;
    std::string email; // the account's address; empty: not known
};

// Usable as a part of a file name.
bool service_name_is_valid(const std::string &name);
// Reads NAME.conf (see the README for its place and its keys). Nothing when there is none, or it names no storage.
std::optional<Service> service_find(const std::string &name);

// platform_data_dir()/cloud, which is made when it is missing.
std::string cloud_data_dir();
// Nothing when nobody is signed in.
std::optional<Credentials> credentials_load(const std::string &service_name);
// Replaces the file of the service as a whole; it is readable by its owner alone. Null removes it.
bool credentials_store(const std::string &service_name, const Credentials *credentials);
// A digest that tells accounts of a storage apart: by the e-mail address, or by the user where none is known, or by the
// token where neither is.
std::string account_identity(const Service &service, const Credentials &credentials);

} // namespace cloud
