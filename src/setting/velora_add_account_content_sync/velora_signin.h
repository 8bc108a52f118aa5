#pragma once
// The sign-in page: the service's own pages in a web view, and what makes an account of the device of it. Main loop
// only.
#include "velora_common/velora_app_data.h"

// Opens the page for the last request, or lets the page that is open go on for it too. is_signin 1 begins with the
// service's sign-in, 0 with its registration. What AppData's upload_list holds goes with the page, and comes back into
// that list when there is an account. Without a network only the popup that says so.
void _velora_signin_create(AppData *ad, int is_signin);

// The same over a page that needs an account. `done` is called with that page in front again, once there is one. Back,
// and a sign-in that comes to nothing, return to that page; `back`, which may be null, is called then.
void _velora_signin_create_over(AppData *ad, int is_signin, void (*done)(AppData *ad),
                                void (*back)(AppData *ad) = nullptr);
