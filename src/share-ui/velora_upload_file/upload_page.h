#pragma once
// The view's page on the naviframe: its title, its buttons, the line above the list. Main loop only.
#include "velora_upload_file/upload_record.h"

// Builds layout and page; the pop callback and the more key call back with the view.
void __page_create(UploadViewData *vd, Elm_Naviframe_Item_Pop_Cb back, Evas_Smart_Cb more);
void __page_end(UploadViewData *vd, Evas_Smart_Cb more);

// The title is a text of the catalogue (an id), or finished words.
void __title_set(UploadViewData *vd, const char *id);
void __title_set_words(UploadViewData *vd, const char *words);
// What the naviframe made of the view's layout: the object that a screen reader meets as the page.
Evas_Object *__page_of(UploadViewData *vd);

// Cancel at the left of the title and Done at its right; their clicks call back with the view. What is there goes.
void __title_buttons_create(UploadViewData *vd, Evas_Smart_Cb cancel, Evas_Smart_Cb done);
void __title_buttons_delete(UploadViewData *vd);

// The bar with the more button, which is there only while its menu has something to offer.
void __more_button_create(UploadViewData *vd, Evas_Smart_Cb more);
void __more_button_delete(UploadViewData *vd);

// The line above the list: words (none: no line), and with `progress` from 0.0 to 1.0 a bar.
void __info_set(UploadViewData *vd, const char *words, double progress = -1);
