#include "velora_upload_file/upload_select.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_genlist.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_popup.h"
#include "velora_upload_file/upload_cancel.h"
#include "velora_upload_file/upload_page.h"
#include "velora_upload_file/upload_progress.h"
#include "velora_upload_file/upload_row.h"
#include "velora_upload_file/upload_text.h"
#include <cstdio>
#include <cstring>

static const char s_topic[] = "stop";
static bool s_is_select_all = false;              // the state of the select-all check
static Evas_Object *s_select_all_check = nullptr; // the check itself, while its row is on screen
static Evas_Object *s_list = nullptr;             // the one-row list that holds the "Select All" row
static Elm_Object_Item *s_row = nullptr;          // that row

static void __select_all_set(bool is_on)
{
    s_is_select_all = is_on;
    if (s_select_all_check)
        elm_check_state_set(s_select_all_check, is_on);
}

// The title says how many are selected; with none there is nothing to be done.
static void __show_count(UploadViewData *vd, int count)
{
    char title[64];
    std::snprintf(title, sizeof title, __text("%d Selected"), count);
    __title_set_words(vd, title);
    if (vd->done_btn)
        elm_object_disabled_set(vd->done_btn, count == 0);
}

void __selection_title_refresh(UploadViewData *vd)
{
    if (vd->is_select_mode && vd->run)
        __show_count(vd, vd->run->selected());
}

static void __selection_clear(UploadViewData *vd)
{
    for (int i = 0; vd->run && i < vd->run->total(); i++)
        vd->run->select(i, false);
}

// The select-all row.

static char *__ud_delete_all_text_get(void *data, Evas_Object *, const char *part)
{
    if (!data) {
        VELORA_LOGE("item is NULL");
        return nullptr;
    }
    return std::strcmp(part, "elm.text.main.left") == 0 ? strdup(__text("Select All")) : nullptr;
}

static void __select_all_check_deleted_cb(void *, Evas *, Evas_Object *obj, void *)
{
    if (s_select_all_check == obj)
        s_select_all_check = nullptr;
}

static Evas_Object *__ud_delete_all_content_get(void *data, Evas_Object *obj, const char *part)
{
    if (!data) {
        VELORA_LOGE("item is NULL");
        return nullptr;
    }
    if (std::strcmp(part, "elm.icon.2") != 0)
        return nullptr;
    Evas_Object *layout = __row_check_create(obj, s_is_select_all, &s_select_all_check);
    ea_screen_reader_name_set(s_select_all_check, __text("Select All"));
    evas_object_event_callback_add(s_select_all_check, EVAS_CALLBACK_DEL, __select_all_check_deleted_cb, nullptr);
    return layout;
}

static void __select_all_toggle_cb(void *, Evas_Object *, void *event_info)
{
    auto *row = static_cast<Elm_Object_Item *>(event_info);
    elm_genlist_item_selected_set(row, EINA_FALSE);
    UploadViewData *vd = s_vd;
    if (!vd || !vd->is_select_mode || !vd->run)
        return;
    __select_all_set(!s_is_select_all);
    for (const RunFile &file : vd->run->files) {
        const int state = file.item->state;
        if (state != UPLOAD_STATE_DONE && state != UPLOAD_STATE_FAILED && state != UPLOAD_STATE_CANCELED)
            vd->run->select(file.index, s_is_select_all);
    }
    elm_genlist_realized_items_update(vd->genlist);
    elm_genlist_item_update(row);
    __show_count(vd, s_is_select_all ? vd->run->queued() : 0);
}

static void __language_changed_cb(void *, Evas_Object *obj, void *)
{
    elm_genlist_realized_items_update(obj);
}

static void __select_all_list_create(UploadViewData *vd)
{
    if (!vd->itc_select_all)
        vd->itc_select_all = __item_class_create("1line", __ud_delete_all_text_get, __ud_delete_all_content_get);
    s_list = elm_genlist_add(vd->ad->naviframe);
    elm_scroller_policy_set(s_list, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
    elm_object_style_set(s_list, "dialogue");
    evas_object_smart_callback_add(s_list, "language,changed", __language_changed_cb, nullptr);
    evas_object_show(s_list);
    auto *record = new ItemData;
    s_row = record->gen_it = elm_genlist_item_append(s_list, vd->itc_select_all, record, nullptr, ELM_GENLIST_ITEM_NONE,
                                                     __select_all_toggle_cb, record);
    elm_object_part_content_set(vd->layout, "elm.swallow.folder", s_list);
    elm_object_signal_emit(vd->layout, "elm.navi.show.select.all", "elm");
    evas_object_resize(s_list, 480, 70);
}

static void __select_all_list_delete(UploadViewData *vd)
{
    s_row = nullptr;
    if (!s_list)
        return;
    remove_genlist_item(s_list);
    elm_object_part_content_unset(vd->layout, "elm.swallow.folder");
    evas_object_del(s_list);
    s_list = nullptr;
}

Elm_Object_Item *__select_all_row()
{
    return s_row;
}

static void __rows_refresh(UploadViewData *vd)
{
    for (Elm_Object_Item *row = elm_genlist_first_item_get(vd->genlist); row; row = elm_genlist_item_next_get(row))
        __row_tappable_set(row, __is_tappable(vd, __row_record(row)->type));
    elm_genlist_realized_items_update(vd->genlist);
}

void __remove_all_selete_item(UploadViewData *vd)
{
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    __title_buttons_delete(vd);
    __title_set(vd, "IDS_KQ_HEADER_VELORA_UPLOADS_ABB");
    elm_object_signal_emit(vd->layout, "elm.navi.hide", "elm");
    vd->is_select_mode = false;
    __select_all_set(false);
    __select_all_list_delete(vd);
    __rows_refresh(vd);
    __progress_line_update(vd);
}

void __selection_cancel(UploadViewData *vd)
{
    __selection_clear(vd);
    __remove_all_selete_item(vd);
}

static void __btn_delete_cancel_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    __selection_cancel(vd);
}

// Takes every selected upload out of the queue.
static void __stop_selected(UploadViewData *vd)
{
    if (!vd->run)
        return;
    std::vector<UploadItem *> selected;
    for (const RunFile &file : vd->run->files) {
        if (!vd->run->is_selected(file.index))
            continue;
        vd->run->select(file.index, false);
        if (file.item->state != UPLOAD_STATE_CANCELED)
            selected.push_back(file.item.get());
    }
    __uploads_cancel(vd, selected);
}

static void __btn_stop_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd || vd != s_vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    _velora_popup_take_away(vd->ad, {vd, s_topic});
    __stop_selected(vd);
}

static void __stop_popup_cancel_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd || vd != s_vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    __select_all_set(false);
    __selection_clear(vd);
    _velora_popup_take_away(vd->ad, {vd, s_topic});
}

static void __stop_popup_replaced_cb(void *data)
{
    __stop_popup_cancel_cb(data, nullptr, nullptr);
}

static void __btn_delete_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    if (!vd->run)
        return;
    const int count = vd->run->selected();
    const bool must_ask = vd->run->is_selected(vd->run->report.current);
    if (!must_ask)
        __stop_selected(vd);
    // First, for a popup gives the focus back to what had it: to a button that is gone, if it came before.
    __remove_all_selete_item(vd);
    if (!must_ask)
        return;
    elm_object_focus_set(vd->genlist, EINA_TRUE);
    char title[96];
    std::snprintf(title, sizeof title, __text_of("IDS_KQ_HEADER_STOP_UPLOADS_ABB", count), count);
    Evas_Object *popup = _velora_common_with_title_btn_popup(
        vd->ad->win_main, title, __text("IDS_KQ_POP_THE_UPLOAD_WILL_STOP_BUT_THE_FILE_WILL_NOT_BE_DELETED"),
        __stop_popup_cancel_cb, __btn_stop_cb, __text("IDS_CLOUD_SK2_CANCEL"), __text("IDS_KQ_BUTTON_STOP_ABB2"), vd);
    elm_layout_signal_emit(elm_object_part_content_get(popup, "button2"), "platform,button,destructive", "platform");
    _velora_popup_show(vd->ad, {vd, s_topic}, popup, __stop_popup_replaced_cb, vd);
}

void __selection_run_ended(UploadViewData *vd)
{
    _velora_popup_take_away(vd->ad, {vd, s_topic});
    if (vd->is_select_mode) // with nothing left to select
        __remove_all_selete_item(vd);
}

void __ctx_delete_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    if (vd->is_select_mode || vd->phase != PHASE_UPLOADING)
        return;
    vd->is_select_mode = true;
    __progress_line_update(vd);
    __select_all_list_create(vd);
    __title_buttons_create(vd, __btn_delete_cancel_cb, __btn_delete_cb);
    if (s_is_select_all)
        elm_object_disabled_set(vd->done_btn, EINA_FALSE);
    else
        __show_count(vd, 0);
    __rows_refresh(vd);
}

void __selection_row_tapped(UploadViewData *vd, ItemData *record, Elm_Object_Item *row)
{
    if (row)
        elm_genlist_item_selected_set(row, EINA_FALSE);
    const UploadRun *run = vd->run.get();
    if (!run || !record->item)
        return;
    run->select(record->item->index, !run->is_selected(record->item->index));
    if (row)
        elm_genlist_item_update(row);
    const int count = run->selected();
    const bool is_all = count > 0 && count == run->queued();
    if (is_all != s_is_select_all)
        __select_all_set(is_all);
    __show_count(vd, row ? count : 0);
}
