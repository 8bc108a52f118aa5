#pragma once
// The web view as a test holds it: an empty widget whose site, person and engine are the test. Events come from the
// main loop, one job after the other, as they come from the real one. Main thread.
#include "webview/ewk.h"
#include <functional>
#include <string>
#include <vector>

namespace fake_ewk {

// Forgets everything below. Views that live stay.
void clear();

struct Answer {
    enum Kind { page, redirect, error, hang } kind = page;
    std::string to = "";                     // of a redirect
    Ewk_Error_Type type = EWK_ERROR_NETWORK; // of an error
};
// What an address leads to; a page where the test has set nothing.
void site(std::function<Answer(const std::string &address)> answer);
// ewk_view_add gives null from now on.
void refuse_views();

// To the view that was made last; nothing when it is gone.
void navigate(const std::string &address); // the person follows a link, or sends a form
void finish();                             // what hangs is there
void fail(Ewk_Error_Type type);            // what hangs has failed
void crash();
void open_window(const std::string &address);
// The tags that the handlers leave.
std::vector<Ewk_Context_Menu_Item_Tag> context_menu(const std::vector<Ewk_Context_Menu_Item_Tag> &tags);

struct Seen {
    std::string address; // of the last ewk_view_url_set
    std::string base, ca_file;
    double patience = 0, text_zoom = 0;
    bool is_dark = false;
    int prepared = 0, stopped = 0, cookies_cleared = 0; // calls
};
const Seen &seen();
int live_views();

} // namespace fake_ewk
