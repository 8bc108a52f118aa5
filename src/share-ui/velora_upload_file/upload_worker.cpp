// The worker of a run, the worker of a retry, and the callback by which the cloud client's thread reports a transfer.
// None of them touches a widget: they store plain words and write to the view's pipe.
#include "velora_common/velora_thread.h"
#include "velora_upload_file/upload_internal.h"
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <semaphore>
#include <thread>

// Released when a transfer ends or is cancelled, and when the worker has to leave.
static std::counting_semaphore s_wake(0);
static std::atomic<bool> s_is_stopping = false;
static std::atomic<bool> s_may_begin = false;
static std::atomic<int> s_callbacks = 0; // transfer callbacks that are running
static pthread_t s_worker;
static bool s_is_joinable = false;

static std::unique_ptr<std::atomic<bool>[]> s_selected;
static std::atomic<int> s_selected_count = 0;

void __selection_resize(int count)
{
    s_selected_count = 0;
    s_selected = std::make_unique<std::atomic<bool>[]>(static_cast<size_t>(count));
    s_selected_count = count;
}

bool __selection_get(int index)
{
    return index >= 0 && index < s_selected_count && s_selected[static_cast<size_t>(index)];
}

void __selection_set(int index, bool selected)
{
    if (index >= 0 && index < s_selected_count)
        s_selected[static_cast<size_t>(index)] = selected;
}

std::string __landed_name(const UploadViewData *vd, const UploadItem *item)
{
    std::string name = __last_segment(item->server_path);
    char *path = nullptr;
    if (item->state == UPLOAD_STATE_DONE && item->request &&
        cloud_content_sync_get_uploaded_path(vd->ad->sync_handle, item->request, &path) == 0 && path)
        name = __last_segment(path);
    std::free(path);
    return name;
}

void __worker_wake()
{
    s_wake.release();
}

static void __send(UploadViewData *vd, const char *format, int index)
{
    char text[32];
    std::snprintf(text, sizeof text, format, index);
    _velora_common_pipe_send_msg(vd->pipe, text);
}

static bool __is_end_state(int state)
{
    return state == UPLOAD_STATE_DONE || state == UPLOAD_STATE_FAILED;
}

static void __transfer_report(UploadViewData *vd, UploadItem *item, int state, int progress, int error)
{
    item->progress = progress;
    item->error = error;
    if (error != 0)
        VELORA_LOGE("upload failed[%d]: [%s]", error, item->path);
    // A cancel on the main loop may come just before the first report; it stands.
    int seen = item->state;
    while (seen != UPLOAD_STATE_CANCELED && !item->state.compare_exchange_weak(seen, state))
        ;
    __send(vd, __is_end_state(state) ? "store.%d" : "update.%d", item->index);
    if (const int remaining = vd->total - vd->canceled; remaining > 0)
        __progress_noti_set_progress(vd->noti_id, (vd->success + vd->fail + progress / 100.0) / remaining);
}

void __upload_file_cb(int state, int, int progress, int error, void *data)
{
    auto *item = static_cast<UploadItem *>(data);
    if (!item) {
        VELORA_LOGE("user_data  is NULL");
        return;
    }
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    s_callbacks++;
    __transfer_report(vd, item, state, progress, error);
    s_callbacks--;
    if (__is_end_state(state) || error != 0)
        s_wake.release();
}

static void __set_content(UploadViewData *vd, int finished)
{
    char text[32];
    std::snprintf(text, sizeof text, "%d / %d", finished, vd->total - vd->canceled);
    __progress_noti_set_content(vd->noti_id, text);
}

static bool __is_under_way(const UploadItem *item)
{
    const int state = item->state;
    return (state == UPLOAD_STATE_WAITING || state == UPLOAD_STATE_UPLOADING) && item->error == 0;
}

// Sends one file and waits for its end. False when the worker has to leave.
static bool __transfer(UploadViewData *vd, UploadItem *item)
{
    int req_id = 0;
    const int refused =
        cloud_content_sync_upload(vd->ad->sync_handle, item->path, item->server_path, &req_id, __upload_file_cb, item);
    vd->req_id = req_id;
    item->request = req_id;
    if (refused != 0) // no request, so no callback
        __transfer_report(vd, item, UPLOAD_STATE_FAILED, 0, refused);
    while (__is_under_way(item) && !s_is_stopping)
        static_cast<void>(s_wake.try_acquire_for(std::chrono::seconds(1)));
    // A cancel on the main loop may come before it can know the request; nothing of it may run on behind our back.
    if (refused == 0 && !__is_end_state(item->state))
        cloud_content_sync_cancel(vd->ad->sync_handle, req_id);
    // The last callback may still be on its way out; the item and the view are its until then.
    while (s_callbacks > 0)
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    return !s_is_stopping;
}

// What a run has come to.
struct RunResult {
    std::vector<char *> uploaded; // local paths, borrowed from the items
    std::vector<char *> failed;
    std::string first_uploaded; // names at the destination
    std::string first_failed;
    bool is_storage_full = false;
};

static void __count_result(UploadViewData *vd, UploadItem *item, RunResult *result)
{
    const std::string name = __landed_name(vd, item);
    if (item->error == UPLOAD_ERROR_STORAGE_FULL) {
        // Every file that is not up counts as failed, but only those that were tried are listed.
        vd->fail = vd->total - vd->canceled - vd->success;
        if (result->first_failed.empty())
            result->first_failed = name;
        result->is_storage_full = true;
    } else if (item->state == UPLOAD_STATE_DONE) {
        if (result->uploaded.empty())
            result->first_uploaded = name;
        result->uploaded.push_back(item->path);
        vd->success++;
    } else if (item->state == UPLOAD_STATE_FAILED) {
        if (result->failed.empty())
            result->first_failed = name;
        result->failed.push_back(item->path);
        vd->fail++;
    }
}

static void __result_noti(const std::string &first, const char *id, const char *display_type, std::vector<char *> paths,
                          int count)
{
    char title[64];
    std::snprintf(title, sizeof title, __text("%d files"), count);
    paths.push_back(nullptr);
    __box_noti_new(count == 1 ? first.c_str() : title, __text(id), display_type, paths.data(), count);
}

static void __run_end(UploadViewData *vd, const RunResult &result)
{
    if (vd->fail > 0)
        __result_noti(result.first_failed, "IDS_CLOUD_POP_UPLOAD_FAILED", "fail", result.failed, vd->fail);
    else if (vd->success > 0)
        __result_noti(result.first_uploaded, "IDS_CLOUD_POP_UPLOAD_COMPLETE", "success", result.uploaded, vd->success);
    vd->is_uploading = false;
    _velora_common_pipe_send_msg(vd->pipe, result.is_storage_full ? "storage_full" : "end");
}

void *__thread_upload_file(void *data)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return nullptr;
    }
    vd->is_uploading = true;
    s_may_begin.wait(false);
    RunResult result;
    VELORA_LOGI("uploading!");
    for (int n = 0; n < vd->total && !result.is_storage_full; n++) {
        vd->cur_index = n;
        if (n >= static_cast<int>(vd->run.size())) {
            VELORA_LOGE("upload_item is NULL");
            return nullptr;
        }
        UploadItem *item = vd->run[static_cast<size_t>(n)];
        if (item->state != UPLOAD_STATE_WAITING)
            continue;
        __set_content(vd, vd->success + vd->fail);
        if (!__transfer(vd, item))
            return nullptr; // the view is being taken down: nobody to report to
        __count_result(vd, item, &result);
        __selection_set(n, false);
        _velora_common_pipe_send_msg(vd->pipe, "selection"); // "store.N" may have been read before
        if (result.is_storage_full)
            break;
        if (const int remaining = vd->total - vd->canceled; remaining > 0)
            __progress_noti_set_progress(vd->noti_id, static_cast<double>(vd->success + vd->fail) / remaining);
        else
            _velora_common_pipe_send_msg(vd->pipe, "end");
    }
    __run_end(vd, result);
    return nullptr;
}

void *__velora_upload_fail_reboot(void *data)
{
    auto *vd = static_cast<UploadViewData *>(data);
    UploadItem *item = vd->run.empty() ? nullptr : vd->run.front();
    if (!item) {
        VELORA_LOGE("upload_item is NULL");
        return nullptr;
    }
    item->error = 0;
    item->progress = 0;
    item->state = UPLOAD_STATE_WAITING;
    vd->is_end_handled = false;
    if (!__transfer(vd, item))
        return nullptr;
    vd->is_uploading = false;
    const std::string name = __landed_name(vd, item);
    const bool is_storage_full = item->error == UPLOAD_ERROR_STORAGE_FULL;
    if (item->state == UPLOAD_STATE_FAILED)
        __result_noti(name, "IDS_CLOUD_POP_UPLOAD_FAILED", "fail",
                      is_storage_full ? std::vector<char *>{} : std::vector<char *>{item->path}, 1);
    else if (item->state == UPLOAD_STATE_DONE)
        __result_noti(name, "IDS_CLOUD_POP_UPLOAD_COMPLETE", "success", {item->path}, 1);
    _velora_common_pipe_send_msg(vd->pipe, is_storage_full ? "storage_full" : "end");
    return nullptr;
}

static void __worker_join()
{
    if (s_is_joinable)
        pthread_join(s_worker, nullptr);
    s_is_joinable = false;
}

static void __run_release(UploadViewData *vd)
{
    for (UploadItem *item : vd->run)
        _velora_upload_item_unref(item);
    vd->run.clear();
}

void __worker_begin()
{
    s_may_begin = true;
    s_may_begin.notify_all();
}

void __worker_start(UploadViewData *vd, void *(*routine)(void *), UploadItem *only)
{
    if (vd->thread)
        return;
    s_may_begin = false;
    __worker_join(); // it has sent its "end" and has nothing left to wait for
    __run_release(vd);
    if (only) {
        vd->run.push_back(_velora_upload_item_ref(only));
    } else {
        for (GList *entry = vd->ad->upload_list; entry; entry = entry->next)
            vd->run.push_back(_velora_upload_item_ref(static_cast<UploadItem *>(entry->data)));
    }
    while (s_wake.try_acquire()) // left over from the end of the run before
        ;
    s_is_stopping = false;
    _velora_common_create_thread(&vd->thread, routine, vd);
    s_worker = vd->thread;
    s_is_joinable = vd->thread != 0;
    if (!s_is_joinable)
        vd->is_uploading = false;
}

void __worker_stop(UploadViewData *vd)
{
    s_is_stopping = true; // the worker cancels its transfer itself: it alone knows the latest request
    __worker_begin();
    s_wake.release();
    __worker_join();
    __run_release(vd);
    vd->thread = 0;
}
