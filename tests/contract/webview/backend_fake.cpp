#include "backend.h"
#include "driver.h"
#include "fake_ewk.h"
#include "visit.h"

using fake_ewk::Answer;

namespace backend {
void start()
{
    driver::start();
    fake_ewk::clear();
    fake_ewk::site([](const std::string &address) -> Answer {
        const std::string path = address.substr(base().size());
        if (path == "/slow")
            return {Answer::hang};
        if (path == "/broken")
            return {Answer::error};
        if (path == "/zip")
            return {.kind = Answer::error, .type = EWK_ERROR_OTHER};
        if (path == "/to-callback")
            return {Answer::redirect, "https://callback.invalid/auth_complete"};
        if (path == "/to-foreign")
            return {Answer::redirect, "https://foreign.invalid/"};
        return {};
    });
}

std::string base()
{
    return "http://site.example:80";
}

void tap(Evas_Object *view)
{
    const std::string address = ewk_view_url_get(view);
    if (address == base() + "/link-window")
        fake_ewk::open_window(base() + "/page");
    else
        fake_ewk::navigate(address == base() + "/link" ? base() + "/page" : "https://foreign.invalid/");
}

void menu(Evas_Object *)
{
    fake_ewk::context_menu({EWK_CONTEXT_MENU_ITEM_TAG_OTHER, EWK_CONTEXT_MENU_ITEM_TAG_OPEN_LINK_IN_NEW_WINDOW,
                            EWK_CONTEXT_MENU_ITEM_TAG_COPY_LINK_TO_CLIPBOARD});
}

void crash()
{
    fake_ewk::crash();
}
} // namespace backend
