#include "velora_common/velora_client.h"
#include "velora_common/velora_log.h"

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
