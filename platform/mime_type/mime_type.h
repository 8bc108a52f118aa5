#pragma once
// MIME types by file extension.
enum mime_type_error_e {
    MIME_TYPE_ERROR_NONE = 0,
    MIME_TYPE_ERROR_INVALID_PARAMETER = -22,
    MIME_TYPE_ERROR_OUT_OF_MEMORY = -12,
};
int mime_type_get_mime_type(const char *file_extension, char **mime_type);
