#pragma once
// Thumbnails of the freedesktop cache; for media_content.cpp.
#include <atomic>
#include <string>

// The path of the valid thumbnail that the cache has for a file which was last changed at `mtime` (seconds since 1970),
// or empty. Any thread.
std::string thumbnail_find(const std::string &path, long long mtime);

// Decodes a picture, with its orientation, to at most 256 pixels a side and writes it to the cache. The result is its
// path, or empty for a broken or too large picture, and when `cancel` becomes true meanwhile. Any thread.
std::string thumbnail_make(const std::string &path, long long mtime, const std::atomic<bool> &cancel);
