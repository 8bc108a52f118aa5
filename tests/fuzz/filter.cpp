// The media filter: what the parser lets through is a statement that SQLite takes, in which the text is values alone.
#include "fuzz.h"
#include "media_content/condition.h"
#include <sqlite3.h>

static sqlite3 *database()
{
    static sqlite3 *db = [] {
        sqlite3 *made = nullptr;
        sqlite3_open(":memory:", &made);
        sqlite3_exec(made, "CREATE TABLE media(type INTEGER, timeline INTEGER, path TEXT, name TEXT)", nullptr, nullptr,
                     nullptr);
        return made;
    }();
    return db;
}

static void check(const std::string &sql, size_t values)
{
    must(sql.find_first_of("'\";-") == sql.npos);
    sqlite3_stmt *stmt = nullptr;
    must(sqlite3_prepare_v2(database(), sql.c_str(), -1, &stmt, nullptr) == SQLITE_OK);
    must(static_cast<size_t>(sqlite3_bind_parameter_count(stmt)) == values);
    sqlite3_finalize(stmt);
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    if (size == 0)
        return 0;
    const auto collate = data[0] & 1 ? MEDIA_CONTENT_COLLATE_NOCASE : MEDIA_CONTENT_COLLATE_DEFAULT;
    const std::string text(reinterpret_cast<const char *>(data) + 1, size - 1);
    if (const auto condition = media_parse_condition(text.c_str(), collate))
        check("SELECT 1 FROM media WHERE " + condition->sql, condition->values.size());
    if (const auto order = media_parse_order(text.c_str(), MEDIA_CONTENT_ORDER_DESC, collate))
        check("SELECT 1 FROM media ORDER BY " + *order, 0);
    return 0;
}
