// What holds for the view and for its fake alike.
#include "backend.h"
#include "visit.h"
#include <gtest/gtest.h>

namespace {
constexpr char page_came[] = "decide started finished";

class Contract : public testing::Test {
  protected:
    static void SetUpTestSuite()
    {
        backend::start();
    }
    std::string base = backend::base();
};

struct Case {
    const char *address; // of the site when it begins with a slash
    const char *words;
};

// After each a page is loaded, so that nothing can come late.
TEST_F(Contract, Addresses)
{
    Visit visit(base);
    for (const auto &[address, words] : {
             Case{"/page", page_came},
             Case{"https://callback.invalid/auth_complete?token=1", "decide"},
             Case{"/to-callback", "decide started decide"},
             Case{"/to-foreign", "decide started decide error:refused finished"},
             Case{"/broken", "decide started error:network finished"},
             Case{"/zip", "decide started error:other finished"},
             Case{"http://other.invalid/page", "decide error:refused"},
             Case{"javascript:alert(1)", "decide error:refused"},
             Case{"data:text/html,page", "decide error:refused"},
             Case{"file:///etc/passwd", "decide error:refused"},
         }) {
        SCOPED_TRACE(address);
        EXPECT_TRUE(visit.load(*address == '/' ? base + address : address, words));
        EXPECT_TRUE(visit.load(base + "/page", page_came));
        EXPECT_EQ(ewk_view_url_get(visit.view), base + "/page");
    }
    for (const std::string cunning : {"@evil.invalid/", ".evil.invalid/", "0/"})
        EXPECT_TRUE(visit.load(base + cunning, "decide error:refused")) << cunning;
}

TEST_F(Contract, NoBaseLoadsNothing)
{
    Visit visit("");
    visit.load(base + "/page", "decide error:refused");
}

TEST_F(Contract, LoadingEndsOnce)
{
    Visit visit(base);
    visit.load(base + "/slow", "decide started");
    ewk_view_stop(visit.view);
    visit.says("finished");
    visit.load(base + "/slow", "decide started");
    visit.load(base + "/page", "finished decide started finished");
    EXPECT_EQ(ewk_view_url_get(visit.view), base + "/page");
}

TEST_F(Contract, WhatAPersonDoes)
{
    Visit visit(base);
    visit.load(base + "/link", page_came);
    backend::tap(visit.view);
    visit.says(page_came);
    EXPECT_EQ(ewk_view_url_get(visit.view), base + "/page");
    visit.load(base + "/link-foreign", page_came);
    backend::tap(visit.view);
    visit.says("decide");
    visit.load(base + "/link-window", page_came);
    backend::tap(visit.view);
    visit.says("window");
    visit.load(base + "/link", page_came);
    backend::menu(visit.view);
    visit.says("menu:84");
}

TEST_F(Contract, ACrashIsTheEnd)
{
    Visit visit(base);
    visit.load(base + "/page", page_came);
    backend::crash();
    visit.says("crashed");
    visit.load(base + "/page", "", 0.1);
    Visit next(base);
    next.load(base + "/page", page_came);
}

TEST_F(Contract, HandlersMayDeleteTheView)
{
    for (const auto &[at, path] : {std::pair{"decide", "/page"},
                                   {"started", "/page"},
                                   {"finished", "/page"},
                                   {"error", "/broken"},
                                   {"error", "/to-foreign"},
                                   {"window", "/link-window"},
                                   {"menu", "/link"},
                                   {"crashed", "/page"}}) {
        SCOPED_TRACE(at);
        Visit visit(base);
        visit.delete_at = at;
        ewk_view_url_set(visit.view, (base + path).c_str());
        ASSERT_TRUE(driver::run_until([&] { return !visit.view || visit.said == page_came; }, 10));
        if (visit.view && visit.delete_at == "menu")
            backend::menu(visit.view);
        else if (visit.view && visit.delete_at == "window")
            backend::tap(visit.view);
        else if (visit.view)
            backend::crash();
        EXPECT_TRUE(driver::run_until([&] { return !visit.view; }, 10));
    }
}

TEST_F(Contract, NullIsNoView)
{
    EXPECT_EQ(ewk_view_add(nullptr), nullptr);
    ewk_view_url_set(nullptr, "x");
    ewk_view_stop(nullptr);
    EXPECT_EQ(ewk_view_url_get(nullptr), nullptr);
    EXPECT_EQ(ewk_context_menu_item_count(nullptr), 0U);
    EXPECT_EQ(ewk_context_cookie_manager_get(ewk_view_context_get(nullptr)), nullptr);
}
} // namespace
