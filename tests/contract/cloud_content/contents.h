#pragma once
// Requests about single files, for tests that wait for what comes of them.
#include "transfers.h"
#include <algorithm>
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <iterator>
#include <memory>
#include <thread>

struct Result : Watch {
    std::string text; // of the last callback
    int status = 0;
};

inline void result_cb(int state, const char *text, int status, int error, void *data)
{
    auto *result = static_cast<Result *>(data);
    result->text = text ? text : "";
    result->status = status;
    result->add({state, 0, error});
}

using Content = std::unique_ptr<cloud_content_sync_content_s, decltype(&cloud_content_sync_content_destroy)>;

// A file of the database; null when there is none.
inline Content content_at(cloud_content_sync_h handle, const std::string &folder_path, const std::string &name)
{
    struct Search {
        std::string name;
        cloud_content_sync_content_h found = nullptr;
    } search{name};
    cloud_content_sync_folder_h folder = nullptr;
    if (cloud_content_sync_get_folder_by_server_path(handle, folder_path.c_str(), &folder) == 0)
        cloud_content_sync_folder_foreach_content_from_db(
            nullptr, folder,
            [](cloud_content_sync_content_h content, int, void *data) {
                auto *wanted = static_cast<Search *>(data);
                char *text = nullptr;
                cloud_content_sync_content_get_name(content, &text);
                if (CString(text).get() == wanted->name)
                    cloud_content_sync_content_clone(&wanted->found, content);
                return !wanted->found;
            },
            &search);
    cloud_content_sync_folder_destroy(folder);
    return {search.found, cloud_content_sync_content_destroy};
}

enum class Kind { CACHED, DOWNLOAD, STREAM };

// Sends a request about /NAME and lets the handle go at once. The result is the function's; *id (may be null) its id.
inline int ask(cloud_content_sync_h handle, Kind kind, const std::string &name, Result &result,
               const std::string &local = "", int *id = nullptr)
{
    const Content content = content_at(handle, "/", name);
    int own = 0;
    int *const out = id ? id : &own;
    switch (kind) {
    case Kind::CACHED:
        return cloud_content_sync_content_get_cached_file(content.get(), out, result_cb, &result);
    case Kind::DOWNLOAD:
        return cloud_content_sync_content_download(content.get(), local.c_str(), out, result_cb, &result);
    case Kind::STREAM:
        return cloud_content_sync_content_get_streaming_url(content.get(), out, result_cb, &result, 30);
    }
    return -1;
}

// The same, and waits: the error of the last callback.
inline int fetch(cloud_content_sync_h handle, Kind kind, const std::string &name, Result &result,
                 const std::string &local = "")
{
    const int refused = ask(handle, kind, name, result, local);
    return refused ? refused : result.end();
}

inline std::string bytes_of(const std::string &path)
{
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

// Names in a folder, hidden ones too, sorted.
inline std::vector<std::string> names_in(const std::string &folder)
{
    std::vector<std::string> names;
    std::error_code ignored;
    for (const auto &entry : std::filesystem::directory_iterator(folder, ignored))
        names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
}

// False when it does not come true within ten seconds.
inline bool comes_true(const std::function<bool()> &condition)
{
    for (int i = 0; i < 2000 && !condition(); i++)
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    return condition();
}

inline bool has_thumbnail(cloud_content_sync_h handle, const std::string &name)
{
    bool exists = false;
    const Content content = content_at(handle, "/", name);
    EXPECT_EQ(cloud_content_sync_content_get_is_thumbnail_exist(content.get(), &exists), 0) << name;
    return exists;
}

// User data of a thumbnail callback.
struct Arrivals {
    std::mutex mutex;
    std::vector<std::string> paths;

    static void cb(const char *path, void *data)
    {
        auto *self = static_cast<Arrivals *>(data);
        std::scoped_lock lock(self->mutex);
        self->paths.emplace_back(path);
    }
    std::vector<std::string> all()
    {
        std::scoped_lock lock(mutex);
        return paths;
    }
};
