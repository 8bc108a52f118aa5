#include "velora_add_account_content_sync_setup_wizard_detail/velora_signin_setupwizard_detail.h"
#include "velora_add_account_content_sync_setup_wizard/velora_signin_setupwizard.h"
#include "velora_common/velora_genlist.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_setup_pages.h"
#include "velora_common/velora_setup_row.h"

struct CameraUploadEnabledViewData {
    AppData *ad = nullptr;
    Evas_Object *illustration = nullptr; // the list's
    Elm_Genlist_Item_Class *itc_icon = nullptr;
    Evas_Object *genlist = nullptr;
    Elm_Object_Item *first_item = nullptr;
};
static CameraUploadEnabledViewData *s_vd;

static CameraUploadEnabledViewData *__view()
{
    if (s_vd && _velora_setup_is_open())
        return s_vd;
    VELORA_LOGE("view is destroyed");
    return nullptr;
}

static void __view_destroy(void *page)
{
    auto *vd = static_cast<CameraUploadEnabledViewData *>(page);
    if (!vd) {
        VELORA_LOGE("Invalid argument: vd is NULL");
        return;
    }
    remove_genlist_item(vd->genlist);
    evas_object_del(vd->genlist);
    elm_genlist_item_class_free(vd->itc_icon);
    s_vd = nullptr;
    delete vd;
}

static Evas_Object *__gl_content_get(void *data, Evas_Object *obj, const char *part)
{
    const auto *item_data = static_cast<SetupItemData *>(data);
    if (!item_data) {
        VELORA_LOGE("Invalid argument: data is NULL");
        return nullptr;
    }
    if (!obj) {
        VELORA_LOGE("Invalid obj: event_info is NULL");
        return nullptr;
    }
    if (!s_vd || g_strcmp0(part, "elm.icon") != 0 || g_strcmp0(item_data->kind, "icon_text") != 0)
        return nullptr;
    s_vd->illustration = _velora_setup_illustration_create(obj, "camera_upload2_lite", 584,
                                                           "IDS_STU_BODY_CAMERA_UPLOAD_HAS_BEEN_ENABLED_VELORA");
    return s_vd->illustration;
}

static void __button_next_cb(void *, Evas_Object *, void *)
{
    const CameraUploadEnabledViewData *vd = __view();
    if (!vd)
        return;
    _velora_setup_result_set(vd->ad, "rbutton_next");
    _velora_setup_leave(vd->ad);
}

static Eina_Bool __setup_wizard_detail_back_cb(void *, Elm_Object_Item *)
{
    VELORA_LOGI("__setup_wizard_detail_back_cb is called!");
    if (const CameraUploadEnabledViewData *vd = __view())
        _velora_setup_go_on(vd->ad, _velora_signin_setupwizard_create);
    return EINA_FALSE;
}

void _velora_signin_setupwizard_detail_create(AppData *ad)
{
    VELORA_LOGI("_velora_signin_setupwizard_detail_create is called!");
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    auto *vd = s_vd = new CameraUploadEnabledViewData;
    vd->ad = ad;
    vd->itc_icon = _velora_setup_item_class_create("1icon", __gl_content_get);
    vd->genlist = _velora_setup_list_create(ad->naviframe);
    vd->first_item = elm_genlist_item_append(vd->genlist, vd->itc_icon,
                                             __setup_create_genlist_item_data(0, vd, nullptr, nullptr, "icon_text", 0),
                                             nullptr, ELM_GENLIST_ITEM_NONE, nullptr, nullptr);
    elm_genlist_item_select_mode_set(vd->first_item, ELM_OBJECT_SELECT_MODE_DISPLAY_ONLY);
    Elm_Object_Item *item = _velora_setup_page_push(ad->naviframe, vd->genlist, "IDS_CLOUD_SK2_NEXT", __button_next_cb,
                                                    __setup_wizard_detail_back_cb, vd);
    _velora_setup_page_add(ad, vd, item, __view_destroy);
}
