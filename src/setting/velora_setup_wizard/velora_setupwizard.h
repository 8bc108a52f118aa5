#pragma once
// The welcome page of the first-boot wizard. Main loop only.
#include "velora_common/velora_app_data.h"

// Opens the page for the last request.
void _velora_setupwizard_view_create(AppData *ad);
