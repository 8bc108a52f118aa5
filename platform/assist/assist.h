#pragma once
// Back and more keys, changeable colours and fonts, the screen reader. Main thread only, with Elementary initialised.
#include <Evas.h>

// Back: Escape, XF86Back. More: Menu, XF86Menu. (Key names of xkeysyms, as Evas gives them.)
enum ea_callback_type_e { EA_CALLBACK_BACK = 0, EA_CALLBACK_MORE = 1 };

// `event_info` is always null.
typedef void (*ea_event_cb)(void *data, Evas_Object *obj, void *event_info);
typedef struct ea_theme_color_table_s *ea_theme_color_table_h;
typedef struct ea_theme_font_table_s *ea_theme_font_table_h;

// Calls `func` when the key is released over `obj`: of the visible objects of a window that are registered for the key
// the topmost gets it, and nobody else; its callbacks run in the order of their registration. A popup in front that is
// not registered for the key keeps it from what it covers. A key that the focused object has used up (a text entry, a
// web page) goes to no one. A widget that is registered for a key has no binding of its own for it any more (a
// naviframe goes back at Escape). The callback runs from the main loop shortly after, when it may delete `obj` or the
// window. One object may have several callbacks. They go away with `obj`; `data` stays the caller's. Null `obj` or
// `func`: no effect.
void ea_object_event_callback_add(Evas_Object *obj, ea_callback_type_e type, ea_event_cb func, void *data);
// Takes back the last registration of this object, key and function. The result is its `data`, null when there is none.
void *ea_object_event_callback_del(Evas_Object *obj, ea_callback_type_e type, ea_event_cb func);

// Tells that the window's widgets carry texts for a screen reader. When the desktop says that one is on
// (org.a11y.Status.ScreenReaderEnabled on the session bus), now or later, the window is offered to it over AT-SPI.
// Asking takes a second at most.
void ea_screen_reader_support_set(Evas_Object *win, bool supported);

// Whether the desktop says that a screen reader is on. False before the first window that supports one.
bool ea_screen_reader_is_on();

// Has a widget that appears, a popup say, read out as a notification with `text` (plain, copied) as its name, and emits
// the smart event "access,read,stop" on it, with null as its event_info, once the text was read. AT-SPI does not tell
// an application when speech ends: the event comes after the time that the text takes a slow voice, 2 seconds and 0.1
// for each letter (0.4 for a wide one), and at least 6, also when no reader is on. It does not come when the widget
// goes before; a second call takes the place of the first. Null `widget` or `text`: no effect.
void ea_screen_reader_read(Evas_Object *widget, const char *text);

// What a screen reader says of a widget in place of the text that it shows. `name` is plain text and copied. Null
// `widget` or `name`: no effect.
void ea_screen_reader_name_set(Evas_Object *widget, const char *name);

// Until this is called with true the two functions that apply tables do nothing.
void ea_theme_changeable_ui_enabled_set(bool enabled);

// Reads a table of Edje colour classes. `light` and `dark` are #RRGGBB or #RRGGBBAA, not premultiplied:
//   <colors><color class="NAME" light="#RRGGBBAA" dark="#RRGGBBAA"/>...</colors>
// Null, and a line in the log, when the file cannot be read or does not keep to this form in every entry. The table is
// the caller's; null may be freed.
ea_theme_color_table_h ea_theme_color_table_new(const char *path);
void ea_theme_color_table_free(ea_theme_color_table_h table);
// What the person chose, for what has colours and sizes of its own: see the two functions that apply tables.
bool ea_theme_is_dark();
// In percent, 50 to 200.
int ea_theme_text_percent();
// Sets the table's classes for the whole process. Style 0 is what the person chose: $ORVANT_THEME ("dark" or "light"),
// else the key "db/setting/theme_dark" of the settings store, else light. Style 1 is dark. Outline and shadow of a
// class get the same colour.
void ea_theme_colors_set(ea_theme_color_table_h table, int style);
// The table's classes are the theme's own again, whatever the style they were set in.
void ea_theme_colors_unset(ea_theme_color_table_h table, int style);

// The same for Edje text classes; SIZE is in pixels, a whole number above 0, and so is MOST, which may be left out and
// is at least SIZE:
//   <fonts><font class="NAME" font="FAMILY" size="SIZE" largest="MOST"/>...</fonts>
ea_theme_font_table_h ea_theme_font_table_new(const char *path);
void ea_theme_font_table_free(ea_theme_font_table_h table);
// Sets the table's classes for the whole process, each SIZE multiplied by what the person chose and MOST at most:
// $ORVANT_TEXT_PERCENT, else the text of the key "db/setting/text_percent" of the settings store, else 100. What is no
// whole number counts as not set; what is below 50 or above 200 counts as 50 or 200.
void ea_theme_fonts_set(ea_theme_font_table_h table);

// What a class stands for now: 0 to 255 each, not premultiplied. False, and everything 255, when nobody has set it.
bool ea_theme_color_get(const char *color_class, int *r, int *g, int *b, int *a);
// False, and null and 0, when nobody has set it. `*font` is the caller's (free), `*size` in pixels, the chosen text
// size included.
bool ea_theme_font_get(const char *font_class, char **font, int *size);
// Colours the whole object by the class, as evas_object_color_set does. No effect when nobody has set the class.
void ea_theme_object_color_set(Evas_Object *obj, const char *color_class);
