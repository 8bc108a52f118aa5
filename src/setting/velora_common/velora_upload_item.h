#pragma once
// One shared file of the upload queue.
#include <Elementary.h>
#include <atomic>
#include <glib.h>

enum UploadState {
    UPLOAD_STATE_WAITING = 0,
    UPLOAD_STATE_UPLOADING = 2,
    UPLOAD_STATE_DONE = 3,
    UPLOAD_STATE_FAILED = 4,
    UPLOAD_STATE_CANCELED = 5,
};

#define UPLOAD_ERROR_STORAGE_FULL 26

// Identified by its position in AppData's upload_list. The three atomic words are written by the cloud client's thread
// (state also by a cancel or retry on the main loop or the retry's worker) and read by all; the rest belongs to the
// main loop, and is not changed while a worker uses it.
struct UploadItem {
    char *path = nullptr;        // local path, owned
    char *server_path = nullptr; // destination in the cloud, owned
    gint64 size = 0;             // of the local file, in bytes
    Elm_Object_Item *gen_it = nullptr;
    std::atomic<int> state = UPLOAD_STATE_WAITING;
    std::atomic<int> progress = 0; // percent
    int index = 0;
    std::atomic<int> error = 0;

    std::atomic<int> request = 0; // id of its last upload; 0 before the client has given one
    std::atomic<int> users = 1;   // the list, and a worker that is on it
};

// Appends a new waiting item for a local path (copied) to a list of items. Main loop only.
GList *_velora_upload_item_append(GList *list, const char *path);

// A worker keeps the items of its run alive with ref, and lets go with unref; the last unref frees the item. Any
// thread.
UploadItem *_velora_upload_item_ref(UploadItem *item);
void _velora_upload_item_unref(UploadItem *item);

// Lets go of every item and empties the list. Main loop only.
void _velora_upload_list_free(GList **list);
