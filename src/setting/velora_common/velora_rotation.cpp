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

void _velora_common_upright_set(Evas_Object *win, bool is_upright)
{
    static int wishes;
    wishes += is_upright ? 1 : -1;
    if (!win || !elm_win_wm_rotation_supported_get(win))
        return;
    const int rotations[] = {0, 90, 180, 270};
    elm_win_wm_rotation_available_rotations_set(win, rotations, wishes > 0 ? 1 : 4);
}
