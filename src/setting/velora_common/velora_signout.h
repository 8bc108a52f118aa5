#pragma once
// Signing out, see cloud_content_sync_deactivate(). Main loop only.
//
// One at a time: while one is under way a call does nothing and answers 0.
//
// With SIGNOUT_SIGN_IN only a sign-in that has come to nothing is ended: an account that was there before stays, with
// its record.
//
// `page` is left at the end, as _velora_page_leave() does; null stands for the application. -1 without an application
// record (logged).
#include "velora_common/velora_app_data.h"

enum SignoutScope { SIGNOUT_ACCOUNT, SIGNOUT_SIGN_IN };

// With a wait on screen that the back key does not close, and nothing said at the end.
int _velora_common_signout(AppData *ad, void *page = nullptr, SignoutScope scope = SIGNOUT_ACCOUNT);
// Without a wait of its own.
int _velora_common_signout_without_remove_popup(AppData *ad, void *page = nullptr,
                                                SignoutScope scope = SIGNOUT_ACCOUNT);
// With the wait, and at the end a popup that says that the account is signed out; its OK leaves. When the device's
// record cannot be removed the page stays; when the account cannot, a short notice says so.
int _velora_common_add_account_with_popup_signout(AppData *ad, void *page = nullptr);

bool _velora_common_signout_is_under_way();
// For who leaves the application, or the page: nothing of a sign-out happens any more. What has been asked of the
// client is done.
void _velora_common_signout_end(AppData *ad);
