#include "tree.h"
#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdio>
#include <dirent.h>
#include <fcntl.h>
#include <functional>
#include <memory>
#include <sys/stat.h>

// Deeper trees are not copied: they would use up the file descriptors, of which two are open per level.
static const int LEVELS = 512;
static const size_t COPY_STEP = 64 << 20;

int status_of_errno(int error)
{
    switch (error) {
    case ENOENT:
    case ENOTDIR:
    case ELOOP:
        return 404;
    case EACCES:
    case EPERM:
    case EROFS:
    case EXDEV:
        return 403;
    case ENAMETOOLONG:
        return 414;
    case EBUSY:
    case ETXTBSY:
        return 423;
    case ENOSPC:
    case EDQUOT:
    case EFBIG:
        return 507;
    case EMFILE:
    case ENFILE:
    case ENOMEM:
        return 503;
    default:
        return 500;
    }
}

std::string Entry::etag() const
{
    char text[64];
    std::snprintf(text, sizeof text, "\"%llx-%llx-%llx\"", static_cast<unsigned long long>(inode),
                  static_cast<unsigned long long>(size), static_cast<unsigned long long>(modified));
    return text;
}

Fd open_folder(int root, const Path &path, size_t count)
{
    Fd folder(openat(root, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    for (size_t i = 0; folder && i < count; i++)
        folder = Fd(openat(folder.fd, path.parts[i].c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    return folder;
}

static int64_t nanoseconds(const struct statx_timestamp &time)
{
    return static_cast<int64_t>(time.tv_sec) * 1000000000 + time.tv_nsec;
}

Entry look(int folder, const std::string &name)
{
    Entry entry;
    entry.name = name;
    struct statx st;
    if (statx(folder, name.c_str(), AT_SYMLINK_NOFOLLOW | AT_EMPTY_PATH, STATX_BASIC_STATS | STATX_BTIME, &st) != 0)
        return entry;
    entry.kind = S_ISREG(st.stx_mode) ? Entry::FILE : S_ISDIR(st.stx_mode) ? Entry::FOLDER : Entry::ODD;
    entry.size = entry.kind == Entry::FILE ? static_cast<int64_t>(st.stx_size) : 0;
    entry.modified = nanoseconds(st.stx_mtime);
    entry.created = st.stx_mask & STATX_BTIME ? nanoseconds(st.stx_btime) : entry.modified;
    entry.inode = st.stx_ino;
    return entry;
}

// All names in the folder but "." and "..", also those that cannot be served.
static bool list_all(int folder, std::vector<Entry> &entries)
{
    const int copy = openat(folder, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (copy < 0)
        return false;
    const std::unique_ptr<DIR, int (*)(DIR *)> dir(fdopendir(copy), closedir);
    if (!dir) {
        close(copy);
        return false;
    }
    errno = 0;
    while (const dirent *item = readdir(dir.get())) {
        const std::string name = item->d_name;
        if (name != "." && name != "..")
            if (Entry entry = look(folder, name); entry.kind != Entry::NONE)
                entries.push_back(std::move(entry));
        errno = 0;
    }
    return errno == 0;
}

bool list_folder(int folder, std::vector<Entry> &entries)
{
    if (!list_all(folder, entries))
        return false;
    std::erase_if(entries, [](const Entry &e) { return e.kind == Entry::ODD || !valid_name(e.name); });
    std::sort(entries.begin(), entries.end(), [](const Entry &a, const Entry &b) { return a.name < b.name; });
    return true;
}

static Fd enter(int folder, const std::string &name)
{
    return Fd(openat(folder, name.empty() ? "." : name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
}

static uint64_t inode_of(int folder)
{
    struct stat st;
    return fstat(folder, &st) == 0 ? st.st_ino : 0;
}

// Calls `leave` for the entry and all below it, each after what it holds, with the open folder that it is in. One
// folder is open at a time, however deep the tree. False when `leave` says so, or somebody moves a folder away
// meanwhile.
static bool walk(int folder, const Entry &root, const std::function<bool(int folder, const Entry &entry)> &leave)
{
    struct Level {
        Entry self;
        uint64_t parent; // the inode of the folder around it
        std::vector<Entry> entries;
        size_t next = 0;
    };
    std::vector<Level> levels;
    Fd here = enter(folder, "");
    const auto go_down = [&](const Entry &entry) {
        Fd inner = entry.kind == Entry::FOLDER ? enter(here.fd, entry.name) : Fd();
        Level level{entry, inode_of(here.fd), {}};
        if (!inner || !list_all(inner.fd, level.entries))
            return leave(here.fd, entry);
        levels.push_back(std::move(level));
        here = std::move(inner);
        return true;
    };
    if (!here || !go_down(root))
        return false;
    while (!levels.empty()) {
        Level &level = levels.back();
        if (level.next < level.entries.size()) {
            const Entry entry = std::move(level.entries[level.next++]);
            if (!go_down(entry))
                return false;
            continue;
        }
        const Level done = std::move(level);
        levels.pop_back();
        here = levels.empty() ? enter(folder, "") : Fd(openat(here.fd, "..", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
        if (!here || inode_of(here.fd) != done.parent) {
            errno = ENOENT;
            return false;
        }
        if (!leave(here.fd, done.self))
            return false;
    }
    return true;
}

int64_t tree_size(int folder, const std::string &name)
{
    int64_t sum = 0;
    walk(folder, look(folder, name), [&](int, const Entry &entry) {
        sum += entry.size;
        return true;
    });
    return sum;
}

bool remove_tree(int folder, const std::string &name, int64_t *bytes)
{
    int64_t removed = 0;
    const bool whole = walk(folder, look(folder, name), [&](int inside, const Entry &entry) {
        if (unlinkat(inside, entry.name.c_str(), entry.kind == Entry::FOLDER ? AT_REMOVEDIR : 0) != 0)
            return false;
        removed += entry.size;
        return true;
    });
    if (bytes)
        *bytes += removed;
    return whole;
}

static bool copy_file(int from, const std::string &from_name, int to, const std::string &to_name)
{
    const Fd in(openat(from, from_name.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    const Fd out(openat(to, to_name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666));
    if (!in || !out)
        return false;
    for (;;) {
        ssize_t count = copy_file_range(in.fd, nullptr, out.fd, nullptr, COPY_STEP, 0);
        if (count == 0)
            return true;
        if (count > 0)
            continue;
        if (errno != EXDEV && errno != EINVAL && errno != ENOSYS && errno != EOPNOTSUPP)
            return false;
        char block[1 << 16];
        while ((count = read(in.fd, block, sizeof block)) > 0)
            if (write(out.fd, block, static_cast<size_t>(count)) != count)
                return false;
        return count == 0;
    }
}

static bool copy_below(int from, const Entry &entry, int to, const std::string &to_name, bool deep,
                       const std::string &below, std::vector<CopiedFile> &files, int level)
{
    if (entry.kind == Entry::FILE) {
        if (!copy_file(from, entry.name, to, to_name))
            return false;
        // What is known about the original holds for the copy only if the original stood still.
        if (look(from, entry.name).etag() == entry.etag())
            files.push_back({below, entry, look(to, to_name)});
        return true;
    }
    if (entry.kind != Entry::FOLDER || level == LEVELS) {
        errno = entry.kind == Entry::FOLDER ? EMFILE : ENOENT;
        return false;
    }
    if (mkdirat(to, to_name.c_str(), 0777) != 0)
        return false;
    if (!deep)
        return true;
    const Fd inner = enter(from, entry.name), copy = enter(to, to_name);
    std::vector<Entry> entries;
    if (!inner || !copy || !list_folder(inner.fd, entries))
        return false;
    for (const Entry &item : entries)
        if (!copy_below(inner.fd, item, copy.fd, item.name, true, below.empty() ? item.name : below + "/" + item.name,
                        files, level + 1))
            return false;
    return true;
}

bool copy_tree(int from, const std::string &from_name, int to, const std::string &to_name, bool deep,
               std::vector<CopiedFile> &files)
{
    if (!copy_below(from, look(from, from_name), to, to_name, deep, "", files, 0))
        return false;
    const Fd copy(openat(to, to_name.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
    // An fsync per file makes copying ten thousand small files thirty times slower.
    return copy && (files.size() == 1 ? fsync(copy.fd) : syncfs(copy.fd)) == 0;
}

// rename() that fails with EEXIST when the name is taken; file systems without that flag still make hard links.
static bool rename_to_free_name(int from, const std::string &from_name, int to, const std::string &to_name)
{
    if (renameat2(from, from_name.c_str(), to, to_name.c_str(), RENAME_NOREPLACE) == 0)
        return true;
    if ((errno != EINVAL && errno != ENOSYS) || look(from, from_name).kind != Entry::FILE)
        return false;
    return linkat(from, from_name.c_str(), to, to_name.c_str(), 0) == 0 && unlinkat(from, from_name.c_str(), 0) == 0;
}

int move_entry(int from, const std::string &from_name, int to, const std::string &to_name, Overwrite overwrite,
               int attic, int64_t *freed, std::string *aside)
{
    if (rename_to_free_name(from, from_name, to, to_name))
        return 201;
    if (errno != EEXIST)
        return errno == EINVAL ? 403 : status_of_errno(errno);
    if (overwrite == Overwrite::NO)
        return 412;
    const Entry old = look(to, to_name);
    if (old.kind == Entry::ODD)
        return 403;
    if (old.kind == Entry::FILE && look(from, from_name).kind == Entry::FILE) {
        if (renameat(from, from_name.c_str(), to, to_name.c_str()) != 0)
            return status_of_errno(errno);
        *freed += old.size;
        return 204;
    }
    const std::string name = temporary_name("old");
    if (renameat(to, to_name.c_str(), attic, name.c_str()) != 0)
        return status_of_errno(errno);
    if (!rename_to_free_name(from, from_name, to, to_name)) {
        const int status = status_of_errno(errno);
        renameat(attic, name.c_str(), to, to_name.c_str());
        return status;
    }
    *aside = name;
    return 204;
}

std::string temporary_name(const char *kind)
{
    static std::atomic<unsigned long long> count = 0;
    return kind + std::string("-") + std::to_string(getpid()) + "-" + std::to_string(++count);
}
