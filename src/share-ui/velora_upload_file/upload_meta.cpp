#include "velora_upload_file/upload_meta.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_network.h"
#include "velora_common/velora_pipe.h"
#include "velora_upload_file/upload_signin.h"

// What the client's thread leaves of the last refresh; the view that started it may be gone.
static std::atomic<int> s_error = 0;

static void __velora_refresh_cb(int status, int error, void *data)
{
    if (status < 3 || status > 5)
        return;
    auto *ad = static_cast<AppData *>(data);
    s_error = error;
    if (!ad->is_meta_refreshed.exchange(true))
        _velora_common_pipe_send_msg(ad->pipe, "refresh_meta_done");
    else if (Ecore_Pipe *pipe = s_view_pipe)
        _velora_common_pipe_send_msg(pipe, "meta_changed");
}

void __meta_refresh_start(UploadViewData *vd)
{
    s_error = 0;
    bool is_complete = false;
    if (cloud_content_sync_get_is_meta_complete(vd->client.get(), &is_complete) != 0)
        is_complete = false;
    vd->ad->is_meta_refreshed = is_complete;
    constexpr int all_types = CLOUD_CONTENT_TYPE_IMAGE | CLOUD_CONTENT_TYPE_VIDEO | CLOUD_CONTENT_TYPE_CAMERA;
    if (const int error = cloud_content_sync_refresh_meta(vd->client.get(), all_types, __velora_refresh_cb, vd->ad);
        error != 0) {
        VELORA_LOGE("cloud_content_sync_refresh_meta failed");
        s_error = error;
        vd->ad->is_meta_refreshed = true;
    }
}

ViewState __meta_state(const UploadViewData *vd)
{
    switch (s_error) {
    case CLOUD_CONTENT_SYNC_ERROR_NONE:
        return VIEW_STATE_NONE;
    case CLOUD_CONTENT_SYNC_ERROR_NETWORK: // of the device, or of the service
        return _velora_common_check_network_without_popup(vd->ad) ? VIEW_STATE_ERROR : VIEW_STATE_OFFLINE;
    default:
        return __is_signed_out(s_error) ? VIEW_STATE_SIGNED_OUT : VIEW_STATE_ERROR;
    }
}
