#pragma once
// The notification area.
//
// Notifications are kept in a store that all of the user's programs share, the SQLite database "notifications.db" in
// platform_data_dir(), and stay after the program that posted them has left. On a session bus with a notification
// daemon (org.freedesktop.Notifications, desktop notifications 1.2) a small program, notification-agent,
// shows what the store holds and acts on taps; this library starts it when it does not run. Without a bus or a daemon
// everything works on the store alone.
//
// A handle is a notification in memory. Any thread may call, and the functions keep no state between calls; one handle
// must not be used by two threads at once. No call waits for the bus: a call writes the store at most. Texts are
// copied in. A null handle or argument gives NOTIFICATION_ERROR_INVALID_PARAMETER, a store that fails
// NOTIFICATION_ERROR_IO; results are written on success alone.

typedef struct notification_s *notification_h;
#include "app/bundle.h"

enum notification_error_e {
    NOTIFICATION_ERROR_NONE = 0,
    NOTIFICATION_ERROR_INVALID_PARAMETER = -22,
    NOTIFICATION_ERROR_OUT_OF_MEMORY = -12,
    NOTIFICATION_ERROR_IO = -5,
    NOTIFICATION_ERROR_NOT_EXIST_ID = -2001,
};

// A normal notification is there until the user taps or removes it; an ongoing one until its program deletes it or
// the process that posted it has ended.
enum notification_type_e { NOTIFICATION_TYPE_NONE = -1, NOTIFICATION_TYPE_NOTI = 0, NOTIFICATION_TYPE_ONGOING = 1 };
enum notification_property_e {
    NOTIFICATION_PROP_DISABLE_AUTO_DELETE = 0x4, // a tap does not remove it
    NOTIFICATION_PROP_VOLATILE_DISPLAY = 0x100,  // it is gone when the machine starts again
};
enum notification_ly_type_e {
    NOTIFICATION_LY_NONE = 0,
    NOTIFICATION_LY_NOTI_EVENT_SINGLE = 1,
    NOTIFICATION_LY_NOTI_EVENT_MULTIPLE = 2,
    NOTIFICATION_LY_NOTI_THUMBNAIL = 3,
    NOTIFICATION_LY_ONGOING_EVENT = 4,
    NOTIFICATION_LY_ONGOING_PROGRESS = 5, // with a progress bar
};
// Where it is shown. Desktop daemons have the tray alone: without its bit nothing is shown.
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

// Makes an empty notification in memory: of this process's package (platform_package()), for the tray. Null for a type
// that is neither of the two. notification_free frees the handle and leaves the store alone.
notification_h notification_create(notification_type_e type);
int notification_free(notification_h noti);

// Set a part of the notification in memory; notification_insert writes it. `flags` is an OR of notification_property_e,
// `app_list` one of notification_display_app_e.
int notification_set_property(notification_h noti, int flags);
int notification_set_layout(notification_h noti, notification_ly_type_e layout);
int notification_set_display_applist(notification_h noti, int app_list);
// A picture file's path.
int notification_set_image(notification_h noti, notification_image_type_e type, const char *image_path);
// A plain text (markup characters are shown as they stand); null takes it away. Texts are ready to be shown: `key` is
// not used, and the argument list must end at once with NOTIFICATION_VARIABLE_TYPE_NONE.
int notification_set_text(notification_h noti, notification_text_type_e type, const char *text, const char *key,
                          int args_type, ...);
// The launch request (app_control_to_bundle) that a tap sends; the bundle is copied. `text` and `key` are not used.
int notification_set_execute_option(notification_h noti, notification_execute_type_e type, const char *text,
                                    const char *key, bundle *service_handle);
int notification_set_pkgname(notification_h noti, const char *pkgname);

// Names, before it is posted, what is to become of an ongoing notification when its process ends without deleting it,
// or the machine does: a normal one with this content, and the same title, pictures and launch request.
int notification_set_heir(notification_h noti, const char *content);

// Posts the notification and gives its private id, 1 or more and never used again; `priv_id` may be null.
// NOTIFICATION_ERROR_INVALID_PARAMETER without a package.
int notification_insert(notification_h noti, int *priv_id);

// A handle of a posted notification, for the caller to free with notification_free; null when the package has none of
// this id (the user may have removed it).
notification_h notification_load(const char *pkgname, int priv_id);

// Change one part of the posted notification `priv_id` of the handle's package, in the store and in the handle.
// `progress` is from 0.0 to 1.0 and held within that. NOTIFICATION_ERROR_NOT_EXIST_ID when it is gone. The last of the
// changes in quick succession is what the user gets to see.
int notification_update_content(notification_h noti, int priv_id, const char *content);
int notification_update_progress(notification_h noti, int priv_id, double progress);

// Takes the posted notification away; the handle still wants notification_free. NOTIFICATION_ERROR_NOT_EXIST_ID when it
// was never posted or is gone.
int notification_delete(notification_h noti);
// Takes all notifications of a package and a type away (NOTIFICATION_TYPE_NONE: of both types). None is no error.
int notification_delete_all_by_type(const char *pkgname, notification_type_e type);

// Shows a short text for three seconds that is kept nowhere. Without a daemon it goes to the log, as a warning.
int notification_status_message_post(const char *message);

// What a program that shows notifications, or a test, reads back of one. char * results are the caller's (free), null
// for what was never set. The bundle belongs to the handle; null when a tap sends nothing.
int notification_get_text(notification_h noti, notification_text_type_e type, char **text);
int notification_get_image(notification_h noti, notification_image_type_e type, char **image_path);
int notification_get_progress(notification_h noti, double *progress);
int notification_get_type(notification_h noti, notification_type_e *type);
int notification_get_property(notification_h noti, int *flags);
int notification_get_layout(notification_h noti, notification_ly_type_e *layout);
int notification_get_display_applist(notification_h noti, int *app_list);
int notification_get_execute_option(notification_h noti, notification_execute_type_e type, bundle **service_handle);

// Calls back with each posted notification of a package (null: of all), oldest first, until the callback returns false.
// The handle is valid during the call; the callback may post, change and delete.
typedef bool (*notification_foreach_cb)(notification_h noti, int priv_id, void *user_data);
int notification_foreach(const char *pkgname, notification_foreach_cb callback, void *user_data);
