#pragma once
// The index of the user's pictures and videos: the SQLite database "media.db" in platform_data_dir(), with thumbnails
// of the freedesktop cache ($XDG_CACHE_HOME/thumbnails, Thumbnail Managing Standard 0.9).
//
// Any thread may call; one filter or media handle must not be used by two threads at once. Texts are copied in; char *
// results are the caller's to release with free(). A null argument gives MEDIA_CONTENT_ERROR_INVALID_PARAMETER, and
// results are written on success alone.

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

// One record of a query. The handle is valid during the call (media_info_clone keeps it longer). The callback may use
// the index; false ends the walk.
typedef bool (*media_info_cb)(media_info_h media, void *user_data);

// Connections are counted per process; MEDIA_CONTENT_ERROR_DB_FAILED when the database cannot be opened. The last
// disconnect gives up the thumbnails that are still being made, without waiting. One disconnect too many gives
// MEDIA_CONTENT_ERROR_INVALID_OPERATION, and so does every use of the index without a connection.
int media_content_connect();
int media_content_disconnect();

// Makes a filter that every record passes, in no particular order. media_filter_destroy frees it.
int media_filter_create(filter_h *filter);
int media_filter_destroy(filter_h filter);

// Restricts a filter. The condition is parsed here and never becomes part of an SQL text:
//
//     condition  := both { "OR" both }
//     both       := comparison { "AND" comparison }
//     comparison := "(" condition ")" | name "=" value
//     name       := MEDIA_TYPE | MEDIA_TIMELINE        compared with a decimal number
//                 | MEDIA_PATH | MEDIA_DISPLAY_NAME    compared with a 'text'
//
// MEDIA_TYPE is a media_content_type_e, MEDIA_TIMELINE the time of the last change in seconds since 1970. There is at
// most one text in a condition, and it comes last: it runs from the first quote to the last one, behind which there are
// only closing parentheses. So quotes within it need no escape (there is none), a caller may put any path between two
// quotes, and no path can add to the condition. A text without its closing quote (cut off by a short buffer) fails.
// MEDIA_CONTENT_COLLATE_NOCASE compares display names without case (ASCII); paths are always compared exactly.
// Anything else gives MEDIA_CONTENT_ERROR_INVALID_PARAMETER and leaves the filter as it was.
int media_filter_set_condition(filter_h filter, const char *condition, media_content_collation_e collate);

// Sorts by the names in `keywords`, separated by commas, the first one first, each in the direction of `order`;
// `collate` is for texts. Anything else than the four names gives MEDIA_CONTENT_ERROR_INVALID_PARAMETER.
int media_filter_set_order(filter_h filter, media_content_order_e order, const char *keywords,
                           media_content_collation_e collate);

// Calls back for each record that passes the filter (null: all), in its order. No record is no error. With `media_mode`
// true, records of files that are gone are left out and forgotten.
// A condition with a MEDIA_PATH makes the index look at that file first: a picture or video that is new or has changed
// is entered, and its thumbnail is made by a thread of this library. The call waits for it, for at most 40 ms and
// only when no other thumbnail is being made; one that takes longer is there for a later query.
int media_info_foreach_media_from_db_with_media_mode(filter_h filter, media_info_cb callback, void *user_data,
                                                     bool media_mode);

// Copies a record; media_info_destroy frees the copy.
int media_info_clone(media_info_h *dst, media_info_h src);
int media_info_destroy(media_info_h media);
int media_info_get_file_path(media_info_h media, char **path);
// `path` is null for a record that has no thumbnail (yet).
int media_info_get_thumbnail_path(media_info_h media, char **path);

// Enters one picture or video into the index (or refreshes its record) and makes its thumbnail when it has none. A
// thumbnail that the cache has is used; for videos there is no other way to get one. Pictures of more than 64 million
// pixels and those that cannot be decoded stay without. The call takes as long as decoding does (a large photo: tenths
// of a second). MEDIA_CONTENT_ERROR_INVALID_PARAMETER, and no record from then on, for what is no absolute path of a
// readable regular file with an image or video MIME type.
int media_content_scan_file(const char *path);
