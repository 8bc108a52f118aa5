#include "theme/theme.h"
#include <Edje.h>
#include <Elementary.h>
#include <algorithm>
#include <climits>
#include <cstring>
#include <string>

namespace {

// Lengths of the theme's files, which declare this scale.
constexpr double theme_scale = 1.8;
constexpr int card_margins = 48; // from a card's content to both edges of the window
constexpr int text_margins = 32; // from a dialog's text to both sides of that content
constexpr int card_edges = 16;   // what a card is wider than its content
constexpr int path_margins = 64; // what a path bar needs beside one name
constexpr int widest_dialog = 600, widest_dialog_of_large_text = 760;
constexpr int narrowest_dialog = 160;
constexpr int room_for_two = 480, room_for_three = 590; // buttons beside each other
constexpr int room_in_low = 400;             // the same where there is no height for more than one line of them
constexpr int low = 400;                     // the height of such a window
constexpr int plain_text = 26;               // the size of "ui.body" that these widths are for
constexpr int narrow = 480, narrowest = 320; // letters can be twice as large in the first, not larger in the other

// Whether the buttons of a dialog stand beside each other, as the spacers of the theme take it.
void buttons_beside(const char *size_class, bool beside)
{
    edje_size_class_set(size_class, 0, 0, beside ? -1 : 0, beside ? 0 : -1);
}

// A dialog that is open when the classes change asks for its size anew; Edje lays it out again by itself, but keeps to
// the size that it was given.
void measure_again(Evas_Object *object, bool is_text_new)
{
    for (const char *plain : {"rectangle", "image", "text", "textblock", "line", "polygon", "textgrid", "vectors"})
        if (std::strcmp(evas_object_type_get(object), plain) == 0)
            return;
    if (elm_object_widget_check(object) && std::strcmp(elm_object_widget_type_get(object), "Elm_Layout") == 0)
        elm_layout_sizing_eval(object);
    // Rows keep the height that they were measured with.
    if (is_text_new && elm_object_widget_check(object) &&
        std::strcmp(elm_object_widget_type_get(object), "Elm_Genlist") == 0)
        elm_genlist_realized_items_update(object);
    Eina_List *members = evas_object_smart_members_get(object);
    const Eina_List *node = nullptr;
    void *member = nullptr;
    EINA_LIST_FOREACH(members, node, member)
    measure_again(static_cast<Evas_Object *>(member), is_text_new);
    eina_list_free(members);
}

struct Letters {
    const char *text_class;
    int plain;      // the size that the palette gives
    int wanted = 0; // what the program has set, or nothing
    int given = 0;  // what this file has made of it
} letters[] = {{"ui.title", 30}, {"ui.body", 26},      {"ui.caption", 22},   {"ATO007", 28},
               {"ATO004", 24},   {"ui.bar.title", 30}, {"ui.bar.button", 26}};

// Large letters in a narrow window leave a row two of them, and in a low one no row: they grow less there.
bool bound_letters(int shorter_side)
{
    bool is_new = false;
    for (Letters &one : letters) {
        const char *font = nullptr;
        Evas_Font_Size now = 0;
        if (!edje_text_class_get(one.text_class, &font, &now) || !font || now <= 0)
            continue;
        if (now != one.given)
            one.wanted = now;
        const int more = one.plain * std::max(shorter_side - narrowest, 0) / (narrow - narrowest);
        const int most = shorter_side < narrow ? one.plain + more : INT_MAX;
        one.given = std::min(one.wanted, most);
        if (one.given == now)
            continue;
        is_new = true;
        edje_text_class_set(one.text_class, std::string(font).c_str(), one.given);
    }
    return is_new;
}

void fit_to_window(void *, Evas *, Evas_Object *win, void *)
{
    int width = 0, height = 0;
    evas_object_geometry_get(win, nullptr, nullptr, &width, &height);
    const double scale = elm_config_scale_get() * elm_object_scale_get(win) / theme_scale;
    if (width <= 1 || scale <= 0)
        return;
    const bool is_text_new = bound_letters(int(std::min(width, height) / scale));
    const char *font = nullptr;
    Evas_Font_Size size = plain_text;
    edje_text_class_get("ui.body", &font, &size);
    const int widest = std::clamp(widest_dialog * size / plain_text, widest_dialog, widest_dialog_of_large_text);
    const int dialog = std::clamp(int(width / scale) - card_margins, narrowest_dialog, widest);
    edje_size_class_set("ui.dialog", dialog, 0, -1, -1);
    edje_size_class_set("ui.path", 24, 40, std::max(int(width / scale) - path_margins, narrowest_dialog), -1);
    const bool is_low = height / scale < low;
    buttons_beside("ui.dialog.beside.2", dialog >= (is_low ? room_in_low : room_for_two));
    buttons_beside("ui.dialog.beside.3", dialog >= (is_low ? room_in_low : room_for_three));
    edje_size_class_set("ui.dialog.card", 0, 0, dialog + card_edges, 99999);
    edje_size_class_set("ui.dialog.text", dialog - text_margins, 0, dialog - text_margins, -1);
    for (Evas_Object *object = evas_object_bottom_get(evas_object_evas_get(win)); object;
         object = evas_object_above_get(object))
        measure_again(object, is_text_new);
}

Ecore_Job *fit_job = nullptr;

// The person's choice may come after the window, which is being drawn here.
void letters_watch(void *win, Evas *, void *)
{
    for (const Letters &one : letters) {
        const char *font = nullptr;
        Evas_Font_Size now = 0;
        if (edje_text_class_get(one.text_class, &font, &now) && font && now != one.given && !fit_job)
            fit_job = ecore_job_add(
                [](void *data) {
                    fit_job = nullptr;
                    fit_to_window(nullptr, nullptr, static_cast<Evas_Object *>(data), nullptr);
                },
                win);
    }
}

void watch_end(void *, Evas *evas, Evas_Object *win, void *)
{
    evas_event_callback_del_full(evas, EVAS_CALLBACK_RENDER_PRE, letters_watch, win);
    if (fit_job)
        ecore_job_del(fit_job);
    fit_job = nullptr;
}

} // namespace

void platform_theme_window_watch(Evas_Object *win)
{
    evas_object_event_callback_add(win, EVAS_CALLBACK_RESIZE, fit_to_window, nullptr);
    evas_event_callback_add(evas_object_evas_get(win), EVAS_CALLBACK_RENDER_PRE, letters_watch, win);
    evas_object_event_callback_add(win, EVAS_CALLBACK_DEL, watch_end, nullptr);
    fit_to_window(nullptr, nullptr, win, nullptr);
}
