#include "velora_upload_file/upload_list.h"
#include "velora_common/velora_log.h"
#include "velora_upload_file/upload_cancel.h"
#include "velora_upload_file/upload_icon.h"
#include "velora_upload_file/upload_keys.h"
#include "velora_upload_file/upload_listed.h"
#include "velora_upload_file/upload_page.h"
#include "velora_upload_file/upload_text.h"
#include <cstdlib>

// A name as a row shows it: passed through the translation.
static char *__name_markup(const char *name)
{
    return __one_line_markup(__text(name));
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
    char *markup = name ? __name_markup(name) : nullptr;
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
        return __name_markup(record->name.c_str());
    if (!__is_part(part, "elm.text.sub.left.bottom"))
        return nullptr;
    // One line, so that the row keeps its height: why, or where nobody knows what to do about it. The line above the
    // list says that of all, when they can be tapped.
    std::string text = __text("IDS_CLOUD_POP_UPLOAD_FAILED");
    const int error = record->item ? record->item->error.load() : 0;
    const char *why = error != 0 ? __failure_text(error) : nullptr;
    if (!why || text == why) // the words for a failure of no known kind say no more
        why = __text("IDS_VELORA_BODY_TAP_TO_RETRY");
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
    return __is_part(part, "elm.text.main.left.top") ? __name_markup(record->name.c_str()) : nullptr;
}

static Evas_Object *__dir_content_get(void *, Evas_Object *obj, const char *part)
{
    return __is_icon_part(part) ? __row_sign_create(obj, "list/B/type.2", "docshelf_icon_folder.png") : nullptr;
}

static Evas_Object *__ud_genlist_file_content_get(void *data, Evas_Object *obj, const char *part)
{
    auto *record = static_cast<ItemData *>(data);
    if (!record)
        return nullptr;
    if (__is_icon_part(part))
        return __file_icon_create(obj, record, record->item ? record->item->path : nullptr);
    if (!__is_part(part, "elm.icon.2") || record->type == ITEM_TYPE_CONTENT)
        return nullptr;
    return __row_sign_create(obj, "list/C/type.1",
                             record->type == ITEM_TYPE_UPLOADED ? "velora_icon_done" : "velora_icon_retry");
}

static Evas_Object *__cancel_button_create(Evas_Object *parent, ItemData *record)
{
    Evas_Object *button = nullptr;
    Evas_Object *layout = __row_layout_create(parent, "list/C/type.3", &button, elm_button_add);
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
    const bool is_selected = s_vd->run && s_vd->run->is_selected(record->item->index);
    Evas_Object *layout = __row_check_create(parent, is_selected, &check);
    ea_screen_reader_name_set(check, record->name.c_str());
    return layout;
}

static Evas_Object *__progress_create(Evas_Object *parent, const ItemData *record)
{
    const UploadItem *item = record->item.get();
    Evas_Object *bar = elm_progressbar_add(parent);
    ea_screen_reader_name_set(bar, record->name.c_str());
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
    const UploadItem *item = record && vd ? record->item.get() : nullptr;
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
    return __is_part(part, "elm.swallow.progressbar") ? __progress_create(obj, record) : nullptr;
}

// The style is that of any row with a second line; this one's is about a failure.
static Eina_Bool __failed_state_get(void *, Evas_Object *, const char *part)
{
    return __is_part(part, "failed");
}

void __item_classes_create(UploadViewData *vd)
{
    vd->itc_dir = __item_class_create("1line", __ud_genlist_dir_text_get, __dir_content_get);
    vd->itc_file = __item_class_create("1line", __ud_genlist_file_text_get, __ud_genlist_file_content_get);
    vd->itc_uploading =
        __item_class_create("2line.velora", __ud_genlist_uploading_text_get, __ud_genlist_uploading_content_get);
    vd->itc_fail = __item_class_create("2line.top", __ud_genlist_file_text_get, __ud_genlist_file_content_get);
    vd->itc_fail->func.state_get = __failed_state_get;
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
    __listed_watch(genlist);
    __list_keys_add(genlist);
    evas_object_show(genlist);
    elm_object_part_content_set(vd->layout, "elm.swallow.genlist", genlist);
    return genlist;
}

void __upload_row_restyle(UploadViewData *vd, Elm_Object_Item *row, int type)
{
    ItemData *record = __row_record(row);
    record->type = type;
    Elm_Genlist_Item_Class *const classes[] = {nullptr, vd->itc_uploading, vd->itc_file, vd->itc_fail};
    elm_genlist_item_item_class_update(row, classes[type]);
    __row_tappable_set(row, __is_tappable(vd, type));
    elm_genlist_item_update(row);
}

// What is on screen stays there when it can: a cancel button that is replaced while a finger is on it is never clicked.
void __upload_row_progress(const UploadItem *item)
{
    if (!item->gen_it) {
        VELORA_LOGI("upload_item->gen_it is NULL");
        return;
    }
    if (!__row_record(item->gen_it)->is_realized) // it is made anew when it comes into sight
        return;
    const int state = item->state;
    Evas_Object *bar = elm_object_item_part_content_get(item->gen_it, "elm.swallow.progressbar");
    if (bar && state == UPLOAD_STATE_UPLOADING && g_strcmp0(elm_object_style_get(bar), "list_progress") == 0) {
        elm_progressbar_value_set(bar, item->progress / 100.0);
        return;
    }
    elm_genlist_item_fields_update(item->gen_it, "elm.swallow.progressbar", ELM_GENLIST_ITEM_FIELD_CONTENT);
    if (state != UPLOAD_STATE_WAITING && state != UPLOAD_STATE_UPLOADING)
        elm_genlist_item_fields_update(item->gen_it, "elm.icon.2", ELM_GENLIST_ITEM_FIELD_CONTENT);
}
