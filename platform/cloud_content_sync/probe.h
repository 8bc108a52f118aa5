#pragma once
// Finds out by two files of its own how a service keeps a file from being replaced. They have temporary names in the
// folder that is to be uploaded to, and are deleted at the end.
#include "cloud_content_sync/http.h"

namespace cloud {

// The client thread.
class Probe {
  public:
    // Both outlive it; `who` is the account, `folder` a server path.
    Probe(Http &http, Credentials credentials, std::string who, std::string folder);
    // Breaks it off; what is left on the service is deleted by a later upload.
    ~Probe();
    Probe(const Probe &) = delete;
    Probe &operator=(const Probe &) = delete;

    // `done` is called once, with one of cloud_content_sync_error_e, when everything is deleted again. It may destroy
    // the probe. With 0 the known "way" of the service has been remembered; it is not when the probe was cancelled.
    void start(std::function<void(int error)> done);
    // Deletes what is there and ends, with 0.
    void cancel();

  private:
    using Next = void (Probe::*)(const Transfer &);
    void put(const std::string &path, Next next);
    void not_stored(const Transfer &transfer);
    void first_stored(const Transfer &transfer);
    void tried_again(const Transfer &transfer);
    void second_stored(const Transfer &transfer);
    void move();
    void moved(const Transfer &transfer);
    void folder_looked_at(const Transfer &transfer);
    void send(std::unique_ptr<Transfer> transfer, Next next);
    void decide(Way way);
    void clean(int error);
    void deleted(const Transfer &transfer);

    Http &http;
    const Credentials credentials;
    const std::string who, folder;
    std::function<void(int)> ended;
    Transfer *transfer_now = nullptr;
    std::string first, second;
    std::vector<std::string> made;
    size_t sent = 0;
    int error = 0;
    bool is_hidden = true, is_cancelled = false, is_cleaning = false;
};

// The headers of a MOVE to a server path that must not replace anything. The target is given as an address, or as a
// path where that is what the service takes.
std::vector<std::string> move_headers(Http &http, const std::string &target);

} // namespace cloud
