// Posts a notification and writes its id to a file descriptor: FD TYPE TITLE CONTENT FLAGS. Leaves then, unless the
// notification is an ongoing one, which would leave with its poster: that one waits to be ended.
#include "app/app_control.h"
#include "notification/notification.h"
#include <cstdlib>
#include <unistd.h>

int main(int, char **argv)
{
    app_control_h request = nullptr;
    bundle *launch = nullptr;
    app_control_create(&request);
    app_control_set_operation(request, "test/open");
    app_control_set_app_id(request, "com.example.receiver");
    app_control_to_bundle(request, &launch);
    notification_h noti = notification_create(static_cast<notification_type_e>(std::atoi(argv[2])));
    notification_set_pkgname(noti, "com.example.poster");
    notification_set_layout(noti, std::atoi(argv[2]) ? NOTIFICATION_LY_ONGOING_PROGRESS : NOTIFICATION_LY_NONE);
    notification_set_property(noti, std::atoi(argv[5]));
    notification_set_text(noti, NOTIFICATION_TEXT_TYPE_TITLE, argv[3], nullptr, NOTIFICATION_VARIABLE_TYPE_NONE);
    notification_set_text(noti, NOTIFICATION_TEXT_TYPE_CONTENT, argv[4], nullptr, NOTIFICATION_VARIABLE_TYPE_NONE);
    notification_set_execute_option(noti, NOTIFICATION_EXECUTE_TYPE_SINGLE_LAUNCH, nullptr, nullptr, launch);
    app_control_destroy(request);
    int id = 0;
    const int result = notification_insert(noti, &id);
    notification_free(noti);
    const bool told = result == 0 && write(std::atoi(argv[1]), &id, sizeof id) == sizeof id;
    if (told && std::atoi(argv[2]) == NOTIFICATION_TYPE_ONGOING)
        pause();
    return told ? 0 : 1;
}
