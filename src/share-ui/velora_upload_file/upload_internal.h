#pragma once
// What the source files of the upload view share. Main loop only, where nothing else is said.
#include "velora_common/velora_app_data.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_upload_item.h"
#include "velora_upload_file/velora_upload_view.h"
#include <atomic>
#include <optional>
#include <string>
#include <unordered_set>
#include <vector>

enum ItemType {
    ITEM_TYPE_CONTENT = 0,   // a file of the open cloud folder
    ITEM_TYPE_UPLOADING = 1, // in the queue
    ITEM_TYPE_UPLOADED = 2,
    ITEM_TYPE_FAILED = 3,
};

// Words that the upload worker or the cloud client's thread touches are atomic; the rest belongs to the main loop.
struct UploadViewData {
    AppData *ad = nullptr;
    Evas_Object *layout = nullptr;
    Evas_Object *genlist = nullptr;
    Elm_Genlist_Item_Class *itc_dir = nullptr;
    Elm_Genlist_Item_Class *itc_file = nullptr;
    Elm_Genlist_Item_Class *itc_uploading = nullptr;
    Elm_Genlist_Item_Class *itc_select_all = nullptr;
    Elm_Genlist_Item_Class *itc_fail = nullptr;
    Ecore_Pipe *pipe = nullptr;
    pthread_t thread = 0;          // marks a running worker; only the "end" of its run clears it
    std::atomic<int> noti_id = -1; // the ongoing notification
    cloud_content_sync_folder_h folder = nullptr;
    char *new_name = nullptr;    // candidate of the search for a free name
    std::atomic<int> req_id = 0; // of the running upload
    std::atomic<int> total = 0;  // files in the queue, fixed at Done
    std::atomic<int> canceled = 0;
    std::atomic<int> success = 0;
    std::atomic<int> fail = 0;
    Evas_Object *toolbar = nullptr; // the path bar
    Evas_Object *cancel_btn = nullptr;
    Evas_Object *done_btn = nullptr;
    Elm_Object_Item *select_all_item = nullptr;
    bool is_select_mode = false;
    bool is_all_selected = false;
    Evas_Object *select_all_genlist = nullptr;
    bool is_upload_started = false;
    std::atomic<bool> is_end_handled = false; // cleared by the retry worker
    Elm_Object_Item *tapped_item = nullptr;   // the path-bar item whose folder the timer opens
    char *tapped_path = nullptr;              // its data, not owned
    Ecore_Timer *pathinfo_timer = nullptr;
    Evas_Object *more_btn = nullptr;
    std::atomic<int> cur_index = 0;
    std::atomic<bool> is_uploading = false;

    Elm_Object_Item *nf_item = nullptr;
    Evas_Object *more_menu = nullptr; // is AppData's popup while it is open
    Evas_Object *state = nullptr;     // what the list area says when there is no list
    std::vector<UploadItem *> run;    // the items of the running (or last) worker, kept alive for it
    // Names of the open folder's files, while a TakenNames lives.
    std::optional<std::unordered_set<std::string>> taken_names;
    size_t listing = 0;    // what the rows of the open folder were made of, as a hash
    int settled = 0;       // items at the head of AppData's list that no Done is awaited for
    GList *kept = nullptr; // items that wait for their Done while AppData's list is a result's
};

// The record of a row, freed with it.
struct ItemData {
    Elm_Object_Item *gen_it = nullptr;
    UploadViewData *vd = nullptr;
    cloud_content_sync_folder_h folder = nullptr;   // of a folder row, owned
    cloud_content_sync_content_h content = nullptr; // of a file row, owned
    const char *thumbnail = nullptr;                // not owned
    char *name = nullptr;                           // owned, as it stands (no markup)
    int index = -1;                                 // of the UploadItem
    int request_id = 0;
    char *local_path = nullptr; // owned
    int file_type = 0;
    char *stream_url = nullptr; // owned
    char *file_name = nullptr;  // owned
    bool is_selected = false;
    int type = ITEM_TYPE_CONTENT;
    char *path = nullptr; // owned; local path of an uploaded or failed file
    unsigned handle = 0;  // by which a result finds the row; 0 before the first request
};

// The one view, or null. Set and cleared on the main loop; the client's thread reads it.
extern std::atomic<UploadViewData *> s_vd;
// Its pipe, or null: for callbacks that may come late, and need nothing else of the view.
extern std::atomic<Ecore_Pipe *> s_view_pipe;

// The text of an id in the language of the view, for texts that are not set on a widget for good.
const char *__text(const char *id);
// The part of a path behind its last slash; points into the path.
const char *__last_segment(const char *path);
// The item at an index of AppData's list, which is what a row means by its index; null if there is none.
UploadItem *__upload_item_find(UploadViewData *vd, int index);
// The item of the running (or last) worker's run that has this index; null if there is none.
UploadItem *__run_item(const UploadViewData *vd, int index);
// The item that a worker's message means: one of its own run while it runs, for a result that was opened meanwhile has
// replaced AppData's list; null if there is none.
UploadItem *__upload_item_find_running(UploadViewData *vd, int index);

// upload_view.cpp
void __destroy_view(UploadViewData *vd);
// Takes the view down and leaves the application, after the callback that asked for it has returned.
void __leave(UploadViewData *vd);
void __title_set(UploadViewData *vd, const char *id);
// What the naviframe made of the view's layout: the object that a screen reader meets as the page.
Evas_Object *__page_of(UploadViewData *vd);
Evas_Object *__title_button_create(UploadViewData *vd, const char *style, const char *id, const char *part,
                                   Evas_Smart_Cb cb);
void __pipe_ensure(UploadViewData *vd);
// Folders make room for the list of uploads: no path bar, no title buttons.
void __uploads_show(UploadViewData *vd);
// Files that were shared while the view was busy with others get their choice of a folder now. False when there are
// none, or when it is still busy. Without a root folder to show the view is gone then.
bool __next_share_begin(UploadViewData *vd);
// Extra data of a result's launch request, beside those that it must have: the path of the destination folder.
inline constexpr char RESULT_FOLDER_KEY[] = "folder_path";

// upload_state.cpp: the look of an empty folder, a failed refresh and the like.
enum ViewState {
    VIEW_STATE_NONE,
    VIEW_STATE_EMPTY,
    VIEW_STATE_LOADING,
    VIEW_STATE_OFFLINE,
    VIEW_STATE_ERROR,
    VIEW_STATE_SIGNED_OUT,
    VIEW_STATE_STOPPED, // nothing is left of a queue
    VIEW_STATE_FULL     // a result without files: there was no room for any
};
// What the last refresh says about an empty list.
ViewState __meta_state();
void __state_show(UploadViewData *vd, ViewState state);
// Starts a refresh of the folder tree. Its end is reported as "refresh_meta_done" on the shell's pipe when the tree was
// not complete before, else as "meta_changed" on the view's.
void __meta_refresh_start(UploadViewData *vd);
// Short words for why a transfer failed, translated.
const char *__failure_text(int error);

// upload_browser.cpp: folders, files and the path bar.
void __path_bar_create(UploadViewData *vd);
bool __folder_go_up(UploadViewData *vd);
bool __is_at_root(UploadViewData *vd);
// Appends the open folder's subfolders and files; the result is their number.
int __folder_list_append(UploadViewData *vd);
// Whether the client knows something else of the open folder by now than its rows show.
bool __folder_list_has_changed(UploadViewData *vd);
// Makes a folder the open one and takes it over; the old one is let go. Null: none is open.
void __folder_open(UploadViewData *vd, cloud_content_sync_folder_h folder);

// upload_queue.cpp: the queue on the main loop.
void __btn_upload_cb(void *data, Evas_Object *obj, void *event_info);
void __pipe_cb(void *data, void *buffer, unsigned int size);
void __upload_file_cancel_cb(void *data, Evas_Object *obj, void *event_info);
void __uploading_file_mutil_cancel(UploadItem *item, UploadViewData *vd);
// The same for many, with one word to the notification at the end: the last ones first, so that the worker gets none of
// them when the running one goes.
void __uploads_cancel(UploadViewData *vd, const std::vector<UploadItem *> &items);
void __retry_popup_show(ItemData *record);

// upload_worker.cpp: the worker of a run, the worker of a retry, and the transfer callback.
void *__thread_upload_file(void *vd);
void *__velora_upload_fail_reboot(void *run);
void __upload_file_cb(int state, int ignored, int progress, int error, void *item);
// The name under which an item went up, or is to go up: another client may have taken the wanted one meanwhile. Any
// thread.
std::string __landed_name(const UploadViewData *vd, const UploadItem *item);
// Lets the worker look at its transfer at once. Any thread.
void __worker_wake();
// Starts a worker on vd->run when none is marked; waits for the last moments of the one before.
void __worker_start(UploadViewData *vd, void *(*routine)(void *), UploadItem *only);
// Lets the worker of a run send its first file: the list of the queue leaves out what is up already, so it comes first.
void __worker_begin();
// Ends the running transfer and waits for the worker. Main loop only.
void __worker_stop(UploadViewData *vd);
// The selection flags of the queue: clear and count are for any thread.
void __selection_resize(int count);
bool __selection_get(int index);
void __selection_set(int index, bool selected);

// upload_notification.cpp: any thread.
int __progress_noti_new(const char *text, int *noti_id);
int __progress_noti_set_content(int noti_id, const char *text);
int __progress_noti_set_progress(int noti_id, double progress);
int __progress_noti_delete(int noti_id);
int __box_noti_new(const char *title, const char *text, const char *display_type, char **paths, int count);
char *__get_format_time(); // g_free

// upload_names.cpp: names of files. Strings are the caller's, g_free.
char *__get_upload_server_path(UploadViewData *vd, const char *local_path);
// Reads the open folder once for many calls of __get_upload_server_path: it may have many files, and the queue too.
struct TakenNames {
    explicit TakenNames(UploadViewData *view);
    ~TakenNames();
    TakenNames(const TakenNames &) = delete;
    TakenNames &operator=(const TakenNames &) = delete;
    UploadViewData *vd;
};
char *__get_file_base_name(const char *name); // null when the name has no dot
char *__get_file_ext_name(const char *name);  // null when the name has no dot

// upload_types.cpp
enum FileType {
    FILE_TYPE_NONE = 0,
    FILE_TYPE_IMAGE = 3,
    FILE_TYPE_VIDEO = 4,
    FILE_TYPE_MUSIC = 5,
    FILE_TYPE_SOUND = 6,
    FILE_TYPE_OTHER = 35,
};
int __get_file_type(const char *name);
char *__get_formatted_size(gint64 bytes); // g_free
const char *__get_local_thumbnail(const char *path);
// The icon of a row's file, as a new widget in `parent`; fills in the row's file type and thumbnail.
Evas_Object *__file_icon_create(Evas_Object *parent, ItemData *record, const char *local_path);
// Forgets the media records that __get_local_thumbnail handed thumbnails out of.
void __local_thumbnails_free();

// upload_thumbnails.cpp
// Has the rows' thumbnails told of when the client has fetched them, or no longer. The view's pipe must outlive that.
void __cloud_thumbnails_watch(UploadViewData *vd, bool is_on);
// "thumb.N": the row, when it is in sight, shows the thumbnail of the path that the handle N stands for.
void __cloud_thumbnail_arrived(UploadViewData *vd, uint32_t handle);

// upload_keys.cpp
// Lets Up and Down go from one upload that something can be done with to the next.
void __list_keys_add(Evas_Object *genlist);
// Sets whether a row can be tapped. A row that cannot loses the keys' focus first: the list would keep it for a row
// that takes no keys, and they would reach nothing.
void __row_tappable_set(Elm_Object_Item *row, bool is_tappable);

// upload_list.cpp: rows.
// A name for a text of one line in the theme, to free: escaped, for the theme's texts are markup, and with the pictures
// that Unicode has from U+2400 on for control characters. A line break as such makes Edje's layout run for ever.
char *__one_line_markup(const char *text);
Evas_Object *__genlist_create(UploadViewData *vd);
void __item_classes_create(UploadViewData *vd);
void __item_classes_free(UploadViewData *vd);
void __upload_row_append(UploadViewData *vd, UploadItem *item, int index);
void __result_rows_append(UploadViewData *vd, bool is_reentry);
Elm_Object_Item *__row_append(UploadViewData *vd, Elm_Genlist_Item_Class *itc, ItemData *record, Evas_Smart_Cb cb);
void __velora_uploading_item_selected(void *data, Evas_Object *obj, void *event_info);
Elm_Genlist_Item_Class *__item_class_create(const char *style, Elm_Gen_Item_Text_Get_Cb text_get,
                                            Elm_Gen_Item_Content_Get_Cb content_get);

// upload_select.cpp: the more menu and the selection mode.
void __more_menu_open(UploadViewData *vd);
void __delete_all_callback_ctxpopup();
void __ctx_delete_cb(void *data, Evas_Object *obj, void *event_info);
void __remove_all_selete_item(UploadViewData *vd);
// Leaves the selection mode with nothing selected.
void __selection_cancel(UploadViewData *vd);
void __selection_row_tapped(UploadViewData *vd, ItemData *record, Elm_Object_Item *row);
// Counts again when an upload has ended and lost its flag.
void __selection_title_refresh(UploadViewData *vd);
// A layout with a check for the end of a row; *check is the check.
Evas_Object *__check_create(Evas_Object *parent, bool is_on, Evas_Object **check);

// upload_open.cpp: opening a file of the open cloud folder.
struct ContentResultMessage;
void __select_item_to_launch_app(void *data, Evas_Object *obj, void *event_info);
void __content_result_handle(UploadViewData *vd, const ContentResultMessage &message);
// A row is going away: results that are still on their way no longer find it.
void __content_row_forget(ItemData *record);
