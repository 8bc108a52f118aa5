#pragma once
// The uploads that the view's list stands for, of which there may be more than anybody will ever look at: rows are made
// for those that can be seen, and for some behind them once those have been. Whatever is to be done with all of them
// asks for them here, not the rows. Main loop only.
#include "velora_upload_file/upload_row.h"
#include <vector>

// Follows what is seen of a list; once for each.
void __listed_watch(Evas_Object *genlist);
// An empty list is to show a run's files as they stand, but for those that were taken out; `tapped` is called with the
// record of a row.
void __listed_show_run(UploadViewData *vd, RunHold run, Evas_Smart_Cb tapped);
// The same with the items of an earlier result, which are all of one type; `tapped` may be null.
void __listed_show_items(UploadViewData *vd, std::vector<UploadItemHold> items, int type, Evas_Smart_Cb tapped);
// The uploads of a type, with a row or without; borrowed.
std::vector<UploadItem *> __listed(const UploadViewData *vd, int type);
bool __listed_is_empty(const UploadViewData *vd);
// Deletes all rows of the view's list, also those of folders and their files, and forgets what was to follow.
void __listed_clear(UploadViewData *vd);
// The page is given up: nothing may hold on to the client.
void __listed_forget();
