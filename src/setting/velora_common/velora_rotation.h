#pragma once
// Which way the window is turned. Main loop only.
#include <Elementary.h>

// 1 when the window is rotated by 90 or 270 degrees, else 0; null is logged and gives 0.
int _velora_common_get_landscape_mode(Evas_Object *win);
