#pragma once
// Files of a service that are kept on this device: whole contents in cloud/cache/SERVICE, thumbnails in
// cloud/thumbnails/SERVICE of the platform's data folder. Any thread.
#include "cloud_content_sync/account.h"
#include <string>

namespace cloud {

enum class Kept { CONTENT, THUMBNAIL };

// The folder of one kind, which is made when it is missing.
std::string cache_folder(Kept kind, const std::string &service);
// Where a version of a file is kept, whether it is there or not. The name says nothing about the file but its
// extension, and differs for every account, path and version: by the entity tag, else by time and size.
std::string cache_file(Kept kind, const std::string &service, const std::string &identity, const ContentRow &row);
// Whether the file is there, with that size (-1: any); it then counts as used now.
bool cache_use(const std::string &file, long long size);
// Removes the files that were used least recently until at most `limit` bytes are left, but never `keep`, and what a
// crash has left behind.
void cache_trim(const std::string &folder, long long limit, const std::string &keep);
// Removes everything that is kept of a service; false when something is left.
bool cache_clear(const std::string &service);

// The entity tag without the mark of a weak one (RFC 9110, 8.8.3): some services call a tag weak for a second.
std::string opaque_tag(const std::string &etag);

} // namespace cloud
