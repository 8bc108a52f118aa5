#pragma once
// MIME types by file extension, from the freedesktop shared MIME database.
enum mime_type_error_e {
    MIME_TYPE_ERROR_NONE = 0,
    MIME_TYPE_ERROR_INVALID_PARAMETER = -22,
    MIME_TYPE_ERROR_OUT_OF_MEMORY = -12,
};

// Writes the MIME type of files with `file_extension` ("jpg", "tar.gz"; without the leading dot, in either case) to
// `mime_type`, for the caller to release with free(). An extension the database does not know has no MIME type:
// MIME_TYPE_ERROR_INVALID_PARAMETER, as for a null or empty argument or one with a '/' in it; `mime_type` is then left
// alone. Any thread.
int mime_type_get_mime_type(const char *file_extension, char **mime_type);
