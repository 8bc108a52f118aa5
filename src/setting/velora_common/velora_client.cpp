#include "velora_common/velora_client.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pipe.h"

ClientHold _velora_common_client_get(AppData *ad)
{
    if (ad->client)
        return ad->client;
    CloudSyncHandle handle = nullptr;
    if (cloud_content_sync_create(VELORA_SERVICE, &handle) != 0 || !handle) {
        VELORA_LOGE("cloud_content_sync_create failed");
        return nullptr;
    }
    ad->client.reset(handle, CloudClientDestroy());
    ad->sync_handle = handle;
    return ad->client;
}

void _velora_common_client_release(AppData *ad)
{
    ad->sync_handle = nullptr;
    ad->client.reset();
}

// Client thread.
static void __velora_refresh_cb(int status, int, void *data)
{
    auto *ad = static_cast<AppData *>(data);
    if (!ad) {
        VELORA_LOGE("user_data is NULL");
        return;
    }
    if (status < 3 || status > 5)
        return;
    ad->is_meta_refreshed = true;
    _velora_common_pipe_send_msg(ad->pipe, "refresh_meta_done");
}

void _velora_common_meta_refresh(AppData *ad)
{
    constexpr int all_types = CLOUD_CONTENT_TYPE_IMAGE | CLOUD_CONTENT_TYPE_VIDEO | CLOUD_CONTENT_TYPE_CAMERA;
    ad->is_meta_refreshed = false;
    if (cloud_content_sync_refresh_meta(ad->sync_handle, all_types, __velora_refresh_cb, ad) == 0)
        return;
    VELORA_LOGE("cloud_content_sync_refresh_meta failed");
    ad->is_meta_refreshed = true;
}
