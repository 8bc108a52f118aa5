#pragma once
// The records of the device's account database as text.
#include "account/account.h"
#include "temp_home.h"
#include <vector>

// Each record of a package as "ID DOMAIN USER MAIL SHOWN ICON PHOTO VIDEO"; the last two are states of capabilities.
// `result` is the query's. There must be a connection.
inline std::vector<std::string> read_accounts(const char *package, int *result = nullptr)
{
    std::vector<std::string> all;
    const auto add = [](account_h account, void *data) {
        int id = -1;
        account_get_account_id(account, &id);
        std::string line = std::to_string(id);
        for (auto *get : {account_get_domain_name, account_get_user_name, account_get_email_address,
                          account_get_display_name, account_get_icon_path}) {
            char *text = nullptr;
            get(account, &text);
            line += " " + (text ? taken(text) : "-");
        }
        for (const char *type : {ACCOUNT_SUPPORTS_CAPABILITY_PHOTO, ACCOUNT_SUPPORTS_CAPABILITY_VIDEO}) {
            account_capability_state_e state = ACCOUNT_CAPABILITY_INVALID;
            account_get_capability(account, type, &state);
            line += " " + std::to_string(state);
        }
        static_cast<std::vector<std::string> *>(data)->push_back(line);
        return true;
    };
    const int queried = account_query_account_by_package_name(add, package, &all);
    if (result)
        *result = queried;
    return all;
}
