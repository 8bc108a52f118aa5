#include "app/language.h"
#include "base/base.h"
#include "vconf/vconf.h"
#include <clocale>
#include <cstdlib>
#include <string>

extern "C" int _nl_msg_cat_cntr; // gettext's own: a changed LANGUAGE counts from the next change of this on

namespace {
constexpr char neutral[] = "C.UTF-8"; // unlike "C" it lets gettext look for catalogues

std::string environment(const char *name)
{
    const char *value = std::getenv(name);
    return value ? value : "";
}

bool is_language(const std::string &locale)
{
    const std::string name = locale.substr(0, locale.find_first_of(".@"));
    return !name.empty() && name != "C" && name != "POSIX";
}

// "de_AT.UTF-8" gives "de_AT:de:en"; what a list names already is not added again.
std::string catalogue_list(const std::string &locale)
{
    if (!is_language(locale))
        return "en";
    const std::string name = locale.substr(0, locale.find_first_of(".@"));
    const std::string language = name.substr(0, name.find('_'));
    std::string list = name;
    if (language != name)
        list += ":" + language;
    return language == "en" ? list : list + ":en";
}
} // namespace

bool language_apply()
{
    static std::string applied;
    static const std::string user_list = environment("LANGUAGE");
    static const std::string user_locale = [] {
        for (const char *name : {"LC_ALL", "LC_MESSAGES", "LANG"})
            if (std::string value = environment(name); !value.empty())
                return value;
        return std::string();
    }();
    const CString set(vconf_get_str("db/menu_widget/language"));
    const bool chosen = set && is_language(set.get());
    const std::string locale = chosen ? set.get() : user_locale;

    std::string list = catalogue_list(locale);
    if (!chosen && !user_list.empty() && is_language(user_locale))
        list = (":" + user_list + ":").find(":en:") == std::string::npos ? user_list + ":en" : user_list;
    setenv("LANGUAGE", list.c_str(), 1);
    ++_nl_msg_cat_cntr; // setlocale does it only when the name of the locale is another one
    if (chosen) {
        unsetenv("LC_ALL");
        setenv("LANG", locale.c_str(), 1);
        setenv("LC_MESSAGES", locale.c_str(), 1);
    }
    const bool known = std::setlocale(LC_ALL, "") != nullptr;
    for (const auto &[category, name] : {std::pair{LC_MESSAGES, "LC_MESSAGES"}, std::pair{LC_CTYPE, "LC_CTYPE"}}) {
        const char *now = std::setlocale(category, nullptr);
        if (known && now && is_language(now))
            continue;
        // later calls of setlocale(LC_ALL, "") must find the same
        unsetenv("LC_ALL");
        setenv(name, neutral, 1);
        std::setlocale(category, neutral);
    }
    if (!known)
        std::setlocale(LC_ALL, "");
    const bool changed = !applied.empty() && applied != list;
    applied = list;
    return changed;
}
