#pragma once
// What is known about a cloud service. Any thread.
#include <optional>
#include <string>

namespace cloud {

struct Service {
    std::string name;
    std::string storage;      // root URL of the WebDAV tree, without a final "/"
    std::string api;          // base URL of the account interface, without a final "/"; empty when there is none
    std::string root_path;    // path of that URL as a server path
    std::string web;          // base URL of the service's pages, without a final "/"; empty when there are none
    std::string callback;     // where they send the person who has decided; empty when there are no pages
    std::string ca_file;      // certificates to trust instead of the system's, or empty
    bool looks_first = false; // what may replace files is used nevertheless, after a look whether the name is free
    bool reads_back = false;  // every file that is uploaded, where the service has no digests
    int stall_seconds = 60;
    int wait_seconds = 300; // that uploads wait for a service in trouble
    int auth_seconds = 180; // that a request of a sign-in may take
};

// Usable as a part of a file name.
bool service_name_is_valid(const std::string &name);
// Reads NAME.conf (see the README for its place and its keys). Nothing when there is none, or it names no storage.
std::optional<Service> service_find(const std::string &name);

// platform_data_dir()/cloud, which is made when it is missing.
std::string cloud_data_dir();

} // namespace cloud
