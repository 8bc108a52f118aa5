#pragma once
// What the application shell's own files share. Main loop only.
#include "velora_common/velora_app_data.h"
#include <string>
#include <vector>

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

// The path that a uri stands for: a part of it, or null for null.
const char *__convert_uri_to_path(const char *uri);

// Takes what nobody can have meant to share out of the first thousand of `paths`, borrowed uris, and returns it.
std::vector<std::string> __refused_take(std::vector<char *> *paths);
// Tells the person what was refused, if anything was, by one notice that counts.
void __refused_say(const std::vector<std::string> &refused);
// Looks at the uris behind the first thousand of a request's bit by bit: what is refused of them is told as well, to
// the person and in the reply, and fails when its turn comes to be uploaded. The array becomes ours.
void __refused_look_on(int request, char **paths, int count);
