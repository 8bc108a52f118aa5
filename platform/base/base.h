#pragma once
// What the platform's libraries share: where they keep their files, and small owners of C handles.
#include <cstdlib>
#include <initializer_list>
#include <memory>
#include <sqlite3.h>
#include <string>

// The folder in which the platform's libraries keep the current user's databases, without a final slash. It is
// $PLATFORM_DATA_DIR when that is set (tests, demos), else $XDG_DATA_HOME/orvant-platform, else
// ~/.local/share/orvant-platform. The folder is made when it is missing, readable by its owner alone. Any thread.
std::string platform_data_dir();

// A file that is installed with the platform's libraries, such as "theme/platform.edj". The running program's own
// folder and those above it are looked through first, so that a program of a build folder finds the files built beside
// it; then the folders orvant-platform of /usr/local/share and /usr/share. Empty when there is none. Any thread.
std::string platform_data_file(const std::string &name);

// The package under which this process owns accounts and notifications; "" until it was set. platform_package_set
// copies its argument (null counts as ""). Any thread; the text of platform_package stays valid until the process ends.
const char *platform_package();
void platform_package_set(const char *package);

// Names the current start of the machine, the kernel's boot_id; records that last until the next start carry it.
// Any thread.
const std::string &platform_boot_id();

struct CFree {
    void operator()(void *p) const
    {
        std::free(p);
    }
};
using CString = std::unique_ptr<char, CFree>;

// An SQLite connection in WAL mode with a busy time-out, closed with its owner. It may be used by one thread at a time.
struct Db {
    struct Close {
        void operator()(sqlite3 *db) const
        {
            sqlite3_close_v2(db);
        }
    };
    std::unique_ptr<sqlite3, Close> handle;
    struct Kept;                // statements, by their text
    std::shared_ptr<Kept> kept; // goes before the connection

    // Opens (and creates) the database file and runs `schema`, a list of statements that change nothing when they were
    // run before. The result is false when either fails; the connection is then closed. `path` may be an address of
    // SQLite's ("file:...").
    bool open(const std::string &path, const char *schema);
    // Opens a database in memory, ":memory:" or an address, with what the `tables` of the file at `path` hold, as far
    // as that can be read. For a disk that is full or read-only. Tables have the same columns in `schema` as there.
    bool open_copy(const std::string &memory, const char *schema, const std::string &path,
                   std::initializer_list<const char *> tables);
    // Runs statements that return no rows.
    bool run(const char *sql);
    // From now on statements are kept when their Stmt ends, for the next one of the same text. No Stmt may outlive the
    // connection.
    void keep_statements();
    // Of a connection that keeps them: whether one has failed since this was last asked because of the disk, which is
    // full, read-only or broken.
    bool had_disk_trouble();
    explicit operator bool() const
    {
        return handle != nullptr;
    }
};

// Either all statements of its life are kept, when commit() is true, or none. Of one thread, like its connection.
class Transaction {
  public:
    explicit Transaction(Db &database) : db(database), open(db.run("BEGIN IMMEDIATE")) {}
    ~Transaction()
    {
        if (open)
            db.run("ROLLBACK");
    }
    Transaction(const Transaction &) = delete;
    Transaction &operator=(const Transaction &) = delete;
    // Whether there is one: another process may hold the database for longer than the wait for it.
    bool begun() const
    {
        return open;
    }
    bool commit()
    {
        open = !db.run("COMMIT");
        return !open;
    }

  private:
    Db &db;
    bool open;
};

// The calling thread's connection to the database `name` in platform_data_dir(), opened when first asked for and closed
// when the thread ends. It follows the file: after a change of folder, a deleted file or a fork it is opened afresh.
// Null when the database cannot be opened. `name` and `schema` must be constants; the connection must not leave the
// thread.
Db *platform_thread_db(const char *name, const char *schema);

// A prepared statement. Parameters count from 1, columns from 0; texts are copied by bind.
struct Stmt {
    struct Finalize {
        void operator()(sqlite3_stmt *s) const
        {
            sqlite3_finalize(s);
        }
    };
    std::shared_ptr<Db::Kept> kept; // where it goes in the end, if anywhere
    std::unique_ptr<sqlite3_stmt, Finalize> handle;

    Stmt(const Db &db, const char *sql);
    ~Stmt();
    Stmt(const Stmt &) = delete;
    Stmt &operator=(const Stmt &) = delete;

    int step();
    Stmt &bind(int index, const char *text); // null binds NULL
    Stmt &bind(int index, const std::string &text);
    Stmt &bind(int index, long long value);
    Stmt &bind(int index, double value);
    // True when a row is there to be read.
    bool row();
    // Runs a statement that returns no rows; false on failure (a broken constraint among them).
    bool done();
    // Makes the statement ready to run again; the parameters stay bound.
    void reset();
    long long integer(int column) const;
    double real(int column) const;
    std::string text(int column) const; // NULL reads as ""
    bool null(int column) const;
    explicit operator bool() const
    {
        return handle != nullptr;
    }
};
