// What requests carry without anybody to send them to: copies, bundles, command lines and reply lines.
#include "app/app_control.h"
#include "app/command_line.h"
#include "temp_home.h"
#include <gtest/gtest.h>

namespace {
const std::string odd_texts[] = {
    "",
    "plain",
    "new\nline and \ttab",
    "not\xff\xfeutf8",
    "quote'\"\\ back",
    "\xed\x95\x9c\xea\xb8\x80.jpg",
    "a=b",
    "%20 %s",
    std::string(4096, 'x') + "\xe9",
};

std::string extra(app_control_h request, const char *key)
{
    char *value = nullptr;
    app_control_get_extra_data(request, key, &value);
    return taken(value);
}

std::vector<std::string> extra_array(app_control_h request, const char *key)
{
    char **values = nullptr;
    int length = -1;
    std::vector<std::string> result;
    if (app_control_get_extra_data_array(request, key, &values, &length) != APP_CONTROL_ERROR_NONE)
        return {"(error)"};
    for (int i = 0; i < length; i++)
        result.push_back(taken(values[i]));
    free(values);
    return result;
}

// One of everything, with texts that trip the careless.
class Requests : public testing::Test {
  protected:
    app_control_h request = nullptr;

    void SetUp() override
    {
        const char *array[] = {odd_texts[2].c_str(), nullptr, odd_texts[3].c_str()};
        app_control_create(&request);
        app_control_set_operation(request, APP_CONTROL_OPERATION_VIEW);
        app_control_set_uri(request, odd_texts[3].c_str());
        app_control_set_window(request, 0xfedcba98);
        for (const std::string &text : odd_texts)
            app_control_add_extra_data(request, ("key " + text).c_str(), text.c_str());
        app_control_add_extra_data_array(request, "some", array, 3);
        app_control_add_extra_data_array(request, "none", nullptr, 0);
    }
    void TearDown() override
    {
        app_control_destroy(request);
    }
    static void expect_filled(app_control_h other)
    {
        char *text = nullptr;
        unsigned int window = 0;
        app_control_get_operation(other, &text);
        EXPECT_EQ(taken(text), APP_CONTROL_OPERATION_VIEW);
        app_control_get_uri(other, &text);
        EXPECT_EQ(taken(text), odd_texts[3]);
        app_control_get_window(other, &window);
        EXPECT_EQ(window, 0xfedcba98);
        for (const std::string &odd : odd_texts)
            EXPECT_EQ(extra(other, ("key " + odd).c_str()), odd);
        EXPECT_EQ(extra_array(other, "some"), (std::vector{odd_texts[2], odd_texts[3]}));
        EXPECT_EQ(extra_array(other, "none"), std::vector<std::string>());
    }
    static CommandLine parse(std::vector<std::string> words)
    {
        words.insert(words.begin(), "program");
        std::vector<char *> argv;
        for (std::string &word : words)
            argv.push_back(word.data());
        return parse_command_line(static_cast<int>(argv.size()), argv.data());
    }
};

TEST_F(Requests, SurviveCloneAndBundle)
{
    app_control_h copy = nullptr, read = nullptr;
    bundle *text = nullptr;
    ASSERT_EQ(app_control_clone(&copy, request), APP_CONTROL_ERROR_NONE);
    app_control_add_extra_data(request, "some", "changed behind the copy's back");
    ASSERT_EQ(app_control_to_bundle(copy, &text), APP_CONTROL_ERROR_NONE);
    for (const char c : text->text)
        ASSERT_TRUE(c >= ' ' && c < 127);
    ASSERT_EQ(app_control_from_bundle(text, &read), APP_CONTROL_ERROR_NONE);
    expect_filled(read);
    app_control_destroy(read);
    app_control_destroy(copy);
    const bundle damaged{"{'operation': 1}"};
    EXPECT_EQ(app_control_from_bundle(&damaged, &read), APP_CONTROL_ERROR_INVALID_PARAMETER);
}

TEST_F(Requests, SurviveTheCommandLine)
{
    CommandLine line = parse(command_line_arguments(*request));
    EXPECT_EQ(line.error, "");
    // a key with an equals sign in it is the one thing that options cannot carry
    app_control_add_extra_data(&line.request, "key a=b", "a=b");
    expect_filled(&line.request);
}

TEST_F(Requests, AreMadeOfFilesAndOptions)
{
    const std::string here = std::filesystem::current_path();
    const std::vector<std::string> none = {"(error)"};
    const struct {
        std::vector<std::string> words;
        std::string operation, error;
        std::vector<std::string> files;
    } cases[] = {
        {{}, "(null)", "", none},
        {{"a b", "../d", "/e/f"}, APP_CONTROL_OPERATION_MULTI_SHARE, "", {here + "/a b", here + "/../d", "/e/f"}},
        {{"file:///tmp/a%20b%FF", "--", "--operation"},
         APP_CONTROL_OPERATION_MULTI_SHARE,
         "",
         {"/tmp/a b\xff", here + "/--operation"}},
        {{"--operation", "share", "--uri", "file:///x"}, APP_CONTROL_OPERATION_SHARE, "", none},
        {{"--extra", "novalue"}, "(null)", "--extra wants KEY=VALUE", none},
        {{"--bogus", "x"}, "(null)", "unknown option --bogus", none},
    };
    for (const auto &one : cases) {
        CommandLine line = parse(one.words);
        EXPECT_EQ(line.request.operation.value_or("(null)"), one.operation);
        EXPECT_EQ(line.error, one.error);
        EXPECT_EQ(extra_array(&line.request, APP_CONTROL_DATA_PATH), one.files);
    }
}
} // namespace
