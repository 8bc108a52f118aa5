#pragma once
// Where the application's files lie.
#include <string>

// The application root, without a final slash: the nearest folder above the running program that holds
// "res/edje/velora.edj" (a build folder is one), else the root it was configured for. Any thread.
const std::string &_velora_common_app_root();

// A file below the application root, for example "res/edje/velora.edj". Any thread.
std::string _velora_common_app_file(const char *relative);

// The folder of the user's media files, without a final slash: $VELORA_MEDIA_ROOT, else as configured. Any thread.
std::string _velora_common_media_root();
