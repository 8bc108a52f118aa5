#pragma once
// The platform's theme, as far as it needs more than its file.
#include <Evas.h>

// Makes dialogs as wide as a window allows: keeps the size classes "ui.dialog" and "ui.dialog.text" of the theme fitted
// to the width of `win` (a window of Elementary, borrowed) from now until it is deleted. They are one for all windows
// of the program: the window that was resized last sets them. In a window whose shorter side is less
// than 480 pixels at the scale 1.8, or what is as many of them at another, the text classes of the palette
// grow less than the person chose, at 320 pixels not at all. Without this call
// dialogs have the width that fits the narrowest screen, 320 pixels of 480. Main loop only.
void platform_theme_window_watch(Evas_Object *win);
