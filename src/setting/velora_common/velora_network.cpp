#include "velora_common/velora_network.h"
#include "connection/connection.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_requests.h"
#include <memory>

struct ConnectionDestroy {
    void operator()(connection_h handle) const
    {
        connection_destroy(handle);
    }
};
using Connection = std::unique_ptr<struct connection_s, ConnectionDestroy>;

static const char s_topic[] = "network";

// The popup belongs to no page: it stands for the requests that want a network.
static PopupOwner __owner()
{
    return {s_topic, s_topic};
}

// Where a page has files of others, only what wanted the network is given up.
static void __velora_network_exit_unless_welcome(AppData *ad)
{
    if (!ad->is_welcome_shown)
        _velora_requests_finish_held(ad);
}

static void __velora_network_error_popup_cancel_cb(void *data, Evas_Object *, void *)
{
    auto *ad = static_cast<AppData *>(data);
    _velora_popup_take_away(ad, __owner());
    __velora_network_exit_unless_welcome(ad);
}

static void __velora_network_general_error_popup_wifi_cb(void *data, Evas_Object *, void *)
{
    auto *ad = static_cast<AppData *>(data);
    _velora_popup_take_away(ad, __owner());
    app_control_h request = nullptr;
    if (app_control_create(&request) == APP_CONTROL_ERROR_NONE) {
        app_control_set_operation(request, APP_CONTROL_OPERATION_SETTING_WIFI);
        app_control_send_launch_request(request, nullptr, nullptr);
        app_control_destroy(request);
    }
    __velora_network_exit_unless_welcome(ad);
}

static void __velora_launch_app_by_network_error(AppData *ad)
{
    app_control_h request = nullptr;
    app_control_create(&request);
    if (!request) {
        VELORA_LOGE("app_control is NULL");
        return;
    }
    if (ad->cellular_state == CONNECTION_CELLULAR_STATE_FLIGHT_MODE) {
        app_control_set_app_id(request, "setting-flightmode-efl");
    } else {
        app_control_set_operation(request, APP_CONTROL_OPERATION_SETTING_MOBILE_NETWORK);
        app_control_set_app_id(request, "setting-network-efl");
    }
    app_control_send_launch_request(request, nullptr, nullptr);
    app_control_destroy(request);
    __velora_network_exit_unless_welcome(ad);
}

static void __velora_network_general_error_popup_data_network_cb(void *data, Evas_Object *, void *)
{
    auto *ad = static_cast<AppData *>(data);
    _velora_popup_take_away(ad, __owner());
    __velora_launch_app_by_network_error(ad);
}

static void __add_button(AppData *ad, Evas_Object *popup, const char *part, const char *text_id, Evas_Smart_Cb cb)
{
    Evas_Object *button = elm_button_add(popup);
    elm_object_style_set(button, "popup");
    elm_object_domain_translatable_text_set(button, VELORA_DOMAIN, text_id);
    elm_object_part_content_set(popup, part, button);
    evas_object_smart_callback_add(button, "clicked", cb, ad);
}

static Evas_Object *__network_popup_create(AppData *ad)
{
    const bool is_mobile_data_off = ad->cellular_state == CONNECTION_CELLULAR_STATE_FLIGHT_MODE ||
                                    ad->cellular_state == CONNECTION_CELLULAR_STATE_ROAMING_OFF ||
                                    ad->cellular_state == CONNECTION_CELLULAR_STATE_CALL_ONLY_AVAILABLE;
    Evas_Object *popup = elm_popup_add(ad->win_main);
    elm_popup_scrollable_set(popup, EINA_TRUE); // long words in a low window
    elm_object_domain_translatable_part_text_set(popup, "title,text", VELORA_DOMAIN,
                                                 "IDS_CLOUD_HEADER_NO_NETWORK_CONNECTION");
    ea_object_event_callback_add(popup, EA_CALLBACK_BACK, __velora_network_error_popup_cancel_cb, ad);
    evas_object_size_hint_weight_set(popup, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    elm_object_domain_translatable_text_set(
        popup, VELORA_DOMAIN,
        is_mobile_data_off ? "IDS_CLOUD_POP_MOBILE_DATA_IS_DISABLED_CONNECT_TO_WI_FI_NETWORK_INSTEAD_OR_ENABLE_"
                             "MOBILE_DATA_AND_TRY_AGAIN"
                           : "IDS_CLOUD_BODY_WI_FI_CONNECTION_REQUIRED_CONNECT_TO_WI_FI_NETWORK_AND_TRY_AGAIN");
    __add_button(ad, popup, "button1", "IDS_CLOUD_SK2_CANCEL", __velora_network_error_popup_cancel_cb);
    __add_button(ad, popup, "button2", "IDS_CLOUD_BODY_WI_FI", __velora_network_general_error_popup_wifi_cb);
    if (is_mobile_data_off)
        __add_button(ad, popup, "button3", "IDS_CLOUD_BODY_SETTINGS",
                     __velora_network_general_error_popup_data_network_cb);
    evas_object_show(popup);
    return popup;
}

// There is a network: what said that there is none is out of date.
static int __connected(AppData *ad)
{
    _velora_popup_take_away(ad, __owner());
    return 1;
}

int _velora_common_check_network(AppData *ad)
{
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return 0;
    }
    connection_h handle = nullptr;
    if (connection_create(&handle) != CONNECTION_ERROR_NONE) {
        VELORA_LOGE("connection_create fail");
        return __connected(ad);
    }
    const Connection connection(handle);
    connection_type_e type = CONNECTION_TYPE_DISCONNECTED;
    if (connection_get_type(handle, &type) != CONNECTION_ERROR_NONE) {
        VELORA_LOGE("connection_get_type fail");
        return __connected(ad);
    }
    if (type != CONNECTION_TYPE_DISCONNECTED)
        return __connected(ad);
    connection_cellular_state_e state = CONNECTION_CELLULAR_STATE_OUT_OF_SERVICE;
    if (connection_get_cellular_state(handle, &state) != CONNECTION_ERROR_NONE) {
        VELORA_LOGE("connection_get_cellular_state failed");
        return 0;
    }
    ad->cellular_state = state;
    _velora_popup_show(ad, __owner(), __network_popup_create(ad));
    return 0;
}

int _velora_common_check_network_without_popup(AppData *)
{
    connection_h handle = nullptr;
    if (connection_create(&handle) != CONNECTION_ERROR_NONE) {
        VELORA_LOGE("connection_create failed");
        return 0;
    }
    const Connection connection(handle);
    connection_type_e type = CONNECTION_TYPE_DISCONNECTED;
    if (connection_get_type(handle, &type) != CONNECTION_ERROR_NONE) {
        VELORA_LOGE("connection_get_type failed");
        return 0;
    }
    return type != CONNECTION_TYPE_DISCONNECTED;
}
