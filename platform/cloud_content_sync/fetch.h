#pragma once
// One answer of the service as a file: received under a temporary name, checked, then renamed. Client thread only.
#include "cloud_content_sync/digest.h"
#include "cloud_content_sync/http.h"
#include <sys/types.h>

namespace cloud {

class Fetch {
  public:
    // The temporary file is made in `folder`. size_limit: an answer of more bytes is refused.
    Fetch(Http &http, std::string folder, mode_t mode, long long size_limit);
    // Breaks off what is under way and removes the temporary file.
    ~Fetch();
    Fetch(const Fetch &) = delete;
    Fetch &operator=(const Fetch &) = delete;

    // Sends `request`, a GET. `done` is called once; it must not destroy this object. False, without a call and with
    // nothing sent, when no file can be made in the folder.
    bool start(std::unique_ptr<Transfer> request, const Credentials &credentials, std::function<void()> done);

    // What came of it, for `done`.
    int error = 0; // one of cloud_content_sync_error_e
    long status = 0;
    std::string etag;
    long long size = 0; // bytes received

    // Gives the file its name, in the same folder; what has that name is replaced, also when it is a symbolic link.
    bool store(const std::string &target);

    // Removes what was received, unless it was stored.
    void discard();

  private:
    bool write(const char *data, size_t count);
    int check(const Transfer &transfer);

    Http &http;
    const std::string folder;
    const mode_t mode;
    const long long size_limit;
    std::string temporary;
    int fd = -1;
    bool local_failed = false;
    Sha256 checksum;
    Transfer *running = nullptr;
};

} // namespace cloud
