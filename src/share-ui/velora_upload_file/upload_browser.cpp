#include "velora_upload_file/upload_browser.h"
#include "velora_common/velora_log.h"
#include "velora_upload_file/upload_listed.h"
#include "velora_upload_file/upload_meta.h"
#include "velora_upload_file/upload_open.h"
#include "velora_upload_file/upload_path_bar.h"
#include "velora_upload_file/upload_progress.h"
#include "velora_upload_file/upload_signin.h"
#include "velora_upload_file/upload_text.h"
#include "velora_upload_file/upload_waiting.h"
#include <cstdlib>
#include <cstring>
#include <functional>

static size_t s_listing; // what the rows of the open folder were made of, as a hash

void __folder_open(UploadViewData *vd, cloud_content_sync_folder_h folder)
{
    if (vd->folder)
        cloud_content_sync_folder_destroy(vd->folder);
    vd->folder = folder;
    if (!folder)
        return;
    std::free(vd->ad->folder_path);
    vd->ad->folder_path = nullptr;
    cloud_content_sync_folder_get_path(folder, &vd->ad->folder_path);
}

void __folder_jump(UploadViewData *vd, const char *path)
{
    cloud_content_sync_folder_h folder = nullptr;
    if (!path) {
        if (cloud_content_sync_folder_get_root(vd->client.get(), &folder) != 0) {
            VELORA_LOGE("cloud_content_sync_folder_get_root failed");
            return;
        }
    } else {
        __folder_open(vd, nullptr);
        if (cloud_content_sync_get_folder_by_server_path(vd->client.get(), path, &folder) != 0) {
            VELORA_LOGE("cloud_content_sync_get_folder_by_server_path failed");
            __done_update(vd); // there is nothing to upload into
            return;
        }
    }
    __folder_open(vd, folder);
    __folder_show(vd);
}

bool __folder_go_up(UploadViewData *vd)
{
    __path_bar_remove_last();
    cloud_content_sync_folder_h parent = nullptr;
    if (!vd->folder || cloud_content_sync_folder_get_parent(vd->folder, &parent) != 0) {
        VELORA_LOGE("cloud_content_sync_folder_get_parent failed");
        return false;
    }
    __folder_open(vd, parent);
    VELORA_LOGI("path: %s", vd->ad->folder_path);
    __folder_show(vd);
    return true;
}

static void __ud_genlist_dir_sel(void *data, Evas_Object *, void *event_info)
{
    elm_genlist_item_selected_set(static_cast<Elm_Object_Item *>(event_info), EINA_FALSE);
    auto *record = static_cast<ItemData *>(data);
    UploadViewData *vd = s_vd;
    if (!record || !vd) {
        VELORA_LOGE("item_data is NULL");
        return;
    }
    if (__path_bar_is_jumping()) // a jump is under way: the rows are those of the folder it leaves
        return;
    cloud_content_sync_folder_h folder = nullptr;
    if (cloud_content_sync_folder_clone(&folder, record->folder) != 0)
        return;
    __folder_open(vd, folder);
    __path_bar_append(vd, vd->ad->folder_path);
    __folder_show(vd);
}

struct Enumeration {
    UploadViewData *vd = nullptr;
    bool has_rows = true; // or only looks
    int count = 0;
    size_t listing = 0; // stands for all that the rows show
};

static void __listing_add(Enumeration *list, const char *name, long long size)
{
    const std::string words = std::to_string(size) + (name ? name : "");
    list->listing = list->listing * 31 + std::hash<std::string>()(words);
}

static bool __folder_info_cb(cloud_content_sync_folder_h folder, int error, void *data)
{
    auto *list = static_cast<Enumeration *>(data);
    if (error != 0) {
        VELORA_LOGE("__folder_info_cb failed");
        return true;
    }
    if (!folder || !list) {
        VELORA_LOGE("Invalid argument");
        return true;
    }
    list->count++;
    char *name = nullptr;
    cloud_content_sync_folder_get_name(folder, &name);
    __listing_add(list, name, -1);
    std::free(name);
    if (!list->has_rows)
        return true;
    auto *record = new ItemData;
    cloud_content_sync_folder_clone(&record->folder, folder);
    __row_append(list->vd, list->vd->itc_dir, record, __ud_genlist_dir_sel);
    return true;
}

static bool __content_info_cb(cloud_content_sync_content_h content, int error, void *data)
{
    auto *list = static_cast<Enumeration *>(data);
    if (error != 0) {
        VELORA_LOGE("__content_info_cb failed");
        return true;
    }
    if (!content || !list) {
        VELORA_LOGE("Invalid argument");
        return true;
    }
    list->count++;
    char *name = nullptr;
    long long size = 0;
    cloud_content_sync_content_get_name(content, &name);
    cloud_content_sync_content_get_size(content, &size);
    __listing_add(list, name, size);
    if (list->has_rows) {
        auto *record = new ItemData;
        cloud_content_sync_content_clone(&record->content, content);
        record->name = record->file_name = name ? name : "";
        __row_append(list->vd, list->vd->itc_file, record, __select_item_to_launch_app);
    }
    std::free(name);
    return true;
}

static Enumeration __folder_enumerate(UploadViewData *vd, bool has_rows)
{
    Enumeration list = {.vd = vd, .has_rows = has_rows};
    if (vd->folder) {
        cloud_content_sync_folder_foreach_children_folder(nullptr, vd->folder, __folder_info_cb, &list);
        cloud_content_sync_folder_foreach_content_from_db(nullptr, vd->folder, __content_info_cb, &list);
    }
    return list;
}

bool __folder_list_has_changed(UploadViewData *vd)
{
    return __folder_enumerate(vd, false).listing != s_listing;
}

void __done_update(UploadViewData *vd)
{
    const ViewState state = __state_shown(vd);
    const bool is_listed = state == VIEW_STATE_NONE || state == VIEW_STATE_EMPTY;
    if (vd->done_btn && vd->phase == PHASE_BROWSING)
        elm_object_disabled_set(vd->done_btn, !is_listed || !vd->folder || __waiting_count() == 0);
    __progress_line_update(vd);
}

static void __again_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (vd != s_vd || vd->phase != PHASE_BROWSING)
        return;
    __meta_refresh_start(vd);
    __folder_show(vd);
}

void __folder_show(UploadViewData *vd)
{
    const bool was_focused = elm_object_focus_get(vd->genlist);
    __listed_clear(vd);
    // What is there before the first refresh may be half a tree, or another account's.
    const ViewState unreachable = __meta_state(vd);
    const bool is_signed_out = unreachable == VIEW_STATE_SIGNED_OUT;
    const bool is_known = vd->ad->is_meta_refreshed && !is_signed_out;
    const Enumeration list = is_known ? __folder_enumerate(vd, true) : Enumeration{};
    s_listing = list.listing;
    if (Elm_Object_Item *first = elm_genlist_first_item_get(vd->genlist); was_focused && first)
        elm_object_item_focus_set(first, EINA_TRUE);
    if (is_signed_out)
        __state_show(vd, unreachable, __signin_open_cb);
    else if (!is_known)
        __state_show(vd, VIEW_STATE_LOADING);
    else if (list.count > 0)
        __state_show(vd, VIEW_STATE_NONE);
    else if (unreachable != VIEW_STATE_NONE)
        __state_show(vd, unreachable, __again_cb);
    else
        __state_show(vd, VIEW_STATE_EMPTY);
    __done_update(vd);
}
