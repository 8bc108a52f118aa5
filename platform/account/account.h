#pragma once
// The device's account database.

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

typedef bool (*account_query_cb)(account_h account, void *user_data);

int account_connect();
int account_disconnect();
int account_create(account_h *account);
int account_destroy(account_h account);
int account_set_domain_name(account_h account, const char *domain_name);
int account_set_user_name(account_h account, const char *user_name);
int account_set_email_address(account_h account, const char *email_address);
int account_set_display_name(account_h account, const char *display_name);
int account_set_icon_path(account_h account, const char *icon_path);
int account_set_package_name(account_h account, const char *package_name);
int account_set_capability(account_h account, const char *type, account_capability_state_e state);
int account_get_account_id(account_h account, int *account_id);
int account_get_user_name(account_h account, char **user_name);
int account_get_email_address(account_h account, char **email_address);
int account_get_display_name(account_h account, char **display_name);
int account_get_icon_path(account_h account, char **icon_path);
int account_get_domain_name(account_h account, char **domain_name);
int account_get_package_name(account_h account, char **package_name);
int account_get_capability(account_h account, const char *type, account_capability_state_e *state);
int account_insert_to_db(account_h account, int *account_id);
int account_update_to_db_by_id(account_h account, int account_id);
int account_query_account_by_package_name(account_query_cb callback, const char *package_name, void *user_data);
int account_delete_from_db_by_package_name(const char *package_name);
