#pragma once
// Is there a network connection, and the popup that explains when there is none.
#include "velora_common/velora_app_data.h"

// 1 when a data connection exists or the connection manager cannot be asked; 0 when there is none. On 0 a popup in
// ad->popup explains why and offers the settings application that helps, except when the cellular state cannot be
// read. Main loop only.
int _velora_common_check_network(AppData *ad);

// 1 when a data connection exists, 0 when there is none or the connection manager cannot be asked. Shows nothing. Main
// loop only.
int _velora_common_check_network_without_popup(AppData *ad);
