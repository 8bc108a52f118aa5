#pragma once
#include "view.h"

// im.cpp: input methods and the on-screen keyboard, by Ecore_IMF
void im_connect(View &view);
void im_disconnect(View &view);
void im_focus(View &view, bool has_focus);
// True when the input method has taken the key.
bool im_filter_down(View &view, Evas_Event_Key_Down *event);
bool im_filter_up(View &view, Evas_Event_Key_Up *event);
// Puts the text in where the page is edited; false where it is not.
bool im_commit(View &view, const char *text);
