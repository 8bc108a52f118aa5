#pragma once
// The page that this version does not have yet: the account's settings. It says so in a popup whose OK
// ends the request, and leaves the application when no page is open: a person must not be left with an empty window.
// Until there are settings, who comes for them without an account gets the sign-in, and a share goes on to its upload.
// Main loop only.
#include "velora_add_account_content_sync_setup_wizard/velora_signin_setupwizard.h"
#include "velora_details_content_sync/velora_details.h"
#include "velora_setup_wizard/velora_setupwizard.h"

// Another request came: the popup, if it is there, has been seen.
void _velora_pending_page_end(AppData *ad);
