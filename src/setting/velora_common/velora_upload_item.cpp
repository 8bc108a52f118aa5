#include "velora_common/velora_upload_item.h"

GList *_velora_upload_item_append(GList *list, const char *path)
{
    auto *item = new UploadItem;
    item->path = g_strdup(path);
    return g_list_append(list, item);
}

UploadItem *_velora_upload_item_ref(UploadItem *item)
{
    item->users++;
    return item;
}

void _velora_upload_item_unref(UploadItem *item)
{
    if (--item->users > 0)
        return;
    g_free(item->path);
    g_free(item->server_path);
    delete item;
}

void _velora_upload_list_free(GList **list)
{
    GList *old = *list;
    *list = nullptr;
    g_list_free_full(old, [](gpointer item) { _velora_upload_item_unref(static_cast<UploadItem *>(item)); });
}
