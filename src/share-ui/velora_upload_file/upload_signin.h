#pragma once
// What the view does about an account that was signed out. Main loop only.
#include "velora_upload_file/upload_record.h"

// The error of a transfer or a refresh says that nobody is signed in, or not any more.
bool __is_signed_out(int error);
// Opens the sign-in over the view; `data` is the view. What waits goes on afterwards.
void __signin_open_cb(void *data, Evas_Object *obj, void *event_info);
// There is an account again: what waited for it goes on. The view's own, above all others.
void __signed_in_again(AppData *ad);
// Says that the account was signed out, and offers to sign in again.
void __signin_ask(UploadViewData *vd);
