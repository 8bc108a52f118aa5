#pragma once
// The scenes of settings pages.
#include <Evas.h>

void settings(Evas_Object *win);
void settings_end(Evas_Object *win); // the same, scrolled to its end
void settings_schedule(Evas_Object *win);
void settings_first(Evas_Object *win); // of the first boot
void switches(Evas_Object *win);
