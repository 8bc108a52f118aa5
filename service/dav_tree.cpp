// Methods that change the tree: DELETE, MKCOL, COPY and MOVE (RFC 4918, 9).
#include "http.h"
#include <cerrno>
#include <cstring>
#include <sys/stat.h>

// Answers when what was taken aside (nothing when empty) is removed and its room, if it was `counted` as used, is free
// again. It may be a folder of a hundred thousand files, so it is not done on the main loop.
static void answer_after_removal(Request &request, int status, const std::string &aside, bool counted = true)
{
    if (aside.empty())
        return request.answer(status);
    const auto freed = std::make_shared<int64_t>(0);
    in_thread(
        request, [attic = request.service->temporary.fd, aside, freed] { remove_tree(attic, aside, freed.get()); },
        [&request, status, freed, counted] {
            request.account->count(counted ? -*freed : 0);
            request.answer(status);
        });
}

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
    if (!may_change(request, request.path, Reach::NAME_AND_BELOW))
        return request.answer(423);
    // Taken away in one step: nobody ever sees half of a folder.
    const Fd folder = request.parent();
    const std::string aside = temporary_name("old");
    const int attic = request.service->temporary.fd;
    if (!folder || renameat(folder.fd, request.path.name().c_str(), attic, aside.c_str()) != 0)
        return request.answer(status_of_errno(errno));
    request.service->metadata.forget(*request.account, request.path);
    request.service->locks.forget(request.account->id, request.path);
    answer_after_removal(request, 204, aside);
}

void dav_mkcol(Request &request)
{
    if (!request.body.empty())
        return request.answer(415);
    if (request.path.root())
        return request.answer(405);
    const Fd folder = request.parent();
    if (!folder)
        return request.answer(errno == ENOENT || errno == ENOTDIR ? 409 : status_of_errno(errno));
    if (const int status = check_conditions(request, look(folder.fd, request.path.name())))
        return request.answer(status);
    if (!may_change(request, request.path, Reach::NAME))
        return request.answer(423);
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
    const auto uri = read_address(request, text);
    if (!uri)
        return 400;
    const char *host = request.header("Host");
    std::string authority = g_uri_get_host(uri.get()) ? g_uri_get_host(uri.get()) : "";
    if (authority.find(':') != std::string::npos)
        authority = "[" + authority + "]";
    // Behind a proxy that speaks TLS our own address is the Host header's, whatever the scheme.
    const int port = g_uri_get_port(uri.get());
    const std::string with_port = authority + ":" + std::to_string(port);
    const bool is_ours =
        host && (!g_ascii_strcasecmp(authority.c_str(), host) || !g_ascii_strcasecmp(with_port.c_str(), host));
    const int status = is_ours ? parse_path(g_uri_get_path(uri.get()), path) : 502;
    return status == 404 ? 502 : status;
}

static Fd target_folder(const Request &request, const Path &target)
{
    return open_folder(request.account->folder.fd, target, target.parts.size() - 1);
}

static int status_without_target_folder()
{
    return errno == ENOENT || errno == ENOTDIR ? 409 : status_of_errno(errno);
}

namespace {
// A copy is made whole among the temporary files, on another thread, and then moved to its name.
struct Copy {
    Request &request;
    Path target;
    Overwrite overwrite;
    bool deep;
    Fd from; // the folder of what is copied
    std::string name = temporary_name("copy");
    int64_t reserved = 0, size = 0;
    std::vector<CopiedFile> files;
    int error = 0; // errno of copying

    Copy(Request &asked, const Path &to, Overwrite over, bool whole, Fd folder)
        : request(asked), target(to), overwrite(over), deep(whole), from(std::move(folder))
    {
    }

    void make()
    {
        const int temporary = request.service->temporary.fd;
        error = copy_tree(from.fd, request.path.name(), temporary, name, deep, files) ? 0 : errno;
        size = tree_size(temporary, name);
    }

    void finish()
    {
        Account &account = *request.account;
        const int temporary = request.service->temporary.fd;
        account.reserved -= reserved;
        int64_t freed = 0;
        std::string aside;
        int status = error ? status_of_errno(error) : 0;
        const Fd to = target_folder(request, target);
        if (!status && !to)
            status = status_without_target_folder();
        if (!status && !may_change(request, target, Reach::NAME_AND_BELOW))
            status = 423;
        if (!status)
            status = move_entry(temporary, name, to.fd, target.name(), overwrite, temporary, &freed, &aside);
        if (status >= 300)
            return answer_after_removal(request, status, name, false);
        account.count(size - freed);
        request.service->metadata.copied(account, request.path, target, deep, files);
        answer_after_removal(request, status, aside);
    }
};
} // namespace

static void start_copy(Request &request, Fd from, const Fd &to, const Path &target, Overwrite overwrite, bool deep)
{
    const Entry source = look(from.fd, request.path.name()), old = look(to.fd, target.name());
    const int64_t size = deep || source.kind == Entry::FILE ? tree_size(from.fd, request.path.name()) : 0;
    const int64_t properties = request.service->metadata.properties_size(*request.account, request.path, deep);
    const int64_t more = size + properties - (old.kind == Entry::NONE ? 0 : tree_size(to.fd, target.name()));
    if (overwrite == Overwrite::NO && old.kind != Entry::NONE)
        return request.answer(412);
    if (more > request.account->left())
        return request.answer(507);
    auto copy = std::make_shared<Copy>(request, target, overwrite, deep, std::move(from));
    copy->reserved = std::max<int64_t>(0, more);
    request.account->reserved += copy->reserved;
    in_thread(
        request, [copy] { copy->make(); }, [copy] { copy->finish(); });
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
    if (!may_change(request, target, Reach::NAME_AND_BELOW) ||
        (move && !may_change(request, request.path, Reach::NAME_AND_BELOW)))
        return request.answer(423);
    Fd from = request.parent();
    const Fd to = target_folder(request, target);
    if (!from)
        return request.answer(status_of_errno(errno));
    if (!to)
        return request.answer(status_without_target_folder());
    if (!move)
        return start_copy(request, std::move(from), to, target, overwrite, !flat);
    int64_t freed = 0;
    std::string aside;
    const int status = move_entry(from.fd, request.path.name(), to.fd, target.name(), overwrite,
                                  request.service->temporary.fd, &freed, &aside);
    if (status >= 300)
        return request.answer(status);
    request.account->count(-freed);
    request.service->metadata.moved(*request.account, request.path, target);
    request.service->locks.forget(request.account->id, request.path); // locks do not move (RFC 4918, 7.7)
    answer_after_removal(request, status, aside);
}
