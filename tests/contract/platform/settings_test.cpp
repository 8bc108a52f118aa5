// The settings store, the 24-hour clock and MIME types.
#include "mime_type/mime_type.h"
#include "runtime_info/runtime_info.h"
#include "support.h"
#include "vconf/vconf.h"
#include <sys/wait.h>
#include <thread>

using Settings = PlatformTest;

TEST_F(Settings, ValuesAreTypedAndSharedBetweenProcesses)
{
    int truth = 7;
    EXPECT_EQ(vconf_get_bool("db/a", &truth), -1);
    EXPECT_EQ(truth, 7);
    EXPECT_EQ(vconf_set_bool("db/a", 5), 0);
    EXPECT_EQ(vconf_get_bool("db/a", &truth), 0);
    EXPECT_EQ(truth, 1);
    EXPECT_EQ(vconf_get_str("db/a"), nullptr);
    if (fork() == 0)
        _exit(vconf_set_str("db/a", "it's; DROP TABLE setting") == 0 ? 0 : 1);
    int status = -1;
    wait(&status);
    ASSERT_EQ(status, 0);
    EXPECT_EQ(taken(vconf_get_str("db/a")), "it's; DROP TABLE setting");
    EXPECT_EQ(vconf_get_bool("db/a", &truth), -1);
    EXPECT_EQ(vconf_unset("db/a"), 0);
    EXPECT_EQ(vconf_unset("db/a"), -1);
}

TEST_F(Settings, MemoryKeysEndWithTheMachinesStart)
{
    vconf_set_str("memory/a", "x");
    vconf_set_str("db/a", "x");
    ASSERT_TRUE(age_records("settings.db", "setting"));
    EXPECT_EQ(vconf_get_str("memory/a"), nullptr);
    EXPECT_EQ(vconf_unset("memory/a"), -1);
    EXPECT_EQ(taken(vconf_get_str("db/a")), "x");
}

TEST_F(Settings, ManyProcessesMayWriteAtOnce)
{
    for (int child = 0; child < 8; child++)
        if (fork() == 0) {
            int failed = 0;
            for (int i = 0; i < 20; i++)
                failed |= vconf_set_bool(("db/" + std::to_string(child) + "/" + std::to_string(i)).c_str(), 1);
            _exit(failed ? 1 : 0);
        }
    for (int child = 0; child < 8; child++) {
        int status = -1;
        wait(&status);
        EXPECT_EQ(status, 0);
    }
    int count = 0;
    vconf_foreach([](const char *, const char *, bool, void *data) { return ++*static_cast<int *>(data) > 0; }, &count);
    EXPECT_EQ(count, 160);
}

TEST_F(Settings, LanguageAndClockFollowTheLocaleUntilTheyAreSet)
{
    const struct {
        const char *all, *messages, *lang, *language;
    } cases[] = {{"", "", "", "(null)"},
                 {"", "", "de_DE.UTF-8", "de_DE.UTF-8"},
                 {"", "fr_FR.UTF-8", "de_DE.UTF-8", "fr_FR.UTF-8"},
                 {"C", "", "de_DE.UTF-8", "(null)"},
                 {"", "POSIX", "C.UTF-8", "(null)"}};
    for (const auto &c : cases) {
        setenv("LC_ALL", c.all, 1);
        setenv("LC_MESSAGES", c.messages, 1);
        setenv("LANG", c.lang, 1);
        EXPECT_EQ(taken(vconf_get_str("db/menu_widget/language")), c.language) << c.all << c.messages << c.lang;
    }
    const auto clock = [](const char *locale) {
        bool on = false;
        setenv("LC_ALL", locale, 1);
        const int error = runtime_info_get_value_bool(RUNTIME_INFO_KEY_24HOUR_CLOCK_FORMAT_ENABLED, &on);
        return error ? error : static_cast<int>(on);
    };
    EXPECT_EQ(clock("xx_XX.UTF-8"), RUNTIME_INFO_ERROR_IO_ERROR);
    EXPECT_EQ(clock("C"), 1);
    vconf_set_bool("db/menu_widget/regionformat_24hour", false);
    EXPECT_EQ(clock("C"), 0);
}

TEST(MimeType, ByExtension)
{
    const std::pair<const char *, const char *> cases[] = {
        {"JPG", "image/jpeg"}, {"tar.gz", "application/x-compressed-tar"}, {"no-such-type", "-"}, {"x/jpg", "-"}};
    for (const auto &[extension, expected] : cases) {
        char *type = nullptr;
        const int result = mime_type_get_mime_type(extension, &type);
        EXPECT_EQ(result == MIME_TYPE_ERROR_NONE ? taken(type) : "-", expected) << extension;
    }
}
