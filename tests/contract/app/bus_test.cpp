// Requests between real processes on a private session bus; toy.cpp is the other application.
#include "../platform/bus.h"
#include "app/app_control.h"
#include "app/bus.h"
#include "temp_home.h"
#include <algorithm>
#include <atomic>
#include <csignal>
#include <gtest/gtest.h>
#include <map>

namespace {
struct Outcome {
    int calls = 0;
    app_control_result_e result{};
    std::map<std::string, std::vector<std::string>> extra;

    std::string operator[](const std::string &key) const
    {
        const auto found = extra.find(key);
        return found == extra.end() ? "(none)" : found->second.at(0);
    }
};

bool keep_extra(app_control_h reply, const char *key, void *data)
{
    char *text = nullptr, **texts = nullptr;
    int length = 0;
    std::vector<std::string> &values = static_cast<Outcome *>(data)->extra[key];
    if (app_control_get_extra_data(reply, key, &text) == APP_CONTROL_ERROR_NONE)
        values.push_back(taken(text));
    app_control_get_extra_data_array(reply, key, &texts, &length);
    for (int i = 0; i < length; i++)
        values.push_back(taken(texts[i]));
    free(texts);
    return true;
}

void replied(app_control_h, app_control_h reply, app_control_result_e result, void *data)
{
    auto *outcome = static_cast<Outcome *>(data);
    outcome->calls++;
    outcome->result = result;
    if (reply)
        app_control_foreach_extra_data(reply, keep_extra, data);
}

int send(const std::string &operation, Outcome *outcome, const std::vector<std::string> &paths = {},
         const char *app_id = "com.example.toy")
{
    app_control_h request = nullptr;
    app_control_create(&request);
    app_control_set_operation(request, (APP_CONTROL_OPERATION_PREFIX + operation).c_str());
    app_control_set_app_id(request, app_id);
    std::vector<const char *> texts;
    for (const std::string &path : paths)
        texts.push_back(path.c_str());
    app_control_add_extra_data_array(request, APP_CONTROL_DATA_PATH, texts.data(), static_cast<int>(texts.size()));
    const int result = app_control_send_launch_request(request, outcome ? replied : nullptr, outcome);
    app_control_destroy(request);
    return result;
}

Outcome exchange(const std::string &operation, const std::vector<std::string> &paths = {},
                 const char *app_id = "com.example.toy")
{
    Outcome outcome;
    EXPECT_EQ(send(operation, &outcome, paths, app_id), APP_CONTROL_ERROR_NONE) << operation;
    EXPECT_TRUE(run_until([&] { return outcome.calls > 0; })) << operation;
    return outcome;
}

struct Ended {
    int status = -1;
    std::string output, errors;
};
using Variables = std::vector<std::pair<std::string, std::string>>; // an empty value unsets

Ended run_program(std::vector<std::string> words, const Variables &variables = {})
{
    char **environment = g_get_environ();
    for (const auto &[name, value] : variables)
        environment = value.empty() ? g_environ_unsetenv(environment, name.c_str())
                                    : g_environ_setenv(environment, name.c_str(), value.c_str(), TRUE);
    std::vector<char *> argv;
    for (std::string &word : words)
        argv.push_back(word.data());
    argv.push_back(nullptr);
    char *output = nullptr, *errors = nullptr;
    int status = 0;
    // off the main thread, which may have to answer the program
    std::atomic<bool> ended = false;
    std::thread waiter([&] {
        g_spawn_sync(nullptr, argv.data(), environment, G_SPAWN_DEFAULT, nullptr, nullptr, &output, &errors, &status,
                     nullptr);
        ended = true;
    });
    EXPECT_TRUE(run_until([&] { return ended.load(); }, 20));
    waiter.join();
    g_strfreev(environment);
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, taken(output), taken(errors)};
}

class Bus : public testing::Test {
  protected:
    static inline TempHome *dir;
    static inline PrivateBus *bus;

    static void SetUpTestSuite()
    {
        dir = new TempHome;
        for (const auto &[id, exec] : {std::pair("toy", TOY), {"toy-face", TOY}, {"broken", "/bin/false"}})
            dir->file(std::string("apps/com.example.") + id + ".desktop",
                      std::string("[Desktop Entry]\nType=Application\nName=Test\nExec=") + exec +
                          " %F\nImplements=com.orvant.AppControl;\n");
        setenv("HOME", dir->path.c_str(), 1);
        setenv("XDG_DATA_HOME", (*dir / "data").c_str(), 1);
        setenv("XDG_CONFIG_HOME", (*dir / "config").c_str(), 1);
        setenv("ORVANT_APPS_DIR", (*dir / "apps").c_str(), 1);
        setenv("ELM_ENGINE", "buffer", 1);
        bus = new PrivateBus("DBUS_SESSION_BUS_ADDRESS");
    }

    static void TearDownTestSuite()
    {
        bus_stop(1);
        g_object_unref(bus_connection());
        delete bus;
        delete dir;
    }

    void TearDown() override
    {
        if (bus_name_owned("com.example.toy")) {
            Outcome left;
            send("leave", &left);
            run_until([&] { return left.calls && !bus_name_owned("com.example.toy"); });
        }
    }
};

TEST_F(Bus, StartsAnApplicationAndReachesItAgain)
{
    const Outcome first = exchange("echo");
    EXPECT_EQ(first.result, APP_CONTROL_RESULT_SUCCEEDED);
    EXPECT_EQ(first["count"], "1"); // the request that started it, and nothing before
    const Outcome second = exchange("echo");
    EXPECT_EQ(second["pid"], first["pid"]);
    EXPECT_EQ(second["count"], "2");
    const Outcome other_face = exchange("echo", {}, "com.example.toy-face");
    EXPECT_EQ(other_face["pid"], first["pid"]);
    EXPECT_EQ(other_face["app-id"], "com.example.toy-face");
    const Ended again = run_program({TOY, "--operation", "echo", "--print-reply"}, {{"ELM_ENGINE", ""}});
    EXPECT_EQ(again.status, 0);
    EXPECT_NE(again.output.find("pid=" + first["pid"] + " count=4"), std::string::npos) << again.output;
}

TEST_F(Bus, CarriesAnyFileName)
{
    std::vector<std::string> names = {"/tmp/new\nline", "/tmp/not\xffutf8\xfe", "/tmp/%41 <b>&\"'\\",
                                      "/" + std::string(4095, 'n')};
    for (int i = 0; i < 3000; i++)
        names.push_back("/many/" + std::to_string(i));
    EXPECT_EQ(exchange("echo", names).extra[APP_CONTROL_DATA_PATH], names);
}

TEST_F(Bus, EveryRequestEndsOnce)
{
    const struct {
        const char *operation, *app_id;
        app_control_result_e result;
    } cases[] = {
        {"fail", "com.example.toy", APP_CONTROL_RESULT_FAILED},
        {"nothing", "com.example.toy", APP_CONTROL_RESULT_CANCELED}, // it lets go of the request
        {"leave", "com.example.toy", APP_CONTROL_RESULT_CANCELED},
        {"crash", "com.example.toy", APP_CONTROL_RESULT_CANCELED},
        {"reply-and-leave", "com.example.toy", APP_CONTROL_RESULT_SUCCEEDED},
        {"reply-and-leave", "com.example.toy", APP_CONTROL_RESULT_SUCCEEDED}, // on the heels of one that is leaving
        {"echo", "com.example.broken", APP_CONTROL_RESULT_FAILED},
    };
    for (const auto &one : cases)
        EXPECT_EQ(exchange(one.operation, {}, one.app_id).result, one.result) << one.operation;
    const Outcome ending = exchange("slow-end-reply-and-leave");
    const Outcome next = exchange("echo"); // comes while the first one ends: it goes to a new one
    EXPECT_NE(next["pid"], ending["pid"]);
    EXPECT_EQ(next["count"], "1");
    Outcome kept;
    send("keep", &kept);
    EXPECT_EQ(exchange("answer")["count"], "(none)"); // that reply goes to the one before
    EXPECT_TRUE(run_until([&] { return kept.calls == 1; }));
    EXPECT_EQ(kept["count"], "3");
    Outcome open;
    send("keep", &open);
    EXPECT_EQ(exchange("leave").result, APP_CONTROL_RESULT_CANCELED);
    EXPECT_TRUE(run_until([&] { return open.calls == 1; }));
    EXPECT_EQ(open.result, APP_CONTROL_RESULT_CANCELED);
    EXPECT_EQ(send("echo", nullptr, {}, "com.example.missing"), APP_CONTROL_ERROR_APP_NOT_FOUND);
}

TEST_F(Bus, MoreRequestsThanMayWaitAreRefused)
{
    const pid_t toy = std::stoi(exchange("echo")["pid"]);
    // Without replies, for the bus has a limit of its own for those.
    const auto keep = [](int count) {
        app_control_s request;
        request.operation = APP_CONTROL_OPERATION_PREFIX "keep";
        for (int i = 0; i < count; i++)
            g_dbus_connection_call(bus_connection(), "com.example.toy", "/com/example/toy", "com.orvant.AppControl",
                                   "Launch", g_variant_new("(@a{sv})", request_to_variant(request)), nullptr,
                                   G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr, nullptr);
    };
    keep(900);
    EXPECT_EQ(exchange("echo").result, APP_CONTROL_RESULT_SUCCEEDED);
    keep(200);
    EXPECT_EQ(exchange("echo").result, APP_CONTROL_RESULT_FAILED);
    kill(toy, SIGKILL);
    EXPECT_TRUE(run_until([] { return !bus_name_owned("com.example.toy"); }));
    EXPECT_EQ(exchange("echo").result, APP_CONTROL_RESULT_SUCCEEDED);
}

TEST_F(Bus, TakesTheDesktopsCalls)
{
    exchange("echo");
    const auto call = [](const char *method, GVariant *parameters) {
        GVariant *reply = g_dbus_connection_call_sync(bus_connection(), "com.example.toy-face", "/com/example/toy_face",
                                                      "org.freedesktop.Application", method, parameters, nullptr,
                                                      G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr);
        if (!reply)
            return false;
        g_variant_unref(reply);
        return true;
    };
    const char *uris[] = {"file:///a%20b", nullptr};
    EXPECT_TRUE(call("Activate", g_variant_new_parsed("(@a{sv} {},)")));
    EXPECT_TRUE(call("Open", g_variant_new("(^as@a{sv})", uris, g_variant_new_parsed("@a{sv} {}"))));
    EXPECT_TRUE(call("ActivateAction", g_variant_new_parsed("('account-add', [<'x'>], @a{sv} {})")));
    EXPECT_EQ(exchange("echo")["count"], "5");
}

TEST_F(Bus, AServiceWithoutARequestEndsItself)
{
    const auto start = [] {
        char program[] = TOY, service[] = "--service";
        char *words[] = {program, service, nullptr};
        char **environment = g_environ_setenv(g_get_environ(), "ORVANT_SERVICE_WAIT", "1", TRUE);
        EXPECT_TRUE(g_spawn_async(nullptr, words, environment, G_SPAWN_DEFAULT, nullptr, nullptr, nullptr, nullptr));
        g_strfreev(environment);
        EXPECT_TRUE(run_until([] { return bus_name_owned("com.example.toy"); }));
    };
    start();
    EXPECT_TRUE(run_until([] { return !bus_name_owned("com.example.toy"); }, 5));
    start();
    const Outcome first = exchange("echo");
    const gint64 begun = g_get_monotonic_time();
    run_until([begun] { return g_get_monotonic_time() - begun > 2 * G_USEC_PER_SEC; }); // well after its time
    EXPECT_EQ(exchange("echo")["pid"], first["pid"]);
}

TEST_F(Bus, ProgramsTellWhatBecameOfARequest)
{
    const std::string file = dir->file("a file", "x"), quoted = dir->path + "/a\\040file";
    const std::vector<std::string> launch = {LAUNCH, "--app", "com.example.toy"};
    const std::vector<std::string> language = {TOY, "--operation", "language-and-leave", "--print-reply"};
    const Variables no_bus = {{"DBUS_SESSION_BUS_ADDRESS", "unix:path=/nowhere"}};
    const struct {
        std::vector<std::string> program, words;
        Variables variables;
        int status;
        std::string output, error;
    } cases[] = {
        {launch, {"share", file}, {}, 0, "uri=file://" + quoted},
        {launch, {"multi-share", file, file, "--extra", "k=v"}, {}, 0, "[]=" + quoted + " k=v"},
        {launch, {"--operation", "fail"}, {}, 1, "reply: FAILED\n"},
        {launch, {"--operation", "reply-and-leave", "--extra", "k=v w", "--array", "e"}, no_bus, 0, "k=v\\040w e[]"},
        {launch, {"share", "missing"}, {}, 2, "", "missing"},
        {{TOY}, {"--operation", "leave"}, no_bus, 0, "/operation/leave\nterminate\n"},
        {{TOY}, {}, {no_bus[0], {"ELM_ENGINE", ""}}, 1, "", "no display"},
        {{TOY}, {"--bogus"}, no_bus, 2, "", "--bogus"},
        {language, {}, {}, 0, "list=en messages=C.UTF-8"},
        {language, {}, {{"LC_ALL", "POSIX"}}, 0, "list=en messages=C.UTF-8"},
        // a language whose locale is not installed
        {language, {}, {{"LANG", "de_AT.UTF-8"}}, 0, "list=de_AT:de:en messages=C.UTF-8"},
        {language, {}, {{"LANG", "C.UTF-8"}, {"LC_ALL", "ko_KR.UTF-8"}}, 0, "list=ko_KR:ko:en messages=C.UTF-8"},
        {language, {}, {{"LANG", "fr_FR.UTF-8"}, {"LANGUAGE", "es:de"}}, 0, "list=es:de:en messages=C.UTF-8"},
    };
    for (const auto &one : cases) {
        std::vector<std::string> words = one.program;
        words.insert(words.end(), one.words.begin(), one.words.end());
        Variables variables = {{"ASAN_OPTIONS", "detect_leaks=0"}}; // the report would be more lines
        for (const char *name :
             {"XDG_RUNTIME_DIR", "DISPLAY", "WAYLAND_DISPLAY", "LANG", "LC_ALL", "LC_MESSAGES", "LANGUAGE"})
            variables.emplace_back(name, "");
        variables.insert(variables.end(), one.variables.begin(), one.variables.end());
        const Ended run = run_program(words, variables);
        EXPECT_EQ(run.status, one.status) << words.back() << run.errors;
        EXPECT_NE(run.output.find(one.output), std::string::npos) << run.output;
        EXPECT_NE(run.errors.find(one.error), std::string::npos) << run.errors;
        EXPECT_LE(std::ranges::count(run.errors, '\n'), one.error.empty() ? 0 : 1) << run.errors;
    }
}
} // namespace
