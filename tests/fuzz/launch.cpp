// Launch requests: what came over the bus, in a bundle, or as arguments is the same after it was sent on.
#include "app/command_line.h"
#include "fuzz.h"
#include <algorithm>

static bool same(const app_control_s &one, const app_control_s &other)
{
    const auto extra = [](const Extra &a, const Extra &b) {
        return a.key == b.key && a.array == b.array && a.values == b.values;
    };
    return one.operation == other.operation && one.uri == other.uri && one.mime == other.mime &&
           one.app_id == other.app_id && one.window == other.window &&
           std::ranges::equal(one.extra, other.extra, extra);
}

static void check_sent(const app_control_s &request)
{
    GVariant *variant = g_variant_ref_sink(request_to_variant(request));
    app_control_s received;
    request_from_variant(variant, received);
    g_variant_unref(variant);
    must(same(request, received));

    app_control_s reply;
    reply.extra = request.extra;
    const std::string line = reply_line(&reply, APP_CONTROL_RESULT_CANCELED);
    app_control_s read;
    app_control_result_e result = APP_CONTROL_RESULT_FAILED;
    must(line.find('\n') == line.npos && parse_reply_line(line, read, result));
    must(result == APP_CONTROL_RESULT_CANCELED && same(reply, read));
}

static CommandLine parse(std::vector<std::string> words)
{
    words.insert(words.begin(), "program");
    std::vector<char *> argv;
    for (std::string &word : words)
        argv.push_back(word.data());
    argv.push_back(nullptr);
    return parse_command_line(static_cast<int>(words.size()), argv.data());
}

static void from_arguments(const std::string &text)
{
    std::vector<std::string> words;
    for (size_t at = 0; at < text.size();) {
        const size_t end = std::min(text.find('\0', at), text.size());
        words.push_back(text.substr(at, end - at));
        at = end + 1;
    }
    const CommandLine line = parse(words);
    if (!line.error.empty())
        return;
    const CommandLine again = parse(command_line_arguments(line.request));
    must(again.error.empty() && same(line.request, again.request));
    check_sent(line.request);
}

static void from_bytes(const std::string &bytes)
{
    GBytes *block = g_bytes_new(bytes.data(), bytes.size()); // aligned
    GVariant *variant = g_variant_ref_sink(g_variant_new_from_bytes(G_VARIANT_TYPE_VARDICT, block, FALSE));
    g_bytes_unref(block);
    app_control_s request;
    request_from_variant(variant, request);
    g_variant_unref(variant);
    check_sent(request);
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    if (size == 0)
        return 0;
    const std::string rest(reinterpret_cast<const char *>(data) + 1, size - 1);
    if (data[0] == 'a') {
        from_arguments(rest);
    } else if (data[0] == 'v') {
        from_bytes(rest);
    } else if (data[0] == 'b') {
        const bundle text{rest};
        app_control_h request = nullptr;
        if (app_control_from_bundle(&text, &request) == APP_CONTROL_ERROR_NONE)
            check_sent(*request);
        app_control_destroy(request);
    } else {
        app_control_s reply;
        app_control_result_e result = APP_CONTROL_RESULT_FAILED;
        if (parse_reply_line(rest, reply, result))
            check_sent(reply);
    }
    return 0;
}
