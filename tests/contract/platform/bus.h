#pragma once
// A private message bus, and objects on it.
#include <functional>
#include <gio/gio.h>
#include <memory>
#include <string>
#include <vector>

// Starts a bus and makes `variable` ("DBUS_SESSION_BUS_ADDRESS", say) its address as long as it lives.
class PrivateBus {
  public:
    explicit PrivateBus(const char *variable);
    ~PrivateBus();
    PrivateBus(const PrivateBus &) = delete;
    PrivateBus &operator=(const PrivateBus &) = delete;
    // A new connection; the caller's (g_object_unref).
    GDBusConnection *connect() const;

  private:
    GTestDBus *bus;
    std::string name;
};

// A program on a bus that answers calls in the thread's main context: the answer's text is parsed as a GVariant.
class Program {
  public:
    using Answer = std::function<std::string(const std::string &method, GVariant *arguments)>;
    Program(const PrivateBus &bus, const char *name, const char *path, const char *introspection, Answer answer);
    ~Program();
    Program(const Program &) = delete;
    Program &operator=(const Program &) = delete;
    void emit(const char *interface, const char *signal, GVariant *arguments);

  private:
    GDBusConnection *connection;
    std::string object;
    std::vector<guint> registrations;
    Answer answer_call;
    static void called(GDBusConnection *, const char *, const char *, const char *, const char *method,
                       GVariant *arguments, GDBusMethodInvocation *invocation, gpointer self);
};

// Runs the main context until `condition` holds; false after ten seconds.
bool run_until(const std::function<bool()> &condition, int seconds = 10);
