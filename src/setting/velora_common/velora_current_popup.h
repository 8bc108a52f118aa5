#pragma once
// The one popup on screen, AppData's, and whose it is. A popup is taken away by its owner, by the end of its owner's
// page, by its own dismissal, or by another popup that takes its place; by nobody else. Main loop only.
#include "velora_common/velora_app_data.h"

// Makes `popup` (a new, shown one; null does nothing) the one on screen, in the place of the one that is there, whose
// owner is told by its `replaced(data)`. `data` must live as long as the popup. The back key never passes through to
// the page behind: a popup that has not registered it ignores it. The popup may delete itself at any time.
void _velora_popup_show(AppData *ad, PopupOwner owner, Evas_Object *popup, void (*replaced)(void *data) = nullptr,
                        void *data = nullptr);

// Whether the popup on screen is this owner's. An empty topic stands for all of a page.
bool _velora_popup_is_shown(const AppData *ad, PopupOwner owner);

// Takes the popup on screen away if it is this owner's, and says whether it was. Nobody is told.
bool _velora_popup_take_away(AppData *ad, PopupOwner owner);
