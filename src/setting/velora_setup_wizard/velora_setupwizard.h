#pragma once
// The first page of the first-boot wizard: what the service is, a new account or the one there is. Main loop only.
#include "velora_common/velora_app_data.h"

// Opens the page for the last request. A page of the wizard that is open takes the request in instead.
void _velora_setupwizard_view_create(AppData *ad);
