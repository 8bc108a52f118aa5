#pragma once
// Requests about single files: the cached copy, a download, an address to stream from.
#include "cloud_content_sync/account.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include <deque>
#include <memory>
#include <mutex>

namespace cloud {

class Client;
class ContentTask;

struct ContentRequest {
    enum Kind { CACHED_FILE, DOWNLOAD, STREAMING_ADDRESS };
    Kind kind = CACHED_FILE;
    ContentRow row = {}; // as the handle knows it
    cloud_content_sync_result_cb cb = nullptr;
    void *user_data = nullptr;
    std::string local_path = {}; // of a download
    int minutes = 0;             // of a streaming address
    int id = 0;
};

class Contents {
  public:
    explicit Contents(Client &client);
    ~Contents();
    Contents(const Contents &) = delete;
    Contents &operator=(const Contents &) = delete;

    // Any thread. The id is the client's, and live.
    void add(ContentRequest request);

    // The client thread only. Starts what waits and takes note of cancels.
    void step();
    bool is_idle() const
    {
        return running.empty();
    }
    // Breaks off everything; with an error that is not 0 all are told.
    void end(int error);

  private:
    Client &client;
    std::mutex mutex;
    std::deque<ContentRequest> waiting; // guarded by mutex
    std::deque<std::unique_ptr<ContentTask>> running;
};

} // namespace cloud
