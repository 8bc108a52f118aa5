#pragma once
// A row of the view's list. Main loop only.
#include "velora_upload_file/upload_record.h"
#include <string>

enum ItemType {
    ITEM_TYPE_CONTENT = 0,   // a file of the open cloud folder
    ITEM_TYPE_UPLOADING = 1, // in the queue
    ITEM_TYPE_UPLOADED = 2,
    ITEM_TYPE_FAILED = 3,
};

// The record of a row, freed with it. Empty texts stand for none.
struct ItemData {
    Elm_Object_Item *gen_it = nullptr;
    cloud_content_sync_folder_h folder = nullptr;   // of a folder row, owned
    cloud_content_sync_content_h content = nullptr; // of a file row, owned
    std::string name;                               // as it stands (no markup)
    int request_id = 0;                             // of what the client was asked for a file row
    std::string local_path;                         // the local copy of a file row
    int file_type = 0;                              // filled in with the row's icon
    std::string stream_url;                         // of a video or sound file row
    std::string file_name;                          // of a file row
    int type = ITEM_TYPE_CONTENT;
    UploadItemHold item;      // of an upload's row
    int place = 0;            // of an upload's row: how many were appended before it
    bool is_realized = false; // of an upload's row: the list holds widgets for it
    unsigned handle = 0;      // by which a result finds the row; 0 before the first request
};

// The record of a row, or null.
ItemData *__row_record(Elm_Object_Item *row);

// Appends a row, which takes the record over. A tap on it calls cb with the record.
Elm_Object_Item *__row_append(UploadViewData *vd, Elm_Genlist_Item_Class *itc, ItemData *record, Evas_Smart_Cb cb);

// A class of rows whose records are ItemData; freed with elm_genlist_item_class_free.
Elm_Genlist_Item_Class *__item_class_create(const char *style, Elm_Gen_Item_Text_Get_Cb text_get,
                                            Elm_Gen_Item_Content_Get_Cb content_get);

// Sets whether a row can be tapped. A row that cannot loses the keys' focus first: the list would keep it for a row
// that takes no keys, and they would reach nothing.
void __row_tappable_set(Elm_Object_Item *row, bool is_tappable);

// What the list of uploads has to do before the record of one of its rows goes.
void __row_gone_cb_set(void (*gone)(const ItemData *record));
// Whether a row of an upload of this type can be tapped, as the view is.
bool __is_tappable(const UploadViewData *vd, int type);

// What a file-row topic has to do before a record goes: it is called with each record of a file row whose client was
// asked for something.
void __row_forget_cb_set(void (*forget)(ItemData *record));

// A layout of the theme for the start or the end of a row, and in it *content, made by `add`.
Evas_Object *__row_layout_create(Evas_Object *parent, const char *style, Evas_Object **content,
                                 Evas_Object *(*add)(Evas_Object *));
// A layout with a check for the end of a row; *check is the check.
Evas_Object *__row_check_create(Evas_Object *parent, bool is_on, Evas_Object **check);
// A layout with a sign, a group of the image theme, for the start or the end of a row.
Evas_Object *__row_sign_create(Evas_Object *parent, const char *style, const char *group);

// Whether a text or content getter is asked for this part; "elm.icon" and "elm.icon.1" are one.
bool __is_part(const char *part, const char *name);
bool __is_icon_part(const char *part);
