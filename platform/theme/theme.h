#pragma once
// The platform's theme, as far as it needs more than its file.
#include <Evas.h>

// Makes dialogs as wide as a window allows: keeps the size classes "ui.dialog" and "ui.dialog.text" of the theme fitted
// to the width of `win` (a window of Elementary, borrowed) from now until it is deleted. They are one for all windows
// of the program: the window that was resized last sets them. In a window narrower than 480 pixels at the scale 1.8, or
// what is as many of them at another, it also keeps the text classes "ui.title", "ui.body" and "ui.caption" from
// growing to more than there is room for: set a table of fonts before it, or resize the window. Without this call
// dialogs have the width that fits the narrowest screen, 320 pixels of 480. Main loop only.
void platform_theme_window_watch(Evas_Object *win);
