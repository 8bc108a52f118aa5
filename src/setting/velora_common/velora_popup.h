#pragma once
// The popups and progress widgets that every page shows, and how they are dismissed.
//
// Every builder returns the new, shown object, which belongs to its caller, who hands it to _velora_popup_show; null,
// after logging, when the parent is null. Text ids are translated and follow a change of language; "plain" texts are
// shown as they come, and are Edje markup. Main loop only.
#include "velora_common/velora_app_data.h"

// The back key, and a third mouse button's release, call cb(data, null, null) while the popup lives. With a null cb
// the back key is ignored and the mouse button deletes the popup.
void _velora_common_register_event_for_popup(Evas_Object *popup, Evas_Smart_Cb cb, void *data);

// A message (id of domain "velora") and OK; OK and back call cb with data.
Evas_Object *_velora_common_create_warning_popup(Evas_Object *parent, const char *text_id, Evas_Smart_Cb cb,
                                                 void *data);

// Title, message and one or two buttons, all plain; no second button without btn2_text. Back does what the first does.
Evas_Object *_velora_common_with_title_btn_popup(Evas_Object *parent, const char *title, const char *text,
                                                 Evas_Smart_Cb cb1, Evas_Smart_Cb cb2, const char *btn1_text,
                                                 const char *btn2_text, void *data);

// Says that a Wi-Fi connection is needed and goes away after 3 seconds, or when a screen reader has read it; the focus
// is the main layout's then.
Evas_Object *_velora_common_create_one_text_popup_with_timer(Evas_Object *parent, AppData *ad);

// A wait without words; back calls back_cb.
Evas_Object *_velora_common_create_processing_popup(Evas_Object *parent, Evas_Smart_Cb back_cb, void *data);

// A wait with a text (id of domain "velora-share"). With a cancel_cb it has a Cancel button, and back does the same;
// without one it has neither.
Evas_Object *_velora_common_create_processing_popup_with_cancel(Evas_Object *parent, const char *text_id,
                                                                Evas_Smart_Cb cancel_cb, void *data);

// A wait with a text (id of domain "velora") beside a small wheel; the caller adds title and back key.
Evas_Object *_velora_common_progressbar_layout_create(Evas_Object *parent, const char *text_id);
