// The folders of the cloud: rows, path bar, and the ways from one folder to another.
#include "velora_upload_file/upload_internal.h"
#include <cstdlib>
#include <cstring>
#include <functional>

static const char s_root_label[] = "Velora";

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

static Eina_Bool __timer_toolbar_append_cb(void *)
{
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return ECORE_CALLBACK_CANCEL;
    }
    if (!vd->pathinfo_timer) {
        VELORA_LOGE("vd->pathinfo_timer is NULL");
        return ECORE_CALLBACK_CANCEL;
    }
    vd->pathinfo_timer = nullptr;
    cloud_content_sync_folder_h folder = nullptr;
    if (g_strcmp0(elm_object_item_text_get(vd->tapped_item), s_root_label) == 0) {
        if (cloud_content_sync_folder_get_root(vd->ad->sync_handle, &folder) != 0) {
            VELORA_LOGE("cloud_content_sync_folder_get_root failed");
            return ECORE_CALLBACK_CANCEL;
        }
    } else {
        __folder_open(vd, nullptr);
        if (cloud_content_sync_get_folder_by_server_path(vd->ad->sync_handle, vd->tapped_path, &folder) != 0) {
            VELORA_LOGE("cloud_content_sync_get_folder_by_server_path failed");
            if (vd->done_btn)
                elm_object_disabled_set(vd->done_btn, EINA_TRUE); // there is nothing to upload into
            return ECORE_CALLBACK_CANCEL;
        }
    }
    __folder_open(vd, folder);
    _velora_upload_view_update();
    return ECORE_CALLBACK_CANCEL;
}

static void __toolbar_it_cb(void *data, Evas_Object *, void *event_info)
{
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    if (vd->pathinfo_timer) {
        VELORA_LOGI("vd->pathinfo_timer is not NULL");
        return;
    }
    auto *item = static_cast<Elm_Object_Item *>(event_info);
    if (item == elm_toolbar_last_item_get(vd->toolbar))
        return;
    vd->tapped_item = item;
    vd->tapped_path = static_cast<char *>(data);
    while (Elm_Object_Item *last = elm_toolbar_last_item_get(vd->toolbar)) {
        if (last == item)
            break;
        elm_object_item_del(last);
    }
    vd->pathinfo_timer = ecore_timer_add(0.25, __timer_toolbar_append_cb, nullptr);
}

static void __path_item_del_cb(void *data, Evas_Object *, void *)
{
    g_free(data);
}

static void __last_item_show_cb(void *)
{
    UploadViewData *vd = s_vd;
    if (!vd || !vd->toolbar)
        return;
    evas_smart_objects_calculate(evas_object_evas_get(vd->toolbar));
    elm_toolbar_item_show(elm_toolbar_last_item_get(vd->toolbar), ELM_TOOLBAR_ITEM_SCROLLTO_LAST);
}

static void __path_bar_append(UploadViewData *vd, const char *label, const char *path)
{
    char *markup = __one_line_markup(label);
    char *data = g_strdup(path);
    Elm_Object_Item *item = elm_toolbar_item_append(vd->toolbar, nullptr, markup, __toolbar_it_cb, data);
    elm_object_item_del_cb_set(item, __path_item_del_cb);
    elm_toolbar_item_bring_in(item, ELM_TOOLBAR_ITEM_SCROLLTO_LAST);
    ecore_job_add(__last_item_show_cb, nullptr); // once more when the bar has given the new item its place
    std::free(markup);
}

void __path_bar_create(UploadViewData *vd)
{
    vd->toolbar = elm_toolbar_add(vd->ad->naviframe);
    elm_object_style_set(vd->toolbar, "navigationbar");
    elm_toolbar_shrink_mode_set(vd->toolbar, ELM_TOOLBAR_SHRINK_SCROLL);
    elm_toolbar_transverse_expanded_set(vd->toolbar, EINA_TRUE);
    elm_toolbar_align_set(vd->toolbar, 0.0);
    elm_toolbar_homogeneous_set(vd->toolbar, EINA_FALSE);
    elm_toolbar_select_mode_set(vd->toolbar, ELM_OBJECT_SELECT_MODE_NONE);
    __path_bar_append(vd, s_root_label, "/");
    elm_object_part_content_set(vd->layout, "elm.swallow.folder", vd->toolbar);
    evas_object_resize(vd->toolbar, 480, 51);
}

// The path bar tells the root by its label; a folder of that name ends the way up as well.
bool __is_at_root(UploadViewData *vd)
{
    Elm_Object_Item *last = elm_toolbar_last_item_get(vd->toolbar);
    return !last || g_strcmp0(elm_object_item_text_get(last), s_root_label) == 0;
}

bool __folder_go_up(UploadViewData *vd)
{
    elm_object_item_del(elm_toolbar_last_item_get(vd->toolbar));
    cloud_content_sync_folder_h parent = nullptr;
    if (!vd->folder || cloud_content_sync_folder_get_parent(vd->folder, &parent) != 0) {
        VELORA_LOGE("cloud_content_sync_folder_get_parent failed");
        return false;
    }
    __folder_open(vd, parent);
    VELORA_LOGI("path: %s", vd->ad->folder_path);
    _velora_upload_view_update();
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
    if (vd->pathinfo_timer) // a jump is under way: the rows are those of the folder it leaves
        return;
    cloud_content_sync_folder_h folder = nullptr;
    if (cloud_content_sync_folder_clone(&folder, record->folder) != 0)
        return;
    __folder_open(vd, folder);
    __path_bar_append(vd, __last_segment(vd->ad->folder_path), vd->ad->folder_path);
    _velora_upload_view_update();
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
    auto *record = new ItemData{.vd = list->vd};
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
        auto *record = new ItemData{.vd = list->vd, .type = ITEM_TYPE_CONTENT};
        cloud_content_sync_content_clone(&record->content, content);
        record->name = g_strdup(name);
        record->file_name = g_strdup(name);
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

int __folder_list_append(UploadViewData *vd)
{
    const Enumeration list = __folder_enumerate(vd, true);
    vd->listing = list.listing;
    return list.count;
}

bool __folder_list_has_changed(UploadViewData *vd)
{
    return __folder_enumerate(vd, false).listing != vd->listing;
}
