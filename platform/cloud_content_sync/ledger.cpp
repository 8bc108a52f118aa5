#include "cloud_content_sync/ledger.h"
#include <ctime>

namespace cloud {

namespace {
enum State { WAITING = 0, SENT = 1, GIVEN_UP = 2 };
constexpr long long KEPT_SECONDS = 30LL * 24 * 60 * 60; // what was given up may be tried again for so long
} // namespace

static bool add_row(Stmt &stmt, const std::string &who, const std::string &local, const std::string &server)
{
    stmt.reset();
    return stmt.bind(1, who).bind(2, local).bind(3, server).bind(4, static_cast<long long>(time(nullptr))).done();
}

static constexpr char INSERT[] =
    "INSERT INTO upload(account, local_path, server_path, state, target, at) VALUES(?, ?, ?, 0, '', ?)";

bool Ledger::add(const std::string &who, const LedgerPaths &files)
{
    return account.write(who, [&](Db &db) {
        Stmt old(db, "DELETE FROM upload WHERE state = 2 AND at < ?");
        if (!old.bind(1, static_cast<long long>(time(nullptr)) - KEPT_SECONDS).done())
            return false;
        Stmt stmt(db, INSERT);
        for (const auto &[local, server] : files)
            if (!add_row(stmt, who, local, server))
                return false;
        return true;
    });
}

bool Ledger::remove(const std::string &who, const LedgerPaths &files)
{
    return account.write(who, [&](Db &db) {
        Stmt stmt(db, "DELETE FROM upload WHERE id = (SELECT id FROM upload WHERE account = ? AND local_path = ? "
                      "AND server_path = ? AND state = 0 ORDER BY id LIMIT 1)");
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
        Stmt stmt(db, "SELECT id, target FROM upload WHERE account = ? AND local_path = ? AND server_path = ? "
                      "ORDER BY target = '', id LIMIT 1");
        if (!stmt.bind(1, who).bind(2, local_path).bind(3, server_path).row())
            return;
        found.id = stmt.integer(0);
        found.target = stmt.text(1);
    });
    return found;
}

bool Ledger::sent(const std::string &who, LedgerRow &row, const std::string &target)
{
    if (row.id != 0 && row.target == target)
        return true;
    return account.write(who, [&](Db &db) {
        if (row.id == 0) {
            Stmt insert(db, INSERT);
            if (!add_row(insert, who, row.local_path, row.server_path))
                return false;
            row.id = sqlite3_last_insert_rowid(db.handle.get());
        }
        row.target = target;
        Stmt stmt(db, "UPDATE upload SET state = 1, target = ?, at = ? WHERE id = ?");
        return stmt.bind(1, target).bind(2, static_cast<long long>(time(nullptr))).bind(3, row.id).done();
    });
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
