// The log, the settings store, the 24-hour clock and MIME types.
#include "dlog/dlog.h"
#include "mime_type/mime_type.h"
#include "runtime_info/runtime_info.h"
#include "support.h"
#include "vconf/vconf.h"
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <thread>

using Settings = PlatformTest;

TEST_F(Settings, ValuesAreTypedAndSharedBetweenProcesses)
{
    int truth = 7;
    EXPECT_EQ(vconf_get_bool("db/a", &truth), -1);
    EXPECT_EQ(truth, 7);
    EXPECT_EQ(vconf_get_str("db/a"), nullptr);
    EXPECT_EQ(vconf_set_str("", "x"), -1);
    EXPECT_EQ(vconf_set_str("db/a", nullptr), -1);
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
    Db db;
    ASSERT_TRUE(db.open(platform_data_dir() + "/settings.db", nullptr));
    ASSERT_TRUE(db.run("UPDATE setting SET boot = 'an earlier start' WHERE boot IS NOT NULL"));
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
                 {"ko_KR.UTF-8", "fr_FR.UTF-8", "", "ko_KR.UTF-8"},
                 {"C", "", "de_DE.UTF-8", "(null)"},
                 {"", "POSIX", "", "(null)"},
                 {"", "", "C.UTF-8", "(null)"}};
    for (const auto &c : cases) {
        setenv("LC_ALL", c.all, 1);
        setenv("LC_MESSAGES", c.messages, 1);
        setenv("LANG", c.lang, 1);
        EXPECT_EQ(taken(vconf_get_str("db/menu_widget/language")), c.language) << c.all << c.messages << c.lang;
    }
    vconf_set_str("db/menu_widget/language", "es_ES.UTF-8");
    EXPECT_EQ(taken(vconf_get_str("db/menu_widget/language")), "es_ES.UTF-8");

    bool on = false;
    setenv("LC_ALL", "C", 1);
    EXPECT_EQ(runtime_info_get_value_bool(RUNTIME_INFO_KEY_24HOUR_CLOCK_FORMAT_ENABLED, &on), 0);
    EXPECT_TRUE(on);
    if (const locale_t american = newlocale(LC_TIME_MASK, "en_US.UTF-8", nullptr)) {
        freelocale(american);
        setenv("LC_ALL", "en_US.UTF-8", 1);
        EXPECT_EQ(runtime_info_get_value_bool(RUNTIME_INFO_KEY_24HOUR_CLOCK_FORMAT_ENABLED, &on), 0);
        EXPECT_FALSE(on);
    }
    setenv("LC_ALL", "xx_XX.UTF-8", 1);
    EXPECT_EQ(runtime_info_get_value_bool(RUNTIME_INFO_KEY_24HOUR_CLOCK_FORMAT_ENABLED, &on),
              RUNTIME_INFO_ERROR_IO_ERROR);
    for (const bool set : {false, true}) {
        vconf_set_bool("db/menu_widget/regionformat_24hour", set);
        EXPECT_EQ(runtime_info_get_value_bool(RUNTIME_INFO_KEY_24HOUR_CLOCK_FORMAT_ENABLED, &on), 0);
        EXPECT_EQ(on, set);
    }
    setenv("LC_ALL", "C", 1);
}

TEST(MimeType, ByExtension)
{
    const struct {
        const char *extension, *type;
    } cases[] = {{"jpg", "image/jpeg"},
                 {"JPG", "image/jpeg"},
                 {"pdf", "application/pdf"},
                 {"txt", "text/plain"},
                 {"mp4", "video/mp4"},
                 {"tar.gz", "application/x-compressed-tar"},
                 {"no-such-type", "-"},
                 {"", "-"},
                 {"x/jpg", "-"}};
    for (const auto &c : cases) {
        char *type = nullptr;
        const int result = mime_type_get_mime_type(c.extension, &type);
        EXPECT_EQ(result == MIME_TYPE_ERROR_NONE ? taken(type) : "-", c.type) << c.extension;
    }
    EXPECT_EQ(mime_type_get_mime_type(nullptr, nullptr), MIME_TYPE_ERROR_INVALID_PARAMETER);
}

enum class Stream { pipe, journal, terminal };

// What a fresh process writes to such a standard error.
static std::string logged(Stream stream, const char *level, int priority, const char *text)
{
    int ends[2];
    if (stream == Stream::terminal) {
        ends[0] = posix_openpt(O_RDWR | O_NOCTTY);
        grantpt(ends[0]);
        unlockpt(ends[0]);
        ends[1] = open(ptsname(ends[0]), O_RDWR | O_NOCTTY);
    } else if (pipe(ends) != 0) {
        return "no pipe";
    }
    if (fork() == 0) {
        dup2(ends[1], STDERR_FILENO);
        struct stat file = {};
        fstat(STDERR_FILENO, &file);
        setenv("DLOG_LEVEL", level, 1);
        unsetenv("JOURNAL_STREAM");
        if (stream == Stream::journal)
            setenv("JOURNAL_STREAM", (std::to_string(file.st_dev) + ":" + std::to_string(file.st_ino)).c_str(), 1);
        __dlog_print(priority, "TAG", "%s", text);
        _exit(0);
    }
    wait(nullptr);
    char bytes[8192];
    if (stream == Stream::terminal)
        fcntl(ends[0], F_SETFL, O_NONBLOCK);
    else
        close(ends[1]);
    const ssize_t count = read(ends[0], bytes, sizeof bytes);
    close(ends[0]);
    std::string line(bytes, static_cast<size_t>(std::max<ssize_t>(count, 0)));
    return stream == Stream::journal || line.empty() ? line : line.substr(13); // without the time
}

TEST(Log, LinesByKindOfStream)
{
    const struct {
        Stream stream;
        const char *level;
        int priority;
        std::string text, line;
    } cases[] = {
        {Stream::pipe, "", DLOG_ERROR, "plain", "E/TAG plain\n"},
        {Stream::pipe, "", DLOG_INFO, "chatter", ""},
        {Stream::pipe, "info", DLOG_INFO, "chatter", "I/TAG chatter\n"},
        {Stream::pipe, "error", DLOG_WARN, "quiet", ""},
        {Stream::journal, "", DLOG_ERROR, "plain", "<3>TAG: plain\n"},
        {Stream::journal, "debug", DLOG_DEBUG, "plain", "<7>TAG: plain\n"},
        {Stream::pipe, "", DLOG_ERROR, "a\n<0>forged\rline\n", "E/TAG a\\n<0>forged\\x0dline\n"},
        {Stream::pipe, "", DLOG_ERROR, "\x1b[0;31m* Critical * x\x1b[0;m", "E/TAG * Critical * x\n"},
        {Stream::terminal, "", DLOG_ERROR, "\x1b[0;31mred\x1b[0;m", "E/TAG \x1b[0;31mred\x1b[0;m\r\n"},
        {Stream::terminal, "", DLOG_ERROR, "\x1b]0;title\a\x1b[2J\xc2\x9b",
         "E/TAG \\x1b]0;title\\x07\\x1b[2J\\x9b\r\n"},
        {Stream::pipe, "", DLOG_ERROR, std::string(3999, 'x') + "\xc3\xa4\xc3\xa4",
         "E/TAG " + std::string(3999, 'x') + "\xc3\xa4...\n"},
    };
    for (const auto &c : cases)
        EXPECT_EQ(logged(c.stream, c.level, c.priority, c.text.c_str()), c.line) << c.text;
}

TEST(Log, SinkGetsEverythingOneAtATime)
{
    static int running, calls;
    static std::string last;
    running = calls = 0;
    const auto sink = [](int priority, const char *tag, const char *text, void *) {
        EXPECT_EQ(++running, 1);
        last = std::string(tag) + std::to_string(priority) + text;
        calls++;
        running--;
    };
    dlog_set_sink(sink, nullptr);
    std::thread threads[3];
    for (auto &thread : threads)
        thread = std::thread([] {
            for (int i = 0; i < 1000; i++)
                __dlog_print(DLOG_DEBUG, "T", "\x1b[0;31m%s\x1b[0;m\n", std::string(600, 'y').c_str());
        });
    for (auto &thread : threads)
        thread.join();
    dlog_set_sink(nullptr, nullptr);
    EXPECT_EQ(calls, 3000);
    EXPECT_EQ(last, "T3\x1b[0;31m" + std::string(600, 'y') + "\x1b[0;m\n");
}
