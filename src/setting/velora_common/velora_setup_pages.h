#pragma once
// The pages of the first-boot wizard: one at a time, and whichever it is, it stands for every request that has opened
// the wizard or has come for it meanwhile. All of them hear the same result. While a page is there the window stays
// upright. Main loop only.
#include "velora_common/velora_app_data.h"

// A request for the wizard has come. True when a page of it is open: that one is in front now, and stands for the
// request too. A page that is just being left has ended, and false is the answer as for none.
bool _velora_setup_join(AppData *ad);
// Registers the page of the naviframe item that was just pushed. It ends by destroy(page), which frees the record and
// is called while the item is still there; popups of the page's and the item go with it.
void _velora_setup_page_add(AppData *ad, void *page, Elm_Object_Item *item, void (*destroy)(void *page));
// Whether the open page is still to be asked: once the person has chosen a way its callbacks do nothing.
bool _velora_setup_is_open();

// What those who wait will hear under "result", whatever page the person leaves from (copied).
void _velora_setup_result_set(AppData *ad, const char *result);
// The wizard is left from an idler: with no other page the application ends, else only the wizard's requests are
// answered.
void _velora_setup_leave(AppData *ad);
// The page ends and `open` builds the next one for the same requests: once the callback that this is called from has
// returned, or at once.
void _velora_setup_go_on(AppData *ad, void (*open)(AppData *ad));
void _velora_setup_go_on_now(AppData *ad, void (*open)(AppData *ad));
