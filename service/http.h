#pragma once
// What the handlers of requests share. All of it runs on the main loop.
#include "attempts.h"
#include "http_date.h"
#include "locks.h"
#include "metadata.h"
#include "oauth.h"
#include "server.h"
#include "sessions.h"
#include "workers.h"
#include <ctime>
#include <functional>

// Disturbances that tests ask for; see README.md.
struct Faults {
    int fail_count = 0, fail_status = 500; // the next fail_count PUT requests are answered with fail_status
    unsigned delay = 0;                    // milliseconds to wait after each 64 KiB of a PUT's body
    int lose_reply = 0;                    // the PUT (counted down) whose answer is lost
};

// What the pages for people need to know of the place where they are served.
struct Site {
    std::string base;     // as people see the service, behind a proxy; empty: as the request names it
    std::string callback; // where a browser goes after an answer; empty: base + "/auth_complete"
    bool registers = true;
};

struct Service {
    Db db;
    Accounts accounts;
    Metadata metadata;
    Locks locks;
    Fd files, temporary; // the folders of the accounts and of unfinished work, on one file system
    Fd thumbnails;
    std::string media_secret; // of the signatures of addresses
    Faults faults;
    Workers workers{4};
    Workers painters{2}; // of thumbnails: bounds their memory, and leaves time for others
    Workers hashers{2};  // of passwords
    Workers syncers{16}; // of finished uploads: they only wait for the disk
    Attempts attempts;   // at passwords
    RequestTokens request_tokens;
    Sessions sessions;
    Site site;
    int large_answers = 0; // being made or sent
};

struct Upload;

static const size_t FORM_AT_MOST = 64 << 10; // bytes of a form that a person sends, or of a call to sign in

// What an address belongs to. MEDIA proves by its signature who allowed it, OAUTH and PAGE see to that themselves, all
// others by credentials.
enum class Area { DAV, ACCOUNT_INFO, MEDIA_ADDRESS, MEDIA, THUMBNAIL, OAUTH, PAGE };

struct Request : Message {
    Service *service = nullptr;
    Account *account = nullptr; // borrowed
    Path path;                  // of the file or folder; empty until the address or the body has named it
    Area area = Area::DAV;
    std::vector<std::string> tokens;    // of locks, that the request has named
    Upload *upload = nullptr;           // owned; of a PUT whose body is being received
    int jobs = 0;                       // on other threads, for this request
    std::string body;                   // of methods other than PUT, as far as it has come
    std::shared_ptr<void> large_answer; // counted in the service while it lives

    ~Request() override;
    void got_headers() override;
    void got_body(const char *bytes, size_t size) override;
    void got_request() override;
    void ended() override;

    bool is(const char *wanted_method) const
    {
        return verb_is(wanted_method);
    }
    // The folder that holds path.name(), empty and errno when it cannot be opened. The path is not the root.
    Fd parent() const
    {
        return open_folder(account->folder.fd, path, path.parts.size() - 1);
    }
    // What is at the path; kind NONE when nothing is.
    Entry look_up() const;
    // The value of a field of the query (application/x-www-form-urlencoded), or "".
    std::string query_field(const char *name) const;
    // The same for a body that is a form.
    std::string form_field(const char *name) const;

  private:
    void authorize();
    void authorized();
};

// Answers a request whose body is still to come, and lets go of its upload.
void refuse(Request &request, int status);
// Answers 429: after so many seconds it may be tried again.
void refuse_for(Request &request, int seconds);
// The address of a header (RFC 4918, 8.3: absolute, or a path) as the request means it; null when it is none.
std::unique_ptr<GUri, decltype(&g_uri_unref)> read_address(const Request &request, const char *text);
// The status that the If-Match, If-None-Match and If-(Un)Modified-Since headers demand for a resource (RFC 9110, 13): 0
// to go on, 412, or 304 for GET and HEAD. An entry of kind NONE is a resource that does not exist.
int check_conditions(const Request &request, const Entry &entry);
// Reads the If header and keeps its tokens. 0 to go on, 412 when it does not hold, 400 when it cannot be read.
int check_if_header(Request &request);
// What a change touches: the content or properties of a resource; also its name, and so the folder it is in; also what
// is below it.
enum class Reach { CONTENT, NAME, NAME_AND_BELOW };
// Whether locks allow the change to somebody with the request's tokens; if not the answer is 423.
bool may_change(Request &request, const Path &path, Reach reach);
// Runs `work` on another thread while the request waits, then `done` on the main loop; `done` answers, or calls this
// again. Both run also when the client has gone meanwhile. `work` must touch nothing that the main loop uses.
// `workers` null: those of the service.
void in_thread(Request &request, std::function<void()> work, std::function<void()> done, Workers *workers = nullptr);
// The value of a Repr-Digest header (RFC 9530) for 64 hexadecimal digits.
std::string repr_digest(const std::string &sha256_hex);
std::string content_type(const std::string &name);

// One handler per method. They answer the request.
void dav_options(Request &request);
void dav_get(Request &request); // and HEAD
void dav_delete(Request &request);
void dav_mkcol(Request &request);
void dav_copy_move(Request &request, bool move);
void dav_propfind(Request &request);
void dav_proppatch(Request &request);
void dav_lock(Request &request);
void dav_unlock(Request &request);
// PUT: begin when the headers are there, chunk by chunk, finish with the end of the body; dropped when the connection
// broke before that.
void put_begin(Request &request);
void put_chunk(Request &request, const char *bytes, size_t size);
void put_finish(Request &request);
void put_drop(Request &request);

// The addresses of media.cpp and thumbnails.cpp. media_open makes the secret when it is missing; false when the
// database fails. media_account reads the path of a signed address; null when the signature does not prove it, or no
// more.
bool media_open(Service &service);
void media_address(Request &request);
Account *media_account(Request &request);
void media_get(Request &request); // and HEAD
void thumbnail(Request &request);
// Prepares for thumbnail(), and removes those that nobody has asked for in a month.
void thumbnails_begin(const Service &service);
