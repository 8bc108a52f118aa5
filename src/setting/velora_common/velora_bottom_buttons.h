#pragma once
// The bar at the bottom of a page. Main loop only.
#include <Elementary.h>

// The two buttons at the bottom of a page (ids of domain "velora", translated once).
Evas_Object *_velora_common_create_bottom_buttons(Evas_Object *parent, void *data, const char *text1_id,
                                                  Evas_Smart_Cb cb1, const char *text2_id, Evas_Smart_Cb cb2);
