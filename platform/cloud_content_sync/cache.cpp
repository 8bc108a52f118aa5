#include "cloud_content_sync/cache.h"
#include "cloud_content_sync/names.h"
#include "cloud_content_sync/service.h"
#include <algorithm>
#include <chrono>
#include <fcntl.h>
#include <filesystem>
#include <glib.h>
#include <sys/stat.h>

namespace fs = std::filesystem;

namespace cloud {

static constexpr size_t EXTENSION_BYTES = 16;
static constexpr auto ABANDONED_AFTER = std::chrono::hours(24);

std::string cache_folder(Kept kind, const std::string &service)
{
    const std::string dir = cloud_data_dir() + (kind == Kept::CONTENT ? "/cache/" : "/thumbnails/") + service;
    g_mkdir_with_parents(dir.c_str(), 0700);
    return dir;
}

std::string opaque_tag(const std::string &etag)
{
    return etag.compare(0, 2, "W/") == 0 ? etag.substr(2) : etag;
}

// "name.JPG" -> ".JPG"; empty when it could be anything but an extension.
static std::string extension_of(const std::string &name)
{
    const size_t dot = name.rfind('.');
    if (dot == name.npos || name.size() - dot > EXTENSION_BYTES)
        return "";
    const std::string extension = name.substr(dot);
    return std::all_of(extension.begin() + 1, extension.end(), [](char c) { return g_ascii_isalnum(c); }) ? extension
                                                                                                          : "";
}

std::string cache_file(Kept kind, const std::string &service, const std::string &identity, const ContentRow &row)
{
    const std::string version =
        row.etag.empty() ? std::to_string(row.mtime) + "-" + std::to_string(row.size) : opaque_tag(row.etag);
    const std::string text = identity + "\n" + version + "\n" + join(row.parent, row.name);
    g_autofree char *digest =
        g_compute_checksum_for_string(G_CHECKSUM_SHA256, text.data(), static_cast<gssize>(text.size()));
    return cache_folder(kind, service) + "/" + digest + (kind == Kept::CONTENT ? extension_of(row.name) : "");
}

bool cache_use(const std::string &file, long long size)
{
    struct stat info = {};
    if (lstat(file.c_str(), &info) != 0 || !S_ISREG(info.st_mode) || (size >= 0 && info.st_size != size))
        return false;
    utimensat(AT_FDCWD, file.c_str(), nullptr, AT_SYMLINK_NOFOLLOW);
    return true;
}

void cache_trim(const std::string &folder, long long limit, const std::string &keep)
{
    struct Item {
        fs::file_time_type used;
        long long size;
        fs::path path;
    };
    std::vector<Item> items;
    long long sum = 0;
    std::error_code error;
    for (fs::directory_iterator entry(folder, error), end; !error && entry != end; entry.increment(error)) {
        std::error_code gone;
        const Item item{entry->last_write_time(gone), static_cast<long long>(entry->file_size(gone)), entry->path()};
        if (gone)
            continue;
        if (item.path.extension() == ".part") {
            if (fs::file_time_type::clock::now() - item.used > ABANDONED_AFTER)
                fs::remove(item.path, gone);
            continue;
        }
        sum += item.size;
        items.push_back(item);
    }
    std::sort(items.begin(), items.end(), [](const Item &a, const Item &b) { return a.used < b.used; });
    for (const Item &item : items) {
        if (sum <= limit)
            break;
        if (item.path == keep || !fs::remove(item.path, error))
            continue;
        sum -= item.size;
    }
}

bool cache_clear(const std::string &service)
{
    bool is_clear = true;
    for (const Kept kind : {Kept::CONTENT, Kept::THUMBNAIL}) {
        std::error_code error;
        fs::remove_all(cache_folder(kind, service), error);
        if (error) // another process may have begun a file meanwhile
            fs::remove_all(cache_folder(kind, service), error);
        is_clear = is_clear && !error;
    }
    return is_clear;
}

} // namespace cloud
