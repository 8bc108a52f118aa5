#pragma once
// Which way the window is turned. Main loop only.
#include <Elementary.h>

// 1 when the window is rotated by 90 or 270 degrees, else 0; null is logged and gives 0.
int _velora_common_get_landscape_mode(Evas_Object *win);

// Keeps the window upright while at least one page wants it so; where the window manager cannot turn it nothing
// happens. Each call with true is taken back by one with false; then all four rotations are allowed again.
void _velora_common_upright_set(Evas_Object *win, bool is_upright);
