#include "velora_upload_file/upload_menu.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_upload_file/upload_select.h"

static const char s_topic[] = "more menu";

void __delete_all_callback_ctxpopup()
{
    if (!s_vd) {
        VELORA_LOGE("s_vd is NULL");
        return;
    }
    _velora_popup_take_away(s_vd->ad, {s_vd, s_topic});
}

static void __place_more_menu(Evas_Object *menu, Evas_Object *win)
{
    int x = 0, y = 0, w = 0, h = 0;
    elm_win_screen_size_get(win, &x, &y, &w, &h);
    // The screen of a desktop is larger than the window that the menu belongs to.
    int win_w = 0, win_h = 0;
    evas_object_geometry_get(win, nullptr, nullptr, &win_w, &win_h);
    w = w > 0 && w < win_w ? w : win_w;
    h = h > 0 && h < win_h ? h : win_h;
    switch (elm_win_rotation_get(win)) {
    case 0:
    case 180:
        evas_object_move(menu, w / 2, h);
        break;
    case 90:
    case 270:
        evas_object_move(menu, h / 2, w);
        break;
    default:
        break;
    }
}

static void __rotate_more_ctxpopup_cb(void *data, Evas_Object *win, void *)
{
    __place_more_menu(static_cast<Evas_Object *>(data), win);
}

static void __window_resized_cb(void *data, Evas *, Evas_Object *win, void *)
{
    __place_more_menu(static_cast<Evas_Object *>(data), win);
}

static void __more_menu_deleted_cb(void *data, Evas *, Evas_Object *obj, void *)
{
    auto *win = static_cast<Evas_Object *>(data);
    evas_object_smart_callback_del_full(win, "wm,rotation,changed", __rotate_more_ctxpopup_cb, obj);
    evas_object_event_callback_del_full(win, EVAS_CALLBACK_RESIZE, __window_resized_cb, obj);
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
    if (!s_vd)
        return;
    __delete_all_callback_ctxpopup();
    __ctx_delete_cb(s_vd, nullptr, nullptr);
}

// The menu must not go before its item has got the whole of the key that chose it.
static void __ctx_item_cb(void *, Evas_Object *, void *)
{
    ecore_job_add(__ctx_delete_job, nullptr);
}

static void __more_menu_open(UploadViewData *vd)
{
    Evas_Object *win = vd->ad->win_main;
    Evas_Object *menu = elm_ctxpopup_add(win);
    elm_object_style_set(menu, "more/default");
    elm_ctxpopup_auto_hide_disabled_set(menu, EINA_TRUE);
    if (elm_win_wm_rotation_supported_get(win))
        evas_object_smart_callback_add(win, "wm,rotation,changed", __rotate_more_ctxpopup_cb, menu);
    evas_object_event_callback_add(win, EVAS_CALLBACK_RESIZE, __window_resized_cb, menu);
    evas_object_event_callback_add(menu, EVAS_CALLBACK_DEL, __more_menu_deleted_cb, win);
    evas_object_smart_callback_add(menu, "dismissed", __dismissed_cb, nullptr);
    ea_object_event_callback_add(menu, EA_CALLBACK_BACK, __dismiss_cb, nullptr);
    ea_object_event_callback_add(menu, EA_CALLBACK_MORE, __dismiss_cb, nullptr);
    Elm_Object_Item *item = elm_ctxpopup_item_append(menu, "IDS_CLOUD_BUTTON_REMOVE", nullptr, __ctx_item_cb, nullptr);
    elm_object_item_domain_translatable_text_set(item, VELORA_SHARE_DOMAIN, "IDS_CLOUD_BUTTON_REMOVE");
    elm_ctxpopup_direction_priority_set(menu, ELM_CTXPOPUP_DIRECTION_UP, ELM_CTXPOPUP_DIRECTION_LEFT,
                                        ELM_CTXPOPUP_DIRECTION_RIGHT, ELM_CTXPOPUP_DIRECTION_DOWN);
    __place_more_menu(menu, win);
    evas_object_show(menu);
    _velora_popup_show(vd->ad, {vd, s_topic}, menu);
}

void __more_create_folder_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    if (vd != s_vd || !vd->more_btn)
        return;
    if (_velora_popup_is_shown(vd->ad, {vd, s_topic})) // the key that opened it closes it
        __delete_all_callback_ctxpopup();
    else if (!vd->ad->popup) // a question that is open is to be answered first
        __more_menu_open(vd);
}
