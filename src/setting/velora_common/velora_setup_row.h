#pragma once
// The rows of the wizard's pages about camera upload. Main loop only.
#include <Elementary.h>

// One per row, made with the row and freed by __gl_del when the row is deleted.
struct SetupItemData {
    int index = 0;             // of an option within its group
    void *view = nullptr;      // the page's record, not owned
    char *text_id_1 = nullptr; // own copies; may be absent
    char *text_id_2 = nullptr;
    char *kind = nullptr; // "icon_text": an illustration, "1button": a button
    int position = 0;     // in its group: 0 top, 1 center, 2 bottom, 3 none
};

SetupItemData *__setup_create_genlist_item_data(int index, void *view, const char *text_id_1, const char *text_id_2,
                                                const char *kind, int position);
// The item class's deleter, text getter and the handler of the list's "realized".
void __gl_del(void *data, Evas_Object *obj);
char *__gl_text_get(void *data, Evas_Object *obj, const char *part);
void __setup_realized_legal_privacy_cb(void *data, Evas_Object *obj, void *event_info);

// An item class of a style with these two and a content getter; the caller's, elm_genlist_item_class_free.
Elm_Genlist_Item_Class *_velora_setup_item_class_create(const char *style, Elm_Gen_Item_Content_Get_Cb content_get);

// A new list in `parent` whose rows follow the language and keep to the width of the list.
Evas_Object *_velora_setup_list_create(Evas_Object *parent);
// Pushes the list as a page: with a title, and one button across the bottom (ids of domain "velora").
Elm_Object_Item *_velora_setup_page_push(Evas_Object *naviframe, Evas_Object *list, const char *button_id,
                                         Evas_Smart_Cb button_cb, Elm_Naviframe_Item_Pop_Cb back_cb, void *data);

// The size of a theme's font class ("ATO007", "ATO004") as the person has chosen it, and in a narrow window not more
// than its words can have there. In pixels of a screen 480 wide; 26 without a table of fonts.
int _velora_setup_font_size(Evas_Object *widget, const char *font_class);

// How high a label that wraps has to be at a width, in pixels.
int _velora_setup_label_height(Evas_Object *label, int width);

// The illustration of a group of velora_setup_wizard.edj, as wide as the list, with a text (id of domain "velora") in
// "elm.title": `height` pixels high where the list is 480 wide, more where the text needs it, less where the list is
// too low. Null when there is no such group. For the list to take.
Evas_Object *_velora_setup_illustration_create(Evas_Object *list, const char *group, int height, const char *text_id);
