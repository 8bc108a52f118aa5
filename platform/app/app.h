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

// The application's callbacks; each may be null. All run on the main thread. `user_data` is what app_efl_main got.
typedef struct {
    // Once, before the first request. False: the application does not start (terminate is not called).
    bool (*create)(void *user_data);
    // Once, when the main loop has ended, however that came about: elm_exit, SIGTERM, SIGINT, SIGHUP.
    void (*terminate)(void *user_data);
    // All windows have been iconified or hidden, and: one of them shows again. A window that others cover, or that the
    // application lowers, is not paused. Windows that exist when a request has been handled are watched.
    void (*pause)(void *user_data);
    void (*resume)(void *user_data);
    // A launch request: the one the process was started with, later those of further starts and of other applications.
    // The request is valid during the call; clone it to reply later.
    void (*app_control)(app_control_h request, void *user_data);
    void (*low_memory)(void *user_data);                                               // never called on this system
    void (*low_battery)(void *user_data);                                              // never called on this system
    void (*device_orientation)(app_device_orientation_e orientation, void *user_data); // never called on this system
    // The key "db/menu_widget/language" has changed; noticed when a request comes or the application resumes. Locale
    // and catalogues are switched already.
    void (*language_changed)(void *user_data);
    void (*region_format_changed)(void *user_data); // never called on this system
} app_event_callback_s;

// Runs the application: create, the first request, the main loop, terminate. It initialises and shuts down Elementary
// and runs GLib's default main context on its main loop. The result is for the process's exit status: 0, 1 when it
// could not start (no display, create refused) or a handed-over request did not succeed, 2 for wrong arguments; the
// reason is one line on standard error. The window tree and Elementary must not be used after it returns. Main thread
// only.
//
// Arguments (they stay in argv): [--operation OP] [--app ID] [--uri URI] [--mime TYPE] [--window ID]
// [--extra KEY=VALUE]... [--array KEY[=VALUE]]... [--print-reply] [--service] [--] [FILE]... make the first request; OP
// may leave out APP_CONTROL_OPERATION_PREFIX, and files alone are a multi_share. With a session bus one process runs
// per application id (see app_set_id): a further start hands its request to it and ends. --print-reply waits for the
// reply and prints it on standard output as "reply: RESULT [KEY=VALUE]..."; --service starts without a request, to wait
// for one from the bus: when none has come after a minute (or after $ORVANT_SERVICE_WAIT seconds) the program ends.
//
// Set when the environment does not: ELM_PROFILE=mobile, ELM_SCALE=1.8, and the language as language.h says. The
// platform theme (theme/platform.edj) is laid over the default theme.
int app_efl_main(int *argc, char ***argv, app_event_callback_s *callback, void *user_data);

// Windows made ready before the start. This system makes none: the results are null and applications create their own.
Evas_Object *app_get_preinitialized_window(const char *name);
Evas_Object *app_get_preinitialized_background();
Evas_Object *app_get_preinitialized_conformant();
