#pragma once
// Back and more keys, changeable colours and fonts, the screen reader.
#include <Evas.h>

enum ea_callback_type_e { EA_CALLBACK_BACK = 0, EA_CALLBACK_MORE = 1 };
typedef void (*ea_event_cb)(void *data, Evas_Object *obj, void *event_info);
typedef struct ea_theme_color_table_s *ea_theme_color_table_h;
typedef struct ea_theme_font_table_s *ea_theme_font_table_h;

void ea_object_event_callback_add(Evas_Object *obj, ea_callback_type_e type, ea_event_cb func, void *data);
void *ea_object_event_callback_del(Evas_Object *obj, ea_callback_type_e type, ea_event_cb func);
void ea_screen_reader_support_set(Evas_Object *win, bool supported);
void ea_theme_changeable_ui_enabled_set(bool enabled);
ea_theme_color_table_h ea_theme_color_table_new(const char *path);
void ea_theme_color_table_free(ea_theme_color_table_h table);
void ea_theme_colors_set(ea_theme_color_table_h table, int style); // 0 the default style, 1 dark when the user asks
void ea_theme_colors_unset(ea_theme_color_table_h table, int style);
ea_theme_font_table_h ea_theme_font_table_new(const char *path);
void ea_theme_font_table_free(ea_theme_font_table_h table);
void ea_theme_fonts_set(ea_theme_font_table_h table);
