#pragma once
// What a package has posted in the notification area, read back from the real store as text.
#include "app/app_control.h"
#include "notification/notification.h"
#include "temp_home.h"
#include <string>
#include <vector>

struct Posted {
    int id = 0;
    std::string text;  // "TITLE: CONTENT", for a result with " DISPLAY_TYPE: NAME..." of its files
    std::string looks; // "TYPE FLAGS PLACES LAYOUT PROGRESS INFO ICON INDICATOR OPERATION APP ACTIVATE"
};

inline std::string last_part(const std::string &path)
{
    return path.substr(path.rfind('/') + 1);
}

inline bool read_posted_one(notification_h noti, int id, void *data)
{
    const auto text_of = [noti](notification_text_type_e part) {
        char *value = nullptr;
        notification_get_text(noti, part, &value);
        return taken(value);
    };
    const auto image_of = [noti](notification_image_type_e part) {
        char *value = nullptr;
        notification_get_image(noti, part, &value);
        return last_part(taken(value));
    };
    notification_type_e type = NOTIFICATION_TYPE_NONE;
    notification_ly_type_e layout = NOTIFICATION_LY_NONE;
    int flags = 0, places = 0, count = 0;
    double progress = -1;
    bundle *launch = nullptr;
    app_control_h request = nullptr;
    char *operation = nullptr, *app = nullptr, *activate = nullptr, *display_type = nullptr, **paths = nullptr;
    notification_get_type(noti, &type);
    notification_get_property(noti, &flags);
    notification_get_display_applist(noti, &places);
    notification_get_layout(noti, &layout);
    notification_get_progress(noti, &progress);
    notification_get_execute_option(noti, NOTIFICATION_EXECUTE_TYPE_SINGLE_LAUNCH, &launch);
    app_control_from_bundle(launch, &request);
    app_control_get_operation(request, &operation);
    app_control_get_app_id(request, &app);
    app_control_get_extra_data(request, "operation_type", &activate);
    app_control_get_extra_data(request, "display_type", &display_type);
    app_control_get_extra_data_array(request, "path", &paths, &count);
    app_control_destroy(request);
    Posted posted = {id, text_of(NOTIFICATION_TEXT_TYPE_TITLE) + ": " + text_of(NOTIFICATION_TEXT_TYPE_CONTENT), ""};
    posted.text += display_type ? " " + taken(display_type) + ":" : "";
    for (int i = 0; i < count; i++)
        posted.text += " " + last_part(taken(paths[i]));
    free(paths);
    for (const int number :
         {static_cast<int>(type), flags, places, static_cast<int>(layout), static_cast<int>(progress * 100)})
        posted.looks += std::to_string(number) + " ";
    posted.looks += text_of(NOTIFICATION_TEXT_TYPE_INFO_1) + " " + image_of(NOTIFICATION_IMAGE_TYPE_ICON) + " " +
                    image_of(NOTIFICATION_IMAGE_TYPE_ICON_FOR_INDICATOR) + " " + last_part(taken(operation)) + " " +
                    taken(app) + " " + taken(activate);
    static_cast<std::vector<Posted> *>(data)->push_back(posted);
    return true;
}

inline std::vector<Posted> read_posted(const char *package)
{
    std::vector<Posted> all;
    notification_foreach(package, read_posted_one, &all);
    return all;
}
