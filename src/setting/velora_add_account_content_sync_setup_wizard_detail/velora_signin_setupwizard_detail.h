#pragma once
// The last page of the first-boot wizard: camera upload is on. Main loop only.
#include "velora_common/velora_app_data.h"

// Opens the page in the place of the one before.
void _velora_signin_setupwizard_detail_create(AppData *ad);
