#include "velora_common/velora_local_data.h"
#include "velora_common/velora_log.h"
#include <Ecore_File.h>
#include <cstdlib>
#include <cstring>
#include <glib.h>
#include <vector>

struct MediaFilter {
    char condition[512] = "(MEDIA_TYPE=0 OR MEDIA_TYPE=1)";
    media_content_collation_e collation = MEDIA_CONTENT_COLLATE_NOCASE;
    media_content_order_e order = MEDIA_CONTENT_ORDER_DESC;
    char keywords[128] = "MEDIA_TIMELINE, MEDIA_DISPLAY_NAME";
    bool media_mode = true;
};

struct MediaQuery {
    std::vector<LocalMediaItem *> items;
    bool media_mode = true;
};

int _velora_common_local_data_connect()
{
    if (const int result = media_content_connect(); result != MEDIA_CONTENT_ERROR_NONE) {
        VELORA_LOGE("DB connection is failed[%d]!", result);
        return -1;
    }
    return 0;
}

int _velora_common_local_data_disconnect()
{
    if (const int result = media_content_disconnect(); result != MEDIA_CONTENT_ERROR_NONE) {
        VELORA_LOGE("DB disconnection is failed[%d]!", result);
        return -1;
    }
    return 0;
}

void __velora_local_data_free_media_item(LocalMediaItem **item)
{
    if (!item || !*item)
        return;
    if ((*item)->media)
        media_info_destroy((*item)->media);
    std::free((*item)->thumbnail_path);
    std::free((*item)->file_path);
    g_free((*item)->ext);
    delete *item;
    *item = nullptr;
}

static bool __velora_local_data_get_media_list_cb(media_info_h media, void *user_data)
{
    auto *query = static_cast<MediaQuery *>(user_data);
    auto *item = new LocalMediaItem;
    const char *failure = nullptr;
    if (media_info_clone(&item->media, media) != MEDIA_CONTENT_ERROR_NONE)
        failure = "Clone media handle failed!";
    else if (media_info_get_file_path(media, &item->file_path) != MEDIA_CONTENT_ERROR_NONE)
        failure = "Get media file path failed!";
    else if (media_info_get_thumbnail_path(media, &item->thumbnail_path) != MEDIA_CONTENT_ERROR_NONE)
        failure = "Get media thumbnail path failed!";
    if (failure) {
        VELORA_LOGE("%s", failure);
        __velora_local_data_free_media_item(&item);
        return false;
    }
    const char *dot = item->file_path ? std::strrchr(item->file_path, '.') : nullptr;
    if (dot)
        item->ext = g_strdup(dot + 1);
    else
        VELORA_LOGE("Extension is NULL!");
    query->items.push_back(item);
    return true;
}

static void __velora_local_data_destroy_filter(filter_h filter)
{
    if (media_filter_destroy(filter) != MEDIA_CONTENT_ERROR_NONE)
        VELORA_LOGE("Failed to destroy filter!");
}

static filter_h __velora_local_data_create_filter(const MediaFilter &wanted)
{
    filter_h filter = nullptr;
    if (media_filter_create(&filter) != MEDIA_CONTENT_ERROR_NONE) {
        VELORA_LOGE("Fail to create filter");
        return nullptr;
    }
    const char *failure = nullptr;
    if (*wanted.condition &&
        media_filter_set_condition(filter, wanted.condition, wanted.collation) != MEDIA_CONTENT_ERROR_NONE)
        failure = "Fail to set condition";
    else if (*wanted.keywords && media_filter_set_order(filter, wanted.order, wanted.keywords, wanted.collation) !=
                                     MEDIA_CONTENT_ERROR_NONE)
        failure = "Fail to set order";
    if (!failure)
        return filter;
    VELORA_LOGE("%s", failure);
    __velora_local_data_destroy_filter(filter);
    return nullptr;
}

static int __velora_local_data_get_all_albums_media_list(const MediaFilter &wanted, MediaQuery *query)
{
    filter_h filter = __velora_local_data_create_filter(wanted);
    if (!filter) {
        VELORA_LOGE("Create filter failed!");
        return -1;
    }
    const int result = media_info_foreach_media_from_db_with_media_mode(filter, __velora_local_data_get_media_list_cb,
                                                                        query, wanted.media_mode);
    __velora_local_data_destroy_filter(filter);
    if (result != MEDIA_CONTENT_ERROR_NONE) {
        VELORA_LOGE("Failed to get medias[%d]!", result);
        return -1;
    }
    return 0;
}

int _velora_common_local_data_get_media_by_path(const char *path, LocalMediaItem **out)
{
    if (!path || !*path || !out) {
        VELORA_LOGE("Invalid path!");
        return -1;
    }
    MediaFilter wanted;
    MediaQuery query;
    int result = -1;
    // A path that does not fit would be cut into another file's.
    if (g_snprintf(wanted.condition, sizeof wanted.condition, "(%s=0 OR %s=1) AND %s='%s'", "MEDIA_TYPE", "MEDIA_TYPE",
                   "MEDIA_PATH", path) < static_cast<int>(sizeof wanted.condition))
        result = __velora_local_data_get_all_albums_media_list(wanted, &query);
    if (result != 0 || query.items.empty()) {
        VELORA_LOGE("Failed to get all albums[%d]!", result);
        for (LocalMediaItem *item : query.items)
            __velora_local_data_free_media_item(&item);
        return -1;
    }
    *out = query.items.front();
    for (size_t i = 1; i < query.items.size(); i++)
        __velora_local_data_free_media_item(&query.items[i]);
    return 0;
}

int _velora_common_file_attr_get_file_ext(const char *filepath, char **ext)
{
    if (!filepath) {
        VELORA_LOGE("filepath is NULL");
        return -1;
    }
    const char *dot = std::strrchr(ecore_file_file_get(filepath), '.');
    if (!dot || dot == filepath)
        return -1;
    *ext = g_strdup(dot + 1);
    return 0;
}
