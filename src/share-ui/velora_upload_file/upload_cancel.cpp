#include "velora_upload_file/upload_cancel.h"
#include "velora_common/velora_log.h"
#include "velora_upload_file/upload_book.h"
#include "velora_upload_file/upload_notification.h"
#include "velora_upload_file/upload_progress.h"
#include "velora_upload_file/upload_row.h"
#include "velora_upload_file/upload_worker.h"

// The file of the running run that an item is, or null.
static const RunFile *__file_of(const UploadViewData *vd, const UploadItem *item)
{
    if (!vd->run || !item || item->index < 0 || item->index >= vd->run->total())
        return nullptr;
    const RunFile *file = &vd->run->files[static_cast<size_t>(item->index)];
    return file->item.get() == item ? file : nullptr;
}

// False when the notification need not tell of it. What waited is added to *taken.
static bool __take_out(UploadItem *item, UploadViewData *vd, std::vector<const RunFile *> *taken)
{
    const RunFile *file = __file_of(vd, item);
    if (!file) { // of a run that has ended meanwhile
        VELORA_LOGE("upload_item is NULL");
        return false;
    }
    const UploadRun &run = *vd->run;
    run.report.canceled++;
    int seen = UPLOAD_STATE_WAITING;
    bool is_canceled = item->state.compare_exchange_strong(seen, UPLOAD_STATE_CANCELED);
    if (!is_canceled && seen == UPLOAD_STATE_UPLOADING)
        is_canceled = item->state.compare_exchange_strong(seen, UPLOAD_STATE_CANCELED);
    if (!is_canceled) {
        VELORA_LOGI("--- Cann't cancel it");
        return true;
    }
    run.report.bytes_canceled += file->size;
    if (item->gen_it)
        elm_object_item_del(item->gen_it);
    item->gen_it = nullptr;
    const bool was_running = seen == UPLOAD_STATE_UPLOADING;
    if (!was_running)
        taken->push_back(file);
    const int result = was_running ? cloud_content_sync_cancel(run.client.get(), item->request) : 0;
    __worker_wake(run);
    if (result != 0)
        VELORA_LOGE("cloud_content_sync_cancel failed");
    return result == 0;
}

static void __tell_remaining(UploadViewData *vd)
{
    const UploadRun &run = *vd->run;
    __progress_noti_set_count(run.noti_id, run.report.success + run.report.fail, run.remaining());
    __progress_noti_flush();
    __progress_line_update(vd);
    if (run.remaining() < 1)
        __run_send(run, "end");
}

void __uploading_file_mutil_cancel(UploadItem *item, UploadViewData *vd)
{
    __uploads_cancel(vd, {item});
}

void __uploads_cancel(UploadViewData *vd, const std::vector<UploadItem *> &items)
{
    std::vector<const RunFile *> taken;
    bool is_told = false;
    for (auto item = items.rbegin(); item != items.rend(); ++item)
        is_told |= __take_out(*item, vd, &taken);
    if (!taken.empty())
        __book_forget(*vd->run, taken);
    if (is_told)
        __tell_remaining(vd);
}

static void __cancel_job(void *data)
{
    const UploadItemHold item(static_cast<UploadItem *>(data));
    if (s_vd)
        __uploading_file_mutil_cancel(item.get(), s_vd);
}

void __upload_file_cancel_cb(void *data, Evas_Object *, void *)
{
    const auto *record = static_cast<const ItemData *>(data);
    if (!record || !record->item) {
        VELORA_LOGE("item is NULL");
        return;
    }
    VELORA_LOGI("-------To cancel: %d", record->item->index);
    // The list may be at work on the row whose button this is; it must not lose the row before it is done.
    ecore_job_add(__cancel_job, _velora_upload_item_ref(record->item.get()));
}
