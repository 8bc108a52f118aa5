#include "dlog/dlog.h"
#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <mutex>
#include <string>
#include <sys/stat.h>
#include <unistd.h>

namespace {

// Below PIPE_BUF, so that a line is written whole to a pipe too.
constexpr size_t TEXT_LIMIT = 4000;

struct Output {
    bool journal = false;
    bool terminal = false;
    int threshold = DLOG_WARN;
};

bool is_journal_stream()
{
    const char *stream = std::getenv("JOURNAL_STREAM");
    unsigned long long device = 0, inode = 0;
    struct stat file = {};
    return stream && std::sscanf(stream, "%llu:%llu", &device, &inode) == 2 && fstat(STDERR_FILENO, &file) == 0 &&
           file.st_dev == device && file.st_ino == inode;
}

const Output &output()
{
    static const Output found = [] {
        Output out;
        out.journal = is_journal_stream();
        out.terminal = isatty(STDERR_FILENO) == 1;
        static constexpr struct {
            const char *name;
            int priority;
        } levels[] = {{"error", DLOG_ERROR},
                      {"warn", DLOG_WARN},
                      {"info", DLOG_INFO},
                      {"debug", DLOG_DEBUG},
                      {"verbose", DLOG_VERBOSE}};
        const char *level = std::getenv("DLOG_LEVEL");
        for (const auto &l : levels)
            if (level && std::strcmp(level, l.name) == 0)
                out.threshold = l.priority;
        return out;
    }();
    return found;
}

int journal_priority(int priority)
{
    switch (priority) {
    case DLOG_FATAL:
        return 2;
    case DLOG_ERROR:
        return 3;
    case DLOG_WARN:
        return 4;
    case DLOG_INFO:
        return 6;
    default:
        return 7;
    }
}

// The length of the colour sequence "\e[0;31m" that `text` begins with, or 0.
size_t colour_length(const char *text)
{
    if (text[0] != '\x1b' || text[1] != '[')
        return 0;
    const size_t digits = std::strspn(text + 2, "0123456789;");
    return text[2 + digits] == 'm' ? digits + 3 : 0;
}

void append_plain(std::string &line, const char *text, bool colours)
{
    const size_t end = line.size() + TEXT_LIMIT;
    while (*text) {
        if (line.size() >= end && (*text & 0xc0) != 0x80) {
            line += "...";
            return;
        }
        if (const size_t length = colour_length(text)) {
            if (colours)
                line.append(text, length);
            text += length;
            continue;
        }
        const auto byte = static_cast<unsigned char>(*text);
        const auto next = static_cast<unsigned char>(text[1]);
        const bool second_set = byte == 0xc2 && next >= 0x80 && next < 0xa0; // U+0080 to U+009F, controls as well
        if (byte == '\n')
            line += "\\n";
        else if (byte == '\t')
            line += "\\t";
        else if (byte < 0x20 || byte == 0x7f || second_set) {
            char escape[8];
            std::snprintf(escape, sizeof escape, "\\x%02x", second_set ? next : byte);
            line += escape;
            text += second_set ? 1 : 0;
        } else
            line += *text;
        text++;
    }
}

std::string format_line(int priority, const char *tag, std::string text)
{
    const Output &out = output();
    std::string line;
    if (out.journal) {
        line = "<" + std::to_string(journal_priority(priority)) + ">";
    } else {
        struct timespec now = {};
        struct tm local = {};
        clock_gettime(CLOCK_REALTIME, &now);
        localtime_r(&now.tv_sec, &local);
        char stamp[32];
        const size_t length = std::strftime(stamp, sizeof stamp, "%H:%M:%S", &local);
        std::snprintf(stamp + length, sizeof stamp - length, ".%03ld ", now.tv_nsec / 1000000);
        line = stamp;
        line += "VVVDIWEFF"[priority < 0 ? 0 : priority > 8 ? 8 : priority];
        line += '/';
    }
    append_plain(line, tag, false);
    line += out.journal ? ": " : " ";
    if (!text.empty() && text.back() == '\n')
        text.pop_back();
    append_plain(line, text.c_str(), out.terminal && !out.journal);
    line += '\n';
    return line;
}

std::recursive_mutex sink_lock;
std::atomic<dlog_sink> sink{nullptr};
void *sink_data = nullptr;

} // namespace

void dlog_set_sink(dlog_sink new_sink, void *data)
{
    const std::lock_guard hold(sink_lock);
    sink_data = data;
    sink = new_sink;
}

int __dlog_print(int priority, const char *tag, const char *format, ...)
{
    if (!format)
        return -1;
    if (!sink && priority < output().threshold)
        return 0;
    const int saved = errno;
    va_list args, again;
    va_start(args, format);
    va_copy(again, args);
    char small[512];
    std::string text;
    const int length = std::vsnprintf(small, sizeof small, format, args);
    if (length >= static_cast<int>(sizeof small)) {
        text.resize(static_cast<size_t>(length) + 1);
        std::vsnprintf(text.data(), text.size(), format, again);
        text.pop_back();
    } else if (length > 0) {
        text = small;
    }
    va_end(again);
    va_end(args);

    if (sink) {
        const std::lock_guard hold(sink_lock);
        if (const dlog_sink run = sink) {
            run(priority, tag ? tag : "", text.c_str(), sink_data);
            errno = saved;
            return 0;
        }
    }
    if (priority < output().threshold)
        return 0;
    const std::string line = format_line(priority, tag ? tag : "", std::move(text));
    const ssize_t written = write(STDERR_FILENO, line.data(), line.size());
    errno = saved;
    return written < 0 ? -1 : static_cast<int>(written);
}
