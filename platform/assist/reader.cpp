// The toolkit keeps the names of its accessibility tree among the interfaces that it does not call stable yet.
#define EFL_BETA_API_SUPPORT
#include "assist/assist.h"
#include <Elementary.h>
// The toolkit's headers need to be in this order.
#include <Ecore_Input.h>

#include <Ecore_Input_Evas.h>
#include <efl_access_object.eo.h>
#include <gio/gio.h>
#include <initializer_list>

namespace {
bool screen_reader_on()
{
    GDBusConnection *bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
    if (!bus)
        return false;
    gboolean on = FALSE;
    GVariant *reply =
        g_dbus_connection_call_sync(bus, "org.a11y.Bus", "/org/a11y/bus", "org.freedesktop.DBus.Properties", "Get",
                                    g_variant_new("(ss)", "org.a11y.Status", "ScreenReaderEnabled"),
                                    G_VARIANT_TYPE("(v)"), G_DBUS_CALL_FLAGS_NO_AUTO_START, 1000, nullptr, nullptr);
    if (reply) {
        GVariant *value = nullptr;
        g_variant_get(reply, "(v)", &value);
        on = g_variant_is_of_type(value, G_VARIANT_TYPE_BOOLEAN) && g_variant_get_boolean(value);
        g_variant_unref(value);
        g_variant_unref(reply);
    }
    g_object_unref(bus);
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
} // namespace

void ea_screen_reader_support_set(Evas_Object *win, bool supported)
{
    static bool is_on = false;
    if (!win || !supported || is_on || !screen_reader_on())
        return;
    is_on = true;
    // First, for filters run in the order in which they come, and EFL's own comes with the connection to the reader.
    ecore_event_filter_add(nullptr, before_the_reader, nullptr, nullptr);
    for (const int type : {ECORE_EVENT_KEY_DOWN, ECORE_EVENT_KEY_UP})
        ecore_event_handler_prepend(type, behind_the_reader, nullptr);
    elm_config_atspi_mode_set(EINA_TRUE);
}

void ea_screen_reader_name_set(Evas_Object *widget, const char *name)
{
    if (widget && name)
        efl_access_object_i18n_name_set(widget, name);
}
