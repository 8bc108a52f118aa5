#include "velora_common/velora_row_control.h"

Evas_Object *_velora_common_row_control(Evas_Object *genlist, Evas_Object *control)
{
    Evas_Object *layout = elm_layout_add(genlist);
    elm_layout_theme_set(layout, "layout", "list/C/type.2", "default");
    evas_object_propagate_events_set(control, EINA_FALSE);
    elm_object_part_content_set(layout, "elm.swallow.content", control);
    return layout;
}
