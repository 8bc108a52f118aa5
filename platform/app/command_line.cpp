#include "app/command_line.h"
#include <algorithm>
#include <cstring>
#include <filesystem>

namespace {
constexpr struct {
    const char *text;
    app_control_result_e result;
} result_names[] = {
    {"SUCCEEDED", APP_CONTROL_RESULT_SUCCEEDED},
    {"FAILED", APP_CONTROL_RESULT_FAILED},
    {"CANCELED", APP_CONTROL_RESULT_CANCELED},
};
constexpr char reply_prefix[] = "reply: ";

void append_to_array(app_control_s &request, const std::string &key, const std::string *value)
{
    const auto have = std::ranges::find(request.extra, key, &Extra::key);
    if (have == request.extra.end() || !have->array)
        request.set(key, true, value ? std::vector{*value} : std::vector<std::string>());
    else if (value)
        have->values.push_back(*value);
}

std::string file_argument(const std::string &argument)
{
    if (argument.starts_with("file:///"))
        if (char *path = g_filename_from_uri(argument.c_str(), nullptr, nullptr)) {
            std::string result = path;
            g_free(path);
            return result;
        }
    return absolute_path(argument);
}

std::string escaped(const std::string &text, bool key)
{
    const bool utf8 = g_utf8_validate(text.data(), static_cast<gssize>(text.size()), nullptr);
    std::string result;
    char octal[8];
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte <= ' ' || byte == '\\' || byte == 127 || (byte > 127 && !utf8) || (key && (c == '=' || c == '['))) {
            g_snprintf(octal, sizeof octal, "\\%03o", byte);
            result += octal;
        } else {
            result += c;
        }
    }
    return result;
}

std::string unescaped(const std::string &text)
{
    char *plain = g_strcompress(text.c_str());
    std::string result = plain;
    g_free(plain);
    return result;
}

// One option with its value; an empty text when it was understood.
std::string take_option(CommandLine &line, const std::string &option, const std::string &value)
{
    app_control_s &request = line.request;
    const size_t equals = value.find('=');
    if (option == "--operation") {
        request.operation = whole_operation(value);
    } else if (option == "--app") {
        request.app_id = value;
    } else if (option == "--uri") {
        request.uri = value;
    } else if (option == "--mime") {
        request.mime = value;
    } else if (option == "--window") {
        request.window = static_cast<unsigned int>(g_ascii_strtoull(value.c_str(), nullptr, 0));
    } else if (option == "--extra") {
        if (equals == std::string::npos || equals == 0)
            return "--extra wants KEY=VALUE";
        request.set(value.substr(0, equals), false, {value.substr(equals + 1)});
    } else if (option == "--array") {
        const std::string text = equals == std::string::npos ? "" : value.substr(equals + 1);
        append_to_array(request, value.substr(0, equals), equals == std::string::npos ? nullptr : &text);
    } else {
        return "unknown option " + option;
    }
    return {};
}
} // namespace

std::string whole_operation(const std::string &operation)
{
    return operation.find("://") == std::string::npos ? APP_CONTROL_OPERATION_PREFIX + operation : operation;
}

std::string absolute_path(const std::string &path)
{
    std::error_code failed;
    const auto whole = std::filesystem::absolute(path, failed);
    if (failed)
        return path;
    // a ".." behind a link does not lead back to where the text says
    const bool up = ("/" + path + "/").find("/../") != std::string::npos;
    return up ? whole.string() : whole.lexically_normal().string();
}

CommandLine parse_command_line(int argc, char **argv)
{
    CommandLine line;
    std::vector<std::string> files;
    bool options = true;
    for (int i = 1; i < argc && line.error.empty(); i++) {
        const std::string word = argv[i];
        if (!options || !word.starts_with("--"))
            files.push_back(file_argument(word));
        else if (word == "--")
            options = false;
        else if (word == "--print-reply")
            line.print_reply = true;
        else if (word == "--service")
            line.service = true;
        else if (i + 1 == argc)
            line.error = word + " wants a value, or is not known";
        else
            line.error = take_option(line, word, argv[++i]);
    }
    if (files.empty())
        return line;
    if (!line.request.operation)
        line.request.operation = APP_CONTROL_OPERATION_MULTI_SHARE;
    line.request.set(APP_CONTROL_DATA_PATH, true, std::move(files));
    return line;
}

std::vector<std::string> command_line_arguments(const app_control_s &request)
{
    std::vector<std::string> arguments;
    const auto add = [&arguments](const char *option, const std::string &value) {
        arguments.insert(arguments.end(), {option, value});
    };
    if (request.operation)
        add("--operation", *request.operation);
    if (request.app_id)
        add("--app", *request.app_id);
    if (request.uri)
        add("--uri", *request.uri);
    if (request.mime)
        add("--mime", *request.mime);
    if (request.window)
        add("--window", std::to_string(request.window));
    for (const Extra &entry : request.extra) {
        if (entry.array)
            add("--array", entry.key);
        for (const std::string &value : entry.values)
            add(entry.array ? "--array" : "--extra", entry.key + "=" + value);
    }
    return arguments;
}

std::string reply_line(const app_control_s *reply, app_control_result_e result)
{
    std::string line = reply_prefix;
    for (const auto &name : result_names)
        if (name.result == result)
            line += name.text;
    if (!reply)
        return line;
    for (const Extra &entry : reply->extra) {
        const std::string key = " " + escaped(entry.key, true) + (entry.array ? "[]" : "");
        if (entry.values.empty())
            line += key;
        for (const std::string &value : entry.values)
            line += key + "=" + escaped(value, false);
    }
    return line;
}

bool parse_reply_line(const std::string &line, app_control_s &reply, app_control_result_e &result)
{
    if (!line.starts_with(reply_prefix))
        return false;
    size_t at = std::strlen(reply_prefix);
    bool known = false;
    for (bool first = true; at <= line.size(); first = false) {
        const size_t end = std::min(line.find(' ', at), line.size());
        const std::string word = line.substr(at, end - at);
        at = end + 1;
        if (first) {
            for (const auto &name : result_names)
                if (word == name.text) {
                    result = name.result;
                    known = true;
                }
            continue;
        }
        const size_t equals = std::min(word.find('='), word.size());
        std::string key = word.substr(0, equals);
        const std::string value = equals < word.size() ? unescaped(word.substr(equals + 1)) : "";
        if (!key.ends_with("[]")) {
            reply.set(unescaped(key), false, {value});
            continue;
        }
        key.resize(key.size() - 2);
        append_to_array(reply, unescaped(key), equals < word.size() ? &value : nullptr);
    }
    return known;
}
