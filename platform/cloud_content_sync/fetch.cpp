#include "cloud_content_sync/fetch.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include <cerrno>
#include <cstdio>
#include <fcntl.h>
#include <glib.h>
#include <unistd.h>

namespace cloud {

// The disk begins to write early, so that the fsync at the end does not hold up the other transfers.
static constexpr long long WRITE_OUT_STEP = 8 << 20;

Fetch::Fetch(Http &h, std::string in, mode_t permissions, long long limit)
    : http(h), folder(std::move(in)), mode(permissions), size_limit(limit)
{
}

Fetch::~Fetch()
{
    http.abort(running);
    discard();
    if (fd >= 0)
        close(fd);
}

void Fetch::discard()
{
    if (!temporary.empty())
        unlink(temporary.c_str());
    temporary.clear();
}

bool Fetch::start(std::unique_ptr<Transfer> request, const Credentials &credentials, std::function<void()> done)
{
    std::string name = folder + "/.download-XXXXXX.part";
    fd = g_mkstemp_full(name.data(), O_WRONLY | O_CLOEXEC, static_cast<int>(mode));
    if (fd < 0) {
        error = CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
        return false;
    }
    temporary = std::move(name);
    request->method = "GET";
    request->write = [this](const char *data, size_t count) { return write(data, count); };
    request->done = [this, done = std::move(done)](Transfer &transfer) {
        running = nullptr;
        status = transfer.status;
        etag = transfer.etag;
        error = check(transfer);
        done();
    };
    running = http.start(std::move(request), credentials);
    return true;
}

bool Fetch::write(const char *data, size_t count)
{
    if (size + static_cast<long long>(count) > size_limit)
        return false;
    checksum.add(data, count);
    while (count > 0) {
        const ssize_t written = ::write(fd, data, count);
        if (written < 0 && errno == EINTR)
            continue;
        if (written <= 0) {
            local_failed = true;
            return false;
        }
        data += written;
        count -= static_cast<size_t>(written);
        size += written;
        if ((size - written) / WRITE_OUT_STEP != size / WRITE_OUT_STEP)
            sync_file_range(fd, 0, 0, SYNC_FILE_RANGE_WRITE);
    }
    return true;
}

int Fetch::check(const Transfer &transfer)
{
    if (local_failed)
        return CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
    if (transfer.result == CURLE_OK && (transfer.status == 404 || transfer.status == 410))
        return CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND;
    if (transfer.result != CURLE_OK || transfer.status != 200) {
        const int why = transfer.error();
        // The name was the service's own, so a refusal of it is the service's failure.
        return why == CLOUD_CONTENT_SYNC_ERROR_BAD_NAME ? CLOUD_CONTENT_SYNC_ERROR_SERVER : why;
    }
    const std::string digest = sha256_of(transfer.repr_digest);
    if (!digest.empty() && digest != checksum.hex())
        return CLOUD_CONTENT_SYNC_ERROR_CORRUPTED;
    return fdatasync(fd) == 0 ? 0 : CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
}

bool Fetch::store(const std::string &target)
{
    if (temporary.empty() || rename(temporary.c_str(), target.c_str()) != 0)
        return false;
    temporary.clear();
    return true;
}

} // namespace cloud
