#pragma once
// The index of the user's pictures and videos.

typedef struct media_filter_s *filter_h;
typedef struct media_info_s *media_info_h;

enum media_content_error_e {
    MEDIA_CONTENT_ERROR_NONE = 0,
    MEDIA_CONTENT_ERROR_INVALID_PARAMETER = -22,
    MEDIA_CONTENT_ERROR_OUT_OF_MEMORY = -12,
    MEDIA_CONTENT_ERROR_INVALID_OPERATION = -38,
    MEDIA_CONTENT_ERROR_DB_FAILED = -4001,
};
enum media_content_collation_e { MEDIA_CONTENT_COLLATE_DEFAULT = 0, MEDIA_CONTENT_COLLATE_NOCASE = 1 };
enum media_content_order_e { MEDIA_CONTENT_ORDER_ASC = 0, MEDIA_CONTENT_ORDER_DESC = 1 };
enum media_content_type_e { MEDIA_CONTENT_TYPE_IMAGE = 0, MEDIA_CONTENT_TYPE_VIDEO = 1 };

typedef bool (*media_info_cb)(media_info_h media, void *user_data);

int media_content_connect();
int media_content_disconnect();
int media_filter_create(filter_h *filter);
int media_filter_destroy(filter_h filter);
int media_filter_set_condition(filter_h filter, const char *condition, media_content_collation_e collate);
int media_filter_set_order(filter_h filter, media_content_order_e order, const char *keywords,
                           media_content_collation_e collate);
int media_info_foreach_media_from_db_with_media_mode(filter_h filter, media_info_cb callback, void *user_data,
                                                     bool media_mode);
int media_info_clone(media_info_h *dst, media_info_h src);
int media_info_destroy(media_info_h media);
int media_info_get_file_path(media_info_h media, char **path);
int media_info_get_thumbnail_path(media_info_h media, char **path);
// Enters one picture or video into the index (or refreshes its record) and makes its thumbnail when it has none.
int media_content_scan_file(const char *path);
