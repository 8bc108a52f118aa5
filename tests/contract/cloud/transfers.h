#pragma once
// What the client's callbacks brought, for tests that wait for it.
#include "base/base.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <string>
#include <vector>

struct Call {
    int state;
    int progress;
    int error;
};

// User data of one upload or refresh.
struct Watch {
    std::function<void(const Call &)> hook; // runs within the callback
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<Call> calls;

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

inline int refresh(cloud_content_sync_h handle)
{
    Watch watch;
    const int error = cloud_content_sync_refresh_meta(handle, 7, refresh_cb, &watch);
    return error ? error : watch.end();
}

inline int upload(cloud_content_sync_h handle, const std::string &local, const std::string &server,
                  std::string *landed = nullptr)
{
    Watch watch;
    int id = 0;
    const int refused = cloud_content_sync_upload(handle, local.c_str(), server.c_str(), &id, transfer_cb, &watch);
    if (refused)
        return refused;
    const int error = watch.end();
    char *path = nullptr;
    if (landed && cloud_content_sync_get_uploaded_path(handle, id, &path) == 0)
        *landed = CString(path).get();
    return error;
}

// What the database holds below a folder, in its order: "name/" of folders, then "name:size" of files.
inline std::vector<std::string> listing(cloud_content_sync_h handle, const std::string &path)
{
    std::vector<std::string> rows;
    cloud_content_sync_folder_h folder = nullptr;
    if (cloud_content_sync_get_folder_by_server_path(handle, path.c_str(), &folder) != 0)
        return {"no such folder"};
    cloud_content_sync_folder_foreach_children_folder(
        nullptr, folder,
        [](cloud_content_sync_folder_h child, int, void *data) {
            char *name = nullptr;
            cloud_content_sync_folder_get_name(child, &name);
            static_cast<std::vector<std::string> *>(data)->push_back(std::string(CString(name).get()) + "/");
            return true;
        },
        &rows);
    cloud_content_sync_folder_foreach_content_from_db(
        nullptr, folder,
        [](cloud_content_sync_content_h content, int, void *data) {
            char *name = nullptr;
            long long size = -1;
            cloud_content_sync_content_get_name(content, &name);
            cloud_content_sync_content_get_size(content, &size);
            static_cast<std::vector<std::string> *>(data)->push_back(std::string(CString(name).get()) + ":" +
                                                                     std::to_string(size));
            return true;
        },
        &rows);
    cloud_content_sync_folder_destroy(folder);
    return rows;
}
