#pragma once
// The application's record in the device's account database.
#include "velora_common/velora_app_data.h"

struct AccountInfo {
    int account_id = 0;
    char *user_name = nullptr; // the e-mail address
    char *domain_name = nullptr;
};

// Writes the record of the signed-in account, or updates the one that is there, and publishes which kinds of media it
// synchronises. 0, or -1 when the account service fails (logged). Main loop only.
int _velora_common_account_insert(CloudSyncHandle handle, const char *email);

// 0 when the account database holds a record of that package; *out is then the caller's, freed with
// __velora_account_info_free. -1 when it holds none or cannot be reached; *out is then as it was. Main loop only.
int __velora_check_account_exist(const char *package_name, AccountInfo **out);
void __velora_account_info_free(AccountInfo *info);

// The device's record and the cloud client's credentials tell of one account or of none: the credentials decide. A
// record without them goes, and credentials without a record get one: what was broken off is brought to its end. With
// a service that is not known nothing is changed. Main loop only.
void _velora_common_account_settle();

// Deletes the record; the account service's result, or -1 when it cannot be reached. Main loop only.
int _velora_common_account_remove_info_from_db();
