// What is shared and nobody can have meant to share.
#include "cloud_content_sync/cloud_content_sync.h"
#include "main/velora_shell.h"
#include "notification/notification.h"
#include "velora_common/velora_requests.h"
#include <clocale>
#include <cstdlib>
#include <deque>
#include <libintl.h>

static constexpr size_t looked_at = 1000; // paths at once, as the person waits

static bool __is_private(const char *path)
{
    return cloud_content_sync_check_local(path) == CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE;
}

std::vector<std::string> __refused_take(std::vector<char *> *paths)
{
    std::vector<std::string> refused;
    std::vector<char *> others;
    for (size_t i = 0; i < paths->size(); i++) {
        const char *path = __convert_uri_to_path((*paths)[i]);
        if (i < looked_at && __is_private(path))
            refused.emplace_back(path);
        else
            others.push_back((*paths)[i]);
    }
    *paths = std::move(others);
    return refused;
}

// One notice at a time: while it stays, what else is refused is counted, and told by the next one with all before it.
struct Notice {
    std::string first; // a refused path
    size_t count = 0, told = 0;
    Ecore_Timer *stays = nullptr;
};
static Notice s_notice;

static void __notice_post()
{
    g_autofree char *name = g_filename_display_basename(s_notice.first.c_str());
    for (char *at = name; *at; at++)
        if (g_ascii_iscntrl(*at))
            *at = '?';
    std::string text = name;
    if (s_notice.count > 1)
        text += " (+" + std::to_string(s_notice.count - 1) + ")";
    text += std::string(": ") + dcgettext(VELORA_DOMAIN, "IDS_VELORA_BODY_FILE_NOT_SHARED", LC_MESSAGES);
    notification_status_message_post(text.c_str());
    s_notice.told = s_notice.count;
}

static Eina_Bool __notice_over_cb(void *)
{
    if (s_notice.told < s_notice.count) {
        __notice_post();
        return ECORE_CALLBACK_RENEW;
    }
    s_notice = {};
    return ECORE_CALLBACK_CANCEL;
}

void __refused_say(const std::vector<std::string> &refused)
{
    if (refused.empty())
        return;
    if (s_notice.count == 0)
        s_notice.first = refused.front();
    s_notice.count += refused.size();
    if (s_notice.stays)
        return;
    constexpr double seconds = 3; // a status message stays so long
    __notice_post();
    s_notice.stays = ecore_timer_add(seconds, __notice_over_cb, nullptr);
}

// Paths of a request that were not looked at; the array is owned.
struct Rest {
    int request = 0;
    char **paths = nullptr;
    int count = 0, next = 0;
};
static std::deque<Rest> s_rests;

static constexpr double budget = 0.005, pause_after = 0.02; // seconds; a look can take 50 µs

static Eina_Bool __look_on_cb(void *)
{
    const double start = ecore_time_get();
    while (!s_rests.empty()) {
        Rest &rest = s_rests.front();
        std::vector<std::string> refused;
        for (; rest.next < rest.count && ecore_time_get() - start < budget; rest.next++)
            if (const char *path = __convert_uri_to_path(rest.paths[rest.next]); path && __is_private(path))
                refused.emplace_back(path);
        __refused_say(refused);
        _velora_request_refused_add(rest.request, std::move(refused));
        if (rest.next < rest.count)
            return ECORE_CALLBACK_RENEW;
        __string_array_free(&rest.paths, &rest.count);
        s_rests.pop_front();
    }
    return ECORE_CALLBACK_CANCEL;
}

void __refused_look_on(int request, char **paths, int count)
{
    if (count <= static_cast<int>(looked_at)) {
        __string_array_free(&paths, &count);
        return;
    }
    if (s_rests.empty())
        ecore_timer_add(pause_after, __look_on_cb, nullptr);
    s_rests.push_back({request, paths, count, static_cast<int>(looked_at)});
}
