#pragma once
// One walk through the account's whole tree, folder by folder, that ends in one replacement of the database's content.
#include "cloud_content_sync/client.h"
#include "cloud_content_sync/dav.h"
#include <deque>
#include <set>

namespace cloud {

// All functions on the client thread.
class Refresh {
  public:
    // Several requests that came while another refresh ran are answered by one walk.
    Refresh(Client &client, std::vector<RefreshRequest> requests);
    ~Refresh();
    Refresh(const Refresh &) = delete;
    Refresh &operator=(const Refresh &) = delete;

    void start();
    bool has_ended() const
    {
        return ended;
    }
    // Breaks it off, if it has not ended, with this error.
    void finish(int error);

  private:
    void list_next();
    void list(const std::string &folder);
    void listed(const std::string &folder, const Transfer &transfer, MultistatusReader &reader);
    bool take(const std::string &folder, MultistatusReader &reader);

    Client &client;
    const std::vector<RefreshRequest> requests;
    Credentials credentials;
    std::deque<std::string> waiting;
    std::set<std::string> seen;
    std::set<Transfer *> running;
    std::vector<FolderRow> folders;
    std::vector<ContentRow> contents;
    bool ended = false;
};

} // namespace cloud
