// A small application for the contract tests: what it does with a request is in the request's operation.
#include "app/app.h"
#include <Elementary.h>
#include <clocale>
#include <cstdio>
#include <string>
#include <unistd.h>

namespace {
app_control_h kept = nullptr;
int requests = 0;
bool slow_end = false;
Evas_Object *window = nullptr;

void say(const char *what)
{
    std::printf("%s\n", what);
    std::fflush(stdout);
}

// Everything that came with the request, and who answers it as how manieth.
void echo(app_control_h request, app_control_h to)
{
    app_control_h reply = nullptr;
    app_control_clone(&reply, request);
    char *text = nullptr;
    if (app_control_get_uri(request, &text); text)
        app_control_add_extra_data(reply, "uri", text);
    free(text);
    if (app_control_get_app_id(request, &text); text)
        app_control_add_extra_data(reply, "app-id", text);
    free(text);
    app_control_add_extra_data(reply, "pid", std::to_string(getpid()).c_str());
    app_control_add_extra_data(reply, "count", std::to_string(requests).c_str());
    app_control_reply_to_launch_request(reply, to, APP_CONTROL_RESULT_SUCCEEDED);
    app_control_destroy(reply);
}

void reset(app_control_h request, void *)
{
    requests++;
    char *text = nullptr;
    app_control_get_operation(request, &text);
    const std::string operation = text ? text : "";
    free(text);
    say(("request " + operation).c_str());
    if (!window) {
        window = elm_win_util_standard_add("toy", "toy");
        evas_object_resize(window, 200, 100);
        evas_object_show(window);
    }
    if (operation.ends_with("/echo") || operation.ends_with("share"))
        echo(request, request);
    if (operation.ends_with("/language-and-leave")) {
        app_control_h reply = nullptr;
        app_control_create(&reply);
        app_control_add_extra_data(reply, "list", getenv("LANGUAGE"));
        app_control_add_extra_data(reply, "messages", setlocale(LC_MESSAGES, nullptr));
        app_control_reply_to_launch_request(reply, request, APP_CONTROL_RESULT_SUCCEEDED);
        app_control_destroy(reply);
    }
    if (operation.ends_with("/fail"))
        app_control_reply_to_launch_request(nullptr, request, APP_CONTROL_RESULT_FAILED);
    if (operation.ends_with("/keep"))
        app_control_clone(&kept, request);
    if (operation.ends_with("/answer")) {
        echo(request, kept);
        app_control_destroy(kept);
        kept = nullptr;
    }
    slow_end = operation.ends_with("/slow-end-reply-and-leave");
    if (operation.ends_with("reply-and-leave"))
        echo(request, request);
    if (operation.ends_with("leave"))
        elm_exit();
    if (operation.ends_with("/crash"))
        _exit(3);
}
} // namespace

int main(int argc, char **argv)
{
    app_set_id("com.example.toy");
    app_add_alias("com.example.toy-face");
    app_event_callback_s callbacks{};
    callbacks.create = [](void *) {
        say("create");
        return true;
    };
    callbacks.terminate = [](void *) {
        say("terminate");
        if (slow_end)
            usleep(300'000); // saving, say, while the next request comes in
    };
    callbacks.pause = [](void *) { say("pause"); };
    callbacks.resume = [](void *) { say("resume"); };
    callbacks.app_control = reset;
    const int status = app_efl_main(&argc, &argv, &callbacks, nullptr);
    app_control_destroy(kept);
    return status;
}
