#pragma once
// WebDAV servers of Debian, each a process of its own that serves a folder of its own on a port of 127.0.0.1.
#include "cloud.h"
#include <memory>
#include <optional>

struct DavServer {
    std::string url;    // of the root of the tree, without the final slash
    Headers taboo;      // names that it cannot list
    std::string folder; // what it serves
    pid_t pid = 0;
    std::shared_ptr<void> process; // ends the server
    bool has_own_user = false;     // so that the test cannot put files into the folder
};

// Those that are installed.
Headers dav_server_names();
// An empty tree of the user, with this password. Nothing when it does not start.
std::optional<DavServer> start_dav_server(const std::string &name, const std::string &user,
                                          const std::string &password);
