// Uploads: the body goes to a temporary file as it arrives, and the finished file to its name in one step.
#include "http.h"
#include "secrets.h"
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>

static const int64_t DELAY_STEP = 64 << 10;
// Written-back in steps while the body arrives, so that the final fsync has little left to wait for.
static const int64_t FLUSH_STEP = 8 << 20;

struct Upload {
    Service *service = nullptr;
    Account *account = nullptr;
    std::string temporary;
    Fd file, folder; // the folder that it goes to, in the end
    Sha256 sha256;
    std::string wanted_digest; // hexadecimal, of the client's Repr-Digest; or empty
    bool only_new = false;     // If-None-Match: *
    int64_t length = -1;       // as announced; -1 for a chunked body
    int64_t received = 0;
    int64_t replaced = 0; // bytes of the file that it takes the place of
    int64_t reserved = 0; // this upload's share of account->reserved
    int64_t flushed = 0;
    int sync_error = 0; // errno of the final fsync
    guint pause_timer = 0;

    void sync()
    {
        sync_error = fsync(file.fd) == 0 ? 0 : errno;
    }
};

void put_drop(Request &request)
{
    if (!request.upload || request.jobs)
        return; // a body that is being written to the disk is complete: it is stored even if nobody waits for it
    Upload *upload = std::exchange(request.upload, nullptr);
    upload->account->reserved -= upload->reserved;
    if (upload->file)
        unlinkat(upload->service->temporary.fd, upload->temporary.c_str(), 0);
    if (upload->pause_timer)
        g_source_remove(upload->pause_timer);
    delete upload;
}

// Makes room for an upload of `bytes` in all; false when the account's quota does not allow it.
static bool reserve(Upload &upload, int64_t bytes)
{
    const int64_t more = std::max<int64_t>(0, bytes - upload.replaced) - upload.reserved;
    if (more > upload.account->left())
        return false;
    upload.reserved += more;
    upload.account->reserved += more;
    return true;
}

// The SHA-256 of a Repr-Digest header as hexadecimal digits: empty when it has none. False when it cannot be read.
static bool read_repr_digest(const char *header, std::string &digest)
{
    // A dictionary of byte sequences (RFC 9651): none of them holds a comma.
    char **members = g_strsplit(header, ",", -1);
    std::string text;
    for (char **member = members; *member; member++)
        if (g_str_has_prefix(g_strstrip(*member), "sha-256="))
            text = *member + std::strlen("sha-256=");
    g_strfreev(members);
    if (text.empty())
        return true;
    gsize size = 0;
    if (text.size() != 46 || text.front() != ':' || text.back() != ':') // 32 bytes are 44 characters
        return false;
    const std::unique_ptr<guchar, decltype(&g_free)> bytes(g_base64_decode(text.substr(1, 44).c_str(), &size), g_free);
    digest = hex(std::string(reinterpret_cast<char *>(bytes.get()), size));
    return size == 32;
}

// Whether the upload may go where it wants to: 0 or the status.
static int check_target(Request &request, const Fd &folder, Entry &entry)
{
    if (request.path.root() || request.path.slash)
        return 405;
    if (!folder)
        return errno == ENOENT || errno == ENOTDIR ? 409 : status_of_errno(errno);
    entry = look(folder.fd, request.path.name());
    if (const int status = check_conditions(request, entry))
        return status;
    if (entry.kind == Entry::FOLDER || entry.kind == Entry::ODD)
        return entry.kind == Entry::FOLDER ? 405 : 403;
    return may_change(request, request.path, entry.kind == Entry::NONE ? Reach::NAME : Reach::CONTENT) ? 0 : 423;
}

void put_begin(Request &request)
{
    Service &service = *request.service;
    if (service.faults.fail_count > 0) {
        service.faults.fail_count--;
        return refuse(request, service.faults.fail_status);
    }
    const char *coding = request.header("Content-Encoding");
    if (coding && g_ascii_strcasecmp(coding, "identity") != 0)
        return refuse(request, 415);
    Entry old;
    const Fd folder = request.path.root() ? Fd() : request.parent();
    if (const int status = request.header("Content-Range") ? 400 : check_target(request, folder, old))
        return refuse(request, status);

    request.upload = new Upload;
    Upload &upload = *request.upload;
    upload.service = &service;
    upload.account = request.account;
    upload.replaced = old.size;
    const char *none_match = request.header("If-None-Match");
    upload.only_new = none_match && std::strcmp(none_match, "*") == 0;
    upload.length = request.body_length();
    const char *digest = request.header("Repr-Digest");
    if (digest && !read_repr_digest(digest, upload.wanted_digest))
        return refuse(request, 400);
    if (!reserve(upload, std::max<int64_t>(0, upload.length)))
        return refuse(request, 507);
    upload.temporary = temporary_name("upload");
    upload.file =
        Fd(openat(service.temporary.fd, upload.temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666));
    if (!upload.file)
        return refuse(request, status_of_errno(errno));
    // A full disk is better known now than after the body. Not every file system can tell.
    if (upload.length > 0 && fallocate(upload.file.fd, FALLOC_FL_KEEP_SIZE, 0, upload.length) != 0 && errno == ENOSPC)
        refuse(request, 507);
}

static gboolean go_on(gpointer data)
{
    auto *request = static_cast<Request *>(data);
    request->upload->pause_timer = 0;
    request->unpause();
    return G_SOURCE_REMOVE;
}

void put_chunk(Request &request, const char *bytes, size_t size)
{
    Upload &upload = *request.upload;
    const int64_t before = upload.received;
    upload.received += static_cast<int64_t>(size);
    if (upload.length < 0 && !reserve(upload, upload.received))
        return refuse(request, 507);
    upload.sha256.add(bytes, size);
    for (gsize written = 0; written < size;) {
        const ssize_t count = write(upload.file.fd, bytes + written, size - written);
        if (count < 0 && errno != EINTR)
            return refuse(request, status_of_errno(errno));
        written += count > 0 ? static_cast<gsize>(count) : 0;
    }
    if (upload.received - upload.flushed >= FLUSH_STEP) {
        sync_file_range(upload.file.fd, upload.flushed, upload.received - upload.flushed, SYNC_FILE_RANGE_WRITE);
        upload.flushed = upload.received;
    }
    const unsigned delay = request.service->faults.delay;
    if (delay && before / DELAY_STEP != upload.received / DELAY_STEP && !upload.pause_timer) {
        request.pause();
        const auto steps = static_cast<unsigned>(upload.received / DELAY_STEP - before / DELAY_STEP);
        upload.pause_timer = g_timeout_add(delay * steps, go_on, &request);
    }
}

// Puts the whole file to its name, not yet for good. The result is 201, 204 or the status of what went wrong.
static int store(Request &request)
{
    Upload &upload = *request.upload;
    Service &service = *request.service;
    const std::string digest = hex(upload.sha256.finish());
    if (upload.length >= 0 && upload.received != upload.length)
        return 400;
    if (!upload.wanted_digest.empty() && upload.wanted_digest != digest)
        return 400;
    if (upload.sync_error)
        return status_of_errno(upload.sync_error);
    // Much may have happened while the body arrived.
    Entry old;
    upload.folder = request.parent();
    if (const int status = check_target(request, upload.folder, old))
        return status;
    int64_t freed = 0;
    std::string aside; // stays empty: no folder is replaced
    const int status =
        move_entry(service.temporary.fd, upload.temporary, upload.folder.fd, request.path.name(),
                   upload.only_new ? Overwrite::NO : Overwrite::YES, service.temporary.fd, &freed, &aside);
    if (status >= 300)
        return status;
    upload.file = Fd();
    request.account->count(upload.received - freed);
    if (status == 201)
        service.metadata.forget_file(*request.account, request.path);
    const Entry entry = look(upload.folder.fd, request.path.name());
    service.metadata.set_digest(*request.account, request.path.folder(), entry, digest);
    request.set_header("ETag", entry.etag());
    request.set_header("Repr-Digest", repr_digest(digest));
    return status;
}

static void finish(Request &request, int status)
{
    put_drop(request);
    request.answer(status);
    if (status < 300 && request.service->faults.lose_reply > 0 && --request.service->faults.lose_reply == 0)
        request.cut();
}

// The content and then its name are on the disk before the answer is given. Both wait on threads of their own, so that
// the uploads of several connections wait at the same time: file systems take such waits together.
void put_finish(Request &request)
{
    if (!request.upload)
        return request.answer(500);
    Upload *upload = request.upload;
    const auto sync_name = [&request, upload] {
        const int status = store(request);
        if (status >= 300)
            return finish(request, status);
        in_thread(
            request, [upload] { fsync(upload->folder.fd); }, [&request, status] { finish(request, status); },
            &request.service->syncers);
    };
    in_thread(
        request, [upload] { upload->sync(); }, sync_name, &request.service->syncers);
}
