#include "theme/theme.h"
#include <Edje.h>
#include <Elementary.h>
#include <algorithm>

namespace {

// Lengths of the theme's files, which declare this scale.
constexpr double theme_scale = 1.8;
constexpr int card_margins = 48; // from a card's content to both edges of the window
constexpr int text_margins = 32; // from a dialog's text to both sides of that content
constexpr int widest_dialog = 600;
constexpr int narrowest_dialog = 160;

void fit_dialogs(void *, Evas *, Evas_Object *win, void *)
{
    int width = 0;
    evas_object_geometry_get(win, nullptr, nullptr, &width, nullptr);
    const double scale = elm_config_scale_get() * elm_object_scale_get(win) / theme_scale;
    if (width <= 1 || scale <= 0)
        return;
    const int dialog = std::clamp(int(width / scale) - card_margins, narrowest_dialog, widest_dialog);
    edje_size_class_set("ui.dialog", dialog, 0, -1, -1);
    edje_size_class_set("ui.dialog.text", dialog - text_margins, 0, -1, -1);
}

} // namespace

void platform_theme_window_watch(Evas_Object *win)
{
    evas_object_event_callback_add(win, EVAS_CALLBACK_RESIZE, fit_dialogs, nullptr);
    fit_dialogs(nullptr, nullptr, win, nullptr);
}
