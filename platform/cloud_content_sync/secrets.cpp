// The interface of the Secret Service by GIO. libsecret is no choice here: it shows prompts whenever a keyring is
// locked or missing, and waits for them.
#include "cloud_content_sync/secrets.h"
#include <chrono>
#include <condition_variable>
#include <gio/gio.h>
#include <map>
#include <mutex>
#include <thread>
#include <vector>

namespace cloud {

using Clock = std::chrono::steady_clock;
using Variant = std::unique_ptr<GVariant, decltype(&g_variant_unref)>;

static constexpr auto LIMIT = std::chrono::seconds(3); // of one function's questions together
static constexpr auto PAUSE = std::chrono::seconds(30);
static constexpr char BUS_NAME[] = "org.freedesktop.secrets";
static constexpr char SERVICE[] = "/org/freedesktop/secrets";
static constexpr char SERVICE_INTERFACE[] = "org.freedesktop.Secret.Service";
static constexpr char COLLECTION_INTERFACE[] = "org.freedesktop.Secret.Collection";
static constexpr char ITEM_INTERFACE[] = "org.freedesktop.Secret.Item";
static constexpr char SCHEMA[] = "com.orvant.CloudContentSync";

namespace {

// What the process knows. A secret is found by its item, which is never used for another one.
struct Memory {
    std::mutex mutex;
    std::map<std::string, std::pair<std::string, std::string>> last; // file -> item, secret
    Clock::time_point pause_end;

    void keep(const std::string &file, const std::string &item, const std::string &secret)
    {
        std::scoped_lock lock(mutex);
        last[file] = {item, secret};
    }
};

Memory &memory()
{
    static Memory all;
    return all;
}

// A connection of its own to the session bus, for as long as one function takes. The service forgets its session when
// it ends.
class Keyring {
  public:
    Keyring()
    {
        const std::string address = bus_address();
        if (address.empty())
            return;
        watch = std::thread([this] { end_late(); });
        bus = g_dbus_connection_new_for_address_sync(
            address.c_str(),
            static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                              G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION),
            nullptr, cancellable, nullptr);
        const Variant opened = call(SERVICE, SERVICE_INTERFACE, "OpenSession",
                                    g_variant_new("(sv)", "plain", g_variant_new_string("")), "(vo)");
        if (opened)
            session = path_in(opened, 1);
    }
    ~Keyring()
    {
        if (bus && !g_cancellable_is_cancelled(cancellable))
            g_dbus_connection_close_sync(bus, cancellable, nullptr);
        g_clear_object(&bus);
        if (watch.joinable()) {
            {
                std::scoped_lock lock(mutex);
                has_ended = true;
            }
            ended.notify_all();
            watch.join();
        }
        if (g_cancellable_is_cancelled(cancellable)) {
            std::scoped_lock lock(memory().mutex);
            memory().pause_end = Clock::now() + PAUSE;
        }
        g_object_unref(cancellable);
    }
    Keyring(const Keyring &) = delete;
    Keyring &operator=(const Keyring &) = delete;

    explicit operator bool() const
    {
        return !session.empty();
    }
    bool store(GVariant *properties, const std::string &secret);
    std::string find(const std::string &file, const std::string &item);
    void remove(const std::string &file, const std::string &item);

  private:
    static std::string bus_address()
    {
        const char *choice = g_getenv("CLOUD_SECRETS");
        std::scoped_lock lock(memory().mutex);
        if (g_strcmp0(choice, "file") == 0 || Clock::now() < memory().pause_end)
            return "";
        if (const char *address = g_getenv("DBUS_SESSION_BUS_ADDRESS"); address && *address)
            return address;
        // GIO would start a bus where there is none.
        const std::string path = std::string(g_get_user_runtime_dir()) + "/bus";
        return g_file_test(path.c_str(), G_FILE_TEST_EXISTS) ? "unix:path=" + path : "";
    }
    void end_late()
    {
        std::unique_lock lock(mutex);
        if (!ended.wait_for(lock, LIMIT, [this] { return has_ended; }))
            g_cancellable_cancel(cancellable);
    }
    Variant call(const std::string &path, const char *interface, const char *method, GVariant *arguments,
                 const char *reply)
    {
        const Variant owned(arguments ? g_variant_ref_sink(arguments) : nullptr, g_variant_unref);
        return Variant(bus ? g_dbus_connection_call_sync(bus, BUS_NAME, path.c_str(), interface, method, owned.get(),
                                                         G_VARIANT_TYPE(reply), G_DBUS_CALL_FLAGS_NONE, -1, cancellable,
                                                         nullptr)
                           : nullptr,
                       g_variant_unref);
    }
    static std::string path_in(const Variant &reply, gsize index)
    {
        const char *path = nullptr;
        g_variant_get_child(reply.get(), index, "&o", &path);
        return path;
    }
    // What is to be confirmed by the person is not done: the prompt is never shown.
    bool is_done(const Variant &reply, gsize index)
    {
        const std::string prompt = reply ? path_in(reply, index) : "";
        if (prompt.size() > 1)
            call(prompt, "org.freedesktop.Secret.Prompt", "Dismiss", nullptr, "()");
        return prompt == "/";
    }
    bool unlock(const std::string &path)
    {
        const char *paths[] = {path.c_str()};
        const Variant reply =
            call(SERVICE, SERVICE_INTERFACE, "Unlock", g_variant_new("(@ao)", g_variant_new_objv(paths, 1)), "(aoo)");
        return is_done(reply, 1);
    }
    std::vector<std::string> search(const std::string &file, const std::string &item);

    std::mutex mutex;
    std::condition_variable ended;
    bool has_ended = false;
    std::thread watch;
    GCancellable *const cancellable = g_cancellable_new();
    GDBusConnection *bus = nullptr;
    std::string session;
};

bool Keyring::store(GVariant *properties, const std::string &secret)
{
    const Variant owned(g_variant_ref_sink(properties), g_variant_unref);
    const Variant alias = call(SERVICE, SERVICE_INTERFACE, "ReadAlias", g_variant_new("(s)", "default"), "(o)");
    const std::string collection = alias ? path_in(alias, 0) : "/";
    if (collection == "/" || !unlock(collection))
        return false;
    const auto bytes = [](const std::string &text) {
        return g_variant_new_fixed_array(G_VARIANT_TYPE_BYTE, text.data(), text.size(), 1);
    };
    const Variant created = call(collection, COLLECTION_INTERFACE, "CreateItem",
                                 g_variant_new("(@a{sv}(o@ay@ays)b)", owned.get(), session.c_str(), bytes(""),
                                               bytes(secret), "text/plain; charset=utf8", FALSE),
                                 "(oo)");
    return is_done(created, 1);
}

std::vector<std::string> Keyring::search(const std::string &file, const std::string &item)
{
    if (!g_utf8_validate(file.c_str(), -1, nullptr))
        return {};
    GVariantBuilder attributes;
    g_variant_builder_init(&attributes, G_VARIANT_TYPE("a{ss}"));
    g_variant_builder_add(&attributes, "{ss}", "xdg:schema", SCHEMA);
    g_variant_builder_add(&attributes, "{ss}", "file", file.c_str());
    if (!item.empty())
        g_variant_builder_add(&attributes, "{ss}", "item", item.c_str());
    const Variant found =
        call(SERVICE, SERVICE_INTERFACE, "SearchItems", g_variant_new("(a{ss})", &attributes), "(aoao)");
    std::vector<std::string> paths;
    for (gsize list = 0; found && list < 2; list++) { // the unlocked ones, then those that are locked
        const Variant items(g_variant_get_child_value(found.get(), list), g_variant_unref);
        for (gsize i = 0; i < g_variant_n_children(items.get()); i++) {
            const std::string path = path_in(items, i);
            if (list == 0 || unlock(path))
                paths.push_back(path);
        }
    }
    return paths;
}

std::string Keyring::find(const std::string &file, const std::string &item)
{
    for (const std::string &path : search(file, item)) {
        const Variant reply =
            call(path, ITEM_INTERFACE, "GetSecret", g_variant_new("(o)", session.c_str()), "((oayays))");
        if (!reply)
            continue;
        const Variant secret(g_variant_get_child_value(reply.get(), 0), g_variant_unref);
        const Variant value(g_variant_get_child_value(secret.get(), 2), g_variant_unref);
        gsize size = 0;
        const auto *bytes = static_cast<const char *>(g_variant_get_fixed_array(value.get(), &size, 1));
        return {bytes, size};
    }
    return "";
}

void Keyring::remove(const std::string &file, const std::string &item)
{
    for (const std::string &path : search(file, item))
        is_done(call(path, ITEM_INTERFACE, "Delete", nullptr, "(o)"), 0);
}

} // namespace

std::string secret_store(const std::string &file, const std::string &service, const std::string &account,
                         const std::string &secret)
{
    for (const std::string &text : {file, service, account})
        if (!g_utf8_validate(text.c_str(), -1, nullptr)) // D-Bus has no other texts
            return "";
    Keyring keyring;
    if (!keyring)
        return "";
    g_autofree char *item = g_uuid_string_random();
    GVariantBuilder attributes, properties;
    g_variant_builder_init(&attributes, G_VARIANT_TYPE("a{ss}"));
    const std::pair<const char *, const char *> pairs[] = {{"xdg:schema", SCHEMA},
                                                           {"service", service.c_str()},
                                                           {"account", account.c_str()},
                                                           {"file", file.c_str()},
                                                           {"item", item}};
    for (const auto &[key, value] : pairs)
        g_variant_builder_add(&attributes, "{ss}", key, value);
    g_variant_builder_init(&properties, G_VARIANT_TYPE("a{sv}"));
    g_variant_builder_add(&properties, "{sv}", "org.freedesktop.Secret.Item.Label",
                          g_variant_new_string((service + ": " + account).c_str()));
    g_variant_builder_add(&properties, "{sv}", "org.freedesktop.Secret.Item.Attributes",
                          g_variant_builder_end(&attributes));
    // What cannot be read back is not kept.
    if (!keyring.store(g_variant_builder_end(&properties), secret) || keyring.find(file, item) != secret)
        return "";
    memory().keep(file, item, secret);
    return item;
}

std::string secret_find(const std::string &file, const std::string &item)
{
    {
        std::scoped_lock lock(memory().mutex);
        const auto found = memory().last.find(file);
        if (found != memory().last.end() && found->second.first == item)
            return found->second.second;
    }
    if (item.empty())
        return "";
    Keyring keyring;
    std::string secret = keyring ? keyring.find(file, item) : "";
    if (!secret.empty())
        memory().keep(file, item, secret);
    return secret;
}

void secret_remove(const std::string &file, const std::string &item)
{
    if (Keyring keyring; keyring)
        keyring.remove(file, item);
    std::scoped_lock lock(memory().mutex);
    const auto found = memory().last.find(file);
    if (found != memory().last.end() && (item.empty() || found->second.first == item))
        memory().last.erase(found);
}

} // namespace cloud
