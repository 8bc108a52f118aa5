// The receiving side: this process's names on the session bus, and the objects behind them.
#include "app/bus.h"
#include "base/base.h"
#include <algorithm>
#include <atomic>

namespace {
constexpr char introspection[] = R"(<node>
<interface name='org.freedesktop.Application'>
 <method name='Activate'><arg type='a{sv}' direction='in'/></method>
 <method name='Open'><arg type='as' direction='in'/><arg type='a{sv}' direction='in'/></method>
 <method name='ActivateAction'><arg type='s' direction='in'/><arg type='av' direction='in'/>
  <arg type='a{sv}' direction='in'/></method>
</interface>
<interface name='com.orvant.AppControl'>
 <method name='Launch'><arg name='request' type='a{sv}' direction='in'/><arg name='reply' type='a{sv}' direction='out'/></method>
</interface>
</node>)";

enum { request_name_do_not_queue = 4, request_name_exists = 3 }; // as D-Bus numbers them for RequestName

// What may wait for an answer here, so that nobody can fill the memory: so many requests, and while so many bytes wait
// no further one.
constexpr int waiting_max = 1000;
constexpr size_t waiting_bytes_max = size_t{128} << 20;

struct Receiver {
    std::string id;
    std::vector<std::string> aliases;
    std::function<void(app_control_h)> receive;
    std::vector<std::string> owned;
    std::vector<guint> objects;
    std::vector<std::weak_ptr<Answer>> answers;
    bool leaving = false;
    guint gate = 0;
};

Receiver &receiver()
{
    static Receiver the;
    return the;
}

// Shared with the bus's thread.
std::atomic<int> waiting;
std::atomic<size_t> waiting_bytes;
std::atomic<const std::vector<std::string> *> object_paths; // never freed

// The place of a request that has passed the gate, until it is answered.
class Place {
  public:
    explicit Place(GVariant *parameters) : bytes(g_variant_get_size(parameters)) {}
    Place(const Place &) = delete;
    Place &operator=(const Place &) = delete;
    ~Place()
    {
        waiting--;
        waiting_bytes -= bytes;
    }

  private:
    const size_t bytes;
};

// Whether method_called is going to get this message.
bool is_request(GDBusMessage *message)
{
    static constexpr struct {
        const char *interface, *member, *signature;
    } calls[] = {
        {"com.orvant.AppControl", "Launch", "a{sv}"},
        {"org.freedesktop.Application", "Activate", "a{sv}"},
        {"org.freedesktop.Application", "Open", "asa{sv}"},
        {"org.freedesktop.Application", "ActivateAction", "sava{sv}"},
    };
    const std::vector<std::string> *paths = object_paths.load();
    const char *path = g_dbus_message_get_path(message);
    return path && paths && g_dbus_message_get_body(message) && std::ranges::find(*paths, path) != paths->end() &&
           std::ranges::any_of(calls, [message](const auto &call) {
               return g_strcmp0(g_dbus_message_get_interface(message), call.interface) == 0 &&
                      g_strcmp0(g_dbus_message_get_member(message), call.member) == 0 &&
                      g_strcmp0(g_dbus_message_get_signature(message), call.signature) == 0;
           });
}

// On the bus's thread: a flood is turned away here and never reaches the main loop.
GDBusMessage *pass_gate(GDBusConnection *bus, GDBusMessage *message, gboolean incoming, gpointer)
{
    if (!incoming || g_dbus_message_get_message_type(message) != G_DBUS_MESSAGE_TYPE_METHOD_CALL ||
        !is_request(message))
        return message;
    // This thread alone adds.
    if (waiting < waiting_max && waiting_bytes < waiting_bytes_max) {
        waiting++;
        waiting_bytes += g_variant_get_size(g_dbus_message_get_body(message));
        return message;
    }
    if (!(g_dbus_message_get_flags(message) & G_DBUS_MESSAGE_FLAGS_NO_REPLY_EXPECTED)) {
        GDBusMessage *refusal = g_dbus_message_new_method_error_literal(
            message, "org.freedesktop.DBus.Error.LimitsExceeded", "too many requests wait here for their answer");
        g_dbus_connection_send_message(bus, refusal, G_DBUS_SEND_MESSAGE_FLAGS_NONE, nullptr, nullptr);
        g_object_unref(refusal);
    }
    g_object_unref(message);
    return nullptr;
}

void finish_launch(GDBusMethodInvocation *invocation, const app_control_s *reply, app_control_result_e result)
{
    if (result == RESULT_LEAVING) {
        g_dbus_method_invocation_return_dbus_error(invocation, BUS_ERROR_LEAVING, "the application is ending");
        return;
    }
    GVariantDict answer;
    GVariant *record = g_variant_ref_sink(request_to_variant(reply ? *reply : app_control_s()));
    g_variant_dict_init(&answer, record);
    g_variant_unref(record);
    g_variant_dict_insert(&answer, "result", "i", static_cast<int>(result));
    g_variant_dict_insert(&answer, "replied", "b", reply != nullptr);
    g_dbus_method_invocation_return_value(invocation, g_variant_new("(@a{sv})", g_variant_dict_end(&answer)));
}

app_control_h launch_request(GVariant *parameters, GDBusMethodInvocation *invocation, std::shared_ptr<Place> place)
{
    auto *request = new app_control_s;
    GVariant *record = g_variant_get_child_value(parameters, 0);
    request_from_variant(record, *request);
    g_variant_unref(record);
    request->answer = std::make_shared<Answer>(
        [invocation, kept = std::move(place)](const app_control_s *reply, app_control_result_e result) {
            finish_launch(invocation, reply, result);
        });
    bus_watch_answer(request->answer);
    return request;
}

// Desktop environments hand over addresses; the platform's requests carry plain paths.
app_control_h open_request(GVariant *parameters)
{
    auto *request = new app_control_s;
    request->operation = APP_CONTROL_OPERATION_MULTI_SHARE;
    std::vector<std::string> paths;
    GVariantIter *uris = nullptr;
    g_variant_get(parameters, "(asa{sv})", &uris, nullptr);
    const char *uri = nullptr;
    while (g_variant_iter_loop(uris, "&s", &uri)) {
        char *path = g_filename_from_uri(uri, nullptr, nullptr);
        paths.emplace_back(path ? path : uri);
        g_free(path);
    }
    g_variant_iter_free(uris);
    request->set(APP_CONTROL_DATA_PATH, true, std::move(paths));
    return request;
}

// An entry's action is an operation with "-" for "/", as action names have no slash. Its parameter, if any, is the URI.
app_control_h action_request(GVariant *parameters)
{
    auto *request = new app_control_s;
    const char *action = nullptr;
    GVariantIter *arguments = nullptr;
    g_variant_get(parameters, "(&sava{sv})", &action, &arguments, nullptr);
    std::string operation = action;
    std::ranges::replace(operation, '-', '/');
    request->operation = APP_CONTROL_OPERATION_PREFIX + operation;
    if (GVariant *first = nullptr; g_variant_iter_next(arguments, "v", &first)) {
        if (g_variant_is_of_type(first, G_VARIANT_TYPE_STRING))
            request->uri = g_variant_get_string(first, nullptr);
        g_variant_unref(first);
    }
    g_variant_iter_free(arguments);
    return request;
}

void method_called(GDBusConnection *, const char *, const char *, const char *, const char *method,
                   GVariant *parameters, GDBusMethodInvocation *invocation, gpointer)
{
    Receiver &the = receiver();
    auto place = std::make_shared<Place>(parameters);
    if (the.leaving) {
        g_dbus_method_invocation_return_dbus_error(invocation, BUS_ERROR_LEAVING, "the application is ending");
        return;
    }
    const std::string name = method;
    if (name == "Launch") {
        the.receive(launch_request(parameters, invocation, std::move(place)));
        return;
    }
    app_control_h request = name == "Open"             ? open_request(parameters)
                            : name == "ActivateAction" ? action_request(parameters)
                                                       : new app_control_s;
    request->answer =
        std::make_shared<Answer>([kept = std::move(place)](const app_control_s *, app_control_result_e) {});
    g_dbus_method_invocation_return_value(invocation, nullptr);
    the.receive(request);
}

bool ask_bus(const char *method, GVariant *parameters, const char *reply_type, GVariant **reply)
{
    GDBusConnection *bus = bus_connection();
    if (!bus) {
        g_variant_unref(g_variant_ref_sink(parameters));
        return false;
    }
    *reply = g_dbus_connection_call_sync(bus, "org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus",
                                         method, parameters, G_VARIANT_TYPE(reply_type), G_DBUS_CALL_FLAGS_NONE, -1,
                                         nullptr, nullptr);
    return *reply != nullptr;
}

// False when somebody else has the name.
bool own_name(const std::string &name)
{
    GVariant *reply = nullptr;
    guint32 code = 0;
    if (!ask_bus("RequestName", g_variant_new("(su)", name.c_str(), request_name_do_not_queue), "(u)", &reply))
        return true; // the bus does not let us have it; go on without
    g_variant_get(reply, "(u)", &code);
    g_variant_unref(reply);
    if (code == request_name_exists)
        return false;
    receiver().owned.push_back(name);
    return true;
}

void export_object(const std::string &name)
{
    static const GDBusInterfaceVTable calls = {method_called, nullptr, nullptr, {}};
    static GDBusNodeInfo *node = g_dbus_node_info_new_for_xml(introspection, nullptr);
    for (GDBusInterfaceInfo **interface = node->interfaces; *interface; interface++) {
        const guint object = g_dbus_connection_register_object(bus_connection(), bus_path(name).c_str(), *interface,
                                                               &calls, nullptr, nullptr, nullptr);
        if (object)
            receiver().objects.push_back(object);
    }
}
} // namespace

void app_set_id(const char *app_id)
{
    receiver().id = app_id ? app_id : "";
    platform_package_set(app_id); // whose accounts this process owns
}

const char *app_get_id()
{
    std::string &id = receiver().id;
    if (id.empty()) {
        char *program = g_file_read_link("/proc/self/exe", nullptr);
        char *name = g_path_get_basename(program ? program : "application");
        id = name;
        g_free(name);
        g_free(program);
    }
    return id.c_str();
}

void app_add_alias(const char *app_id)
{
    if (app_id)
        receiver().aliases.emplace_back(app_id);
}

std::vector<std::string> bus_own_ids()
{
    std::vector<std::string> ids = receiver().aliases;
    ids.insert(ids.begin(), app_get_id());
    return ids;
}

GDBusConnection *bus_connection()
{
    static GDBusConnection *bus = [] {
        GDBusConnection *connection = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
        if (connection)
            g_dbus_connection_set_exit_on_close(connection, FALSE);
        return connection;
    }();
    return bus;
}

bool bus_name_owned(const std::string &name)
{
    GVariant *reply = nullptr;
    gboolean owned = FALSE;
    if (ask_bus("NameHasOwner", g_variant_new("(s)", name.c_str()), "(b)", &reply)) {
        g_variant_get(reply, "(b)", &owned);
        g_variant_unref(reply);
    }
    return owned;
}

bool bus_name_activatable(const std::string &name)
{
    GVariant *reply = nullptr;
    bool found = false;
    if (ask_bus("ListActivatableNames", g_variant_new("()"), "(as)", &reply)) {
        GVariant *names = g_variant_get_child_value(reply, 0);
        const char **list = g_variant_get_strv(names, nullptr);
        found = g_strv_contains(list, name.c_str());
        g_free(list);
        g_variant_unref(names);
        g_variant_unref(reply);
    }
    return found;
}

std::string bus_path(const std::string &app_id)
{
    std::string path = "/" + app_id;
    std::ranges::replace(path, '.', '/');
    std::ranges::replace(path, '-', '_');
    return path;
}

Role bus_own(std::function<void(app_control_h)> receive)
{
    Receiver &the = receiver();
    const std::string id = app_get_id();
    if (!g_dbus_is_name(id.c_str()) || !bus_connection())
        return Role::alone;
    the.leaving = false;
    the.receive = std::move(receive);
    auto *paths = new std::vector<std::string>;
    for (const std::string &name : bus_own_ids())
        paths->push_back(bus_path(name));
    object_paths = paths;
    if (!the.gate)
        the.gate = g_dbus_connection_add_filter(bus_connection(), pass_gate, nullptr, nullptr);
    // the objects come first: whoever sees the name finds them
    for (const std::string &name : bus_own_ids())
        export_object(name);
    if (!own_name(id)) {
        for (const guint object : std::exchange(the.objects, {}))
            g_dbus_connection_unregister_object(bus_connection(), object);
        return Role::second;
    }
    for (const std::string &name : the.aliases)
        if (!own_name(name))
            g_warning("another program has the name %s", name.c_str());
    return Role::first;
}

void bus_watch_answer(const std::shared_ptr<Answer> &answer)
{
    auto &answers = receiver().answers;
    std::erase_if(answers, [](const std::weak_ptr<Answer> &one) { return one.expired(); });
    answers.push_back(answer);
}

void bus_give_back()
{
    Receiver &the = receiver();
    the.leaving = true;
    for (const std::string &name : std::exchange(the.owned, {})) {
        GVariant *reply = nullptr;
        if (ask_bus("ReleaseName", g_variant_new("(s)", name.c_str()), "(u)", &reply))
            g_variant_unref(reply);
    }
    // calls that came in before the names were gone get their "leaving" now
    for (int i = 0; i < 1000 && g_main_context_iteration(nullptr, FALSE); i++)
        ;
    for (const auto &weak : std::exchange(the.answers, {}))
        if (const auto answer = weak.lock())
            answer->give(nullptr, APP_CONTROL_RESULT_CANCELED);
    for (const guint object : std::exchange(the.objects, {}))
        g_dbus_connection_unregister_object(bus_connection(), object);
    the.receive = nullptr;
}
