#pragma once
// Requests of a sign-in, and what their callbacks brought.
#include "transfers.h"

enum class Step { REQUEST_TOKEN, EMAIL, ACTIVATE, DEACTIVATE };
inline constexpr Step ALL_STEPS[] = {Step::REQUEST_TOKEN, Step::EMAIL, Step::ACTIVATE, Step::DEACTIVATE};

inline void begin(cloud_content_sync_h handle, Step step, Watch &watch)
{
    const auto token_cb = [](int status, const char *token, const char *secret, int error, void *data) {
        EXPECT_EQ(token != nullptr, error == 0);
        EXPECT_EQ(secret != nullptr, error == 0);
        result_cb(status, token, 0, error, data);
    };
    const auto email_cb = [](int status, const char *email, int error, void *data) {
        result_cb(status, email, 0, error, data);
    };
    const auto status_cb = [](int status, int error, void *data) { result_cb(status, nullptr, 0, error, data); };
    const int refused = step == Step::REQUEST_TOKEN
                            ? cloud_content_sync_auth_get_request_token_info(handle, token_cb, &watch)
                        : step == Step::EMAIL    ? cloud_content_sync_auth_get_email(handle, email_cb, &watch)
                        : step == Step::ACTIVATE ? cloud_content_sync_activate(handle, status_cb, &watch)
                                                 : cloud_content_sync_deactivate(handle, status_cb, &watch);
    EXPECT_EQ(refused, 0);
}

// The error of the callback; "DONE" or "FAILED" is left in *status when it is wanted.
inline int run(cloud_content_sync_h handle, Step step, std::string *text = nullptr, int *status = nullptr)
{
    Watch watch;
    begin(handle, step, watch);
    const int error = watch.end();
    if (text)
        *text = watch.text;
    if (status)
        *status = watch.calls.empty() ? 0 : watch.calls.back().state;
    return error;
}

// The address of who is signed in to "Test"; "(null)" when nobody is.
inline std::string who()
{
    char *email = nullptr;
    cloud_content_sync_account_get_email("Test", &email);
    return taken(email);
}
