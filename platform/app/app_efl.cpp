#include "app/app.h"
#include "app/bus.h"
#include "app/command_line.h"
#include "app/glib_loop.h"
#include "app/inspect.h"
#include "app/language.h"
#include "app/target.h"
#include "app/window_rest.h"
#include "base/base.h"
#include "theme/theme.h"
#include <Ecore_X.h>
#include <Efreet.h>
#include <Elementary.h>
#include <algorithm>
#include <cstdio>
#include <deque>
#include <unistd.h>

namespace {
// With so many requests waiting they are no longer handled as fast as can be, which leaves the bus nothing to run on.
constexpr size_t flood_size = 50;
constexpr double flood_pause = 0.005; // seconds

struct Application {
    const app_event_callback_s *callbacks = nullptr;
    void *user_data = nullptr;
    bool paused = false;
    Ecore_Timer *service_timer = nullptr;
    std::deque<std::unique_ptr<app_control_s>> queue;
    bool queue_begun = false;
    std::vector<Evas_Object *> windows;        // watched ones
    std::vector<Evas_Object *> hidden_windows; // those of them that are iconified or hidden
};
Application app;

void tell(void (*callback)(void *))
{
    if (callback)
        callback(app.user_data);
}

void follow_language()
{
    if (!language_apply())
        return;
    elm_language_set("");
    tell(app.callbacks->language_changed);
}

void set_paused(bool paused)
{
    if (app.paused == paused)
        return;
    app.paused = paused;
    if (!paused)
        follow_language();
    tell(paused ? app.callbacks->pause : app.callbacks->resume);
}

void look_at_windows()
{
    set_paused(!app.windows.empty() && app.hidden_windows.size() == app.windows.size());
}

void window_hidden(void *, Evas_Object *window, void *)
{
    if (std::ranges::find(app.hidden_windows, window) == app.hidden_windows.end())
        app.hidden_windows.push_back(window);
    window_rest_hidden_set(window, true);
    look_at_windows();
}

void window_shown(void *, Evas_Object *window, void *)
{
    std::erase(app.hidden_windows, window);
    window_rest_hidden_set(window, false);
    look_at_windows();
}

void window_deleted(void *, Evas *, Evas_Object *window, void *)
{
    std::erase(app.windows, window);
    std::erase(app.hidden_windows, window);
}

void watch_windows()
{
    Eina_List *all = ecore_evas_ecore_evas_list_get();
    void *item = nullptr;
    EINA_LIST_FREE(all, item)
    {
        auto *window = static_cast<Evas_Object *>(ecore_evas_data_get(static_cast<Ecore_Evas *>(item), "elm_win"));
        if (!window || std::ranges::find(app.windows, window) != app.windows.end())
            continue;
        app.windows.push_back(window);
        platform_theme_window_watch(window);
        window_rest_watch(window);
        evas_object_smart_callback_add(window, "iconified", window_hidden, nullptr);
        evas_object_smart_callback_add(window, "withdrawn", window_hidden, nullptr);
        evas_object_smart_callback_add(window, "normal", window_shown, nullptr);
        evas_object_event_callback_add(window, EVAS_CALLBACK_DEL, window_deleted, nullptr);
    }
}

Eina_Bool handle_next(void *);

void handle_request(void *)
{
    if (app.queue.empty())
        return;
    const auto request = std::move(app.queue.front());
    app.queue.pop_front();
    // First, for the callback may run a loop of its own.
    app.queue_begun = !app.queue.empty();
    if (app.queue_begun)
        ecore_timer_add(app.queue.size() > flood_size ? flood_pause : 0.0, handle_next, nullptr);
    g_clear_pointer(&app.service_timer, ecore_timer_del);
    follow_language();
    if (app.callbacks->app_control)
        app.callbacks->app_control(request.get(), app.user_data);
    watch_windows();
}

Eina_Bool handle_next(void *)
{
    handle_request(nullptr);
    return ECORE_CALLBACK_CANCEL;
}

// Requests are handled from a job: the callback may take its time or run a loop, and one that ends the application
// finds a running loop. One in each turn of the loop, so that many requests do not keep everything else waiting.
void queue_request(app_control_h request)
{
    app.queue.emplace_back(request);
    if (!std::exchange(app.queue_begun, true))
        ecore_job_add(handle_request, nullptr);
}

// Seconds without a request until a program started for one gives up.
double service_wait()
{
    const char *text = std::getenv("ORVANT_SERVICE_WAIT");
    const double seconds = text ? g_ascii_strtod(text, nullptr) : 0.0;
    return seconds > 0.0 ? seconds : 60.0;
}

Eina_Bool no_request_came(void *)
{
    app.service_timer = nullptr;
    elm_exit();
    return ECORE_CALLBACK_CANCEL;
}

void set_default(const char *name, const char *value)
{
    setenv(name, value, 0);
}

// False, with a line for the person, when no window can be opened.
bool find_display()
{
    const char *engine = std::getenv("ELM_ENGINE");
    const char *wayland = std::getenv("WAYLAND_DISPLAY");
    if (!environment_has_display()) {
        std::fprintf(stderr, "%s: no display: set DISPLAY or WAYLAND_DISPLAY, or ELM_ENGINE=buffer\n", app_get_id());
        return false;
    }
    if ((engine && *engine) || (wayland && *wayland))
        return true;
    if (!ecore_x_init(nullptr)) {
        std::fprintf(stderr, "%s: cannot open the display %s\n", app_get_id(), std::getenv("DISPLAY"));
        return false;
    }
    return true;
}

// EFL complains at length, with traces, about each bus that is missing. That is a state of the machine, not a fault.
void quiet_without_bus()
{
    const char *address = std::getenv("DBUS_SYSTEM_BUS_ADDRESS");
    const bool system_bus = (address && *address) || access("/run/dbus/system_bus_socket", F_OK) == 0;
    if (!system_bus || !bus_connection())
        set_default("EINA_LOG_LEVELS", "eldbus:0,eina_safety:0,ecore_system_upower:0,ecore_system_systemd:0,"
                                       "elementary:1");
}

struct HandedOver {
    bool known = false;
    bool print = false;
    app_control_result_e result = APP_CONTROL_RESULT_FAILED;
};

void reply_of_first(app_control_h, app_control_h reply, app_control_result_e result, void *data)
{
    auto *outcome = static_cast<HandedOver *>(data);
    outcome->known = true;
    outcome->result = result;
    std::puts(reply_line(reply, result).c_str());
}

// Gives the request to the running instance; the exit status.
int hand_over(CommandLine &line)
{
    if (line.service)
        return 0;
    if (!line.request.app_id)
        line.request.app_id = app_get_id();
    HandedOver outcome;
    const int sent =
        app_control_send_launch_request(&line.request, line.print_reply ? reply_of_first : nullptr, &outcome);
    if (sent != APP_CONTROL_ERROR_NONE) {
        std::fprintf(stderr, "%s: the running instance does not answer\n", app_get_id());
        return 1;
    }
    while (line.print_reply && !outcome.known)
        g_main_context_iteration(nullptr, TRUE);
    return line.print_reply && outcome.result != APP_CONTROL_RESULT_SUCCEEDED ? 1 : 0;
}

app_control_h first_request(const CommandLine &line)
{
    auto *request = new app_control_s(line.request);
    const bool print = line.print_reply;
    request->answer = std::make_shared<Answer>([print](const app_control_s *reply, app_control_result_e result) {
        if (!print)
            return;
        std::puts(reply_line(reply, result).c_str());
        std::fflush(stdout);
    });
    bus_watch_answer(request->answer);
    return request;
}

int run(const CommandLine &line, int argc, char **argv)
{
    quiet_without_bus();
    if (!find_display()) {
        bus_stop(0);
        return 1;
    }
    set_default("ELM_PROFILE", "mobile");
    set_default("ELM_SCALE", "1.8");
    language_apply();
    efreet_cache_disable(); // or each start leaves a daemon behind that indexes icons nobody here asks for
    elm_init(argc, argv);
    glib_loop_start();
    inspect_publish();
    if (const std::string theme = platform_data_file("theme/platform.edj"); !theme.empty())
        elm_theme_overlay_add(nullptr, theme.c_str());

    int status = 0;
    if (app.callbacks->create && !app.callbacks->create(app.user_data)) {
        std::fprintf(stderr, "%s: the application refused to start\n", app_get_id());
        status = 1;
    } else {
        if (line.service)
            app.service_timer = ecore_timer_add(service_wait(), no_request_came, nullptr);
        else
            queue_request(first_request(line));
        elm_run();
        tell(app.callbacks->terminate);
    }
    for (const auto &request : app.queue)
        request->answer->give(nullptr, RESULT_LEAVING);
    app.queue.clear();
    bus_stop(10);
    glib_loop_stop();
    elm_shutdown();
    return status;
}
} // namespace

int app_efl_main(int *argc, char ***argv, app_event_callback_s *callback, void *user_data)
{
    if (!argc || !argv || !callback)
        return 2;
    CommandLine line = parse_command_line(*argc, *argv);
    if (!line.error.empty()) {
        std::fprintf(stderr, "%s: %s\n", app_get_id(), line.error.c_str());
        return 2;
    }
    app = Application{};
    app.callbacks = callback;
    app.user_data = user_data;
    if (bus_own(queue_request) != Role::second)
        return run(line, *argc, *argv);
    const int status = hand_over(line);
    bus_stop(10);
    return status;
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
