#include "velora_upload_file/upload_messages.h"
#include "notification/notification.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pages.h"
#include "velora_upload_file/upload_list.h"
#include "velora_upload_file/upload_listed.h"
#include "velora_upload_file/upload_menu.h"
#include "velora_upload_file/upload_message.h"
#include "velora_upload_file/upload_notification.h"
#include "velora_upload_file/upload_open.h"
#include "velora_upload_file/upload_page.h"
#include "velora_upload_file/upload_progress.h"
#include "velora_upload_file/upload_select.h"
#include "velora_upload_file/upload_share.h"
#include "velora_upload_file/upload_signin.h"
#include "velora_upload_file/upload_state.h"
#include "velora_upload_file/upload_text.h"
#include "velora_upload_file/upload_thumbnails.h"
#include "velora_upload_file/upload_worker.h"
#include <algorithm>

static RunHold __run_close(UploadViewData *vd)
{
    RunHold run = std::move(vd->run);
    vd->run = nullptr;
    __worker_join(run.get());
    if (run->noti_id != -1)
        __progress_noti_delete(run->noti_id);
    __delete_all_callback_ctxpopup();
    __more_button_delete(vd);
    __selection_run_ended(vd);
    return run;
}

// The person is told; files that wait for a folder still get their choice, for there may be room for them.
static void __storage_full(UploadViewData *vd)
{
    notification_status_message_post(__text("Unable to upload, not enough memory"));
    __run_close(vd);
    vd->phase = PHASE_ENDED;
    if (__next_share_begin(vd))
        elm_win_activate(vd->ad->win_main);
    else
        _velora_page_leave(vd->ad, vd);
}

static void __run_ended(UploadViewData *vd)
{
    VELORA_LOGI("All are done");
    const RunHold run = __run_close(vd);
    if (vd->phase == PHASE_UPLOADING)
        vd->phase = PHASE_ENDED;
    if (__next_share_begin(vd)) {
        elm_win_activate(vd->ad->win_main); // they are waiting for an answer
        return;
    }
    if (vd->phase == PHASE_ENDED && __listed_is_empty(vd))
        __state_show(vd, VIEW_STATE_STOPPED);
    __progress_line_update(vd);
    const auto is_failed_so = [](const RunFile &file) {
        return file.item->state == UPLOAD_STATE_FAILED && __is_signed_out(file.item->error);
    };
    if (vd->phase == PHASE_ENDED && std::ranges::any_of(run->files, is_failed_so))
        __signin_ask(vd);
}

static void __row_store(UploadViewData *vd, const RunFile &file)
{
    UploadItem *item = file.item.get();
    VELORA_LOGI("--------- store: %d,upload_item->state[%d]", file.index, item->state.load());
    if (!item->gen_it)
        return;
    ItemData *record = __row_record(item->gen_it);
    if (!record) {
        VELORA_LOGE("item is NULL");
        return;
    }
    record->name = __landed_name(file);
    __upload_row_restyle(vd, item->gen_it, item->state == UPLOAD_STATE_DONE ? ITEM_TYPE_UPLOADED : ITEM_TYPE_FAILED);
}

static void __item_message(UploadViewData *vd, const Message &message)
{
    if (!message.has_number) {
        VELORA_LOGE("split_str is NULL");
        return;
    }
    if (message.number < 0 || message.number >= vd->run->total()) {
        VELORA_LOGE("upload_item is NULL");
        return;
    }
    const RunFile &file = vd->run->files[static_cast<size_t>(message.number)];
    if (message.verb == "store")
        __row_store(vd, file);
    else
        __upload_row_progress(file.item.get());
    if (vd->phase == PHASE_UPLOADING) // the line may be about a result that is looked at meanwhile
        __progress_line_update_soon();
}

static void __run_message(UploadViewData *vd, const Message &message)
{
    if (!vd->run || (message.run != 0 && message.run != vd->run->number)) {
        VELORA_LOGI("%s of a run that is over", message.verb.c_str());
        return;
    }
    if (message.verb == "storage_full")
        __storage_full(vd);
    else if (message.verb == "end")
        __run_ended(vd);
    else if (message.verb == "selection")
        __selection_title_refresh(vd);
    else if (__is_of_item(message.verb))
        __item_message(vd, message);
}

void __pipe_cb(void *, void *buffer, unsigned int size)
{
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("view is destroyed");
        return;
    }
    if (!buffer) {
        VELORA_LOGE("Invalid argument: buffer is NULL");
        return;
    }
    if (ContentResultMessage result; _velora_common_is_content_result(buffer, size, &result)) {
        __content_result_handle(vd, result);
        return;
    }
    const Message message = __message_read(buffer, size);
    if (message.verb == "meta_changed")
        __share_meta_changed(vd);
    else if (message.verb == "thumb" && message.has_number)
        __cloud_thumbnail_arrived(vd, static_cast<uint32_t>(message.number));
    else
        __run_message(vd, message);
}
