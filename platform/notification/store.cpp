#include "notification/store.h"
#include "base/base.h"
#include <fstream>
#include <unistd.h>

namespace {

// `boot` names the start of the machine after which a volatile notification is void. AUTOINCREMENT keeps the id of a
// deleted notification from becoming another one's while somebody still holds it.
constexpr const char *SCHEMA =
    "CREATE TABLE IF NOT EXISTS notification ("
    " id INTEGER PRIMARY KEY AUTOINCREMENT, package TEXT NOT NULL, type INTEGER NOT NULL, flags INTEGER NOT NULL,"
    " layout INTEGER NOT NULL, places INTEGER NOT NULL, progress REAL NOT NULL, title TEXT, content TEXT, info TEXT,"
    " info_sub TEXT, icon TEXT, indicator TEXT, launch TEXT, boot TEXT, closed INTEGER NOT NULL DEFAULT 0);"
    // Who posted an ongoing notification. The time of its start tells a process from a later one of the same number.
    "CREATE TABLE IF NOT EXISTS poster (id INTEGER PRIMARY KEY, pid INTEGER NOT NULL, started INTEGER NOT NULL);"
    // What an ongoing notification becomes when its poster is gone.
    "CREATE TABLE IF NOT EXISTS heir (id INTEGER PRIMARY KEY, content TEXT NOT NULL)";

Db *store()
{
    return platform_thread_db("notifications.db", SCHEMA);
}

void bind(Stmt &statement, int index, const notification_s::Text &text)
{
    if (text)
        statement.bind(index, *text);
}

notification_s::Text read(const Stmt &statement, int column)
{
    if (statement.null(column))
        return std::nullopt;
    return statement.text(column);
}

// When a process was started, in clock ticks since the machine's start (proc(5), /proc/PID/stat, field 22); 0 when it
// is gone.
long long started(long long pid)
{
    std::ifstream file("/proc/" + std::to_string(pid) + "/stat");
    std::string stat;
    std::getline(file, stat);
    size_t at = stat.rfind(')'); // the name before it may hold anything
    if (at == stat.npos || at + 2 >= stat.size() || stat[at + 2] == 'Z')
        return 0;
    for (int field = 2; field < 22 && at != stat.npos; field++)
        at = stat.find(' ', at + 1);
    return at == stat.npos ? 0 : std::strtoll(stat.c_str() + at, nullptr, 10);
}

bool remember_poster(const Db &db, long long id, const notification_s::Text &heir)
{
    const long long pid = getpid();
    Stmt poster(db, "INSERT OR REPLACE INTO poster VALUES (?1, ?2, ?3)");
    if (!poster.bind(1, id).bind(2, pid).bind(3, started(pid)).done())
        return false;
    return !heir || Stmt(db, "INSERT OR REPLACE INTO heir VALUES (?1, ?2)").bind(1, id).bind(2, *heir).done();
}

// Runs a change of one notification; true when there was one.
bool change(Db &db, Stmt &statement, bool &failed)
{
    failed = !statement.done();
    return !failed && sqlite3_changes(db.handle.get()) > 0;
}

} // namespace

int text_index(int type)
{
    switch (type) {
    case NOTIFICATION_TEXT_TYPE_TITLE:
        return 0;
    case NOTIFICATION_TEXT_TYPE_CONTENT:
        return 1;
    case NOTIFICATION_TEXT_TYPE_INFO_1:
        return 2;
    case NOTIFICATION_TEXT_TYPE_INFO_SUB_2:
        return 3;
    default:
        return -1;
    }
}

bool store_insert(notification_s &noti)
{
    Db *db = store();
    if (!db)
        return false;
    Stmt(*db, "DELETE FROM notification WHERE boot <> ?1").bind(1, platform_boot_id()).done();
    // A process that is killed here must not leave one behind that has no poster: nobody would take it away.
    Transaction transaction(*db);
    if (!transaction.begun())
        return false;
    Stmt insert(*db, "INSERT INTO notification (package, type, flags, layout, places, progress, title, content, info,"
                     " info_sub, icon, indicator, launch, boot)"
                     " VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10, ?11, ?12, ?13, ?14) RETURNING id");
    insert.bind(1, noti.package);
    int index = 2;
    for (const int number : {noti.type, noti.flags, noti.layout, noti.places})
        insert.bind(index++, static_cast<long long>(number));
    insert.bind(index++, noti.progress);
    for (const auto &text : noti.texts)
        bind(insert, index++, text);
    for (const auto &image : noti.images)
        bind(insert, index++, image);
    if (noti.launch)
        insert.bind(index, noti.launch->text);
    // An heir is to be there after the machine's next start, whatever becomes of the ongoing one.
    if (noti.flags & NOTIFICATION_PROP_VOLATILE_DISPLAY && !noti.heir)
        insert.bind(index + 1, platform_boot_id());
    if (!insert.row())
        return false;
    const int id = static_cast<int>(insert.integer(0));
    if (!insert.done())
        return false;
    if (noti.type == NOTIFICATION_TYPE_ONGOING && !remember_poster(*db, id, noti.heir))
        return false;
    if (!transaction.commit())
        return false;
    noti.id = id;
    return true;
}

bool store_forget_orphans()
{
    Db *db = store();
    if (!db)
        return false;
    std::vector<long long> orphans;
    Stmt posters(*db, "SELECT id, pid, started FROM poster");
    while (posters.row())
        if (started(posters.integer(1)) != posters.integer(2))
            orphans.push_back(posters.integer(0));
    posters.reset();
    bool changed = false;
    for (const long long id : orphans) {
        Stmt inherit(*db,
                     "UPDATE notification SET type = ?2, flags = 0, layout = ?3, progress = 0, closed = 0, content ="
                     " (SELECT content FROM heir WHERE heir.id = ?1) WHERE id = ?1 AND id IN (SELECT id FROM heir)");
        inherit.bind(1, id)
            .bind(2, static_cast<long long>(NOTIFICATION_TYPE_NOTI))
            .bind(3, static_cast<long long>(NOTIFICATION_LY_NOTI_EVENT_SINGLE));
        Stmt remove(*db, "DELETE FROM notification WHERE id = ?1 AND id NOT IN (SELECT id FROM heir)");
        bool failed = false;
        changed = change(*db, inherit, failed) || changed;
        changed = change(*db, remove.bind(1, id), failed) || changed;
        Stmt(*db, "DELETE FROM heir WHERE id = ?1").bind(1, id).done();
        Stmt(*db, "DELETE FROM poster WHERE id = ?1").bind(1, id).done();
    }
    return changed;
}

std::vector<notification_s> store_list(const char *package, int id)
{
    std::vector<notification_s> list;
    Db *db = store();
    if (!db)
        return list;
    if (id == 0)
        store_forget_orphans();
    Stmt select(*db, "SELECT id, package, type, flags, layout, places, progress, title, content, info, info_sub, icon,"
                     " indicator, launch, closed FROM notification WHERE (?1 IS NULL OR package = ?1)"
                     " AND (?2 = 0 OR id = ?2) AND (boot IS NULL OR boot = ?3) ORDER BY id");
    select.bind(1, package).bind(2, static_cast<long long>(id)).bind(3, platform_boot_id());
    while (select.row()) {
        notification_s &noti = list.emplace_back();
        noti.id = static_cast<int>(select.integer(0));
        noti.package = select.text(1);
        int column = 2;
        for (int *number : {&noti.type, &noti.flags, &noti.layout, &noti.places})
            *number = static_cast<int>(select.integer(column++));
        noti.progress = select.real(column++);
        for (auto &text : noti.texts)
            text = read(select, column++);
        for (auto &image : noti.images)
            image = read(select, column++);
        if (const auto launch = read(select, column++))
            noti.launch = bundle{*launch};
        noti.closed = select.integer(column) != 0;
    }
    return list;
}

bool store_set_content(const std::string &package, int id, const char *content, bool &failed)
{
    Db *db = store();
    failed = !db;
    if (!db)
        return false;
    Stmt update(*db, "UPDATE notification SET content = ?3 WHERE id = ?1 AND package = ?2");
    update.bind(1, static_cast<long long>(id)).bind(2, package).bind(3, content);
    return change(*db, update, failed);
}

bool store_set_progress(const std::string &package, int id, double progress, bool &failed)
{
    Db *db = store();
    failed = !db;
    if (!db)
        return false;
    Stmt update(*db, "UPDATE notification SET progress = ?3 WHERE id = ?1 AND package = ?2");
    update.bind(1, static_cast<long long>(id)).bind(2, package).bind(3, progress);
    return change(*db, update, failed);
}

bool store_delete(const std::string &package, int id, bool &failed)
{
    Db *db = store();
    failed = !db;
    if (!db)
        return false;
    Stmt remove(*db, "DELETE FROM notification WHERE id = ?1 AND package = ?2");
    remove.bind(1, static_cast<long long>(id)).bind(2, package);
    return change(*db, remove, failed);
}

bool store_delete_type(const std::string &package, int type)
{
    Db *db = store();
    if (!db)
        return false;
    Stmt remove(*db, "DELETE FROM notification WHERE package = ?1 AND (?2 = -1 OR type = ?2)");
    return remove.bind(1, package).bind(2, static_cast<long long>(type)).done();
}

void store_set_closed(int id)
{
    if (Db *db = store())
        Stmt(*db, "UPDATE notification SET closed = 1 WHERE id = ?1").bind(1, static_cast<long long>(id)).done();
}

long long store_version()
{
    Db *db = store();
    if (!db)
        return 0;
    Stmt version(*db, "PRAGMA data_version");
    return version.row() ? version.integer(0) : 0;
}
