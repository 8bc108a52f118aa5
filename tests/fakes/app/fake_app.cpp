#include "fake_app.h"
#include "app/request.h"
#include <Elementary.h>
#include <map>
#include <utility>

int real_app_control_create(app_control_h *);
int real_app_control_clone(app_control_h *, app_control_h);
int real_app_control_set_operation(app_control_h, const char *);
int real_app_control_set_app_id(app_control_h, const char *);
int real_app_control_add_extra_data(app_control_h, const char *, const char *);
int real_app_control_to_bundle(app_control_h, bundle **);

namespace {
struct Failure {
    int nth;
    int error;
};

struct State {
    std::map<std::string, Failure> failures;
    std::vector<fake_app::Sent> sent;
    std::vector<fake_app::Reply> replies;
    std::vector<std::pair<std::string, std::string>> viewers;
    bool receivers_exist = true;
    std::function<void()> script;
    app_event_callback_s callbacks{};
    void *user_data = nullptr;
};

State &state()
{
    static State the;
    return the;
}

std::string own_id = "com.example.application";

// The error that the call must give; 0 for none.
int failure(const char *function)
{
    const auto found = state().failures.find(function);
    if (found == state().failures.end() || --found->second.nth > 0)
        return 0;
    const int error = found->second.error;
    state().failures.erase(found);
    return error;
}

void tell(void (*callback)(void *))
{
    if (callback)
        callback(state().user_data);
}
} // namespace

namespace fake_app {

void clear()
{
    State old;
    std::swap(old, state());
    for (const Sent &one : old.sent)
        app_control_destroy(one.request);
    for (const Reply &one : old.replies)
        app_control_destroy(one.reply);
    state().callbacks = old.callbacks;
    state().user_data = old.user_data;
}

void fail(const std::string &function, int nth, int error)
{
    state().failures[function] = {nth, error};
}

std::vector<Sent> &sent()
{
    return state().sent;
}

bool answer(size_t index, app_control_h reply, app_control_result_e result)
{
    if (index >= sent().size() || !sent()[index].callback)
        return false;
    const Sent one = sent()[index];
    sent()[index].callback = nullptr;
    one.callback(one.request, reply, result, one.user_data);
    return true;
}

std::vector<Reply> &replies()
{
    return state().replies;
}

app_control_h receive(const char *operation, const char *sender)
{
    auto *request = new app_control_s;
    if (operation)
        request->operation = operation;
    request->answer =
        std::make_shared<Answer>([from = std::string(sender)](const app_control_s *reply, app_control_result_e result) {
            replies().push_back({reply ? new app_control_s(*reply) : nullptr, result, from});
        });
    return request;
}

void install_viewer(const std::string &mime, const std::string &app_id)
{
    state().viewers.emplace_back(mime, app_id);
}

void set_receivers_exist(bool exist)
{
    state().receivers_exist = exist;
}

void run(std::function<void()> script)
{
    state().script = std::move(script);
}

void request(app_control_h request)
{
    if (state().callbacks.app_control)
        state().callbacks.app_control(request, state().user_data);
}

void pause()
{
    tell(state().callbacks.pause);
}

void resume()
{
    tell(state().callbacks.resume);
}

void change_language()
{
    tell(state().callbacks.language_changed);
}

} // namespace fake_app

int app_efl_main(int *argc, char ***argv, app_event_callback_s *callback, void *user_data)
{
    if (!argc || !argv || !callback)
        return 2;
    State &the = state();
    the.callbacks = *callback;
    the.user_data = user_data;
    if (callback->create && !callback->create(user_data))
        return 1;
    if (the.script) {
        the.script();
    } else {
        app_control_h first = fake_app::receive(nullptr);
        fake_app::request(first);
        app_control_destroy(first);
        elm_run();
    }
    tell(callback->terminate);
    return 0;
}

Evas_Object *app_get_preinitialized_window(const char *)
{
    return nullptr;
}

Evas_Object *app_get_preinitialized_background()
{
    return nullptr;
}

Evas_Object *app_get_preinitialized_conformant()
{
    return nullptr;
}

void app_set_id(const char *app_id)
{
    own_id = app_id ? app_id : "";
}

const char *app_get_id()
{
    return own_id.c_str();
}

void app_add_alias(const char *) {}

int app_control_create(app_control_h *request)
{
    const int error = failure("app_control_create");
    return error ? error : real_app_control_create(request);
}

int app_control_clone(app_control_h *clone, app_control_h request)
{
    const int error = failure("app_control_clone");
    return error ? error : real_app_control_clone(clone, request);
}

int app_control_set_operation(app_control_h request, const char *operation)
{
    const int error = failure("app_control_set_operation");
    return error ? error : real_app_control_set_operation(request, operation);
}

int app_control_set_app_id(app_control_h request, const char *app_id)
{
    const int error = failure("app_control_set_app_id");
    return error ? error : real_app_control_set_app_id(request, app_id);
}

int app_control_add_extra_data(app_control_h request, const char *key, const char *value)
{
    const int error = failure("app_control_add_extra_data");
    return error ? error : real_app_control_add_extra_data(request, key, value);
}

int app_control_to_bundle(app_control_h request, bundle **out)
{
    const int error = failure("app_control_to_bundle");
    return error ? error : real_app_control_to_bundle(request, out);
}

int app_control_send_launch_request(app_control_h request, app_control_reply_cb callback, void *user_data)
{
    if (!request)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    if (const int error = failure("app_control_send_launch_request"))
        return error;
    if (!state().receivers_exist)
        return APP_CONTROL_ERROR_APP_NOT_FOUND;
    state().sent.push_back({new app_control_s(*request), callback, user_data});
    return APP_CONTROL_ERROR_NONE;
}

int app_control_reply_to_launch_request(app_control_h reply, app_control_h request, app_control_result_e result)
{
    if (!request || !request->answer)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    if (const int error = failure("app_control_reply_to_launch_request"))
        return error;
    return request->answer->give(reply, result) ? APP_CONTROL_ERROR_NONE : APP_CONTROL_ERROR_LAUNCH_REJECTED;
}

int app_control_foreach_app_matched(app_control_h request, app_control_app_matched_cb callback, void *user_data)
{
    if (!request || !callback)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    if (const int error = failure("app_control_foreach_app_matched"))
        return error;
    if (request->operation && *request->operation != APP_CONTROL_OPERATION_VIEW)
        return APP_CONTROL_ERROR_NONE;
    for (const auto &[mime, app_id] : state().viewers)
        if (request->mime == mime && !callback(request, app_id.c_str(), user_data))
            break;
    return APP_CONTROL_ERROR_NONE;
}
