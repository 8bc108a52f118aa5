#include "cloud_content_sync/local_file.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/service.h"
#include <algorithm>
#include <cerrno>
#include <dirent.h>
#include <fcntl.h>
#include <iterator>
#include <linux/magic.h>
#include <linux/openat2.h>
#include <memory>
#include <sys/syscall.h>
#include <sys/vfs.h>
#include <unistd.h>

namespace cloud {

namespace {
struct Descriptor {
    int fd = -1;
    explicit Descriptor(int number) : fd(number) {}
    Descriptor(const Descriptor &) = delete;
    Descriptor &operator=(const Descriptor &) = delete;
    ~Descriptor()
    {
        if (fd >= 0)
            close(fd);
    }
    std::string proc_path() const
    {
        return "/proc/self/fd/" + std::to_string(fd);
    }
};
} // namespace

// What the system makes up has names like files, but nobody's data.
static bool is_made_up(int fd)
{
    static constexpr unsigned long kinds[] = {
        PROC_SUPER_MAGIC,   SYSFS_MAGIC,  DEBUGFS_MAGIC, TRACEFS_MAGIC,       SECURITYFS_MAGIC,
        CGROUP_SUPER_MAGIC, BPF_FS_MAGIC, SELINUX_MAGIC, CGROUP2_SUPER_MAGIC, EFIVARFS_MAGIC,
        DEVPTS_SUPER_MAGIC, NSFS_MAGIC,   PSTOREFS_MAGIC};
    struct statfs system = {};
    return fstatfs(fd, &system) == 0 &&
           std::find(std::begin(kinds), std::end(kinds), static_cast<unsigned long>(system.f_type)) != std::end(kinds);
}

// What a link names; empty when it is none. Of an open file in /proc it is the path without links.
static std::string link_target(const std::string &link)
{
    char path[PATH_MAX];
    const ssize_t size = readlink(link.c_str(), path, sizeof path);
    return size > 0 ? std::string(path, static_cast<size_t>(size)) : "";
}

// For systems without openat2: whether the path, or a link that it ends in, names something in a folder of /proc.
static bool leads_into_proc(std::string path)
{
    for (int links = 0; links < 40; links++) {
        const size_t slash = path.rfind('/');
        const std::string folder = slash == path.npos ? "." : path.substr(0, slash + 1);
        const Descriptor held(open(folder.c_str(), O_PATH | O_CLOEXEC));
        if (held.fd >= 0 && is_made_up(held.fd))
            return true;
        const std::string target = link_target(path);
        if (target.empty())
            return false;
        path = target.front() == '/' ? target : folder + (slash == path.npos ? "/" : "") + target;
    }
    return true;
}

// A descriptor that stands for the file and opens nothing. *is_link: a link of /proc, which names a file of this
// process and not one of the person's.
static int take_hold(const std::string &path, bool *is_link)
{
    open_how how = {};
    how.flags = O_PATH | O_CLOEXEC;
    how.resolve = RESOLVE_NO_MAGICLINKS;
    const auto found = static_cast<int>(syscall(SYS_openat2, AT_FDCWD, path.c_str(), &how, sizeof how));
    if (found >= 0 || errno == ENOENT)
        return found;
    const bool was_loop = errno == ELOOP;
    const int plainly = open(path.c_str(), O_PATH | O_CLOEXEC);
    *is_link = plainly >= 0 && (was_loop || leads_into_proc(path));
    return plainly;
}

// By its place, and where it has another name as well, by what it is.
static bool is_our_own(const Descriptor &file, const struct stat &about)
{
    const std::string folder = cloud_data_dir();
    const Descriptor own(open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (own.fd < 0)
        return false;
    const std::string place = link_target(own.proc_path());
    if (!place.empty() && link_target(file.proc_path()).compare(0, place.size() + 1, place + "/") == 0)
        return true;
    if (about.st_nlink == 1)
        return false;
    const std::unique_ptr<DIR, int (*)(DIR *)> entries(opendir(folder.c_str()), closedir);
    while (const dirent *entry = entries ? readdir(entries.get()) : nullptr)
        if (struct stat one = {}; fstatat(own.fd, entry->d_name, &one, AT_SYMLINK_NOFOLLOW) == 0 &&
                                  one.st_ino == about.st_ino && one.st_dev == about.st_dev)
            return true;
    return false;
}

static int refusal(const Descriptor &held, const struct stat &about)
{
    if (S_ISDIR(about.st_mode))
        return CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
    const bool is_closed = about.st_uid != geteuid() && !(about.st_mode & S_IROTH);
    if (!S_ISREG(about.st_mode) || is_closed || is_made_up(held.fd) || is_our_own(held, about))
        return CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE;
    return CLOUD_CONTENT_SYNC_ERROR_NONE;
}

int local_file_open(const std::string &path, struct stat *file, int *error)
{
    *error = CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE;
    bool is_link = false;
    const Descriptor held(take_hold(path, &is_link));
    if (held.fd < 0 || fstat(held.fd, file) != 0)
        return -1;
    if (const int refused = is_link ? CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE : refusal(held, *file)) {
        *error = refused;
        return -1;
    }
    const int fd = open(held.proc_path().c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (fd >= 0 && fstat(fd, file) == 0) {
        *error = CLOUD_CONTENT_SYNC_ERROR_NONE;
        return fd;
    }
    if (fd >= 0)
        close(fd);
    return -1;
}

} // namespace cloud

int cloud_content_sync_check_local(const char *local_path)
{
    if (!local_path || !*local_path)
        return CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER;
    struct stat about = {};
    int error = CLOUD_CONTENT_SYNC_ERROR_NONE;
    const cloud::Descriptor file(cloud::local_file_open(local_path, &about, &error));
    return error;
}
