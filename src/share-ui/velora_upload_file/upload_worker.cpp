#include "velora_upload_file/upload_worker.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pipe.h"
#include "velora_common/velora_thread.h"
#include "velora_upload_file/upload_book.h"
#include "velora_upload_file/upload_notification.h"
#include "velora_upload_file/upload_text.h"
#include "velora_upload_file/upload_wait.h"
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <thread>

std::string __landed_name(const RunFile &file)
{
    std::string name = __last_segment(file.destination.c_str());
    char *path = nullptr;
    if (file.item->state == UPLOAD_STATE_DONE && file.item->request &&
        cloud_content_sync_get_uploaded_path(file.run->client.get(), file.item->request, &path) == 0 && path)
        name = __last_segment(path);
    std::free(path);
    return name;
}

void __worker_wake(const UploadRun &run)
{
    run.report.wake.release();
}

void __run_send(const UploadRun &run, const char *verb)
{
    char text[32];
    std::snprintf(text, sizeof text, "%s.%d", verb, run.number);
    _velora_common_pipe_send_msg(run.pipe, text);
}

static void __send_of(const RunFile &file, const char *verb)
{
    char text[24];
    std::snprintf(text, sizeof text, "%s.%d", verb, file.index);
    __run_send(*file.run, text);
}

static bool __is_end_state(int state)
{
    return state == UPLOAD_STATE_DONE || state == UPLOAD_STATE_FAILED;
}

static void __show_progress(const UploadRun &run, double of_current_file)
{
    if (const int remaining = run.remaining(); remaining > 0)
        __progress_noti_set_progress(run.noti_id, (run.report.success + run.report.fail + of_current_file) / remaining);
}

static void __transfer_report(const RunFile &file, int state, int progress, int error)
{
    UploadItem *item = file.item.get();
    item->progress = progress;
    item->error = error; // before the state: whoever sees a final state sees its reason
    if (error != 0)
        VELORA_LOGE("upload failed[%d]: [%s]", error, item->path);
    // A cancel on the main loop may come just before the first report; it stands.
    int seen = item->state;
    while (seen != UPLOAD_STATE_CANCELED && !item->state.compare_exchange_weak(seen, state))
        ;
    __send_of(file, __is_end_state(state) ? "store" : "update");
    __wait_noti_update(*file.run);
    __show_progress(*file.run, progress / 100.0);
}

void __upload_file_cb(int state, int, int progress, int error, void *data)
{
    const auto *file = static_cast<const RunFile *>(data);
    if (!file) {
        VELORA_LOGE("user_data  is NULL");
        return;
    }
    RunReport &report = file->run->report;
    report.callbacks++;
    __transfer_report(*file, state, progress, error);
    const bool is_end = __is_end_state(state) || error != 0;
    if (is_end)
        report.wake.release();
    report.callbacks--; // the run may go from here on
}

static bool __is_under_way(const UploadItem *item)
{
    const int state = item->state;
    return (state == UPLOAD_STATE_WAITING || state == UPLOAD_STATE_UPLOADING) && item->error == 0;
}

// Sends one file and waits for its end. False when the worker has to leave.
static bool __transfer(const RunFile &file)
{
    const UploadRun &run = *file.run;
    UploadItem *item = file.item.get();
    int req_id = 0;
    const int refused = cloud_content_sync_upload(run.client.get(), item->path, file.destination.c_str(), &req_id,
                                                  __upload_file_cb, const_cast<RunFile *>(&file));
    item->request = req_id;
    if (refused != 0) // no request, so no callback
        __transfer_report(file, UPLOAD_STATE_FAILED, 0, refused);
    while (__is_under_way(item) && !run.report.is_stopping)
        static_cast<void>(run.report.wake.try_acquire_for(std::chrono::seconds(1)));
    // A cancel on the main loop may come before it can know the request; nothing of it may run on behind our back.
    if (refused == 0 && run.report.is_stopping)
        cloud_content_sync_suspend(run.client.get(), req_id); // the next process goes on with it
    else if (refused == 0 && !__is_end_state(item->state))
        cloud_content_sync_cancel(run.client.get(), req_id);
    // The last callback may still be on its way out; the file is its until then.
    while (run.report.callbacks > 0)
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    return !run.report.is_stopping;
}

// What a run has come to.
struct RunResult {
    std::vector<char *> uploaded; // local paths, borrowed from the items
    std::vector<char *> failed;
    std::string first_uploaded; // names at the destination
    std::string first_failed;
    bool is_storage_full = false;
};

static void __count_result(const RunFile &file, RunResult *result)
{
    const UploadRun &run = *file.run;
    const UploadItem *item = file.item.get();
    const std::string name = __landed_name(file);
    if (item->error == UPLOAD_ERROR_STORAGE_FULL) {
        // Every file that is not up counts as failed, but only those that were tried before are listed.
        run.report.fail = run.remaining() - run.report.success;
        if (result->first_failed.empty())
            result->first_failed = name;
        result->is_storage_full = true;
    } else if (item->state == UPLOAD_STATE_DONE) {
        if (result->uploaded.empty())
            result->first_uploaded = name;
        result->uploaded.push_back(item->path);
        run.report.success++;
    } else if (item->state == UPLOAD_STATE_FAILED) {
        if (result->failed.empty())
            result->first_failed = name;
        result->failed.push_back(item->path);
        run.report.fail++;
    }
}

static void __result_noti(const UploadRun &run, const std::string &first, const char *id, const char *display_type,
                          std::vector<char *> paths, int count)
{
    char title[64];
    std::snprintf(title, sizeof title, __text_of("%d files", count), count);
    paths.push_back(nullptr);
    __box_noti_new(count == 1 ? first.c_str() : title, __text(id), display_type, paths.data(), count,
                   run.folder.c_str());
}

static void __run_end(const UploadRun &run, const RunResult &result)
{
    const int success = run.report.success, fail = run.report.fail;
    if (fail > 0)
        __result_noti(run, result.first_failed, "IDS_CLOUD_POP_UPLOAD_FAILED", "fail", result.failed, fail);
    else if (success > 0)
        __result_noti(run, result.first_uploaded, "IDS_CLOUD_POP_UPLOAD_COMPLETE", "success", result.uploaded, success);
    __run_send(run, result.is_storage_full ? "storage_full" : "end");
}

void *__thread_upload_file(void *data)
{
    const auto *run = static_cast<const UploadRun *>(data);
    if (!run) {
        VELORA_LOGE("data is NULL");
        return nullptr;
    }
    RunResult result;
    std::vector<const RunFile *> passed; // which may have been taken out before they were entered
    VELORA_LOGI("uploading!");
    __book_enter(*run);
    for (const RunFile &file : run->files) {
        run->report.current = file.index;
        if (file.item->state != UPLOAD_STATE_WAITING) {
            passed.push_back(&file);
            continue;
        }
        __progress_noti_set_count(run->noti_id, run->report.success + run->report.fail, run->remaining());
        if (!__transfer(file))
            return nullptr; // the view is being taken down: nobody to report to
        __count_result(file, &result);
        run->select(file.index, false);
        __run_send(*run, "selection"); // "store" may have been read before
        if (result.is_storage_full)
            break;
        __show_progress(*run, 0);
        if (run->remaining() <= 0)
            __run_send(*run, "end");
    }
    if (result.is_storage_full)
        for (const RunFile &file : run->files)
            if (file.item->state == UPLOAD_STATE_WAITING)
                passed.push_back(&file); // they count as failed
    __book_forget(*run, passed);
    __run_end(*run, result);
    return nullptr;
}

bool __worker_start(UploadRun *run)
{
    _velora_common_create_thread(&run->thread, __thread_upload_file, run);
    run->is_joinable = run->thread != 0;
    return run->is_joinable;
}

void __worker_join(UploadRun *run)
{
    if (run->is_joinable)
        pthread_join(run->thread, nullptr);
    run->is_joinable = false;
}

void __worker_stop(UploadRun *run)
{
    run->report.is_stopping = true; // the worker cancels its transfer itself: it alone knows the latest request
    run->report.wake.release();
    __worker_join(run);
}
