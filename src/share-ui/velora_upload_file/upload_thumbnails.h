#pragma once
// Thumbnails of the open cloud folder's pictures, which the client fetches while the rows are in sight. Main loop only.
#include "velora_upload_file/upload_record.h"
#include <cstdint>

// Has the rows' thumbnails told of when the client has fetched them, or no longer. The view's pipe must outlive that.
void __cloud_thumbnails_watch(UploadViewData *vd, bool is_on);
// "thumb.N": the row, when it is in sight, shows the thumbnail of the path that the handle N stands for.
void __cloud_thumbnail_arrived(UploadViewData *vd, uint32_t handle);
