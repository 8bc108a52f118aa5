#pragma once
// What the device's media index knows of a local file.
#include "media_content/media_content.h"

struct LocalMediaItem {
    media_info_h media = nullptr; // a clone, owned
    char *thumbnail_path = nullptr;
    char *file_path = nullptr;
    char *ext = nullptr; // after the last dot of file_path; null when there is none
};

// Connect to and disconnect from the media index: 0, or -1 (logged). Main loop only, like all below.
int _velora_common_local_data_connect();
int _velora_common_local_data_disconnect();

// 0 when the index holds a picture or video at exactly that path; *out is then the caller's, freed with
// __velora_local_data_free_media_item. -1 otherwise. The index must be connected.
int _velora_common_local_data_get_media_by_path(const char *path, LocalMediaItem **out);
void __velora_local_data_free_media_item(LocalMediaItem **item);

// 0 and *ext (the caller's, g_free) when the last component of the path has a dot that is not the path's very first
// character: the text after its last dot. -1 otherwise.
int _velora_common_file_attr_get_file_ext(const char *filepath, char **ext);
