#pragma once
// The client of a cloud storage service: the account's folder tree in a local database, and transfers.
//
// The service is a WebDAV server (RFC 4918). It is found by its name in a description file, see README.md here.
//
// Threads. Every function may be called from any thread, also from within a callback. Callbacks of transfers,
// refreshes, content requests and thumbnails run on the client's own thread, one per handle and one callback at a time;
// those that list folders and contents run on the caller's thread, before the function returns. A callback that waits
// holds up the client's other transfers.
//
// Results. Functions answer one of cloud_content_sync_error_e; output arguments are written only when it is 0. What
// can only be known later, a missing account included, is reported by the callback.
//
// Ownership. Strings given to the client are borrowed until the function returns. Strings it gives (char **) are the
// caller's to free(). Folder and content handles that a function gives are the caller's to destroy; they stay usable
// after the client's handle is destroyed.
//
// Names are bytes as the service has them: UTF-8 as a rule, but nothing forbids others. Server paths begin with "/",
// are not percent-encoded, and do not end in "/" but for the root.

typedef struct cloud_content_sync_s *cloud_content_sync_h;
typedef struct cloud_content_sync_folder_s *cloud_content_sync_folder_h;
typedef struct cloud_content_sync_content_s *cloud_content_sync_content_h;

enum cloud_content_sync_error_e {
    CLOUD_CONTENT_SYNC_ERROR_NONE = 0,
    CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER = 1, // a required argument is null or malformed
    CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE = 2,        // no description of a service of that name
    CLOUD_CONTENT_SYNC_ERROR_DB_FAILED = 3,
    CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND = 4,        // no such folder, content or request
    CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT = 5,       // nobody is signed in
    CLOUD_CONTENT_SYNC_ERROR_NETWORK = 20,         // the service cannot be reached
    CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED = 21,    // the service refuses the credentials (401)
    CLOUD_CONTENT_SYNC_ERROR_SERVER = 22,          // the service answered with another error
    CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE = 23,      // the local file is missing, unreadable or a folder
    CLOUD_CONTENT_SYNC_ERROR_CORRUPTED = 24,       // what is stored is not what was sent
    CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN = 25,       // the service refuses the operation (403, 409, 423)
    CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL = 26,    // the account's storage is full (507)
    CLOUD_CONTENT_SYNC_ERROR_BAD_NAME = 27,        // the service cannot store a file of this name
    CLOUD_CONTENT_SYNC_ERROR_LOCAL_CHANGED = 28,   // the local file changed while it was sent
    CLOUD_CONTENT_SYNC_ERROR_CERTIFICATE = 29,     // the service's certificate is not to be trusted; of a sign-in alone
    CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE = 32,   // the local file is not one that somebody can have meant to upload
    CLOUD_CONTENT_SYNC_ERROR_OUTCOME_UNKNOWN = 30, // it may be stored; another upload of the same paths looks first
    CLOUD_CONTENT_SYNC_ERROR_UNSAFE = 31,          // the service would replace other files, nothing is uploaded to it
};
// States of a transfer and of a refresh. Callbacks bring RUNNING, DONE and FAILED; what is queued is silent.
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

// state: RUNNING any number of times, with `progress` 0 to 100 in percent of the bytes sent, which never goes back;
// then exactly once DONE (progress 100) or FAILED (error not 0). file_count is 1. Client thread.
typedef void (*cloud_content_sync_transfer_cb)(int state, int file_count, int progress, int error, void *user_data);
// status: exactly once DONE, or FAILED with an error that is not 0. Client thread.
typedef void (*cloud_content_sync_refresh_cb)(int status, int error, void *user_data);
// Return true to go on with the next one. The handle is the library's; clone it to keep it. error is 0.
typedef bool (*cloud_content_sync_folder_cb)(cloud_content_sync_folder_h folder, int error, void *user_data);
typedef bool (*cloud_content_sync_content_cb)(cloud_content_sync_content_h content, int error, void *user_data);

// Opens a client of the service; nothing is sent. NO_SERVICE without a usable description. Where the service's database
// cannot be opened, on a full or read-only disk, the client goes on with a copy of it in memory. Nobody needs to be
// signed in: requests then fail with NO_ACCOUNT.
int cloud_content_sync_create(const char *service_name, cloud_content_sync_h *handle);
// Ends all requests and frees the handle. No callback runs any more on return: one that is running is waited for,
// unless this is called from within it. Transfers in progress are broken off by closing their connection.
int cloud_content_sync_destroy(cloud_content_sync_h handle);

// Whether a content type (one of IMAGE, VIDEO, CAMERA) is to be kept in step, at first true. It is a setting of the
// account that is signed in: others do not see it, it is there again when that account takes the place of another, and
// goes when the account is signed out. With nobody signed in it reads as true, and setting it answers NO_ACCOUNT.
int cloud_content_sync_setting_get_type_activation(cloud_content_sync_h handle, int content_type, bool *value);
int cloud_content_sync_setting_set_type_activation(cloud_content_sync_h handle, int content_type, bool value);
// Whether what the camera makes is to be uploaded by itself; a setting of the account as the above is, at first false,
// and with nobody signed in. Whoever holds a handle may act on it; this library does not.
int cloud_content_sync_setting_get_camera_upload(cloud_content_sync_h handle, bool *value);
int cloud_content_sync_setting_set_camera_upload(cloud_content_sync_h handle, bool value);
// The same for: whether a content type is to be transferred over Wi-Fi alone.
int cloud_content_sync_setting_get_wifi_only_type(cloud_content_sync_h handle, int content_type, bool *value);
int cloud_content_sync_setting_set_wifi_only_type(cloud_content_sync_h handle, int content_type, bool value);

// Asks the service how much of the account's storage there is and how much of it is used, in bytes. Returns at once;
// INVALID_PARAMETER for a null handle or callback, and there is no callback then. Otherwise there is exactly one, on
// the client's thread, unless the cancel below or destroy comes first: status DONE and error 0, with total 0 where the
// service names no bound (RFC 4331); or FAILED, with 0 and 0, and an error: NO_ACCOUNT, NETWORK, UNAUTHORIZED, SERVER.
// Several may be asked for; each is answered.
typedef void (*cloud_content_sync_storage_cb)(int status, unsigned long long total, unsigned long long used, int error,
                                              void *user_data);
int cloud_content_sync_get_server_storage_info(cloud_content_sync_h handle, cloud_content_sync_storage_cb cb,
                                               void *user_data);
// Ends the questions with this user_data, which then have no callback; one that is running is waited for, unless this
// is called from within it. NOT_FOUND when there is none.
int cloud_content_sync_cancel_server_storage_info(cloud_content_sync_h handle, void *user_data);

// Fetches the account's whole tree and puts it in the place of what the database held; a refresh that fails changes
// nothing. content_types: a sum of content types, not 0; folders and files of every type are fetched whatever it is. cb
// may be null. Refreshes asked for while one runs are answered together by a second one. NO_ACCOUNT, NETWORK,
// UNAUTHORIZED, SERVER, FORBIDDEN and DB_FAILED are reported by the callback.
int cloud_content_sync_refresh_meta(cloud_content_sync_h handle, int content_types, cloud_content_sync_refresh_cb cb,
                                    void *user_data);
// Whether the database already holds one whole refresh of the signed-in account.
int cloud_content_sync_get_is_meta_complete(cloud_content_sync_h handle, bool *complete);

// The root: path "/", named as the service. It is there before the first refresh as well.
int cloud_content_sync_folder_get_root(cloud_content_sync_h handle, cloud_content_sync_folder_h *folder);
// A folder of the database; a final "/" of the path is ignored. NOT_FOUND when there is none, INVALID_PARAMETER when
// the path is not absolute or has an empty, "." or ".." segment.
int cloud_content_sync_get_folder_by_server_path(cloud_content_sync_h handle, const char *path,
                                                 cloud_content_sync_folder_h *folder);
// NOT_FOUND for the root, and when the parent is gone from the database.
int cloud_content_sync_folder_get_parent(cloud_content_sync_folder_h folder, cloud_content_sync_folder_h *parent);
int cloud_content_sync_folder_clone(cloud_content_sync_folder_h *copy, cloud_content_sync_folder_h folder);
int cloud_content_sync_folder_destroy(cloud_content_sync_folder_h folder);
int cloud_content_sync_folder_get_path(cloud_content_sync_folder_h folder, char **path);
int cloud_content_sync_folder_get_name(cloud_content_sync_folder_h folder, char **name);
// One call per folder, or file, that the database holds directly below `folder`. The order is that of the names: case
// and accents count little, numbers count by their value ("img2" before "img10"), and it is the same in every locale.
// handle may be null: the folder knows its account. NOT_FOUND when the folder is gone from the database.
int cloud_content_sync_folder_foreach_children_folder(cloud_content_sync_h handle, cloud_content_sync_folder_h folder,
                                                      cloud_content_sync_folder_cb cb, void *user_data);
int cloud_content_sync_folder_foreach_content_from_db(cloud_content_sync_h handle, cloud_content_sync_folder_h folder,
                                                      cloud_content_sync_content_cb cb, void *user_data);
int cloud_content_sync_content_clone(cloud_content_sync_content_h *copy, cloud_content_sync_content_h content);
int cloud_content_sync_content_destroy(cloud_content_sync_content_h content);
int cloud_content_sync_content_get_name(cloud_content_sync_content_h content, char **name);
// In bytes.
int cloud_content_sync_content_get_size(cloud_content_sync_content_h content, long long *size);
// IMAGE, VIDEO or NONE, by the extension of the name.
int cloud_content_sync_content_get_content_type(cloud_content_sync_content_h content, int *type);
// Whether a thumbnail of the current version is in the client's cache; of its file the path, NOT_FOUND without one. It
// is a JPEG or PNG picture, at most 256 pixels wide and high, in platform_data_dir()/cloud/thumbnails. When there is
// none, asking for it has it fetched: a picture's, from a service that makes thumbnails, behind all uploads and
// requests, what was asked for last first. Only the last 200 wait; what a service refuses is not asked for again by
// this handle. Of the service's file as the last refresh knows it; false and NOT_FOUND once the client's handle is
// destroyed.
int cloud_content_sync_content_get_is_thumbnail_exist(cloud_content_sync_content_h content, bool *exists);
int cloud_content_sync_content_get_thumbnail_path(cloud_content_sync_content_h content, char **path);
// A thumbnail that was fetched is there now. Client thread; server_path is valid until the callback returns.
typedef void (*cloud_content_sync_thumbnail_cb)(const char *server_path, void *user_data);
// One callback per handle; null ends it. The former one does not run any more on return: if it is running it is waited
// for, unless this is called from within it.
int cloud_content_sync_set_thumbnail_cb(cloud_content_sync_h handle, cloud_content_sync_thumbnail_cb cb,
                                        void *user_data);

// The name to try when `name` (not empty) is taken: a counter before the last dot, or one more than the counter that is
// there: what stands in parentheses at the end of that part and begins with a number of 1 or more ("a.jpg" gives
// "a(1).jpg", "a(2 b).jpg" gives "a(3).jpg", "a(0)" gives "a(0)(1)"). At most 255 bytes, shortened by whole characters.
// *next is the caller's to free().
int cloud_content_sync_name_get_next(const char *name, char **next);

// Stores a local file at server_path, whose folder must exist. Returns at once; *req_id (above 0) is written before the
// first callback. Uploads of one handle are sent one after the other, in the order in which they were asked for. What
// one has stored is looked at while the next one is sent, so who has two at a time under way, or more, does not wait
// for the service's second answer; the last callbacks of two that follow each other may come in either order.
//
// Nothing is ever overwritten: when the name is taken, by a file or a folder, the next free one is used, as
// cloud_content_sync_name_get_next has it. DONE means that the service holds a file of the same size and
// SHA-256; a service that offers no digests has the file read back. An answer that is lost is settled by looking, not
// by sending again; one more attempt follows when nothing is there. The file is in the database before the last
// callback.
//
// cb may be null. A null or empty argument answers INVALID_PARAMETER and there is no request; all else is reported by
// the callback: NO_ACCOUNT, LOCAL_FILE, LOCAL_PRIVATE, BAD_NAME (also for a server_path that is not absolute or has an
// empty, "." or
// ".." segment), FORBIDDEN (also when the folder does not exist), STORAGE_FULL, CORRUPTED, UNAUTHORIZED, SERVER,
// NETWORK (also when nothing moves for a minute, or no answer comes for five minutes after the last byte), and
// LOCAL_CHANGED: what was stored of the changed file is then removed. UNSAFE: README.md, "Nothing is replaced".
int cloud_content_sync_upload(cloud_content_sync_h handle, const char *local_path, const char *server_path, int *req_id,
                              cloud_content_sync_transfer_cb cb, void *user_data);
// What the upload that runs waits for before it is tried again, and in how many seconds that is at the latest. It
// begins and ends with a callback (RUNNING) of the upload, and the seconds of a busy service pass with one each.
enum cloud_content_sync_wait_e {
    CLOUD_CONTENT_SYNC_WAIT_NONE = 0,
    CLOUD_CONTENT_SYNC_WAIT_NO_NETWORK = 1,    // the device has none; as long as it takes
    CLOUD_CONTENT_SYNC_WAIT_NOT_REACHABLE = 2, // the service does not answer, or not whole
    CLOUD_CONTENT_SYNC_WAIT_SERVICE_BUSY = 3,  // it asked for time (429, 503 with Retry-After)
};
int cloud_content_sync_get_wait(cloud_content_sync_h handle, cloud_content_sync_wait_e *reason, int *seconds);

// Whether what the client writes down outlives this process. False from when the disk, full or read-only, refuses it:
// uploads and refreshes go on, but the book below, settings and sign-ins cannot be changed, and an upload that is cut
// off with the process is not gone on with. It stays so for this handle.
int cloud_content_sync_get_is_persistent(cloud_content_sync_h handle, bool *persistent);

// The book of uploads, which outlives the process: files that are going to be uploaded, until each of them is stored,
// cancelled or has failed. An upload finds its entry by its paths, and looks first whether an earlier attempt has
// stored the file; one without an entry gets one. Sign-out empties the book.
//
// Enters files in this order, all or none. NO_ACCOUNT; DB_FAILED on a full disk: the uploads do not need it.
int cloud_content_sync_queue_add(cloud_content_sync_h handle, const char *const *local_paths,
                                 const char *const *server_paths, int count);
// Takes entries out; those of uploads that have begun go with them. Errors as above; what is not there is none.
int cloud_content_sync_queue_remove(cloud_content_sync_h handle, const char *const *local_paths,
                                    const char *const *server_paths, int count);
// Calls back with every entry that has not ended, in order, on the caller's thread, until the callback returns false.
// The texts are valid during the call. NO_ACCOUNT.
typedef bool (*cloud_content_sync_queue_cb)(const char *local_path, const char *server_path, void *user_data);
int cloud_content_sync_queue_foreach(cloud_content_sync_h handle, cloud_content_sync_queue_cb cb, void *user_data);

// Whether an upload would take this local file as it is now: LOCAL_FILE; LOCAL_PRIVATE for a file of the client's own,
// of another user who has not opened it to everybody, and for what is no file with data: a device, a socket, a pipe, a
// file that the system makes up. Uploads decide for themselves by the file that they have open. Reads the file system.
int cloud_content_sync_check_local(const char *local_path);
// Where a finished upload really landed (it may be the next free name). Known until the handle is destroyed, and within
// the last callback already; NOT_FOUND for a request that has not succeeded.
int cloud_content_sync_get_uploaded_path(cloud_content_sync_h handle, int req_id, char **server_path);
// Ends a queued or running upload or content request, which then has no last callback. No callback of it runs any more
// on return: one that is running is waited for, unless this is called from within it. What it has stored so far is
// removed. NOT_FOUND when there is no such request or it has had its last callback.
int cloud_content_sync_cancel(cloud_content_sync_h handle, int req_id);
// The same for an upload that another process is to go on with: its entry in the book stays.
int cloud_content_sync_suspend(cloud_content_sync_h handle, int req_id);

// The credentials by which the device's user is known to a service, as a sign-in or a set-up tool leaves them.
// user null: bearer token in secret (RFC 6750); otherwise HTTP Basic (RFC 7617). secret null: nobody is signed in any
// more. They are kept in a file that its owner alone can read, the secret in the session's Secret Service where there
// is one that works without asking the person, and sent to the service's storage and account interface alone. Requests
// that begin later use them. While the Secret Service that has the secret cannot be asked they fail with UNAUTHORIZED.
//
// email: the account's address, as the service gives it. The account is known by it, so a new token, or another way to
// sign in, with the same address keeps the database and the caches; those of another account are removed. Null where it
// is not known: the account is then known by the user, or else by the token, so every new token is another account.
//
// INVALID_PARAMETER for an empty email, user or secret, for control characters, and for a user with a colon;
// NO_SERVICE; DB_FAILED when they cannot be stored.
int cloud_content_sync_credentials_set(const char *service_name, const char *email, const char *user,
                                       const char *secret);

// Signing in, by a service that has pages for it. In this order:
//
//   1. get_request_token_info asks the service for a request token, which lives ten minutes.
//   2. The person signs in on the service's pages, at an address that names the token, and allows this device in.
//   3. get_email exchanges the token for an access token, and asks whose it is. What it gets is provisional: kept in
//      the memory of this handle, and by nothing else. It is revoked at the service when the handle is destroyed, when
//      it is deactivated, or when another request token is asked for, as far as the service can be reached. The
//      exchange works once. A cancel does not end it: the next get_email gets what it brings. An answer that is lost
//      leaves an access token at the service that nobody here knows; the person can revoke it there.
//   4. activate makes that account the device's: its credentials are stored, what was kept of another account goes, and
//      the access token that was in use before is revoked.
//
// One of these requests, or a deactivation, runs at a time in a handle; a new one ends the one before as auth_cancel
// does. All return at once, with INVALID_PARAMETER for a null handle or callback and, but for a deactivation,
// NO_SERVICE when the service has no account interface (Api), or no pages (Web); there is no callback then. Otherwise
// there is exactly one, on the client's thread, unless auth_cancel or destroy comes first. What a request of step n
// lacks of step n - 1 is NO_ACCOUNT. A request waits at most `AuthTimeout` seconds of the service's description, 180
// when it says nothing: then it is NETWORK. Destroying a handle that has something to revoke takes at most 3 seconds
// more than otherwise.

// status: DONE, with the token and the secret that belongs to it, both valid until the callback returns; or FAILED,
// with null for both and an error: NETWORK, CERTIFICATE, SERVER. The secret is the client's concern; it is not needed
// to go on.
typedef void (*cloud_content_sync_request_token_cb)(int status, const char *request_token, const char *secret,
                                                    int error, void *user_data);
int cloud_content_sync_auth_get_request_token_info(cloud_content_sync_h handle, cloud_content_sync_request_token_cb cb,
                                                   void *user_data);
// email: the account's address, valid until the callback returns, with the error 0; or null and an error: UNAUTHORIZED
// when the person has not allowed it, NO_ACCOUNT, NETWORK, SERVER. status: as above.
typedef void (*cloud_content_sync_email_cb)(int status, const char *email, int error, void *user_data);
int cloud_content_sync_auth_get_email(cloud_content_sync_h handle, cloud_content_sync_email_cb cb, void *user_data);
// error: 0, or NO_ACCOUNT, DB_FAILED when the credentials cannot be stored: who was signed in before still is then.
typedef void (*cloud_content_sync_status_cb)(int status, int error, void *user_data);
int cloud_content_sync_activate(cloud_content_sync_h handle, cloud_content_sync_status_cb cb, void *user_data);
// Ends a sign-in that is under way in this handle, from the call that asks for a request token to an activation that
// has stored it: what is provisional is revoked and forgotten, and whoever is signed in stays so. With none under way
// it signs out: every request of the handle ends (their last callbacks bring NO_ACCOUNT; what an upload has stored by
// then stays), credentials, database, settings, caches and thumbnails of the account go, and then the access token is
// revoked; a password stays what it is. What is on the device goes also when the
// service cannot be reached, or the token cannot be read: that is DONE, with the error NETWORK or SERVER. FAILED, with
// DB_FAILED, only when something on the device could not be removed: then whoever was signed in still is. With nobody
// signed in it is DONE.
int cloud_content_sync_deactivate(cloud_content_sync_h handle, cloud_content_sync_status_cb cb, void *user_data);
// Ends a sign-in that is under way, as above; with none under way nothing is done, whoever is signed in, and that is
// DONE.
int cloud_content_sync_auth_abandon(cloud_content_sync_h handle, cloud_content_sync_status_cb cb, void *user_data);
// Ends the request of this section that runs, which then has no callback. No callback of it runs any more on return:
// one that is running is waited for, unless this is called from within it. An activation that has stored its
// credentials is not undone, nor a deactivation or abandonment that was asked for. A sign-in that is under way stays
// so. NOT_FOUND when there is none.
int cloud_content_sync_auth_cancel(cloud_content_sync_h handle);

// The address of the account that is signed in, "" where it is not known. NO_ACCOUNT when nobody is. Reads a file.
int cloud_content_sync_account_get_email(const char *service_name, char **email);

// Where the service's pages are (`Web`, without a final "/"), the address that they send the person to when she has
// decided (`Callback`; where it is not given, web + "/auth_complete"), and the certificates to trust for them
// (`CAFile`, "" for the system's). Each may be null when it is not wanted. NO_SERVICE when there is no such service, or
// it has no pages.
int cloud_content_sync_service_get_pages(const char *service_name, char **web, char **callback, char **ca_file);

// How the tree is kept fresh: a setting of the account, as type_activation is, on which whoever holds a handle may act;
// this library refreshes when it is asked to alone. type: 1 to 3, of which PERIODIC (3) means every `seconds`, 1 at
// least. At first, and with nobody signed in, it is 1 with 0 seconds. INVALID_PARAMETER, NO_ACCOUNT, DB_FAILED.
enum cloud_content_sync_refresh_type_e { CLOUD_CONTENT_SYNC_REFRESH_TYPE_PERIODIC = 3 };
int cloud_content_sync_setting_get_refresh_type(cloud_content_sync_h handle, int *type, int *seconds);
int cloud_content_sync_setting_set_refresh_type(cloud_content_sync_h handle, int type, int seconds);

// The last, and only, callback of a request about one file. state: DONE, or FAILED with an error that is not 0. text:
// the path or address that was asked for when it is DONE, else null; valid until the callback returns. status: the HTTP
// status (RFC 9110, 15) of the service's last answer, 0 when it was not asked or did not answer. Client thread.
typedef void (*cloud_content_sync_result_cb)(int state, const char *text, int status, int error, void *user_data);

// All three return at once; *request_id (above 0) is written before the callback. Up to four run at the same time,
// beside the uploads. The content may be destroyed right after the call. cb may be null. INVALID_PARAMETER for a null
// or malformed argument, NOT_FOUND when the client's handle, from which the content came, is destroyed; there is no
// request then. All else is reported by the callback: NO_ACCOUNT, NETWORK, UNAUTHORIZED, FORBIDDEN, SERVER, NOT_FOUND
// (the service has no such file any more), CORRUPTED (the size or the SHA-256 is not what the service says, Repr-Digest
// of RFC 9530), and LOCAL_FILE (it cannot be written, the disk is full).

// The file's whole content in the client's cache, platform_data_dir()/cloud/cache, under a name of its own with the
// file's extension. A version that is there already is answered without the service. The file belongs to the cache and
// must not be changed; when the cache grows over 512 MiB what was used least recently is removed, and all of it when
// somebody else signs in.
int cloud_content_sync_content_get_cached_file(cloud_content_sync_content_h content, int *request_id,
                                               cloud_content_sync_result_cb cb, void *user_data);
// An address from which anyone can read the file without credentials, by HTTP with ranges, for `minutes` (above 0, and
// at most as long as the service allows). SERVER from a service that has no such addresses.
int cloud_content_sync_content_get_streaming_url(cloud_content_sync_content_h content, int *request_id,
                                                 cloud_content_sync_result_cb cb, void *user_data, int minutes);
// Stores the file at local_path, whose folder must exist, as a whole or not at all: a regular file of that name is
// replaced when the content is complete. LOCAL_FILE when anything else has the name, a symbolic link for instance.
int cloud_content_sync_content_download(cloud_content_sync_content_h content, const char *local_path, int *request_id,
                                        cloud_content_sync_result_cb cb, void *user_data);
