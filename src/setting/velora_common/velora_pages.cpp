#include "velora_common/velora_pages.h"
#include "velora_common/velora_requests.h"
#include <algorithm>
#include <memory>
#include <vector>

struct Page {
    int number = 0; // a page's address may become another's
    void *page = nullptr;
    PageEnds ends;
    std::vector<int> requests;
};

static std::vector<Page> s_pages; // in the order in which they were built

static std::vector<Page>::iterator __find(const void *page)
{
    return std::ranges::find(s_pages, page, &Page::page);
}

void _velora_pages_add(AppData *, void *page, PageEnds ends)
{
    static int last_number;
    s_pages.push_back({++last_number, page, ends, {_velora_request_last()}});
}

void _velora_pages_join(AppData *, void *page)
{
    const auto found = __find(page);
    if (found != s_pages.end() && !std::ranges::count(found->requests, _velora_request_last()))
        found->requests.push_back(_velora_request_last());
}

void _velora_pages_remove(void *page)
{
    std::erase_if(s_pages, [page](const Page &one) { return one.page == page; });
}

bool _velora_pages_are_empty()
{
    return s_pages.empty();
}

bool _velora_pages_have_files()
{
    return std::ranges::any_of(s_pages,
                               [](const Page &one) { return one.ends.has_files && one.ends.has_files(one.page); });
}

static void __end(Page page)
{
    page.ends.end(page.page);
    _velora_pages_remove(page.page);
}

struct Leave {
    AppData *ad;
    int number;
};

static void __leave_job(void *data)
{
    const std::unique_ptr<Leave> leave(static_cast<Leave *>(data));
    const auto found = std::ranges::find(s_pages, leave->number, &Page::number);
    if (found == s_pages.end()) // asked twice, or it has ended otherwise
        return;
    const std::vector<int> left = found->requests;
    __end(*found);
    // Pages on the way to this one, opened for the same requests: nobody wants to go back to them.
    const auto is_left = [&left](const Page &one) {
        return std::ranges::all_of(one.requests, [&left](int number) { return std::ranges::count(left, number) > 0; });
    };
    for (auto other = std::ranges::find_if(s_pages, is_left); other != s_pages.end();
         other = std::ranges::find_if(s_pages, is_left))
        __end(*other);
    if (s_pages.empty()) {
        _velora_app_exit(leave->ad);
        return;
    }
    for (const int number : left)
        _velora_request_answer(leave->ad, number, APP_CONTROL_RESULT_SUCCEEDED);
}

void _velora_page_leave(AppData *ad, void *page)
{
    if (const auto found = __find(page); found != s_pages.end())
        ecore_job_add(__leave_job, new Leave{ad, found->number});
}

void _velora_pages_end()
{
    while (!s_pages.empty())
        __end(s_pages.back());
}

void _velora_pages_abandon()
{
    for (const Page &page : s_pages)
        page.ends.abandon(page.page);
    s_pages.clear();
}
