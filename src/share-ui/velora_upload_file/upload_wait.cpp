#include "velora_upload_file/upload_wait.h"
#include "velora_upload_file/upload_notification.h"
#include "velora_upload_file/upload_text.h"
#include <cstdio>

std::string __wait_text(const UploadRun &run)
{
    cloud_content_sync_wait_e reason = CLOUD_CONTENT_SYNC_WAIT_NONE;
    int seconds = 0;
    if (!run.client || cloud_content_sync_get_wait(run.client.get(), &reason, &seconds) != 0)
        return {};
    char words[160];
    switch (reason) {
    case CLOUD_CONTENT_SYNC_WAIT_NO_NETWORK:
        return __text("IDS_VELORA_BODY_WAIT_NETWORK");
    case CLOUD_CONTENT_SYNC_WAIT_NOT_REACHABLE:
        return __text("IDS_VELORA_BODY_WAIT_REACHABLE");
    case CLOUD_CONTENT_SYNC_WAIT_SERVICE_BUSY:
        std::snprintf(words, sizeof words, __text_of("The service is busy · on in %d seconds", seconds), seconds);
        return words;
    case CLOUD_CONTENT_SYNC_WAIT_NONE:
        break;
    }
    return {};
}

void __wait_noti_update(const UploadRun &run)
{
    const std::string text = __wait_text(run);
    if (text.empty() && !run.report.waits)
        return;
    run.report.waits = !text.empty();
    if (text.empty())
        __progress_noti_set_count(run.noti_id, run.report.success + run.report.fail, run.remaining());
    else
        __progress_noti_set_content(run.noti_id, text.c_str());
}
