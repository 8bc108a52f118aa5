#pragma once
// The application framework as a test holds it: requests and replies are written down instead of sent, the lifecycle
// runs at the test's command, and any call can be made to fail. The records themselves are the real ones. Main thread.
#include "app/app.h"
#include <functional>
#include <string>
#include <vector>

namespace fake_app {

// Forgets everything below, and what was to fail. Handles in `sent` and `replies` are destroyed.
void clear();

// From now the `nth` call (1: the next) of the function of this name gives `error` and does nothing else. Functions:
// app_control_create, _clone, _set_operation, _set_app_id, _add_extra_data, _to_bundle, _send_launch_request,
// _reply_to_launch_request, _foreach_app_matched, all with "app_control" in front.
void fail(const std::string &function, int nth, int error);

struct Sent {
    app_control_h request; // a copy
    app_control_reply_cb callback;
    void *user_data;
};
// What app_control_send_launch_request took.
std::vector<Sent> &sent();
// Lets the receiver of sent()[index] answer: runs its callback, if it gave one, the first time. False otherwise.
bool answer(size_t index, app_control_h reply, app_control_result_e result);

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
// With true (it starts so) app_control_send_launch_request finds every application, else APP_NOT_FOUND.
void set_receivers_exist(bool exist);

// app_efl_main calls create, then the script in place of the main loop, then terminate, and gives 0 (1 when create
// refuses). Without a script it hands over one empty request and runs the Ecore main loop. The script calls:
void run(std::function<void()> script);
void request(app_control_h request); // the application's launch request callback
void pause();
void resume();
void change_language();

} // namespace fake_app
