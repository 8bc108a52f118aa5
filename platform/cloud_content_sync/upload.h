#pragma once
// One upload, from the opening of the local file to its last callback.
#include "cloud_content_sync/client.h"
#include "cloud_content_sync/dav.h"
#include "cloud_content_sync/digest.h"
#include "cloud_content_sync/ledger.h"
#include "cloud_content_sync/patience.h"
#include <optional>
#include <sys/stat.h>

namespace cloud {

// All functions on the client thread.
class Upload {
  public:
    Upload(Client &client, UploadRequest request);
    ~Upload();
    Upload(const Upload &) = delete;
    Upload &operator=(const Upload &) = delete;

    void start();
    // Reports progress and takes note of a cancel. It is called often, and never from within a libcurl callback, so
    // what it calls may do as it likes.
    void step();
    // When step() is to be called although nothing moves; nothing: there is no such time.
    std::optional<std::chrono::steady_clock::time_point> due() const;
    // Breaks it off; what is stored by now stays. The error is that of the last callback.
    void end(int error);
    bool has_ended() const
    {
        return ended;
    }

  private:
    // What a look at a server path found.
    enum class Found { ABSENT, SAME, DIFFERENT };
    struct Look {
        Found found = Found::ABSENT;
        int error = 0;              // not zero: the service could not be asked, `found` means nothing
        long long retry_after = -1; // seconds that the service has asked for, -1 when it has not
    };
    using LookDone = void (Upload::*)(const Look &);

    void resume();
    void hash_some();
    void resumed(const Look &look);
    void refused(const Look &look);
    void trouble(int error, long long retry_after = -1);
    void wait_step();
    int open_local();
    bool local_changed() const;
    bool local_is_what_was_sent() const;
    size_t read(char *buffer, size_t size);
    void put();
    void put_ended(const Transfer &transfer);
    void put_unanswered(const Transfer &transfer);
    void stored(const Transfer &transfer);
    void verified(const Look &look);
    void settled(const Look &look);
    void occupied(const Look &look);
    void try_next_name();
    void next_name_looked_at(const Look &look);
    // Compares what is stored under `target` with what was sent; by_digest false: only whether something is there.
    void look(bool by_digest, LookDone then);
    void looked(const Transfer &transfer, MultistatusReader &reader);
    void read_back();
    void finish_look(const Look &result);
    void request(std::unique_ptr<Transfer> transfer, void (Upload::*ended)(const Transfer &));
    void remove_stored(int error);
    void finish(int error);
    bool whole_file_read() const
    {
        return sent == local.st_size;
    }

    Client &client;
    const UploadRequest wanted;
    Credentials credentials;
    int fd = -1;
    struct stat local = {};
    std::optional<Sha256> checksum; // of the current attempt
    std::string digest;             // hexadecimal, once the file was read whole
    std::string target;             // server path of the current attempt
    long long sent = 0;             // bytes of the current attempt
    int percent = -1;               // last one reported
    int read_error = 0;
    int puts = 0;
    bool lost_reply = false; // an attempt for `target` ended without an answer
    bool is_unknown = false; // an attempt may have stored the file under `target`, and nobody has seen it there
    int put_error = 0;       // of the attempt that is being looked after
    LedgerRow record;        // in the book of uploads
    std::string who;         // whose upload it is
    Wait wait;               // for better times, before the next attempt
    bool is_hashing = false; // of what an earlier attempt has sent
    bool created = false;    // this request made what is stored under `target`
    std::string stored_etag;
    int names_tried = 0;
    int look_attempts = 0;
    bool look_by_digest = false;
    LookDone look_done = nullptr;
    Transfer *transfer_now = nullptr;
    bool is_putting = false;
    bool is_removing = false;
    bool ended = false;
};

} // namespace cloud
