#pragma once
// The application framework as a test holds it: requests and replies are written down instead of sent, the lifecycle
// runs at the test's command. The records themselves are the real ones. Main thread.
#include "app/app.h"
#include <functional>
#include <string>
#include <vector>

namespace fake_app {

// Forgets everything below. Handles in `sent` and `replies` are destroyed.
void clear();

struct Sent {
    app_control_h request; // a copy
    app_control_reply_cb callback;
    void *user_data;
};
// What app_control_send_launch_request took.
std::vector<Sent> &sent();

struct Reply {
    app_control_h reply; // a copy, null when none was given
    app_control_result_e result;
    std::string sender; // of the request
};
// What app_control_reply_to_launch_request gave.
std::vector<Reply> &replies();

// A request as it arrives from another application: it can be replied to. The caller destroys it; when it and its
// clones are gone without a reply, replies() gets a CANCELED.
app_control_h receive(const char *operation, const char *sender = "com.example.sender");

// Applications for app_control_foreach_app_matched.
void install_viewer(const std::string &mime, const std::string &app_id);

// app_efl_main calls create, then the script in place of the main loop, then terminate, and gives 0 (1 when create
// refuses). The script calls:
void run(std::function<void()> script);
void request(app_control_h request); // the application's launch request callback
void pause();
void resume();
// What app_efl_main was given for the callbacks.
void *user_data();

} // namespace fake_app
