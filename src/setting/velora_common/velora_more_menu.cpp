#include "velora_common/velora_more_menu.h"
#include "velora_common/velora_current_popup.h"

static const char s_topic[] = "more menu";

struct MoreMenu {
    AppData *ad = nullptr;
    const void *page = nullptr;
    void (*chosen)(void *data) = nullptr;
    void *data = nullptr;
    Ecore_Job *job = nullptr; // once the entry is chosen
    Evas_Object *menu = nullptr;
};

static void __move_more_ctxpopup(Evas_Object *menu, Evas_Object *win)
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
    __move_more_ctxpopup(static_cast<Evas_Object *>(data), win);
}

static void __window_resized_cb(void *data, Evas *, Evas_Object *win, void *)
{
    __move_more_ctxpopup(static_cast<Evas_Object *>(data), win);
}

static void _delete_ctxpopup_cb(void *data, Evas *, Evas_Object *obj, void *)
{
    auto *record = static_cast<MoreMenu *>(data);
    Evas_Object *win = record->ad->win_main;
    evas_object_smart_callback_del_full(win, "wm,rotation,changed", __rotate_more_ctxpopup_cb, obj);
    evas_object_event_callback_del_full(win, EVAS_CALLBACK_RESIZE, __window_resized_cb, obj);
    if (record->job)
        ecore_job_del(record->job);
    delete record;
}

static void __dismiss_cb(void *, Evas_Object *obj, void *)
{
    elm_ctxpopup_dismiss(obj);
}

static void __dismissed_cb(void *, Evas_Object *obj, void *)
{
    evas_object_del(obj);
}

static void __chosen_job(void *data)
{
    auto *record = static_cast<MoreMenu *>(data);
    record->job = nullptr;
    auto *const chosen = record->chosen;
    void *const of = record->data;
    evas_object_del(record->menu);
    chosen(of);
}

// The menu must not go before its item has got the whole of the key that chose it.
static void __item_cb(void *data, Evas_Object *, void *)
{
    auto *record = static_cast<MoreMenu *>(data);
    if (!record->job)
        record->job = ecore_job_add(__chosen_job, record);
}

void _velora_more_menu_open(AppData *ad, const void *page, const char *domain, const char *text_id,
                            void (*chosen)(void *data), void *data)
{
    Evas_Object *win = ad->win_main;
    Evas_Object *menu = elm_ctxpopup_add(win);
    auto *record = new MoreMenu{.ad = ad, .page = page, .chosen = chosen, .data = data, .menu = menu};
    elm_object_style_set(menu, "more/default");
    elm_ctxpopup_auto_hide_disabled_set(menu, EINA_TRUE);
    if (elm_win_wm_rotation_supported_get(win))
        evas_object_smart_callback_add(win, "wm,rotation,changed", __rotate_more_ctxpopup_cb, menu);
    evas_object_event_callback_add(win, EVAS_CALLBACK_RESIZE, __window_resized_cb, menu);
    evas_object_event_callback_add(menu, EVAS_CALLBACK_DEL, _delete_ctxpopup_cb, record);
    evas_object_smart_callback_add(menu, "dismissed", __dismissed_cb, nullptr);
    ea_object_event_callback_add(menu, EA_CALLBACK_BACK, __dismiss_cb, nullptr);
    ea_object_event_callback_add(menu, EA_CALLBACK_MORE, __dismiss_cb, nullptr);
    Elm_Object_Item *item = elm_ctxpopup_item_append(menu, text_id, nullptr, __item_cb, record);
    elm_object_item_domain_translatable_text_set(item, domain, text_id);
    elm_ctxpopup_direction_priority_set(menu, ELM_CTXPOPUP_DIRECTION_UP, ELM_CTXPOPUP_DIRECTION_LEFT,
                                        ELM_CTXPOPUP_DIRECTION_RIGHT, ELM_CTXPOPUP_DIRECTION_DOWN);
    __move_more_ctxpopup(menu, win);
    evas_object_show(menu);
    _velora_popup_show(ad, {page, s_topic}, menu);
}

bool _velora_more_menu_close(AppData *ad, const void *page)
{
    return _velora_popup_take_away(ad, {page, s_topic});
}
