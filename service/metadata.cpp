#include "metadata.h"

// A path is kept as its folder and its name, so that a folder's rows lie together; the root has neither.
static const char SCHEMA[] =
    "CREATE TABLE IF NOT EXISTS digests(account INTEGER NOT NULL, folder TEXT NOT NULL, name TEXT NOT NULL, size "
    "INTEGER NOT NULL, modified INTEGER NOT NULL, inode INTEGER NOT NULL, sha256 TEXT NOT NULL, PRIMARY KEY(account, "
    "folder, name)) WITHOUT ROWID;"
    "CREATE TABLE IF NOT EXISTS properties(account INTEGER NOT NULL, folder TEXT NOT NULL, name TEXT NOT NULL, ns TEXT "
    "NOT NULL, property TEXT NOT NULL, xml TEXT NOT NULL, PRIMARY KEY(account, folder, name, ns, property)) WITHOUT "
    "ROWID;";

// What lies below a path ?4 is in it, or in a folder below it ('0' is the character after '/'). These are two
// conditions for two statements: with an OR between them SQLite reads all rows of the account.
#define IN_IT "account = ?1 AND folder = ?4"
#define DEEPER "account = ?1 AND folder > ?4 || '/' AND folder < ?4 || '0'"
#define ITSELF "account = ?1 AND folder = ?2 AND name = ?3"

// The bytes of all properties of an account, kept by triggers. They count as stored.
#define SIZE_OF(row) "length(CAST(" row ".ns || " row ".property || " row ".xml AS BLOB))"
static const char SIZES_SCHEMA[] =
    "CREATE TABLE IF NOT EXISTS property_sizes(account INTEGER PRIMARY KEY, bytes INTEGER NOT NULL);"
    "INSERT OR IGNORE INTO property_sizes SELECT account, sum(" SIZE_OF(
        "properties") ") FROM properties GROUP BY account;"
                      "CREATE TRIGGER IF NOT EXISTS property_added AFTER INSERT ON properties BEGIN "
                      "INSERT INTO property_sizes VALUES(new.account, " SIZE_OF(
                          "new") ") ON CONFLICT(account) DO UPDATE SET bytes = bytes + "
                                 "excluded.bytes; END;"
                                 "CREATE TRIGGER IF NOT EXISTS property_removed AFTER DELETE ON properties BEGIN "
                                 "UPDATE property_sizes SET bytes = bytes - " SIZE_OF(
                                     "old") " WHERE account = old.account; END;"
                                            "CREATE TRIGGER IF NOT EXISTS property_changed AFTER UPDATE OF xml ON "
                                            "properties BEGIN "
                                            "UPDATE property_sizes SET bytes = bytes + " SIZE_OF("new") " - " SIZE_OF(
                                                "old") " WHERE account = new.account; END;";

bool Metadata::open(Db &database)
{
    db = &database;
    return db->run(SCHEMA) && db->run(SIZES_SCHEMA);
}

static Stmt &bind_path(Stmt &statement, const Account &account, const Path &path)
{
    return statement.bind(1, account.id).bind(2, path.folder()).bind(3, path.name());
}

static Digest read_digest(const Stmt &row)
{
    return {row.integer(0), row.integer(1), static_cast<uint64_t>(row.integer(2)), row.text(3)};
}

std::string Metadata::digest(const Account &account, const Path &path, const Entry &entry)
{
    Stmt row(*db, "SELECT size, modified, inode, sha256 FROM digests WHERE " ITSELF);
    if (!bind_path(row, account, path).row())
        return {};
    const Digest digest = read_digest(row);
    return digest.valid_for(entry) ? digest.sha256 : "";
}

std::unordered_map<std::string, Digest> Metadata::digests_in(const Account &account, const Path &folder)
{
    std::unordered_map<std::string, Digest> found;
    Stmt row(*db, "SELECT size, modified, inode, sha256, name FROM digests WHERE account = ? AND folder = ?");
    row.bind(1, account.id).bind(2, folder.whole());
    while (row.row())
        found.emplace(row.text(4), read_digest(row));
    return found;
}

void Metadata::set_digest(const Account &account, const std::string &folder, const Entry &entry,
                          const std::string &sha256)
{
    Stmt row(*db, "INSERT OR REPLACE INTO digests VALUES(?, ?, ?, ?, ?, ?, ?)");
    row.bind(1, account.id).bind(2, folder).bind(3, entry.name).bind(4, static_cast<long long>(entry.size));
    row.bind(5, static_cast<long long>(entry.modified)).bind(6, static_cast<long long>(entry.inode)).bind(7, sha256);
    row.done();
}

DeadProperties Metadata::properties(const Account &account, const Path &path)
{
    DeadProperties found;
    Stmt row(*db, "SELECT ns, property, xml FROM properties WHERE " ITSELF);
    bind_path(row, account, path);
    while (row.row())
        found.push_back({row.text(0), row.text(1), row.text(2)});
    return found;
}

std::unordered_map<std::string, DeadProperties> Metadata::properties_in(const Account &account, const Path &folder)
{
    std::unordered_map<std::string, DeadProperties> found;
    Stmt row(*db, "SELECT name, ns, property, xml FROM properties WHERE account = ? AND folder = ?");
    row.bind(1, account.id).bind(2, folder.whole());
    while (row.row())
        found[row.text(0)].push_back({row.text(1), row.text(2), row.text(3)});
    return found;
}

int64_t Metadata::properties_size(const Account &account)
{
    Stmt row(*db, "SELECT bytes FROM property_sizes WHERE account = ?");
    return row.bind(1, account.id).row() ? row.integer(0) : 0;
}

int64_t Metadata::properties_size(const Account &account, const Path &path, bool deep)
{
    int64_t bytes = 0;
    Stmt itself(*db, "SELECT total(" SIZE_OF("properties") ") FROM properties WHERE " ITSELF);
    bytes += bind_path(itself, account, path).row() ? itself.integer(0) : 0;
    for (const char *sql : {"SELECT total(" SIZE_OF("properties") ") FROM properties WHERE " IN_IT,
                            "SELECT total(" SIZE_OF("properties") ") FROM properties WHERE " DEEPER}) {
        Stmt below(*db, sql);
        bytes += deep && below.bind(1, account.id).bind(4, path.whole()).row() ? below.integer(0) : 0;
    }
    return bytes;
}

bool Metadata::change_properties(Account &account, const Path &path, const DeadProperties &changes)
{
    Stmt set(*db, "INSERT INTO properties VALUES(?, ?, ?, ?, ?, ?) ON CONFLICT DO UPDATE SET xml = excluded.xml");
    Stmt remove(*db, "DELETE FROM properties WHERE " ITSELF " AND ns = ?4 AND property = ?5");
    bool changed = db->run("BEGIN IMMEDIATE");
    for (const DeadProperty &change : changes) {
        Stmt &statement = change.xml.empty() ? remove : set;
        bind_path(statement, account, path).bind(4, change.ns).bind(5, change.name);
        if (!change.xml.empty())
            statement.bind(6, change.xml);
        changed = changed && statement.done();
        statement.reset();
    }
    const int64_t more = properties_size(account) - account.properties;
    changed = changed && (more <= 0 || more <= account.left());
    changed = db->run(changed ? "COMMIT" : "ROLLBACK") && changed;
    account.properties = properties_size(account);
    return changed;
}

void Metadata::forget_file(Account &account, const Path &path)
{
    for (const char *sql : {"DELETE FROM digests WHERE " ITSELF, "DELETE FROM properties WHERE " ITSELF}) {
        Stmt row(*db, sql);
        bind_path(row, account, path).done();
    }
    account.properties = properties_size(account);
}

void Metadata::forget(Account &account, const Path &path)
{
    forget_file(account, path);
    for (const char *sql : {"DELETE FROM digests WHERE " IN_IT, "DELETE FROM digests WHERE " DEEPER,
                            "DELETE FROM properties WHERE " IN_IT, "DELETE FROM properties WHERE " DEEPER}) {
        Stmt row(*db, sql);
        row.bind(1, account.id).bind(4, path.whole()).done();
    }
    account.properties = properties_size(account);
}

void Metadata::moved(Account &account, const Path &from, const Path &to)
{
    db->run("BEGIN IMMEDIATE");
    forget(account, to);
    for (const char *sql : {"UPDATE digests SET folder = ?5, name = ?6 WHERE " ITSELF,
                            "UPDATE properties SET folder = ?5, name = ?6 WHERE " ITSELF}) {
        Stmt row(*db, sql);
        bind_path(row, account, from).bind(5, to.folder()).bind(6, to.name()).done();
    }
    for (const char *sql :
         {"UPDATE digests SET folder = ?5 || substr(folder, length(?4) + 1) WHERE " DEEPER,
          "UPDATE properties SET folder = ?5 || substr(folder, length(?4) + 1) WHERE " DEEPER,
          "UPDATE digests SET folder = ?5 WHERE " IN_IT, "UPDATE properties SET folder = ?5 WHERE " IN_IT}) {
        Stmt row(*db, sql);
        row.bind(1, account.id).bind(4, from.whole()).bind(5, to.whole()).done();
    }
    db->run("COMMIT");
}

void Metadata::copied(Account &account, const Path &from, const Path &to, bool deep,
                      const std::vector<CopiedFile> &files)
{
    db->run("BEGIN IMMEDIATE");
    forget(account, to);
    Stmt itself(*db, "INSERT INTO properties SELECT account, ?5, ?6, ns, property, xml FROM properties WHERE " ITSELF);
    bind_path(itself, account, from).bind(5, to.folder()).bind(6, to.name()).done();
    for (const char *sql :
         {"INSERT INTO properties SELECT account, ?5 || substr(folder, length(?4) + 1), name, ns, "
          "property, xml FROM properties WHERE " DEEPER,
          "INSERT INTO properties SELECT account, ?5, name, ns, property, xml FROM properties WHERE " IN_IT}) {
        Stmt below(*db, sql);
        if (deep)
            below.bind(1, account.id).bind(4, from.whole()).bind(5, to.whole()).done();
    }
    for (const CopiedFile &file : files) {
        Path old_path = from, new_path = to;
        for (size_t start = 0; start < file.below.size();) {
            const size_t end = std::min(file.below.find('/', start), file.below.size());
            old_path.parts.push_back(file.below.substr(start, end - start));
            new_path.parts.push_back(old_path.parts.back());
            start = end + 1;
        }
        Entry entry = file.to;
        entry.name = new_path.name();
        if (const std::string known = digest(account, old_path, file.from); !known.empty())
            set_digest(account, new_path.folder(), entry, known);
    }
    db->run("COMMIT");
}
#undef BELOW
#undef ITSELF
