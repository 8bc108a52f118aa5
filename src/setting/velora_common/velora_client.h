#pragma once
// The one cloud client of the process.
//
// Whoever uses it holds it. The order of ends: a page joins its workers, lets go of its holds and deletes its pipe;
// then the exit routine lets go of AppData's hold, with which the client is destroyed and no callback runs any more;
// then the shell's pipe goes. Main loop only; a hold may be copied and let go of on any thread.
#include "velora_common/velora_app_data.h"

// The client, made when there is none; AppData keeps a hold as well. Null when it cannot be made (logged).
ClientHold _velora_common_client_get(AppData *ad);

// Lets go of AppData's hold.
void _velora_common_client_release(AppData *ad);

// Starts a refresh of the account's tree, of all types; its end is "refresh_meta_done" on AppData's pipe and
// `is_meta_refreshed`. A failure to start is logged, and is the end.
void _velora_common_meta_refresh(AppData *ad);
