#pragma once
// The choice of what is uploaded by itself, after a sign-in in the first-boot wizard. Main loop only.
#include "velora_common/velora_app_data.h"

// Opens the page for the last request.
void _velora_signin_setupwizard_create(AppData *ad);
