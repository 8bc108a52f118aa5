// The toolkit keeps the names of its accessibility tree among the interfaces that it does not call stable yet.
#define EFL_BETA_API_SUPPORT
#define EFL_ACCESS_OBJECT_PROTECTED
#include "assist/assist.h"
#include <Elementary.h>
// The toolkit's headers need to be in this order.
#include <Ecore_Input.h>

#include <Ecore_Input_Evas.h>
#include <algorithm>
#include <efl_access_object.eo.h>
#include <efl_access_object.h>
#include <gio/gio.h>
#include <initializer_list>
#include <memory>

namespace {
bool is_supported = false; // by the program's windows
bool is_on = false;        // what the desktop said last

bool is_true(GVariant *value)
{
    return g_variant_is_of_type(value, G_VARIANT_TYPE_BOOLEAN) && g_variant_get_boolean(value);
}

bool ask(GDBusConnection *bus)
{
    bool on = false;
    GVariant *reply =
        g_dbus_connection_call_sync(bus, "org.a11y.Bus", "/org/a11y/bus", "org.freedesktop.DBus.Properties", "Get",
                                    g_variant_new("(ss)", "org.a11y.Status", "ScreenReaderEnabled"),
                                    G_VARIANT_TYPE("(v)"), G_DBUS_CALL_FLAGS_NO_AUTO_START, 1000, nullptr, nullptr);
    if (reply) {
        GVariant *value = nullptr;
        g_variant_get(reply, "(v)", &value);
        on = is_true(value);
        g_variant_unref(value);
        g_variant_unref(reply);
    }
    return on;
}

const void *fed = nullptr; // the key event that the canvas has got already

Eina_Bool feed(int type, void *event)
{
    if (type == ECORE_EVENT_KEY_DOWN)
        return ecore_event_evas_key_down(nullptr, type, event);
    return ecore_event_evas_key_up(nullptr, type, event);
}

// EFL 1.26 asks the screen reader about each key and then drops the key whatever the answer is. So the canvas gets it
// before, and not again where EFL lets it through.
Eina_Bool before_the_reader(void *, void *, int type, void *event)
{
    if (type == ECORE_EVENT_KEY_DOWN || type == ECORE_EVENT_KEY_UP) {
        fed = event;
        feed(type, event);
    }
    return EINA_TRUE;
}

Eina_Bool behind_the_reader(void *, int, void *event)
{
    return event == fed ? ECORE_CALLBACK_DONE : ECORE_CALLBACK_PASS_ON;
}
void offer_windows()
{
    static bool is_offered = false;
    if (is_offered || !is_on || !is_supported)
        return;
    is_offered = true;
    // First, for filters run in the order in which they come, and EFL's own comes with the connection to the reader.
    ecore_event_filter_add(nullptr, before_the_reader, nullptr, nullptr);
    for (const int type : {ECORE_EVENT_KEY_DOWN, ECORE_EVENT_KEY_UP})
        ecore_event_handler_prepend(type, behind_the_reader, nullptr);
    elm_config_atspi_mode_set(EINA_TRUE);
}

void status_changed(GDBusConnection *, const char *, const char *, const char *, const char *, GVariant *parameters,
                    gpointer)
{
    if (!g_variant_is_of_type(parameters, G_VARIANT_TYPE("(sa{sv}as)")))
        return;
    GVariant *changed = g_variant_get_child_value(parameters, 1);
    if (GVariant *value = g_variant_lookup_value(changed, "ScreenReaderEnabled", nullptr)) {
        is_on = is_true(value);
        g_variant_unref(value);
        offer_windows();
    }
    g_variant_unref(changed);
}

// A text that is being read, as far as one can know.
struct Reading {
    Evas_Object *widget;
    Ecore_Timer *end;
};
constexpr char reading_key[] = "assist,reading";

void reading_dropped(void *data, Evas *, Evas_Object *, void *)
{
    const std::unique_ptr<Reading> reading(static_cast<Reading *>(data));
    ecore_timer_del(reading->end);
}

void stop_reading(Reading *reading)
{
    evas_object_data_del(reading->widget, reading_key);
    evas_object_event_callback_del_full(reading->widget, EVAS_CALLBACK_DEL, reading_dropped, reading);
    delete reading;
}

Eina_Bool read_to_its_end(void *data)
{
    auto *reading = static_cast<Reading *>(data);
    Evas_Object *widget = reading->widget;
    stop_reading(reading);
    evas_object_smart_callback_call(widget, "access,read,stop", nullptr);
    return ECORE_CALLBACK_CANCEL;
}

double seconds_to_read(const char *text)
{
    constexpr double before_it_speaks = 2, a_letter = 0.1, a_wide_letter = 0.4, least = 6;
    double seconds = before_it_speaks;
    char *valid = g_utf8_make_valid(text, -1);
    for (const char *c = valid; *c; c = g_utf8_next_char(c))
        seconds += g_unichar_iswide(g_utf8_get_char(c)) ? a_wide_letter : a_letter;
    g_free(valid);
    return std::max(seconds, least);
}
} // namespace

void ea_screen_reader_support_set(Evas_Object *win, bool supported)
{
    static GDBusConnection *bus = nullptr; // kept: it brings the changes
    if (!win || !supported)
        return;
    is_supported = true;
    if (!bus && (bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr))) {
        g_dbus_connection_signal_subscribe(bus, "org.a11y.Bus", "org.freedesktop.DBus.Properties", "PropertiesChanged",
                                           "/org/a11y/bus", "org.a11y.Status", G_DBUS_SIGNAL_FLAGS_NONE, status_changed,
                                           nullptr, nullptr);
        is_on = ask(bus);
    }
    offer_windows();
}

bool ea_screen_reader_is_on()
{
    return is_on;
}

void ea_screen_reader_read(Evas_Object *widget, const char *text)
{
    if (!widget || !text)
        return;
    ea_screen_reader_name_set(widget, text);
    if (is_on && efl_isa(widget, EFL_ACCESS_OBJECT_MIXIN)) {
        efl_access_object_role_set(widget, EFL_ACCESS_ROLE_NOTIFICATION);
        efl_access_state_changed_signal_emit(widget, EFL_ACCESS_STATE_TYPE_SHOWING, EINA_TRUE);
    }
    auto *reading = static_cast<Reading *>(evas_object_data_get(widget, reading_key));
    if (reading) {
        ecore_timer_del(reading->end);
    } else {
        reading = new Reading{widget, nullptr};
        evas_object_data_set(widget, reading_key, reading);
        evas_object_event_callback_add(widget, EVAS_CALLBACK_DEL, reading_dropped, reading);
    }
    reading->end = ecore_timer_add(seconds_to_read(text), read_to_its_end, reading);
}

void ea_screen_reader_name_set(Evas_Object *widget, const char *name)
{
    if (widget && name)
        efl_access_object_i18n_name_set(widget, name);
}
