#pragma once
// Names of files, and the destination that takes no name which the folder already has. Strings are the caller's,
// g_free. Main loop only.
#include "velora_upload_file/upload_record.h"
#include <string>
#include <unordered_set>

// The names of a folder's files, read once for many files: there may be many of both.
class TakenNames {
  public:
    // Null: no folder, no names.
    explicit TakenNames(cloud_content_sync_folder_h folder);
    bool contains(const std::string &name) const
    {
        return names.contains(name);
    }

  private:
    std::unordered_set<std::string> names;
};

// Where a local file goes in the open folder.
char *__get_upload_server_path(UploadViewData *vd, const char *local_path);
// The same for any folder whose names are known.
char *__get_server_path(const TakenNames &taken, const char *folder_path, const char *local_path);

char *__get_file_ext_name(const char *name); // null when the name has no dot
