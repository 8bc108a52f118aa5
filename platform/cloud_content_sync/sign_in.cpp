// The public functions of signing in and out.
#include "cloud_content_sync/account.h"
#include "cloud_content_sync/auth.h"
#include "cloud_content_sync/handle.h"
#include "cloud_content_sync/names.h"
#include <climits>

using cloud::AuthRequest;

static constexpr int DONE = CLOUD_CONTENT_SYNC_ERROR_NONE;
static constexpr int INVALID = CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER;
static constexpr int NO_SERVICE = CLOUD_CONTENT_SYNC_ERROR_NO_SERVICE;

static int ask(cloud_content_sync_h handle, const AuthRequest &request)
{
    const cloud::Service &service = handle->client->service;
    // Whoever came by another way can still leave.
    if (request.kind != AuthRequest::DEACTIVATE && (service.api.empty() || service.web.empty()))
        return NO_SERVICE;
    handle->client->auth->ask(request);
    return DONE;
}

int cloud_content_sync_auth_get_request_token_info(cloud_content_sync_h handle, cloud_content_sync_request_token_cb cb,
                                                   void *user_data)
{
    if (!handle || !cb)
        return INVALID;
    return ask(handle, {.kind = AuthRequest::REQUEST_TOKEN, .token_cb = cb, .user_data = user_data});
}

int cloud_content_sync_auth_get_email(cloud_content_sync_h handle, cloud_content_sync_email_cb cb, void *user_data)
{
    if (!handle || !cb)
        return INVALID;
    return ask(handle, {.kind = AuthRequest::EMAIL, .email_cb = cb, .user_data = user_data});
}

int cloud_content_sync_activate(cloud_content_sync_h handle, cloud_content_sync_status_cb cb, void *user_data)
{
    if (!handle || !cb)
        return INVALID;
    return ask(handle, {.kind = AuthRequest::ACTIVATE, .status_cb = cb, .user_data = user_data});
}

int cloud_content_sync_deactivate(cloud_content_sync_h handle, cloud_content_sync_status_cb cb, void *user_data)
{
    if (!handle || !cb)
        return INVALID;
    return ask(handle, {.kind = AuthRequest::DEACTIVATE, .status_cb = cb, .user_data = user_data});
}

int cloud_content_sync_auth_abandon(cloud_content_sync_h handle, cloud_content_sync_status_cb cb, void *user_data)
{
    if (!handle || !cb)
        return INVALID;
    return ask(handle,
               {.kind = AuthRequest::DEACTIVATE, .status_cb = cb, .user_data = user_data, .is_sign_in_only = true});
}

int cloud_content_sync_auth_cancel(cloud_content_sync_h handle)
{
    if (!handle)
        return INVALID;
    return handle->client->auth->cancel() ? DONE : CLOUD_CONTENT_SYNC_ERROR_NOT_FOUND;
}

int cloud_content_sync_account_get_email(const char *service_name, char **email)
{
    if (!service_name || !email || !cloud::service_name_is_valid(service_name))
        return INVALID;
    const auto known = cloud::credentials_known(service_name);
    return known ? cloud::give(known->email, email) : CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT;
}

int cloud_content_sync_service_get_pages(const char *service_name, char **web, char **callback, char **ca_file)
{
    if (!service_name || !cloud::service_name_is_valid(service_name))
        return INVALID;
    const auto service = cloud::service_find(service_name);
    if (!service || service->web.empty())
        return NO_SERVICE;
    const std::pair<char **, const std::string *> wanted[] = {
        {web, &service->web}, {callback, &service->callback}, {ca_file, &service->ca_file}};
    for (const auto &[out, text] : wanted)
        if (out)
            cloud::give(*text, out);
    return DONE;
}

// Type and seconds are one setting, so that no reader sees half of a change.
static constexpr char REFRESH_TYPE[] = "refresh_type";
static constexpr int TYPE_FIRST = 1, TYPE_LAST = 3, TYPES = 4;

int cloud_content_sync_setting_get_refresh_type(cloud_content_sync_h handle, int *type, int *seconds)
{
    if (!handle || !type || !seconds)
        return INVALID;
    const long long both = handle->client->account->setting(REFRESH_TYPE, TYPE_FIRST);
    *type = static_cast<int>(both % TYPES);
    *seconds = static_cast<int>(both / TYPES);
    return DONE;
}

int cloud_content_sync_setting_set_refresh_type(cloud_content_sync_h handle, int type, int seconds)
{
    const bool is_periodic = type == CLOUD_CONTENT_SYNC_REFRESH_TYPE_PERIODIC;
    if (!handle || type < TYPE_FIRST || type > TYPE_LAST || seconds < (is_periodic ? 1 : 0))
        return INVALID;
    return handle->client->account->set_setting(REFRESH_TYPE, static_cast<long long>(seconds) * TYPES + type);
}
