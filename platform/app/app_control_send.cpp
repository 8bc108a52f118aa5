// The sending side: to a running application over the bus, to one that is started first, on the command line.
#include "app/bus.h"
#include "app/command_line.h"
#include "app/target.h"
#include <algorithm>
#include <cstring>
#include <fcntl.h>
#include <gio/gunixinputstream.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {
constexpr guint start_seconds = 60; // until a started program must have taken its name

enum class Stage {
    starting, // the receiver is being started
    called,   // the request has left
};

// One request on its way. It frees itself when it has told the sender how it ended.
struct Launch {
    Target target;
    app_control_h request = nullptr;
    app_control_reply_cb callback = nullptr;
    void *user_data = nullptr;
    Stage stage = Stage::starting;
    int starts = 0;
    guint name_watch = 0;
    GPid child = 0;
    guint child_watch = 0;
    guint timer = 0;
};

std::vector<Launch *> &launches()
{
    static std::vector<Launch *> all;
    return all;
}

void reap(GPid child, gint, gpointer)
{
    g_spawn_close_pid(child);
}

void stop_waiting(Launch *launch)
{
    if (launch->child_watch)
        g_child_watch_add(launch->child, reap, nullptr);
    if (launch->name_watch)
        g_bus_unwatch_name(launch->name_watch);
    for (const guint source : {launch->timer, launch->child_watch})
        if (source)
            g_source_remove(source);
    launch->name_watch = launch->timer = launch->child_watch = 0;
}

void end_launch(Launch *launch, app_control_h reply, app_control_result_e result)
{
    stop_waiting(launch);
    std::erase(launches(), launch);
    if (launch->callback)
        launch->callback(launch->request, reply, result, launch->user_data);
    app_control_destroy(launch->request);
    delete launch;
}

void call(Launch *launch, GDBusCallFlags flags);
void start(Launch *launch);

void call_ended(GObject *bus, GAsyncResult *outcome, gpointer data)
{
    auto *launch = static_cast<Launch *>(data);
    GError *error = nullptr;
    GVariant *answer = g_dbus_connection_call_finish(G_DBUS_CONNECTION(bus), outcome, &error);
    if (answer) {
        app_control_s reply;
        gint32 result = APP_CONTROL_RESULT_FAILED;
        gboolean replied = TRUE;
        GVariant *record = g_variant_get_child_value(answer, 0);
        request_from_variant(record, reply);
        g_variant_lookup(record, "result", "i", &result);
        g_variant_lookup(record, "replied", "b", &replied);
        g_variant_unref(record);
        g_variant_unref(answer);
        end_launch(launch, replied ? &reply : nullptr, static_cast<app_control_result_e>(result));
        return;
    }
    char *name = g_dbus_error_get_remote_error(error);
    const bool gone = g_error_matches(error, G_DBUS_ERROR, G_DBUS_ERROR_SERVICE_UNKNOWN) ||
                      g_error_matches(error, G_DBUS_ERROR, G_DBUS_ERROR_NAME_HAS_NO_OWNER) ||
                      g_strcmp0(name, BUS_ERROR_LEAVING) == 0;
    const bool left = g_error_matches(error, G_DBUS_ERROR, G_DBUS_ERROR_NO_REPLY) ||
                      g_error_matches(error, G_IO_ERROR, G_IO_ERROR_CLOSED);
    g_free(name);
    if (gone && launch->starts < 2) {
        start(launch);
    } else {
        if (!left)
            g_warning("%s: %s", launch->target.app_id.c_str(), error->message);
        end_launch(launch, nullptr, left ? APP_CONTROL_RESULT_CANCELED : APP_CONTROL_RESULT_FAILED);
    }
    g_error_free(error);
}

void call(Launch *launch, GDBusCallFlags flags)
{
    stop_waiting(launch);
    launch->stage = Stage::called;
    const std::string &id = launch->target.app_id;
    g_dbus_connection_call(bus_connection(), id.c_str(), bus_path(id).c_str(), "com.orvant.AppControl", "Launch",
                           g_variant_new("(@a{sv})", request_to_variant(*launch->request)), G_VARIANT_TYPE("(a{sv})"),
                           flags, G_MAXINT, nullptr, call_ended, launch);
}

void name_appeared(GDBusConnection *, const char *, const char *, gpointer data)
{
    auto *launch = static_cast<Launch *>(data);
    if (launch->stage == Stage::starting)
        call(launch, G_DBUS_CALL_FLAGS_NO_AUTO_START);
}

void child_ended(GPid child, gint status, gpointer data)
{
    auto *launch = static_cast<Launch *>(data);
    g_spawn_close_pid(child);
    launch->child_watch = 0;
    // a program that goes on in the background may still come
    if (launch->stage == Stage::starting && !g_spawn_check_wait_status(status, nullptr))
        end_launch(launch, nullptr, APP_CONTROL_RESULT_FAILED);
}

gboolean start_timed_out(gpointer data)
{
    auto *launch = static_cast<Launch *>(data);
    launch->timer = 0;
    g_warning("%s: started, but did not come up", launch->target.app_id.c_str());
    end_launch(launch, nullptr, APP_CONTROL_RESULT_FAILED);
    return G_SOURCE_REMOVE;
}

// In the child. Only calls that are allowed between fork and exec.
void detach(gpointer)
{
    setsid(); // an interrupt at the sender's terminal is not meant for the program
    struct stat errors = {};
    if (fstat(STDERR_FILENO, &errors) != 0 || !S_ISFIFO(errors.st_mode))
        return;
    // whoever reads the sender's messages from a pipe shall not have to wait for the program's end
    if (const int nowhere = open("/dev/null", O_WRONLY | O_CLOEXEC); nowhere >= 0)
        dup2(nowhere, STDERR_FILENO);
}

bool spawn(const std::vector<std::string> &command, GSpawnFlags flags, GPid *child, int *output)
{
    std::vector<char *> arguments;
    for (const std::string &word : command)
        arguments.push_back(const_cast<char *>(word.c_str()));
    arguments.push_back(nullptr);
    GError *error = nullptr;
    flags = static_cast<GSpawnFlags>(flags | G_SPAWN_SEARCH_PATH | G_SPAWN_DO_NOT_REAP_CHILD);
    if (!command.empty() && g_spawn_async_with_pipes(nullptr, arguments.data(), nullptr, flags, detach, nullptr, child,
                                                     nullptr, output, nullptr, &error))
        return true;
    g_warning("%s", error ? error->message : "the entry has no command");
    g_clear_error(&error);
    return false;
}

// Starts the receiver. With a display of our own we start it ourselves, since a program that the bus starts gets the
// bus's environment, which may have none.
void start(Launch *launch)
{
    launch->starts++;
    if (!launch->target.info || !environment_has_display()) {
        if (bus_name_activatable(launch->target.app_id) || !launch->target.info) {
            call(launch, G_DBUS_CALL_FLAGS_NONE);
            return;
        }
    }
    launch->stage = Stage::starting;
    if (spawn(command_of(launch->target.info.get(), {"--service"}), G_SPAWN_STDOUT_TO_DEV_NULL, &launch->child,
              nullptr)) {
        launch->child_watch = g_child_watch_add(launch->child, child_ended, launch);
        launch->timer = g_timeout_add_seconds(start_seconds, start_timed_out, launch);
        launch->name_watch =
            g_bus_watch_name_on_connection(bus_connection(), launch->target.app_id.c_str(),
                                           G_BUS_NAME_WATCHER_FLAGS_NONE, name_appeared, nullptr, launch, nullptr);
        return;
    }
    launch->timer = g_idle_add(
        [](gpointer data) -> gboolean {
            auto *failed = static_cast<Launch *>(data);
            failed->timer = 0;
            end_launch(failed, nullptr, APP_CONTROL_RESULT_FAILED);
            return G_SOURCE_REMOVE;
        },
        launch);
}

void line_read(GObject *stream, GAsyncResult *outcome, gpointer data)
{
    auto *launch = static_cast<Launch *>(data);
    char *line = g_data_input_stream_read_line_finish(G_DATA_INPUT_STREAM(stream), outcome, nullptr, nullptr);
    app_control_s reply;
    app_control_result_e result = APP_CONTROL_RESULT_CANCELED;
    const bool understood = line && parse_reply_line(line, reply, result);
    if (line && !understood) {
        g_free(line);
        g_data_input_stream_read_line_async(G_DATA_INPUT_STREAM(stream), G_PRIORITY_DEFAULT, nullptr, line_read, data);
        return;
    }
    g_free(line);
    g_object_unref(stream);
    end_launch(launch, understood && !reply.extra.empty() ? &reply : nullptr, result);
}

// Without a bus: everything goes on the command line, the reply comes from standard output.
bool start_with_arguments(Launch *launch)
{
    auto arguments = command_line_arguments(*launch->request);
    if (launch->callback)
        arguments.insert(arguments.begin(), "--print-reply");
    GPid child = 0;
    int output = -1;
    const GSpawnFlags flags = launch->callback ? G_SPAWN_DEFAULT : G_SPAWN_STDOUT_TO_DEV_NULL;
    if (!spawn(command_of(launch->target.info.get(), arguments), flags, &child, launch->callback ? &output : nullptr))
        return false;
    g_child_watch_add(
        child, [](GPid pid, gint, gpointer) { g_spawn_close_pid(pid); }, nullptr);
    if (launch->callback) {
        GInputStream *pipe = g_unix_input_stream_new(output, TRUE);
        GDataInputStream *lines = g_data_input_stream_new(pipe);
        g_object_unref(pipe);
        launch->stage = Stage::called;
        g_data_input_stream_read_line_async(lines, G_PRIORITY_DEFAULT, nullptr, line_read, launch);
    }
    return true;
}

gboolean ordinary_started(gpointer data)
{
    auto *launch = static_cast<Launch *>(data);
    launch->timer = 0;
    end_launch(launch, nullptr, APP_CONTROL_RESULT_SUCCEEDED);
    return G_SOURCE_REMOVE;
}
} // namespace

int app_control_send_launch_request(app_control_h request, app_control_reply_cb callback, void *user_data)
{
    if (!request)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    Target target = find_target(*request);
    if (target.kind == Target::none)
        return APP_CONTROL_ERROR_APP_NOT_FOUND;
    if (target.kind == Target::ordinary && !start_ordinary(target.info.get(), *request))
        return APP_CONTROL_ERROR_LAUNCH_REJECTED;
    auto *launch = new Launch;
    launch->target = std::move(target);
    launch->callback = callback;
    launch->user_data = user_data;
    launch->request = new app_control_s(*request);
    launches().push_back(launch);
    if (launch->target.kind == Target::ordinary) {
        launch->stage = Stage::called;
        launch->timer = g_idle_add(ordinary_started, launch);
    } else if (bus_name_owned(launch->target.app_id)) {
        call(launch, G_DBUS_CALL_FLAGS_NO_AUTO_START);
    } else if (bus_connection()) {
        start(launch);
    } else {
        const bool started = start_with_arguments(launch);
        if (!started || !callback) {
            launch->callback = nullptr;
            end_launch(launch, nullptr, APP_CONTROL_RESULT_FAILED);
        }
        return started ? APP_CONTROL_ERROR_NONE : APP_CONTROL_ERROR_LAUNCH_REJECTED;
    }
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
    for (const AppInfo &info : viewers(*request)) {
        std::string id = g_app_info_get_id(info.get()) ? g_app_info_get_id(info.get()) : "";
        if (id.ends_with(".desktop"))
            id.resize(id.size() - std::strlen(".desktop"));
        if (!callback(request, id.c_str(), user_data))
            break;
    }
    return APP_CONTROL_ERROR_NONE;
}

void bus_stop(int patience)
{
    bus_give_back();
    for (Launch *launch : launches())
        launch->callback = nullptr; // what it would work on is gone
    const gint64 limit = g_get_monotonic_time() + patience * G_USEC_PER_SEC;
    const auto on_the_way = [] {
        return std::ranges::any_of(launches(), [](const Launch *one) { return one->stage != Stage::called; });
    };
    const guint tick = g_timeout_add(
        100, [](gpointer) -> gboolean { return G_SOURCE_CONTINUE; }, nullptr);
    while (on_the_way() && g_get_monotonic_time() < limit)
        g_main_context_iteration(nullptr, TRUE);
    g_source_remove(tick);
    if (GDBusConnection *bus = bus_connection())
        g_dbus_connection_flush_sync(bus, nullptr, nullptr);
}
