// GET and HEAD: files are read from the disk as the connection takes them.
#include "http.h"
#include <cerrno>
#include <cstring>
#include <fcntl.h>

// The one range of the Range header; the whole file when there is none, or several, or If-Range names another version.
// False when it lies outside the file.
static bool chosen_range(const Request &request, const Entry &entry, int64_t &start, int64_t &end, bool &partial)
{
    start = 0;
    end = entry.size - 1;
    partial = false;
    const char *if_range = request.header("If-Range");
    if (if_range && entry.etag() != if_range && http_date(entry.modified) != if_range)
        return true;
    const char *range = request.header("Range");
    if (!range || g_ascii_strncasecmp(range, "bytes=", 6) != 0)
        return true;
    // "first-last", "first-" or "-how many of the end"
    const std::string text = range + 6;
    const size_t dash = text.find('-');
    guint64 numbers[2] = {0, 0};
    const std::string parts[2] = {text.substr(0, dash), dash == text.npos ? "" : text.substr(dash + 1)};
    for (const int i : {0, 1})
        if (!parts[i].empty() && !g_ascii_string_to_unsigned(parts[i].c_str(), 10, 0, G_MAXINT64, &numbers[i], nullptr))
            return true; // several, or none that can be read: they are ignored (RFC 9110, 14.2)
    if (dash == text.npos || (parts[0].empty() && parts[1].empty()))
        return true;
    partial = true;
    const auto first = static_cast<int64_t>(numbers[0]), last = static_cast<int64_t>(numbers[1]);
    start = parts[0].empty() ? std::max<int64_t>(0, entry.size - last) : first;
    end = parts[0].empty() || parts[1].empty() ? entry.size - 1 : std::min(last, entry.size - 1);
    return start < entry.size && start <= end;
}

void dav_get(Request &request)
{
    Entry entry = request.look_up();
    if (entry.kind == Entry::FOLDER) {
        request.set_header("Allow", "OPTIONS, DELETE, COPY, MOVE, PROPFIND, PROPPATCH, LOCK, UNLOCK");
        return request.answer(405);
    }
    if (entry.kind != Entry::FILE)
        return request.answer(404);
    const Fd folder = request.parent();
    Fd file(folder ? openat(folder.fd, request.path.name().c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC)
                   : -1);
    if (!file)
        return request.answer(status_of_errno(errno));
    // What was opened counts, not what stood there a moment ago.
    entry = look(file.fd, "");
    entry.name = request.path.name();
    if (entry.kind != Entry::FILE)
        return request.answer(404);

    request.set_header("ETag", entry.etag());
    request.set_header("Last-Modified", http_date(entry.modified));
    request.set_header("Accept-Ranges", "bytes");
    if (const std::string digest = request.service->metadata.digest(*request.account, request.path, entry);
        !digest.empty())
        request.set_header("Repr-Digest", repr_digest(digest));
    if (const int status = check_conditions(request, entry))
        return request.answer(status);
    request.set_header("Content-Type", content_type(entry.name));
    request.set_header("X-Content-Type-Options", "nosniff");
    request.set_header("Content-Security-Policy", "sandbox");

    int64_t start, end;
    bool partial;
    if (!chosen_range(request, entry, start, end, partial)) {
        request.set_header("Content-Range", "bytes */" + std::to_string(entry.size));
        return request.answer(416);
    }
    if (partial)
        request.set_header("Content-Range", "bytes " + std::to_string(start) + "-" + std::to_string(end) + "/" +
                                                std::to_string(entry.size));
    request.answer_file(partial ? 206 : 200, std::move(file), start, end - start + 1);
}
