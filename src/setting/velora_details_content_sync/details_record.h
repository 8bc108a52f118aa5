#pragma once
// The record of the settings page, and what its files know of each other. Main loop only, but for the atomic words.
#include "velora_common/velora_app_data.h"

enum DetailsItemKind {
    DETAIL_ITEM_NONE = 0,
    DETAIL_ITEM_CAMERA_UPLOAD = 1,
    DETAIL_ITEM_SYNC_IMAGES = 2,
    DETAIL_ITEM_SYNC_VIDEOS = 3,
    DETAIL_ITEM_CAMERA_WIFI_ONLY = 4,
    DETAIL_ITEM_IMAGES_WIFI_ONLY = 5,
    DETAIL_ITEM_VIDEOS_WIFI_ONLY = 6,
};

struct DetailsViewData {
    AppData *ad = nullptr;
    Evas_Object *genlist = nullptr;
    Elm_Genlist_Item_Class *itc_storage = nullptr;
    Elm_Genlist_Item_Class *itc_2line = nullptr;
    Elm_Genlist_Item_Class *itc_1line = nullptr; // switches, and the choices of the schedule
    Elm_Object_Item *schedule_item = nullptr;
    Elm_Object_Item *storage_item = nullptr;
    unsigned char is_storage_received = 0;
    guint64 storage_used = 0; // bytes, as storage_total
    guint64 storage_total = 0;
    Elm_Genlist_Item_Class *itc_group = nullptr;
    int sync_schedule_value = 0;
    Elm_Object_Item *camera_wifi_item = nullptr;
    Elm_Object_Item *images_wifi_item = nullptr;
    Elm_Object_Item *videos_wifi_item = nullptr;
    bool is_camera_upload = false; // as read last, like the two below
    bool is_images = false;
    bool is_videos = false;

    int launch_mode = LAUNCH_MODE_NONE; // that the page was opened in
    ClientHold client;
    Elm_Object_Item *nf_item = nullptr;
    Evas_Object *more_btn = nullptr; // while there is a menu
    Ecore_Pipe *pipe = nullptr;
    GList *files = nullptr;   // of UploadItem: shared, and waiting until the page is done
    char *account = nullptr;  // the address that the page shows the settings of; null: nobody's
    Ecore_Job *job = nullptr; // Done, or a choice of the schedule
    int chosen_schedule = 0;  // of that job
    bool is_setting = false;  // a switch is set by us, not by the person
    bool is_asking = false;   // for the storage
    std::atomic<guint64> answer_used = 0, answer_total = 0; // the client's thread writes them before its message
    std::atomic<int> answer_error = 0;
    std::atomic<int> question = 0; // number of the last one; the main loop
};

struct DetailsItemData {
    int index = 0;
    DetailsViewData *vd = nullptr;
    char *text1 = nullptr; // owned, as the two below
    char *text2 = nullptr;
    char *text3 = nullptr;        // "check", "radio" or null
    Evas_Object *radio = nullptr; // while the row is on screen, as the check
    Evas_Object *check = nullptr;
    int kind = DETAIL_ITEM_NONE;
};

namespace details {
// The one page, or null.
extern DetailsViewData *s_vd;
} // namespace details

// The text of an id of the domain "velora"; anything else comes back as it is.
const char *__details_text(const char *id);

// velora_details.cpp

// Looks whose settings they are, shows what is stored and asks for the storage anew.
void __details_refresh(DetailsViewData *vd);

// details_rows.cpp

DetailsItemData *__create_genlist_item_data(int index, DetailsViewData *vd, const char *text1, const char *text2,
                                            const char *text3, int kind);
void __details_item_classes_create(DetailsViewData *vd);
void __details_item_classes_free(DetailsViewData *vd);
// Fills the page's list.
void __details_rows_append(DetailsViewData *vd);
// Puts another text under a row's first.
void __details_text2_set(Elm_Object_Item *row, const char *text);
// What a screen reader says of a row that has a control: its name, which the theme's parts would say three times, and
// with an id the control's state.
void __details_row_say(Elm_Object_Item *item, const char *state_id);
// Reads every setting again and shows what there is. Without an account nothing can be set.
void __details_rows_read(DetailsViewData *vd);
// Keeps a control of a row in the row's record, *slot, while the control lives.
void __details_control_keep(DetailsItemData *row, Evas_Object **slot, Evas_Object *control);
// What was chosen could not be stored: says so, and shows what is stored.
void __details_not_saved(DetailsViewData *vd);

// details_schedule.cpp

int __get_sync_schedule_value(CloudSyncHandle handle);
// The table's text, g_free; null for a value that is not in it.
char *__schedule_text_get(int value);
// "selected" of the schedule's row: the popup. `data` is the page.
void __gl_sel_sync_schedule_cb(void *data, Evas_Object *obj, void *event_info);
// A choice's radio; content of its row.
Evas_Object *__schedule_radio_create(Evas_Object *genlist, DetailsItemData *row);
// Shows the value that is stored.
void __schedule_row_update(DetailsViewData *vd);

// details_storage.cpp

// Asks the service, unless a question is under way. The old figures stand until its answer.
void __storage_ask(DetailsViewData *vd);
// The handler of the page's pipe: "storage.N", the service has answered question N.
void __storage_pipe_cb(void *data, void *buffer, unsigned int size);
// Nothing is known any more, and what is under way is not waited for.
void __storage_forget(DetailsViewData *vd);
// Writes the figures into their row.
void __update_server_storage_info(DetailsViewData *vd);
// The bar of the row, or null when there is nothing that it could show.
Evas_Object *__storage_bar_create(Evas_Object *genlist, const DetailsItemData *row);
// A size with its unit, as the language writes numbers, into 30 bytes. 0, or -1.
int __contentsync_storage_status_size_transition(unsigned long long bytes, char *out);

// details_remove.cpp

// "clicked" of the more button, and the more key. `data` is the page.
void __more_cb(void *data, Evas_Object *obj, void *event_info);
