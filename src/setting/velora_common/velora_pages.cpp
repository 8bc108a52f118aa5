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
static int s_touched;             // number of the page that was built or joined last

static std::vector<Page>::iterator __find(const void *page)
{
    return std::ranges::find(s_pages, page, &Page::page);
}

static void __add(void *page, PageEnds ends, std::vector<int> requests)
{
    static int last_number;
    s_pages.push_back({++last_number, page, ends, std::move(requests)});
    s_touched = last_number;
}

void _velora_pages_add(AppData *, void *page, PageEnds ends)
{
    __add(page, ends, {_velora_request_last()});
}

void _velora_pages_add_over(AppData *, void *page, PageEnds ends)
{
    __add(page, ends, {});
}

static void __join(Page *page, int request)
{
    if (!std::ranges::count(page->requests, request))
        page->requests.push_back(request);
}

void _velora_pages_join(AppData *, void *page)
{
    const auto found = __find(page);
    if (found == s_pages.end())
        return;
    __join(&*found, _velora_request_last());
    s_touched = found->number;
}

void _velora_pages_go_on(AppData *ad, void *page, void (*open)(AppData *ad))
{
    std::vector<int> requests;
    if (const auto found = __find(page); found != s_pages.end())
        requests = std::move(found->requests);
    _velora_pages_remove(page);
    s_touched = 0;
    open(ad);
    const auto next = std::ranges::find(s_pages, s_touched, &Page::number);
    for (const int request : requests)
        if (next != s_pages.end())
            __join(&*next, request);
}

bool _velora_pages_have_others(const void *page)
{
    return std::ranges::any_of(s_pages, [page](const Page &one) { return one.page != page; });
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

// Takes down what stands for the same requests as the page alone. The requests.
static std::vector<int> __end_with_way(const Page &page)
{
    const std::vector<int> left = page.requests;
    __end(page);
    // Pages on the way to this one, opened for the same requests: nobody wants to go back to them.
    const auto is_left = [&left](const Page &one) {
        return std::ranges::all_of(one.requests, [&left](int number) { return std::ranges::count(left, number) > 0; });
    };
    for (auto other = std::ranges::find_if(s_pages, is_left); !left.empty() && other != s_pages.end();
         other = std::ranges::find_if(s_pages, is_left))
        __end(*other);
    return left;
}

static void __answer(AppData *ad, const std::vector<int> &requests)
{
    for (const int number : requests)
        _velora_request_answer(ad, number, APP_CONTROL_RESULT_SUCCEEDED);
}

static void __leave_job(void *data)
{
    const std::unique_ptr<Leave> leave(static_cast<Leave *>(data));
    const auto found = std::ranges::find(s_pages, leave->number, &Page::number);
    if (found == s_pages.end()) // asked twice, or it has ended otherwise
        return;
    const std::vector<int> left = __end_with_way(*found);
    if (s_pages.empty())
        _velora_app_exit(leave->ad);
    else
        __answer(leave->ad, left);
}

void _velora_page_replace(AppData *ad, void *page)
{
    if (const auto found = __find(page); found != s_pages.end())
        __answer(ad, __end_with_way(*found));
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
