// What requests do without anybody to send them to. The same cases run against the framework and against the one that
// tests put in its place.
#include "app/app_control.h"
#include "app/command_line.h"
#include <gtest/gtest.h>

namespace {
const std::string odd_texts[] = {
    "",
    "plain",
    "new\nline and \ttab",
    "not\xff\xfeutf8",
    "quote'\"\\ back",
    "\xed\x95\x9c\xea\xb8\x80.jpg",
    "<b>&amp;",
    "a=b",
    "%20 %s",
    std::string(4096, 'x') + "\xe9",
};

struct Request {
    app_control_h handle = nullptr;
    Request()
    {
        app_control_create(&handle);
    }
    ~Request()
    {
        app_control_destroy(handle);
    }
};

std::string take(char *text)
{
    std::string result = text ? text : "(null)";
    free(text);
    return result;
}

std::string extra(app_control_h request, const char *key)
{
    char *value = nullptr;
    app_control_get_extra_data(request, key, &value);
    return take(value);
}

std::vector<std::string> extra_array(app_control_h request, const char *key)
{
    char **values = nullptr;
    int length = -1;
    std::vector<std::string> result;
    if (app_control_get_extra_data_array(request, key, &values, &length) != APP_CONTROL_ERROR_NONE)
        return {"(error)"};
    EXPECT_EQ(values[length], nullptr);
    for (int i = 0; i < length; i++)
        result.push_back(take(values[i]));
    free(values);
    return result;
}

// One of everything, with texts that trip the careless.
void fill(app_control_h request)
{
    const char *array[] = {odd_texts[2].c_str(), nullptr, odd_texts[3].c_str()};
    app_control_set_operation(request, APP_CONTROL_OPERATION_VIEW);
    app_control_set_uri(request, odd_texts[3].c_str());
    app_control_set_window(request, 0xfedcba98);
    for (const std::string &text : odd_texts)
        app_control_add_extra_data(request, ("key " + text).c_str(), text.c_str());
    app_control_add_extra_data_array(request, "some", array, 3);
    app_control_add_extra_data_array(request, "none", nullptr, 0);
}

void expect_filled(app_control_h request)
{
    char *text = nullptr;
    unsigned int window = 0;
    app_control_get_operation(request, &text);
    EXPECT_EQ(take(text), APP_CONTROL_OPERATION_VIEW);
    app_control_get_uri(request, &text);
    EXPECT_EQ(take(text), odd_texts[3]);
    EXPECT_EQ(app_control_get_mime(request, &text), APP_CONTROL_ERROR_NONE);
    EXPECT_EQ(text, nullptr);
    app_control_get_window(request, &window);
    EXPECT_EQ(window, 0xfedcba98);
    for (const std::string &odd : odd_texts)
        EXPECT_EQ(extra(request, ("key " + odd).c_str()), odd);
    EXPECT_EQ(extra_array(request, "some"), (std::vector{odd_texts[2], odd_texts[3]}));
    EXPECT_EQ(extra_array(request, "none"), std::vector<std::string>());
}

TEST(Requests, SurviveCloneAndBundle)
{
    Request first;
    fill(first.handle);
    expect_filled(first.handle);
    app_control_h copy = nullptr;
    ASSERT_EQ(app_control_clone(&copy, first.handle), APP_CONTROL_ERROR_NONE);
    app_control_add_extra_data(first.handle, "some", "changed behind the copy's back");
    expect_filled(copy);
    bundle *text = nullptr;
    ASSERT_EQ(app_control_to_bundle(copy, &text), APP_CONTROL_ERROR_NONE);
    for (const char c : text->text)
        ASSERT_TRUE(c >= ' ' && c < 127);
    app_control_h read = nullptr;
    ASSERT_EQ(app_control_from_bundle(text, &read), APP_CONTROL_ERROR_NONE);
    expect_filled(read);
    app_control_destroy(read);
    app_control_destroy(copy);
}

TEST(Requests, RefuseWhatIsNotABundle)
{
    for (const char *text : {"", "{", "'text'", "[1, 2]", "{'operation': 1}"}) {
        const bundle damaged{text};
        app_control_h request = nullptr;
        EXPECT_EQ(app_control_from_bundle(&damaged, &request), APP_CONTROL_ERROR_INVALID_PARAMETER) << text;
        EXPECT_EQ(request, nullptr);
    }
    // unknown entries and wrong types are passed over
    const bundle strange{"{'operation': <1>, 'later': <'x'>, 'uri': <b'u'>, 'extra': <[(b'k', false, @aay [])]>}"};
    app_control_h request = nullptr;
    ASSERT_EQ(app_control_from_bundle(&strange, &request), APP_CONTROL_ERROR_NONE);
    char *uri = nullptr;
    app_control_get_uri(request, &uri);
    EXPECT_EQ(take(uri), "u");
    EXPECT_EQ(extra(request, "k"), "(null)");
    app_control_destroy(request);
}

TEST(Requests, TellWhatIsWrong)
{
    Request request;
    fill(request.handle);
    char *text = nullptr;
    char **texts = nullptr;
    int length = 0;
    const struct {
        const char *what;
        int result, expected;
    } cases[] = {
        {"no handle", app_control_set_uri(nullptr, "x"), APP_CONTROL_ERROR_INVALID_PARAMETER},
        {"no key", app_control_add_extra_data(request.handle, nullptr, "x"), APP_CONTROL_ERROR_INVALID_PARAMETER},
        {"no value", app_control_add_extra_data(request.handle, "k", nullptr), APP_CONTROL_ERROR_INVALID_PARAMETER},
        {"length", app_control_add_extra_data_array(request.handle, "k", nullptr, 1),
         APP_CONTROL_ERROR_INVALID_PARAMETER},
        {"missing", app_control_get_extra_data(request.handle, "k", &text), APP_CONTROL_ERROR_KEY_NOT_FOUND},
        {"array", app_control_get_extra_data(request.handle, "some", &text), APP_CONTROL_ERROR_INVALID_DATA_TYPE},
        {"no array", app_control_get_extra_data_array(request.handle, "key plain", &texts, &length),
         APP_CONTROL_ERROR_INVALID_DATA_TYPE},
        {"not received", app_control_reply_to_launch_request(nullptr, request.handle, APP_CONTROL_RESULT_SUCCEEDED),
         APP_CONTROL_ERROR_INVALID_PARAMETER},
        {"no callback", app_control_foreach_app_matched(request.handle, nullptr, nullptr),
         APP_CONTROL_ERROR_INVALID_PARAMETER},
        {"no request", app_control_send_launch_request(nullptr, nullptr, nullptr), APP_CONTROL_ERROR_INVALID_PARAMETER},
    };
    for (const auto &one : cases)
        EXPECT_EQ(one.result, one.expected) << one.what;
    EXPECT_EQ(text, nullptr);
}

TEST(Requests, StopListingWhenAsked)
{
    Request request;
    fill(request.handle);
    int calls = 0;
    app_control_foreach_extra_data(
        request.handle,
        [](app_control_h of, const char *key, void *data) {
            app_control_add_extra_data(of, (std::string("new ") + key).c_str(), "x"); // must not upset the walk
            return ++*static_cast<int *>(data) < 2;
        },
        &calls);
    EXPECT_EQ(calls, 2);
}

TEST(CommandLine, CarriesARequest)
{
    Request request;
    fill(request.handle);
    std::vector<std::string> words = command_line_arguments(*request.handle);
    words.insert(words.begin(), {"program", "--print-reply"});
    std::vector<char *> argv;
    for (std::string &word : words)
        argv.push_back(word.data());
    CommandLine line = parse_command_line(static_cast<int>(argv.size()), argv.data());
    EXPECT_EQ(line.error, "");
    EXPECT_TRUE(line.print_reply);
    // a key with an equals sign in it is the one thing that options cannot carry
    app_control_add_extra_data(&line.request, "key a=b", "a=b");
    expect_filled(&line.request);
}

TEST(CommandLine, CarriesAReply)
{
    Request request;
    fill(request.handle);
    for (const auto result : {APP_CONTROL_RESULT_SUCCEEDED, APP_CONTROL_RESULT_FAILED, APP_CONTROL_RESULT_CANCELED}) {
        const std::string line = reply_line(request.handle, result);
        EXPECT_EQ(line.find('\n'), std::string::npos);
        app_control_s read;
        read.operation = APP_CONTROL_OPERATION_VIEW; // a reply has extra data only
        read.uri = odd_texts[3];
        read.window = 0xfedcba98;
        auto parsed = static_cast<app_control_result_e>(99);
        ASSERT_TRUE(parse_reply_line(line, read, parsed));
        EXPECT_EQ(parsed, result);
        expect_filled(&read);
    }
    EXPECT_EQ(reply_line(nullptr, APP_CONTROL_RESULT_FAILED), "reply: FAILED");
}

TEST(CommandLine, MakesTheFirstRequest)
{
    const std::string here = take(g_get_current_dir());
    const struct {
        std::vector<std::string> words;
        std::string operation, uri, error;
        std::vector<std::string> files;
    } cases[] = {
        {{}, "(null)", "(null)", "", {"(error)"}},
        {{"a b", "./c", "../d", "/e/f"},
         APP_CONTROL_OPERATION_MULTI_SHARE,
         "(null)",
         "",
         {here + "/a b", here + "/c", here + "/../d", "/e/f"}},
        {{"file:///tmp/a%20b%FF", "--", "--operation"},
         APP_CONTROL_OPERATION_MULTI_SHARE,
         "(null)",
         "",
         {"/tmp/a b\xff", here + "/--operation"}},
        {{"--operation", "account/add"}, APP_CONTROL_OPERATION_ACCOUNT_ADD, "(null)", "", {"(error)"}},
        {{"--operation", "share", "--uri", "file:///x"}, APP_CONTROL_OPERATION_SHARE, "file:///x", "", {"(error)"}},
        {{"--array", APP_CONTROL_DATA_PATH}, "(null)", "(null)", "", {}},
        {{"--extra", "novalue"}, "(null)", "(null)", "--extra wants KEY=VALUE", {"(error)"}},
        {{"--bogus", "x"}, "(null)", "(null)", "unknown option --bogus", {"(error)"}},
    };
    for (const auto &one : cases) {
        std::vector<std::string> words = one.words;
        words.insert(words.begin(), "program");
        std::vector<char *> argv;
        for (std::string &word : words)
            argv.push_back(word.data());
        CommandLine line = parse_command_line(static_cast<int>(argv.size()), argv.data());
        EXPECT_EQ(line.request.operation.value_or("(null)"), one.operation);
        EXPECT_EQ(line.request.uri.value_or("(null)"), one.uri);
        EXPECT_EQ(line.error, one.error);
        EXPECT_EQ(extra_array(&line.request, APP_CONTROL_DATA_PATH), one.files);
    }
}
} // namespace
