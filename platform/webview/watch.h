#pragma once
#include "view.h"

// watch.cpp: whether the process that shows the page lives, answers and paints
void watch_connect(View &view);
void watch_start(View &view); // from the first load on; once more for another patience
void watch_stop(View &view);
void watch_painted(View &view);   // the view has got pixels
void watch_committed(View &view); // another page has come, of which nothing is painted yet
void watch_finished(View &view);  // it is whole, and should be
