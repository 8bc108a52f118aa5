#pragma once
// Launch requests between applications, and their replies. It needs no window system.

typedef struct app_control_s *app_control_h;
#include "app/bundle.h"

enum app_control_error_e {
    APP_CONTROL_ERROR_NONE = 0,
    APP_CONTROL_ERROR_INVALID_PARAMETER = -22,
    APP_CONTROL_ERROR_OUT_OF_MEMORY = -12,
    APP_CONTROL_ERROR_KEY_NOT_FOUND = -5001,
    APP_CONTROL_ERROR_APP_NOT_FOUND = -5002,
    APP_CONTROL_ERROR_LAUNCH_REJECTED = -5003,
    APP_CONTROL_ERROR_INVALID_DATA_TYPE = -5004,
};
enum app_control_result_e {
    APP_CONTROL_RESULT_SUCCEEDED = 0,
    APP_CONTROL_RESULT_FAILED = -1,
    APP_CONTROL_RESULT_CANCELED = -2,
};

#define APP_CONTROL_OPERATION_PREFIX "http://orvant.com/appcontrol/operation/"
#define APP_CONTROL_OPERATION_SHARE APP_CONTROL_OPERATION_PREFIX "share"
#define APP_CONTROL_OPERATION_MULTI_SHARE APP_CONTROL_OPERATION_PREFIX "multi_share"
#define APP_CONTROL_OPERATION_VIEW APP_CONTROL_OPERATION_PREFIX "view"
#define APP_CONTROL_OPERATION_ACCOUNT_ADD APP_CONTROL_OPERATION_PREFIX "account/add"
#define APP_CONTROL_OPERATION_ACCOUNT_CONFIGURE APP_CONTROL_OPERATION_PREFIX "account/configure"
#define APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD APP_CONTROL_OPERATION_PREFIX "notification/upload"
#define APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD_RESULT APP_CONTROL_OPERATION_PREFIX "notification/upload_result"
#define APP_CONTROL_OPERATION_SETTING_WIFI APP_CONTROL_OPERATION_PREFIX "setting/WIFI"
#define APP_CONTROL_OPERATION_SETTING_MOBILE_NETWORK APP_CONTROL_OPERATION_PREFIX "setting/mobile_network"
#define APP_CONTROL_DATA_PATH "http://orvant.com/appcontrol/data/path"

// The id under which this process sends requests and owns accounts and notifications.
void app_set_id(const char *app_id);
const char *app_get_id();

typedef void (*app_control_reply_cb)(app_control_h request, app_control_h reply, app_control_result_e result,
                                     void *user_data);
typedef bool (*app_control_app_matched_cb)(app_control_h request, const char *app_id, void *user_data);
typedef bool (*app_control_extra_data_cb)(app_control_h request, const char *key, void *user_data);

int app_control_create(app_control_h *request);
int app_control_destroy(app_control_h request);
int app_control_clone(app_control_h *clone, app_control_h request);
int app_control_set_operation(app_control_h request, const char *operation);
int app_control_get_operation(app_control_h request, char **operation);
int app_control_set_uri(app_control_h request, const char *uri);
int app_control_get_uri(app_control_h request, char **uri);
int app_control_set_mime(app_control_h request, const char *mime);
int app_control_get_mime(app_control_h request, char **mime);
int app_control_set_app_id(app_control_h request, const char *app_id);
int app_control_get_app_id(app_control_h request, char **app_id);
int app_control_set_window(app_control_h request, unsigned int xwin);
int app_control_get_window(app_control_h request, unsigned int *xwin);
int app_control_add_extra_data(app_control_h request, const char *key, const char *value);
int app_control_get_extra_data(app_control_h request, const char *key, char **value);
int app_control_add_extra_data_array(app_control_h request, const char *key, const char *values[], int length);
int app_control_get_extra_data_array(app_control_h request, const char *key, char ***values, int *length);
int app_control_foreach_extra_data(app_control_h request, app_control_extra_data_cb callback, void *user_data);
int app_control_foreach_app_matched(app_control_h request, app_control_app_matched_cb callback, void *user_data);
int app_control_send_launch_request(app_control_h request, app_control_reply_cb callback, void *user_data);
int app_control_reply_to_launch_request(app_control_h reply, app_control_h request, app_control_result_e result);
int app_control_to_bundle(app_control_h request, bundle **out); // the bundle belongs to the request
int app_control_from_bundle(const bundle *data, app_control_h *request);
