#pragma once
// The device's account database: the SQLite file "accounts.db" in platform_data_dir(), shared by all programs of the
// user.
//
// A handle is a record in memory; only account_insert_to_db, _update_to_db_by_id, _query_... and _delete_... touch the
// database, and they need a connection (ACCOUNT_ERROR_DB_NOT_OPENED without one). Any thread may call; one handle must
// not be used by two threads at once. Texts are copied in; char * results are the caller's to release with free(). A
// null argument gives ACCOUNT_ERROR_INVALID_PARAMETER everywhere; results are written on success alone.

typedef struct account_s *account_h;

enum account_error_e {
    ACCOUNT_ERROR_NONE = 0,
    ACCOUNT_ERROR_INVALID_PARAMETER = -22,
    ACCOUNT_ERROR_OUT_OF_MEMORY = -12,
    ACCOUNT_ERROR_DB_FAILED = -1001,
    ACCOUNT_ERROR_DB_NOT_OPENED = -1002,
    ACCOUNT_ERROR_RECORD_NOT_FOUND = -1003,
};

enum account_capability_state_e {
    ACCOUNT_CAPABILITY_INVALID = 0,
    ACCOUNT_CAPABILITY_DISABLED = 1,
    ACCOUNT_CAPABILITY_ENABLED = 2,
};

#define ACCOUNT_SUPPORTS_CAPABILITY_PHOTO "http://orvant.com/account/capability/photo"
#define ACCOUNT_SUPPORTS_CAPABILITY_VIDEO "http://orvant.com/account/capability/video"

// One record of a query, valid during the call. The callback may read and set its fields and write the database; false
// ends the walk.
typedef bool (*account_query_cb)(account_h account, void *user_data);

// Connections are counted per process: each successful account_connect wants one account_disconnect. The first one
// opens the database; ACCOUNT_ERROR_DB_FAILED when that fails. Disconnecting more often gives
// ACCOUNT_ERROR_DB_NOT_OPENED.
int account_connect();
int account_disconnect();

// Makes an empty record, owned by this process's package (platform_package()). account_destroy frees it.
int account_create(account_h *account);
int account_destroy(account_h account);

// Set a field of the record in memory. account_set_package_name is for set-up tools: an application leaves the package
// that account_create fills in.
int account_set_domain_name(account_h account, const char *domain_name);
int account_set_user_name(account_h account, const char *user_name);
int account_set_email_address(account_h account, const char *email_address);
int account_set_display_name(account_h account, const char *display_name);
int account_set_icon_path(account_h account, const char *icon_path);
int account_set_package_name(account_h account, const char *package_name);
// `type` is one of ACCOUNT_SUPPORTS_CAPABILITY_*; ACCOUNT_CAPABILITY_INVALID takes the capability away.
int account_set_capability(account_h account, const char *type, account_capability_state_e state);

// Read a field of the record in memory. The id of a record that is not in the database and a text that was never set
// give ACCOUNT_ERROR_RECORD_NOT_FOUND; a capability that was never set is ACCOUNT_CAPABILITY_INVALID.
int account_get_account_id(account_h account, int *account_id);
int account_get_user_name(account_h account, char **user_name);
int account_get_email_address(account_h account, char **email_address);
int account_get_display_name(account_h account, char **display_name);
int account_get_icon_path(account_h account, char **icon_path);
int account_get_domain_name(account_h account, char **domain_name);
int account_get_package_name(account_h account, char **package_name);
int account_get_capability(account_h account, const char *type, account_capability_state_e *state);

// Writes a new record and gives its id, 1 or more; ids are not used again. ACCOUNT_ERROR_INVALID_PARAMETER without a
// package or a user name. A package has at most one record for a user name in a domain: a second one gives
// ACCOUNT_ERROR_DB_FAILED, as every failure of the database does.
int account_insert_to_db(account_h account, int *account_id);
// Writes the fields and capabilities that were set on this handle since it was made, read or last written, and leaves
// all others of the record as they are; the package counts only when account_set_package_name set it.
// ACCOUNT_ERROR_RECORD_NOT_FOUND when no record has the id.
int account_update_to_db_by_id(account_h account, int account_id);
// Calls back for each record of a package, oldest first. ACCOUNT_ERROR_RECORD_NOT_FOUND when it has none.
int account_query_account_by_package_name(account_query_cb callback, const char *package_name, void *user_data);
// The same for the records of all packages.
int account_foreach_account_from_db(account_query_cb callback, void *user_data);
// Deletes all records of a package. ACCOUNT_ERROR_RECORD_NOT_FOUND when it has none.
int account_delete_from_db_by_package_name(const char *package_name);
