#pragma once
// Which program takes a launch request, and how it is started. For the framework's own sources; main thread only.
#include "app/request.h"

struct GObjectUnref {
    void operator()(gpointer object) const
    {
        g_object_unref(object);
    }
};
using AppInfo = std::unique_ptr<GAppInfo, GObjectUnref>;

struct Target {
    enum { none, ours, ordinary } kind = none;
    std::string app_id; // ours: the bus name
    AppInfo info;       // ours: may be null when the bus starts it
};

// The entry APP_ID.desktop: of $ORVANT_APPS_DIR, of packaging/applications in the running program's folder or one above
// it (a build folder), then of the user's and the system's data folders. Null when there is none.
AppInfo desktop_entry(const std::string &app_id);

Target find_target(const app_control_s &request);
// The applications for a request to view, the user's default first.
std::vector<AppInfo> viewers(const app_control_s &request);

// Starts an ordinary program with what the request is about. False when it cannot be started.
bool start_ordinary(GAppInfo *info, const app_control_s &request);

// The command of the entry with `arguments` behind it, field codes left out. Empty when it cannot be read.
std::vector<std::string> command_of(GAppInfo *info, const std::vector<std::string> &arguments);

// True when a program started from here finds a display.
bool environment_has_display();
