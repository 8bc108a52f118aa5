#pragma once
// The local files that an upload takes, and those that nobody can have meant to share.
#include <string>
#include <sys/stat.h>

namespace cloud {

// Opens a local file for reading and looks at it. The descriptor is the caller's to close; `*file` is what it was then.
// Or -1 and *error: LOCAL_FILE when it is missing, unreadable or a folder; LOCAL_PRIVATE when it is the client's own
// (in cloud_data_dir(), by whatever name it was reached), another user's that is not open to everybody, or nothing that
// holds data: a device, a socket, a pipe, a file that the system makes up. What is no regular file is never opened for
// reading, which may have effects. The decision is about the file that is open, so no change of names can get around
// it.
int local_file_open(const std::string &path, struct stat *file, int *error);

} // namespace cloud
