#include "cloud_content_sync/known.h"
#include "cloud_content_sync/names.h"
#include <algorithm>
#include <cerrno>
#include <csignal>
#include <ctime>
#include <mutex>
#include <set>
#include <unistd.h>
#include <utility>

namespace cloud {

static constexpr long long BELIEVED_SECONDS = 30LL * 24 * 3600;
static constexpr long long AT_WORK_SECONDS = 60;
static constexpr unsigned SAMPLE_OF = 16;
static constexpr size_t DIGITS = 32;
static constexpr std::string_view PREFIX = "velora-", SUFFIX = ".part";
static constexpr char SCHEMA[] = R"(
CREATE TABLE IF NOT EXISTS known(storage TEXT NOT NULL, key TEXT NOT NULL, value INTEGER NOT NULL,
    found INTEGER NOT NULL, PRIMARY KEY(storage, key)) WITHOUT ROWID;
CREATE TABLE IF NOT EXISTS temporary(storage TEXT NOT NULL, path TEXT NOT NULL, account TEXT NOT NULL,
    pid INTEGER NOT NULL, boot TEXT NOT NULL, made INTEGER NOT NULL, PRIMARY KEY(storage, path)) WITHOUT ROWID;
)";

// The temporary names that this process is at work on, whichever client of it is.
static std::mutex s_mutex;
static std::set<std::string> s_at_work;

std::string temporary_name(bool is_hidden)
{
    static constexpr char HEX[] = "0123456789abcdef";
    unsigned char bytes[DIGITS / 2];
    if (getentropy(bytes, sizeof bytes) != 0)
        std::abort();
    std::string name = is_hidden ? "." : "";
    name += PREFIX;
    for (const unsigned char byte : bytes)
        name.append({HEX[byte >> 4], HEX[byte & 15]});
    return name.append(SUFFIX);
}

bool is_temporary_name(std::string_view name)
{
    if (name.starts_with('.'))
        name.remove_prefix(1);
    if (name.size() != PREFIX.size() + DIGITS + SUFFIX.size() || !name.starts_with(PREFIX) || !name.ends_with(SUFFIX))
        return false;
    const std::string_view digits = name.substr(PREFIX.size(), DIGITS);
    return digits.find_first_not_of("0123456789abcdef") == digits.npos;
}

Known::Known(const Service &service) : name(service.name), storage(service.storage) {}

Db *Known::database()
{
    const std::string path = cloud_data_dir() + "/" + name + ".db";
    if (!was_opened && !db.open(path, SCHEMA))
        db.open_copy(":memory:", SCHEMA, path, {"known", "temporary"});
    was_opened = true;
    return db ? &db : nullptr;
}

std::optional<int> Known::find(const std::string &key)
{
    if (const auto known = found.find(key); known != found.end())
        return known->second;
    std::optional<int> value;
    if (const Db *from = database()) {
        Stmt stmt(*from, "SELECT value FROM known WHERE storage = ? AND key = ? AND found BETWEEN ? AND ?");
        const long long now = time(nullptr);
        if (stmt.bind(1, storage).bind(2, key).bind(3, now - BELIEVED_SECONDS).bind(4, now).row())
            value = static_cast<int>(stmt.integer(0));
    }
    return found[key] = value;
}

void Known::remember(const std::string &key, int value)
{
    found[key] = value;
    if (const Db *to = database()) {
        Stmt stmt(*to, "INSERT OR REPLACE INTO known(storage, key, value, found) VALUES(?, ?, ?, ?)");
        const long long now = time(nullptr);
        stmt.bind(1, storage).bind(2, key).bind(3, static_cast<long long>(value)).bind(4, now).done();
    }
}

void Known::doubt(const std::string &key)
{
    if (!find(key) || !doubted.insert(key).second)
        return;
    found[key].reset();
    if (const Db *to = database())
        Stmt(*to, "DELETE FROM known WHERE storage = ? AND key = ?").bind(1, storage).bind(2, key).done();
}

void Known::add_temporary(const std::string &who, const std::string &path)
{
    {
        std::scoped_lock lock(s_mutex);
        s_at_work.insert(storage + path);
    }
    const long long now = time(nullptr);
    left[path] = {who, now};
    if (const Db *to = database()) {
        Stmt stmt(*to,
                  "INSERT OR REPLACE INTO temporary(storage, path, account, pid, boot, made) VALUES(?, ?, ?, ?, ?, ?)");
        stmt.bind(1, storage)
            .bind(2, path)
            .bind(3, who)
            .bind(4, static_cast<long long>(getpid()))
            .bind(5, platform_boot_id())
            .bind(6, now);
        stmt.done();
    }
}

void Known::drop_temporary(const std::string &path)
{
    leave_temporary(path);
    left.erase(path);
    if (const Db *to = database())
        Stmt(*to, "DELETE FROM temporary WHERE storage = ? AND path = ?").bind(1, storage).bind(2, path).done();
}

void Known::drop_temporary_if_old(const std::string &path)
{
    leave_temporary(path);
    const long long old = time(nullptr) - AT_WORK_SECONDS;
    if (const auto found_left = left.find(path);
        found_left != left.end() &&
        (found_left->second.made < old || found_left->second.made > old + 2 * AT_WORK_SECONDS))
        left.erase(found_left);
    if (const Db *to = database()) {
        Stmt stmt(*to, "DELETE FROM temporary WHERE storage = ? AND path = ? AND made NOT BETWEEN ? AND ? + ?");
        stmt.bind(1, storage).bind(2, path).bind(3, old).bind(4, old).bind(5, 2 * AT_WORK_SECONDS).done();
    }
}

void Known::leave_temporary(const std::string &path)
{
    std::scoped_lock lock(s_mutex);
    s_at_work.erase(storage + path);
}

std::vector<std::string> Known::left_behind(const std::string &who)
{
    std::set<std::string> paths;
    // Others' leavings are looked for once; what this one leaves is in `left`.
    if (const Db *from = std::exchange(looked_for, who) == who ? nullptr : database()) {
        Stmt stmt(*from, "SELECT path, account, pid, boot, made FROM temporary WHERE storage = ?");
        stmt.bind(1, storage);
        bool has_others = false;
        while (stmt.row()) {
            const auto pid = static_cast<pid_t>(stmt.integer(2));
            const bool is_alive = stmt.text(3) == platform_boot_id() && (kill(pid, 0) == 0 || errno == EPERM);
            has_others |= stmt.text(1) != who;
            if (stmt.text(1) == who && (!is_alive || pid == getpid()))
                left.emplace(stmt.text(0), Temporary{who, stmt.integer(4)});
        }
        stmt.reset();
        if (has_others) // nobody is left who could delete what another account has there
            Stmt(*from, "DELETE FROM temporary WHERE storage = ? AND account != ?")
                .bind(1, storage)
                .bind(2, who)
                .done();
    }
    for (const auto &[path, one] : left)
        if (one.account == who)
            paths.insert(path);
    std::scoped_lock lock(s_mutex);
    std::erase_if(paths, [this](const std::string &path) { return s_at_work.count(storage + path) > 0; });
    return {paths.begin(), paths.end()};
}

bool Known::is_sample()
{
    return samples++ % SAMPLE_OF == 0;
}

} // namespace cloud
