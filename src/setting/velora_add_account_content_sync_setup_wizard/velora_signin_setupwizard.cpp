#include "velora_add_account_content_sync_setup_wizard/velora_signin_setupwizard.h"
#include "notification/notification.h"
#include "velora_add_account_content_sync_setup_wizard_detail/velora_signin_setupwizard_detail.h"
#include "velora_common/velora_client.h"
#include "velora_common/velora_genlist.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_row_control.h"
#include "velora_common/velora_setup_pages.h"
#include "velora_common/velora_setup_row.h"
#include "velora_setup_wizard/velora_setupwizard.h"
#include <clocale>
#include <libintl.h>

struct CameraUploadSetupViewData {
    AppData *ad = nullptr;
    Evas_Object *illustration = nullptr; // the list's
    Evas_Object *genlist = nullptr;
    Elm_Genlist_Item_Class *itc_icon = nullptr;
    Elm_Genlist_Item_Class *itc_line = nullptr;
    Elm_Genlist_Item_Class *itc_group = nullptr;
    Elm_Genlist_Item_Class *itc_sub = nullptr;
    Elm_Object_Item *first_item = nullptr;
    bool is_wifi_only = false;    // what Enable writes, and the group of radios shows
    Evas_Object *radio = nullptr; // the group's own, never shown: it outlives the rows and their radios

    ClientHold client; // null when there is none to be had
};
static CameraUploadSetupViewData *s_vd;

static constexpr int s_any_network = 1, s_wifi_only = 2; // values of the radios

static const char *__text(const char *id)
{
    return dcgettext(VELORA_DOMAIN, id, LC_MESSAGES);
}

static CameraUploadSetupViewData *__view()
{
    if (s_vd && _velora_setup_is_open())
        return s_vd;
    VELORA_LOGE("view is destroyed");
    return nullptr;
}

static void __view_destroy(void *page)
{
    auto *vd = static_cast<CameraUploadSetupViewData *>(page);
    if (!vd) {
        VELORA_LOGE("Invalid argument: vd is NULL");
        return;
    }
    remove_genlist_item(vd->genlist);
    for (Elm_Genlist_Item_Class *one : {vd->itc_icon, vd->itc_line, vd->itc_group, vd->itc_sub})
        elm_genlist_item_class_free(one);
    s_vd = nullptr;
    delete vd;
}

// The choice of networks: what is shown and what is written is always the same.

static void __network_choose(CameraUploadSetupViewData *vd, int value)
{
    vd->is_wifi_only = value != s_any_network;
    elm_radio_value_set(vd->radio, value);
}

static void __radio_changed_cb(void *, Evas_Object *radio, void *)
{
    if (CameraUploadSetupViewData *vd = __view())
        __network_choose(vd, elm_radio_state_value_get(radio));
}

static void __upload_lable_mode_cb(void *data, Evas_Object *obj, void *event_info)
{
    if (!obj) {
        VELORA_LOGE("obj is NULL");
        return;
    }
    elm_genlist_item_selected_set(static_cast<Elm_Object_Item *>(event_info), EINA_FALSE);
    if (CameraUploadSetupViewData *vd = __view())
        __network_choose(vd, GPOINTER_TO_INT(data));
}

static Evas_Object *__radio_create(CameraUploadSetupViewData *vd, const SetupItemData *item_data)
{
    Evas_Object *radio = elm_radio_add(vd->genlist);
    elm_radio_state_value_set(radio, item_data->index + 1);
    elm_radio_group_add(radio, vd->radio);
    elm_radio_value_set(vd->radio, vd->is_wifi_only ? s_wifi_only : s_any_network);
    evas_object_size_hint_weight_set(radio, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(radio, EVAS_HINT_FILL, EVAS_HINT_FILL);
    elm_object_focus_allow_set(radio, EINA_FALSE); // keys choose the row
    evas_object_smart_callback_add(radio, "changed", __radio_changed_cb, nullptr);
    ea_screen_reader_name_set(radio, __text(item_data->text_id_2));
    return _velora_common_row_control(vd->genlist, radio);
}

// Enable

static bool __settings_write(CloudSyncHandle handle, bool is_wifi_only)
{
    bool was_on = false;
    cloud_content_sync_setting_get_camera_upload(handle, &was_on);
    if (const int error = cloud_content_sync_setting_set_camera_upload(handle, true); error != 0) {
        VELORA_LOGE("Failed to cloud_content_sync_setting_set_camera_upload:[%d]", error);
        return false;
    }
    if (cloud_content_sync_setting_set_wifi_only_type(handle, CLOUD_CONTENT_TYPE_CAMERA, is_wifi_only) == 0)
        return true;
    VELORA_LOGE("cloud_content_sync_setting_set_wifi_only_type failed");
    cloud_content_sync_setting_set_camera_upload(handle, was_on); // not over a network that was not chosen
    return false;
}

static void __turn_on_btn_cb(void *, Evas_Object *, void *event_info)
{
    const CameraUploadSetupViewData *vd = __view();
    if (!vd)
        return;
    elm_genlist_item_selected_set(static_cast<Elm_Object_Item *>(event_info), EINA_FALSE); // for another try
    // The next page says that it is on.
    if (vd->client && __settings_write(vd->client.get(), vd->is_wifi_only))
        _velora_setup_go_on(vd->ad, _velora_signin_setupwizard_detail_create);
    else
        notification_status_message_post(__text("IDS_VELORA_BODY_SETTING_NOT_SAVED"));
}

// The other ways

static void __button_Skip_cb(void *, Evas_Object *, void *)
{
    const CameraUploadSetupViewData *vd = __view();
    if (!vd)
        return;
    _velora_setup_result_set(vd->ad, "rbutton_skip");
    _velora_setup_leave(vd->ad);
}

static Eina_Bool __setup_wizard_back_cb(void *, Elm_Object_Item *)
{
    VELORA_LOGI("__setup_wizard_back_cb is called!");
    const CameraUploadSetupViewData *vd = __view();
    if (!vd)
        return EINA_FALSE;
    _velora_setup_result_set(vd->ad, "lbutton_click");
    _velora_setup_go_on(vd->ad, _velora_setupwizard_view_create);
    return EINA_FALSE;
}

// Rows

static Evas_Object *__enable_button_create(Evas_Object *genlist, const SetupItemData *item_data)
{
    Evas_Object *button = elm_button_add(genlist);
    elm_object_style_set(button, "contacts");
    elm_object_domain_translatable_text_set(button, VELORA_DOMAIN, item_data->text_id_1);
    elm_object_focus_allow_set(button, EINA_FALSE); // keys choose the row
    return button;
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
    if (!s_vd)
        return nullptr;
    if (g_strcmp0(part, "elm.icon.2") == 0)
        return item_data->position == 1 ? __radio_create(s_vd, item_data) : nullptr;
    if (g_strcmp0(part, "elm.icon") != 0)
        return nullptr;
    if (g_strcmp0(item_data->kind, "1button") == 0)
        return __enable_button_create(obj, item_data);
    if (g_strcmp0(item_data->kind, "icon_text") != 0)
        return nullptr;
    s_vd->illustration = _velora_setup_illustration_create(
        obj, "camera_upload1_lite", 315,
        "IDS_STU_BODY_ENABLE_CAMERA_UPLOAD_TO_AUTOMATICALLY_SAVE_ALL_YOUR_PICTURES_TO_VELORA_AND_ACCESS_THEM_FROM_"
        "ANYWHERE_VELORA");
    return s_vd->illustration;
}

static Elm_Object_Item *__row_append(CameraUploadSetupViewData *vd, const Elm_Genlist_Item_Class *item_class,
                                     SetupItemData *item_data, Evas_Smart_Cb selected = nullptr, int value = 0)
{
    Elm_Object_Item *item = elm_genlist_item_append(vd->genlist, item_class, item_data, nullptr, ELM_GENLIST_ITEM_NONE,
                                                    selected, GINT_TO_POINTER(value));
    if (!selected)
        elm_genlist_item_select_mode_set(item, ELM_OBJECT_SELECT_MODE_DISPLAY_ONLY);
    return item;
}

static void __rows_append(CameraUploadSetupViewData *vd)
{
    const auto data = [vd](int index, const char *text_id_1, const char *text_id_2, const char *kind, int position) {
        return __setup_create_genlist_item_data(index, vd, text_id_1, text_id_2, kind, position);
    };
    vd->first_item = __row_append(vd, vd->itc_icon, data(0, nullptr, nullptr, "icon_text", 0));
    __row_append(vd, vd->itc_group, data(0, "IDS_STU_HEADER_UPLOAD_VIA_ABB", nullptr, nullptr, 3));
    __row_append(vd, vd->itc_line, data(0, nullptr, "IDS_STU_OPT_WI_FI_OR_MOBILE_NETWORKS_ABB", nullptr, 1),
                 __upload_lable_mode_cb, s_any_network);
    __row_append(vd, vd->itc_line, data(1, nullptr, "IDS_STU_OPT_WI_FI_ONLY", nullptr, 1), __upload_lable_mode_cb,
                 s_wifi_only);
    __row_append(vd, vd->itc_icon, data(0, "IDS_STU_BUTTON_ENABLE_CAMERA_UPLOAD_VELORA_ABB", nullptr, "1button", 3),
                 __turn_on_btn_cb);
    __row_append(vd, vd->itc_sub,
                 data(0, nullptr, "IDS_STU_BODY_TO_GET_50_GB_OF_SPACE_COMPLETE_THE_GET_STARTED_GUIDE_AT_VELORACOM_GS",
                      nullptr, 3));
}

static void __network_read(CameraUploadSetupViewData *vd)
{
    if (!vd->client || cloud_content_sync_setting_get_wifi_only_type(vd->client.get(), CLOUD_CONTENT_TYPE_CAMERA,
                                                                     &vd->is_wifi_only) != 0)
        VELORA_LOGE("cloud_content_sync_setting_get_wifi_only_type failed");
}

static void __list_create(CameraUploadSetupViewData *vd)
{
    vd->itc_icon = _velora_setup_item_class_create("1icon", __gl_content_get);
    vd->itc_line = _velora_setup_item_class_create("1line", __gl_content_get);
    vd->itc_group = _velora_setup_item_class_create("groupindex", __gl_content_get);
    vd->itc_sub = _velora_setup_item_class_create("multiline_sub", __gl_content_get);
    vd->genlist = _velora_setup_list_create(vd->ad->naviframe);
    vd->radio = elm_radio_add(vd->genlist);
    elm_radio_state_value_set(vd->radio, 0);
    elm_radio_value_set(vd->radio, 0);
    elm_object_focus_allow_set(vd->radio, EINA_FALSE);
    evas_object_data_set(vd->genlist, "radio", vd->radio);
    __rows_append(vd);
}

void _velora_signin_setupwizard_create(AppData *ad)
{
    VELORA_LOGI("_velora_signin_setupwizard_create is called!");
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    if (_velora_setup_join(ad))
        return;
    auto *vd = s_vd = new CameraUploadSetupViewData;
    vd->ad = ad;
    vd->client = _velora_common_client_get(ad);
    __network_read(vd);
    __list_create(vd);
    Elm_Object_Item *item = _velora_setup_page_push(ad->naviframe, vd->genlist, "IDS_STU_BUTTON_SKIP", __button_Skip_cb,
                                                    __setup_wizard_back_cb, vd);
    _velora_setup_page_add(ad, vd, item, __view_destroy);
}
