#include "accounts.h"
#include "secrets.h"
#include <algorithm>
#include <ctime>
#include <fcntl.h>
#include <glib.h>
#include <strings.h>
#include <sys/stat.h>

static const int64_t DEFAULT_QUOTA = 50LL << 30;
static const size_t PROVED_AT_MOST = 1000;
static const int64_t USE_NOTED_AFTER = 300; // seconds; not every request is to write the database
static const int DEVICES_AT_MOST = 100; // of an account; more sign out the one that is not used for the longest time

static const char SCHEMA[] =
    "CREATE TABLE IF NOT EXISTS accounts(id INTEGER PRIMARY KEY, email TEXT NOT NULL UNIQUE, display_name TEXT NOT "
    "NULL, password TEXT NOT NULL, quota INTEGER NOT NULL);"
    "CREATE TABLE IF NOT EXISTS tokens(hash TEXT PRIMARY KEY, account INTEGER NOT NULL REFERENCES accounts(id) ON "
    "DELETE CASCADE, issued INTEGER NOT NULL);";

namespace {
// Lets go of what a statement that is kept has read.
struct Reset {
    Stmt &statement;

    ~Reset()
    {
        statement.reset();
    }
};
} // namespace

bool Accounts::open(Db &database, int files)
{
    db = &database;
    root = files;
    key = random_bytes(32);
    return db->run(SCHEMA) && add_device_columns() &&
           db->run("CREATE INDEX IF NOT EXISTS tokens_of_account ON tokens(account)");
}

// Tokens were once without a device.
bool Accounts::add_device_columns()
{
    if (!db->run("BEGIN IMMEDIATE"))
        return false;
    bool is_there = false;
    {
        Stmt column(*db, "SELECT 1 FROM pragma_table_info('tokens') WHERE name = 'device'");
        is_there = column.row();
    }
    const bool done = is_there || db->run("ALTER TABLE tokens ADD COLUMN device TEXT NOT NULL DEFAULT '';"
                                          "ALTER TABLE tokens ADD COLUMN used INTEGER NOT NULL DEFAULT 0;");
    return db->run(done ? "COMMIT" : "ROLLBACK") && done;
}

// The address as accounts are looked up by it.
static std::string folded(const std::string &email)
{
    std::string text = email;
    for (char &c : text)
        c = g_ascii_tolower(c);
    return text;
}

bool valid_email(const std::string &email)
{
    const size_t at = email.find('@');
    if (at == 0 || at == std::string::npos || at + 1 == email.size() || email.find('@', at + 1) != std::string::npos ||
        email.size() > 254 || email[0] == '.' || !g_utf8_validate(email.c_str(), -1, nullptr))
        return false;
    return std::none_of(email.begin(), email.end(), [](char c) {
        return static_cast<unsigned char>(c) <= ' ' || c == 127 || c == '/' || c == ':';
    });
}

bool Accounts::add(const std::string &email, const std::string &password, int64_t quota, std::string &reason)
{
    const std::string address = folded(email);
    if (!valid_email(address)) {
        reason = "not an e-mail address: " + email;
        return false;
    }
    if (password.empty() || password.find('\0') != std::string::npos) {
        reason = "the password of " + email + " is empty";
        return false;
    }
    Stmt known(*db, "SELECT id FROM accounts WHERE email = ?");
    if (known.bind(1, address).row()) {
        if (quota >= 0)
            Stmt(*db, "UPDATE accounts SET quota = ?1 WHERE email = ?2")
                .bind(1, static_cast<long long>(quota))
                .bind(2, address)
                .done();
        return true;
    }
    const std::string hash = password_hash(password);
    if (hash.empty()) {
        reason = "the password of " + email + " is too long";
        return false;
    }
    if (mkdirat(root, address.c_str(), 0777) != 0 && errno != EEXIST) {
        reason = "cannot make the folder of " + address + ": " + g_strerror(errno);
        return false;
    }
    Stmt insert(*db, "INSERT INTO accounts(email, display_name, password, quota) VALUES(?, ?, ?, ?)");
    insert.bind(1, address).bind(2, email.substr(0, email.find('@'))).bind(3, hash);
    insert.bind(4, static_cast<long long>(quota >= 0 ? quota : DEFAULT_QUOTA));
    if (insert.done())
        return true;
    reason = "cannot write the database";
    return false;
}

bool Accounts::exists(const std::string &email)
{
    Stmt known(*db, "SELECT id FROM accounts WHERE email = ?");
    return known.bind(1, folded(email)).row();
}

Account *Accounts::find(const std::string &email)
{
    Stmt known(*db, "SELECT id FROM accounts WHERE email = ?");
    return known.bind(1, folded(email)).row() ? find(known.integer(0)) : nullptr;
}

Accounts::Made Accounts::make(const std::string &email, const std::string &hash)
{
    const std::string address = folded(email);
    if (exists(address))
        return Made::TAKEN;
    unlinkat(root, address.c_str(), AT_REMOVEDIR); // an empty one says nothing
    if (mkdirat(root, address.c_str(), 0777) != 0)
        return errno == EEXIST ? Made::TAKEN : Made::FAILED;
    Stmt insert(*db, "INSERT INTO accounts(email, display_name, password, quota) VALUES(?, ?, ?, ?)");
    insert.bind(1, address).bind(2, email.substr(0, email.find('@'))).bind(3, hash);
    insert.bind(4, static_cast<long long>(DEFAULT_QUOTA));
    if (!hash.empty() && insert.done())
        return Made::YES;
    unlinkat(root, address.c_str(), AT_REMOVEDIR);
    return Made::FAILED;
}

std::string Accounts::issue_token(const std::string &email, const std::string &device)
{
    const std::string token = hex(random_bytes(32)), address = folded(email);
    Stmt insert(*db, "INSERT INTO tokens(hash, account, issued, device) SELECT ?1, id, ?2, ?4 FROM accounts WHERE "
                     "email = ?3");
    insert.bind(1, hex(sha256(token))).bind(2, static_cast<long long>(time(nullptr))).bind(3, address);
    if (!insert.bind(4, device).done() || sqlite3_changes(db->handle.get()) != 1)
        return "";
    Stmt bound(*db, "DELETE FROM tokens WHERE rowid IN (SELECT rowid FROM tokens WHERE account = (SELECT id FROM "
                    "accounts WHERE email = ?1) ORDER BY max(issued, used) DESC, rowid DESC LIMIT -1 OFFSET ?2)");
    bound.bind(1, address).bind(2, static_cast<long long>(DEVICES_AT_MOST)).done();
    return token;
}

bool Accounts::revoke_token(const std::string &token)
{
    Stmt row(*db, "DELETE FROM tokens WHERE hash = ?");
    return row.bind(1, hex(sha256(token))).done() && sqlite3_changes(db->handle.get()) == 1;
}

std::vector<Device> Accounts::devices(const Account &account)
{
    std::vector<Device> found;
    Stmt row(*db, "SELECT rowid, device, issued, used FROM tokens WHERE account = ? ORDER BY rowid DESC LIMIT ?");
    row.bind(1, account.id).bind(2, static_cast<long long>(DEVICES_AT_MOST));
    while (row.row())
        found.push_back({row.integer(0), row.text(1), row.integer(2), row.integer(3)});
    return found;
}

void Accounts::sign_out(const Account &account, long long device)
{
    Stmt row(*db, "DELETE FROM tokens WHERE rowid = ? AND account = ?");
    row.bind(1, device).bind(2, account.id).done();
}

Account *Accounts::find(long long id)
{
    if (!by_id)
        by_id.emplace(*db, "SELECT email, display_name, quota FROM accounts WHERE id = ?");
    const Reset reset{*by_id};
    if (!by_id->bind(1, id).row())
        return nullptr;
    Account &account = loaded[id];
    account.quota = by_id->integer(2);
    if (account.folder)
        return &account;
    account.id = id;
    account.email = by_id->text(0);
    account.display_name = by_id->text(1);
    mkdirat(root, account.email.c_str(), 0777);
    account.folder = Fd(openat(root, account.email.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    if (!account.folder)
        return nullptr;
    account.used = tree_size(account.folder.fd, "");
    Stmt properties(*db, "SELECT bytes FROM property_sizes WHERE account = ?");
    account.properties = properties.bind(1, id).row() ? properties.integer(0) : 0;
    return &account;
}

Account *Accounts::by_token(const std::string &token)
{
    const std::string hash = hex(sha256(token));
    Stmt row(*db, "SELECT account, hash, used FROM tokens WHERE hash = ?");
    if (!row.bind(1, hash).row() || !equal_in_constant_time(row.text(1), hash))
        return nullptr;
    const auto now = static_cast<long long>(time(nullptr));
    const long long id = row.integer(0), age = now - row.integer(2);
    row.reset();
    if (age > USE_NOTED_AFTER || age < 0)
        Stmt(*db, "UPDATE tokens SET used = ? WHERE hash = ?").bind(1, now).bind(2, hash).done();
    return find(id);
}

void PasswordCheck::run()
{
    if (hash.empty())
        password_hash(password);
    else
        is_right = password_matches(password, hash);
}

std::string Accounts::proof(const std::string &password, const std::string &hash) const
{
    return hmac_sha256(key, hash + '\0' + password);
}

Account *Accounts::settle(const PasswordCheck &check)
{
    Stmt row(*db, "SELECT id FROM accounts WHERE email = ? AND password = ?");
    if (!check.is_right || !row.bind(1, check.email).bind(2, check.hash).row())
        return nullptr;
    if (proved.size() >= PROVED_AT_MOST)
        proved.clear();
    proved.insert(proof(check.password, check.hash));
    return find(row.integer(0));
}

Account *Accounts::authorize(const char *header, PasswordCheck &check)
{
    if (header && strncasecmp(header, "Bearer ", 7) == 0)
        return by_token(header + 7);
    if (!header || strncasecmp(header, "Basic ", 6) != 0)
        return nullptr;
    gsize size = 0;
    const std::unique_ptr<guchar, decltype(&g_free)> bytes(g_base64_decode(header + 6, &size), g_free);
    const std::string pair(reinterpret_cast<char *>(bytes.get()), size);
    const size_t colon = pair.find(':');
    if (colon == std::string::npos || pair.find('\0') != std::string::npos)
        return nullptr;
    return authorize(pair.substr(0, colon), pair.substr(colon + 1), check);
}

Account *Accounts::authorize(const std::string &email, const std::string &password, PasswordCheck &check)
{
    check.email = folded(email);
    check.password = password;
    if (!by_email)
        by_email.emplace(*db, "SELECT id, password FROM accounts WHERE email = ?");
    const Reset reset{*by_email};
    if (!by_email->bind(1, check.email).row())
        return nullptr;
    check.hash = by_email->text(1);
    return proved.count(proof(check.password, check.hash)) ? find(by_email->integer(0)) : nullptr;
}

std::string plain_text(const std::string &text, long characters)
{
    std::string plain;
    const char *next = g_utf8_validate(text.c_str(), -1, nullptr) ? text.c_str() : "";
    for (long count = 0; *next && count < characters; next = g_utf8_next_char(next)) {
        const gunichar c = g_utf8_get_char(next);
        const bool is_space = g_unichar_isspace(c);
        if ((!is_space && !g_unichar_isgraph(c)) || (is_space && (plain.empty() || plain.back() == ' ')))
            continue;
        plain += is_space ? " " : std::string(next, static_cast<size_t>(g_utf8_next_char(next) - next));
        count++;
    }
    if (!plain.empty() && plain.back() == ' ')
        plain.pop_back();
    return plain;
}
