#include "velora_common/velora_requests.h"
#include "vconf/vconf.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pages.h"
#include <algorithm>
#include <cstdlib>
#include <optional>
#include <string>
#include <vector>

struct Request {
    int number = 0;
    app_control_h control = nullptr; // owned
    int launch_mode = LAUNCH_MODE_NONE;
    bool is_share = false;
    bool is_held = false;
    std::optional<std::string> result;
    std::vector<std::string> refused; // of what was shared
};

static std::vector<Request> s_requests; // in the order in which they came
static int s_last_number;

static std::vector<Request>::iterator __find(int number)
{
    return std::ranges::find(s_requests, number, &Request::number);
}

int _velora_request_add(AppData *ad, app_control_h request)
{
    Request one{.number = ++s_last_number};
    app_control_clone(&one.control, request);
    ad->app_control = one.control;
    g_free(ad->reply_result); // of the request before
    ad->reply_result = nullptr;
    s_requests.push_back(std::move(one));
    return s_last_number;
}

int _velora_request_last()
{
    return s_last_number;
}

void _velora_request_note_mode(const AppData *ad)
{
    if (const auto last = __find(s_last_number); last != s_requests.end()) {
        last->launch_mode = ad->launch_mode;
        last->is_share = ad->is_share;
    }
}

void _velora_request_result_set(int number, const char *result)
{
    const auto found = __find(number);
    if (found == s_requests.end())
        return;
    found->result.reset();
    if (result)
        found->result = result;
}

void _velora_request_hold_last()
{
    if (const auto last = __find(s_last_number); last != s_requests.end())
        last->is_held = true;
}

app_control_h _velora_request_held()
{
    const auto held = std::ranges::find(s_requests, true, &Request::is_held);
    return held == s_requests.end() ? nullptr : held->control;
}

int _velora_request_held_taken(AppData *ad, std::vector<std::string> refused, size_t others)
{
    const auto held = std::ranges::find(s_requests, true, &Request::is_held);
    if (held == s_requests.end())
        return 0;
    const int number = held->number;
    held->is_held = false;
    held->refused = std::move(refused);
    if (!held->refused.empty() && others == 0)
        _velora_request_answer(ad, number, APP_CONTROL_RESULT_FAILED);
    return number;
}

void _velora_request_refused_add(int number, std::vector<std::string> refused)
{
    if (const auto found = __find(number); found != s_requests.end())
        std::ranges::move(refused, std::back_inserter(found->refused));
}

static void __reply(const Request &request, app_control_result_e result)
{
    app_control_h reply = nullptr;
    if (app_control_create(&reply) != APP_CONTROL_ERROR_NONE)
        return;
    if (request.result &&
        app_control_add_extra_data(reply, "result", request.result->c_str()) != APP_CONTROL_ERROR_NONE)
        VELORA_LOGE("app_control_add_extra_data failed");
    std::vector<const char *> refused;
    for (const std::string &path : request.refused)
        refused.push_back(path.c_str());
    if (!refused.empty())
        app_control_add_extra_data_array(reply, "refused", refused.data(), static_cast<int>(refused.size()));
    if (app_control_reply_to_launch_request(reply, request.control, result) != APP_CONTROL_ERROR_NONE)
        VELORA_LOGE("app_control_reply_to_launch_request failed");
    app_control_destroy(reply);
}

static bool __is_settings_waiting()
{
    int value = 0;
    return vconf_get_bool("db/private/ug-setting-cloud/is_exist", &value) == 0 && value;
}

static void __answer(AppData *ad, Request request, app_control_result_e result)
{
    if (request.number == s_last_number) { // what AppData says is said of this one
        request.launch_mode = ad->launch_mode;
        request.is_share = ad->is_share;
        if (!request.result && ad->reply_result)
            request.result = ad->reply_result;
    }
    if (request.is_share || request.launch_mode == LAUNCH_MODE_SETUP_WIZARD || __is_settings_waiting())
        __reply(request, result);
    if (ad->app_control == request.control)
        ad->app_control = nullptr;
    app_control_destroy(request.control);
}

void _velora_request_answer(AppData *ad, int number, app_control_result_e result)
{
    const auto found = __find(number);
    if (found == s_requests.end())
        return;
    Request request = std::move(*found);
    s_requests.erase(found);
    __answer(ad, std::move(request), result);
}

// The application may be at work on the request that it leaves over.
static void __exit_job(void *data)
{
    if (_velora_pages_are_empty()) // another request may have come meanwhile
        _velora_app_exit(static_cast<AppData *>(data));
}

static void __exit_over_pages_job(void *data)
{
    if (!_velora_pages_have_files())
        _velora_app_exit(static_cast<AppData *>(data));
}

void _velora_request_finish(AppData *ad, int number)
{
    if (_velora_pages_are_empty())
        ecore_job_add(__exit_job, ad);
    else
        _velora_request_answer(ad, number, APP_CONTROL_RESULT_SUCCEEDED);
}

void _velora_requests_finish_held(AppData *ad)
{
    if (!_velora_pages_have_files()) {
        ecore_job_add(__exit_over_pages_job, ad);
        return;
    }
    while (true) {
        const auto held = std::ranges::find(s_requests, true, &Request::is_held);
        if (held == s_requests.end())
            return;
        // Nothing of it was sent anywhere, and the application goes on with something else.
        _velora_request_answer(ad, held->number, APP_CONTROL_RESULT_CANCELED);
    }
}

void _velora_requests_answer_all(AppData *ad)
{
    std::vector<Request> all;
    all.swap(s_requests);
    std::ranges::reverse(all); // the last one first: it is what the person has just left
    for (Request &request : all)
        __answer(ad, std::move(request), APP_CONTROL_RESULT_SUCCEEDED);
    ad->app_control = nullptr;
}
