#pragma once
#include <Evas.h>

// A window that nobody sees takes no frames. EFL stops drawing a window that is iconified or wholly covered, but the
// frame that it had asked for before stays asked for, sixty times a second, until the window is drawn again. From here
// on that frame is taken back while the window is out of sight, and asked for when it comes back. Animations that are
// under way go on by themselves. Once per window, which ends the watch with itself; main thread only.
void window_rest_watch(Evas_Object *window);

// The window is iconified or withdrawn, or it is neither again; what covers it is seen here already.
void window_rest_hidden_set(Evas_Object *window, bool hidden);
