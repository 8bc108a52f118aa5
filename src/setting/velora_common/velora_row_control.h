#pragma once
// What stands at the end of a list's row. Main loop only.
#include <Elementary.h>

// The theme's layout for the end of a row of `genlist`, with `control` (a switch, a radio) in it, which it owns from
// now on. Events of the control go no further: a tap on it is not a tap on its row. The layout is for the list to take.
Evas_Object *_velora_common_row_control(Evas_Object *genlist, Evas_Object *control);
