#include "account/account.h"
#include "base/base.h"
#include <array>
#include <atomic>
#include <cstring>
#include <map>
#include <vector>

namespace {

enum FieldIndex { PACKAGE, DOMAIN, USER, EMAIL, DISPLAY, ICON, FIELD_COUNT };
constexpr const char *COLUMNS[FIELD_COUNT] = {"package", "domain", "user", "email", "display", "icon"};

template <typename T> struct Field {
    T value = {};
    bool present = false;
    bool changed = false;

    void set(const T &v)
    {
        value = v;
        present = changed = true;
    }
};

// The connection belongs to the thread and outlives account_disconnect; counting decides who may use it.
std::atomic<int> connections{0};

constexpr const char *SCHEMA =
    "CREATE TABLE IF NOT EXISTS account ("
    " id INTEGER PRIMARY KEY AUTOINCREMENT, package TEXT NOT NULL, domain TEXT, user TEXT NOT NULL, email TEXT,"
    " display TEXT, icon TEXT);"
    "CREATE UNIQUE INDEX IF NOT EXISTS account_user ON account (package, ifnull(domain, ''), user);"
    "CREATE TABLE IF NOT EXISTS capability ("
    " account INTEGER NOT NULL REFERENCES account (id) ON DELETE CASCADE, type TEXT NOT NULL, state INTEGER NOT NULL,"
    " PRIMARY KEY (account, type))";

Db *database()
{
    return platform_thread_db("accounts.db", SCHEMA);
}

} // namespace

struct account_s {
    int id = -1;
    std::array<Field<std::string>, FIELD_COUNT> fields;
    std::map<std::string, Field<account_capability_state_e>> capabilities;

    void written()
    {
        for (auto &field : fields)
            field.changed = false;
        for (auto &[type, capability] : capabilities)
            capability.changed = false;
    }
};

namespace {

int set_field(account_h account, FieldIndex index, const char *value)
{
    if (!account || !value)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    account->fields[index].set(value);
    return ACCOUNT_ERROR_NONE;
}

int get_field(account_h account, FieldIndex index, char **value)
{
    if (!account || !value)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    const auto &field = account->fields[index];
    if (!field.present)
        return ACCOUNT_ERROR_RECORD_NOT_FOUND;
    char *copy = strdup(field.value.c_str());
    if (!copy)
        return ACCOUNT_ERROR_OUT_OF_MEMORY;
    *value = copy;
    return ACCOUNT_ERROR_NONE;
}

bool write_capabilities(Db &db, account_h account, int id)
{
    for (const auto &[type, capability] : account->capabilities) {
        if (!capability.changed)
            continue;
        const bool remove = capability.value == ACCOUNT_CAPABILITY_INVALID;
        Stmt write(db, remove ? "DELETE FROM capability WHERE account = ?1 AND type = ?2"
                              : "INSERT OR REPLACE INTO capability (account, type, state) VALUES (?1, ?2, ?3)");
        write.bind(1, static_cast<long long>(id)).bind(2, type);
        if (!remove)
            write.bind(3, static_cast<long long>(capability.value));
        if (!write.done())
            return false;
    }
    return true;
}

bool read_capabilities(Db &db, account_s &account)
{
    Stmt select(db, "SELECT type, state FROM capability WHERE account = ?1");
    select.bind(1, static_cast<long long>(account.id));
    while (select.row()) {
        auto &capability = account.capabilities[select.text(0)];
        capability.value = static_cast<account_capability_state_e>(select.integer(1));
        capability.present = true;
    }
    return static_cast<bool>(select);
}

} // namespace

int account_connect()
{
    if (!database())
        return ACCOUNT_ERROR_DB_FAILED;
    connections++;
    return ACCOUNT_ERROR_NONE;
}

int account_disconnect()
{
    for (int count = connections; count > 0;)
        if (connections.compare_exchange_weak(count, count - 1))
            return ACCOUNT_ERROR_NONE;
    return ACCOUNT_ERROR_DB_NOT_OPENED;
}

int account_create(account_h *account)
{
    if (!account)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    *account = new account_s;
    auto &package = (*account)->fields[PACKAGE];
    package.value = platform_package();
    package.present = !package.value.empty();
    return ACCOUNT_ERROR_NONE;
}

int account_destroy(account_h account)
{
    if (!account)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    delete account;
    return ACCOUNT_ERROR_NONE;
}

int account_set_domain_name(account_h account, const char *domain_name)
{
    return set_field(account, DOMAIN, domain_name);
}

int account_set_user_name(account_h account, const char *user_name)
{
    return set_field(account, USER, user_name);
}

int account_set_email_address(account_h account, const char *email_address)
{
    return set_field(account, EMAIL, email_address);
}

int account_set_display_name(account_h account, const char *display_name)
{
    return set_field(account, DISPLAY, display_name);
}

int account_set_icon_path(account_h account, const char *icon_path)
{
    return set_field(account, ICON, icon_path);
}

int account_set_package_name(account_h account, const char *package_name)
{
    return set_field(account, PACKAGE, package_name);
}

int account_set_capability(account_h account, const char *type, account_capability_state_e state)
{
    if (!account || !type || !*type || state < ACCOUNT_CAPABILITY_INVALID || state > ACCOUNT_CAPABILITY_ENABLED)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    account->capabilities[type].set(state);
    return ACCOUNT_ERROR_NONE;
}

int account_get_account_id(account_h account, int *account_id)
{
    if (!account || !account_id)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    if (account->id < 0)
        return ACCOUNT_ERROR_RECORD_NOT_FOUND;
    *account_id = account->id;
    return ACCOUNT_ERROR_NONE;
}

int account_get_user_name(account_h account, char **user_name)
{
    return get_field(account, USER, user_name);
}

int account_get_email_address(account_h account, char **email_address)
{
    return get_field(account, EMAIL, email_address);
}

int account_get_display_name(account_h account, char **display_name)
{
    return get_field(account, DISPLAY, display_name);
}

int account_get_icon_path(account_h account, char **icon_path)
{
    return get_field(account, ICON, icon_path);
}

int account_get_domain_name(account_h account, char **domain_name)
{
    return get_field(account, DOMAIN, domain_name);
}

int account_get_package_name(account_h account, char **package_name)
{
    return get_field(account, PACKAGE, package_name);
}

int account_get_capability(account_h account, const char *type, account_capability_state_e *state)
{
    if (!account || !type || !state)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    const auto found = account->capabilities.find(type);
    *state = found == account->capabilities.end() ? ACCOUNT_CAPABILITY_INVALID : found->second.value;
    return ACCOUNT_ERROR_NONE;
}

int account_insert_to_db(account_h account, int *account_id)
{
    if (!account || !account_id || account->fields[PACKAGE].value.empty() || account->fields[USER].value.empty())
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    if (connections == 0)
        return ACCOUNT_ERROR_DB_NOT_OPENED;
    Db *db = database();
    if (!db)
        return ACCOUNT_ERROR_DB_FAILED;
    Transaction transaction(*db);
    Stmt insert(*db,
                "INSERT INTO account (package, domain, user, email, display, icon) VALUES (?1, ?2, ?3, ?4, ?5, ?6)");
    for (int i = 0; i < FIELD_COUNT; i++)
        if (account->fields[i].present)
            insert.bind(i + 1, account->fields[i].value);
    if (!transaction.begun() || !insert.done())
        return ACCOUNT_ERROR_DB_FAILED;
    const int id = static_cast<int>(sqlite3_last_insert_rowid(db->handle.get()));
    if (!write_capabilities(*db, account, id) || !transaction.commit())
        return ACCOUNT_ERROR_DB_FAILED;
    account->id = *account_id = id;
    account->written();
    return ACCOUNT_ERROR_NONE;
}

int account_update_to_db_by_id(account_h account, int account_id)
{
    if (!account || account_id < 0)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    if (connections == 0)
        return ACCOUNT_ERROR_DB_NOT_OPENED;
    Db *db = database();
    if (!db)
        return ACCOUNT_ERROR_DB_FAILED;
    Transaction transaction(*db);
    if (!transaction.begun())
        return ACCOUNT_ERROR_DB_FAILED;
    Stmt exists(*db, "SELECT 1 FROM account WHERE id = ?1");
    if (!exists.bind(1, static_cast<long long>(account_id)).row())
        return ACCOUNT_ERROR_RECORD_NOT_FOUND;
    exists.reset();
    for (int i = 0; i < FIELD_COUNT; i++) {
        if (!account->fields[i].changed)
            continue;
        Stmt update(*db, (std::string("UPDATE account SET ") + COLUMNS[i] + " = ?1 WHERE id = ?2").c_str());
        if (!update.bind(1, account->fields[i].value).bind(2, static_cast<long long>(account_id)).done())
            return ACCOUNT_ERROR_DB_FAILED;
    }
    if (!write_capabilities(*db, account, account_id) || !transaction.commit())
        return ACCOUNT_ERROR_DB_FAILED;
    account->written();
    return ACCOUNT_ERROR_NONE;
}

static int query_accounts(account_query_cb callback, const char *package_name, void *user_data)
{
    if (connections == 0)
        return ACCOUNT_ERROR_DB_NOT_OPENED;
    Db *db = database();
    if (!db)
        return ACCOUNT_ERROR_DB_FAILED;
    // All records are read before the first call, so that the callback may write.
    std::vector<account_s> accounts;
    {
        Stmt select(*db, "SELECT id, package, domain, user, email, display, icon FROM account "
                         "WHERE ?1 IS NULL OR package = ?1 ORDER BY id");
        if (!select)
            return ACCOUNT_ERROR_DB_FAILED;
        select.bind(1, package_name);
        while (select.row()) {
            account_s &account = accounts.emplace_back();
            account.id = static_cast<int>(select.integer(0));
            for (int i = 0; i < FIELD_COUNT; i++) {
                account.fields[i].value = select.text(i + 1);
                account.fields[i].present = !select.null(i + 1);
            }
        }
    }
    for (account_s &account : accounts)
        if (!read_capabilities(*db, account))
            return ACCOUNT_ERROR_DB_FAILED;
    for (account_s &account : accounts)
        if (!callback(&account, user_data))
            break;
    return accounts.empty() ? ACCOUNT_ERROR_RECORD_NOT_FOUND : ACCOUNT_ERROR_NONE;
}

int account_query_account_by_package_name(account_query_cb callback, const char *package_name, void *user_data)
{
    if (!callback || !package_name)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    return query_accounts(callback, package_name, user_data);
}

int account_foreach_account_from_db(account_query_cb callback, void *user_data)
{
    if (!callback)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    return query_accounts(callback, nullptr, user_data);
}

int account_delete_from_db_by_package_name(const char *package_name)
{
    if (!package_name)
        return ACCOUNT_ERROR_INVALID_PARAMETER;
    if (connections == 0)
        return ACCOUNT_ERROR_DB_NOT_OPENED;
    Db *db = database();
    if (!db)
        return ACCOUNT_ERROR_DB_FAILED;
    Stmt remove(*db, "DELETE FROM account WHERE package = ?1");
    if (!remove.bind(1, package_name).done())
        return ACCOUNT_ERROR_DB_FAILED;
    return sqlite3_changes(db->handle.get()) > 0 ? ACCOUNT_ERROR_NONE : ACCOUNT_ERROR_RECORD_NOT_FOUND;
}
