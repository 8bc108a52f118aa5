#include "velora_upload_file/upload_book.h"
#include "notification/notification.h"
#include "velora_common/velora_log.h"
#include "velora_upload_file/upload_text.h"
#include <atomic>

using Change = int (*)(cloud_content_sync_h handle, const char *const *local_paths, const char *const *server_paths,
                       int count);

static int __change(const UploadRun &run, const std::vector<const RunFile *> &files, Change change)
{
    std::vector<const char *> local, server;
    for (const RunFile *file : files) {
        local.push_back(file->item->path);
        server.push_back(file->destination.c_str());
    }
    if (files.empty())
        return CLOUD_CONTENT_SYNC_ERROR_NONE;
    const int error = change(run.client.get(), local.data(), server.data(), static_cast<int>(files.size()));
    if (error != CLOUD_CONTENT_SYNC_ERROR_NONE)
        VELORA_LOGE("the book of uploads cannot be written: %d", error);
    return error;
}

void __book_enter(const UploadRun &run)
{
    std::vector<const RunFile *> files;
    for (const RunFile &file : run.files)
        if (file.item->state == UPLOAD_STATE_WAITING)
            files.push_back(&file);
    static std::atomic<bool> was_said; // once is enough
    if (__change(run, files, cloud_content_sync_queue_add) == CLOUD_CONTENT_SYNC_ERROR_DB_FAILED &&
        !was_said.exchange(true))
        notification_status_message_post(__text("IDS_VELORA_BODY_NOT_KEPT"));
}

void __book_forget(const UploadRun &run, const std::vector<const RunFile *> &files)
{
    __change(run, files, cloud_content_sync_queue_remove);
}

std::vector<BookEntry> __book_entries(cloud_content_sync_h client)
{
    std::vector<BookEntry> entries;
    const auto append = [](const char *local_path, const char *server_path, void *data) {
        static_cast<std::vector<BookEntry> *>(data)->push_back({local_path, server_path});
        return true;
    };
    if (client)
        cloud_content_sync_queue_foreach(client, append, &entries);
    return entries;
}
