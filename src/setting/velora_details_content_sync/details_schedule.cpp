// How often the account is kept fresh: the row, and the popup in which one of five intervals is chosen.
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_row_control.h"
#include "velora_details_content_sync/details_record.h"
#include <algorithm>
#include <cstdio>
#include <iterator>

using details::s_vd;

static const char s_topic[] = "schedule";

struct Schedule {
    int seconds;
    const char *text_id;
    int hours; // for a text that names them; else 0
};
static const Schedule s_schedules[] = {
    {3600, "IDS_CLOUD_OPT_EVERY_HOUR", 0},      {10800, "IDS_CLOUD_OPT_EVERY_PD_HOURS", 3},
    {21600, "IDS_CLOUD_OPT_EVERY_PD_HOURS", 6}, {43200, "IDS_CLOUD_OPT_EVERY_PD_HOURS", 12},
    {86400, "IDS_CLOUD_OPT_EVERY_DAY", 0},
};
static constexpr int s_schedule_count = std::size(s_schedules);

int __get_sync_schedule_value(CloudSyncHandle handle)
{
    int type = CLOUD_CONTENT_SYNC_REFRESH_TYPE_PERIODIC, seconds = 0;
    if (cloud_content_sync_setting_get_refresh_type(handle, &type, &seconds) != 0) {
        VELORA_LOGE("cloud_content_sync_setting_get_refresh_type failed");
        return 0;
    }
    if (type != CLOUD_CONTENT_SYNC_REFRESH_TYPE_PERIODIC)
        return 0;
    for (int i = 0; i < s_schedule_count; i++)
        if (s_schedules[i].seconds == seconds)
            return i;
    VELORA_LOGE("Error time");
    return 0;
}

static bool __set_content_sync_refresh_type(CloudSyncHandle handle, int value)
{
    int seconds = 0;
    if (value >= 0 && value < s_schedule_count)
        seconds = s_schedules[value].seconds;
    else
        VELORA_LOGE("Error sync_schedule_value");
    if (cloud_content_sync_setting_set_refresh_type(handle, CLOUD_CONTENT_SYNC_REFRESH_TYPE_PERIODIC, seconds) == 0)
        return true;
    VELORA_LOGE("cloud_content_sync_setting_set_refresh_type failed");
    return false;
}

char *__schedule_text_get(int value)
{
    if (value < 0 || value >= s_schedule_count)
        return nullptr;
    const Schedule &schedule = s_schedules[value];
    if (schedule.hours == 0)
        return g_strdup(schedule.text_id);
    char text[1024];
    std::snprintf(text, sizeof text, __details_text(schedule.text_id), schedule.hours);
    return g_strdup(text);
}

void __schedule_row_update(DetailsViewData *vd)
{
    char *text = __schedule_text_get(vd->sync_schedule_value);
    __details_text2_set(vd->schedule_item, text);
    elm_genlist_item_fields_update(vd->schedule_item, "elm.text.sub.left.bottom", ELM_GENLIST_ITEM_FIELD_TEXT);
    g_free(text);
}

// The popup must not go before its row has got the whole of the key that chose it.
static void __sync_schedule_save_cb(void *data)
{
    auto *vd = static_cast<DetailsViewData *>(data);
    vd->job = nullptr;
    _velora_popup_take_away(vd->ad, {vd, s_topic});
    if (!__set_content_sync_refresh_type(vd->client.get(), vd->chosen_schedule))
        __details_not_saved(vd);
    vd->sync_schedule_value = __get_sync_schedule_value(vd->client.get());
    __schedule_row_update(vd);
}

static void __choose(int index)
{
    DetailsViewData *vd = s_vd;
    if (!vd || vd->job || !_velora_popup_is_shown(vd->ad, {vd, s_topic}))
        return;
    vd->chosen_schedule = index;
    vd->job = ecore_job_add(__sync_schedule_save_cb, vd);
}

static void __sync_schedule_gl_sel_cb(void *, Evas_Object *, void *event_info)
{
    auto *item = static_cast<Elm_Object_Item *>(event_info);
    if (!item) {
        VELORA_LOGE("Invalid argument: event_info is NULL");
        return;
    }
    elm_genlist_item_selected_set(item, EINA_FALSE);
    const auto *row = static_cast<DetailsItemData *>(elm_object_item_data_get(item));
    VELORA_LOGI("data_subItem->index: %d", row->index);
    __choose(row->index);
}

static void __sync_schedule_radio_changed_cb(void *data, Evas_Object *, void *)
{
    __choose(static_cast<int>(reinterpret_cast<intptr_t>(data)));
}

Evas_Object *__schedule_radio_create(Evas_Object *genlist, DetailsItemData *row)
{
    auto *group = static_cast<Evas_Object *>(evas_object_data_get(genlist, "radio"));
    Evas_Object *radio = elm_radio_add(genlist);
    __details_control_keep(row, &row->radio, radio);
    elm_radio_state_value_set(radio, row->index + 1); // before the group, which marks it by its value
    elm_radio_group_add(radio, group);
    elm_radio_value_set(group, row->vd->sync_schedule_value + 1);
    evas_object_size_hint_weight_set(radio, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(radio, EVAS_HINT_FILL, EVAS_HINT_FILL);
    elm_object_focus_allow_set(radio, EINA_FALSE); // keys choose the row
    ea_screen_reader_name_set(radio, __details_text(row->text1));
    evas_object_smart_callback_add(radio, "changed", __sync_schedule_radio_changed_cb,
                                   reinterpret_cast<void *>(static_cast<intptr_t>(row->index)));
    return _velora_common_row_control(genlist, radio);
}

static void __popup_back_cb(void *, Evas_Object *, void *)
{
    if (s_vd)
        _velora_popup_take_away(s_vd->ad, {s_vd, s_topic});
}

static void __choice_say(Elm_Object_Item *item)
{
    const auto *row = static_cast<DetailsItemData *>(elm_object_item_data_get(item));
    __details_row_say(item, row->index == row->vd->sync_schedule_value ? "IDS_VELORA_BODY_SELECTED" : "");
}

// The finished texts of the choices are in the language that they were made in.
static void __language_changed_cb(void *, Evas_Object *genlist, void *)
{
    for (Elm_Object_Item *item = elm_genlist_first_item_get(genlist); item; item = elm_genlist_item_next_get(item)) {
        auto *row = static_cast<DetailsItemData *>(elm_object_item_data_get(item));
        g_free(row->text1);
        row->text1 = __schedule_text_get(row->index);
        __choice_say(item);
    }
    elm_genlist_realized_items_update(genlist);
}

static Evas_Object *__choices_create(DetailsViewData *vd, Evas_Object *parent)
{
    Evas_Object *genlist = elm_genlist_add(parent);
    elm_object_style_set(genlist, "popup");
    elm_genlist_mode_set(genlist, ELM_LIST_COMPRESS);
    evas_object_size_hint_weight_set(genlist, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(genlist, EVAS_HINT_FILL, EVAS_HINT_FILL);
    evas_object_smart_callback_add(genlist, "language,changed", __language_changed_cb, nullptr);
    Evas_Object *group = elm_radio_add(genlist);
    elm_radio_state_value_set(group, 0);
    elm_radio_value_set(group, 0);
    ea_screen_reader_name_set(group, __details_text("IDS_CLOUD_BODY_SYNC_SCHEDULE"));
    evas_object_data_set(genlist, "radio", group);
    VELORA_LOGI("vd->sync_schedule_value is [%d]", vd->sync_schedule_value);
    for (int i = 0; i < s_schedule_count; i++) {
        char *text = __schedule_text_get(i);
        __choice_say(elm_genlist_item_append(
            genlist, vd->itc_1line, __create_genlist_item_data(i, vd, text, nullptr, "radio", DETAIL_ITEM_NONE),
            nullptr, ELM_GENLIST_ITEM_NONE, __sync_schedule_gl_sel_cb, vd));
        g_free(text);
    }
    evas_object_show(genlist);
    return genlist;
}

// A list takes what it is given, and a table works its least size out from what is in it: this gives it its height, as
// much as all choices need when the window has it.
static void __height_fit(Evas_Object *height, Evas_Object *genlist)
{
    constexpr double least = 288, most = 0.6; // pixels of the density that the pages are drawn for; of the window
    int window = 0, needed = 0;
    evas_object_geometry_get(elm_object_top_widget_get(genlist), nullptr, nullptr, nullptr, &window);
    elm_scroller_child_size_get(genlist, nullptr, &needed);
    const double wanted = std::max(least * elm_config_scale_get() / elm_app_base_scale_get(), 1.0 * needed);
    evas_object_size_hint_min_set(height, 0, static_cast<int>(std::min(wanted, window * most)));
}

static void __realized_cb(void *data, Evas_Object *genlist, void *)
{
    __height_fit(static_cast<Evas_Object *>(data), genlist);
}

void __gl_sel_sync_schedule_cb(void *data, Evas_Object *, void *event_info)
{
    auto *item = static_cast<Elm_Object_Item *>(event_info);
    if (!item) {
        VELORA_LOGE("Invalid argument: event_info is NULL");
        return;
    }
    elm_genlist_item_selected_set(item, EINA_FALSE);
    auto *vd = static_cast<DetailsViewData *>(data);
    if (vd->job || vd->ad->popup)
        return;
    Evas_Object *popup = elm_popup_add(vd->ad->win_main);
    ea_object_event_callback_add(popup, EA_CALLBACK_BACK, __popup_back_cb, nullptr);
    elm_object_domain_translatable_part_text_set(popup, "title,text", VELORA_DOMAIN, "IDS_CLOUD_BODY_SYNC_SCHEDULE");
    evas_object_size_hint_weight_set(popup, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    Evas_Object *table = elm_table_add(popup);
    evas_object_size_hint_weight_set(table, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(table, EVAS_HINT_FILL, EVAS_HINT_FILL);
    Evas_Object *height = evas_object_rectangle_add(evas_object_evas_get(popup));
    evas_object_size_hint_weight_set(height, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    elm_table_pack(table, height, 0, 0, 1, 1);
    Evas_Object *genlist = __choices_create(vd, table);
    elm_table_pack(table, genlist, 0, 0, 1, 1);
    __height_fit(height, genlist);
    evas_object_smart_callback_add(genlist, "realized", __realized_cb, height);
    elm_object_content_set(popup, table);
    evas_object_show(popup);
    _velora_popup_show(vd->ad, {vd, s_topic}, popup);
}
