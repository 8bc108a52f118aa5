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
    return db->run(SCHEMA);
}

// The address as accounts are looked up by it.
static std::string folded(const std::string &email)
{
    std::string text = email;
    for (char &c : text)
        c = g_ascii_tolower(c);
    return text;
}

// The address names a folder and stands before ':' in credentials.
static bool valid_email(const std::string &email)
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
    if (mkdirat(root, address.c_str(), 0777) != 0 && errno != EEXIST) {
        reason = "cannot make the folder of " + address + ": " + g_strerror(errno);
        return false;
    }
    Stmt insert(*db, "INSERT INTO accounts(email, display_name, password, quota) VALUES(?, ?, ?, ?)");
    insert.bind(1, address).bind(2, email.substr(0, email.find('@'))).bind(3, password_hash(password));
    insert.bind(4, static_cast<long long>(quota >= 0 ? quota : DEFAULT_QUOTA));
    if (insert.done())
        return true;
    reason = "cannot write the database";
    return false;
}

std::string Accounts::issue_token(const std::string &email)
{
    const std::string token = hex(random_bytes(32));
    Stmt insert(*db, "INSERT INTO tokens(hash, account, issued) SELECT ?1, id, ?2 FROM accounts WHERE email = ?3");
    insert.bind(1, hex(sha256(token))).bind(2, static_cast<long long>(time(nullptr))).bind(3, folded(email));
    return insert.done() && sqlite3_changes(db->handle.get()) == 1 ? token : "";
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
    Stmt row(*db, "SELECT account, hash FROM tokens WHERE hash = ?");
    return row.bind(1, hash).row() && equal_in_constant_time(row.text(1), hash) ? find(row.integer(0)) : nullptr;
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
    check.email = folded(pair.substr(0, colon));
    check.password = pair.substr(colon + 1);
    if (!by_email)
        by_email.emplace(*db, "SELECT id, password FROM accounts WHERE email = ?");
    const Reset reset{*by_email};
    if (!by_email->bind(1, check.email).row())
        return nullptr;
    check.hash = by_email->text(1);
    return proved.count(proof(check.password, check.hash)) ? find(by_email->integer(0)) : nullptr;
}
