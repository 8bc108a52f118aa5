#include "velora_upload_file/upload_waiting.h"
#include <Ecore_File.h>
#include <utility>

static std::vector<UploadItemHold> s_waiting;
static gint64 s_bytes;

int __waiting_take(AppData *ad)
{
    int count = 0;
    for (const GList *entry = ad->upload_list; entry; entry = entry->next, count++) {
        UploadItemHold item(_velora_upload_item_ref(static_cast<UploadItem *>(entry->data)));
        item->size = ecore_file_size(item->path);
        s_bytes += item->size;
        s_waiting.push_back(std::move(item));
    }
    _velora_upload_list_free(&ad->upload_list);
    return count;
}

int __waiting_count()
{
    return static_cast<int>(s_waiting.size());
}

gint64 __waiting_bytes()
{
    return s_bytes;
}

const char *__waiting_first()
{
    return s_waiting.empty() ? nullptr : s_waiting.front()->path;
}

std::vector<UploadItemHold> __waiting_give()
{
    s_bytes = 0;
    return std::exchange(s_waiting, {});
}
