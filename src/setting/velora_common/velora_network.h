#pragma once
// Is there a network connection, and the popup that explains when there is none.
#include "velora_common/velora_app_data.h"

// 1 when a data connection exists or the connection manager cannot be asked; 0 when there is none. On 0 a popup of its
// own explains why and offers the settings application that helps, except when the cellular state cannot be read; it
// goes when the next check finds a connection. Its buttons leave the application, but for the welcome page and for
// pages with files that were shared before: there only the shares that are held for want of a network are given up.
// Main loop only.
int _velora_common_check_network(AppData *ad);

// 1 when a data connection exists, 0 when there is none or the connection manager cannot be asked. Shows nothing. Main
// loop only.
int _velora_common_check_network_without_popup(AppData *ad);
