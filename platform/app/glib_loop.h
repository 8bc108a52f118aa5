#pragma once
// GLib's main context on the Ecore main loop. Main thread only.

// From now on each wait of the Ecore main loop also waits for the sources of GLib's default main context and runs the
// ready ones: time-outs, idle sources, GIO, D-Bus. Ecore must be initialised. A second call changes nothing.
// While another thread owns the context its sources are that thread's affair.
void glib_loop_start();
// The Ecore main loop waits for its own alone again.
void glib_loop_stop();
