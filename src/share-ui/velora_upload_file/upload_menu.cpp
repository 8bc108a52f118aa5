#include "velora_upload_file/upload_menu.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_more_menu.h"
#include "velora_upload_file/upload_select.h"

void __delete_all_callback_ctxpopup()
{
    if (!s_vd) {
        VELORA_LOGE("s_vd is NULL");
        return;
    }
    _velora_more_menu_close(s_vd->ad, s_vd);
}

static void __chosen_cb(void *data)
{
    __ctx_delete_cb(data, nullptr, nullptr);
}

void __more_create_folder_cb(void *data, Evas_Object *, void *)
{
    auto *vd = static_cast<UploadViewData *>(data);
    if (!vd) {
        VELORA_LOGE("data is NULL");
        return;
    }
    if (vd != s_vd || !vd->more_btn || elm_naviframe_top_item_get(vd->ad->naviframe) != vd->nf_item)
        return;
    // The key that opened it closes it; a question that is open is to be answered first.
    if (!_velora_more_menu_close(vd->ad, vd) && !vd->ad->popup)
        _velora_more_menu_open(vd->ad, vd, VELORA_SHARE_DOMAIN, "IDS_CLOUD_BUTTON_REMOVE", __chosen_cb, vd);
}
