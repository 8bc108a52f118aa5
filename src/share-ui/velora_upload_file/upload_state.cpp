// The refresh of the folder tree, and what the view says when there is no list to show.
#include "velora_common/velora_paths.h"
#include "velora_common/velora_thread.h"
#include "velora_upload_file/upload_internal.h"
#include <clocale>
#include <libintl.h>

const char *__text(const char *id)
{
    return *id ? dcgettext(VELORA_SHARE_DOMAIN, id, LC_MESSAGES) : id;
}

const char *__failure_text(int error)
{
    switch (error) {
    case CLOUD_CONTENT_SYNC_ERROR_NETWORK:
        return __text("IDS_VELORA_BODY_NO_NETWORK");
    case CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED:
    case CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT:
        return __text("IDS_VELORA_BODY_SIGN_IN_AGAIN");
    case CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE:
        return __text("IDS_VELORA_BODY_FILE_MISSING");
    case CLOUD_CONTENT_SYNC_ERROR_LOCAL_CHANGED:
        return __text("IDS_VELORA_BODY_FILE_CHANGED");
    case CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN:
        return __text("IDS_VELORA_BODY_REFUSED");
    case CLOUD_CONTENT_SYNC_ERROR_BAD_NAME:
        return __text("IDS_VELORA_BODY_BAD_NAME");
    case CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL:
        return __text("IDS_VELORA_BODY_STORAGE_FULL");
    default:
        return __text("IDS_VELORA_BODY_FAILED");
    }
}

// What the client's thread needs of a refresh; one runs at a time, and the view that started it may be gone.
struct MetaRefresh {
    AppData *ad = nullptr;
    std::atomic<int> error = 0;
    std::atomic<Ecore_Pipe *> main_pipe = nullptr;
};
static MetaRefresh s_refresh;

static void __velora_refresh_cb(int status, int error, void *)
{
    if (status < 3 || status > 5)
        return;
    s_refresh.error = error;
    if (s_refresh.ad->is_meta_refreshed.exchange(true)) {
        if (Ecore_Pipe *pipe = s_view_pipe)
            _velora_common_pipe_send_msg(pipe, "meta_changed");
    } else
        _velora_common_pipe_send_msg(s_refresh.main_pipe, "refresh_meta_done");
}

void __meta_refresh_start(UploadViewData *vd)
{
    s_refresh.ad = vd->ad;
    s_refresh.error = 0;
    s_refresh.main_pipe = vd->ad->pipe;
    bool is_complete = false;
    if (cloud_content_sync_get_is_meta_complete(vd->ad->sync_handle, &is_complete) != 0)
        is_complete = false;
    vd->ad->is_meta_refreshed = is_complete;
    constexpr int all_types = CLOUD_CONTENT_TYPE_IMAGE | CLOUD_CONTENT_TYPE_VIDEO | CLOUD_CONTENT_TYPE_CAMERA;
    if (const int error = cloud_content_sync_refresh_meta(vd->ad->sync_handle, all_types, __velora_refresh_cb, vd->ad);
        error != 0) {
        VELORA_LOGE("cloud_content_sync_refresh_meta failed");
        s_refresh.error = error;
        vd->ad->is_meta_refreshed = true;
    }
}

ViewState __meta_state()
{
    switch (s_refresh.error) {
    case CLOUD_CONTENT_SYNC_ERROR_NONE:
        return VIEW_STATE_NONE;
    case CLOUD_CONTENT_SYNC_ERROR_NETWORK:
        return VIEW_STATE_OFFLINE;
    case CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED:
    case CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT:
        return VIEW_STATE_SIGNED_OUT;
    default:
        return VIEW_STATE_ERROR;
    }
}

static void __retry_cb(void *, Evas_Object *, void *)
{
    UploadViewData *vd = s_vd;
    if (!vd)
        return;
    __meta_refresh_start(vd);
    if (vd->ad->is_meta_refreshed)
        _velora_upload_view_update();
    else
        __state_show(vd, VIEW_STATE_LOADING);
}

void __state_show(UploadViewData *vd, ViewState state)
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
    if (vd->state)
        evas_object_del(vd->state);
    vd->state = nullptr;
    elm_object_signal_emit(vd->layout, state == VIEW_STATE_NONE ? "velora,state,hide" : "velora,state,show", "velora");
    const bool has_retry = state == VIEW_STATE_OFFLINE || state == VIEW_STATE_ERROR || state == VIEW_STATE_SIGNED_OUT;
    if (vd->done_btn && !vd->is_select_mode)
        elm_object_disabled_set(vd->done_btn, has_retry || state == VIEW_STATE_LOADING || !vd->folder);
    if (state == VIEW_STATE_NONE)
        return;

    vd->state = elm_layout_add(vd->layout);
    elm_layout_file_set(vd->state, _velora_common_app_file("res/edje/velora.edj").c_str(), "velora.state");
    Evas_Object *icon = elm_image_add(vd->state);
    elm_image_file_set(icon, _velora_common_app_file("res/edje/velora_edc_images.edj").c_str(), looks[state].icon);
    elm_object_part_content_set(vd->state, "velora.icon", icon);
    elm_object_domain_translatable_part_text_set(vd->state, "velora.title", VELORA_SHARE_DOMAIN, looks[state].title);
    if (looks[state].text)
        elm_object_domain_translatable_part_text_set(vd->state, "velora.text", VELORA_SHARE_DOMAIN, looks[state].text);
    if (has_retry) {
        Evas_Object *button = elm_button_add(vd->state);
        elm_object_domain_translatable_text_set(button, VELORA_SHARE_DOMAIN, "IDS_VELORA_BUTTON_RETRY");
        evas_object_smart_callback_add(button, "clicked", __retry_cb, nullptr);
        elm_object_part_content_set(vd->state, "velora.swallow.action", button);
    }
    elm_object_part_content_set(vd->layout, "velora.swallow.state", vd->state);
}
