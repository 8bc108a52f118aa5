#pragma once
// The notification area.

typedef struct notification_s *notification_h;
#include "app/bundle.h"

enum notification_error_e {
    NOTIFICATION_ERROR_NONE = 0,
    NOTIFICATION_ERROR_INVALID_PARAMETER = -22,
    NOTIFICATION_ERROR_OUT_OF_MEMORY = -12,
    NOTIFICATION_ERROR_IO = -5,
    NOTIFICATION_ERROR_NOT_EXIST_ID = -2001,
};

enum notification_type_e { NOTIFICATION_TYPE_NONE = -1, NOTIFICATION_TYPE_NOTI = 0, NOTIFICATION_TYPE_ONGOING = 1 };
enum notification_property_e {
    NOTIFICATION_PROP_DISABLE_AUTO_DELETE = 0x4,
    NOTIFICATION_PROP_VOLATILE_DISPLAY = 0x100,
};
enum notification_ly_type_e {
    NOTIFICATION_LY_NONE = 0,
    NOTIFICATION_LY_NOTI_EVENT_SINGLE = 1,
    NOTIFICATION_LY_NOTI_EVENT_MULTIPLE = 2,
    NOTIFICATION_LY_NOTI_THUMBNAIL = 3,
    NOTIFICATION_LY_ONGOING_EVENT = 4,
    NOTIFICATION_LY_ONGOING_PROGRESS = 5,
};
enum notification_display_app_e {
    NOTIFICATION_DISPLAY_APP_NOTIFICATION_TRAY = 0x1,
    NOTIFICATION_DISPLAY_APP_INDICATOR = 0x8,
};
enum notification_image_type_e { NOTIFICATION_IMAGE_TYPE_ICON = 0, NOTIFICATION_IMAGE_TYPE_ICON_FOR_INDICATOR = 1 };
enum notification_text_type_e {
    NOTIFICATION_TEXT_TYPE_TITLE = 0,
    NOTIFICATION_TEXT_TYPE_CONTENT = 1,
    NOTIFICATION_TEXT_TYPE_INFO_1 = 4,
    NOTIFICATION_TEXT_TYPE_INFO_SUB_2 = 7,
};
enum notification_execute_type_e { NOTIFICATION_EXECUTE_TYPE_SINGLE_LAUNCH = 1 };
enum notification_variable_type_e { NOTIFICATION_VARIABLE_TYPE_NONE = -1 };

notification_h notification_create(notification_type_e type);
int notification_set_property(notification_h noti, int flags);
int notification_set_layout(notification_h noti, notification_ly_type_e layout);
int notification_set_display_applist(notification_h noti, int app_list);
int notification_set_image(notification_h noti, notification_image_type_e type, const char *image_path);
int notification_set_text(notification_h noti, notification_text_type_e type, const char *text, const char *key,
                          int args_type, ...);
int notification_set_execute_option(notification_h noti, notification_execute_type_e type, const char *text,
                                    const char *key, bundle *service_handle);
int notification_set_pkgname(notification_h noti, const char *pkgname);
int notification_insert(notification_h noti, int *priv_id);
notification_h notification_load(const char *pkgname, int priv_id);
int notification_update_content(notification_h noti, int priv_id, const char *content);
int notification_update_progress(notification_h noti, int priv_id, double progress);
int notification_delete(notification_h noti);
int notification_delete_all_by_type(const char *pkgname, notification_type_e type);
int notification_free(notification_h noti);
int notification_status_message_post(const char *message);

// What a program that shows notifications, or a test, reads back of one. char * results are the caller's (free).
int notification_get_text(notification_h noti, notification_text_type_e type, char **text);
int notification_get_image(notification_h noti, notification_image_type_e type, char **image_path);
int notification_get_progress(notification_h noti, double *progress);
int notification_get_type(notification_h noti, notification_type_e *type);
int notification_get_property(notification_h noti, int *flags);
int notification_get_layout(notification_h noti, notification_ly_type_e *layout);
int notification_get_display_applist(notification_h noti, int *app_list);
int notification_get_execute_option(notification_h noti, notification_execute_type_e type, bundle **service_handle);
typedef bool (*notification_foreach_cb)(notification_h noti, int priv_id, void *user_data);
int notification_foreach(const char *pkgname, notification_foreach_cb callback, void *user_data);
