#pragma once
#include "view.h"
#include <functional>

// menu.cpp: the context menu
void menu_connect(View &view);
unsigned int menu_count(const Ewk_Context_Menu *menu);
Ewk_Context_Menu_Item *menu_nth(const Ewk_Context_Menu *menu, unsigned int n);
Ewk_Context_Menu_Item_Tag menu_item_tag(const Ewk_Context_Menu_Item *item);
void menu_item_remove(Ewk_Context_Menu *menu, Ewk_Context_Menu_Item *item);

// dialog.cpp: what a page asks a person, and what it must not ask
void dialog_connect(View &view);
// The view's one popup, in place of an earlier one: goes at the back key, with the view, or with the page's process.
// `ended` is called when it does, and never again. `popup` is a new ctxpopup or popup.
void popup_set(View &view, Evas_Object *popup, std::function<void()> ended);
// Not at once: the key that was its answer would reach the page as well.
void popup_close_soon(Evas_Object *popup);
// A list of items to choose from; `x` and `y` in the page. Its items are still to be added.
Evas_Object *ctxpopup_new(View &view, int x, int y);
// Plain text as Elementary wants it.
std::string markup_of(const char *text);
