#include "velora_common/velora_setup_pages.h"
#include "velora_common/velora_current_popup.h"
#include "velora_common/velora_log.h"
#include "velora_common/velora_pages.h"
#include "velora_common/velora_requests.h"
#include "velora_common/velora_rotation.h"
#include <algorithm>
#include <utility>
#include <vector>

struct SetupPage {
    AppData *ad = nullptr;
    void *page = nullptr;
    Elm_Object_Item *item = nullptr;
    void (*destroy)(void *page) = nullptr;
    bool is_left = false;
    Ecore_Idler *leaving = nullptr;
    Ecore_Job *going_on = nullptr;
    void (*next)(AppData *ad) = nullptr;
};
static SetupPage s_open;
static std::vector<int> s_requests; // that the wizard stands for
static bool s_is_going_on;          // a page is built in the place of another

static void __stop(const SetupPage &open)
{
    if (open.leaving)
        ecore_idler_del(open.leaving);
    if (open.going_on)
        ecore_job_del(open.going_on);
}

static void __take_down()
{
    const SetupPage open = std::exchange(s_open, {});
    AppData *ad = open.ad;
    __stop(open);
    elm_naviframe_item_pop_cb_set(open.item, nullptr, nullptr);
    _velora_popup_take_away(ad, {open.page, ""});
    open.destroy(open.page);
    // None of its widgets may have the keys' focus, or be given it, while they go.
    elm_object_tree_focus_allow_set(ad->naviframe, EINA_FALSE);
    elm_object_item_del(open.item);
    elm_object_tree_focus_allow_set(ad->naviframe, EINA_TRUE);
    _velora_common_upright_set(ad->win_main, false);
}

static void __end(void *page)
{
    _velora_pages_remove(page);
    __take_down();
    s_requests.clear();
}

static void __abandon(void *)
{
    __stop(std::exchange(s_open, {}));
    s_requests.clear();
}

bool _velora_setup_join(AppData *ad)
{
    if (s_open.is_left)
        _velora_page_replace(ad, s_open.page);
    if (!s_open.page)
        return false;
    s_requests.push_back(_velora_request_last());
    _velora_pages_join(ad, s_open.page);
    elm_naviframe_item_promote(s_open.item);
    return true;
}

void _velora_setup_page_add(AppData *ad, void *page, Elm_Object_Item *item, void (*destroy)(void *page))
{
    s_open = {.ad = ad, .page = page, .item = item, .destroy = destroy};
    if (s_is_going_on) { // what it stands for is handed to it
        _velora_pages_add_over(ad, page, {__end, __abandon});
    } else {
        s_requests.push_back(_velora_request_last());
        _velora_pages_add(ad, page, {__end, __abandon});
    }
    _velora_common_upright_set(ad->win_main, true);
}

bool _velora_setup_is_open()
{
    return s_open.page && !s_open.is_left && !s_open.next;
}

void _velora_setup_result_set(AppData *ad, const char *result)
{
    for (const int number : s_requests)
        _velora_request_result_set(number, result);
    if (!std::ranges::count(s_requests, _velora_request_last()))
        return;
    g_free(ad->reply_result);
    ad->reply_result = g_strdup(result);
}

static Eina_Bool __idler_exit_cb(void *data)
{
    s_open.leaving = nullptr;
    if (auto *ad = static_cast<AppData *>(data))
        _velora_page_leave(ad, s_open.page);
    else
        VELORA_LOGE("data is NULL");
    return ECORE_CALLBACK_CANCEL;
}

void _velora_setup_leave(AppData *ad)
{
    if (!_velora_setup_is_open())
        return;
    s_open.is_left = true;
    s_open.leaving = ecore_idler_add(__idler_exit_cb, ad);
}

void _velora_setup_go_on_now(AppData *ad, void (*open)(AppData *ad))
{
    void *page = s_open.page;
    __take_down();
    s_is_going_on = true;
    _velora_pages_go_on(ad, page, open); // by the page's address alone
    s_is_going_on = false;
}

static void __go_on_job(void *data)
{
    s_open.going_on = nullptr;
    _velora_setup_go_on_now(static_cast<AppData *>(data), s_open.next);
}

void _velora_setup_go_on(AppData *ad, void (*open)(AppData *ad))
{
    if (!_velora_setup_is_open())
        return;
    s_open.next = open;
    s_open.going_on = ecore_job_add(__go_on_job, ad);
}
