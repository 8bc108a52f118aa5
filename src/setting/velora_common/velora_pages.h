#pragma once
// The pages that there are, and the requests that opened them.
//
// A page enters the list when it is built and leaves it when it ends. It stands for the request that opened it and for
// later ones that it has taken in. When it is left, those requests are answered and the pages that stand for nothing
// else end with it; what other requests opened stays, and with the last page the application ends. Main loop only.
#include "velora_common/velora_app_data.h"

// What a page registers. `end` takes the page down, widgets and workers, and must call _velora_pages_remove. `abandon`
// stops its workers alone: the process ends, and the widgets may be gone. Either may be called at any time.
struct PageEnds {
    void (*end)(void *page) = nullptr;
    void (*abandon)(void *page) = nullptr;
    // Whether files that somebody shared would be dropped with the page now; null: never.
    bool (*has_files)(void *page) = nullptr;
};

// Enters a page, opened by the last request.
void _velora_pages_add(AppData *ad, void *page, PageEnds ends);
// Enters a page that another page has opened: it stands for no request, and ends with the others.
void _velora_pages_add_over(AppData *ad, void *page, PageEnds ends);
// The last request's concern is this page's from now on.
void _velora_pages_join(AppData *ad, void *page);
// Takes a page that has ended out of the list, and answers nobody. Nothing when it is not there.
void _velora_pages_remove(void *page);
// `page` is done: takes it out of the list and calls `open`. What it stood for is the concern of the page that `open`
// builds or joins; with none of these the requests stay until the application is left.
void _velora_pages_go_on(AppData *ad, void *page, void (*open)(AppData *ad));
bool _velora_pages_are_empty();
// Whether there is a page besides this one.
bool _velora_pages_have_others(const void *page);
// Whether files that somebody shared would be dropped if the application were left now.
bool _velora_pages_have_files();

// A page is left by the person: once the callback that this is called from has returned it is taken down, and its
// requests are answered when other pages remain, else the application is left.
void _velora_page_leave(AppData *ad, void *page);
// The same at once, for a page that another one takes the place of: the application goes on.
void _velora_page_replace(AppData *ad, void *page);

// Every page ends, the last one first.
void _velora_pages_end();
void _velora_pages_abandon();
