// A small client: sends a launch request as another application would, and prints the reply.
#include "app/bus.h"
#include "app/command_line.h"
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <unistd.h>

#ifndef DEFAULT_APP
#error "DEFAULT_APP is the id of the application that gets requests without --app"
#endif

namespace {
constexpr char usage[] = "[--app ID] [--no-wait] (share FILE | multi-share FILE... | --operation OP) [--uri URI] "
                         "[--mime TYPE] [--extra KEY=VALUE]... [--array KEY VALUE...]...";

struct Arguments {
    app_control_s request;
    bool wait = true;
    std::string error;
};

// Takes the words up to the next option.
std::vector<std::string> following(char **argv, int argc, int &at)
{
    std::vector<std::string> words;
    while (at + 1 < argc && std::strncmp(argv[at + 1], "--", 2) != 0)
        words.emplace_back(argv[++at]);
    return words;
}

std::string take_files(app_control_s &request, const std::string &command, std::vector<std::string> files)
{
    if (files.empty() || (command == "share" && files.size() != 1))
        return command == "share" ? "share wants one file" : "multi-share wants files";
    for (std::string &file : files) {
        if (access(file.c_str(), R_OK) != 0)
            return "cannot read " + file + ": " + std::strerror(errno);
        file = absolute_path(file);
    }
    request.operation = command == "share" ? APP_CONTROL_OPERATION_SHARE : APP_CONTROL_OPERATION_MULTI_SHARE;
    if (command == "share")
        request.uri = "file://" + files.front(); // the path as it is: receivers only take the front off
    else
        request.set(APP_CONTROL_DATA_PATH, true, std::move(files));
    return {};
}

Arguments parse(int argc, char **argv)
{
    Arguments result;
    app_control_s &request = result.request;
    request.app_id = DEFAULT_APP;
    for (int i = 1; i < argc && result.error.empty(); i++) {
        const std::string word = argv[i];
        const char *value = i + 1 < argc ? argv[i + 1] : nullptr;
        const char *equals = value ? std::strchr(value, '=') : nullptr;
        if (word == "share" || word == "multi-share") {
            auto files = following(argv, argc, i);
            if (i + 1 < argc && std::strcmp(argv[i + 1], "--") == 0)
                for (i += 2; i < argc; i++)
                    files.emplace_back(argv[i]);
            result.error = take_files(request, word, std::move(files));
        } else if (word == "--no-wait") {
            result.wait = false;
        } else if (word == "--array" && value) {
            const std::string key = argv[++i];
            request.set(key, true, following(argv, argc, i));
        } else if (word == "--extra" && equals && equals != value) {
            request.set(std::string(value, equals), false, {equals + 1});
            i++;
        } else if (word == "--operation" && value) {
            request.operation = whole_operation(argv[++i]);
        } else if (word == "--uri" && value) {
            request.uri = argv[++i];
        } else if (word == "--mime" && value) {
            request.mime = argv[++i];
        } else if (word == "--app" && value) {
            request.app_id = argv[++i];
        } else {
            result.error = "cannot make sense of \"" + word + "\"; usage: " + usage;
        }
    }
    if (result.error.empty() && argc < 2)
        result.error = std::string("usage: ") + usage;
    if (const char *window = g_getenv("WINDOWID"))
        request.window = static_cast<unsigned int>(g_ascii_strtoull(window, nullptr, 0));
    return result;
}

struct Outcome {
    bool known = false;
    app_control_result_e result = APP_CONTROL_RESULT_FAILED;
};

void replied(app_control_h, app_control_h reply, app_control_result_e result, void *data)
{
    auto *outcome = static_cast<Outcome *>(data);
    *outcome = {true, result};
    std::puts(reply_line(reply, result).c_str());
}
} // namespace

int main(int argc, char **argv)
{
    Arguments arguments = parse(argc, argv);
    const char *slash = argc ? std::strrchr(argv[0], '/') : nullptr;
    const char *program = slash ? slash + 1 : argc ? argv[0] : "launch";
    if (!arguments.error.empty()) {
        std::fprintf(stderr, "%s: %s\n", program, arguments.error.c_str());
        return 2;
    }
    Outcome outcome;
    const int sent = app_control_send_launch_request(&arguments.request, arguments.wait ? replied : nullptr, &outcome);
    if (sent != APP_CONTROL_ERROR_NONE) {
        std::fprintf(stderr, "%s: %s %s\n", program, arguments.request.app_id->c_str(),
                     sent == APP_CONTROL_ERROR_APP_NOT_FOUND ? "is not installed" : "cannot be started");
        return 1;
    }
    while (arguments.wait && !outcome.known)
        g_main_context_iteration(nullptr, TRUE);
    bus_stop(60);
    return arguments.wait && outcome.result != APP_CONTROL_RESULT_SUCCEEDED ? 1 : 0;
}
