#pragma once
// The client of a cloud storage service: the account's folder tree in a local database, and transfers.

typedef struct cloud_content_sync_s *cloud_content_sync_h;
typedef struct cloud_content_sync_folder_s *cloud_content_sync_folder_h;
typedef struct cloud_content_sync_content_s *cloud_content_sync_content_h;

enum cloud_content_sync_error_e {
    CLOUD_CONTENT_SYNC_ERROR_NONE = 0,
    CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER = 1, // a required argument is null or malformed
    CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE = 2,        // no description of a service of that name
    CLOUD_CONTENT_SYNC_ERROR_DB_FAILED = 3,
    CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND = 4,      // no such folder, content or request
    CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT = 5,     // nobody is signed in
    CLOUD_CONTENT_SYNC_ERROR_NETWORK = 20,       // the service cannot be reached
    CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED = 21,  // the service refuses the credentials (401)
    CLOUD_CONTENT_SYNC_ERROR_SERVER = 22,        // the service answered with another error
    CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE = 23,    // the local file is missing, unreadable or not a regular file
    CLOUD_CONTENT_SYNC_ERROR_CORRUPTED = 24,     // what is stored is not what was sent
    CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN = 25,     // the service refuses the operation (403, 409, 423)
    CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL = 26,  // the account's storage is full (507)
    CLOUD_CONTENT_SYNC_ERROR_BAD_NAME = 27,      // the service cannot store a file of this name
    CLOUD_CONTENT_SYNC_ERROR_LOCAL_CHANGED = 28, // the local file changed while it was sent
};
// States of a transfer and of a refresh.
enum cloud_content_sync_state_e {
    CLOUD_CONTENT_SYNC_STATE_QUEUED = 1,
    CLOUD_CONTENT_SYNC_STATE_RUNNING = 2,
    CLOUD_CONTENT_SYNC_STATE_DONE = 3,
    CLOUD_CONTENT_SYNC_STATE_FAILED = 4,
};
enum cloud_content_sync_content_type_e {
    CLOUD_CONTENT_TYPE_NONE = 0,
    CLOUD_CONTENT_TYPE_IMAGE = 1,
    CLOUD_CONTENT_TYPE_VIDEO = 2,
    CLOUD_CONTENT_TYPE_CAMERA = 4
};

typedef void (*cloud_content_sync_transfer_cb)(int state, int file_count, int progress, int error, void *user_data);
typedef void (*cloud_content_sync_refresh_cb)(int status, int error, void *user_data);
// Return true to go on with the next one. The handle is the library's; clone it to keep it.
typedef bool (*cloud_content_sync_folder_cb)(cloud_content_sync_folder_h folder, int error, void *user_data);
typedef bool (*cloud_content_sync_content_cb)(cloud_content_sync_content_h content, int error, void *user_data);

int cloud_content_sync_create(const char *service_name, cloud_content_sync_h *handle);
int cloud_content_sync_destroy(cloud_content_sync_h handle);

int cloud_content_sync_setting_get_type_activation(cloud_content_sync_h handle, int content_type, bool *value);
int cloud_content_sync_setting_set_type_activation(cloud_content_sync_h handle, int content_type, bool value);

int cloud_content_sync_refresh_meta(cloud_content_sync_h handle, int content_types, cloud_content_sync_refresh_cb cb,
                                    void *user_data);
// Whether the database already holds one whole refresh of the signed-in account.
int cloud_content_sync_get_is_meta_complete(cloud_content_sync_h handle, bool *complete);

int cloud_content_sync_folder_get_root(cloud_content_sync_h handle, cloud_content_sync_folder_h *folder);
int cloud_content_sync_get_folder_by_server_path(cloud_content_sync_h handle, const char *path,
                                                 cloud_content_sync_folder_h *folder);
int cloud_content_sync_folder_get_parent(cloud_content_sync_folder_h folder, cloud_content_sync_folder_h *parent);
int cloud_content_sync_folder_clone(cloud_content_sync_folder_h *copy, cloud_content_sync_folder_h folder);
int cloud_content_sync_folder_destroy(cloud_content_sync_folder_h folder);
int cloud_content_sync_folder_get_path(cloud_content_sync_folder_h folder, char **path);
int cloud_content_sync_folder_get_name(cloud_content_sync_folder_h folder, char **name);
// handle may be null: the folder knows its account.
int cloud_content_sync_folder_foreach_children_folder(cloud_content_sync_h handle, cloud_content_sync_folder_h folder,
                                                      cloud_content_sync_folder_cb cb, void *user_data);
int cloud_content_sync_folder_foreach_content_from_db(cloud_content_sync_h handle, cloud_content_sync_folder_h folder,
                                                      cloud_content_sync_content_cb cb, void *user_data);
int cloud_content_sync_content_clone(cloud_content_sync_content_h *copy, cloud_content_sync_content_h content);
int cloud_content_sync_content_destroy(cloud_content_sync_content_h content);
int cloud_content_sync_content_get_name(cloud_content_sync_content_h content, char **name);
int cloud_content_sync_content_get_size(cloud_content_sync_content_h content, long long *size);
int cloud_content_sync_content_get_content_type(cloud_content_sync_content_h content, int *type);
int cloud_content_sync_content_get_is_thumbnail_exist(cloud_content_sync_content_h content, bool *exists);
int cloud_content_sync_content_get_thumbnail_path(cloud_content_sync_content_h content, char **path);

int cloud_content_sync_upload(cloud_content_sync_h handle, const char *local_path, const char *server_path, int *req_id,
                              cloud_content_sync_transfer_cb cb, void *user_data);
// Where a finished upload really landed (it may be the next free name). Known until the handle is destroyed.
int cloud_content_sync_get_uploaded_path(cloud_content_sync_h handle, int req_id, char **server_path);
int cloud_content_sync_cancel(cloud_content_sync_h handle, int req_id);

// The credentials by which the device's user is known to a service, as a sign-in or a set-up tool leaves them.
// user null: bearer token in secret; otherwise HTTP Basic.
int cloud_content_sync_credentials_set(const char *service_name, const char *user, const char *secret);
