#include "velora_common/velora_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_paths.h"
#include <clocale>
#include <libintl.h>

static void __popup_mouse_up_cb(void *data, Evas *, Evas_Object *, void *event_info)
{
    auto *popup = static_cast<Evas_Object *>(data);
    const auto *event = static_cast<Evas_Event_Mouse_Up *>(event_info);
    if (event->button != 3)
        return;
    auto cb = reinterpret_cast<Evas_Smart_Cb>(evas_object_data_get(popup, "mycallback"));
    if (cb)
        cb(evas_object_data_get(popup, "mydata"), nullptr, nullptr);
    else
        evas_object_del(popup);
}

static void __popup_back_key_cb(void *data, Evas_Object *, void *)
{
    auto *popup = static_cast<Evas_Object *>(data);
    if (!popup)
        return;
    auto cb = reinterpret_cast<Evas_Smart_Cb>(evas_object_data_get(popup, "mycallback"));
    if (cb)
        cb(evas_object_data_get(popup, "mydata"), nullptr, nullptr);
}

void _velora_common_register_event_for_popup(Evas_Object *popup, Evas_Smart_Cb cb, void *data)
{
    if (!popup) {
        VELORA_LOGE("popup is NULL");
        return;
    }
    evas_object_event_callback_add(popup, EVAS_CALLBACK_MOUSE_UP, __popup_mouse_up_cb, popup);
    ea_object_event_callback_add(popup, EA_CALLBACK_BACK, __popup_back_key_cb, popup);
    evas_object_data_set(popup, "mydata", data);
    evas_object_data_set(popup, "mycallback", reinterpret_cast<void *>(cb));
}

static void __expand(Evas_Object *obj)
{
    evas_object_size_hint_weight_set(obj, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
}

static void __fill(Evas_Object *obj)
{
    evas_object_size_hint_align_set(obj, EVAS_HINT_FILL, EVAS_HINT_FILL);
}

static Evas_Object *__button_add(Evas_Object *popup, const char *part, Evas_Smart_Cb cb, void *data)
{
    Evas_Object *button = elm_button_add(popup);
    elm_object_style_set(button, "popup");
    elm_object_part_content_set(popup, part, button);
    evas_object_smart_callback_add(button, "clicked", cb, data);
    return button;
}

static Evas_Object *__layout_add(Evas_Object *parent, const char *group)
{
    Evas_Object *layout = elm_layout_add(parent);
    elm_layout_file_set(layout, _velora_common_app_file("res/edje/velora.edj").c_str(), group);
    return layout;
}

static Evas_Object *__wheel_add(Evas_Object *parent, const char *style)
{
    Evas_Object *wheel = elm_progressbar_add(parent);
    elm_object_style_set(wheel, style);
    elm_progressbar_pulse_set(wheel, EINA_TRUE);
    elm_progressbar_pulse(wheel, EINA_TRUE);
    return wheel;
}

Evas_Object *_velora_common_create_warning_popup(Evas_Object *parent, const char *text_id, Evas_Smart_Cb cb, void *data)
{
    if (!parent) {
        VELORA_LOGE("parent is NULL");
        return nullptr;
    }
    Evas_Object *popup = elm_popup_add(parent);
    elm_popup_scrollable_set(popup, EINA_TRUE); // long words in a low window
    elm_object_domain_translatable_text_set(popup, VELORA_DOMAIN, text_id);
    elm_object_domain_translatable_text_set(__button_add(popup, "button1", cb, data), VELORA_DOMAIN,
                                            "IDS_CLOUD_BODY_OK");
    _velora_common_register_event_for_popup(popup, cb, data);
    evas_object_show(popup);
    return popup;
}

Evas_Object *_velora_common_with_title_btn_popup(Evas_Object *parent, const char *title, const char *text,
                                                 Evas_Smart_Cb cb1, Evas_Smart_Cb cb2, const char *btn1_text,
                                                 const char *btn2_text, void *data)
{
    if (!parent) {
        VELORA_LOGE("parent is NULL");
        return nullptr;
    }
    Evas_Object *popup = elm_popup_add(parent);
    elm_popup_align_set(popup, ELM_NOTIFY_ALIGN_FILL, 1.0);
    elm_popup_scrollable_set(popup, EINA_TRUE); // long words in a low window
    __expand(popup);
    elm_object_text_set(popup, text);
    elm_object_part_text_set(popup, "title,text", title);
    elm_object_text_set(__button_add(popup, "button1", cb1, data), btn1_text);
    if (btn2_text) {
        Evas_Object *button = __button_add(popup, "button2", cb2, data);
        elm_object_text_set(button, btn2_text);
        elm_layout_signal_emit(button, "platform,button,primary", "platform"); // of the two the one that acts
    }
    _velora_common_register_event_for_popup(popup, cb1, data);
    evas_object_show(popup);
    return popup;
}

static void __popup_del_cb(void *, Evas_Object *obj, void *)
{
    evas_object_del(obj);
}

static void __popup_del_by_timeout(void *data, Evas_Object *obj, void *)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("ad is NULL");
        return;
    }
    evas_object_del(obj); // whatever else is on screen by now is not ours
    if (ad->layout_main)
        elm_object_focus_set(ad->layout_main, EINA_TRUE);
}

Evas_Object *_velora_common_create_one_text_popup_with_timer(Evas_Object *parent, AppData *ad)
{
    if (!parent) {
        VELORA_LOGE("parent is NULL");
        return nullptr;
    }
    Evas_Object *popup = elm_popup_add(parent);
    ea_object_event_callback_add(popup, EA_CALLBACK_BACK, __popup_del_cb, nullptr);
    __expand(popup);
    elm_object_domain_translatable_text_set(
        popup, VELORA_DOMAIN, "IDS_CLOUD_BODY_WI_FI_CONNECTION_REQUIRED_CONNECT_TO_WI_FI_NETWORK_AND_TRY_AGAIN");
    if (ea_screen_reader_is_on()) {
        evas_object_smart_callback_add(popup, "access,read,stop", __popup_del_by_timeout, ad);
        ea_screen_reader_read(
            popup,
            dcgettext(VELORA_DOMAIN, "IDS_CLOUD_BODY_WI_FI_CONNECTION_REQUIRED_CONNECT_TO_WI_FI_NETWORK_AND_TRY_AGAIN",
                      LC_MESSAGES));
    } else {
        elm_popup_timeout_set(popup, 3.0);
        evas_object_smart_callback_add(popup, "timeout", __popup_del_by_timeout, ad);
    }
    evas_object_show(popup);
    return popup;
}

Evas_Object *_velora_common_create_processing_popup(Evas_Object *parent, Evas_Smart_Cb back_cb, void *data)
{
    Evas_Object *popup = elm_popup_add(parent);
    Evas_Object *layout = __layout_add(popup, "popup_processing");
    elm_object_part_content_set(layout, "elm.swallow.icon", __wheel_add(layout, "process_large"));
    elm_object_content_set(popup, layout);
    evas_object_show(popup);
    _velora_common_register_event_for_popup(popup, back_cb, data);
    return popup;
}

Evas_Object *_velora_common_create_processing_popup_with_cancel(Evas_Object *parent, const char *text_id,
                                                                Evas_Smart_Cb cancel_cb, void *data)
{
    Evas_Object *popup = elm_popup_add(parent);
    Evas_Object *layout = __layout_add(popup, "popup_processingview_1button");
    __expand(layout);
    elm_object_domain_translatable_part_text_set(layout, "elm.swallow.text", VELORA_SHARE_DOMAIN, text_id);
    Evas_Object *wheel = __wheel_add(layout, "process_large");
    elm_progressbar_horizontal_set(wheel, EINA_TRUE);
    __fill(wheel);
    __expand(wheel);
    evas_object_show(wheel);
    elm_object_part_content_set(layout, "elm.swallow.content", wheel);
    elm_object_content_set(popup, layout);
    if (cancel_cb) {
        Evas_Object *button = __button_add(popup, "button1", cancel_cb, data);
        elm_object_domain_translatable_text_set(button, VELORA_SHARE_DOMAIN, "IDS_CLOUD_SK2_CANCEL");
        evas_object_propagate_events_set(button, EINA_FALSE);
        evas_object_show(button);
        ea_object_event_callback_add(popup, EA_CALLBACK_BACK, cancel_cb, data);
    }
    evas_object_show(popup);
    return popup;
}

Evas_Object *_velora_common_progressbar_layout_create(Evas_Object *parent, const char *text_id)
{
    if (!parent) {
        VELORA_LOGE("parent is NULL");
        return nullptr;
    }
    Evas_Object *popup = elm_popup_add(parent);
    Evas_Object *outer = __layout_add(popup, "velora.popup.processing");
    Evas_Object *inner = __layout_add(outer, "left,icon,right,text");
    Evas_Object *wheel = __wheel_add(inner, "process_medium");
    elm_progressbar_horizontal_set(wheel, EINA_TRUE);
    __fill(wheel);
    __expand(wheel);
    evas_object_show(wheel);
    elm_object_part_content_set(inner, "processing_icon", wheel);
    elm_object_domain_translatable_part_text_set(inner, "processing_text", VELORA_DOMAIN, text_id);
    elm_object_part_content_set(outer, "processing_content", inner);
    elm_object_content_set(popup, outer);
    __fill(popup);
    __expand(popup);
    evas_object_show(popup);
    return popup;
}
