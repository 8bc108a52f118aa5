// What kind of file a name stands for, and how it looks in the list.
#include "velora_common/velora_local_data.h"
#include "velora_common/velora_paths.h"
#include "velora_upload_file/upload_internal.h"
#include <cstdlib>
#include <cstring>
#include <map>
#include <string>

struct FileTypeEntry {
    const char *ext;
    int type;
};

static const FileTypeEntry s_file_types[] = {
    {"BMP", 3},    {"GIF", 3},  {"JPG", 3},  {"JPEG", 3},  {"JPE", 3},   {"PNG", 3},   {"PJPEG", 3}, {"WBMP", 3},
    {"3GP", 4},    {"3GPP", 4}, {"3G2", 4},  {"ASF", 4},   {"AVI", 4},   {"MP4", 4},   {"MPG", 4},   {"MPEG", 4},
    {"MKV", 4},    {"SDP", 4},  {"WMV", 4},  {"AAC", 5},   {"FLAC", 5},  {"G72", 5},   {"MP3", 5},   {"M4A", 5},
    {"MKA", 5},    {"WMA", 5},  {"IMY", 6},  {"MMF", 6},   {"MID", 6},   {"MIDI", 6},  {"MXMF", 6},  {"ogg", 6},
    {"SPM", 6},    {"SMP", 6},  {"SPF", 6},  {"WAV", 6},   {"XMF", 6},   {"PDF", 7},   {"DOC", 8},   {"DOCX", 8},
    {"PPT", 9},    {"PPTX", 9}, {"XLS", 10}, {"XLSX", 10}, {"AMR", 11},  {"AWB", 11},  {"HTML", 12}, {"HTM", 12},
    {"XHTML", 12}, {"SWF", 13}, {"M3G", 13}, {"IPK", 15},  {"THM", 16},  {"TXT", 17},  {"VCF", 18},  {"VCS", 19},
    {"VNT", 20},   {"VBM", 21}, {"SCN", 24}, {"SVG", 25},  {"SVGZ", 25}, {"opml", 26}, {"PEM", 27},  {"JAD", 28},
    {"JAR", 28},   {"WGT", 29}, {"DCF", 30}, {"TPK", 31},  {"SNB", 32},  {"GUL", 33},  {"HWP", 34},
};

int __get_file_type(const char *name)
{
    if (!name) {
        VELORA_LOGE("file_name is NULL");
        return 32;
    }
    char *ext = __get_file_ext_name(name);
    if (!ext)
        return FILE_TYPE_NONE;
    int type = FILE_TYPE_OTHER;
    for (const FileTypeEntry &entry : s_file_types) {
        if (g_ascii_strcasecmp(ext, entry.ext) == 0) {
            type = entry.type;
            break;
        }
    }
    g_free(ext);
    return type;
}

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

char *__get_formatted_size(gint64 bytes)
{
    constexpr gint64 kib = 1024, mib = kib * 1024, gib = mib * 1024;
    const auto size = static_cast<double>(bytes);
    if (bytes >= gib)
        return g_strdup_printf("%.2fGB", size * (1.0 / gib));
    if (bytes >= mib)
        return g_strdup_printf("%.2fMB", size * (1.0 / mib));
    return g_strdup_printf("%.2fKB", size * (1.0 / kib));
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
    record->file_type = __get_file_type(record->name);
    Evas_Object *layout = elm_layout_add(parent);
    elm_layout_file_set(layout, _velora_common_app_file("res/edje/velora.edj").c_str(), "genlist_content");
    evas_object_size_hint_weight_set(layout, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
    evas_object_size_hint_align_set(layout, EVAS_HINT_FILL, EVAS_HINT_FILL);

    char *cloud_thumbnail = nullptr;
    record->thumbnail = nullptr;
    if (record->file_type == FILE_TYPE_IMAGE || record->file_type == FILE_TYPE_VIDEO) {
        if (local_path)
            record->thumbnail = __get_local_thumbnail(local_path);
        else
            cloud_thumbnail = __get_cloud_thumbnail(record->content);
    }
    const char *thumbnail = cloud_thumbnail ? cloud_thumbnail : record->thumbnail;

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
