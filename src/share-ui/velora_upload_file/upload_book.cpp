#include "velora_upload_file/upload_book.h"
#include "velora_common/velora_log.h"

using Change = int (*)(cloud_content_sync_h handle, const char *const *local_paths, const char *const *server_paths,
                       int count);

static void __change(const UploadRun &run, const std::vector<const RunFile *> &files, Change change)
{
    std::vector<const char *> local, server;
    for (const RunFile *file : files) {
        local.push_back(file->item->path);
        server.push_back(file->destination.c_str());
    }
    if (files.empty())
        return;
    if (const int error = change(run.client.get(), local.data(), server.data(), static_cast<int>(files.size())))
        VELORA_LOGE("the book of uploads cannot be written: %d", error);
}

void __book_enter(const UploadRun &run)
{
    std::vector<const RunFile *> files;
    for (const RunFile &file : run.files)
        if (file.item->state == UPLOAD_STATE_WAITING)
            files.push_back(&file);
    __change(run, files, cloud_content_sync_queue_add);
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
