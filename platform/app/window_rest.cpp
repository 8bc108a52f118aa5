// The event of a frame is not called stable yet.
#define EFL_BETA_API_SUPPORT
#include "app/window_rest.h"
#include <Ecore_Evas.h>
#include <Ecore_X.h>
#include <Efl_Ui.h>
#include <Elementary.h>
#include <glib.h>

namespace {
constexpr char rest_key[] = "window,rest";
constexpr double until_drawn = 0.3; // seconds in which EFL takes its frame back itself, unless it no longer draws

struct Rest {
    Evas_Object *window = nullptr;
    Evas *evas = nullptr;
    Ecore_Evas *engine = nullptr;
    Efl_Event_Cb frame = nullptr; // how the engine asks for a frame: with this function and itself
    int asked = 0;                // how often it does just now
    bool is_taken = false;        // back by us, and the engine does not know
    bool is_hidden = false, is_covered = false;
    Ecore_Timer *timer = nullptr;
    Ecore_Event_Handler *visibility = nullptr;
};

Rest *find_rest(const Evas_Object *window)
{
    return static_cast<Rest *>(evas_object_data_get(window, rest_key));
}

bool is_out_of_sight(const Rest &rest)
{
    return rest.is_hidden || rest.is_covered;
}

void take_back(Rest *rest)
{
    efl_event_callback_del(rest->evas, EFL_CANVAS_OBJECT_EVENT_ANIMATOR_TICK, rest->frame, rest->engine);
}

Eina_Bool settle(void *data)
{
    auto *rest = static_cast<Rest *>(data);
    rest->timer = nullptr;
    const int wanted = is_out_of_sight(*rest) ? 0 : 1; // twice: it was asked for by us, and anew by the engine
    while (rest->asked > wanted) {
        const int before = rest->asked;
        take_back(rest);
        if (rest->asked == before)
            break;
        rest->is_taken = wanted == 0;
    }
    return ECORE_CALLBACK_CANCEL;
}

void settle_soon(Rest *rest)
{
    if (!rest->timer)
        rest->timer = ecore_timer_add(until_drawn, settle, rest);
}

void state_changed(Rest *rest)
{
    if (is_out_of_sight(*rest)) {
        settle_soon(rest);
        return;
    }
    g_clear_pointer(&rest->timer, ecore_timer_del);
    if (!rest->is_taken)
        return;
    rest->is_taken = false;
    efl_event_callback_add(rest->evas, EFL_CANVAS_OBJECT_EVENT_ANIMATOR_TICK, rest->frame, rest->engine);
    // Something to draw, with which the engine finds out again whether it has asked for a frame.
    int width = 0, height = 0;
    evas_output_size_get(rest->evas, &width, &height);
    evas_damage_rectangle_add(rest->evas, 0, 0, width, height);
}

int count_frames(const Rest &rest, const void *info, Efl_Event_Cb *found)
{
    int count = 0;
    for (auto *item = static_cast<const Efl_Callback_Array_Item_Full *>(info); item->desc; item++)
        if (item->desc == EFL_CANVAS_OBJECT_EVENT_ANIMATOR_TICK && item->user_data == rest.engine) {
            *found = item->func;
            count++;
        }
    return count;
}

void callback_added(void *data, const Efl_Event *event)
{
    auto *rest = static_cast<Rest *>(data);
    rest->asked += count_frames(*rest, event->info, &rest->frame);
    if (rest->asked > (is_out_of_sight(*rest) ? 0 : 1))
        settle_soon(rest);
}

void callback_deleted(void *data, const Efl_Event *event)
{
    auto *rest = static_cast<Rest *>(data);
    Efl_Event_Cb frame = nullptr;
    rest->asked -= count_frames(*rest, event->info, &frame);
    if (rest->asked < 0) // one that was there before the watch
        rest->asked = 0;
}

Eina_Bool visibility_changed(void *data, int, void *event_info)
{
    auto *rest = static_cast<Rest *>(data);
    const auto *change = static_cast<Ecore_X_Event_Window_Visibility_Change *>(event_info);
    if (change->win == elm_win_xwindow_get(rest->window)) {
        rest->is_covered = change->fully_obscured;
        state_changed(rest);
    }
    return ECORE_CALLBACK_PASS_ON;
}

void window_deleted(void *data, Evas *, Evas_Object *, void *)
{
    auto *rest = static_cast<Rest *>(data);
    efl_event_callback_del(rest->evas, EFL_EVENT_CALLBACK_ADD, callback_added, rest);
    efl_event_callback_del(rest->evas, EFL_EVENT_CALLBACK_DEL, callback_deleted, rest);
    g_clear_pointer(&rest->timer, ecore_timer_del);
    g_clear_pointer(&rest->visibility, ecore_event_handler_del);
    delete rest;
}
} // namespace

void window_rest_watch(Evas_Object *window)
{
    Evas *evas = evas_object_evas_get(window);
    Ecore_Evas *engine = ecore_evas_ecore_evas_get(evas);
    if (!engine || find_rest(window))
        return;
    auto *rest = new Rest;
    rest->window = window;
    rest->evas = evas;
    rest->engine = engine;
    evas_object_data_set(window, rest_key, rest);
    efl_event_callback_add(evas, EFL_EVENT_CALLBACK_ADD, callback_added, rest);
    efl_event_callback_add(evas, EFL_EVENT_CALLBACK_DEL, callback_deleted, rest);
    if (elm_win_xwindow_get(window))
        rest->visibility = ecore_event_handler_add(ECORE_X_EVENT_WINDOW_VISIBILITY_CHANGE, visibility_changed, rest);
    evas_object_event_callback_add(window, EVAS_CALLBACK_DEL, window_deleted, rest);
}

void window_rest_hidden_set(Evas_Object *window, bool hidden)
{
    Rest *rest = find_rest(window);
    if (!rest)
        return;
    rest->is_hidden = hidden;
    state_changed(rest);
}
