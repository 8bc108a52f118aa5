#include "vconf/vconf.h"
#include "base/base.h"
#include <cstring>
#include <vector>

namespace {

constexpr const char *LANGUAGE_KEY = "db/menu_widget/language";

constexpr const char *SCHEMA = "CREATE TABLE IF NOT EXISTS setting ("
                               " key TEXT PRIMARY KEY, is_bool INTEGER NOT NULL, value TEXT NOT NULL, boot TEXT)";

Db *store()
{
    return platform_thread_db("settings.db", SCHEMA);
}

bool usable(const char *key)
{
    return key && *key;
}

int set(const char *key, bool is_bool, const char *value)
{
    Db *db = store();
    if (!db)
        return -1;
    Stmt insert(*db, "INSERT OR REPLACE INTO setting (key, is_bool, value, boot) VALUES (?1, ?2, ?3, ?4)");
    insert.bind(1, key).bind(2, is_bool ? 1LL : 0LL).bind(3, value);
    if (std::strncmp(key, "memory/", 7) == 0)
        insert.bind(4, platform_boot_id());
    return insert.done() ? 0 : -1;
}

bool get(const char *key, bool is_bool, std::string &value)
{
    Db *db = store();
    if (!db)
        return false;
    Stmt select(*db, "SELECT value FROM setting WHERE key = ?1 AND is_bool = ?2 AND (boot IS NULL OR boot = ?3)");
    select.bind(1, key).bind(2, is_bool ? 1LL : 0LL).bind(3, platform_boot_id());
    if (!select.row())
        return false;
    value = select.text(0);
    return true;
}

// By the variables alone: setlocale may not have been called, and its answer belongs to another thread's next call.
const char *locale_language()
{
    for (const char *name : {"LC_ALL", "LC_MESSAGES", "LANG"})
        if (const char *value = std::getenv(name); value && *value) {
            const bool none =
                std::strcmp(value, "C") == 0 || std::strcmp(value, "POSIX") == 0 || std::strncmp(value, "C.", 2) == 0;
            return none ? nullptr : value;
        }
    return nullptr;
}

} // namespace

int vconf_get_bool(const char *key, int *value)
{
    std::string text;
    if (!usable(key) || !value || !get(key, true, text))
        return -1;
    *value = text == "true" ? 1 : 0;
    return 0;
}

char *vconf_get_str(const char *key)
{
    if (!usable(key))
        return nullptr;
    if (std::string text; get(key, false, text))
        return strdup(text.c_str());
    const char *fallback = std::strcmp(key, LANGUAGE_KEY) == 0 ? locale_language() : nullptr;
    return fallback ? strdup(fallback) : nullptr;
}

int vconf_set_bool(const char *key, int value)
{
    return usable(key) ? set(key, true, value ? "true" : "false") : -1;
}

int vconf_set_str(const char *key, const char *value)
{
    return usable(key) && value ? set(key, false, value) : -1;
}

int vconf_unset(const char *key)
{
    Db *db = usable(key) ? store() : nullptr;
    if (!db)
        return -1;
    Stmt remove(*db, "DELETE FROM setting WHERE key = ?1 RETURNING boot IS NULL OR boot = ?2");
    remove.bind(1, key).bind(2, platform_boot_id());
    const bool had_value = remove.row() && remove.integer(0);
    return remove.done() && had_value ? 0 : -1;
}

int vconf_foreach(vconf_foreach_cb callback, void *user_data)
{
    Db *db = callback ? store() : nullptr;
    if (!db)
        return -1;
    struct Setting {
        std::string key, value;
        bool is_bool;
    };
    std::vector<Setting> settings;
    Stmt select(*db, "SELECT key, value, is_bool FROM setting WHERE boot IS NULL OR boot = ?1 ORDER BY key");
    select.bind(1, platform_boot_id());
    while (select.row())
        settings.push_back({select.text(0), select.text(1), select.integer(2) != 0});
    select.reset();
    for (const Setting &s : settings)
        if (!callback(s.key.c_str(), s.value.c_str(), s.is_bool, user_data))
            break;
    return 0;
}
