// The toolkit does not call stable yet how a widget is told of a key.
#define EFL_BETA_API_SUPPORT
#define EFL_UI_WIDGET_PROTECTED
#include "assist/assist.h"
#include <Ecore_Evas.h>
#include <Efl_Ui.h>
#include <Elementary.h>
#include <algorithm>
#include <climits>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

namespace {
constexpr struct {
    const char *key;
    ea_callback_type_e type;
} keys[] = {
    {"Escape", EA_CALLBACK_BACK},
    {"XF86Back", EA_CALLBACK_BACK},
    {"Menu", EA_CALLBACK_MORE},
    {"XF86Menu", EA_CALLBACK_MORE},
};

struct Registration {
    Evas_Object *obj; // null once it is taken back or its object is gone
    ea_callback_type_e type;
    ea_event_cb func;
    void *data;
};

// A window's registrations, and the hidden object that hears its keys.
struct Canvas {
    Evas *evas = nullptr;
    Evas_Object *listener = nullptr;
    std::vector<std::shared_ptr<Registration>> registrations;
    std::string pressed;          // the key that is down; only its release counts, so that repeats do nothing
    bool used_up = false;         // by the object in focus
    Evas_Object *asked = nullptr; // the object in focus that was asked last
};

std::vector<std::unique_ptr<Canvas>> &canvases()
{
    static std::vector<std::unique_ptr<Canvas>> all;
    return all;
}

Canvas *find_canvas(const Evas *evas)
{
    for (const auto &canvas : canvases())
        if (canvas->evas == evas)
            return canvas.get();
    return nullptr;
}

bool visible(const Evas_Object *obj)
{
    for (; obj; obj = evas_object_smart_parent_get(obj))
        if (!evas_object_visible_get(obj))
            return false;
    return true;
}

std::vector<const Evas_Object *> ancestry(const Evas_Object *obj)
{
    std::vector<const Evas_Object *> line;
    for (; obj; obj = evas_object_smart_parent_get(obj))
        line.insert(line.begin(), obj);
    return line;
}

// By layer and stacking where the two lines of ancestors part; an object is above what it is a part of.
bool is_above(const Evas_Object *one, const Evas_Object *other)
{
    const auto line = ancestry(one);
    const auto other_line = ancestry(other);
    const auto [at, other_at] = std::ranges::mismatch(line, other_line);
    if (at == line.end() || other_at == other_line.end())
        return line.size() > other_line.size();
    if (const int layer = evas_object_layer_get(*at), other_layer = evas_object_layer_get(*other_at);
        layer != other_layer)
        return layer > other_layer;
    for (const Evas_Object *next = evas_object_above_get(*other_at); next; next = evas_object_above_get(next))
        if (next == *at)
            return true;
    return false;
}

bool is_popup(const Evas_Object *obj)
{
    const char *type = elm_object_widget_check(obj) ? elm_object_widget_type_get(obj) : nullptr;
    return type && strcasestr(type, "popup");
}

bool is_registered(const Evas_Object *obj, const char *key)
{
    const Canvas *canvas = key ? find_canvas(evas_object_evas_get(obj)) : nullptr;
    return canvas && std::ranges::any_of(keys, [&](const auto &known) {
               return std::strcmp(key, known.key) == 0 &&
                      std::ranges::any_of(canvas->registrations,
                                          [&](const auto &one) { return one->obj == obj && one->type == known.type; });
           });
}

// Keys that the widget in focus does not use go up to those around it, and the toolkit's naviframe then goes back when
// Escape goes down: once more than the registration says.
Eina_Bool input_event(Eo *obj, void *, const Efl_Event *event, Efl_Canvas_Object *source)
{
    if ((event->desc == EFL_EVENT_KEY_DOWN || event->desc == EFL_EVENT_KEY_UP) &&
        is_registered(obj, efl_input_key_sym_get(static_cast<const Eo *>(event->info))))
        return EINA_FALSE;
    return efl_ui_widget_input_event_handler(efl_super(obj, EFL_OBJECT_OVERRIDE_CLASS), event, source);
}

void own_key_bindings_end(Evas_Object *obj)
{
    if (!elm_object_widget_check(obj))
        return;
    EFL_OPS_DEFINE(ops, EFL_OBJECT_OP_FUNC(efl_ui_widget_input_event_handler, input_event));
    efl_object_override(obj, &ops);
}

// Null when nobody gets it.
const Evas_Object *receiver(const Canvas &canvas, ea_callback_type_e type)
{
    const Evas_Object *top = nullptr;
    for (const auto &one : canvas.registrations)
        if ((one->type == type || is_popup(one->obj)) && visible(one->obj) && (!top || is_above(one->obj, top)))
            top = one->obj;
    return top;
}

struct Release {
    Evas *evas;
    ea_callback_type_e type;
};

void deliver(void *data)
{
    const std::unique_ptr<Release> release(static_cast<Release *>(data));
    const Canvas *canvas = find_canvas(release->evas);
    const Evas_Object *obj = canvas ? receiver(*canvas, release->type) : nullptr;
    if (!obj)
        return;
    const auto registrations = canvas->registrations; // callbacks add, take back and delete
    for (const auto &one : registrations)
        if (one->obj == obj && one->type == release->type)
            one->func(one->data, one->obj, nullptr);
}

void focused_deleted(void *data, Evas *, Evas_Object *, void *)
{
    static_cast<Canvas *>(data)->asked = nullptr;
}

void focused_key_down(void *data, Evas *, Evas_Object *, void *event_info);

void stop_asking(Canvas *canvas)
{
    if (!canvas->asked)
        return;
    evas_object_event_callback_del_full(canvas->asked, EVAS_CALLBACK_KEY_DOWN, focused_key_down, canvas);
    evas_object_event_callback_del_full(canvas->asked, EVAS_CALLBACK_DEL, focused_deleted, canvas);
    canvas->asked = nullptr;
}

void focused_key_down(void *data, Evas *, Evas_Object *, void *event_info)
{
    auto *canvas = static_cast<Canvas *>(data);
    canvas->used_up = static_cast<Evas_Event_Key_Down *>(event_info)->event_flags & EVAS_EVENT_FLAG_ON_HOLD;
    stop_asking(canvas);
}

// Such an object hears no keys: a page on its way in, for one.
bool is_frozen(const Evas_Object *obj)
{
    for (; obj; obj = evas_object_smart_parent_get(obj))
        if (evas_object_freeze_events_get(obj))
            return true;
    return false;
}

// Grabs hear a key before the object in focus does; what that one makes of it is seen by a callback behind all of its
// own. When the callback does not run, the object has gone over the key: that is using it up.
void key_down(void *data, Evas *evas, Evas_Object *, void *event_info)
{
    auto *canvas = static_cast<Canvas *>(data);
    stop_asking(canvas);
    canvas->pressed = static_cast<Evas_Event_Key_Down *>(event_info)->key;
    canvas->asked = evas_focus_get(evas);
    if (canvas->asked && is_frozen(canvas->asked))
        canvas->asked = nullptr;
    canvas->used_up = canvas->asked != nullptr;
    if (!canvas->asked)
        return;
    evas_object_event_callback_priority_add(canvas->asked, EVAS_CALLBACK_KEY_DOWN, SHRT_MAX, focused_key_down, canvas);
    evas_object_event_callback_add(canvas->asked, EVAS_CALLBACK_DEL, focused_deleted, canvas);
}

void key_up(void *data, Evas *evas, Evas_Object *, void *event_info)
{
    auto *canvas = static_cast<Canvas *>(data);
    const std::string key = static_cast<Evas_Event_Key_Up *>(event_info)->key;
    const bool ours = canvas->pressed == key && !canvas->used_up;
    canvas->pressed.clear();
    if (!ours)
        return;
    for (const auto &one : keys)
        if (key == one.key)
            ecore_job_add(deliver, new Release{evas, one.type}); // Evas is still walking its objects
}

void listener_deleted(void *data, Evas *, Evas_Object *, void *)
{
    stop_asking(static_cast<Canvas *>(data));
    std::erase_if(canvases(), [data](const auto &one) { return one.get() == data; });
}

Canvas *get_canvas(Evas *evas)
{
    if (Canvas *have = find_canvas(evas))
        return have;
    auto *canvas = canvases().emplace_back(std::make_unique<Canvas>()).get();
    canvas->evas = evas;
    canvas->listener = evas_object_rectangle_add(evas);
    Evas_Modifier_Mask others = 0;
    for (const char *name : {"Control", "Alt", "Shift", "Super"})
        others |= evas_key_modifier_mask_get(evas, name);
    for (const auto &one : keys)
        if (!evas_object_key_grab(canvas->listener, one.key, 0, others, EINA_FALSE))
            EINA_LOG_WARN("the key %s is taken", one.key);
    evas_object_event_callback_add(canvas->listener, EVAS_CALLBACK_KEY_DOWN, key_down, canvas);
    evas_object_event_callback_add(canvas->listener, EVAS_CALLBACK_KEY_UP, key_up, canvas);
    evas_object_event_callback_add(canvas->listener, EVAS_CALLBACK_DEL, listener_deleted, canvas);
    return canvas;
}

void object_deleted(void *, Evas *evas, Evas_Object *obj, void *)
{
    Canvas *canvas = find_canvas(evas);
    if (!canvas)
        return;
    for (const auto &one : canvas->registrations)
        if (one->obj == obj)
            one->obj = nullptr;
    std::erase_if(canvas->registrations, [](const auto &one) { return !one->obj; });
}
} // namespace

void ea_object_event_callback_add(Evas_Object *obj, ea_callback_type_e type, ea_event_cb func, void *data)
{
    if (!obj || !func)
        return;
    Canvas *canvas = get_canvas(evas_object_evas_get(obj));
    if (std::ranges::none_of(canvas->registrations, [obj](const auto &one) { return one->obj == obj; })) {
        evas_object_event_callback_add(obj, EVAS_CALLBACK_DEL, object_deleted, nullptr);
        own_key_bindings_end(obj);
    }
    canvas->registrations.push_back(std::make_shared<Registration>(Registration{obj, type, func, data}));
}

void *ea_object_event_callback_del(Evas_Object *obj, ea_callback_type_e type, ea_event_cb func)
{
    Canvas *canvas = obj ? find_canvas(evas_object_evas_get(obj)) : nullptr;
    if (!canvas)
        return nullptr;
    auto &all = canvas->registrations;
    const auto found = std::find_if(all.rbegin(), all.rend(), [=](const auto &one) {
        return one->obj == obj && one->type == type && one->func == func;
    });
    if (found == all.rend())
        return nullptr;
    (*found)->obj = nullptr;
    void *data = (*found)->data;
    all.erase(std::next(found).base());
    if (std::ranges::none_of(all, [obj](const auto &one) { return one->obj == obj; }))
        evas_object_event_callback_del(obj, EVAS_CALLBACK_DEL, object_deleted);
    return data;
}
