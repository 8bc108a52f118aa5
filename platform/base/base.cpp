#include "base/base.h"
#include <atomic>
#include <filesystem>
#include <fstream>
#include <map>
#include <mutex>
#include <set>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

namespace fs = std::filesystem;

std::string platform_data_dir()
{
    std::string dir;
    if (const char *set = std::getenv("PLATFORM_DATA_DIR"); set && *set)
        dir = set;
    else if (const char *xdg = std::getenv("XDG_DATA_HOME"); xdg && *xdg == '/')
        dir = std::string(xdg) + "/orvant-platform";
    else if (const char *home = std::getenv("HOME"); home && *home)
        dir = std::string(home) + "/.local/share/orvant-platform";
    else
        dir = "/tmp/orvant-platform-" + std::to_string(getuid());
    std::error_code failed;
    if (!fs::exists(dir, failed) && fs::create_directories(dir, failed))
        ::chmod(dir.c_str(), 0700);
    return dir;
}

std::string platform_data_file(const std::string &name)
{
    std::error_code failed;
    for (fs::path dir = fs::read_symlink("/proc/self/exe", failed).parent_path(); !failed && dir.has_relative_path();
         dir = dir.parent_path())
        if (const fs::path file = dir / "platform" / name; fs::exists(file, failed))
            return file;
    for (const fs::path folder : {"/usr/local/share/orvant-platform", "/usr/share/orvant-platform"})
        if (fs::exists(folder / name, failed))
            return folder / name;
    return {};
}

static std::atomic<const char *> package{""};

const char *platform_package()
{
    return package;
}

void platform_package_set(const char *name)
{
    // Texts are kept, because a reader in another thread may still hold an earlier one.
    static std::mutex lock;
    static std::set<std::string> names;
    const std::lock_guard hold(lock);
    package = names.insert(name ? name : "").first->c_str();
}

const std::string &platform_boot_id()
{
    static const std::string id = [] {
        std::string line;
        std::ifstream file("/proc/sys/kernel/random/boot_id");
        std::getline(file, line);
        return line;
    }();
    return id;
}

Db *platform_thread_db(const char *name, const char *schema)
{
    struct Connection {
        Db db;
        std::string path;
        struct stat file = {};
        pid_t process = 0;
    };
    static thread_local std::map<std::string, Connection> connections;
    Connection &c = connections[name];
    const std::string path = platform_data_dir() + "/" + name;
    struct stat now = {};
    const bool there = ::stat(path.c_str(), &now) == 0;
    if (c.db && there && c.process == getpid() && c.path == path && c.file.st_ino == now.st_ino &&
        c.file.st_dev == now.st_dev)
        return &c.db;
    if (c.db && c.process != getpid())
        (void)c.db.handle.release(); // closing it here would drop the locks of the process it belongs to
    c.db.handle.reset();
    if (!c.db.open(path, schema) || ::stat(path.c_str(), &c.file) != 0)
        return nullptr;
    c.path = path;
    c.process = getpid();
    return &c.db;
}

bool Db::open(const std::string &path, const char *schema)
{
    sqlite3 *raw = nullptr;
    const int result =
        sqlite3_open_v2(path.c_str(), &raw,
                        SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_NOMUTEX | SQLITE_OPEN_URI, nullptr);
    handle.reset(raw);
    if (result != SQLITE_OK) {
        handle.reset();
        return false;
    }
    sqlite3_busy_timeout(raw, 5000);
    // The change to WAL does not wait for the timeout when several programs open a new database at once.
    int switched = SQLITE_BUSY;
    for (int tries = 0; switched == SQLITE_BUSY && tries < 500; tries++) {
        if (tries > 0)
            sqlite3_sleep(10);
        switched = sqlite3_exec(raw, "PRAGMA journal_mode=WAL", nullptr, nullptr, nullptr);
    }
    if (switched != SQLITE_OK || !run("PRAGMA synchronous=NORMAL; PRAGMA foreign_keys=ON;") || (schema && !run(schema)))
        handle.reset();
    return handle != nullptr;
}

// The characters of a path that have a meaning in an address of SQLite's.
static std::string sqlite_address(const std::string &path, const char *parameter)
{
    std::string address = "file:";
    for (const char c : path)
        address += c == '%' ? "%25" : c == '?' ? "%3f" : c == '#' ? "%23" : std::string(1, c);
    // Otherwise it would be looked for where the first database of the connection is.
    return address + "?vfs=" + sqlite3_vfs_find(nullptr)->zName + "&" + parameter;
}

bool Db::open_copy(const std::string &memory, const char *schema, const std::string &path,
                   std::initializer_list<const char *> tables)
{
    if (!open(memory, schema))
        return false;
    // A file whose index cannot be made either is read without it, but for what its log holds.
    for (const char *how : {"mode=ro", "immutable=1"}) {
        if (!Stmt(*this, "ATTACH ? AS disk").bind(1, sqlite_address(path, how)).done())
            continue;
        bool is_read = true;
        for (const std::string table : tables)
            is_read &= run(("INSERT OR REPLACE INTO main." + table + " SELECT * FROM disk." + table).c_str());
        run("DETACH disk");
        if (is_read)
            break;
    }
    return true;
}

bool Db::run(const char *sql)
{
    return handle && sqlite3_exec(handle.get(), sql, nullptr, nullptr, nullptr) == SQLITE_OK;
}

struct Db::Kept {
    std::map<std::string, std::unique_ptr<sqlite3_stmt, Stmt::Finalize>, std::less<>> statements;
    bool had_disk_trouble = false;
};

void Db::keep_statements()
{
    kept = std::make_shared<Kept>();
}

bool Db::had_disk_trouble()
{
    return kept && std::exchange(kept->had_disk_trouble, false);
}

Stmt::Stmt(const Db &db, const char *sql) : kept(db.kept)
{
    if (const auto found = kept ? kept->statements.find(sql) : decltype(kept->statements.end())();
        kept && found != kept->statements.end()) {
        handle = std::move(found->second);
        kept->statements.erase(found);
        return;
    }
    sqlite3_stmt *raw = nullptr;
    if (db && sqlite3_prepare_v2(db.handle.get(), sql, -1, &raw, nullptr) == SQLITE_OK)
        handle.reset(raw);
}

Stmt::~Stmt()
{
    if (!kept || !handle)
        return;
    sqlite3_reset(handle.get());
    sqlite3_clear_bindings(handle.get());
    kept->statements[sqlite3_sql(handle.get())] = std::move(handle);
}

Stmt &Stmt::bind(int index, const char *text)
{
    if (handle)
        sqlite3_bind_text(handle.get(), index, text, -1, SQLITE_TRANSIENT);
    return *this;
}

Stmt &Stmt::bind(int index, const std::string &text)
{
    if (handle)
        sqlite3_bind_text(handle.get(), index, text.data(), static_cast<int>(text.size()), SQLITE_TRANSIENT);
    return *this;
}

Stmt &Stmt::bind(int index, long long value)
{
    if (handle)
        sqlite3_bind_int64(handle.get(), index, value);
    return *this;
}

Stmt &Stmt::bind(int index, double value)
{
    if (handle)
        sqlite3_bind_double(handle.get(), index, value);
    return *this;
}

int Stmt::step()
{
    const int result = handle ? sqlite3_step(handle.get()) : SQLITE_MISUSE;
    const int kind = result & 0xff;
    const bool is_trouble =
        kind == SQLITE_FULL || kind == SQLITE_IOERR || kind == SQLITE_READONLY || kind == SQLITE_CANTOPEN;
    if (kept && is_trouble)
        kept->had_disk_trouble = true;
    return result;
}

bool Stmt::row()
{
    return step() == SQLITE_ROW;
}

bool Stmt::done()
{
    return step() == SQLITE_DONE;
}

void Stmt::reset()
{
    if (handle)
        sqlite3_reset(handle.get());
}

long long Stmt::integer(int column) const
{
    return sqlite3_column_int64(handle.get(), column);
}

double Stmt::real(int column) const
{
    return sqlite3_column_double(handle.get(), column);
}

std::string Stmt::text(int column) const
{
    const auto *bytes = reinterpret_cast<const char *>(sqlite3_column_text(handle.get(), column));
    return bytes ? std::string(bytes, static_cast<size_t>(sqlite3_column_bytes(handle.get(), column))) : std::string();
}

bool Stmt::null(int column) const
{
    return sqlite3_column_type(handle.get(), column) == SQLITE_NULL;
}
