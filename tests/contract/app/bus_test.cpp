// Requests between real processes on a private session bus; toy.cpp is the other application.
#include "app/app_control.h"
#include "app/bus.h"
#include <algorithm>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <thread>

namespace fs = std::filesystem;

namespace {
struct Outcome {
    int calls = 0;
    app_control_result_e result{};
    std::vector<std::pair<std::string, std::string>> extra; // an array's values one by one

    std::string operator[](const std::string &key) const
    {
        for (const auto &[name, value] : extra)
            if (name == key)
                return value;
        return "(none)";
    }
};

bool keep_extra(app_control_h reply, const char *key, void *data)
{
    auto *outcome = static_cast<Outcome *>(data);
    char *text = nullptr;
    char **texts = nullptr;
    int length = 0;
    if (app_control_get_extra_data(reply, key, &text) == APP_CONTROL_ERROR_NONE)
        outcome->extra.emplace_back(key, text);
    app_control_get_extra_data_array(reply, key, &texts, &length);
    for (int i = 0; i < length; i++) {
        outcome->extra.emplace_back(key, texts[i]);
        free(texts[i]);
    }
    free(texts);
    free(text);
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

bool run_until(const std::function<bool()> &condition)
{
    const gint64 limit = g_get_monotonic_time() + 20 * G_USEC_PER_SEC;
    const guint tick = g_timeout_add(
        50, [](gpointer) -> gboolean { return G_SOURCE_CONTINUE; }, nullptr);
    while (!condition() && g_get_monotonic_time() < limit)
        g_main_context_iteration(nullptr, TRUE);
    g_source_remove(tick);
    return condition();
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

struct Program {
    int status = -1;
    std::string output, errors;
};

Program run_program(std::vector<std::string> words,
                    const std::vector<std::pair<std::string, std::string>> &variables = {})
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
    Program run;
    // off the main thread, which may have to answer the program
    bool ended = false;
    std::thread waiter([&] {
        g_spawn_sync(nullptr, argv.data(), environment, G_SPAWN_DEFAULT, nullptr, nullptr, &output, &errors, &status,
                     nullptr);
        g_idle_add(
            [](gpointer data) -> gboolean {
                *static_cast<bool *>(data) = true;
                return G_SOURCE_REMOVE;
            },
            &ended);
    });
    EXPECT_TRUE(run_until([&] { return ended; }));
    waiter.join();
    run = {WIFEXITED(status) ? WEXITSTATUS(status) : -1, output ? output : "", errors ? errors : ""};
    g_free(output);
    g_free(errors);
    g_strfreev(environment);
    return run;
}

class Bus : public testing::Test {
  protected:
    static fs::path dir;
    static GTestDBus *bus;

    static void write_entry(const fs::path &file, const std::string &exec, const std::string &more)
    {
        std::ofstream(file) << "[Desktop Entry]\nType=Application\nName=Test\nExec=" << exec << "\n" << more << "\n";
    }

    static void SetUpTestSuite()
    {
        char name[] = "/tmp/app-contract-XXXXXX";
        dir = mkdtemp(name);
        fs::create_directories(dir / "data/applications");
        fs::create_directories(dir / "apps");
        const std::string implements = "Implements=com.orvant.AppControl;";
        for (const char *id : {"com.example.toy", "com.example.toy-face"})
            write_entry(dir / "apps" / (std::string(id) + ".desktop"), TOY " %F", implements);
        write_entry(dir / "apps/com.example.broken.desktop", "/bin/false", implements);
        // a viewer that writes down what it was given
        std::ofstream(dir / "viewer") << "#!/bin/sh\nprintf '%s' \"$1\" >" << dir << "/seen.new\nmv " << dir
                                      << "/seen.new " << dir << "/seen\n";
        fs::permissions(dir / "viewer", fs::perms::owner_all);
        for (const char *id : {"first-viewer", "second-viewer"})
            write_entry(dir / "data/applications" / (std::string(id) + ".desktop"), (dir / "viewer").string() + " %f",
                        "MimeType=image/x-odd;image/jpeg;");
        std::ofstream(dir / "data/applications/mimeapps.list")
            << "[Default Applications]\nimage/x-odd=second-viewer.desktop\nimage/jpeg=first-viewer.desktop\n"
            << "[Added Associations]\nimage/x-odd=first-viewer.desktop;second-viewer.desktop;\n"
            << "image/jpeg=first-viewer.desktop;\n";
        for (const auto &[key, value] :
             std::initializer_list<std::pair<const char *, std::string>>{{"HOME", dir},
                                                                         {"XDG_DATA_HOME", dir / "data"},
                                                                         {"XDG_CONFIG_HOME", dir / "config"},
                                                                         {"PLATFORM_DATA_DIR", dir / "platform"},
                                                                         {"ORVANT_APPS_DIR", dir / "apps"},
                                                                         {"ELM_ENGINE", "buffer"}})
            setenv(key, value.c_str(), 1);
        bus = g_test_dbus_new(G_TEST_DBUS_NONE);
        g_test_dbus_up(bus);
    }

    static void TearDownTestSuite()
    {
        bus_stop(1);
        g_object_unref(bus_connection());
        g_test_dbus_down(bus);
        g_object_unref(bus);
        fs::remove_all(dir);
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
fs::path Bus::dir;
GTestDBus *Bus::bus;

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
    const Program again = run_program({TOY, "--operation", "echo", "--print-reply"}, {{"ELM_ENGINE", ""}});
    EXPECT_EQ(again.status, 0);
    EXPECT_NE(again.output.find("pid=" + first["pid"] + " count=4"), std::string::npos) << again.output;
}

TEST_F(Bus, CarriesAnyFileName)
{
    std::vector<std::string> names = {"/tmp/new\nline", "/tmp/not\xffutf8\xfe", "/tmp/%41 <b>&\"'\\",
                                      "/" + std::string(4095, 'n')};
    for (int i = 0; i < 3000; i++)
        names.push_back("/many/" + std::to_string(i));
    const Outcome outcome = exchange("echo", names);
    std::vector<std::string> back;
    for (const auto &[key, value] : outcome.extra)
        if (key == APP_CONTROL_DATA_PATH)
            back.push_back(value);
    EXPECT_EQ(back, names);
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

TEST_F(Bus, OpensOrdinaryPrograms)
{
    app_control_h request = nullptr;
    app_control_create(&request);
    app_control_set_operation(request, APP_CONTROL_OPERATION_VIEW);
    app_control_set_mime(request, "image/x-odd");
    std::vector<std::string> ids;
    const auto collect = [](app_control_h, const char *id, void *data) {
        static_cast<std::vector<std::string> *>(data)->emplace_back(id);
        return true;
    };
    app_control_foreach_app_matched(request, collect, &ids);
    EXPECT_EQ(ids, (std::vector<std::string>{"second-viewer", "first-viewer"})); // the user's default first
    ids.clear();
    app_set_id("second-viewer");
    app_control_foreach_app_matched(request, collect, &ids);
    app_set_id("com.example.test");
    EXPECT_EQ(ids, std::vector<std::string>{"first-viewer"}); // nobody views for himself
    ids.clear();
    app_control_set_mime(request, "image/x-unknown");
    EXPECT_EQ(app_control_foreach_app_matched(request, collect, &ids), APP_CONTROL_ERROR_NONE);
    EXPECT_TRUE(ids.empty());
    app_control_set_mime(request, nullptr);
    const fs::path picture = dir / "a b%41\n\xff.jpg";
    std::ofstream(picture) << "x";
    for (const char *app_id : {static_cast<const char *>(nullptr), "com.example.missing-viewer", "second-viewer"}) {
        fs::remove(dir / "seen");
        app_control_set_app_id(request, app_id);
        app_control_set_uri(request, app_id ? picture.c_str() : ("file://" + picture.string()).c_str());
        Outcome outcome;
        ASSERT_EQ(app_control_send_launch_request(request, replied, &outcome), APP_CONTROL_ERROR_NONE);
        ASSERT_TRUE(run_until([&] { return outcome.calls && fs::exists(dir / "seen"); }));
        EXPECT_EQ(outcome.result, APP_CONTROL_RESULT_SUCCEEDED);
        char *seen = nullptr;
        g_file_get_contents((dir / "seen").c_str(), &seen, nullptr, nullptr);
        EXPECT_STREQ(seen, picture.c_str());
        g_free(seen);
    }
    app_control_destroy(request);
}

TEST_F(Bus, LaunchClientTellsTheReply)
{
    const std::string file = dir / "a file";
    std::ofstream(file) << "x";
    const std::string quoted = dir.string() + "/a\\040file";
    const std::pair<std::string, std::string> no_bus = {"DBUS_SESSION_BUS_ADDRESS", ""};
    const struct {
        std::vector<std::string> words;
        int status;
        std::string output;
        bool bus;
    } cases[] = {
        {{"share", file}, 0, "uri=file://" + quoted, true},
        {{"multi-share", file, file, "--extra", "k=v"}, 0, "[]=" + quoted + " k=v", true},
        {{"--operation", "echo", "--array", "k", "1", "2"}, 0, "SUCCEEDED k[]=1 k[]=2", true},
        {{"--operation", "fail"}, 1, "reply: FAILED\n", true},
        {{"--no-wait", "--operation", "leave"}, 0, "", true},
        {{"--operation", "reply-and-leave", "--extra", "k=v w", "--array", "e"}, 0, "k=v\\040w e[]", false},
        {{"--operation", "leave"}, 1, "reply: CANCELED\n", false},
        {{"share", "missing"}, 2, "", true},
        {{"share"}, 2, "", true},
        {{"--extra", "x"}, 2, "", true},
    };
    for (const auto &one : cases) {
        std::vector<std::string> words = one.words;
        words.insert(words.begin(), {LAUNCH, "--app", "com.example.toy"});
        std::vector<std::pair<std::string, std::string>> variables = {{"XDG_RUNTIME_DIR", ""}, {"DISPLAY", ""}};
        if (!one.bus)
            variables.push_back(no_bus);
        const Program run = run_program(words, variables);
        EXPECT_EQ(run.status, one.status) << one.output << run.errors;
        EXPECT_NE(run.output.find(one.output), std::string::npos) << run.output;
        if (one.status == 2) {
            EXPECT_EQ(std::ranges::count(run.errors, '\n'), 1) << run.errors;
        }
    }
}

TEST_F(Bus, StartsWithoutBusOrNotAtAll)
{
    const std::pair<std::string, std::string> no_bus = {"DBUS_SESSION_BUS_ADDRESS", "unix:path=/nowhere"};
    const struct {
        std::vector<std::string> words;
        std::vector<std::pair<std::string, std::string>> variables;
        int status;
        std::string output, error;
    } cases[] = {
        {{"--operation", "leave"},
         {no_bus},
         0,
         "create\nrequest " APP_CONTROL_OPERATION_PREFIX "leave\nterminate\n",
         ""},
        {{}, {no_bus, {"ELM_ENGINE", ""}, {"DISPLAY", ""}, {"WAYLAND_DISPLAY", ""}}, 1, "", "no display"},
        {{}, {no_bus, {"ELM_ENGINE", ""}, {"DISPLAY", ":4711"}, {"WAYLAND_DISPLAY", ""}}, 1, "", "display :4711"},
        {{"--bogus"}, {no_bus}, 2, "", "--bogus"},
    };
    for (const auto &one : cases) {
        std::vector<std::string> words = one.words;
        words.insert(words.begin(), TOY);
        auto variables = one.variables;
        variables.emplace_back("ASAN_OPTIONS", "detect_leaks=0"); // the report would be more lines
        const Program run = run_program(words, variables);
        EXPECT_EQ(run.status, one.status) << one.error;
        EXPECT_EQ(run.output, one.output);
        EXPECT_NE(run.errors.find(one.error), std::string::npos) << run.errors;
        EXPECT_LE(std::ranges::count(run.errors, '\n'), one.error.empty() ? 0 : 1) << run.errors;
    }
}

TEST_F(Bus, FindsCatalogues)
{
    const struct {
        std::string lang, all, list, catalogues, messages;
    } cases[] = {
        {"", "", "", "en", "C.UTF-8"},
        {"C", "", "", "en", "C.UTF-8"},
        {"C.UTF-8", "", "", "en", "C.UTF-8"},
        {"", "POSIX", "", "en", "C.UTF-8"},
        {"de_AT.UTF-8", "", "", "de_AT:de:en", "C.UTF-8"}, // a language whose locale is not installed
        {"xx", "", "", "xx:en", "C.UTF-8"},
        {"C.UTF-8", "ko_KR.UTF-8", "", "ko_KR:ko:en", "C.UTF-8"},
        {"fr_FR.UTF-8", "", "es:de", "es:de:en", "C.UTF-8"},
        {"en_GB.UTF-8", "", "", "en_GB:en", "C.UTF-8"},
    };
    for (const auto &one : cases) {
        const Program run =
            run_program({TOY, "--operation", "language-and-leave", "--print-reply"},
                        {{"LANG", one.lang}, {"LC_ALL", one.all}, {"LC_MESSAGES", ""}, {"LANGUAGE", one.list}});
        EXPECT_NE(run.output.find("list=" + one.catalogues + " messages=" + one.messages), std::string::npos)
            << one.lang << one.all << ": " << run.output;
    }
}
} // namespace
