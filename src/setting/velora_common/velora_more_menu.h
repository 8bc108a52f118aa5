#pragma once
// The more menu of a page: a menu with one entry at the bottom of the window. Main loop only.
#include "velora_common/velora_app_data.h"

// Opens the menu as the popup on screen, a page's. The entry's text is `text_id` of `domain`. It stays at its place
// when the window turns or changes its size; the back key and the more key close it. chosen(data) is called once the
// menu is gone, from the main loop; not when the menu, or its page, ends otherwise.
void _velora_more_menu_open(AppData *ad, const void *page, const char *domain, const char *text_id,
                            void (*chosen)(void *data), void *data);
// Deletes the page's menu, if it is open; whether it was.
bool _velora_more_menu_close(AppData *ad, const void *page);
