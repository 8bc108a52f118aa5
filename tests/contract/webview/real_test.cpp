// What only an engine can show.
#include "backend.h"
#include "backend_real.h"
#include "visit.h"
#include <csignal>
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <unistd.h>

namespace {
constexpr char page_came[] = "decide started finished";

std::string variable(const char *name)
{
    const char *value = std::getenv(name);
    return value ? value : "";
}

class Engine : public testing::Test {
  protected:
    static void SetUpTestSuite()
    {
        backend::start();
    }
    // The page that a script or a form leads to is there, and whole.
    static bool arrives(Visit &visit, const std::string &path)
    {
        const std::string address = backend::base() + path;
        const bool there = driver::run_until(
            [&] { return ewk_view_url_get(visit.view) == address && visit.said.ends_with("finished"); }, 10);
        EXPECT_EQ(ewk_view_url_get(visit.view), address) << visit.said;
        visit.said.clear();
        return there;
    }
    std::string base = backend::base();
};

TEST_F(Engine, Certificates)
{
    const std::string site = variable("SITE_TLS"), page = site + "/page", right = variable("SITE_CA"),
                      wrong = variable("SITE_WRONG_CA");
    const std::string bad = "decide started error:certificate finished";
    for (int round = 0; round < 2; round++) { // a certificate that was good for one view is not for another
        for (const auto &[authorities, words] :
             {std::pair{std::string(), bad}, {wrong, bad}, {"/none", bad}, {right, std::string(page_came)}}) {
            Visit visit(site, authorities);
            EXPECT_TRUE(visit.load(page, words)) << authorities;
        }
    }
}

TEST_F(Engine, ForeignParts)
{
    Visit visit(base);
    ewk_view_url_set(visit.view, (base + "/foreign-parts").c_str());
    arrives(visit, "/parts-done"); // site.py tells when they were asked for
}

TEST_F(Engine, CookiesAreCleared)
{
    for (const char *expected : {"/no-cookie", "/has-cookie", "/no-cookie"}) {
        Visit visit(base);
        static int views = 0;
        if (++views == 3)
            ewk_cookie_manager_cookies_clear(ewk_context_cookie_manager_get(ewk_view_context_get(visit.view)));
        ewk_view_url_set(visit.view, (base + "/cookie").c_str());
        arrives(visit, expected);
    }
}

TEST_F(Engine, TypingAndTab)
{
    Visit visit(base);
    visit.load(base + "/form", page_came);
    driver::click(visit.view);
    EXPECT_TRUE(driver::run_until([&] { return elm_object_focus_get(visit.view); }, 5));
    driver::run_until([] { return false; }, 0.3); // what has the focus in the page, nobody is told
    for (const char *key : {"a", "Tab", "b", "Return"})
        driver::press(visit.window, key);
    arrives(visit, "/got?a=a&b=b");
}

TEST_F(Engine, ChoicesAndQuestions)
{
    Visit visit(base);
    visit.load(base + "/select", page_came);
    driver::click(visit.view);
    const auto choice = [&](const char *text) { return driver::find_text(visit.window, text); };
    ASSERT_TRUE(driver::run_until([&] { return choice("2"); }, 5));
    driver::run_until([] { return false; }, 0.3); // it moves into its place
    driver::click(choice("2"));
    arrives(visit, "/chose-2");
    for (const char *key : {"Escape", "Return"}) {
        visit.load(base + "/alert", page_came);
        driver::click(visit.view);
        ASSERT_TRUE(driver::run_until([&] { return choice("a <b>&</b>"); }, 5));
        driver::press(visit.window, key);
        arrives(visit, "/closed");
        EXPECT_EQ(driver::find_widget(visit.window, "elm_popup"), nullptr);
    }
    visit.load(base + "/alert", page_came);
    driver::click(visit.view);
    ASSERT_TRUE(driver::run_until([&] { return choice("a <b>&</b>"); }, 5));
    backend::crash();
    visit.says("crashed");
    EXPECT_EQ(driver::find_widget(visit.window, "elm_popup"), nullptr);
}

TEST_F(Engine, AProcessThatStandsStill)
{
    Visit visit(base);
    visit.load(base + "/page", page_came);
    ewk_view_patience_set(visit.view, 0.5);
    evas_object_hide(visit.view);
    const pid_t process = backend::web_process();
    kill(process, SIGSTOP);
    visit.load(base + "/page", "", 1.5); // nobody looks
    driver::run_until([] { return false; }, 1.5);
    EXPECT_EQ(visit.said, "");
    evas_object_show(visit.view);
    visit.says("crashed", 5);
}

int descriptors()
{
    return static_cast<int>(std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {}));
}

long status(const std::string &name)
{
    std::ifstream file("/proc/self/status");
    for (std::string word; file >> word;)
        if (long value = 0; word == name + ":" && file >> value)
            return value;
    return 0;
}

TEST_F(Engine, ViewsLeaveNothingBehind)
{
    const auto visit_once = [this] {
        Visit visit(base);
        return visit.load(base + "/page", page_came);
    };
    for (int i = 0; i < 3; i++)
        visit_once();
    const auto at_rest = [](int most) { return [most] { return descriptors() <= most; }; };
    driver::run_until([] { return false; }, 0.5);
    const int files = descriptors();
    const long threads = status("Threads");
    [[maybe_unused]] const long memory = status("VmRSS");
    for (int i = 0; i < 5; i++)
        ASSERT_TRUE(visit_once());
    // the engine's pools breathe; a view that stays has a dozen descriptors and 1.2 MB of pixels
    EXPECT_TRUE(driver::run_until(at_rest(files + 6), 5)) << descriptors() << " of " << files;
    EXPECT_TRUE(driver::run_until([&] { return status("Threads") <= threads + 3; }, 10));
#if !defined(__SANITIZE_ADDRESS__) // which keeps what was freed
    EXPECT_LT(status("VmRSS"), memory + 3000);
#endif
}
} // namespace
