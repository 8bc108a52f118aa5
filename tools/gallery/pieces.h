#pragma once
// What scenes are made of. A style, group or picture that is not there is counted and named on standard error.
#include <Elementary.h>
#include <string>

void missing(const char *kind, const char *name);

// Path of a theme file of the application.
std::string resource(const char *name);

void expand(Evas_Object *obj);
Evas_Object *layout_add(Evas_Object *parent, const char *group);
Evas_Object *theme_layout_add(Evas_Object *parent, const char *group);
Evas_Object *picture_add(Evas_Object *parent, const std::string &group);
Evas_Object *button_add(Evas_Object *parent, const char *style, const char *text); // the default style without one
Evas_Object *progress_add(Evas_Object *parent, const char *style, double value);

// Window, conformant and naviframe as an application has them.
Evas_Object *frame_add(Evas_Object *win);
Elm_Object_Item *page_add(Evas_Object *frame, const char *title, Evas_Object *content);
