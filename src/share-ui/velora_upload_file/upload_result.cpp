#include "velora_upload_file/upload_result.h"
#include "velora_common/velora_log.h"
#include "velora_upload_file/upload_listed.h"
#include "velora_upload_file/upload_names.h"
#include "velora_upload_file/upload_notification.h"
#include "velora_upload_file/upload_progress.h"
#include "velora_upload_file/upload_queue.h"
#include "velora_upload_file/upload_retry.h"
#include "velora_upload_file/upload_select.h"
#include "velora_upload_file/upload_state.h"
#include "velora_upload_file/upload_text.h"
#include <Ecore_File.h>
#include <cstdlib>

// The folder that the files of the result were meant for, so that another try leads there again.
static std::string __folder_of_result(const AppData *ad)
{
    char *path = nullptr;
    if (ad->app_control)
        app_control_get_extra_data(ad->app_control, RESULT_FOLDER_KEY, &path);
    const std::string folder = path ? path : "/";
    std::free(path);
    return folder;
}

static TakenNames __names_of(UploadViewData *vd, const std::string &path)
{
    cloud_content_sync_folder_h folder = nullptr;
    if (cloud_content_sync_get_folder_by_server_path(vd->client.get(), path.c_str(), &folder) != 0)
        return TakenNames(nullptr);
    TakenNames names(folder);
    cloud_content_sync_folder_destroy(folder);
    return names;
}

static void __rows_append(UploadViewData *vd)
{
    AppData *ad = vd->ad;
    const bool is_success = g_strcmp0(ad->display_type, "success") == 0;
    const bool is_failure = g_strcmp0(ad->display_type, "fail") == 0;
    __state_show(vd, is_failure && ad->result_path_count == 0 ? VIEW_STATE_FULL : VIEW_STATE_NONE);
    const std::string folder = __folder_of_result(ad);
    const TakenNames taken = __names_of(vd, folder);
    std::vector<UploadItemHold> items;
    for (const GList *entry = ad->upload_list; entry; entry = entry->next) {
        auto *item = static_cast<UploadItem *>(entry->data);
        item->size = ecore_file_size(item->path);
        item->server_path = __get_server_path(taken, folder.c_str(), item->path);
        items.emplace_back(_velora_upload_item_ref(item));
    }
    if (is_success || is_failure)
        __listed_show_items(vd, std::move(items), is_success ? ITEM_TYPE_UPLOADED : ITEM_TYPE_FAILED,
                            is_success ? nullptr : __velora_uploading_item_selected);
}

void __result_show(UploadViewData *vd)
{
    if (vd->is_select_mode) // of the run that goes on behind the result
        __selection_cancel(vd);
    __retry_popup_end(vd);
    __uploads_show(vd, PHASE_RESULT);
    __rows_append(vd);
    _velora_upload_list_free(&vd->ad->upload_list); // the list holds its items
    __progress_line_update(vd);
}
