#pragma once
// What kind of file a name stands for, and the size of a file in words. Any thread.
#include <glib.h>

enum FileType {
    FILE_TYPE_NONE = 0,
    FILE_TYPE_IMAGE = 3,
    FILE_TYPE_VIDEO = 4,
    FILE_TYPE_MUSIC = 5,
    FILE_TYPE_SOUND = 6,
    FILE_TYPE_OTHER = 35,
};
int __get_file_type(const char *name);

// Two decimals and no space ("1.50MB"); the caller's, g_free.
char *__get_formatted_size(gint64 bytes);
