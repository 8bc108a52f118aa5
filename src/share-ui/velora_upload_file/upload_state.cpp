#include "velora_upload_file/upload_state.h"
#include "velora_common/velora_paths.h"

// The look of the one view; it goes with the view's layout.
struct StateLook {
    Evas_Object *look = nullptr;
    ViewState shown = VIEW_STATE_NONE;
};
static StateLook s_state;

static void __look_deleted_cb(void *, Evas *, Evas_Object *obj, void *)
{
    if (s_state.look == obj)
        s_state = {};
}

ViewState __state_shown(const UploadViewData *)
{
    return s_state.shown;
}

void __state_show(UploadViewData *vd, ViewState state, Evas_Smart_Cb again)
{
    static const struct {
        const char *icon, *title, *text;
    } looks[] = {
        {},
        {"velora_state_empty", "IDS_VELORA_STATE_EMPTY_TITLE", "IDS_VELORA_STATE_EMPTY_TEXT"},
        {"velora_state_loading", "IDS_VELORA_STATE_LOADING_TITLE", nullptr},
        {"velora_state_offline", "IDS_VELORA_STATE_OFFLINE_TITLE", "IDS_VELORA_STATE_OFFLINE_TEXT"},
        {"velora_state_error", "IDS_VELORA_STATE_ERROR_TITLE", "IDS_VELORA_STATE_ERROR_TEXT"},
        {"velora_state_error", "IDS_VELORA_STATE_SIGNED_OUT_TITLE", "IDS_VELORA_STATE_SIGNED_OUT_TEXT"},
        {"velora_state_stopped", "IDS_VELORA_STATE_STOPPED_TITLE", "IDS_VELORA_STATE_STOPPED_TEXT"},
        {"velora_state_error", "IDS_CLOUD_POP_UPLOAD_FAILED", "IDS_VELORA_BODY_STORAGE_FULL"},
    };
    if (s_state.look && s_state.shown == state) // there may be a finger on it
        return;
    if (s_state.look)
        evas_object_del(s_state.look);
    s_state = {.shown = state};
    elm_object_signal_emit(vd->layout, state == VIEW_STATE_NONE ? "velora,state,hide" : "velora,state,show", "velora");
    if (state == VIEW_STATE_NONE)
        return;

    Evas_Object *look = s_state.look = elm_layout_add(vd->layout);
    elm_layout_file_set(look, _velora_common_app_file("res/edje/velora.edj").c_str(), "velora.state");
    Evas_Object *icon = elm_image_add(look);
    elm_image_file_set(icon, _velora_common_app_file("res/edje/velora_edc_images.edj").c_str(), looks[state].icon);
    elm_object_part_content_set(look, "velora.icon", icon);
    elm_object_domain_translatable_part_text_set(look, "velora.title", VELORA_SHARE_DOMAIN, looks[state].title);
    if (looks[state].text)
        elm_object_domain_translatable_part_text_set(look, "velora.text", VELORA_SHARE_DOMAIN, looks[state].text);
    if (again) {
        Evas_Object *button = elm_button_add(look);
        elm_object_domain_translatable_text_set(button, VELORA_SHARE_DOMAIN,
                                                state == VIEW_STATE_SIGNED_OUT ? "IDS_VELORA_BUTTON_SIGN_IN"
                                                                               : "IDS_VELORA_BUTTON_RETRY");
        evas_object_smart_callback_add(button, "clicked", again, vd);
        elm_object_part_content_set(look, "velora.swallow.action", button);
    }
    evas_object_event_callback_add(look, EVAS_CALLBACK_DEL, __look_deleted_cb, nullptr);
    elm_object_part_content_set(vd->layout, "velora.swallow.state", look);
}
