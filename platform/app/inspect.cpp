#include "app/inspect.h"
#include "app/bus.h"
#include <Elementary.h>
#include <cstdlib>
#include <cstring>
#include <gio/gio.h>

namespace {
constexpr char interface_xml[] = "<node><interface name='com.orvant.Inspect'>"
                                 "<method name='Visible'><arg type='a(ssiiii)' direction='out'/></method>"
                                 "<method name='Keys'><arg type='u' direction='out'/></method>"
                                 "</interface></node>";

struct Walk {
    GVariantBuilder *out = nullptr;
    int x = 0, y = 0; // of the window on the screen
    Evas_Object *focused = nullptr;
};

bool is_in_sight(const Evas_Object *obj, Eina_Rectangle *place)
{
    int r = 0, g = 0, b = 0, a = 0;
    evas_object_color_get(obj, &r, &g, &b, &a);
    if (!evas_object_visible_get(obj) || a == 0)
        return false;
    evas_object_geometry_get(obj, &place->x, &place->y, &place->w, &place->h);
    Eina_Rectangle seen = *place;
    for (const Evas_Object *clip = evas_object_clip_get(obj); clip; clip = evas_object_clip_get(clip)) {
        Eina_Rectangle area = {};
        evas_object_geometry_get(clip, &area.x, &area.y, &area.w, &area.h);
        evas_object_color_get(clip, &r, &g, &b, &a);
        if (!evas_object_visible_get(clip) || a == 0 || !eina_rectangle_intersection(&seen, &area))
            return false;
    }
    Eina_Rectangle canvas = {};
    evas_output_size_get(evas_object_evas_get(obj), &canvas.w, &canvas.h);
    return eina_rectangle_intersection(&seen, &canvas) && seen.w > 0 && seen.h > 0;
}

void add(const Walk &walk, const char *kind, const char *text, const Eina_Rectangle &place)
{
    if (!text || !*text)
        return;
    char *valid = g_utf8_make_valid(text, -1); // names of files may hold any bytes
    g_variant_builder_add(walk.out, "(ssiiii)", kind, valid, walk.x + place.x, walk.y + place.y, place.w, place.h);
    g_free(valid);
}

void add_markup(const Walk &walk, const char *kind, const char *markup, const Eina_Rectangle &place)
{
    if (!markup)
        return;
    char *text = evas_textblock_text_markup_to_utf8(nullptr, markup);
    add(walk, kind, text, place);
    std::free(text);
}

void add_widget(const Walk &walk, const Evas_Object *obj, const Eina_Rectangle &place)
{
    const char *type = elm_object_widget_type_get(obj);
    if (std::strcmp(type, "Elm_Button") == 0) {
        add_markup(walk, elm_object_disabled_get(obj) ? "disabled" : type, elm_object_text_get(obj), place);
    } else if (std::strcmp(type, "Elm_Progressbar") == 0 && !elm_progressbar_pulse_get(obj)) {
        char text[16];
        g_snprintf(text, sizeof text, "%.0f %%", elm_progressbar_value_get(obj) * 100);
        add(walk, type, text, place);
    }
}

// What an object that draws its widgets itself says of them: lines of kind, text, x, y, width and height with tabs in
// between, in pixels from its corner.
void add_own(const Walk &walk, const Evas_Object *obj, const Eina_Rectangle &place)
{
    const auto *list = static_cast<const char *>(evas_object_data_get(obj, "inspect,list"));
    char **lines = g_strsplit(list ? list : "", "\n", -1);
    for (char **line = lines; *line; line++) {
        char **fields = g_strsplit(*line, "\t", -1);
        if (g_strv_length(fields) == 6)
            add(walk, fields[0], fields[1],
                {place.x + std::atoi(fields[2]), place.y + std::atoi(fields[3]), std::atoi(fields[4]),
                 std::atoi(fields[5])});
        g_strfreev(fields);
    }
    g_strfreev(lines);
}

void visit(Walk &walk, Evas_Object *obj)
{
    Eina_Rectangle place = {};
    const char *type = evas_object_type_get(obj);
    // A smart object may be smaller than what it shows, an empty context popup even without size.
    const bool is_seen = is_in_sight(obj, &place);
    if (!evas_object_visible_get(obj))
        return;
    if (elm_object_widget_check(obj) && elm_object_focus_get(obj))
        walk.focused = obj; // the innermost comes last
    if (is_seen && std::strcmp(type, "text") == 0)
        add(walk, "text", evas_object_text_text_get(obj), place);
    else if (is_seen && std::strcmp(type, "textblock") == 0)
        add_markup(walk, "text", evas_object_textblock_text_markup_get(obj), place);
    else if (is_seen && elm_object_widget_check(obj))
        add_widget(walk, obj, place);
    if (is_seen)
        add_own(walk, obj, place);
    for (const char *leaf : {"rectangle", "image", "text", "textblock", "line", "polygon", "vectors", "textgrid"})
        if (std::strcmp(type, leaf) == 0)
            return;
    Eina_List *members = evas_object_smart_members_get(obj);
    void *member = nullptr;
    EINA_LIST_FREE(members, member)
    visit(walk, static_cast<Evas_Object *>(member));
}

void add_focus(const Walk &walk)
{
    if (!walk.focused)
        return;
    Eina_Rectangle place = {};
    evas_object_geometry_get(walk.focused, &place.x, &place.y, &place.w, &place.h);
    const char *text = elm_object_text_get(walk.focused);
    if (Elm_Object_Item *item = elm_object_focused_item_get(walk.focused)) {
        text = elm_object_item_text_get(item);
        for (const char *part : {"elm.text.main.left", "elm.text.main.left.top"})
            if (!text || !*text)
                text = elm_object_item_part_text_get(item, part);
    }
    add_markup(walk, "focus", text && *text ? text : elm_object_widget_type_get(walk.focused), place);
}

unsigned keys = 0; // that came up again

// A filter, for a handler would miss the keys that a screen reader takes. The bus is read after all handlers have run.
Eina_Bool count_key(void *, void *, int type, void *)
{
    keys += type == ECORE_EVENT_KEY_UP;
    return EINA_TRUE;
}

void answer(GDBusConnection *, const gchar *, const gchar *, const gchar *, const gchar *method, GVariant *,
            GDBusMethodInvocation *invocation, gpointer)
{
    if (std::strcmp(method, "Keys") == 0)
        return g_dbus_method_invocation_return_value(invocation, g_variant_new("(u)", keys));
    GVariantBuilder out;
    g_variant_builder_init(&out, G_VARIANT_TYPE("a(ssiiii)"));
    Eina_List *windows = ecore_evas_ecore_evas_list_get();
    void *window = nullptr;
    EINA_LIST_FREE(windows, window)
    {
        auto *ee = static_cast<Ecore_Evas *>(window);
        Walk walk = {.out = &out};
        ecore_evas_geometry_get(ee, &walk.x, &walk.y, nullptr, nullptr);
        for (Evas_Object *obj = evas_object_bottom_get(ecore_evas_get(ee)); obj; obj = evas_object_above_get(obj))
            visit(walk, obj);
        add_focus(walk);
    }
    g_dbus_method_invocation_return_value(invocation, g_variant_new("(a(ssiiii))", &out));
}

const GDBusInterfaceVTable methods = {answer, nullptr, nullptr, {}};
} // namespace

void inspect_publish()
{
    GDBusConnection *bus = bus_connection();
    if (!std::getenv("ORVANT_INSPECT") || !bus)
        return;
    ecore_event_filter_add(nullptr, count_key, nullptr, nullptr);
    GDBusNodeInfo *node = g_dbus_node_info_new_for_xml(interface_xml, nullptr);
    g_dbus_connection_register_object(bus, "/com/orvant/Inspect", node->interfaces[0], &methods, nullptr, nullptr,
                                      nullptr);
    g_dbus_node_info_unref(node);
}
