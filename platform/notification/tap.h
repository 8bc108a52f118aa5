#pragma once
// What a tap on a notification does; for the agent and the tool. Main thread only.
#include "notification/store.h"

// Sends the launch request and then takes a normal notification away unless DISABLE_AUTO_DELETE is set. False, and it
// stays, when the request cannot be sent; a notification without one has nothing to send. The main loop has to go on,
// or tap_finish to be called, until the request has left.
bool tap(const notification_s &noti);
// Sees launch requests on their way; to be called once, at the end of a program.
void tap_finish();
