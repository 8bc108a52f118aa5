#pragma once
// HTTP requests of one thread: a libcurl multi handle whose connections are kept alive between requests. Redirects are
// never followed, so the credentials never leave the host of the service's description.
#include "cloud_content_sync/credentials.h"
#include "cloud_content_sync/http_digest.h"
#include "cloud_content_sync/known.h"
#include <atomic>
#include <chrono>
#include <curl/curl.h>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace cloud {

// Answers of `read` besides a number of bytes.
inline constexpr size_t READ_FAILED = CURL_READFUNC_ABORT;

struct Transfer {
    // The request.
    std::string method;
    std::string path; // server path below the storage's root; a folder's ends in "/"
    std::string url;  // instead of path: an address of the account interface
    std::vector<std::string> headers;
    std::string body;
    std::function<size_t(char *, size_t)> read; // instead of body: source of exactly body_size bytes, or READ_FAILED
    long long body_size = 0;
    // Begins the source again, which has to do with a refusal of the whole request alone; without it, or when it
    // answers false, a body is sent once.
    std::function<bool()> rewind;
    // Of the whole request, beside the limit for stalls; 0: none. With one the request is sent once alone.
    std::chrono::seconds time_limit{0};
    std::function<bool(const char *, size_t)> write; // takes the answer's body when its status is 2xx; false ends it
    std::function<void(Transfer &)> done;            // called once, unless the transfer is aborted

    // What came of it.
    CURLcode result = CURLE_OK;
    long status = 0;
    std::string content_length; // as the answer's header has it
    std::string etag;
    std::string repr_digest;
    long long retry_after = 0; // seconds, by the service's Retry-After; 0: it gave none
    bool was_resent = false;   // libcurl found the connection dead and wanted to send the body a second time

    // Kept by Http.
    Credentials account;
    std::vector<std::string> challenges; // of a 401
    std::string answered_nonce;          // the nonce that it was sent with
    int attempts = 0;
    std::chrono::seconds stall_limit{60};
    std::chrono::steady_clock::time_point last_activity;
    std::unique_ptr<CURL, decltype(&curl_easy_cleanup)> easy{nullptr, curl_easy_cleanup};
    std::unique_ptr<curl_slist, decltype(&curl_slist_free_all)> header_list{nullptr, curl_slist_free_all};

    bool is_success() const
    {
        return result == CURLE_OK && status >= 200 && status < 300;
    }
    // The request cannot have reached the service.
    bool never_sent() const;
    // The service is busy: the seconds to wait before the next attempt, 0 when it names none; -1 when it is not.
    long long asks_to_wait() const;
    // The answer does not say whether the request was carried out: who answers, or passes the answer on, gave up.
    bool leaves_open() const;
    // One of cloud_content_sync_error_e for a request that did not succeed.
    int error() const;
};

// The SHA-256 among the digests of a Repr-Digest header (RFC 9530, 3) in hexadecimal digits, or "".
std::string sha256_of(const std::string &repr_digest);

class Http {
  public:
    explicit Http(const Service &service);
    ~Http();
    Http(const Http &) = delete;
    Http &operator=(const Http &) = delete;

    // The transfer stays valid until its done() has returned, or until it is aborted.
    // Without a secret it goes without credentials.
    Transfer *start(std::unique_ptr<Transfer> transfer, const Credentials &credentials);
    // Ends a transfer and closes its connection; done() is not called. Null is allowed.
    void abort(Transfer *transfer);
    // Moves data, calls the done() of what has ended, and waits for more to do, at most `wait`. The wait ends as well
    // when the descriptor `fd` can be read, which is answered; -1: there is none.
    bool run(std::chrono::milliseconds wait, int fd = -1);
    bool is_idle() const // nothing is under way
    {
        return transfers.empty();
    }
    // Ends the wait of run(), or of the next one. Any thread.
    void wake();
    // The root URL of the WebDAV tree, without a final "/".
    const std::string &storage() const
    {
        return service.storage;
    }

  private:
    void launch(Transfer &transfer);
    void authorize(Transfer &transfer, const std::string &url);
    bool must_knock(const Transfer &transfer);
    void knock();
    void knocked();
    bool answer_challenge(Transfer &transfer);
    bool send_again(CURL *easy, CURLcode result);
    void dispatch();
    void end_stalled();
    void finish(CURL *easy, CURLcode result);

    const Service service;
    std::optional<DigestChallenge> challenge; // of the tree, when it asks for Digest
    std::vector<Transfer *> behind_knock;     // they are sent when the one that is under way has its answer
    Transfer *knock_now = nullptr;
    std::atomic<std::thread::id> runner; // the thread of run()
    bool is_woken = false;               // by that thread

  public:
    Known known{service};

  private:
    std::unique_ptr<CURLM, decltype(&curl_multi_cleanup)> multi;
    std::map<CURL *, std::unique_ptr<Transfer>> transfers;
};

} // namespace cloud
