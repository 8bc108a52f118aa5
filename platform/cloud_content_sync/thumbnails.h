#pragma once
// Thumbnails of pictures, fetched in the background from a service that makes them.
#include "cloud_content_sync/account.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include <chrono>
#include <condition_variable>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <vector>

namespace cloud {

class Client;
class Fetch;

class Thumbnails {
  public:
    explicit Thumbnails(Client &client);
    ~Thumbnails();
    Thumbnails(const Thumbnails &) = delete;
    Thumbnails &operator=(const Thumbnails &) = delete;

    // Any thread.
    // The file of the current thumbnail, when it is there.
    std::optional<std::string> find(const ContentRow &row);
    // Fetches the thumbnail when there is time for it. What was asked for last comes first, and what waits longest is
    // forgotten when too much waits; what failed is not tried again.
    void want(const ContentRow &row);
    // The former callback does not run any more on return, but for the one from within which this is called.
    void set_cb(cloud_content_sync_thumbnail_cb cb, void *user_data);

    // The client thread only.
    void step(bool may_start);
    // Breaks off and forgets everything that was asked for.
    void end();

  private:
    struct Wish {
        ContentRow row;
        std::string file; // where it is to be kept
    };
    struct Running;
    std::string file_of(const ContentRow &row) const;
    bool start(Wish wish);
    void fetched(Running &one);
    void report(const ContentRow &row);

    Client &client;
    std::mutex mutex; // guards all up to the empty line
    std::condition_variable callback_ended;
    std::deque<Wish> waiting;       // first the one to be fetched next
    std::set<std::string> underway; // files
    std::set<std::string> failed;   // files
    cloud_content_sync_thumbnail_cb cb = nullptr;
    void *cb_data = nullptr;
    bool is_calling = false;

    std::vector<std::unique_ptr<Running>> running; // client thread
    std::chrono::steady_clock::time_point pause_end;
    unsigned stored = 0;
};

} // namespace cloud
