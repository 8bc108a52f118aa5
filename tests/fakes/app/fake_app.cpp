#include "fake_app.h"
#include "app/request.h"
#include <Elementary.h>
#include <utility>

namespace {
struct State {
    std::vector<fake_app::Sent> sent;
    std::vector<fake_app::Reply> replies;
    std::vector<std::pair<std::string, std::string>> viewers;
    std::function<void()> script;
    app_event_callback_s callbacks{};
    void *user_data = nullptr;
};

State &state()
{
    static State the;
    return the;
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

std::vector<Sent> &sent()
{
    return state().sent;
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

void *user_data()
{
    return state().user_data;
}

void install_viewer(const std::string &mime, const std::string &app_id)
{
    state().viewers.emplace_back(mime, app_id);
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

} // namespace fake_app

int app_efl_main(int *, char ***, app_event_callback_s *callback, void *user_data)
{
    State &the = state();
    the.callbacks = *callback;
    the.user_data = user_data;
    if (callback->create && !callback->create(user_data))
        return 1;
    the.script();
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

void app_set_id(const char *) {}

const char *app_get_id()
{
    return "com.example.application";
}

void app_add_alias(const char *) {}

int app_control_send_launch_request(app_control_h request, app_control_reply_cb callback, void *user_data)
{
    if (!request)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    state().sent.push_back({new app_control_s(*request), callback, user_data});
    return APP_CONTROL_ERROR_NONE;
}

int app_control_reply_to_launch_request(app_control_h reply, app_control_h request, app_control_result_e result)
{
    if (!request || !request->answer)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    return request->answer->give(reply, result) ? APP_CONTROL_ERROR_NONE : APP_CONTROL_ERROR_LAUNCH_REJECTED;
}

int app_control_foreach_app_matched(app_control_h request, app_control_app_matched_cb callback, void *user_data)
{
    if (!request || !callback)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    if (request->operation && *request->operation != APP_CONTROL_OPERATION_VIEW)
        return APP_CONTROL_ERROR_NONE;
    for (const auto &[mime, app_id] : state().viewers)
        if (request->mime == mime && !callback(request, app_id.c_str(), user_data))
            break;
    return APP_CONTROL_ERROR_NONE;
}
