#include "cloud_content_sync/http.h"
#include "cloud_content_sync/names.h"
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <glib.h>
#include <string_view>
#include <utility>

namespace cloud {

static constexpr long CONNECT_SECONDS = 15;
// Of what comes; that of a list or a file is worth a larger one.
static constexpr long BUFFER_BYTES = 256 * 1024, SMALL_BUFFER_BYTES = 16 * 1024;
static constexpr long long UPLOAD_BYTES_MIN = 16 * 1024, UPLOAD_BYTES_MAX = 64 * 1024;

static constexpr char AUTH[] = "auth";
static constexpr int ATTEMPTS_MAX = 3;
// A large body is not sent with a nonce of which the service may have had enough.
static constexpr auto NONCE_FRESH = std::chrono::seconds(60);
static constexpr long long LARGE_BYTES = 1 << 20;

static bool may_be_digest(const Transfer &transfer)
{
    return transfer.url.empty() && !transfer.account.user.empty() && !transfer.account.secret.empty();
}

static size_t read_cb(char *buffer, size_t size, size_t count, void *data)
{
    auto *transfer = static_cast<Transfer *>(data);
    transfer->last_activity = std::chrono::steady_clock::now();
    return transfer->read(buffer, size * count);
}

// libcurl asks for the start again when a kept connection turned out dead. Whether the service took the body by then is
// for the caller to find out, so it is never sent a second time from here.
static int seek_cb(void *data, curl_off_t, int)
{
    static_cast<Transfer *>(data)->was_resent = true;
    return CURL_SEEKFUNC_FAIL;
}

static size_t write_cb(char *bytes, size_t size, size_t count, void *data)
{
    auto *transfer = static_cast<Transfer *>(data);
    transfer->last_activity = std::chrono::steady_clock::now();
    long status = 0;
    curl_easy_getinfo(transfer->easy.get(), CURLINFO_RESPONSE_CODE, &status);
    if (!transfer->write || status < 200 || status > 299)
        return size * count;
    return transfer->write(bytes, size * count) ? size * count : 0;
}

static void take_header(std::string_view line, const char *name, std::string &value)
{
    const size_t size = std::strlen(name);
    if (line.size() <= size || line[size] != ':' || g_ascii_strncasecmp(line.data(), name, size) != 0)
        return;
    line.remove_prefix(size + 1);
    const size_t first = line.find_first_not_of(" \t");
    const size_t last = line.find_last_not_of(" \t\r\n");
    value = first == line.npos || last == line.npos || last < first ? "" : line.substr(first, last - first + 1);
}

static size_t header_cb(char *bytes, size_t size, size_t count, void *data)
{
    auto *transfer = static_cast<Transfer *>(data);
    transfer->last_activity = std::chrono::steady_clock::now();
    const std::string_view line(bytes, size * count);
    if (line.substr(0, 5) == "HTTP/") {
        transfer->etag.clear();
        transfer->challenges.clear();
        transfer->repr_digest.clear();
        transfer->content_length.clear();
    }
    take_header(line, "ETag", transfer->etag);
    take_header(line, "Repr-Digest", transfer->repr_digest);
    take_header(line, "Content-Length", transfer->content_length);
    std::string challenge;
    take_header(line, "WWW-Authenticate", challenge);
    if (!challenge.empty())
        transfer->challenges.push_back(std::move(challenge));
    return size * count;
}

Http::Http(const Service &description) : service(description), multi(nullptr, curl_multi_cleanup)
{
    static const CURLcode initialised = curl_global_init(CURL_GLOBAL_DEFAULT);
    multi.reset(initialised == CURLE_OK ? curl_multi_init() : nullptr);
    if (!multi)
        std::abort();
}

Http::~Http()
{
    while (!transfers.empty())
        abort(transfers.begin()->second.get());
}

static void set_credentials(CURL *easy, const Credentials &credentials)
{
    if (credentials.secret.empty())
        return;
    if (credentials.user.empty()) {
        curl_easy_setopt(easy, CURLOPT_HTTPAUTH, CURLAUTH_BEARER);
        curl_easy_setopt(easy, CURLOPT_XOAUTH2_BEARER, credentials.secret.c_str());
    } else {
        curl_easy_setopt(easy, CURLOPT_HTTPAUTH, CURLAUTH_BASIC);
        curl_easy_setopt(easy, CURLOPT_USERNAME, credentials.user.c_str());
        curl_easy_setopt(easy, CURLOPT_PASSWORD, credentials.secret.c_str());
    }
}

// A service that asked for Digest is not sent the password again, for as long as that is remembered.
void Http::authorize(Transfer &transfer, const std::string &url)
{
    const bool is_digest = may_be_digest(transfer) && known.find(AUTH) == 1;
    if (!is_digest)
        return set_credentials(transfer.easy.get(), transfer.account);
    if (!challenge)
        return;
    const size_t path = url.find('/', url.find("://") + 3);
    const std::string header = digest_authorization(*challenge, transfer.account, transfer.method, url.substr(path));
    transfer.answered_nonce = challenge->nonce;
    transfer.header_list.reset(curl_slist_append(transfer.header_list.release(), header.c_str()));
}

static void set_body(CURL *easy, Transfer &transfer)
{
    if (transfer.read) {
        curl_easy_setopt(easy, CURLOPT_UPLOAD, 1L);
        curl_easy_setopt(easy, CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(transfer.body_size));
        curl_easy_setopt(easy, CURLOPT_READFUNCTION, read_cb);
        curl_easy_setopt(easy, CURLOPT_READDATA, &transfer);
        curl_easy_setopt(easy, CURLOPT_SEEKFUNCTION, seek_cb);
        curl_easy_setopt(easy, CURLOPT_SEEKDATA, &transfer);
        const long long piece = std::clamp<long long>(transfer.body_size, UPLOAD_BYTES_MIN, UPLOAD_BYTES_MAX);
        curl_easy_setopt(easy, CURLOPT_UPLOAD_BUFFERSIZE, static_cast<long>(piece));
        // Nothing has to be rewound to send an empty body twice, so libcurl would do it unasked on a dead connection.
        if (transfer.body_size == 0)
            curl_easy_setopt(easy, CURLOPT_FRESH_CONNECT, 1L);
    } else if (!transfer.body.empty() || transfer.method == "POST") {
        curl_easy_setopt(easy, CURLOPT_POSTFIELDSIZE, static_cast<long>(transfer.body.size()));
        curl_easy_setopt(easy, CURLOPT_POSTFIELDS, transfer.body.c_str());
    }
    if (transfer.method == "HEAD")
        curl_easy_setopt(easy, CURLOPT_NOBODY, 1L);
    curl_easy_setopt(easy, CURLOPT_CUSTOMREQUEST, transfer.method.c_str());
}

Transfer *Http::start(std::unique_ptr<Transfer> owned, const Credentials &credentials)
{
    Transfer &transfer = *owned;
    transfer.account = credentials;
    transfer.headers.emplace_back("Expect:");
    transfer.easy.reset(curl_easy_init());
    if (!transfer.easy)
        std::abort();
    transfer.stall_limit = std::chrono::seconds(service.stall_seconds);
    transfer.last_activity = std::chrono::steady_clock::now();
    transfers[transfer.easy.get()] = std::move(owned);
    if (must_knock(transfer)) {
        behind_knock.push_back(&transfer);
        knock();
    } else {
        launch(transfer);
    }
    return &transfer;
}

// A body that is not in memory is sent when it is known how to authenticate: a refusal would come after it.
bool Http::must_knock(const Transfer &transfer)
{
    if (!transfer.read || !may_be_digest(transfer) || known.find(AUTH) == 0)
        return false;
    const bool is_old = challenge && std::chrono::steady_clock::now() - challenge->came > NONCE_FRESH;
    return !challenge || (is_old && transfer.body_size >= LARGE_BYTES);
}

void Http::knock()
{
    if (knock_now)
        return;
    auto transfer = std::make_unique<Transfer>();
    transfer->method = "PROPFIND";
    transfer->path = "/";
    transfer->headers = {"Depth: 0"};
    transfer->done = [this](Transfer &done) {
        knock_now = nullptr;
        if (done.is_success() && !known.find(AUTH))
            known.remember(AUTH, 0);
        if (done.result == CURLE_OK && challenge)
            challenge->came = std::chrono::steady_clock::now();
        knocked();
    };
    knock_now = start(std::move(transfer), behind_knock.front()->account);
}

// Whatever came of it, those that waited find out for themselves.
void Http::knocked()
{
    const std::vector<Transfer *> all = std::exchange(behind_knock, {});
    for (Transfer *transfer : all) {
        transfer->last_activity = std::chrono::steady_clock::now();
        launch(*transfer);
    }
}

// Whether a refused request can be sent again, with an answer to the service's challenge.
bool Http::answer_challenge(Transfer &transfer)
{
    if (transfer.result != CURLE_OK || transfer.status != 401 || !may_be_digest(transfer) ||
        ++transfer.attempts >= ATTEMPTS_MAX)
        return false;
    auto next = digest_challenge(transfer.challenges);
    if (!next || next->nonce == transfer.answered_nonce)
        return false;
    challenge = std::move(next);
    known.remember(AUTH, 1);
    return !transfer.read || (transfer.rewind && transfer.rewind());
}

bool Http::send_again(CURL *easy, CURLcode result)
{
    const auto found = transfers.find(easy);
    if (found == transfers.end())
        return false;
    Transfer &transfer = *found->second;
    transfer.result = result;
    curl_easy_getinfo(easy, CURLINFO_RESPONSE_CODE, &transfer.status);
    if (!answer_challenge(transfer))
        return false;
    std::unique_ptr<Transfer> owned = std::move(found->second);
    transfers.erase(found);
    curl_multi_remove_handle(multi.get(), easy);
    transfer.header_list.reset();
    transfer.easy.reset(curl_easy_init());
    if (!transfer.easy)
        std::abort();
    transfer.last_activity = std::chrono::steady_clock::now();
    transfers[transfer.easy.get()] = std::move(owned);
    launch(transfer);
    return true;
}

void Http::launch(Transfer &transfer)
{
    CURL *easy = transfer.easy.get();
    const std::string url = transfer.url.empty() ? service.storage + percent_encode(transfer.path) : transfer.url;
    curl_easy_setopt(easy, CURLOPT_URL, url.c_str());
    curl_easy_setopt(easy, CURLOPT_PATH_AS_IS, 1L);
    curl_easy_setopt(easy, CURLOPT_PROTOCOLS_STR, "http,https");
    curl_easy_setopt(easy, CURLOPT_FOLLOWLOCATION, 0L);
    curl_easy_setopt(easy, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(easy, CURLOPT_QUICK_EXIT, 1L); // an abort does not wait for the name resolver
    curl_easy_setopt(easy, CURLOPT_CONNECTTIMEOUT, CONNECT_SECONDS);
    curl_easy_setopt(easy, CURLOPT_BUFFERSIZE, transfer.write ? BUFFER_BYTES : SMALL_BUFFER_BYTES);
    curl_easy_setopt(easy, CURLOPT_WRITEFUNCTION, write_cb);
    curl_easy_setopt(easy, CURLOPT_WRITEDATA, &transfer);
    curl_easy_setopt(easy, CURLOPT_HEADERFUNCTION, header_cb);
    curl_easy_setopt(easy, CURLOPT_HEADERDATA, &transfer);
    if (!service.ca_file.empty()) { // these and no others
        curl_easy_setopt(easy, CURLOPT_CAINFO, service.ca_file.c_str());
        curl_easy_setopt(easy, CURLOPT_CAPATH, nullptr);
    }
    if (transfer.time_limit.count() > 0) {
        transfer.stall_limit = transfer.time_limit;
        curl_easy_setopt(easy, CURLOPT_TIMEOUT, static_cast<long>(transfer.time_limit.count()));
        // On a kept connection that turns out dead libcurl would send it again.
        curl_easy_setopt(easy, CURLOPT_FRESH_CONNECT, 1L);
        curl_easy_setopt(easy, CURLOPT_FORBID_REUSE, 1L); // or each would leave a connection behind
    }
    set_body(easy, transfer);
    for (const std::string &header : transfer.headers)
        transfer.header_list.reset(curl_slist_append(transfer.header_list.release(), header.c_str()));
    authorize(transfer, url);
    curl_easy_setopt(easy, CURLOPT_HTTPHEADER, transfer.header_list.get());
    if (curl_multi_add_handle(multi.get(), easy) != CURLM_OK)
        std::abort();
}

void Http::abort(Transfer *transfer)
{
    const auto found = transfer ? transfers.find(transfer->easy.get()) : transfers.end();
    if (found == transfers.end())
        return;
    std::erase(behind_knock, transfer);
    curl_multi_remove_handle(multi.get(), found->first);
    transfers.erase(found);
}

void Http::finish(CURL *easy, CURLcode result)
{
    const auto found = transfers.find(easy);
    if (found == transfers.end())
        return;
    const std::unique_ptr<Transfer> transfer = std::move(found->second);
    transfers.erase(found);
    curl_multi_remove_handle(multi.get(), easy);
    transfer->result = result;
    curl_easy_getinfo(easy, CURLINFO_RESPONSE_CODE, &transfer->status);
    curl_off_t seconds = 0;
    if (curl_easy_getinfo(easy, CURLINFO_RETRY_AFTER, &seconds) == CURLE_OK)
        transfer->retry_after = seconds;
    transfer->done(*transfer);
}

void Http::dispatch()
{
    int left = 0;
    while (const CURLMsg *message = curl_multi_info_read(multi.get(), &left))
        if (message->msg == CURLMSG_DONE && !send_again(message->easy_handle, message->data.result))
            finish(message->easy_handle, message->data.result);
}

void Http::end_stalled()
{
    const auto now = std::chrono::steady_clock::now();
    std::vector<CURL *> stalled;
    for (const auto &[easy, transfer] : transfers)
        if (!std::ranges::count(behind_knock, transfer.get()) &&
            now - transfer->last_activity > std::max(transfer->stall_limit, std::chrono::seconds(1)))
            stalled.push_back(easy);
    for (CURL *easy : stalled)
        finish(easy, CURLE_OPERATION_TIMEDOUT);
}

bool Http::run(std::chrono::milliseconds wait, int fd)
{
    runner = std::this_thread::get_id();
    int running = 0;
    curl_multi_perform(multi.get(), &running);
    dispatch();
    end_stalled();
    if (std::exchange(is_woken, false))
        return false;
    curl_waitfd other = {.fd = fd, .events = CURL_WAIT_POLLIN, .revents = 0};
    curl_multi_poll(multi.get(), &other, fd >= 0 ? 1 : 0, static_cast<int>(wait.count()), nullptr);
    return other.revents != 0;
}

void Http::wake()
{
    // A callback of this thread's own needs no system calls to be heard.
    if (runner.load() == std::this_thread::get_id()) {
        is_woken = true;
        return;
    }
    curl_multi_wakeup(multi.get());
}

} // namespace cloud
