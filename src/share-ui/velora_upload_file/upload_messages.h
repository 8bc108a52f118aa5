#pragma once
// What the view's pipe brings. Main loop only.
#include "velora_upload_file/upload_record.h"

// The pipe's handler: results of content requests, and the texts that upload_worker.h, upload_meta.h and
// upload_thumbnails.h tell of. What another run than the view's has sent is ignored.
void __pipe_cb(void *data, void *buffer, unsigned int size);
