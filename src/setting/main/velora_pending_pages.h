#pragma once
// Pages that this version does not have yet. Each says so in a popup whose OK ends the request, and leaves the
// application when no page is open: a person must not be left with an empty window. Main loop only.
#include "velora_common/velora_app_data.h"

void _velora_signin_create(AppData *ad, int is_signin);
void _velora_setupwizard_view_create(AppData *ad);
void _velora_signin_setupwizard_create(AppData *ad);
void _velora_details_create(AppData *ad);

// Another request came: the popup, if it is there, has been seen.
void _velora_pending_page_end(AppData *ad);
