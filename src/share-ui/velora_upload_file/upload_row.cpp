#include "velora_upload_file/upload_row.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_paths.h"
#include <cstring>

static void (*s_forget)(ItemData *record);
static void (*s_gone)(const ItemData *record);

void __row_gone_cb_set(void (*gone)(const ItemData *record))
{
    s_gone = gone;
}

void __row_forget_cb_set(void (*forget)(ItemData *record))
{
    s_forget = forget;
}

ItemData *__row_record(Elm_Object_Item *row)
{
    return row ? static_cast<ItemData *>(elm_object_item_data_get(row)) : nullptr;
}

static void __gl_del(void *data, Evas_Object *)
{
    auto *record = static_cast<ItemData *>(data);
    if (!record) {
        VELORA_LOGE("item_data is NULL");
        return;
    }
    // No message of a run may reach a row that is gone.
    if (record->item && record->item->gen_it == record->gen_it)
        record->item->gen_it = nullptr;
    if (record->item && s_gone)
        s_gone(record);
    if (record->handle && s_forget)
        s_forget(record);
    if (record->folder)
        cloud_content_sync_folder_destroy(record->folder);
    if (record->content)
        cloud_content_sync_content_destroy(record->content);
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

Elm_Object_Item *__row_append(UploadViewData *vd, Elm_Genlist_Item_Class *itc, ItemData *record, Evas_Smart_Cb cb)
{
    record->gen_it = elm_genlist_item_append(vd->genlist, itc, record, nullptr, ELM_GENLIST_ITEM_NONE, cb, record);
    if (record->item)
        record->item->gen_it = record->gen_it;
    return record->gen_it;
}

Evas_Object *__row_layout_create(Evas_Object *parent, const char *style, Evas_Object **content,
                                 Evas_Object *(*add)(Evas_Object *))
{
    Evas_Object *layout = elm_layout_add(parent);
    elm_layout_theme_set(layout, "layout", style, "default");
    *content = add(layout);
    elm_object_part_content_set(layout, "elm.swallow.content", *content);
    return layout;
}

Evas_Object *__row_check_create(Evas_Object *parent, bool is_on, Evas_Object **check)
{
    Evas_Object *layout = __row_layout_create(parent, "list/C/type.1", check, elm_check_add);
    elm_check_state_set(*check, is_on);
    evas_object_size_hint_weight_set(*check, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(*check, EVAS_HINT_FILL, EVAS_HINT_FILL);
    // The row is what is tapped and focused; the check only shows.
    elm_object_focus_allow_set(*check, EINA_FALSE);
    evas_object_pass_events_set(*check, EINA_TRUE);
    evas_object_repeat_events_set(layout, EINA_TRUE);
    return layout;
}

Evas_Object *__row_sign_create(Evas_Object *parent, const char *style, const char *group)
{
    Evas_Object *image = nullptr;
    Evas_Object *layout = __row_layout_create(parent, style, &image, elm_image_add);
    evas_object_repeat_events_set(layout, EINA_TRUE);
    evas_object_size_hint_aspect_set(layout, EVAS_ASPECT_CONTROL_BOTH, 1, 1);
    elm_image_file_set(image, _velora_common_app_file("res/edje/velora_edc_images.edj").c_str(), group);
    evas_object_size_hint_align_set(image, EVAS_HINT_FILL, EVAS_HINT_FILL);
    evas_object_size_hint_weight_set(image, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    return layout;
}

bool __is_tappable(const UploadViewData *vd, int type)
{
    return type == ITEM_TYPE_FAILED || (vd->is_select_mode && type == ITEM_TYPE_UPLOADING);
}

void __row_tappable_set(Elm_Object_Item *row, bool is_tappable)
{
    Evas_Object *genlist = elm_object_item_widget_get(row);
    const bool had_focus = !is_tappable && elm_object_focused_item_get(genlist) == row;
    if (had_focus)
        elm_object_item_focus_set(row, EINA_FALSE);
    elm_genlist_item_select_mode_set(row, is_tappable ? ELM_OBJECT_SELECT_MODE_DEFAULT
                                                      : ELM_OBJECT_SELECT_MODE_DISPLAY_ONLY);
    if (had_focus) {
        elm_object_focus_set(genlist, EINA_FALSE);
        elm_object_focus_set(genlist, EINA_TRUE);
    }
}

bool __is_part(const char *part, const char *name)
{
    return std::strcmp(part, name) == 0;
}

bool __is_icon_part(const char *part)
{
    return __is_part(part, "elm.icon") || __is_part(part, "elm.icon.1");
}
