// Lists the posted notifications and taps them, from a shell.
#include "base/base.h"
#include "notification/courier.h"
#include "notification/tap.h"
#include <chrono>
#include <cstdio>
#include <cstring>
#include <string_view>
#include <thread>

namespace {

constexpr const char *USAGE = "Usage: notifications list [--package PACKAGE] [--wait-for TEXT] [--seconds N]\n"
                              "       notifications tap PACKAGE ID\n"
                              "\n"
                              "\"list\" prints each posted notification on a line: its id, \"normal\" or \"ongoing\", "
                              "title, content and progress\n"
                              "from 0 to 100, with tabs between. \"tap\" does what a tap on the notification does.\n"
                              "\n"
                              "  --package PACKAGE  those of one application\n"
                              "  --wait-for TEXT    waits until a line contains TEXT, and prints the lines then\n"
                              "  --seconds N        waits N seconds at most, instead of 30\n"
                              "  --help             shows this\n"
                              "\n"
                              "Exit status: 0 done, 1 no such notification or the time is over, 2 wrong arguments.\n";

// A field of a line, without the characters that end fields and lines.
std::string field(const notification_s::Text &text)
{
    std::string result = text.value_or("");
    for (char &c : result)
        if (static_cast<unsigned char>(c) < 0x20)
            c = ' ';
    return result;
}

std::string line(const notification_s &noti)
{
    const auto text = [&noti](int type) { return field(noti.texts[text_index(type)]); };
    return std::to_string(noti.id) + (noti.type == NOTIFICATION_TYPE_ONGOING ? "\tongoing\t" : "\tnormal\t") +
           text(NOTIFICATION_TEXT_TYPE_TITLE) + '\t' + text(NOTIFICATION_TEXT_TYPE_CONTENT) + '\t' +
           std::to_string(static_cast<int>(noti.progress * 100.0 + 0.5));
}

int list(const char *package, const char *wait_for, int seconds)
{
    const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(seconds);
    for (;;) {
        std::string lines;
        bool found = !wait_for;
        for (const notification_s &noti : store_list(package)) {
            const std::string text = line(noti);
            found = found || text.find(wait_for) != text.npos;
            lines += text + '\n';
        }
        const bool over = std::chrono::steady_clock::now() >= limit;
        if (found || over) {
            std::fputs(lines.c_str(), stdout);
            if (!found)
                std::fprintf(stderr, "notifications: no \"%s\" within %d seconds\n", wait_for, seconds);
            return found ? 0 : 1;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(100));
    }
}

int tap_one(const char *package, int id)
{
    const auto found = store_list(package, id);
    if (found.empty()) {
        std::fprintf(stderr, "notifications: %s has no notification %d\n", package, id);
        return 1;
    }
    const bool sent = tap(found.front());
    if (!sent)
        std::fprintf(stderr, "notifications: the launch request cannot be sent\n");
    courier_changed();
    tap_finish();
    return sent ? 0 : 1;
}

int number(const char *text)
{
    char *end = nullptr;
    const long value = std::strtol(text, &end, 10);
    return end != text && !*end && value > 0 && value < 1'000'000'000 ? static_cast<int>(value) : 0;
}

} // namespace

int main(int argc, char **argv)
{
    const std::string_view command = argc > 1 ? argv[1] : "";
    if (command == "--help" || command == "-h") {
        std::fputs(USAGE, stdout);
        return 0;
    }
    if (command == "tap" && argc == 4 && number(argv[3]))
        return tap_one(argv[2], number(argv[3]));
    const char *package = nullptr, *wait_for = nullptr;
    int seconds = 30;
    bool usable = command == "list" && argc % 2 == 0;
    for (int i = 2; usable && i < argc; i += 2) {
        const std::string_view name = argv[i];
        if (name == "--package")
            package = argv[i + 1];
        else if (name == "--wait-for")
            wait_for = argv[i + 1];
        else if (name == "--seconds")
            seconds = number(argv[i + 1]);
        else
            usable = false;
        usable = usable && seconds > 0;
    }
    if (usable)
        return list(package, wait_for, seconds);
    std::fputs(USAGE, stderr);
    return 2;
}
