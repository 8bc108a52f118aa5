#include "notification/tap.h"
#include "app/app_control.h"
#include "app/bus.h"

static constexpr int START_SECONDS = 60; // for an application that is started by the request

bool tap(const notification_s &noti)
{
    bool sent = true;
    if (noti.launch) {
        app_control_h request = nullptr;
        sent = app_control_from_bundle(&*noti.launch, &request) == APP_CONTROL_ERROR_NONE &&
               app_control_send_launch_request(request, nullptr, nullptr) == APP_CONTROL_ERROR_NONE;
        if (request)
            app_control_destroy(request);
    }
    bool failed = false;
    if (sent && noti.type == NOTIFICATION_TYPE_NOTI && !(noti.flags & NOTIFICATION_PROP_DISABLE_AUTO_DELETE))
        store_delete(noti.package, noti.id, failed);
    return sent && !failed;
}

void tap_finish()
{
    bus_stop(START_SECONDS);
}
