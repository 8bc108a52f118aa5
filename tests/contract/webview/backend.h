#pragma once
// What shows the pages of the cases, and how a person gets at them. Pages of the site, all below base():
//   /page, /slow (never comes), /broken (the service breaks off), /zip (no page), /to-callback, /to-foreign
//   (redirects), /link, /link-foreign, /link-window (nothing but one link, all over the page)
#include <Evas.h>
#include <string>

namespace backend {
void start();
std::string base();
void tap(Evas_Object *view);
void menu(Evas_Object *view);
void crash();
} // namespace backend
