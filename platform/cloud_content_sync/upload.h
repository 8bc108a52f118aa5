#pragma once
// One upload, from the opening of the local file to its last callback.
#include "cloud_content_sync/client.h"
#include "cloud_content_sync/dav.h"
#include "cloud_content_sync/digest.h"
#include "cloud_content_sync/ledger.h"
#include "cloud_content_sync/patience.h"
#include "cloud_content_sync/probe.h"
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
    // Whether the next upload need not wait for the end of this one.
    bool may_step_aside() const
    {
        return is_checking || !is_wanted();
    }
    // What is stored could not be looked at: it goes on when nothing else is uploaded, by go_on().
    bool is_deferred() const
    {
        return doubt && is_wanted();
    }
    void go_on();
    // Whether another upload to this server path has to wait for it.
    bool concerns(const std::string &path) const
    {
        return (!is_checking || !is_wanted()) && (path == target || path == wanted.server_path);
    }
    // Breaks it off; what is stored by now stays. The error is that of the last callback.
    void end(int error);
    bool has_ended() const
    {
        return ended;
    }

  private:
    bool is_wanted() const
    {
        return client.is_wanted(wanted.id);
    }
    // What a look at a server path found.
    enum class Found { ABSENT, SAME, DIFFERENT };
    struct Look {
        Found found = Found::ABSENT;
        int error = 0;              // not zero: the service could not be asked, `found` means nothing
        long long retry_after = -1; // seconds that the service has asked for, -1 when it has not
    };
    using LookDone = void (Upload::*)(const Look &);

    void resume();
    void hash(LookDone then);
    void hash_some();
    void resumed(const Look &look);
    void refused(const Look &look);
    void trouble(int error, long long retry_after = -1);
    void wait_step();
    int open_local();
    bool local_changed() const;
    bool local_is_what_was_sent() const;
    size_t read(char *buffer, size_t size);
    bool begin_body();
    void put();
    void put_ended(const Transfer &transfer);
    void put_unanswered(const Transfer &transfer);
    void stored(const Transfer &transfer);
    void verified(const Look &look);
    void settled(const Look &look);
    void occupied(const Look &look);
    void try_next_name();
    // upload_place.cpp: where and how the file is stored without replacing another.
    void prepare();
    void delete_left_behind();
    void left_behind_deleted(const Transfer &transfer);
    void choose_way();
    bool place();
    const std::string &where() const
    {
        return temporary.empty() ? target : temporary;
    }
    void delete_temporary(std::function<void()> then);
    void send_deletion();
    void temporary_deleted(const Transfer &transfer);
    void delete_again();
    bool renew_temporary();
    void move();
    void moved(const Transfer &transfer);
    void arrived(const std::string &etag);
    void temporary_looked_at(const Look &look);
    void target_looked_at(const Look &look);
    bool is_folder_in_doubt(long status, int error);
    void folder_looked_at(const Look &look);
    // Compares what is stored with what was sent, as thoroughly as the service and its description ask for.
    void check_stored();
    void note_digest(bool is_there);
    void head_ended(const Transfer &transfer);
    void checked(const Look &look);
    void next_name_looked_at(const Look &look);
    void is_there_already();
    // Compares what is stored under `path` (empty: where()) with what was sent; by_digest false: only whether something
    // is there.
    void look(bool by_digest, LookDone then, const std::string &path = "");
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
    bool lost_reply = false;     // an attempt for `target` ended without an answer
    bool is_unknown = false;     // an attempt may have stored the file under `target`, and nobody has seen it there
    bool is_seen_absent = false; // it was not there after the last attempt, but may still come
    long put_status = 0;         // HTTP's, or 0
    int put_error = 0;           // of the attempt that is being looked after
    LedgerRow record;            // in the book of uploads
    std::string who;             // whose upload it is
    Wait wait;                   // for better times, before the next attempt
    bool is_hashing = false;     // of what an earlier attempt has sent
    bool created = false;        // this request made what is stored under `target`
    std::string stored_etag;
    int names_tried = 0;
    int look_attempts = 0;
    int breaks = 0; // of connections in the middle of a body
    std::string look_path;
    bool look_by_digest = false;
    std::optional<Look> doubt; // what that has told in place of how it is
    LookDone look_done = nullptr, after_hash = nullptr;
    Transfer *transfer_now = nullptr;
    std::unique_ptr<Probe> probe;
    std::vector<std::string> left_behind; // of earlier uploads, to be deleted
    std::string temporary;                // server path, while the file is not under its own name
    bool is_prepared = false;
    bool is_temporary_whole = false; // and verified
    bool is_broken_off = false;      // a PUT to it was; the service may still be at work on it
    bool was_broken_off = false;     // and it was deleted once
    std::function<void()> after_deletion;
    std::optional<std::chrono::steady_clock::time_point> delete_again_at;
    int moves = 0;
    int folder_error = 0;
    bool is_checking = false; // what is stored under its name is looked at
    bool is_putting = false;
    bool is_moving = false;
    bool is_removing = false;
    bool ended = false;
};

} // namespace cloud
