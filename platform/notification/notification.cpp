#include "notification/notification.h"
#include "base/base.h"
#include "notification/courier.h"
#include "notification/store.h"
#include <algorithm>
#include <cmath>
#include <cstring>

namespace {

int copy_out(const notification_s::Text &text, char **out)
{
    char *copy = text ? strdup(text->c_str()) : nullptr;
    if (text && !copy)
        return NOTIFICATION_ERROR_OUT_OF_MEMORY;
    *out = copy;
    return NOTIFICATION_ERROR_NONE;
}

bool is_image(int type)
{
    return type == NOTIFICATION_IMAGE_TYPE_ICON || type == NOTIFICATION_IMAGE_TYPE_ICON_FOR_INDICATOR;
}

int outcome(bool done, bool failed)
{
    if (done)
        courier_changed();
    return done ? NOTIFICATION_ERROR_NONE : failed ? NOTIFICATION_ERROR_IO : NOTIFICATION_ERROR_NOT_EXIST_ID;
}

} // namespace

notification_h notification_create(notification_type_e type)
{
    if (type != NOTIFICATION_TYPE_NOTI && type != NOTIFICATION_TYPE_ONGOING)
        return nullptr;
    auto *noti = new notification_s;
    noti->type = type;
    noti->package = platform_package();
    return noti;
}

int notification_free(notification_h noti)
{
    if (!noti)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    delete noti;
    return NOTIFICATION_ERROR_NONE;
}

int notification_set_property(notification_h noti, int flags)
{
    if (!noti)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    noti->flags = flags;
    return NOTIFICATION_ERROR_NONE;
}

int notification_set_layout(notification_h noti, notification_ly_type_e layout)
{
    if (!noti || layout < NOTIFICATION_LY_NONE || layout > NOTIFICATION_LY_ONGOING_PROGRESS)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    noti->layout = layout;
    return NOTIFICATION_ERROR_NONE;
}

int notification_set_display_applist(notification_h noti, int app_list)
{
    if (!noti)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    noti->places = app_list;
    return NOTIFICATION_ERROR_NONE;
}

int notification_set_image(notification_h noti, notification_image_type_e type, const char *image_path)
{
    if (!noti || !is_image(type) || !image_path)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    noti->images[type] = image_path;
    return NOTIFICATION_ERROR_NONE;
}

int notification_set_text(notification_h noti, notification_text_type_e type, const char *text, const char *,
                          int args_type, ...)
{
    const int index = text_index(type);
    if (!noti || index < 0 || args_type != NOTIFICATION_VARIABLE_TYPE_NONE)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    noti->texts[index].reset();
    if (text)
        noti->texts[index] = text;
    return NOTIFICATION_ERROR_NONE;
}

int notification_set_execute_option(notification_h noti, notification_execute_type_e type, const char *, const char *,
                                    bundle *service_handle)
{
    if (!noti || type != NOTIFICATION_EXECUTE_TYPE_SINGLE_LAUNCH || !service_handle)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    noti->launch = *service_handle;
    return NOTIFICATION_ERROR_NONE;
}

int notification_set_pkgname(notification_h noti, const char *pkgname)
{
    if (!noti || !pkgname || !*pkgname)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    noti->package = pkgname;
    return NOTIFICATION_ERROR_NONE;
}

int notification_set_heir(notification_h noti, const char *content)
{
    if (!noti || !content)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    noti->heir = content;
    return NOTIFICATION_ERROR_NONE;
}

int notification_insert(notification_h noti, int *priv_id)
{
    if (!noti || noti->package.empty())
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    if (!store_insert(*noti))
        return NOTIFICATION_ERROR_IO;
    if (priv_id)
        *priv_id = noti->id;
    courier_changed();
    return NOTIFICATION_ERROR_NONE;
}

notification_h notification_load(const char *pkgname, int priv_id)
{
    if (!pkgname || priv_id < 1)
        return nullptr;
    auto found = store_list(pkgname, priv_id);
    return found.empty() ? nullptr : new notification_s(std::move(found.front()));
}

int notification_update_content(notification_h noti, int priv_id, const char *content)
{
    if (!noti || !content)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    bool failed = false;
    const bool done = store_set_content(noti->package, priv_id, content, failed);
    if (done)
        noti->texts[text_index(NOTIFICATION_TEXT_TYPE_CONTENT)] = content;
    return outcome(done, failed);
}

int notification_update_progress(notification_h noti, int priv_id, double progress)
{
    if (!noti || std::isnan(progress))
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    const double held = std::clamp(progress, 0.0, 1.0);
    bool failed = false;
    const bool done = store_set_progress(noti->package, priv_id, held, failed);
    if (done)
        noti->progress = held;
    return outcome(done, failed);
}

int notification_delete(notification_h noti)
{
    if (!noti)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    bool failed = false;
    const bool done = store_delete(noti->package, noti->id, failed);
    return outcome(done, failed);
}

int notification_delete_all_by_type(const char *pkgname, notification_type_e type)
{
    if (!pkgname || type < NOTIFICATION_TYPE_NONE || type > NOTIFICATION_TYPE_ONGOING)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    return outcome(store_delete_type(pkgname, type), true);
}

int notification_status_message_post(const char *message)
{
    if (!message)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    courier_post(message);
    return NOTIFICATION_ERROR_NONE;
}

int notification_get_text(notification_h noti, notification_text_type_e type, char **text)
{
    const int index = text_index(type);
    return noti && index >= 0 && text ? copy_out(noti->texts[index], text) : NOTIFICATION_ERROR_INVALID_PARAMETER;
}

int notification_get_image(notification_h noti, notification_image_type_e type, char **image_path)
{
    return noti && is_image(type) && image_path ? copy_out(noti->images[type], image_path)
                                                : NOTIFICATION_ERROR_INVALID_PARAMETER;
}

int notification_get_progress(notification_h noti, double *progress)
{
    if (!noti || !progress)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    *progress = noti->progress;
    return NOTIFICATION_ERROR_NONE;
}

int notification_get_type(notification_h noti, notification_type_e *type)
{
    if (!noti || !type)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    *type = static_cast<notification_type_e>(noti->type);
    return NOTIFICATION_ERROR_NONE;
}

int notification_get_property(notification_h noti, int *flags)
{
    if (!noti || !flags)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    *flags = noti->flags;
    return NOTIFICATION_ERROR_NONE;
}

int notification_get_layout(notification_h noti, notification_ly_type_e *layout)
{
    if (!noti || !layout)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    *layout = static_cast<notification_ly_type_e>(noti->layout);
    return NOTIFICATION_ERROR_NONE;
}

int notification_get_display_applist(notification_h noti, int *app_list)
{
    if (!noti || !app_list)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    *app_list = noti->places;
    return NOTIFICATION_ERROR_NONE;
}

int notification_get_execute_option(notification_h noti, notification_execute_type_e type, bundle **service_handle)
{
    if (!noti || type != NOTIFICATION_EXECUTE_TYPE_SINGLE_LAUNCH || !service_handle)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    *service_handle = noti->launch ? &*noti->launch : nullptr;
    return NOTIFICATION_ERROR_NONE;
}

int notification_foreach(const char *pkgname, notification_foreach_cb callback, void *user_data)
{
    if (!callback)
        return NOTIFICATION_ERROR_INVALID_PARAMETER;
    for (notification_s &noti : store_list(pkgname))
        if (!callback(&noti, noti.id, user_data))
            break;
    return NOTIFICATION_ERROR_NONE;
}
