#include "velora_upload_file/upload_notification.h"
#include "app/app_control.h"
#include "notification/notification.h"
#include "runtime_info/runtime_info.h"
#include "velora_common/velora_app_data.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_paths.h"
#include "velora_upload_file/upload_pace.h"
#include <clocale>
#include <condition_variable>
#include <cstdio>
#include <ctime>
#include <libintl.h>
#include <memory>
#include <mutex>
#include <thread>
#include <utility>
#include <vector>

struct NotificationFree {
    void operator()(notification_h noti) const
    {
        notification_free(noti);
    }
};
struct AppControlDestroy {
    void operator()(app_control_h request) const
    {
        app_control_destroy(request);
    }
};
using Notification = std::unique_ptr<struct notification_s, NotificationFree>;
using AppControl = std::unique_ptr<struct app_control_s, AppControlDestroy>;

// What the two notifications differ in.
struct NotiSettings {
    notification_type_e type = NOTIFICATION_TYPE_NOTI;
    int property = NOTIFICATION_PROP_VOLATILE_DISPLAY;
    notification_ly_type_e layout = NOTIFICATION_LY_NOTI_EVENT_MULTIPLE;
    int display = NOTIFICATION_DISPLAY_APP_NOTIFICATION_TRAY;
    const char *operation = nullptr;
};

// Logs a failed step; true when it succeeded.
static bool __noti_step(int result, const char *step)
{
    if (result != 0)
        VELORA_LOGE("Fail to %s [%d]", step, result);
    return result == 0;
}

static bool __noti_set_text(notification_h noti, notification_text_type_e type, const char *text)
{
    return __noti_step(notification_set_text(noti, type, text, nullptr, NOTIFICATION_VARIABLE_TYPE_NONE),
                       "notification_set_text");
}

// Creates a notification and gives it everything but its request.
static Notification __noti_create(const NotiSettings &settings, const char *title, const char *text)
{
    Notification noti(notification_create(settings.type));
    if (!noti) {
        VELORA_LOGE("notification_create failed");
        return nullptr;
    }
    const std::string indicator_icon = _velora_common_app_file("res/images/B03_velora.png");
    const std::string icon = _velora_common_app_file("res/images/com.orvant.velora.png");
    const bool is_set =
        __noti_step(notification_set_property(noti.get(), settings.property), "notification_set_property") &&
        __noti_step(notification_set_layout(noti.get(), settings.layout), "notification_set_layout") &&
        __noti_step(notification_set_display_applist(noti.get(), settings.display),
                    "notification_set_display_applist") &&
        __noti_step(
            notification_set_image(noti.get(), NOTIFICATION_IMAGE_TYPE_ICON_FOR_INDICATOR, indicator_icon.c_str()),
            "notification_set_image") &&
        __noti_step(notification_set_image(noti.get(), NOTIFICATION_IMAGE_TYPE_ICON, icon.c_str()),
                    "notification_set_image") &&
        __noti_set_text(noti.get(), NOTIFICATION_TEXT_TYPE_TITLE, title) &&
        __noti_set_text(noti.get(), NOTIFICATION_TEXT_TYPE_CONTENT, text);
    return is_set ? std::move(noti) : nullptr;
}

static AppControl __request_create(const char *operation)
{
    app_control_h handle = nullptr;
    if (app_control_create(&handle) != APP_CONTROL_ERROR_NONE) {
        VELORA_LOGE("app_control_create failed!");
        return nullptr;
    }
    if (!handle) {
        VELORA_LOGE("app_control_handle is NULL!");
        return nullptr;
    }
    AppControl request(handle);
    if (app_control_set_operation(handle, operation) != APP_CONTROL_ERROR_NONE ||
        app_control_set_app_id(handle, VELORA_SHARE_PACKAGE) != APP_CONTROL_ERROR_NONE) {
        VELORA_LOGE("app_control_set_operation failed!");
        return nullptr;
    }
    if (app_control_add_extra_data(handle, "operation_type", "Activate") != APP_CONTROL_ERROR_NONE) {
        VELORA_LOGE("app_control_add_extra_data failed!");
        return nullptr;
    }
    return request;
}

// Gives the notification its request and hands it to the notification service.
static int __noti_insert(notification_h noti, app_control_h request, int *noti_id)
{
    bundle *data = nullptr;
    if (app_control_to_bundle(request, &data) != APP_CONTROL_ERROR_NONE) {
        VELORA_LOGE("app_control_to_budle failed!");
        return -1;
    }
    if (!data) {
        VELORA_LOGE("Invalid bundle!!");
        return -1;
    }
    const bool is_inserted =
        __noti_step(
            notification_set_execute_option(noti, NOTIFICATION_EXECUTE_TYPE_SINGLE_LAUNCH, nullptr, nullptr, data),
            "notification_set_execute_option") &&
        __noti_step(notification_set_pkgname(noti, VELORA_SHARE_PACKAGE), "notification_set_pkgname") &&
        __noti_step(notification_insert(noti, noti_id), "notification_insert");
    return is_inserted ? 0 : -1;
}

int __progress_noti_new(const char *text, int *noti_id)
{
    // A new run takes away the result of the one before.
    notification_delete_all_by_type(VELORA_SHARE_PACKAGE, NOTIFICATION_TYPE_NOTI);
    const NotiSettings settings = {
        .type = NOTIFICATION_TYPE_ONGOING,
        .property = NOTIFICATION_PROP_DISABLE_AUTO_DELETE | NOTIFICATION_PROP_VOLATILE_DISPLAY,
        .layout = NOTIFICATION_LY_ONGOING_PROGRESS,
        .display = NOTIFICATION_DISPLAY_APP_NOTIFICATION_TRAY | NOTIFICATION_DISPLAY_APP_INDICATOR,
    };
    const Notification noti = __noti_create(settings, "Velora", text);
    if (!noti)
        return -1;
    const AppControl request = __request_create(APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD);
    if (!request)
        return -1;
    __noti_step(
        notification_set_heir(noti.get(), dcgettext(VELORA_SHARE_DOMAIN, "IDS_VELORA_BODY_INTERRUPTED", LC_MESSAGES)),
        "notification_set_heir");
    int id = *noti_id;
    if (__noti_insert(noti.get(), request.get(), &id) != 0)
        return -1;
    *noti_id = id;
    return 0;
}

static Notification __noti_load(int noti_id)
{
    if (noti_id < 1) {
        VELORA_LOGE("Invalid noti id");
        return nullptr;
    }
    return Notification(notification_load(VELORA_SHARE_PACKAGE, noti_id));
}

// The changes that wait for their time. It is left behind when the process ends, for its thread may be at work.
struct Changes {
    std::mutex lock; // held while one is written, so that they are written in their order
    std::condition_variable offered;
    NotiPace pace;
    bool is_served = false; // by a thread
};

static Changes &__changes()
{
    static Changes *the = new Changes;
    return *the;
}

// Writes what may be written by `time`, with the lock held. 0, or -1 when there is no such notification.
static int __changes_write(Changes &changes, NotiPace::Time time = std::chrono::steady_clock::now())
{
    int result = 0;
    while (const std::optional<NotiChange> change = changes.pace.take(time)) {
        const Notification noti = __noti_load(change->noti_id);
        if (!noti) {
            VELORA_LOGE("notification_load failed");
            result = -1;
        } else if (change->content)
            notification_update_content(noti.get(), change->noti_id, change->content->c_str());
        else
            notification_update_progress(noti.get(), change->noti_id, change->progress);
        changes.pace.wrote(std::chrono::steady_clock::now());
    }
    return result;
}

// Sees to what was offered too early to be written, and leaves when nothing has been for a while.
static void __changes_serve()
{
    constexpr std::chrono::seconds patience(2);
    Changes &changes = __changes();
    std::unique_lock hold(changes.lock);
    while (true) {
        if (const std::optional<NotiPace::Time> due = changes.pace.due())
            changes.offered.wait_until(hold, *due);
        else if (!changes.offered.wait_for(hold, patience, [&changes] { return changes.pace.due().has_value(); }))
            break;
        __changes_write(changes);
    }
    changes.is_served = false;
}

static int __change(NotiChange change)
{
    if (change.noti_id < 1) {
        VELORA_LOGE("Invalid noti id");
        return -1;
    }
    Changes &changes = __changes();
    const std::lock_guard hold(changes.lock);
    const bool was_waiting = changes.pace.due().has_value();
    changes.pace.offer(std::move(change));
    const int result = __changes_write(changes);
    if (was_waiting || !changes.pace.due())
        return result;
    if (!std::exchange(changes.is_served, true))
        std::thread(__changes_serve).detach();
    changes.offered.notify_one();
    return result;
}

int __progress_noti_set_content(int noti_id, const char *text)
{
    return __change({.noti_id = noti_id, .content = text});
}

int __progress_noti_set_count(int noti_id, int finished, int remaining)
{
    char text[32];
    std::snprintf(text, sizeof text, "%d / %d", finished, remaining);
    return __progress_noti_set_content(noti_id, text);
}

int __progress_noti_set_progress(int noti_id, double progress)
{
    return __change({.noti_id = noti_id, .progress = progress});
}

void __progress_noti_flush()
{
    const std::lock_guard hold(__changes().lock);
    __changes_write(__changes(), NotiPace::Time::max());
}

int __progress_noti_delete(int noti_id)
{
    const std::lock_guard hold(__changes().lock);
    __changes().pace.forget(noti_id);
    const Notification noti = __noti_load(noti_id);
    if (!noti)
        return noti_id < 1 ? -1 : 0;
    __noti_step(notification_delete(noti.get()), "notification_delete");
    return 0;
}

char *__get_format_time()
{
    bool is_24_hours = false;
    if (const int error = runtime_info_get_value_bool(RUNTIME_INFO_KEY_24HOUR_CLOCK_FORMAT_ENABLED, &is_24_hours);
        error != RUNTIME_INFO_ERROR_NONE) {
        VELORA_LOGE("runtime_info_get_value_bool error_code: %d", error);
        is_24_hours = false;
    }
    const time_t now = time(nullptr);
    struct tm local = {};
    localtime_r(&now, &local);
    char text[80] = "";
    strftime(text, sizeof text, is_24_hours ? "%R" : "%I:%M %p", &local);
    return g_strdup(text);
}

int __box_noti_new(const char *title, const char *text, const char *display_type, char **paths, int count,
                   const char *folder)
{
    notification_delete_all_by_type(VELORA_SHARE_PACKAGE, NOTIFICATION_TYPE_NOTI);
    const Notification noti = __noti_create({}, title, text);
    if (!noti || !__noti_set_text(noti.get(), NOTIFICATION_TEXT_TYPE_INFO_1, text))
        return -1;
    char *now = __get_format_time();
    const bool is_timed = __noti_set_text(noti.get(), NOTIFICATION_TEXT_TYPE_INFO_SUB_2, now);
    g_free(now);
    if (!is_timed)
        return -1;
    const AppControl request = __request_create(APP_CONTROL_OPERATION_NOTIFICATION_UPLOAD_RESULT);
    if (!request)
        return -1;
    if (folder)
        app_control_add_extra_data(request.get(), RESULT_FOLDER_KEY, folder);
    std::vector<const char *> existing; // a full storage counts files that have no path in the list
    for (int i = 0; paths && i < count && paths[i]; i++)
        existing.push_back(paths[i]);
    if (app_control_add_extra_data(request.get(), "display_type", display_type) != APP_CONTROL_ERROR_NONE ||
        app_control_add_extra_data_array(request.get(), "path", existing.data(), static_cast<int>(existing.size())) !=
            APP_CONTROL_ERROR_NONE) {
        VELORA_LOGE("app_control_add_extra_data failed!");
        return -1;
    }
    int noti_id = -1;
    return __noti_insert(noti.get(), request.get(), &noti_id);
}
