// What Evas tells of pointer, fingers and keys, as the toolkit's events for the page.
#include "im.h"
#include "view.h"
#include <cmath>
#include <gtk/gtk.h>
#include <xkbcommon/xkbcommon.h>

namespace {
// What the engine's gestures take for a touchscreen: a device like the pointer that is one. The machine's own, if it
// has any, are Evas's affair.
GdkDevice *touchscreen(GdkDevice *pointer)
{
    static GdkDevice *device = GDK_DEVICE(g_object_new(
        G_OBJECT_TYPE(pointer), "display", gdk_device_get_display(pointer), "name", "fingers", "type",
        GDK_DEVICE_TYPE_SLAVE, "input-source", GDK_SOURCE_TOUCHSCREEN, "input-mode", GDK_MODE_SCREEN, nullptr));
    return device;
}

bool is_touch(const GdkEvent *event)
{
    return event->type == GDK_TOUCH_BEGIN || event->type == GDK_TOUCH_UPDATE || event->type == GDK_TOUCH_END ||
           event->type == GDK_TOUCH_CANCEL;
}

void send(View &view, GdkEvent *event)
{
    const bool is_key = event->type == GDK_KEY_PRESS || event->type == GDK_KEY_RELEASE;
    if (GdkWindow *window = gtk_widget_get_window(GTK_WIDGET(view.page)); window && !view.is_dead) {
        GdkSeat *seat = gdk_display_get_default_seat(gtk_widget_get_display(GTK_WIDGET(view.page)));
        event->any.window = GDK_WINDOW(g_object_ref(window));
        gdk_event_set_device(event, is_key ? gdk_seat_get_keyboard(seat) : gdk_seat_get_pointer(seat));
        if (is_touch(event))
            gdk_event_set_source_device(event, touchscreen(gdk_seat_get_pointer(seat)));
        gtk_main_do_event(event);
    }
    gdk_event_free(event);
}

unsigned state_of(const View &view, Evas_Modifier *modifiers)
{
    constexpr std::pair<const char *, unsigned> masks[] = {
        {"Control", GDK_CONTROL_MASK}, {"Shift", GDK_SHIFT_MASK}, {"Alt", GDK_MOD1_MASK}, {"Super", GDK_SUPER_MASK}};
    unsigned state = view.buttons;
    for (const auto &[name, mask] : masks)
        if (modifiers && evas_key_modifier_is_set(modifiers, name))
            state |= mask;
    return state;
}

struct Place {
    int x = 0, y = 0;
};

Place in_page(const View &view, int canvas_x, int canvas_y)
{
    Place origin;
    evas_object_geometry_get(view.image, &origin.x, &origin.y, nullptr, nullptr);
    return {canvas_x - origin.x, canvas_y - origin.y};
}

// Fingers scroll, with momentum, tap and pinch by the engine's own gestures. What Elementary takes for a finger in its
// lists is one here, too.
bool is_finger(Evas_Device *device)
{
    return (device && evas_device_class_get(device) == EVAS_DEVICE_CLASS_TOUCH) ||
           elm_config_scroll_thumbscroll_enabled_get();
}

void touch(View &view, GdkEventType type, int finger, Place at, unsigned time)
{
    if (finger < 0 || finger > 31)
        return;
    const unsigned bit = 1U << finger;
    if (type == GDK_TOUCH_BEGIN)
        view.fingers |= bit;
    else if (!(view.fingers & bit))
        return;
    else if (type != GDK_TOUCH_UPDATE)
        view.fingers &= ~bit;
    GdkEvent *event = gdk_event_new(type);
    event->touch.time = time;
    event->touch.x = event->touch.x_root = at.x;
    event->touch.y = event->touch.y_root = at.y;
    event->touch.sequence = reinterpret_cast<GdkEventSequence *>(static_cast<intptr_t>(finger) + 1);
    event->touch.emulating_pointer = finger == 0;
    send(view, event);
}

void button(View &view, bool is_down, int number, Place at, unsigned time, Evas_Modifier *modifiers)
{
    GdkEvent *event = gdk_event_new(is_down ? GDK_BUTTON_PRESS : GDK_BUTTON_RELEASE);
    event->button.time = time;
    event->button.x = event->button.x_root = at.x;
    event->button.y = event->button.y_root = at.y;
    event->button.button = static_cast<guint>(number);
    event->button.state = state_of(view, modifiers);
    const unsigned bit = number >= 1 && number <= 5 ? GDK_BUTTON1_MASK << (number - 1) : 0U;
    view.buttons = is_down ? view.buttons | bit : view.buttons & ~bit;
    send(view, event);
}

void mouse_down(void *data, Evas *, Evas_Object *, void *info)
{
    View &view = view_of(data);
    const Hold hold(view);
    const auto *event = static_cast<Evas_Event_Mouse_Down *>(info);
    elm_object_focus_set(view.obj, EINA_TRUE);
    if (!hold)
        return;
    const Place at = in_page(view, event->canvas.x, event->canvas.y);
    if (event->button == 1 && is_finger(event->dev))
        touch(view, GDK_TOUCH_BEGIN, 0, at, event->timestamp);
    else
        button(view, true, event->button, at, event->timestamp, event->modifiers);
}

void mouse_up(void *data, Evas *, Evas_Object *, void *info)
{
    View &view = view_of(data);
    const Hold hold(view);
    const auto *event = static_cast<Evas_Event_Mouse_Up *>(info);
    const Place at = in_page(view, event->canvas.x, event->canvas.y);
    if (event->button == 1 && (view.fingers & 1))
        touch(view, GDK_TOUCH_END, 0, at, event->timestamp);
    else
        button(view, false, event->button, at, event->timestamp, event->modifiers);
}

void mouse_move(void *data, Evas *, Evas_Object *, void *info)
{
    View &view = view_of(data);
    const Hold hold(view);
    const auto *event = static_cast<Evas_Event_Mouse_Move *>(info);
    const Place at = in_page(view, event->cur.canvas.x, event->cur.canvas.y);
    if (view.fingers & 1) {
        touch(view, GDK_TOUCH_UPDATE, 0, at, event->timestamp);
        return;
    }
    GdkEvent *motion = gdk_event_new(GDK_MOTION_NOTIFY);
    motion->motion.time = event->timestamp;
    motion->motion.x = motion->motion.x_root = at.x;
    motion->motion.y = motion->motion.y_root = at.y;
    motion->motion.state = state_of(view, event->modifiers);
    send(view, motion);
}

void multi_down(void *data, Evas *, Evas_Object *, void *info)
{
    const Hold hold(view_of(data));
    const auto *event = static_cast<Evas_Event_Multi_Down *>(info);
    touch(view_of(data), GDK_TOUCH_BEGIN, event->device, in_page(view_of(data), event->canvas.x, event->canvas.y),
          event->timestamp);
}

void multi_move(void *data, Evas *, Evas_Object *, void *info)
{
    const Hold hold(view_of(data));
    const auto *event = static_cast<Evas_Event_Multi_Move *>(info);
    touch(view_of(data), GDK_TOUCH_UPDATE, event->device,
          in_page(view_of(data), event->cur.canvas.x, event->cur.canvas.y), event->timestamp);
}

void multi_up(void *data, Evas *, Evas_Object *, void *info)
{
    const Hold hold(view_of(data));
    const auto *event = static_cast<Evas_Event_Multi_Up *>(info);
    touch(view_of(data), GDK_TOUCH_END, event->device, in_page(view_of(data), event->canvas.x, event->canvas.y),
          event->timestamp);
}

void wheel(void *data, Evas *, Evas_Object *, void *info)
{
    View &view = view_of(data);
    const Hold hold(view);
    const auto *event = static_cast<Evas_Event_Mouse_Wheel *>(info);
    const Place at = in_page(view, event->canvas.x, event->canvas.y);
    GdkEvent *scroll = gdk_event_new(GDK_SCROLL);
    scroll->scroll.time = event->timestamp;
    scroll->scroll.x = scroll->scroll.x_root = at.x;
    scroll->scroll.y = scroll->scroll.y_root = at.y;
    scroll->scroll.state = state_of(view, event->modifiers) & ~static_cast<unsigned>(GDK_CONTROL_MASK); // no zoom
    scroll->scroll.direction = GDK_SCROLL_SMOOTH;
    (event->direction ? scroll->scroll.delta_x : scroll->scroll.delta_y) = event->z;
    send(view, scroll);
}

// The program's own: back and more (assist), whatever the page would do with them.
bool is_programs(const std::string &key)
{
    return key == "Escape" || key == "XF86Back" || key == "Menu" || key == "XF86Menu";
}

bool key_event(View &view, bool is_down, const char *key, const char *string, const char *compose, unsigned code,
               unsigned time, Evas_Modifier *modifiers)
{
    if (!key || is_programs(key))
        return false;
    if (is_down && compose && *compose && g_strcmp0(compose, string) != 0)
        return im_commit(view, compose); // by a dead key or the compose key
    unsigned value = xkb_keysym_from_name(key, XKB_KEYSYM_NO_FLAGS);
    if (value == XKB_KEY_NoSymbol && string && *string)
        value = gdk_unicode_to_keyval(g_utf8_get_char(string));
    if (value == XKB_KEY_NoSymbol)
        return false;
    GdkEvent *event = gdk_event_new(is_down ? GDK_KEY_PRESS : GDK_KEY_RELEASE);
    event->key.time = time;
    event->key.keyval = value;
    event->key.hardware_keycode = static_cast<guint16>(code);
    event->key.state = state_of(view, modifiers);
    event->key.string = g_strdup("");
    send(view, event);
    return true;
}

// Before Elementary moves its focus with them: Tab and the arrows are the page's.
Eina_Bool elm_event(void *data, Evas_Object *, Evas_Object *, Evas_Callback_Type type, void *info)
{
    View &view = view_of(data);
    const Hold hold(view);
    if (type == EVAS_CALLBACK_KEY_DOWN) {
        auto *event = static_cast<Evas_Event_Key_Down *>(info);
        if (!im_filter_down(view, event) && !key_event(view, true, event->key, event->string, event->compose,
                                                       event->keycode, event->timestamp, event->modifiers))
            return EINA_FALSE;
        event->event_flags = EVAS_EVENT_FLAG_ON_HOLD;
        return EINA_TRUE;
    }
    if (type == EVAS_CALLBACK_KEY_UP) {
        auto *event = static_cast<Evas_Event_Key_Up *>(info);
        if (!im_filter_up(view, event) && !key_event(view, false, event->key, event->string, nullptr, event->keycode,
                                                     event->timestamp, event->modifiers))
            return EINA_FALSE;
        event->event_flags = EVAS_EVENT_FLAG_ON_HOLD;
        return EINA_TRUE;
    }
    return EINA_FALSE;
}

void focus_set(View &view, bool has_focus)
{
    if (has_focus == view.has_focus)
        return;
    view.has_focus = has_focus;
    GdkEvent *event = gdk_event_new(GDK_FOCUS_CHANGE);
    event->focus_change.window = GDK_WINDOW(g_object_ref(gtk_widget_get_window(view.offscreen)));
    event->focus_change.in = has_focus;
    gtk_widget_event(view.offscreen, event);
    gdk_event_free(event);
    im_focus(view, has_focus);
}

// Keys come to an object of Evas, the view's own or one inside it.
bool keys_come_to(const View &view)
{
    const Evas *canvas = evas_object_evas_get(view.obj);
    const Evas_Object *focused = evas_focus_state_get(canvas) ? evas_focus_get(canvas) : nullptr;
    while (focused && focused != view.obj)
        focused = evas_object_smart_parent_get(focused);
    return focused;
}

// Focus passes through other objects on its way: it is looked at when it has settled.
void focus_moved(void *data, Evas *, void *)
{
    View &view = view_of(data);
    if (view.focus_job)
        return;
    view.focus_job = ecore_job_add(
        [](void *moved) {
            View &settled = view_of(moved);
            settled.focus_job = nullptr;
            const Hold hold(settled);
            focus_set(settled, keys_come_to(settled));
        },
        data);
}

constexpr std::pair<Evas_Callback_Type, Evas_Object_Event_Cb> pointer_events[] = {
    {EVAS_CALLBACK_MOUSE_DOWN, mouse_down}, {EVAS_CALLBACK_MOUSE_UP, mouse_up},
    {EVAS_CALLBACK_MOUSE_MOVE, mouse_move}, {EVAS_CALLBACK_MOUSE_WHEEL, wheel},
    {EVAS_CALLBACK_MULTI_DOWN, multi_down}, {EVAS_CALLBACK_MULTI_MOVE, multi_move},
    {EVAS_CALLBACK_MULTI_UP, multi_up},
};
constexpr Evas_Callback_Type focus_events[] = {EVAS_CALLBACK_CANVAS_OBJECT_FOCUS_IN,
                                               EVAS_CALLBACK_CANVAS_OBJECT_FOCUS_OUT, EVAS_CALLBACK_CANVAS_FOCUS_IN,
                                               EVAS_CALLBACK_CANVAS_FOCUS_OUT};
} // namespace

void input_connect(View &view)
{
    im_connect(view);
    for (const auto &[type, function] : pointer_events)
        evas_object_event_callback_add(view.image, type, function, &view);
    elm_object_event_callback_add(view.obj, elm_event, &view);
    for (const Evas_Callback_Type type : focus_events)
        evas_event_callback_add(evas_object_evas_get(view.obj), type, focus_moved, &view);
}

void input_disconnect(View &view)
{
    for (const Evas_Callback_Type type : focus_events)
        evas_event_callback_del_full(evas_object_evas_get(view.obj), type, focus_moved, &view);
    elm_object_event_callback_del(view.obj, elm_event, &view);
    for (const auto &[type, function] : pointer_events)
        evas_object_event_callback_del_full(view.image, type, function, &view);
    if (view.focus_job)
        ecore_job_del(view.focus_job);
    view.focus_job = nullptr;
    im_disconnect(view);
}
