#include "cloud_content_sync/account.h"
#include "cloud_content_sync/cache.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "cloud_content_sync/names.h"
#include "cloud_content_sync/secrets.h"
#include "dlog/dlog.h"
#include <sys/stat.h>
#include <unordered_set>

namespace cloud {

static constexpr char SCHEMA[] = R"(
CREATE TABLE IF NOT EXISTS setting(key TEXT PRIMARY KEY, value TEXT NOT NULL) WITHOUT ROWID;
CREATE TABLE IF NOT EXISTS account_setting(account TEXT NOT NULL, key TEXT NOT NULL, value INTEGER NOT NULL,
    PRIMARY KEY(account, key)) WITHOUT ROWID;
CREATE TABLE IF NOT EXISTS folder(path TEXT PRIMARY KEY, parent TEXT NOT NULL, name TEXT NOT NULL,
    sort TEXT NOT NULL) WITHOUT ROWID;
CREATE INDEX IF NOT EXISTS folder_order ON folder(parent, sort, name);
CREATE TABLE IF NOT EXISTS content(parent TEXT NOT NULL, name TEXT NOT NULL, sort TEXT NOT NULL, size INTEGER NOT NULL,
    mtime INTEGER NOT NULL, etag TEXT NOT NULL, PRIMARY KEY(parent, name)) WITHOUT ROWID;
CREATE INDEX IF NOT EXISTS content_order ON content(parent, sort, name);
CREATE TABLE IF NOT EXISTS upload(id INTEGER PRIMARY KEY, account TEXT NOT NULL, local_path TEXT NOT NULL,
    server_path TEXT NOT NULL, state INTEGER NOT NULL, target TEXT NOT NULL, at INTEGER NOT NULL);
CREATE UNIQUE INDEX IF NOT EXISTS upload_paths ON upload(account, local_path, server_path);
)";
static constexpr char INSERT_CONTENT[] =
    "INSERT OR REPLACE INTO content(parent, name, sort, size, mtime, etag) VALUES(?, ?, ?, ?, ?, ?)";

Account::Account(Service description) : service(std::move(description)) {}

bool Account::open()
{
    const std::string path = cloud_data_dir() + "/" + service.name + ".db";
    bool has_rows = false;
    {
        std::scoped_lock lock(reading, writing);
        const bool is_open = writer.open(path, SCHEMA) && chmod(path.c_str(), 0600) == 0 && reader.open(path, nullptr);
        if (!is_open && !open_copy())
            return false;
        for (Db *db : {&writer, &reader})
            db->keep_statements();
        has_rows =
            Stmt(reader, "SELECT 1 FROM folder UNION ALL SELECT 1 FROM content UNION ALL SELECT 1 FROM upload LIMIT 1")
                .row();
    }
    // What a process has left that was killed while it signed out.
    if (has_rows && identity().empty())
        while_signed_in("", [&] { return clear(); });
    return true;
}

std::string Account::identity() const
{
    const auto credentials = credentials_known(service.name);
    return credentials ? account_identity(service, *credentials) : "";
}

// With both locks. What is in use stays when there is no memory either.
bool Account::open_copy()
{
    static std::atomic<int> copies = 0;
    const std::string path = cloud_data_dir() + "/" + service.name + ".db",
                      memory = "file:/cloud-" + std::to_string(++copies) + "?vfs=memdb"; // of this process
    Db next_writer, next_reader;
    if (!next_writer.open_copy(memory, SCHEMA, path, {"setting", "account_setting", "folder", "content", "upload"}) ||
        !next_reader.open(memory, nullptr))
        return false;
    __dlog_print(DLOG_WARN, "CLOUD", "the database of %s cannot be written; what changes now is kept in memory alone",
                 service.name.c_str());
    writer = std::move(next_writer);
    reader = std::move(next_reader);
    for (Db *db : {&writer, &reader})
        db->keep_statements();
    is_copy = true;
    return true;
}

bool Account::attempt(const std::function<bool()> &work, bool *is_disk_trouble)
{
    const auto run = [this](const char *sql) { return Stmt(writer, sql).done(); };
    writer.had_disk_trouble();
    if (run("BEGIN IMMEDIATE") && work() && run("COMMIT"))
        return true;
    *is_disk_trouble = writer.had_disk_trouble();
    writer.run("ROLLBACK");
    return false;
}

// `work` may be called several times.
bool Account::change(const std::function<bool()> &work, bool may_leave_disk)
{
    std::scoped_lock lock(writing);
    bool is_disk_trouble = false;
    if (attempt(work, &is_disk_trouble))
        return true;
    // On a full disk what the log takes up already can be written once more.
    if (!is_disk_trouble || is_copy)
        return false;
    if (writer.run("PRAGMA wal_checkpoint(RESTART)") && attempt(work, &is_disk_trouble))
        return true;
    if (!may_leave_disk)
        return false;
    {
        std::scoped_lock readers(reading);
        if (!open_copy())
            return false;
    }
    return attempt(work, &is_disk_trouble);
}

// Credentials change under the database's lock alone, so whoever holds it knows whose rows it writes, whatever other
// processes do.
bool Account::while_signed_in(const std::string &who, const std::function<bool()> &work)
{
    return change([&] { return identity() == who && work(); }, true);
}

bool Account::write(const std::string &who, const std::function<bool(Db &)> &work)
{
    return while_signed_in(who, [&] { return work(writer); });
}

bool Account::write_now(const std::string &who, const std::function<bool(Db &)> &work)
{
    if (!write(who, work))
        return false;
    std::scoped_lock lock(writing);
    return !is_copy && writer.run("PRAGMA wal_checkpoint(FULL)");
}

void Account::read(const std::function<void(const Db &)> &work)
{
    std::scoped_lock lock(reading);
    work(reader);
}

// The credentials are what makes an account be there. They go last and come last, so a process that is killed leaves
// the former account, at worst with an empty tree and empty caches, which a refresh fills; or the new one; or none.
bool Account::replace_credentials(const Credentials *next, std::optional<Credentials> &former)
{
    const std::string who = next ? account_identity(service, *next) : "";
    const std::string whose = complete_for();
    const bool is_same = next && identity() == who && (whose.empty() || whose == who);
    // Once before, so that a crash in the middle leaves no rows to somebody else.
    if (!is_same && !change([&] { return clear() && (next || forget_settings()); }))
        return false;
    return change([&] {
        former = credentials_known(service.name);
        if (!is_same && !clear())
            return false;
        // Files of another account are never found by the next one.
        if (!is_same && !cache_clear(service.name) && !next)
            return false;
        return credentials_store(service.name, next);
    });
}

bool Account::sign_in(const Credentials *credentials, std::optional<Credentials> *former)
{
    if (is_copy) // rows on the disk that cannot be removed would be the next one's
        return false;
    // The Secret Service may take its time, so it is not asked while others wait for the database. An item that no file
    // names is nobody's.
    const std::string file = credentials_file(service.name);
    Credentials next = credentials ? *credentials : Credentials();
    if (credentials) {
        const std::string &name = !next.email.empty() ? next.email : next.user;
        next.item = secret_store(file, service.name, name.empty() ? "token" : name, next.secret);
        if (!next.item.empty() && name.empty())
            next.identity = account_identity(service, next);
    }
    std::optional<Credentials> before;
    const bool is_stored = replace_credentials(credentials ? &next : nullptr, before);
    if (is_stored && former && before && before->secret.empty())
        before->secret = secret_find(file, before->item);
    if (is_stored && !credentials) { // what was deleted is not to be found in the file either
        std::scoped_lock lock(writing);
        writer.run("VACUUM; PRAGMA wal_checkpoint(TRUNCATE)");
    }
    const std::string unused = !is_stored ? next.item : before ? before->item : "";
    if (!unused.empty() || (is_stored && !credentials))
        secret_remove(file, is_stored && !credentials ? "" : unused);
    if (former)
        *former = before;
    return is_stored;
}

bool Account::folder_exists(const std::string &path)
{
    if (path == "/")
        return true;
    std::scoped_lock lock(reading);
    return Stmt(reader, "SELECT 1 FROM folder WHERE path = ?").bind(1, path).row();
}

std::vector<FolderRow> Account::folders_of(const std::string &parent)
{
    std::scoped_lock lock(reading);
    std::vector<FolderRow> rows;
    Stmt stmt(reader, "SELECT path, name FROM folder WHERE parent = ? ORDER BY sort, name");
    stmt.bind(1, parent);
    while (stmt.row())
        rows.push_back({stmt.text(0), stmt.text(1)});
    return rows;
}

std::vector<ContentRow> Account::contents_of(const std::string &parent)
{
    std::scoped_lock lock(reading);
    std::vector<ContentRow> rows;
    Stmt stmt(reader, "SELECT name, size, mtime, etag FROM content WHERE parent = ? ORDER BY sort, name");
    stmt.bind(1, parent);
    while (stmt.row())
        rows.push_back({parent, stmt.text(0), stmt.integer(1), stmt.integer(2), stmt.text(3)});
    return rows;
}

static bool insert_content(Stmt &stmt, const ContentRow &row)
{
    stmt.reset();
    return stmt.bind(1, row.parent)
        .bind(2, row.name)
        .bind(3, sort_key(row.name))
        .bind(4, row.size)
        .bind(5, row.mtime)
        .bind(6, row.etag)
        .done();
}

static bool write_tree(Db &db, const std::vector<FolderRow> &folders, const std::vector<ContentRow> &contents,
                       const std::vector<ContentRow> &later, const std::string &identity)
{
    if (!db.run("DELETE FROM folder; DELETE FROM content"))
        return false;
    std::unordered_set<std::string> paths = {"/"};
    Stmt folder(db, "INSERT OR REPLACE INTO folder(path, parent, name, sort) VALUES(?, ?, ?, ?)");
    for (const FolderRow &row : folders) {
        paths.insert(row.path);
        folder.reset();
        if (!folder.bind(1, row.path).bind(2, parent_of(row.path)).bind(3, row.name).bind(4, sort_key(row.name)).done())
            return false;
    }
    Stmt content(db, INSERT_CONTENT);
    for (const ContentRow &row : contents)
        if (!insert_content(content, row))
            return false;
    for (const ContentRow &row : later)
        if (paths.count(row.parent) && !insert_content(content, row))
            return false;
    Stmt complete(db, "INSERT OR REPLACE INTO setting(key, value) VALUES('complete_for', ?)");
    return complete.bind(1, identity).done();
}

bool Account::replace(const std::vector<FolderRow> &folders, const std::vector<ContentRow> &contents,
                      const std::vector<ContentRow> &later, const std::string &who)
{
    return while_signed_in(who, [&] { return write_tree(writer, folders, contents, later, who); });
}

bool Account::insert(const ContentRow &content, const std::string &who, const std::function<bool(Db &)> &more)
{
    return while_signed_in(who, [&] {
        Stmt stmt(writer, INSERT_CONTENT);
        return insert_content(stmt, content) && (!more || more(writer));
    });
}

std::optional<ContentRow> Account::content_at(const std::string &parent, const std::string &name)
{
    std::scoped_lock lock(reading);
    Stmt stmt(reader, "SELECT size, mtime, etag FROM content WHERE parent = ? AND name = ?");
    if (!stmt.bind(1, parent).bind(2, name).row())
        return {};
    return ContentRow{parent, name, stmt.integer(0), stmt.integer(1), stmt.text(2)};
}

bool Account::update(const ContentRow &row, const std::string &who)
{
    return while_signed_in(who, [&] {
        Stmt stmt(writer, "UPDATE content SET size = ?, mtime = ?, etag = ? WHERE parent = ? AND name = ?");
        stmt.bind(1, row.size).bind(2, row.mtime).bind(3, row.etag).bind(4, row.parent).bind(5, row.name);
        return stmt.done();
    });
}

std::string Account::complete_for()
{
    std::scoped_lock lock(reading);
    Stmt stmt(reader, "SELECT value FROM setting WHERE key = 'complete_for'");
    return stmt.row() ? stmt.text(0) : "";
}

// Within change().
bool Account::clear()
{
    writer.run("DELETE FROM temporary"); // a table that may not be there yet; they name folders
    return writer.run("DELETE FROM folder; DELETE FROM content; DELETE FROM upload; DELETE FROM setting "
                      "WHERE key = 'complete_for'");
}

// Within change().
bool Account::forget_settings()
{
    Stmt stmt(writer, "DELETE FROM account_setting WHERE account = ?");
    return stmt.bind(1, identity()).done();
}

long long Account::setting(const std::string &key, long long fallback)
{
    std::scoped_lock lock(reading);
    Stmt stmt(reader, "SELECT value FROM account_setting WHERE account = ? AND key = ?");
    return stmt.bind(1, identity()).bind(2, key).row() ? stmt.integer(0) : fallback;
}

int Account::set_setting(const std::string &key, long long value)
{
    bool is_anybody = true;
    const bool is_stored = !is_copy && change([&] {
        const std::string who = identity();
        is_anybody = !who.empty();
        Stmt stmt(writer, "INSERT OR REPLACE INTO account_setting(account, key, value) VALUES(?, ?, ?)");
        return is_anybody && stmt.bind(1, who).bind(2, key).bind(3, value).done();
    });
    return !is_anybody ? CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT : is_stored ? 0 : CLOUD_CONTENT_SYNC_ERROR_DB_FAILED;
}

} // namespace cloud
