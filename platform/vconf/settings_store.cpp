// Reads and changes the settings store from a shell.
#include "base/base.h"
#include "vconf/vconf.h"
#include <cstdio>
#include <string_view>

namespace {

constexpr const char *USAGE = "Usage: settings-store get KEY\n"
                              "       settings-store set KEY VALUE\n"
                              "       settings-store unset KEY\n"
                              "       settings-store list\n"
                              "\n"
                              "Reads and changes the user's settings. The values true and false are stored as truth\n"
                              "values, any other as text; with --text before KEY they are text too.\n"
                              "\n"
                              "  --help  shows this\n"
                              "\n"
                              "Exit status: 0 done, 1 no such setting or the store failed, 2 wrong arguments.\n";

int get(const char *key)
{
    int truth = 0;
    if (vconf_get_bool(key, &truth) == 0) {
        std::puts(truth ? "true" : "false");
        return 0;
    }
    const CString text(vconf_get_str(key));
    if (!text) {
        std::fprintf(stderr, "settings-store: %s is not set\n", key);
        return 1;
    }
    std::puts(text.get());
    return 0;
}

int set(const char *key, std::string_view value, bool as_text)
{
    const bool truth = !as_text && (value == "true" || value == "false");
    if ((truth ? vconf_set_bool(key, value == "true") : vconf_set_str(key, value.data())) == 0)
        return 0;
    std::fprintf(stderr, "settings-store: %s cannot be set\n", key);
    return 1;
}

bool print(const char *key, const char *value, bool, void *)
{
    std::printf("%s = %s\n", key, value);
    return true;
}

} // namespace

int main(int argc, char **argv)
{
    const std::string_view command = argc > 1 ? argv[1] : "";
    if (command == "--help" || command == "-h") {
        std::fputs(USAGE, stdout);
        return 0;
    }
    const bool as_text = argc == 5 && command == "set" && std::string_view(argv[2]) == "--text";
    char **words = argv + (as_text ? 3 : 2);
    const int count = argc - (as_text ? 3 : 2);
    if (command == "get" && count == 1 && *words[0])
        return get(words[0]);
    if (command == "set" && count == 2 && *words[0])
        return set(words[0], words[1], as_text);
    if (command == "unset" && count == 1 && *words[0]) {
        if (vconf_unset(words[0]) == 0)
            return 0;
        std::fprintf(stderr, "settings-store: %s is not set\n", words[0]);
        return 1;
    }
    if (command == "list" && count == 0)
        return vconf_foreach(print, nullptr) == 0 ? 0 : 1;
    std::fputs(USAGE, stderr);
    return 2;
}
