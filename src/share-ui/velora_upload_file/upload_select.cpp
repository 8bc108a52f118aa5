// The more menu, and the selection mode in which uploads are taken out of the queue.
#include "velora_common/velora_popup.h"
#include "velora_upload_file/upload_internal.h"
#include <cstdio>
#include <cstring>

static bool s_is_select_all = false;              // the state of the select-all check
static Evas_Object *s_select_all_check = nullptr; // the check itself, while its row is on screen

static void __select_all_set(bool is_on)
{
    s_is_select_all = is_on;
    if (s_select_all_check)
        elm_check_state_set(s_select_all_check, is_on);
}

static int __queued_count(const UploadViewData *vd)
{
    return vd->total - vd->canceled - vd->success - vd->fail;
}

static int __selected_count(const UploadViewData *vd)
{
    int count = 0;
    for (int i = 0; i < vd->total; i++)
        count += __selection_get(i);
    return count;
}

// The title says how many are selected; with none there is nothing to be done.
static void __show_count(UploadViewData *vd, int count)
{
    char title[64];
    std::snprintf(title, sizeof title, __text("%d Selected"), count);
    elm_object_item_part_text_set(vd->nf_item, "elm.text.title", title);
    ea_screen_reader_name_set(__page_of(vd), title);
    if (vd->done_btn)
        elm_object_disabled_set(vd->done_btn, count == 0);
}

void __selection_title_refresh(UploadViewData *vd)
{
    if (vd->is_select_mode)
        __show_count(vd, __selected_count(vd));
}

static void __selection_clear(UploadViewData *vd)
{
    for (int i = 0; i < vd->total; i++)
        __selection_set(i, false);
}

// Deletes the more menu, if that is what AppData's popup is.
void __delete_all_callback_ctxpopup()
{
    UploadViewData *vd = s_vd;
    if (!vd) {
        VELORA_LOGE("s_vd is NULL");
        return;
    }
    if (!vd->ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    if (vd->ad->popup && vd->ad->popup == vd->more_menu)
        _velora_app_popup_delete(vd->ad);
}

static void __place_more_menu(UploadViewData *vd)
{
    int x = 0, y = 0, w = 0, h = 0;
    elm_win_screen_size_get(vd->ad->win_main, &x, &y, &w, &h);
    // The screen of a desktop is larger than the window that the menu belongs to.
    int win_w = 0, win_h = 0;
    evas_object_geometry_get(vd->ad->win_main, nullptr, nullptr, &win_w, &win_h);
    w = w > 0 && w < win_w ? w : win_w;
    h = h > 0 && h < win_h ? h : win_h;
    switch (elm_win_rotation_get(vd->ad->win_main)) {
    case 0:
    case 180:
        evas_object_move(vd->more_menu, w / 2, h);
        break;
    case 90:
    case 270:
        evas_object_move(vd->more_menu, h / 2, w);
        break;
    default:
        break;
    }
}

static void __rotate_more_ctxpopup_cb(void *, Evas_Object *, void *)
{
    UploadViewData *vd = s_vd;
    if (vd && vd->more_menu)
        __place_more_menu(vd);
}

static void __more_menu_deleted_cb(void *data, Evas *, Evas_Object *obj, void *)
{
    auto *win = static_cast<Evas_Object *>(data);
    evas_object_smart_callback_del(win, "wm,rotation,changed", __rotate_more_ctxpopup_cb);
    UploadViewData *vd = s_vd;
    if (!vd || vd->more_menu != obj)
        return;
    vd->more_menu = nullptr;
    if (vd->ad->popup == obj)
        vd->ad->popup = nullptr;
}

static void __dismiss_cb(void *, Evas_Object *obj, void *)
{
    elm_ctxpopup_dismiss(obj);
}

static void __dismissed_cb(void *, Evas_Object *obj, void *)
{
    evas_object_del(obj);
}

static void __ctx_delete_job(void *)
{
    if (UploadViewData *vd = s_vd)
        __ctx_delete_cb(vd, nullptr, nullptr);
}

// The menu must not go before its item has got the whole of the key that chose it.
static void __ctx_item_cb(void *, Evas_Object *, void *)
{
    ecore_job_add(__ctx_delete_job, nullptr);
}

void __more_menu_open(UploadViewData *vd)
{
    AppData *ad = vd->ad;
    const bool was_open = vd->more_menu;
    _velora_app_popup_delete(ad);
    if (was_open) // the key that opened it closes it
        return;
    vd->more_menu = ad->popup = elm_ctxpopup_add(ad->win_main);
    elm_object_style_set(vd->more_menu, "more/default");
    elm_ctxpopup_auto_hide_disabled_set(vd->more_menu, EINA_TRUE);
    if (elm_win_wm_rotation_supported_get(ad->win_main))
        evas_object_smart_callback_add(ad->win_main, "wm,rotation,changed", __rotate_more_ctxpopup_cb, vd);
    evas_object_event_callback_add(vd->more_menu, EVAS_CALLBACK_DEL, __more_menu_deleted_cb, ad->win_main);
    evas_object_smart_callback_add(vd->more_menu, "dismissed", __dismissed_cb, nullptr);
    ea_object_event_callback_add(vd->more_menu, EA_CALLBACK_BACK, __dismiss_cb, nullptr);
    ea_object_event_callback_add(vd->more_menu, EA_CALLBACK_MORE, __dismiss_cb, nullptr);
    if (vd->total > 0) {
        Elm_Object_Item *item =
            elm_ctxpopup_item_append(vd->more_menu, "IDS_CLOUD_BUTTON_REMOVE", nullptr, __ctx_item_cb, nullptr);
        elm_object_item_domain_translatable_text_set(item, VELORA_SHARE_DOMAIN, "IDS_CLOUD_BUTTON_REMOVE");
    }
    elm_ctxpopup_direction_priority_set(vd->more_menu, ELM_CTXPOPUP_DIRECTION_UP, ELM_CTXPOPUP_DIRECTION_LEFT,
                                        ELM_CTXPOPUP_DIRECTION_RIGHT, ELM_CTXPOPUP_DIRECTION_DOWN);
    __place_more_menu(vd);
    evas_object_show(vd->more_menu);
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

Evas_Object *__check_create(Evas_Object *parent, bool is_on, Evas_Object **check)
{
    Evas_Object *layout = elm_layout_add(parent);
    elm_layout_theme_set(layout, "layout", "list/C/type.1", "default");
    *check = elm_check_add(layout);
    elm_check_state_set(*check, is_on);
    evas_object_size_hint_weight_set(*check, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(*check, EVAS_HINT_FILL, EVAS_HINT_FILL);
    // The row is what is tapped and focused; the check only shows.
    elm_object_focus_allow_set(*check, EINA_FALSE);
    elm_object_part_content_set(layout, "elm.swallow.content", *check);
    return layout;
}

static Evas_Object *__ud_delete_all_content_get(void *data, Evas_Object *obj, const char *part)
{
    if (!data) {
        VELORA_LOGE("item is NULL");
        return nullptr;
    }
    if (std::strcmp(part, "elm.icon.2") != 0)
        return nullptr;
    Evas_Object *layout = __check_create(obj, s_is_select_all, &s_select_all_check);
    ea_screen_reader_name_set(s_select_all_check, __text("Select All"));
    evas_object_event_callback_add(s_select_all_check, EVAS_CALLBACK_DEL, __select_all_check_deleted_cb, nullptr);
    evas_object_pass_events_set(s_select_all_check, EINA_TRUE); // a tap on it is a tap on the row
    evas_object_repeat_events_set(layout, EINA_TRUE);
    return layout;
}

static void __select_all_toggle_cb(void *, Evas_Object *, void *event_info)
{
    auto *row = static_cast<Elm_Object_Item *>(event_info);
    elm_genlist_item_selected_set(row, EINA_FALSE);
    UploadViewData *vd = s_vd;
    if (!vd || !vd->is_select_mode)
        return;
    __select_all_set(!s_is_select_all);
    vd->is_all_selected = s_is_select_all;
    int index = 0;
    for (GList *entry = vd->ad->upload_list; entry && index < vd->total; entry = entry->next, index++) {
        const auto *item = static_cast<const UploadItem *>(entry->data);
        if (item->state == UPLOAD_STATE_DONE || item->state == UPLOAD_STATE_FAILED || !item->gen_it)
            continue;
        __selection_set(index, s_is_select_all);
        static_cast<ItemData *>(elm_object_item_data_get(item->gen_it))->is_selected = s_is_select_all;
    }
    elm_genlist_realized_items_update(vd->genlist);
    elm_genlist_item_update(row);
    __show_count(vd, s_is_select_all ? __queued_count(vd) : 0);
}

static void __language_changed_cb(void *, Evas_Object *obj, void *)
{
    elm_genlist_realized_items_update(obj);
}

static void __select_all_list_create(UploadViewData *vd)
{
    if (!vd->itc_select_all)
        vd->itc_select_all = __item_class_create("1line", __ud_delete_all_text_get, __ud_delete_all_content_get);
    vd->select_all_genlist = elm_genlist_add(vd->ad->naviframe);
    elm_scroller_policy_set(vd->select_all_genlist, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
    elm_object_style_set(vd->select_all_genlist, "dialogue");
    evas_object_smart_callback_add(vd->select_all_genlist, "language,changed", __language_changed_cb, nullptr);
    evas_object_show(vd->select_all_genlist);
    auto *record = new ItemData{.vd = vd};
    vd->select_all_item = elm_genlist_item_append(vd->select_all_genlist, vd->itc_select_all, record, nullptr,
                                                  ELM_GENLIST_ITEM_NONE, __select_all_toggle_cb, record);
    elm_object_part_content_set(vd->layout, "elm.swallow.folder", vd->select_all_genlist);
    elm_object_signal_emit(vd->layout, "elm.navi.show.select.all", "elm");
    evas_object_resize(vd->select_all_genlist, 480, 70);
}

static void __select_all_list_delete(UploadViewData *vd)
{
    vd->select_all_item = nullptr;
    if (!vd->select_all_genlist)
        return;
    remove_genlist_item(vd->select_all_genlist);
    elm_object_part_content_unset(vd->layout, "elm.swallow.folder");
    evas_object_del(vd->select_all_genlist);
    vd->select_all_genlist = nullptr;
}

static void __rows_refresh(UploadViewData *vd)
{
    GList *entry = vd->ad->upload_list;
    for (int i = 0; i < vd->total; i++, entry = entry->next) {
        if (!entry) {
            VELORA_LOGE("upload_item is NULL");
            return;
        }
        const auto *item = static_cast<const UploadItem *>(entry->data);
        if (!item->gen_it) // taken out, or not in the list
            continue;
        auto *record = static_cast<ItemData *>(elm_object_item_data_get(item->gen_it));
        if (!record) {
            VELORA_LOGE("item_data is NULL");
            return;
        }
        record->is_selected = __selection_get(i);
        const bool is_tappable =
            record->type == ITEM_TYPE_FAILED || (vd->is_select_mode && record->type == ITEM_TYPE_UPLOADING);
        __row_tappable_set(item->gen_it, is_tappable);
        elm_genlist_item_update(item->gen_it);
    }
}

void __remove_all_selete_item(UploadViewData *vd)
{
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    for (Evas_Object **button : {&vd->done_btn, &vd->cancel_btn}) {
        if (*button)
            evas_object_del(*button);
        *button = nullptr;
    }
    __title_set(vd, "IDS_KQ_HEADER_VELORA_UPLOADS_ABB");
    elm_object_signal_emit(vd->layout, "elm.navi.hide", "elm");
    vd->is_select_mode = false;
    vd->is_all_selected = false;
    __select_all_set(false);
    __select_all_list_delete(vd);
    __rows_refresh(vd);
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
    std::vector<UploadItem *> selected;
    GList *entry = vd->ad->upload_list;
    for (int i = 0; i < vd->total && entry; i++, entry = entry->next) {
        if (!__selection_get(i))
            continue;
        __selection_set(i, false);
        if (auto *item = static_cast<UploadItem *>(entry->data); item->gen_it)
            selected.push_back(item);
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
    __stop_selected(vd);
    _velora_app_popup_delete(vd->ad);
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
    _velora_app_popup_delete(vd->ad);
}

static void __btn_delete_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    const bool must_ask = __selection_get(vd->cur_index);
    if (!must_ask)
        __stop_selected(vd);
    // First, for a popup gives the focus back to what had it: to a button that is gone, if it came before.
    __remove_all_selete_item(vd);
    if (!must_ask)
        return;
    elm_object_focus_set(vd->genlist, EINA_TRUE);
    _velora_app_popup_delete(vd->ad);
    vd->ad->popup = _velora_common_with_title_btn_popup(
        vd->ad->win_main, __text("IDS_KQ_HEADER_STOP_UPLOADS_ABB"),
        __text("IDS_KQ_POP_THE_UPLOAD_WILL_STOP_BUT_THE_FILE_WILL_NOT_BE_DELETED"), __stop_popup_cancel_cb,
        __btn_stop_cb, __text("IDS_CLOUD_SK2_CANCEL"), __text("IDS_KQ_BUTTON_STOP_ABB2"), vd);
}

void __ctx_delete_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    _velora_app_popup_delete(vd->ad);
    if (vd->is_select_mode)
        return;
    vd->is_select_mode = true;
    __select_all_list_create(vd);
    vd->cancel_btn = __title_button_create(vd, "naviframe/title_text_left", "IDS_TPLATFORM_ACBUTTON_CANCEL_ABB",
                                           "title_left_text_btn", __btn_delete_cancel_cb);
    vd->done_btn = __title_button_create(vd, "naviframe/title_text_right", "IDS_TPLATFORM_ACBUTTON_DONE_ABB",
                                         "title_right_text_btn", __btn_delete_cb);
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
    record->is_selected = !record->is_selected;
    __selection_set(record->index, record->is_selected);
    if (row)
        elm_genlist_item_update(row);
    const int count = __selected_count(vd);
    const bool is_all = count > 0 && count == __queued_count(vd);
    vd->is_all_selected = is_all;
    if (is_all != s_is_select_all)
        __select_all_set(is_all);
    __show_count(vd, row ? count : 0);
}
