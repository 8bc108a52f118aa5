#pragma once
// A share in the view: its choice of a folder. Main loop only.
#include "velora_upload_file/upload_record.h"

// Shows the folders for the files that wait, and a wait when the client does not know them yet. Without a root folder
// to show the page is left.
void __browse_begin(UploadViewData *vd);
// Files that were shared while the view was busy with others get their choice of a folder now. False when there are
// none, or when it is still busy.
bool __next_share_begin(UploadViewData *vd);
// More files came: they go along, follow, or are next.
void __share_joins(UploadViewData *vd);
// Somebody has signed in, perhaps somebody else: the choice of a folder begins at the root.
void __share_begin_anew(UploadViewData *vd);
// The first refresh of the folder tree has ended.
void __share_meta_done(UploadViewData *vd);
// A later refresh has ended: the rows change where they are no longer true, the place in the list does not.
void __share_meta_changed(UploadViewData *vd);
// The popup's OK: closes it and leaves. `data` is the view.
void __popup_exit_cb(void *data, Evas_Object *obj, void *event_info);
