#pragma once
// What every list of the application needs. Main loop only.
#include <Elementary.h>

// Deletes every item of a genlist, in order.
void remove_genlist_item(Evas_Object *genlist);
