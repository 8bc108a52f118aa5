#pragma once
// Drives EFL pages in process: real widgets, real events, no display (ELM_ENGINE=buffer unless the environment says
// otherwise). Main thread only. Nothing here sleeps: every wait is a run of the main loop until a condition holds.
#include <Elementary.h>
#include <functional>
#include <string>

namespace driver {

// Initialises Elementary, once per process, with GLib's sources on its loop, scale 1.8, the platform theme when it is
// built, and transitions a hundred times as fast as a person sees them.
void start();

// Runs the main loop until the condition holds, at most `seconds`. The result is whether it holds. elm_exit does not
// end the wait; exit_requested tells of it.
bool run_until(const std::function<bool()> &condition, double seconds = 5.0);
// Runs the main loop until all jobs, events and idlers queued so far have run and the canvases are drawn.
void settle();
// True when elm_exit was called since the last call of this function.
bool exit_requested();

// A press and a release of a mouse button at the middle of the object or row. What happens is up to what lies there on
// top. False when it is not visible there. The loop has settled on return. A row is scrolled into view first.
bool click(Evas_Object *obj, int button = 1);
bool click_row(Elm_Object_Item *row);
// A key by its name ("Escape", "XF86Back", "Return", "a"), down and up, to what has the focus there. The loop settles.
void press(Evas_Object *window, const char *key);

// The first visible object below (in the sense of smart members; a window stands for its whole canvas) that passes.
Evas_Object *find(Evas_Object *below, const std::function<bool(Evas_Object *)> &passes);
// By the widget's type ("elm_button", "Elm_Popup", letter case does not matter); `nth` counts from 0.
Evas_Object *find_widget(Evas_Object *below, const char *type, int nth = 0);
// By the whole text that a person reads, markup taken off.
Evas_Object *find_text(Evas_Object *below, const std::string &text);
// What a person reads there, part by part, each visible text in a line of its own.
std::string read_texts(Evas_Object *below);

// The window's canvas as a PNG file, for looking at.
bool save_picture(Evas_Object *window, const std::string &path);

} // namespace driver
