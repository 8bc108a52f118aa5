#pragma once
// What a page shows, for scripts that operate the application.
#include "view.h"

// Keeps the list that the inspection of windows reads ("inspect,list") as long as the view lives; nothing without
// $ORVANT_INSPECT.
void inspect_start(View &view);
void inspect_stop(View &view);
