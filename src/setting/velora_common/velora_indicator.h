#pragma once
// How the indicator lies over a page. Main loop only.
#include <Elementary.h>

enum IndicatorMode {
    INDICATOR_MODE_TRANSPARENT = 0,
    INDICATOR_MODE_HEADER = 1,
    INDICATOR_MODE_TRANSLUCENT = 2,
};

// How the indicator lies over the page; a mode not of IndicatorMode changes nothing.
void _velora_common_set_indicator_mode(Evas_Object *conformant, int mode);
