// The rows of the page, and its switches: what one shows is what the cloud client stores.
#include "notification/notification.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_row_control.h"
#include "velora_details_content_sync/details_record.h"
#include <clocale>
#include <cstring>
#include <libintl.h>

using details::s_vd;

const char *__details_text(const char *id)
{
    return id && *id ? dcgettext(VELORA_DOMAIN, id, LC_MESSAGES) : "";
}

void __details_not_saved(DetailsViewData *vd)
{
    notification_status_message_post(__details_text("IDS_VELORA_BODY_SETTING_NOT_SAVED"));
    __details_refresh(vd); // the account itself may be gone
}

// What each switch stands for.

using Get = int (*)(CloudSyncHandle handle, int content_type, bool *value);
using Set = int (*)(CloudSyncHandle handle, int content_type, bool value);

static int __get_camera_upload(CloudSyncHandle handle, int, bool *value)
{
    return cloud_content_sync_setting_get_camera_upload(handle, value);
}

static int __set_camera_upload(CloudSyncHandle handle, int, bool value)
{
    return cloud_content_sync_setting_set_camera_upload(handle, value);
}

struct Switch {
    Get get;
    Set set;
    int content_type;
    const char *get_name, *set_name;              // for the log
    bool DetailsViewData::*value;                 // where the page keeps it
    Elm_Object_Item *DetailsViewData::*companion; // the row that is of no use while this is off
};
static constexpr Switch __wifi_only(int content_type)
{
    return {cloud_content_sync_setting_get_wifi_only_type,
            cloud_content_sync_setting_set_wifi_only_type,
            content_type,
            "get_wifi_only_type",
            "set_wifi_only_type",
            nullptr,
            nullptr};
}

static const Switch &__switch_of(int kind)
{
    static const Switch switches[] = {
        {__get_camera_upload, __set_camera_upload, CLOUD_CONTENT_TYPE_CAMERA, "get_camera_upload", "set_camera_upload",
         &DetailsViewData::is_camera_upload, &DetailsViewData::camera_wifi_item},
        {cloud_content_sync_setting_get_type_activation, cloud_content_sync_setting_set_type_activation,
         CLOUD_CONTENT_TYPE_IMAGE, "get_type_activation", "set_type_activation", &DetailsViewData::is_images,
         &DetailsViewData::images_wifi_item},
        {cloud_content_sync_setting_get_type_activation, cloud_content_sync_setting_set_type_activation,
         CLOUD_CONTENT_TYPE_VIDEO, "get_type_activation", "set_type_activation", &DetailsViewData::is_videos,
         &DetailsViewData::videos_wifi_item},
        __wifi_only(CLOUD_CONTENT_TYPE_CAMERA),
        __wifi_only(CLOUD_CONTENT_TYPE_IMAGE),
        __wifi_only(CLOUD_CONTENT_TYPE_VIDEO),
    };
    return switches[kind - DETAIL_ITEM_CAMERA_UPLOAD];
}

// What is stored. False where it cannot be read, and with nobody signed in.
static bool __switch_read(const DetailsViewData *vd, int kind)
{
    const Switch &one = __switch_of(kind);
    bool value = false;
    if (const int error = one.get(vd->client.get(), one.content_type, &value); error != 0) {
        VELORA_LOGE("Failed to cloud_content_sync_setting_%s:[%d]", one.get_name, error);
        return false;
    }
    return value && vd->account;
}

static bool __switch_write(const DetailsViewData *vd, int kind, bool state)
{
    const Switch &one = __switch_of(kind);
    const int error = one.set(vd->client.get(), one.content_type, state);
    if (error != 0)
        VELORA_LOGE("Failed to cloud_content_sync_setting_%s:[%d]", one.set_name, error);
    return error == 0;
}

// A tap on the row, or on the switch.

void __details_row_say(Elm_Object_Item *item, const char *state_id)
{
    const auto *row = static_cast<DetailsItemData *>(elm_object_item_data_get(item));
    std::string name = __details_text(row->text1);
    if (*state_id)
        name = name + ", " + __details_text(state_id);
    ea_screen_reader_name_set(item, name.c_str());
    Evas_Object *control = row->check ? row->check : row->radio;
    if (control)
        ea_screen_reader_name_set(control, __details_text(row->text1));
}

static void __switch_show(Elm_Object_Item *item, bool state)
{
    auto *row = static_cast<DetailsItemData *>(elm_object_item_data_get(item));
    __details_row_say(item, state ? "IDS_VELORA_BODY_ON" : "IDS_VELORA_BODY_OFF");
    DetailsViewData *vd = row->vd;
    vd->is_setting = true;
    if (row->check && (elm_check_state_get(row->check) == EINA_TRUE) != state)
        elm_check_state_set(row->check, state);
    vd->is_setting = false;
    const Switch &one = __switch_of(row->kind);
    if (!one.companion)
        return;
    vd->*one.value = state;
    if (Elm_Object_Item *companion = vd->*one.companion)
        elm_object_item_disabled_set(companion, !state);
}

static void __detail_update_genlist_statue(DetailsItemData *row, DetailsViewData *vd, bool state)
{
    Elm_Object_Item *item = elm_genlist_nth_item_get(vd->genlist, static_cast<unsigned>(row->index));
    if (__switch_write(vd, row->kind, state))
        __switch_show(item, __switch_read(vd, row->kind));
    else
        __details_not_saved(vd);
}

static void __gl_sel_switch_cb(void *, Evas_Object *, void *event_info)
{
    auto *item = static_cast<Elm_Object_Item *>(event_info);
    if (!item) {
        VELORA_LOGE("Invalid argument: event_info is NULL");
        return;
    }
    elm_genlist_item_selected_set(item, EINA_FALSE);
    auto *row = static_cast<DetailsItemData *>(elm_object_item_data_get(item));
    if (!s_vd || !row->check || elm_object_item_disabled_get(item))
        return;
    __detail_update_genlist_statue(row, s_vd, !elm_check_state_get(row->check));
}

static void __detail_check_changed_cb(void *data, Evas_Object *check, void *)
{
    auto *row = static_cast<DetailsItemData *>(data);
    if (s_vd && !s_vd->is_setting)
        __detail_update_genlist_statue(row, s_vd, elm_check_state_get(check));
}

// What the list asks for.

static char *__gl_text_get(void *data, Evas_Object *, const char *part)
{
    const auto *row = static_cast<DetailsItemData *>(data);
    if (!row) {
        VELORA_LOGE("item_data is NULL");
        return nullptr;
    }
    for (const char *main : {"elm.text.main.left.top", "elm.text.main.left", "elm.text.multiline", "elm.text.main"})
        if (std::strcmp(part, main) == 0)
            return strdup(__details_text(row->text1));
    return std::strcmp(part, "elm.text.sub.left.bottom") == 0 ? strdup(__details_text(row->text2)) : nullptr;
}

static Evas_Object *__check_create(Evas_Object *genlist, DetailsItemData *row)
{
    Evas_Object *check = elm_check_add(genlist);
    __details_control_keep(row, &row->check, check);
    elm_object_style_set(check, "on&off");
    elm_check_state_set(check, __switch_read(row->vd, row->kind));
    elm_object_focus_allow_set(check, EINA_FALSE); // keys operate the row
    ea_screen_reader_name_set(check, __details_text(row->text1));
    evas_object_smart_callback_add(check, "changed", __detail_check_changed_cb, row);
    return _velora_common_row_control(genlist, check);
}

static Evas_Object *__gl_content_get(void *data, Evas_Object *obj, const char *part)
{
    auto *row = static_cast<DetailsItemData *>(data);
    if (!row) {
        VELORA_LOGE("Invalid argument: data is NULL");
        return nullptr;
    }
    if (!obj) {
        VELORA_LOGE("Invalid obj: event_info is NULL");
        return nullptr;
    }
    if (std::strcmp(part, "elm.icon.bar") == 0)
        return __storage_bar_create(obj, row);
    if (std::strcmp(part, "elm.icon.2") != 0)
        return nullptr;
    if (g_strcmp0(row->text3, "check") == 0)
        return __check_create(obj, row);
    return g_strcmp0(row->text3, "radio") == 0 ? __schedule_radio_create(obj, row) : nullptr;
}

static void __control_deleted_cb(void *data, Evas *, Evas_Object *obj, void *)
{
    auto *row = static_cast<DetailsItemData *>(data);
    for (Evas_Object **slot : {&row->check, &row->radio})
        if (*slot == obj)
            *slot = nullptr;
}

void __details_control_keep(DetailsItemData *row, Evas_Object **slot, Evas_Object *control)
{
    *slot = control;
    evas_object_event_callback_add(control, EVAS_CALLBACK_DEL, __control_deleted_cb, row);
}

static void __gl_del(void *data, Evas_Object *)
{
    auto *row = static_cast<DetailsItemData *>(data);
    for (Evas_Object *control : {row->check, row->radio}) // the list deletes them behind us
        if (control)
            evas_object_event_callback_del_full(control, EVAS_CALLBACK_DEL, __control_deleted_cb, row);
    for (char *text : {row->text1, row->text2, row->text3})
        g_free(text);
    delete row;
}

static Elm_Genlist_Item_Class *__item_class_create(const char *style)
{
    Elm_Genlist_Item_Class *itc = elm_genlist_item_class_new();
    itc->item_style = style;
    itc->func.text_get = __gl_text_get;
    itc->func.content_get = __gl_content_get;
    itc->func.del = __gl_del;
    return itc;
}

void __details_item_classes_create(DetailsViewData *vd)
{
    vd->itc_storage = __item_class_create("2line.top.3");
    vd->itc_2line = __item_class_create("2line.top");
    vd->itc_1line = __item_class_create("1line");
    vd->itc_group = __item_class_create("groupindex");
}

void __details_item_classes_free(DetailsViewData *vd)
{
    for (Elm_Genlist_Item_Class *itc : {vd->itc_storage, vd->itc_2line, vd->itc_1line, vd->itc_group})
        elm_genlist_item_class_free(itc);
}

DetailsItemData *__create_genlist_item_data(int index, DetailsViewData *vd, const char *text1, const char *text2,
                                            const char *text3, int kind)
{
    return new DetailsItemData{.index = index,
                               .vd = vd,
                               .text1 = g_strdup(text1),
                               .text2 = g_strdup(text2),
                               .text3 = g_strdup(text3),
                               .kind = kind};
}

static Elm_Object_Item *__append(DetailsViewData *vd, Elm_Genlist_Item_Class *itc, const char *text1,
                                 const char *text2 = nullptr, int kind = DETAIL_ITEM_NONE,
                                 Evas_Smart_Cb tapped = nullptr)
{
    const int index = static_cast<int>(elm_genlist_items_count(vd->genlist));
    Elm_Object_Item *item = elm_genlist_item_append(
        vd->genlist, itc, __create_genlist_item_data(index, vd, text1, text2, kind ? "check" : nullptr, kind), nullptr,
        ELM_GENLIST_ITEM_NONE, tapped, vd);
    if (!tapped)
        elm_genlist_item_select_mode_set(item, ELM_OBJECT_SELECT_MODE_NONE);
    return item;
}

static void __group_append(DetailsViewData *vd, const char *title, int kind, const char *text, int wifi_kind,
                           const char *wifi_text)
{
    __append(vd, vd->itc_group, title);
    __append(vd, vd->itc_1line, text, nullptr, kind, __gl_sel_switch_cb);
    vd->*__switch_of(kind).companion = __append(vd, vd->itc_1line, wifi_text, nullptr, wifi_kind, __gl_sel_switch_cb);
}

// A switch and its companion make one card.
static void __row_realized_cb(void *, Evas_Object *, void *event_info)
{
    auto *item = static_cast<Elm_Object_Item *>(event_info);
    const int kind = static_cast<DetailsItemData *>(elm_object_item_data_get(item))->kind;
    if (kind != DETAIL_ITEM_NONE)
        elm_object_item_signal_emit(item, __switch_of(kind).companion ? "elm,state,top" : "elm,state,bottom", "elm");
}

// The toolkit takes the keys to titles too, which cannot even show it.
static bool __is_stop(Elm_Object_Item *item)
{
    return elm_genlist_item_select_mode_get(item) == ELM_OBJECT_SELECT_MODE_DEFAULT &&
           !elm_object_item_disabled_get(item);
}

static Evas_Object *__beyond(const DetailsViewData *vd, bool is_down)
{
    if (!is_down)
        return elm_object_item_part_content_get(vd->nf_item, "prev_btn");
    if (vd->more_btn)
        return vd->more_btn;
    Evas_Object *bar = elm_object_item_part_content_get(vd->nf_item, "toolbar");
    return bar ? elm_object_part_content_get(bar, "emergency_btn") : nullptr;
}

static Eina_Bool __list_key_cb(void *data, Evas_Object *genlist, Evas_Object *, Evas_Callback_Type type,
                               void *event_info)
{
    if (type != EVAS_CALLBACK_KEY_DOWN)
        return EINA_FALSE;
    const auto *vd = static_cast<DetailsViewData *>(data);
    auto *event = static_cast<Evas_Event_Key_Down *>(event_info);
    const bool is_down = std::strcmp(event->key, "Down") == 0 || std::strcmp(event->key, "KP_Down") == 0;
    if (!is_down && std::strcmp(event->key, "Up") != 0 && std::strcmp(event->key, "KP_Up") != 0)
        return EINA_FALSE;
    const auto step = is_down ? elm_genlist_item_next_get : elm_genlist_item_prev_get;
    Elm_Object_Item *item = elm_object_focused_item_get(genlist);
    if (item)
        item = step(item);
    else
        item = is_down ? elm_genlist_first_item_get(genlist) : elm_genlist_last_item_get(genlist);
    while (item && !__is_stop(item))
        item = step(item);
    if (!is_down && item == vd->schedule_item) // what no key stops at comes into sight with it
        elm_genlist_item_show(vd->storage_item, ELM_GENLIST_ITEM_SCROLLTO_IN);
    if (item) {
        elm_genlist_item_show(item, ELM_GENLIST_ITEM_SCROLLTO_IN);
        elm_object_item_focus_set(item, EINA_TRUE);
    } else if (Evas_Object *next = __beyond(vd, is_down)) {
        elm_object_focus_set(next, EINA_TRUE);
    }
    event->event_flags = static_cast<Evas_Event_Flags>(event->event_flags | EVAS_EVENT_FLAG_ON_HOLD);
    return EINA_TRUE;
}

void __details_rows_append(DetailsViewData *vd)
{
    elm_object_event_callback_add(vd->genlist, __list_key_cb, vd);
    evas_object_smart_callback_add(vd->genlist, "realized", __row_realized_cb, nullptr);
    vd->storage_item = __append(vd, vd->itc_storage, "IDS_CLOUD_BODY_STORAGE_USAGE", "IDS_CLOUD_OPT_LOADING_ING_ABB");
    __append(vd, vd->itc_group, "IDS_ST_HEADER_SYNCED_BY_ORVANT_ABB");
    vd->schedule_item = __append(vd, vd->itc_2line, "IDS_CLOUD_BODY_SYNC_SCHEDULE", nullptr, DETAIL_ITEM_NONE,
                                 __gl_sel_sync_schedule_cb);
    __group_append(vd, "IDS_COM_HEADER_CAMERA", DETAIL_ITEM_CAMERA_UPLOAD, "IDS_CLOUD_OPT_CAMERA_UPLOAD_ABB",
                   DETAIL_ITEM_CAMERA_WIFI_ONLY, "IDS_ST_OPT_UPLOAD_VIA_WI_FI_ONLY_ABB");
    __group_append(vd, "IDS_CLOUD_BODY_PICTURES", DETAIL_ITEM_SYNC_IMAGES, "IDS_ST_MBODY_SYNC_IMAGES",
                   DETAIL_ITEM_IMAGES_WIFI_ONLY, "IDS_ST_MBODY_SYNC_IMAGES_VIA_WI_FI_ONLY_ABB");
    __group_append(vd, "IDS_CLOUD_BODY_VIDEOS_ABB", DETAIL_ITEM_SYNC_VIDEOS, "IDS_ST_MBODY_SYNC_VIDEOS",
                   DETAIL_ITEM_VIDEOS_WIFI_ONLY, "IDS_ST_MBODY_SYNC_VIDEOS_VIA_WI_FI_ONLY_ABB");
}

void __details_text2_set(Elm_Object_Item *item, const char *text)
{
    auto *row = static_cast<DetailsItemData *>(elm_object_item_data_get(item));
    if (!row) {
        VELORA_LOGE("item_data is NULL");
        return;
    }
    g_free(row->text2);
    row->text2 = g_strdup(text);
}

void __details_rows_read(DetailsViewData *vd)
{
    vd->sync_schedule_value = __get_sync_schedule_value(vd->client.get());
    __schedule_row_update(vd);
    elm_object_item_disabled_set(vd->schedule_item, !vd->account);
    for (Elm_Object_Item *item = elm_genlist_first_item_get(vd->genlist); item;
         item = elm_genlist_item_next_get(item)) {
        auto *row = static_cast<DetailsItemData *>(elm_object_item_data_get(item));
        if (row->kind == DETAIL_ITEM_NONE) {
            if (item != vd->storage_item && item != vd->schedule_item)
                __details_row_say(item, "");
            continue;
        }
        if (__switch_of(row->kind).companion)
            elm_object_item_disabled_set(item, !vd->account);
        __switch_show(item, __switch_read(vd, row->kind));
    }
}
