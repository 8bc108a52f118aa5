#pragma once
// What a page shows, for screen readers and for scripts that operate the application.
#include "view.h"

// Keeps the list that the inspection of windows reads ("inspect,list") as long as the view lives, and has a screen
// reader told of changes. Nothing without a screen reader and $ORVANT_INSPECT.
void inspect_start(View &view);
void inspect_stop(View &view);
