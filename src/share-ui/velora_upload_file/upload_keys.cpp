// The toolkit takes the keys to rows that can be selected; most uploads cannot, and what can be done with them is on
// their cancel button.
#include "velora_upload_file/upload_keys.h"
#include "velora_upload_file/upload_row.h"
#include "velora_upload_file/upload_select.h"
#include <cstring>

static Evas_Object *__cancel_button_of(Elm_Object_Item *row)
{
    Evas_Object *layout = elm_object_item_part_content_get(row, "elm.icon.2");
    Evas_Object *content = layout ? elm_object_part_content_get(layout, "elm.swallow.content") : nullptr;
    const char *type = content ? elm_object_widget_type_get(content) : nullptr;
    return type && std::strcmp(type, "Elm_Button") == 0 ? content : nullptr;
}

// Whether there is anything for the keys in a row. A row that is out of sight has no button yet.
static bool __is_stop(UploadViewData *vd, Elm_Object_Item *row)
{
    const auto *record = __row_record(row);
    return elm_genlist_item_select_mode_get(row) == ELM_OBJECT_SELECT_MODE_DEFAULT ||
           (record && record->type == ITEM_TYPE_UPLOADING && !vd->is_select_mode);
}

static Elm_Object_Item *__current_row(UploadViewData *vd)
{
    if (Elm_Object_Item *row = elm_object_focused_item_get(vd->genlist))
        return row;
    Eina_List *realized = elm_genlist_realized_items_get(vd->genlist);
    Elm_Object_Item *found = nullptr;
    void *row = nullptr;
    EINA_LIST_FREE(realized, row)
    {
        const Evas_Object *button = __cancel_button_of(static_cast<Elm_Object_Item *>(row));
        if (button && elm_object_focus_get(button))
            found = static_cast<Elm_Object_Item *>(row);
    }
    return found;
}

static void __row_focus(UploadViewData *vd, Elm_Object_Item *row)
{
    elm_genlist_item_show(row, ELM_GENLIST_ITEM_SCROLLTO_IN);
    evas_smart_objects_calculate(evas_object_evas_get(vd->genlist)); // the row has its button after this
    if (Evas_Object *button = __cancel_button_of(row))
        elm_object_focus_set(button, EINA_TRUE);
    else
        elm_object_item_focus_set(row, EINA_TRUE);
}

static Eina_Bool __list_key_cb(void *, Evas_Object *, Evas_Object *, Evas_Callback_Type type, void *event_info)
{
    UploadViewData *vd = s_vd;
    if (!vd || vd->phase == PHASE_BROWSING || type != EVAS_CALLBACK_KEY_DOWN)
        return EINA_FALSE;
    auto *event = static_cast<Evas_Event_Key_Down *>(event_info);
    const bool is_down = std::strcmp(event->key, "Down") == 0 || std::strcmp(event->key, "KP_Down") == 0;
    const bool is_up = std::strcmp(event->key, "Up") == 0 || std::strcmp(event->key, "KP_Up") == 0;
    if (!is_down && !is_up)
        return EINA_FALSE;
    const auto step = is_down ? elm_genlist_item_next_get : elm_genlist_item_prev_get;
    Elm_Object_Item *row = __current_row(vd);
    if (row)
        row = step(row);
    else
        row = is_down ? elm_genlist_first_item_get(vd->genlist) : elm_genlist_last_item_get(vd->genlist);
    while (row && !__is_stop(vd, row))
        row = step(row);
    // Past the ends: on to what stands above or below the list.
    if (row)
        __row_focus(vd, row);
    else if (is_up && __select_all_row())
        elm_object_item_focus_set(__select_all_row(), EINA_TRUE);
    else if (is_up)
        elm_object_focus_set(elm_object_item_part_content_get(vd->nf_item, "prev_btn"), EINA_TRUE);
    else if (vd->more_btn)
        elm_object_focus_set(vd->more_btn, EINA_TRUE);
    event->event_flags = static_cast<Evas_Event_Flags>(event->event_flags | EVAS_EVENT_FLAG_ON_HOLD);
    return EINA_TRUE;
}

void __list_keys_add(Evas_Object *genlist)
{
    elm_object_event_callback_add(genlist, __list_key_cb, nullptr);
}
