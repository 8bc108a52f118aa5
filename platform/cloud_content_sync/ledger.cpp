#include "cloud_content_sync/ledger.h"
#include <ctime>

namespace cloud {

namespace {
// Of a row: 0 waits, 1 was sent to its target, 2 was given up.
constexpr long long KEPT_SECONDS = 30LL * 24 * 60 * 60; // what was given up may be tried again for so long
} // namespace

// The row's id; 0 when it cannot be written.
static long long add_row(Stmt &stmt, const std::string &who, const std::string &local, const std::string &server)
{
    stmt.reset();
    stmt.bind(1, who).bind(2, local).bind(3, server).bind(4, static_cast<long long>(time(nullptr)));
    const long long id = stmt.row() ? stmt.integer(0) : 0;
    return id != 0 && stmt.done() ? id : 0;
}

// What was given up waits again, with what is known of it.
static constexpr char INSERT[] =
    "INSERT INTO upload(account, local_path, server_path, state, target, at) VALUES(?, ?, ?, 0, '', ?) "
    "ON CONFLICT(account, local_path, server_path) DO UPDATE SET state = min(state, 1), at = excluded.at "
    "RETURNING id";

bool Ledger::add(const std::string &who, const LedgerPaths &files)
{
    std::vector<long long> made;
    const bool is_written = account.write_now(who, [&](Db &db) {
        made.clear();
        Stmt old(db, "DELETE FROM upload WHERE state = 2 AND at < ?");
        if (!old.bind(1, static_cast<long long>(time(nullptr)) - KEPT_SECONDS).done())
            return false;
        Stmt last(db, "SELECT max(id) FROM upload"), stmt(db, INSERT);
        const long long before = last.row() ? last.integer(0) : 0;
        for (const auto &[local, server] : files) {
            const long long id = add_row(stmt, who, local, server);
            if (id == 0)
                return false;
            if (id > before)
                made.push_back(id);
        }
        return true;
    });
    std::scoped_lock lock(mutex);
    own.insert(made.begin(), made.end());
    return is_written;
}

bool Ledger::remove(const std::string &who, const LedgerPaths &files)
{
    return account.write(who, [&](Db &db) {
        Stmt stmt(db, "DELETE FROM upload WHERE account = ? AND local_path = ? AND server_path = ? AND state < 2");
        for (const auto &[local, server] : files) {
            stmt.reset();
            if (!stmt.bind(1, who).bind(2, local).bind(3, server).done())
                return false;
        }
        return true;
    });
}

std::vector<LedgerRow> Ledger::waiting(const std::string &who)
{
    std::vector<LedgerRow> rows;
    account.read([&](const Db &db) {
        Stmt stmt(db, "SELECT id, local_path, server_path, target FROM upload WHERE account = ? AND state < 2 "
                      "ORDER BY id");
        stmt.bind(1, who);
        while (stmt.row())
            rows.push_back({stmt.integer(0), stmt.text(1), stmt.text(2), stmt.text(3)});
    });
    return rows;
}

LedgerRow Ledger::begin(const std::string &who, const std::string &local_path, const std::string &server_path)
{
    LedgerRow found{0, local_path, server_path, ""};
    account.read([&](const Db &db) {
        Stmt stmt(db, "SELECT id, target FROM upload WHERE account = ? AND local_path = ? AND server_path = ?");
        if (!stmt.bind(1, who).bind(2, local_path).bind(3, server_path).row())
            return;
        found.id = stmt.integer(0);
        found.target = stmt.text(1);
    });
    std::scoped_lock lock(mutex);
    found.is_inherited = found.id != 0 && own.count(found.id) == 0;
    return found;
}

bool Ledger::sent(const std::string &who, LedgerRow &row, const std::string &target)
{
    if (row.id != 0 && row.target == target)
        return true;
    long long id = 0;
    const bool is_written = account.write(who, [&](Db &db) {
        id = row.id;
        if (id == 0) {
            Stmt insert(db, INSERT);
            id = add_row(insert, who, row.local_path, row.server_path);
            if (id == 0)
                return false;
        }
        Stmt stmt(db, "UPDATE upload SET state = 1, target = ?, at = ? WHERE id = ?");
        return stmt.bind(1, target).bind(2, static_cast<long long>(time(nullptr))).bind(3, id).done();
    });
    if (!is_written)
        return false;
    row.id = id;
    row.target = target;
    return true;
}

bool Ledger::give_up(const std::string &who, const LedgerRow &row)
{
    return row.id == 0 || account.write(who, [&](Db &db) {
        Stmt stmt(db, "UPDATE upload SET state = 2 WHERE id = ?");
        return stmt.bind(1, row.id).done();
    });
}

bool ledger_close(Db &db, const LedgerRow &row)
{
    Stmt stmt(db, "DELETE FROM upload WHERE id = ?");
    return row.id == 0 || stmt.bind(1, row.id).done();
}

bool Ledger::close(const std::string &who, const LedgerRow &row)
{
    return row.id == 0 || account.write(who, [&](Db &db) { return ledger_close(db, row); });
}

} // namespace cloud
