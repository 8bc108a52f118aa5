// Methods that change the tree: DELETE, MKCOL, COPY and MOVE (RFC 4918, 9).
#include "http.h"
#include <cerrno>
#include <cstring>
#include <sys/stat.h>

void dav_delete(Request &request)
{
    if (request.path.root())
        return request.answer(403);
    const Entry entry = request.look_up();
    if (entry.kind != Entry::FILE && entry.kind != Entry::FOLDER)
        return request.answer(404);
    if (const int status = check_conditions(request, entry))
        return request.answer(status);
    const char *depth = request.header("Depth");
    if (entry.kind == Entry::FOLDER && depth && g_ascii_strcasecmp(depth, "infinity") != 0)
        return request.answer(400);
    // Taken away in one step: nobody ever sees half of a folder.
    const Fd folder = request.parent();
    const std::string aside = temporary_name("old");
    const int attic = request.service->temporary.fd;
    if (!folder || renameat(folder.fd, request.path.name().c_str(), attic, aside.c_str()) != 0)
        return request.answer(status_of_errno(errno));
    int64_t freed = 0;
    remove_tree(attic, aside, &freed);
    request.account->used = std::max<int64_t>(0, request.account->used - freed);
    request.service->metadata.forget(*request.account, request.path);
    request.answer(204);
}

void dav_mkcol(Request &request)
{
    if (soup_server_message_get_request_body(request.message)->length > 0)
        return request.answer(415);
    if (request.path.root())
        return request.answer(405);
    const Fd folder = request.parent();
    if (!folder)
        return request.answer(errno == ENOENT || errno == ENOTDIR ? 409 : status_of_errno(errno));
    if (const int status = check_conditions(request, look(folder.fd, request.path.name())))
        return request.answer(status);
    if (mkdirat(folder.fd, request.path.name().c_str(), 0777) != 0)
        return request.answer(errno == EEXIST ? 405 : status_of_errno(errno));
    fsync(folder.fd);
    request.service->metadata.forget(*request.account, request.path);
    request.answer(201);
}

// The Destination header: 0, or the status of what is wrong with it.
static int read_destination(const Request &request, Path &path)
{
    const char *text = request.header("Destination");
    if (!text)
        return 400;
    GUri *own = soup_server_message_get_uri(request.message);
    GUri *uri = g_uri_parse_relative(own, text, static_cast<GUriFlags>(SOUP_HTTP_URI_FLAGS), nullptr);
    if (!uri)
        return 400;
    const char *host = soup_message_headers_get_one(soup_server_message_get_request_headers(request.message), "Host");
    std::string authority = g_uri_get_host(uri) ? g_uri_get_host(uri) : "";
    if (authority.find(':') != std::string::npos)
        authority = "[" + authority + "]";
    const std::string with_port = authority + ":" + std::to_string(g_uri_get_port(uri));
    // Behind a proxy that speaks TLS our own address is the Host header's, whatever the scheme.
    const bool ours = g_uri_get_host(own) && g_uri_get_host(uri) &&
                      (!g_ascii_strcasecmp(g_uri_get_host(own), g_uri_get_host(uri)) ||
                       (host && (authority == host || with_port == host)));
    const int status = ours ? parse_path(g_uri_get_path(uri), path) : 502;
    g_uri_unref(uri);
    return status == 404 ? 502 : status;
}

// A copy is made whole among the temporary files and then moved to its name.
static int copy_to(Request &request, const Fd &from, const Path &target, const Fd &to, Overwrite overwrite, bool deep)
{
    Account &account = *request.account;
    const int temporary = request.service->temporary.fd;
    const Entry source = look(from.fd, request.path.name()), old = look(to.fd, target.name());
    const int64_t size = deep || source.kind == Entry::FILE ? tree_size(from.fd, request.path.name()) : 0;
    if (overwrite == Overwrite::NO && old.kind != Entry::NONE)
        return 412;
    if (size - (old.kind == Entry::NONE ? 0 : tree_size(to.fd, target.name())) > account.left())
        return 507;
    const std::string name = temporary_name("copy");
    std::vector<CopiedFile> files;
    int64_t freed = 0;
    int status = 0;
    if (!copy_tree(from.fd, request.path.name(), temporary, name, deep, files))
        status = status_of_errno(errno);
    int64_t copied = 0;
    if (!status) {
        copied = tree_size(temporary, name);
        status = move_entry(temporary, name, to.fd, target.name(), overwrite, temporary, &freed);
    }
    if (status >= 300) {
        remove_tree(temporary, name, nullptr);
        return status;
    }
    account.used += copied - freed;
    request.service->metadata.copied(account, request.path, target, deep, files);
    return status;
}

void dav_copy_move(Request &request, bool move)
{
    Path target;
    if (const int status = read_destination(request, target))
        return request.answer(status);
    const char *depth = request.header("Depth"), *overwrite_header = request.header("Overwrite");
    const bool flat = depth && std::strcmp(depth, "0") == 0;
    if ((depth && !flat && g_ascii_strcasecmp(depth, "infinity") != 0) || (flat && move))
        return request.answer(400);
    if (overwrite_header && g_ascii_strcasecmp(overwrite_header, "F") != 0 &&
        g_ascii_strcasecmp(overwrite_header, "T") != 0)
        return request.answer(400);
    const Overwrite overwrite =
        overwrite_header && g_ascii_strcasecmp(overwrite_header, "F") == 0 ? Overwrite::NO : Overwrite::YES;

    const Entry entry = request.look_up();
    if (entry.kind != Entry::FILE && entry.kind != Entry::FOLDER)
        return request.answer(404);
    if (const int status = check_conditions(request, entry))
        return request.answer(status);
    // A thing cannot take its own place, nor that of a folder around it, nor one within itself.
    if (request.path.root() || target.root() || target.parts == request.path.parts || request.path.holds(target) ||
        target.holds(request.path))
        return request.answer(403);
    const Fd from = request.parent(), to = open_folder(request.account->folder.fd, target, target.parts.size() - 1);
    if (!from)
        return request.answer(status_of_errno(errno));
    if (!to)
        return request.answer(errno == ENOENT || errno == ENOTDIR ? 409 : status_of_errno(errno));

    int status;
    if (move) {
        int64_t freed = 0;
        status = move_entry(from.fd, request.path.name(), to.fd, target.name(), overwrite,
                            request.service->temporary.fd, &freed);
        if (status < 300) {
            request.account->used = std::max<int64_t>(0, request.account->used - freed);
            request.service->metadata.moved(*request.account, request.path, target);
        }
    } else {
        status = copy_to(request, from, target, to, overwrite, !flat);
    }
    request.answer(status);
}
