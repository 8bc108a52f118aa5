#include "velora_common/velora_upload_item.h"

GList *_velora_upload_items_append(GList *list, char *const *paths, int count)
{
    GList *added = nullptr; // from its end: a list is walked to its end by each append
    for (int i = count; i-- > 0;) {
        auto *item = new UploadItem;
        item->path = g_strdup(paths[i]);
        added = g_list_prepend(added, item);
    }
    return g_list_concat(list, added);
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
