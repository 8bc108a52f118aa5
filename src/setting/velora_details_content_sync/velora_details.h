#pragma once
// The settings of the account that is signed in. Main loop only.
#include "velora_common/velora_app_data.h"

// Opens the page for the last request.
void _velora_details_create(AppData *ad);
