#include "velora_common/velora_bottom_buttons.h"
#include "velora_common/velora_app_data.h"
#include "velora_common/velora_paths.h"
#include <clocale>
#include <libintl.h>

Evas_Object *_velora_common_create_bottom_buttons(Evas_Object *parent, void *data, const char *text1_id,
                                                  Evas_Smart_Cb cb1, const char *text2_id, Evas_Smart_Cb cb2)
{
    Evas_Object *layout = elm_layout_add(parent);
    elm_layout_file_set(layout, _velora_common_app_file("res/edje/velora.edj").c_str(),
                        "emergency_unlock_bottom_button");
    evas_object_size_hint_weight_set(layout, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_show(layout);
    const struct {
        const char *part, *text_id;
        Evas_Smart_Cb cb;
    } buttons[] = {{"emergency_btn", text1_id, cb1}, {"unlock_btn", text2_id, cb2}};
    for (const auto &wanted : buttons) {
        Evas_Object *button = elm_button_add(layout);
        elm_object_style_set(button, "bottom");
        elm_object_text_set(button, dcgettext(VELORA_DOMAIN, wanted.text_id, LC_MESSAGES));
        evas_object_smart_callback_add(button, "clicked", wanted.cb, data);
        elm_object_part_content_set(layout, wanted.part, button);
        evas_object_size_hint_weight_set(button, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
        evas_object_size_hint_align_set(button, EVAS_HINT_FILL, EVAS_HINT_FILL);
        evas_object_show(button);
    }
    return layout;
}
