#include "velora_common/velora_indicator.h"

void _velora_common_set_indicator_mode(Evas_Object *conformant, int mode)
{
    static const struct {
        const char *signal, *style;
    } modes[] = {
        {"elm,state,indicator,overlap", "indicator/transparent"},
        {"elm,state,indicator,nooverlap", "indicator/headerbg"},
        {"elm,state,indicator,overlap", "indicator/translucent"},
    };
    if (mode < INDICATOR_MODE_TRANSPARENT || mode > INDICATOR_MODE_TRANSLUCENT)
        return;
    elm_object_signal_emit(conformant, modes[mode].signal, "elm");
    if (Evas_Object *bg = elm_object_part_content_get(conformant, "elm.swallow.indicator_bg"))
        elm_object_style_set(bg, modes[mode].style);
}
