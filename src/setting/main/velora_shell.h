#pragma once
// What the application shell's own files share. Main loop only.
#include "velora_common/velora_app_data.h"

// Builds window, background, conformant, layout and naviframe into AppData, once per process; first_mode is the mode
// of the first request. Each failure is logged and leaves the later fields null.
void __create_main_view(AppData *ad, int first_mode);

// Reads the colour and font tables and applies them to the theme.
void __changeable_colors_set(AppData *ad);
void __changeable_font_set(AppData *ad);

// Sets is_landscape from the window's rotation, unless the person has locked the rotation.
void __velora_update_landscape_mode(AppData *ad);

// Has the window show the system's indicator when there is a service that draws one.
void __velora_update_indicator(AppData *ad);

// The LaunchMode that a request's extra data "launch_mode" stands for.
int __velora_read_launch_mode(app_control_h request);

// Makes our window transient for that of the request's sender, when it gave one and both are of X11.
void __velora_join_caller_window(AppData *ad, app_control_h request);

// Opens the page that a request is for. False when a failed network check ended it.
bool __velora_dispatch(AppData *ad, app_control_h request, const char *operation);

// Frees `*count` strings and their array, and clears both words.
void __string_array_free(char ***values, int *count);
