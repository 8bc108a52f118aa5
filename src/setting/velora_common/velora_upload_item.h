#pragma once
// One shared file of the upload queue.
#include <Elementary.h>
#include <atomic>
#include <glib.h>
#include <memory>

enum UploadState {
    UPLOAD_STATE_WAITING = 0,
    UPLOAD_STATE_UPLOADING = 2,
    UPLOAD_STATE_DONE = 3,
    UPLOAD_STATE_FAILED = 4,
    UPLOAD_STATE_CANCELED = 5,
};

#define UPLOAD_ERROR_STORAGE_FULL 26

// The atomic words are written by the worker and the cloud client's thread (state also by a cancel, all of them by a
// retry before its worker starts) and read by all; the rest belongs to the main loop, and is not changed while the item
// is in a run.
struct UploadItem {
    char *path = nullptr;              // local path, owned
    char *server_path = nullptr;       // destination in the cloud, owned
    gint64 size = 0;                   // of the local file, in bytes; what it was when the run was prepared
    Elm_Object_Item *gen_it = nullptr; // its row in the list, if it has one
    std::atomic<int> state = UPLOAD_STATE_WAITING;
    std::atomic<int> progress = 0; // percent
    int index = -1;                // its place in its latest run
    std::atomic<int> error = 0;

    std::atomic<int> request = 0; // id of its last upload; 0 before the client has given one
    std::atomic<int> users = 1;   // the list, rows, and a run that it is in
};

// Appends new waiting items for local paths (copied) to a list of items. Main loop only.
GList *_velora_upload_items_append(GList *list, char *const *paths, int count);

// Whoever keeps an item holds it with ref, and lets go with unref; the last unref frees the item. Any thread.
UploadItem *_velora_upload_item_ref(UploadItem *item);
void _velora_upload_item_unref(UploadItem *item);

// A hold on an item, as a value.
struct UploadItemUnref {
    void operator()(UploadItem *item) const
    {
        _velora_upload_item_unref(item);
    }
};
using UploadItemHold = std::unique_ptr<UploadItem, UploadItemUnref>;

// Lets go of every item and empties the list. Main loop only.
void _velora_upload_list_free(GList **list);
