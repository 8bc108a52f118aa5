#pragma once
// The application framework: one running instance, its lifecycle and its main loop.
#include "app/app_control.h"
#include <Evas.h>

enum app_device_orientation_e {
    APP_DEVICE_ORIENTATION_0,
    APP_DEVICE_ORIENTATION_90,
    APP_DEVICE_ORIENTATION_180,
    APP_DEVICE_ORIENTATION_270
};

typedef struct {
    bool (*create)(void *user_data);
    void (*terminate)(void *user_data);
    void (*pause)(void *user_data);
    void (*resume)(void *user_data);
    void (*app_control)(app_control_h request, void *user_data); // reset: a launch request
    void (*low_memory)(void *user_data);
    void (*low_battery)(void *user_data);
    void (*device_orientation)(app_device_orientation_e orientation, void *user_data);
    void (*language_changed)(void *user_data);
    void (*region_format_changed)(void *user_data);
} app_event_callback_s;

int app_efl_main(int *argc, char ***argv, app_event_callback_s *callback, void *user_data);

Evas_Object *app_get_preinitialized_window(const char *name);
Evas_Object *app_get_preinitialized_background();
Evas_Object *app_get_preinitialized_conformant();
