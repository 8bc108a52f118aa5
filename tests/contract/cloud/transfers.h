#pragma once
// What the client's callbacks brought, for tests that wait for it, and what its database holds.
#include "base/base.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "temp_home.h"
#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <cstring>
#include <functional>
#include <gtest/gtest.h>
#include <random>
#include <vector>

using Names = std::vector<std::string>;

struct Call {
    int state;
    int progress;
    int error;
};

// User data of one upload, refresh or request about a file.
struct Watch {
    std::function<void(const Call &)> hook; // runs within the callback
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<Call> calls;
    std::string text; // of a request's callback; paths of thumbnails, a line each
    int status = 0;

    void add(const Call &call)
    {
        if (hook)
            hook(call);
        // The last call lets the test go on and free this, so nothing is touched after it.
        std::scoped_lock lock(mutex);
        calls.push_back(call);
        changed.notify_all();
    }
    size_t count()
    {
        std::scoped_lock lock(mutex);
        return calls.size();
    }
    // False when it did not come true within a minute.
    bool wait(const std::function<bool(const std::vector<Call> &)> &condition)
    {
        std::unique_lock lock(mutex);
        return changed.wait_for(lock, std::chrono::seconds(60), [&] { return condition(calls); });
    }
    bool wait_for_progress(int progress)
    {
        return wait([&](const auto &all) { return !all.empty() && all.back().progress >= progress; });
    }
    // The error of the last callback; -1 when there was none.
    int end()
    {
        const bool ended = wait([](const auto &all) { return !all.empty() && all.back().state != 2; });
        std::scoped_lock lock(mutex);
        return ended ? calls.back().error : -1;
    }
};

inline void transfer_cb(int state, int, int progress, int error, void *data)
{
    static_cast<Watch *>(data)->add({state, progress, error});
}

inline void refresh_cb(int status, int error, void *data)
{
    static_cast<Watch *>(data)->add({status, 0, error});
}

inline void result_cb(int state, const char *text, int status, int error, void *data)
{
    auto *result = static_cast<Watch *>(data);
    result->text = text ? text : "";
    result->status = status;
    result->add({state, 0, error});
}

inline int refresh(cloud_content_sync_h handle)
{
    Watch watch;
    const int error = cloud_content_sync_refresh_meta(handle, 7, refresh_cb, &watch);
    return error ? error : watch.end();
}

inline int start(cloud_content_sync_h handle, const std::string &local, const std::string &server, Watch &watch)
{
    int id = 0;
    EXPECT_EQ(cloud_content_sync_upload(handle, local.c_str(), server.c_str(), &id, transfer_cb, &watch), 0);
    return id;
}

inline int upload(cloud_content_sync_h handle, const std::string &local, const std::string &server,
                  std::string *landed = nullptr)
{
    Watch watch;
    const int id = start(handle, local, server, watch), error = watch.end();
    char *path = nullptr;
    if (landed && cloud_content_sync_get_uploaded_path(handle, id, &path) == 0)
        *landed = CString(path).get();
    return error;
}

using Content = std::unique_ptr<cloud_content_sync_content_s, decltype(&cloud_content_sync_content_destroy)>;

inline std::string name_of(cloud_content_sync_content_h content)
{
    char *name = nullptr;
    cloud_content_sync_content_get_name(content, &name);
    return taken(name);
}

// What the database holds below a folder, in its order: "name/" of folders, then "name:size" of files. The file of the
// wanted name is kept in *content.
inline Names listing(cloud_content_sync_h handle, const std::string &path, const std::string &wanted = "",
                     Content *content = nullptr)
{
    struct Rows {
        Names names;
        std::string wanted;
        cloud_content_sync_content_h content = nullptr;
    } rows{{}, wanted};
    cloud_content_sync_folder_h folder = nullptr;
    if (cloud_content_sync_get_folder_by_server_path(handle, path.c_str(), &folder) != 0)
        return {"no such folder"};
    cloud_content_sync_folder_foreach_children_folder(
        nullptr, folder,
        [](cloud_content_sync_folder_h child, int, void *data) {
            char *name = nullptr;
            cloud_content_sync_folder_get_name(child, &name);
            static_cast<Rows *>(data)->names.push_back(taken(name) + "/");
            return true;
        },
        &rows);
    cloud_content_sync_folder_foreach_content_from_db(
        nullptr, folder,
        [](cloud_content_sync_content_h row, int, void *data) {
            auto *to = static_cast<Rows *>(data);
            long long size = -1;
            cloud_content_sync_content_get_size(row, &size);
            to->names.push_back(name_of(row) + ":" + std::to_string(size));
            if (name_of(row) == to->wanted)
                cloud_content_sync_content_clone(&to->content, row);
            return true;
        },
        &rows);
    cloud_content_sync_folder_destroy(folder);
    if (content)
        content->reset(rows.content);
    return rows.names;
}

// The file /NAME of the database; null when there is none.
inline Content content_at(cloud_content_sync_h handle, const std::string &name)
{
    Content content(nullptr, cloud_content_sync_content_destroy);
    listing(handle, "/", name, &content);
    return content;
}

enum class Kind { CACHED, DOWNLOAD, STREAM };

// Sends a request about /NAME and lets the handle go at once; its id.
inline int ask(cloud_content_sync_h handle, Kind kind, const std::string &name, Watch &result,
               const std::string &local = "")
{
    const Content content = content_at(handle, name);
    int id = 0;
    const int refused = kind == Kind::CACHED
                            ? cloud_content_sync_content_get_cached_file(content.get(), &id, result_cb, &result)
                        : kind == Kind::DOWNLOAD
                            ? cloud_content_sync_content_download(content.get(), local.c_str(), &id, result_cb, &result)
                            : cloud_content_sync_content_get_streaming_url(content.get(), &id, result_cb, &result, 30);
    EXPECT_EQ(refused, 0) << name;
    return id;
}

// The same, and waits: the error of the callback.
inline int fetch(cloud_content_sync_h handle, Kind kind, const std::string &name, Watch &result,
                 const std::string &local = "")
{
    ask(handle, kind, name, result, local);
    return result.end();
}

inline bool has_thumbnail(cloud_content_sync_h handle, const std::string &name)
{
    bool exists = false;
    EXPECT_EQ(cloud_content_sync_content_get_is_thumbnail_exist(content_at(handle, name).get(), &exists), 0) << name;
    return exists;
}

inline void thumbnail_cb(const char *path, void *data)
{
    auto *arrivals = static_cast<Watch *>(data);
    std::scoped_lock lock(arrivals->mutex);
    arrivals->calls.push_back({});
    arrivals->text += path + std::string("\n");
}

// Names in a folder, hidden ones too, sorted.
inline Names names_in(const std::string &folder)
{
    Names names;
    std::error_code ignored;
    for (const auto &entry : std::filesystem::directory_iterator(folder, ignored))
        names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
}

// Bytes that are the same for the same seed: a random block again and again, each time with its number.
inline std::string some_bytes(size_t size, unsigned seed)
{
    std::mt19937_64 random(seed);
    std::vector<uint64_t> block(8 << 10);
    for (uint64_t &word : block)
        word = random();
    std::string bytes(size, '\0');
    const size_t step = block.size() * sizeof block[0];
    for (size_t at = 0; at < size; at += step, block[0]++)
        std::memcpy(bytes.data() + at, block.data(), std::min(step, size - at));
    return bytes;
}
