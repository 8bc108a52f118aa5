#include "velora_upload_file/upload_icon.h"
#include "velora_common/velora_local_data.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_paths.h"
#include "velora_upload_file/upload_types.h"
#include <cstdlib>
#include <map>
#include <string>

static const char *__icon_group(int type)
{
    static const std::map<int, const char *> groups = {
        {3, "docshelf_icon_images.png"},     {4, "docshelf_icon_video.png"},  {5, "docshelf_icon_music.png"},
        {6, "docshelf_icon_music.png"},      {7, "docshelf_icon_pdf.png"},    {8, "docshelf_icon_word.png"},
        {9, "docshelf_icon_ppt.png"},        {10, "docshelf_icon_excel.png"}, {11, "docshelf_icon_amr.png"},
        {12, "docshelf_icon_html.png"},      {17, "docshelf_icon_text.png"},  {18, "docshelf_icon_vcard.png"},
        {19, "docshelf_icon_vcalender.png"}, {26, "docshelf_icon_rss.png"},   {31, "docshelf_icon_tpk.png"},
        {32, "docshelf_icon_snb.png"},       {34, "docshelf_icon_hwp.png"},
    };
    const auto found = groups.find(type);
    return found == groups.end() ? "docshelf_icon_etc.png" : found->second;
}

// The records whose thumbnails rows are showing, by local path: the media index is asked once per file.
static std::map<std::string, LocalMediaItem *> s_media_items;

const char *__get_local_thumbnail(const char *path)
{
    if (!path)
        return nullptr;
    if (const auto known = s_media_items.find(path); known != s_media_items.end())
        return known->second->thumbnail_path;
    LocalMediaItem *item = nullptr;
    const int ret = _velora_common_local_data_get_media_by_path(path, &item);
    if (!item) {
        VELORA_LOGE("mitem is null!");
        return nullptr;
    }
    if (ret == -1)
        VELORA_LOGE("ret[%d]", ret);
    if (!item->thumbnail_path || !*item->thumbnail_path) { // not made yet: the next row that asks may find it
        __velora_local_data_free_media_item(&item);
        return nullptr;
    }
    s_media_items[path] = item;
    return item->thumbnail_path;
}

void __local_thumbnails_free()
{
    for (auto &[path, item] : s_media_items)
        __velora_local_data_free_media_item(&item);
    s_media_items.clear();
}

static char *__get_cloud_thumbnail(cloud_content_sync_content_h content)
{
    bool exists = false;
    char *path = nullptr;
    if (content && cloud_content_sync_content_get_is_thumbnail_exist(content, &exists) == 0 && exists)
        cloud_content_sync_content_get_thumbnail_path(content, &path);
    return path;
}

Evas_Object *__file_icon_create(Evas_Object *parent, ItemData *record, const char *local_path)
{
    record->file_type = __get_file_type(record->name.c_str());
    Evas_Object *layout = elm_layout_add(parent);
    elm_layout_file_set(layout, _velora_common_app_file("res/edje/velora.edj").c_str(), "genlist_content");
    evas_object_size_hint_weight_set(layout, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(layout, EVAS_HINT_FILL, EVAS_HINT_FILL);

    char *cloud_thumbnail = nullptr;
    const char *thumbnail = nullptr;
    if (record->file_type == FILE_TYPE_IMAGE || record->file_type == FILE_TYPE_VIDEO) {
        if (local_path)
            thumbnail = __get_local_thumbnail(local_path);
        else
            thumbnail = cloud_thumbnail = __get_cloud_thumbnail(record->content);
    }

    Evas_Object *image = elm_image_add(layout);
    if (thumbnail)
        elm_image_file_set(image, thumbnail, nullptr);
    else
        elm_image_file_set(image, _velora_common_app_file("res/edje/velora_edc_images.edj").c_str(),
                           __icon_group(record->file_type));
    elm_image_fill_outside_set(image, EINA_TRUE);
    elm_object_part_content_set(layout, "elm.swallow.content", image);
    if (record->file_type == FILE_TYPE_VIDEO)
        elm_object_signal_emit(layout, "elm.video.show", "elm");
    std::free(cloud_thumbnail);
    return layout;
}
