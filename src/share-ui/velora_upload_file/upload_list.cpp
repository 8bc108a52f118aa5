// How the rows of the view's list look.
#include "velora_common/velora_paths.h"
#include "velora_common/velora_popup.h"
#include "velora_upload_file/upload_internal.h"
#include <cstdlib>
#include <cstring>

static bool __is_part(const char *part, const char *name)
{
    return std::strcmp(part, name) == 0;
}

static bool __is_icon_part(const char *part)
{
    return __is_part(part, "elm.icon") || __is_part(part, "elm.icon.1");
}

char *__one_line_markup(const char *text)
{
    char *valid = g_utf8_make_valid(text, -1);
    std::string shown;
    for (const char *c = valid; *c; c++) {
        const auto byte = static_cast<unsigned char>(*c);
        if (byte < 0x20)
            shown += {'\xe2', '\x90', static_cast<char>(0x80 + byte)};
        else
            shown += *c;
    }
    g_free(valid);
    return elm_entry_utf8_to_markup(shown.c_str());
}

// A name as a row shows it: passed through the translation.
static char *__name_markup(const char *name)
{
    return name ? __one_line_markup(__text(name)) : nullptr;
}

static char *__ud_genlist_dir_text_get(void *data, Evas_Object *, const char *part)
{
    auto *record = static_cast<ItemData *>(data);
    if (!record) {
        VELORA_LOGE("item is NULL");
        return nullptr;
    }
    if (!__is_part(part, "elm.text.main.left"))
        return nullptr;
    char *name = nullptr;
    cloud_content_sync_folder_get_name(record->folder, &name);
    char *markup = __name_markup(name);
    std::free(name);
    return markup;
}

static char *__ud_genlist_file_text_get(void *data, Evas_Object *, const char *part)
{
    auto *record = static_cast<ItemData *>(data);
    if (!record) {
        VELORA_LOGE("item is NULL");
        return nullptr;
    }
    if (__is_part(part, "elm.text.main.left") || __is_part(part, "elm.text.main.left.top"))
        return __name_markup(record->name);
    if (!__is_part(part, "elm.text.sub.left.bottom"))
        return nullptr;
    std::string text = __text("IDS_CLOUD_POP_UPLOAD_FAILED");
    UploadViewData *vd = s_vd;
    const UploadItem *item = vd ? __upload_item_find(vd, record->index) : nullptr;
    const char *why = item && item->error != 0 ? __failure_text(item->error) : nullptr;
    if (why && text != why) // the words for a failure of no known kind say no more
        text = text + " · " + why;
    return elm_entry_utf8_to_markup(text.c_str());
}

static char *__ud_genlist_uploading_text_get(void *data, Evas_Object *, const char *part)
{
    auto *record = static_cast<ItemData *>(data);
    if (!record) {
        VELORA_LOGE("item is NULL");
        return nullptr;
    }
    return __is_part(part, "elm.text.main.left.top") ? __name_markup(record->name) : nullptr;
}

static Evas_Object *__list_layout_create(Evas_Object *parent, const char *style, Evas_Object **content,
                                         Evas_Object *(*add)(Evas_Object *))
{
    Evas_Object *layout = elm_layout_add(parent);
    elm_layout_theme_set(layout, "layout", style, "default");
    *content = add(layout);
    elm_object_part_content_set(layout, "elm.swallow.content", *content);
    return layout;
}

static Evas_Object *__dir_content_get(void *, Evas_Object *obj, const char *part)
{
    if (!__is_icon_part(part))
        return nullptr;
    Evas_Object *image = nullptr;
    Evas_Object *layout = __list_layout_create(obj, "list/B/type.2", &image, elm_image_add);
    evas_object_repeat_events_set(layout, EINA_TRUE);
    evas_object_size_hint_aspect_set(layout, EVAS_ASPECT_CONTROL_BOTH, 1, 1);
    elm_image_file_set(image, _velora_common_app_file("res/edje/velora_edc_images.edj").c_str(),
                       "docshelf_icon_folder.png");
    evas_object_size_hint_align_set(image, EVAS_HINT_FILL, EVAS_HINT_FILL);
    evas_object_size_hint_weight_set(image, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    return layout;
}

static Evas_Object *__ud_genlist_file_content_get(void *data, Evas_Object *obj, const char *part)
{
    auto *record = static_cast<ItemData *>(data);
    if (!record || !__is_icon_part(part))
        return nullptr;
    return __file_icon_create(obj, record, record->type == ITEM_TYPE_CONTENT ? nullptr : record->path);
}

static Evas_Object *__cancel_button_create(Evas_Object *parent, ItemData *record)
{
    Evas_Object *button = nullptr;
    Evas_Object *layout = __list_layout_create(parent, "list/C/type.3", &button, elm_button_add);
    elm_object_style_set(button, "editfield_clear");
    elm_object_domain_translatable_text_set(button, VELORA_SHARE_DOMAIN, "IDS_CLOUD_SK2_CANCEL");
    // Heard, not seen: there is one such button in every row.
    const std::string name = std::string(__text("IDS_CLOUD_SK2_CANCEL")) + ", " + record->name;
    ea_screen_reader_name_set(button, name.c_str());
    evas_object_smart_callback_add(button, "clicked", __upload_file_cancel_cb, record);
    evas_object_propagate_events_set(button, EINA_FALSE);
    return layout;
}

static Evas_Object *__selection_check_create(Evas_Object *parent, const ItemData *record)
{
    Evas_Object *check = nullptr;
    Evas_Object *layout = __check_create(parent, __selection_get(record->index), &check);
    ea_screen_reader_name_set(check, record->name);
    evas_object_pass_events_set(check, EINA_TRUE); // a tap on it selects the row
    evas_object_repeat_events_set(layout, EINA_TRUE);
    return layout;
}

static Evas_Object *__progress_create(Evas_Object *parent, const ItemData *record, const UploadItem *item)
{
    Evas_Object *bar = elm_progressbar_add(parent);
    ea_screen_reader_name_set(bar, record->name);
    elm_object_style_set(bar, item->state == UPLOAD_STATE_UPLOADING ? "list_progress" : "pending_custom");
    elm_progressbar_horizontal_set(bar, EINA_TRUE);
    elm_progressbar_value_set(bar, item->progress / 100.0);
    evas_object_size_hint_align_set(bar, EVAS_HINT_FILL, EVAS_HINT_FILL);
    evas_object_size_hint_weight_set(bar, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    elm_progressbar_pulse(bar, EINA_TRUE);
    return bar;
}

static Evas_Object *__ud_genlist_uploading_content_get(void *data, Evas_Object *obj, const char *part)
{
    auto *record = static_cast<ItemData *>(data);
    UploadViewData *vd = s_vd;
    const UploadItem *item = record && vd ? __upload_item_find(vd, record->index) : nullptr;
    if (!item) {
        VELORA_LOGE("upload_item is NULL");
        return nullptr;
    }
    if (__is_icon_part(part))
        return __file_icon_create(obj, record, item->path);
    if (__is_part(part, "elm.icon.2")) {
        const int state = item->state;
        if (state != UPLOAD_STATE_WAITING && state != UPLOAD_STATE_UPLOADING) {
            VELORA_LOGI("upload_item->state is [%d]", state);
            return nullptr;
        }
        return vd->is_select_mode ? __selection_check_create(obj, record) : __cancel_button_create(obj, record);
    }
    return __is_part(part, "elm.swallow.progressbar") ? __progress_create(obj, record, item) : nullptr;
}

static void __gl_del(void *data, Evas_Object *)
{
    auto *record = static_cast<ItemData *>(data);
    if (!record) {
        VELORA_LOGE("item_data is NULL");
        return;
    }
    // No message of the run may reach a row that is gone. Other items go with their rows.
    UploadViewData *vd = s_vd;
    UploadItem *item = vd && record->index >= 0 ? __run_item(vd, record->index) : nullptr;
    if (item && item->gen_it == record->gen_it)
        item->gen_it = nullptr;
    __content_row_forget(record);
    if (record->folder)
        cloud_content_sync_folder_destroy(record->folder);
    if (record->content)
        cloud_content_sync_content_destroy(record->content);
    g_free(record->name);
    g_free(record->local_path);
    g_free(record->stream_url);
    g_free(record->file_name);
    g_free(record->path);
    delete record;
}

Elm_Genlist_Item_Class *__item_class_create(const char *style, Elm_Gen_Item_Text_Get_Cb text_get,
                                            Elm_Gen_Item_Content_Get_Cb content_get)
{
    Elm_Genlist_Item_Class *itc = elm_genlist_item_class_new();
    itc->item_style = style;
    itc->func.text_get = text_get;
    itc->func.content_get = content_get;
    itc->func.state_get = nullptr;
    itc->func.del = __gl_del;
    return itc;
}

void __item_classes_create(UploadViewData *vd)
{
    vd->itc_dir = __item_class_create("1line", __ud_genlist_dir_text_get, __dir_content_get);
    vd->itc_file = __item_class_create("1line", __ud_genlist_file_text_get, __ud_genlist_file_content_get);
    vd->itc_uploading =
        __item_class_create("2line.velora", __ud_genlist_uploading_text_get, __ud_genlist_uploading_content_get);
    vd->itc_fail = __item_class_create("2line.top", __ud_genlist_file_text_get, __ud_genlist_file_content_get);
}

void __item_classes_free(UploadViewData *vd)
{
    for (Elm_Genlist_Item_Class **itc :
         {&vd->itc_dir, &vd->itc_file, &vd->itc_uploading, &vd->itc_select_all, &vd->itc_fail}) {
        if (*itc)
            elm_genlist_item_class_free(*itc);
        *itc = nullptr;
    }
}

static void __language_changed_cb(void *, Evas_Object *obj, void *)
{
    elm_genlist_realized_items_update(obj);
}

Evas_Object *__genlist_create(UploadViewData *vd)
{
    Evas_Object *genlist = elm_genlist_add(vd->ad->naviframe);
    elm_object_style_set(genlist, "dialogue");
    elm_genlist_mode_set(genlist, ELM_LIST_COMPRESS);
    evas_object_smart_callback_add(genlist, "language,changed", __language_changed_cb, nullptr);
    __list_keys_add(genlist);
    evas_object_show(genlist);
    elm_object_part_content_set(vd->layout, "elm.swallow.genlist", genlist);
    return genlist;
}

Elm_Object_Item *__row_append(UploadViewData *vd, Elm_Genlist_Item_Class *itc, ItemData *record, Evas_Smart_Cb cb)
{
    record->gen_it = elm_genlist_item_append(vd->genlist, itc, record, nullptr, ELM_GENLIST_ITEM_NONE, cb, record);
    return record->gen_it;
}

void __velora_uploading_item_selected(void *data, Evas_Object *, void *event_info)
{
    auto *record = static_cast<ItemData *>(data);
    UploadViewData *vd = s_vd;
    if (!record || !vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    VELORA_LOGI("select item style is [%d]", record->type);
    auto *row = static_cast<Elm_Object_Item *>(event_info);
    if (record->type == ITEM_TYPE_UPLOADING && vd->is_select_mode)
        __selection_row_tapped(vd, record, row);
    if (record->type != ITEM_TYPE_FAILED)
        return;
    if (row) {
        elm_genlist_item_selected_set(row, EINA_FALSE);
        record->gen_it = row;
    }
    if (!vd->is_uploading)
        __retry_popup_show(record);
}

void __upload_row_append(UploadViewData *vd, UploadItem *item, int index)
{
    auto *record = new ItemData{
        .vd = vd, .name = g_strdup(__last_segment(item->server_path)), .index = index, .type = ITEM_TYPE_UPLOADING};
    if (item->state == UPLOAD_STATE_FAILED) {
        record->type = ITEM_TYPE_FAILED;
        record->path = g_strdup(item->path);
        item->gen_it = __row_append(vd, vd->itc_fail, record, __velora_uploading_item_selected);
        return;
    }
    item->gen_it = __row_append(vd, vd->itc_uploading, record, __velora_uploading_item_selected);
    __row_tappable_set(item->gen_it, vd->is_select_mode);
}

void __result_rows_append(UploadViewData *vd, bool is_reentry)
{
    AppData *ad = vd->ad;
    const bool is_success = g_strcmp0(ad->display_type, "success") == 0;
    const bool is_failure = g_strcmp0(ad->display_type, "fail") == 0;
    __state_show(vd, is_failure && ad->result_path_count == 0 ? VIEW_STATE_FULL : VIEW_STATE_NONE);
    GList *entry = ad->upload_list;
    for (int i = 0; i < ad->result_path_count; i++, entry = entry->next) {
        if (!entry) {
            VELORA_LOGE("upload_item is NULL");
            return;
        }
        auto *item = static_cast<UploadItem *>(entry->data);
        if (!is_success && !is_failure)
            continue;
        if (is_reentry && item->state == UPLOAD_STATE_CANCELED)
            continue;
        auto *record = new ItemData{.vd = vd,
                                    .name = g_strdup(__last_segment(ad->result_paths[i])),
                                    .index = i,
                                    .type = is_success ? ITEM_TYPE_UPLOADED : ITEM_TYPE_FAILED,
                                    .path = g_strdup(ad->result_paths[i])};
        item->gen_it = __row_append(vd, is_success ? vd->itc_file : vd->itc_fail, record,
                                    is_success ? nullptr : __velora_uploading_item_selected);
        __row_tappable_set(item->gen_it, !is_success);
    }
}
