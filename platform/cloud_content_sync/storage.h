#pragma once
// How much of the account's storage is used (RFC 4331), one question after the other.
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/dav.h"
#include "cloud_content_sync/http.h"
#include <deque>
#include <memory>
#include <mutex>
#include <optional>

namespace cloud {

class Client;

class Storage {
  public:
    explicit Storage(Client &client);
    ~Storage();
    Storage(const Storage &) = delete;
    Storage &operator=(const Storage &) = delete;

    // Any thread.
    void ask(cloud_content_sync_storage_cb cb, void *user_data);
    // False when there was no question with this user_data. No callback of one runs any more on return, but for the
    // one from within which this is called.
    bool cancel(void *user_data);

    // The client thread only. Starts what waits and takes note of cancels.
    void step();
    // Ends all questions; an error other than 0 is what they are answered with.
    void end(int error);

  private:
    struct Question {
        int id = 0;
        cloud_content_sync_storage_cb cb = nullptr;
        void *user_data = nullptr;
    };
    void start();
    void answer(int error, unsigned long long total, unsigned long long used);
    void drop(int id);

    Client &client;
    std::mutex mutex; // guards what follows
    std::deque<Question> questions;

    std::optional<Question> running; // client thread, like all that follows
    Transfer *transfer = nullptr;
};

} // namespace cloud
