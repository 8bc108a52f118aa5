#pragma once
// What a package has posted in the notification area, read back from the real store.
#include "app/app_control.h"
#include "notification/notification.h"
#include <cstdlib>
#include <string>
#include <utility>
#include <vector>

struct Posted {
    int id = 0, flags = 0, places = 0;
    notification_type_e type = NOTIFICATION_TYPE_NONE;
    notification_ly_type_e layout = NOTIFICATION_LY_NONE;
    double progress = -1;
    std::string title, content, info, when, icon, indicator;
    std::string operation, app_id, activate, display_type; // of the request that a tap sends
    std::vector<std::string> paths;
};

// Takes a text that was given to the caller; "(null)" for none.
inline std::string taken(char *text)
{
    std::string result = text ? text : "(null)";
    free(text);
    return result;
}

inline void read_request(notification_h noti, Posted &posted)
{
    bundle *text = nullptr;
    app_control_h request = nullptr;
    notification_get_execute_option(noti, NOTIFICATION_EXECUTE_TYPE_SINGLE_LAUNCH, &text);
    if (!text || app_control_from_bundle(text, &request) != APP_CONTROL_ERROR_NONE)
        return;
    char *value = nullptr, **paths = nullptr;
    int count = 0;
    app_control_get_operation(request, &value);
    posted.operation = taken(std::exchange(value, nullptr));
    app_control_get_app_id(request, &value);
    posted.app_id = taken(std::exchange(value, nullptr));
    app_control_get_extra_data(request, "operation_type", &value);
    posted.activate = taken(std::exchange(value, nullptr));
    app_control_get_extra_data(request, "display_type", &value);
    posted.display_type = taken(value);
    app_control_get_extra_data_array(request, "path", &paths, &count);
    for (int i = 0; i < count; i++)
        posted.paths.push_back(taken(paths[i]));
    free(paths);
    app_control_destroy(request);
}

inline std::vector<Posted> read_posted(const char *package)
{
    const auto read = [](notification_h noti, int id, void *data) {
        Posted posted = {.id = id};
        notification_get_type(noti, &posted.type);
        notification_get_property(noti, &posted.flags);
        notification_get_display_applist(noti, &posted.places);
        notification_get_layout(noti, &posted.layout);
        notification_get_progress(noti, &posted.progress);
        char *value = nullptr;
        for (const auto &[part, to] : {std::pair{NOTIFICATION_TEXT_TYPE_TITLE, &posted.title},
                                       {NOTIFICATION_TEXT_TYPE_CONTENT, &posted.content},
                                       {NOTIFICATION_TEXT_TYPE_INFO_1, &posted.info},
                                       {NOTIFICATION_TEXT_TYPE_INFO_SUB_2, &posted.when}}) {
            notification_get_text(noti, part, &value);
            *to = taken(std::exchange(value, nullptr));
        }
        for (const auto &[part, to] : {std::pair{NOTIFICATION_IMAGE_TYPE_ICON, &posted.icon},
                                       {NOTIFICATION_IMAGE_TYPE_ICON_FOR_INDICATOR, &posted.indicator}}) {
            notification_get_image(noti, part, &value);
            *to = taken(std::exchange(value, nullptr));
        }
        read_request(noti, posted);
        static_cast<std::vector<Posted> *>(data)->push_back(posted);
        return true;
    };
    std::vector<Posted> all;
    notification_foreach(package, read, &all);
    return all;
}
