#include "assist/assist.h"
#include "base/base.h"
#include "vconf/vconf.h"
#include <Elementary.h>
#include <algorithm>
#include <array>
#include <cstring>
#include <glib.h>

#include <limits>
#include <optional>
#include <string>
#include <vector>

using Color = std::array<int, 4>;

struct ea_theme_color_table_s {
    struct Entry {
        std::string name;
        Color light, dark;
    };
    std::vector<Entry> entries;
};

struct ea_theme_font_table_s {
    struct Entry {
        std::string name, font;
        int size, largest = std::numeric_limits<int>::max();
    };
    std::vector<Entry> entries;
};

namespace {
bool enabled = false;

bool parse(const char *text, std::string &value)
{
    value = text;
    return *text != '\0';
}

bool parse(const char *text, Color &color)
{
    const size_t length = std::strlen(text);
    if (text[0] != '#' || (length != 7 && length != 9) || std::strspn(text + 1, "0123456789abcdefABCDEF") != length - 1)
        return false;
    color[3] = 255;
    for (size_t i = 0; 1 + 2 * i < length; i++)
        color[i] = g_ascii_xdigit_value(text[1 + 2 * i]) * 16 + g_ascii_xdigit_value(text[2 + 2 * i]);
    return true;
}

bool parse(const char *text, int &size)
{
    guint64 number = 0;
    const bool good = g_ascii_string_to_unsigned(text, 10, 1, 1000, &number, nullptr);
    size = static_cast<int>(number);
    return good;
}

bool fill(ea_theme_color_table_s::Entry &entry, const std::string &attribute, const char *value)
{
    return attribute == "class"   ? parse(value, entry.name)
           : attribute == "light" ? parse(value, entry.light)
                                  : attribute == "dark" && parse(value, entry.dark);
}

bool fill(ea_theme_font_table_s::Entry &entry, const std::string &attribute, const char *value)
{
    return attribute == "class"  ? parse(value, entry.name)
           : attribute == "font" ? parse(value, entry.font)
           : attribute == "size" ? parse(value, entry.size)
                                 : attribute == "largest" && parse(value, entry.largest);
}

// Whether every attribute that must be there was given.
bool is_whole(const ea_theme_color_table_s::Entry &, int filled)
{
    return filled == 3;
}

bool is_whole(const ea_theme_font_table_s::Entry &entry, int filled)
{
    return filled == (entry.largest == std::numeric_limits<int>::max() ? 3 : 4) && entry.largest >= entry.size;
}

constexpr const char *outer_element(const ea_theme_color_table_s *)
{
    return "colors";
}

constexpr const char *outer_element(const ea_theme_font_table_s *)
{
    return "fonts";
}

template <class Table>
void element(GMarkupParseContext *context, const char *name, const char **attributes, const char **values,
             gpointer data, GError **error)
{
    auto *table = static_cast<Table *>(data);
    const std::string outer = outer_element(table);
    const GSList *stack = g_markup_parse_context_get_element_stack(context);
    if (!stack->next && name == outer)
        return;
    typename Table::Entry entry{};
    int filled = 0; // Markup has refused repeated attributes
    bool good = stack->next && !stack->next->next && outer.compare(0, outer.size() - 1, name) == 0;
    for (; good && *attributes; attributes++, values++, filled++)
        good = fill(entry, *attributes, *values);
    if (good && is_whole(entry, filled))
        table->entries.push_back(std::move(entry));
    else
        g_set_error(error, G_MARKUP_ERROR, G_MARKUP_ERROR_INVALID_CONTENT, "element %s is not as it should be", name);
}

template <class Table> Table *read_table(const char *path)
{
    if (!path)
        return nullptr;
    static const GMarkupParser parser = {element<Table>, nullptr, nullptr, nullptr, nullptr};
    auto table = std::make_unique<Table>();
    char *text = nullptr;
    gsize length = 0;
    GError *error = nullptr;
    GMarkupParseContext *context =
        g_markup_parse_context_new(&parser, G_MARKUP_PREFIX_ERROR_POSITION, table.get(), nullptr);
    const bool good = g_file_get_contents(path, &text, &length, &error) &&
                      g_markup_parse_context_parse(context, text, static_cast<gssize>(length), &error) &&
                      g_markup_parse_context_end_parse(context, &error);
    g_markup_parse_context_free(context);
    g_free(text);
    if (good)
        return table.release();
    g_warning("%s: %s", path, error->message);
    g_error_free(error);
    return nullptr;
}

bool dark_chosen()
{
    if (const char *name = g_getenv("ORVANT_THEME"); name && *name)
        return std::strcmp(name, "dark") == 0;
    int dark = 0;
    return vconf_get_bool("db/setting/theme_dark", &dark) == 0 && dark;
}

// A whole number, within what the themes are made for; nothing when the text is no number.
std::optional<int> percent(const char *text)
{
    gint64 number = 0;
    if (!text || !g_ascii_string_to_signed(text, 10, G_MININT, G_MAXINT, &number, nullptr))
        return std::nullopt;
    return static_cast<int>(std::clamp<gint64>(number, 50, 200));
}

int chosen_text_percent()
{
    if (const std::optional<int> chosen = percent(g_getenv("ORVANT_TEXT_PERCENT")))
        return *chosen;
    const CString stored(vconf_get_str("db/setting/text_percent"));
    return percent(stored.get()).value_or(100);
}
} // namespace

bool ea_theme_is_dark()
{
    return dark_chosen();
}

int ea_theme_text_percent()
{
    return chosen_text_percent();
}

void ea_theme_changeable_ui_enabled_set(bool on)
{
    enabled = on;
}

ea_theme_color_table_h ea_theme_color_table_new(const char *path)
{
    return read_table<ea_theme_color_table_s>(path);
}

void ea_theme_color_table_free(ea_theme_color_table_h table)
{
    delete table;
}

void ea_theme_colors_set(ea_theme_color_table_h table, int style)
{
    if (!table || !enabled)
        return;
    const bool dark = style == 1 || dark_chosen();
    for (const auto &entry : table->entries) {
        const auto &[r, g, b, a] = dark ? entry.dark : entry.light;
        edje_color_class_set(entry.name.c_str(), r, g, b, a, r, g, b, a, r, g, b, a);
    }
}

void ea_theme_colors_unset(ea_theme_color_table_h table, int)
{
    if (!table)
        return;
    for (const auto &entry : table->entries)
        edje_color_class_del(entry.name.c_str());
}

ea_theme_font_table_h ea_theme_font_table_new(const char *path)
{
    return read_table<ea_theme_font_table_s>(path);
}

void ea_theme_font_table_free(ea_theme_font_table_h table)
{
    delete table;
}

void ea_theme_fonts_set(ea_theme_font_table_h table)
{
    if (!table || !enabled)
        return;
    const int percent = chosen_text_percent();
    for (const auto &entry : table->entries) {
        const int size = std::min((entry.size * percent + 50) / 100, entry.largest);
        edje_text_class_set(entry.name.c_str(), entry.font.c_str(), size);
    }
}

bool ea_theme_color_get(const char *color_class, int *r, int *g, int *b, int *a)
{
    if (!color_class || !r || !g || !b || !a)
        return false;
    int unused[8];
    if (edje_color_class_get(color_class, r, g, b, a, unused, unused + 1, unused + 2, unused + 3, unused + 4,
                             unused + 5, unused + 6, unused + 7))
        return true;
    *r = *g = *b = *a = 255;
    return false;
}

bool ea_theme_font_get(const char *font_class, char **font, int *size)
{
    if (!font_class || !font || !size)
        return false;
    const char *name = nullptr;
    Evas_Font_Size value = 0;
    const bool found = edje_text_class_get(font_class, &name, &value) && name;
    *font = found ? strdup(name) : nullptr;
    *size = found ? value : 0;
    return found;
}

void ea_theme_object_color_set(Evas_Object *obj, const char *color_class)
{
    int r = 0, g = 0, b = 0, a = 0;
    if (!obj || !ea_theme_color_get(color_class, &r, &g, &b, &a))
        return;
    evas_color_argb_premul(a, &r, &g, &b);
    evas_object_color_set(obj, r, g, b, a);
}
