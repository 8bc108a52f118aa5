#pragma once
// Launch requests between applications, and their replies. It needs no window system.
//
// A request is a record: what to do (the operation), on what (URI, MIME type), by whom (an application id; without one
// the platform chooses), the sender's window, and extra data: texts or arrays of texts by key. All texts are bytes that
// end with NUL: a file name comes through as it is, UTF-8 or not.
//
// Over the session bus an application owns its id as its bus name and answers there to org.freedesktop.Application
// (desktop entries of freedesktop.org, 1.5, "D-Bus Activation") and to
//   com.orvant.AppControl.Launch (in a{sv} request, out a{sv} reply)
// whose answer comes when the application replies. Without a bus a request is handed over on the command line.
//
// Rules for all functions below. Handles given to a function are borrowed, handles and texts that come out belong to
// the caller (destroy handles with app_control_destroy, release texts with free); what is an exception says so. Results
// are app_control_error_e: a null handle, or a null pointer where a value is needed, gives INVALID_PARAMETER and
// changes nothing. Records may be made, filled, read and bundled on any thread, one thread at a time for one record.
// Sending, replying and matching belong to the main thread, where every callback runs too.

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
// The files of a multi_share: an array of absolute paths (a "file://" in front is allowed, percent escapes are not).
#define APP_CONTROL_DATA_PATH "http://orvant.com/appcontrol/data/path"

// The id under which this process receives and sends requests and owns accounts and notifications, in the form of a
// D-Bus name ("com.example.viewer"). Set it once, before threads are started and before app_efl_main. Unset it is the
// program's file name. app_get_id gives a text that stays valid until the next app_set_id.
void app_set_id(const char *app_id);
const char *app_get_id();

// A further id under which this process receives requests, for an application with several faces (a settings page and
// a share target, say). Each id has a desktop entry file of its own. Call it before app_efl_main.
void app_add_alias(const char *app_id);

// `reply` is null when the receiver gave none. Both handles are valid during the call.
typedef void (*app_control_reply_cb)(app_control_h request, app_control_h reply, app_control_result_e result,
                                     void *user_data);
// Each of these two returns true to go on, false to stop. The texts are valid during the call.
typedef bool (*app_control_app_matched_cb)(app_control_h request, const char *app_id, void *user_data);
typedef bool (*app_control_extra_data_cb)(app_control_h request, const char *key, void *user_data);

int app_control_create(app_control_h *request);
// When the last copy of a received request goes away unanswered, its sender is told CANCELED.
int app_control_destroy(app_control_h request);
// A copy of everything, and a reply to the copy is a reply to the original. `*clone` is overwritten, not destroyed.
int app_control_clone(app_control_h *clone, app_control_h request);

// The setters copy; null takes the value away. The getters give null (0 for the window) with ERROR_NONE when there is
// no value. The window is an X window id.
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

// Extra data: a key's earlier value is replaced. Null entries of `values` are left out; `length` may be 0. The getters
// give null and KEY_NOT_FOUND for a missing key, INVALID_DATA_TYPE for a text that is an array or the reverse.
// `*values` is one allocation per text and one for the array, which ends with a null that `*length` does not count.
int app_control_add_extra_data(app_control_h request, const char *key, const char *value);
int app_control_get_extra_data(app_control_h request, const char *key, char **value);
int app_control_add_extra_data_array(app_control_h request, const char *key, const char *values[], int length);
int app_control_get_extra_data_array(app_control_h request, const char *key, char ***values, int *length);
// In the order in which the keys were first added. The callback may change the record.
int app_control_foreach_extra_data(app_control_h request, app_control_extra_data_cb callback, void *user_data);

// Calls back once for each installed application that can show the request's MIME type (without one, the type guessed
// from the URI), the user's default first, without this application
// itself. The ids are desktop file ids without ".desktop". No application is not an
// error. A request with another operation than view matches none.
int app_control_foreach_app_matched(app_control_h request, app_control_app_matched_cb callback, void *user_data);

// Sends the request to the application of its id, which is started when it does not run. An ordinary desktop program
// gets the URI, or the array APP_CONTROL_DATA_PATH. A request to view, or for a settings page, that names no
// application or one that is not installed goes to what the desktop has for it. APP_NOT_FOUND: nobody takes the
// request; LAUNCH_REJECTED: the program could not be started. With NONE a callback that is not null runs exactly once,
// later: SUCCEEDED, FAILED or CANCELED as the receiver replied, SUCCEEDED when an ordinary program was started,
// CANCELED when the receiver left without a reply, FAILED when it could not be reached or turned the request down,
// which it does while 1,000 requests, or 128 MiB of them, wait there for their answer. There is no time limit: a person
// may be at work there.
int app_control_send_launch_request(app_control_h request, app_control_reply_cb callback, void *user_data);

// Answers a received request (or its clone). `reply` may be null. INVALID_PARAMETER: the request was not received from
// anybody; LAUNCH_REJECTED: it has been answered before. A sender that does not wait for a reply is no error.
int app_control_reply_to_launch_request(app_control_h reply, app_control_h request, app_control_result_e result);

// The request as a text (see bundle.h). The bundle belongs to the request: it is valid until the next
// app_control_to_bundle or app_control_destroy of the same request, and later changes of the request do not show in it.
int app_control_to_bundle(app_control_h request, bundle **out);
// INVALID_PARAMETER when the text is not such a request.
int app_control_from_bundle(const bundle *data, app_control_h *request);
