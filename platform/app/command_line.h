#pragma once
// Launch requests as program arguments, and replies as a line of text. For the framework's own sources; any thread.
#include "app/request.h"

struct CommandLine {
    app_control_s request;
    bool print_reply = false; // --print-reply: the reply goes to standard output
    bool service = false;     // --service: the first request comes over the bus
    std::string error;        // what is wrong with the arguments, for a person; empty when they are right
};

// [--operation OP] [--app ID] [--uri URI] [--mime TYPE] [--window ID] [--extra KEY=VALUE]... [--array KEY[=VALUE]]...
// [--print-reply] [--service] [--] [FILE]...
// OP is a whole operation or what stands behind APP_CONTROL_OPERATION_PREFIX. Each --array adds one value to its key's
// array; without "=" it only makes the array. Files make a multi_share; relative names are taken from the current
// folder, file: URIs are decoded.
CommandLine parse_command_line(int argc, char **argv);
// The arguments that parse_command_line reads as this request.
std::vector<std::string> command_line_arguments(const app_control_s &request);

std::string whole_operation(const std::string &operation);
// The path from the root, without resolving links.
std::string absolute_path(const std::string &path);

// "reply: RESULT [KEY=VALUE]... [KEY[]=VALUE]...": RESULT is SUCCEEDED, FAILED or CANCELED, "[]" marks an array's
// values (none: KEY[] alone). White space, control characters, backslashes, equals signs in keys and what is not UTF-8
// are escaped as in C.
std::string reply_line(const app_control_s *reply, app_control_result_e result);
// False when the line is something else.
bool parse_reply_line(const std::string &line, app_control_s &reply, app_control_result_e &result);
