#pragma once
// The file system under the accounts' folders. Every call takes an open folder and one name, and no call follows a
// symbolic link, so that nothing outside the folder can be reached. What is neither a regular file nor a folder is
// "odd": it is never read, listed, copied or written to, and goes only with the folder that holds it.
#include "path.h"
#include <cstdint>
#include <sys/types.h>
#include <unistd.h>
#include <utility>

// An open file descriptor, closed with its owner.
struct Fd {
    int fd = -1;

    Fd() = default;
    explicit Fd(int open_fd) : fd(open_fd) {}
    Fd(Fd &&other) noexcept : fd(std::exchange(other.fd, -1)) {}
    Fd &operator=(Fd &&other) noexcept
    {
        std::swap(fd, other.fd);
        return *this;
    }
    ~Fd()
    {
        if (fd >= 0)
            ::close(fd);
    }
    explicit operator bool() const
    {
        return fd >= 0;
    }
};

struct Entry {
    enum Kind { NONE, FILE, FOLDER, ODD };
    Kind kind = NONE;
    std::string name;
    int64_t size = 0;     // bytes; 0 for folders
    int64_t modified = 0; // nanoseconds since 1970
    int64_t created = 0;  // the same; `modified` where the file system does not know it
    uint64_t inode = 0;

    // Changes whenever the content does.
    std::string etag() const;
};

// The HTTP status of a failed call's errno: 404, 403, 414, 423, 507, 503 or 500.
int status_of_errno(int error);

// Opens the folder at the first `count` names of `path` below `root`. On failure the result is empty and errno is set.
Fd open_folder(int root, const Path &path, size_t count);
// What `name` in the folder is; "" is the folder itself. NONE when it is not there or cannot be seen.
Entry look(int folder, const std::string &name);
// The files and folders in it, sorted by name. False and errno on failure.
bool list_folder(int folder, std::vector<Entry> &entries);
// The bytes of all regular files of `name`, itself or below it.
int64_t tree_size(int folder, const std::string &name);
// Removes `name` and all below it; *bytes (may be null) grows by the sizes of the regular files that went. False and
// errno when something stays.
bool remove_tree(int folder, const std::string &name, int64_t *bytes);

// What copy_tree made of one file: the names below the copied root joined by '/' ("" for the root itself).
struct CopiedFile {
    std::string below;
    Entry from, to;
};
// Copies a file, or a folder with all in it (`deep`) or empty. Contents are on the disk when it returns. False and
// errno on failure; what was made by then stays for the caller to remove.
bool copy_tree(int from, const std::string &from_name, int to, const std::string &to_name, bool deep,
               std::vector<CopiedFile> &files);

enum class Overwrite { NO, YES };
// Moves a file or folder to a name of another folder of the same file system. With Overwrite::NO the move and the
// check that the name is free are one step. With Overwrite::YES what was there is gone afterwards: a file at once
// (*freed grows by its size), anything else waits for remove_tree in the folder `attic` under the name *aside. The
// result is 201 (the name was free), 204 (it was not), 412 (taken) or an error's status; nothing has changed after an
// error.
int move_entry(int from, const std::string &from_name, int to, const std::string &to_name, Overwrite overwrite,
               int attic, int64_t *freed, std::string *aside);
// A name that no other call has returned in this process, for the folder of temporary files.
std::string temporary_name(const char *kind);
