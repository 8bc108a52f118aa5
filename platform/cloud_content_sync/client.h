#pragma once
// The client of one handle: its requests, and the one thread on which they run and call back.
#include "cloud_content_sync/account.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/http.h"
#include "cloud_content_sync/ledger.h"
#include "cloud_content_sync/patience.h"
#include "cloud_content_sync/service.h"
#include "connection/connection.h"
#include <condition_variable>
#include <deque>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <thread>
#include <vector>

namespace cloud {

class Auth;
class Contents;
class Refresh;
class Storage;
class Thumbnails;
class Upload;

struct UploadRequest {
    int id = 0;
    std::string local_path;
    std::string server_path;
    cloud_content_sync_transfer_cb cb = nullptr;
    void *user_data = nullptr;
};

struct RefreshRequest {
    cloud_content_sync_refresh_cb cb = nullptr;
    void *user_data = nullptr;
};

class Client : public std::enable_shared_from_this<Client> {
  public:
    Client(Service service, std::shared_ptr<Account> account);
    ~Client();
    Client(const Client &) = delete;
    Client &operator=(const Client &) = delete;

    // Any thread.
    void start();
    // No callback runs any more when this returns, but for the one from within which it is called.
    void stop();
    // *id is written before the request can call back.
    void upload(UploadRequest request, int *id);
    // With keeps_entry an upload's entry in the book stays, for another process to go on with.
    // False when no such request is queued or running. In both cases no callback of it runs any more on return, but for
    // the one from within which this is called.
    bool cancel(int id, bool keeps_entry = false);
    void refresh(RefreshRequest request);
    std::optional<std::string> uploaded_path(int id);
    // What the upload that runs waits for, and the seconds until it is tried again.
    cloud_content_sync_wait_e waiting_for(int *seconds);
    // A new request's id, to be cancelled by; 0 after stop().
    int new_request();
    bool is_stopping();
    bool on_own_thread() const
    {
        return std::this_thread::get_id() == thread_id;
    }
    const std::unique_ptr<Auth> auth;
    const std::unique_ptr<Contents> contents;
    const std::unique_ptr<Storage> storage;
    const std::unique_ptr<Thumbnails> thumbnails;

    const Service service;
    const std::shared_ptr<Account> account;
    Ledger ledger;

    // The client thread only, for what runs on it.
    Http http;
    Patience patience;
    // Between the two whoever asks for waiting_for() is told. retry_after: as Patience::next has it.
    Wait wait_begin(long long retry_after);
    void wait_end();
    bool has_network_changed() const // since the wait began
    {
        return network_changed;
    }
    bool is_kept(int id);
    bool is_wanted(int id); // neither cancelled nor stopped
    // Around a callback of a request. False when the request is not wanted any more: there is no callback then.
    bool begin_callback(int id, bool is_last);
    void end_callback();
    void report_progress(const UploadRequest &request, int percent);
    // The request's last callback; the file is of the account `who`. False, and nothing done, when the request is not
    // wanted any more.
    // `record` is taken out of the book with it.
    bool report_done(const UploadRequest &request, const ContentRow &stored, const std::string &who,
                     const LedgerRow &record);
    void report_failed(const UploadRequest &request, int error);
    void report_refreshed(const RefreshRequest &request, int error);
    // Ends all requests but those of a sign-in; the error, not 0, is that of their last callbacks.
    void end_requests(int error);
    // What uploads have stored since the running refresh began.
    std::vector<ContentRow> stored_meanwhile;

  private:
    void loop();
    void rest();
    void step_upload();
    bool begin_next_upload();
    void step_refresh();

    std::mutex mutex;
    std::condition_variable callback_ended;
    bool stopping = false;
    int last_id = 0;
    int calling = 0;    // request whose callback runs now
    std::set<int> kept; // were cancelled, but for their entries in the book
    std::set<int> live; // queued or running, and not cancelled
    std::deque<UploadRequest> upload_queue;
    std::vector<RefreshRequest> refresh_queue;
    std::map<int, std::string> landed;
    Wait wait; // what the upload that runs waits for

    std::unique_ptr<Upload> running_upload; // client thread
    // Uploads for which the next one does not wait: they were cancelled and clean up, or what they have stored is
    // looked at. Client thread.
    std::vector<std::unique_ptr<Upload>> beside;
    std::unique_ptr<Refresh> running_refresh; // client thread
    connection_watch_h network = nullptr;     // while an upload waits for it; client thread
    bool network_changed = false;             // client thread
    std::thread thread;
    std::thread::id thread_id;
};

} // namespace cloud
