#include "velora_common/velora_account.h"
#include "account/account.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_paths.h"
#include <cstdlib>

struct Capabilities {
    account_capability_state_e photo = ACCOUNT_CAPABILITY_ENABLED;
    account_capability_state_e video = ACCOUNT_CAPABILITY_ENABLED;
};

static account_capability_state_e __get_content_sync_setting_type_activation(CloudSyncHandle handle, int content_type)
{
    bool value = true;
    if (cloud_content_sync_setting_get_type_activation(handle, content_type, &value) != 0) {
        VELORA_LOGE("cloud_content_sync_setting_get_type_activation failed");
        return ACCOUNT_CAPABILITY_ENABLED;
    }
    return value ? ACCOUNT_CAPABILITY_ENABLED : ACCOUNT_CAPABILITY_DISABLED;
}

static bool __velora_common_account_update_capability_callback(account_h account, void *user_data)
{
    const auto *values = static_cast<const Capabilities *>(user_data);
    if (!values) {
        VELORA_LOGE("out_acc_info is NULL");
        return true;
    }
    int id = -1;
    if (const int result = account_get_account_id(account, &id); result != ACCOUNT_ERROR_NONE)
        VELORA_LOGE("account_get_account_id failed: %d", result);
    account_set_capability(account, ACCOUNT_SUPPORTS_CAPABILITY_PHOTO, values->photo);
    account_set_capability(account, ACCOUNT_SUPPORTS_CAPABILITY_VIDEO, values->video);
    if (const int result = account_update_to_db_by_id(account, id); result != ACCOUNT_ERROR_NONE)
        VELORA_LOGE("account_update_to_db_by_id failed: %d", result);
    return true;
}

static bool __velora_account_get_id_cb(account_h account, void *user_data)
{
    account_get_account_id(account, static_cast<int *>(user_data));
    return true;
}

static int __velora_account_write(account_h account, const char *email)
{
    const std::string icon = _velora_common_app_file("res/images/com.orvant.velora.png");
    if (account_set_domain_name(account, VELORA_SERVICE) != ACCOUNT_ERROR_NONE ||
        account_set_user_name(account, email) != ACCOUNT_ERROR_NONE ||
        account_set_email_address(account, email) != ACCOUNT_ERROR_NONE ||
        account_set_display_name(account, email) != ACCOUNT_ERROR_NONE ||
        account_set_icon_path(account, icon.c_str()) != ACCOUNT_ERROR_NONE)
        return -1;
    int id = -1;
    if (account_query_account_by_package_name(__velora_account_get_id_cb, VELORA_PACKAGE, &id) == ACCOUNT_ERROR_NONE)
        return id >= 0 && account_update_to_db_by_id(account, id) != ACCOUNT_ERROR_NONE ? -1 : 0;
    if (account_insert_to_db(account, &id) != ACCOUNT_ERROR_NONE) {
        VELORA_LOGE("account_insert_to_db fail");
        return -1;
    }
    return 0;
}

int _velora_common_account_insert(CloudSyncHandle handle, const char *email)
{
    int result = -1;
    if (account_connect() == ACCOUNT_ERROR_NONE) {
        account_h account = nullptr;
        if (account_create(&account) == ACCOUNT_ERROR_NONE) {
            result = __velora_account_write(account, email);
            account_destroy(account);
        }
        account_disconnect();
    }
    if (result != 0) {
        VELORA_LOGE("__velora_account_set_info_to_db failed");
        return -1;
    }
    Capabilities values;
    values.photo = __get_content_sync_setting_type_activation(handle, CLOUD_CONTENT_TYPE_IMAGE);
    values.video = __get_content_sync_setting_type_activation(handle, CLOUD_CONTENT_TYPE_VIDEO);
    if (account_connect() != ACCOUNT_ERROR_NONE)
        return 0;
    account_query_account_by_package_name(__velora_common_account_update_capability_callback, VELORA_PACKAGE, &values);
    account_disconnect();
    return 0;
}

static bool __velora_account_cb(account_h account, void *user_data)
{
    char *user_name = nullptr;
    if (account_get_user_name(account, &user_name) != ACCOUNT_ERROR_NONE)
        return false;
    int id = 0;
    char *domain_name = nullptr;
    if (account_get_account_id(account, &id) != ACCOUNT_ERROR_NONE ||
        account_get_domain_name(account, &domain_name) != ACCOUNT_ERROR_NONE) {
        std::free(user_name);
        return true;
    }
    auto **out = static_cast<AccountInfo **>(user_data);
    __velora_account_info_free(*out); // an earlier record of the same package
    *out = new AccountInfo{.account_id = id, .user_name = user_name, .domain_name = domain_name};
    return true;
}

int __velora_check_account_exist(const char *package_name, AccountInfo **out)
{
    if (account_connect() != ACCOUNT_ERROR_NONE)
        return -1;
    AccountInfo *found = nullptr;
    const int result = account_query_account_by_package_name(__velora_account_cb, package_name, &found);
    account_disconnect();
    if (result != ACCOUNT_ERROR_NONE || !found) {
        __velora_account_info_free(found);
        return -1;
    }
    *out = found;
    return 0;
}

void __velora_account_info_free(AccountInfo *info)
{
    if (!info)
        return;
    std::free(info->user_name);
    std::free(info->domain_name);
    delete info;
}

void _velora_common_account_settle()
{
    char *email = nullptr;
    const int signed_in = cloud_content_sync_account_get_email(VELORA_SERVICE, &email);
    AccountInfo *info = nullptr;
    const bool is_recorded = __velora_check_account_exist(VELORA_PACKAGE, &info) == 0;
    if (signed_in == CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT && is_recorded) {
        VELORA_LOGI("the record of an account that is not signed in goes");
        _velora_common_account_remove_info_from_db();
    } else if (signed_in == 0 && *email && (!is_recorded || g_strcmp0(info->user_name, email) != 0)) {
        VELORA_LOGI("the account that is signed in gets its record");
        _velora_common_account_insert(nullptr, email);
    }
    std::free(email);
    __velora_account_info_free(info);
}

int _velora_common_account_remove_info_from_db()
{
    if (account_connect() != ACCOUNT_ERROR_NONE)
        return -1;
    const int result = account_delete_from_db_by_package_name(VELORA_PACKAGE);
    account_disconnect();
    return result;
}
