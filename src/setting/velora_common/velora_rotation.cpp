#include "velora_common/velora_rotation.h"
#include "velora_common/velora_log.h"

int _velora_common_get_landscape_mode(Evas_Object *win)
{
    if (!win) {
        VELORA_LOGE("parent is NULL");
        return 0;
    }
    const int rotation = elm_win_rotation_get(win);
    return rotation != 0 && rotation != 180;
}
