// How devices are signed in, and what people see of the service with a browser.
#include "base/base.h"
#include "cloud.h"
#include <array>
#include <csignal>
#include <glib.h>
#include <gtest/gtest.h>
#include <thread>

using Fields = std::vector<std::pair<std::string, std::string>>;

static const std::string NOBODY = "Authorization:", ANN = "ann@example.org";

static std::string encoded(const std::string &text)
{
    g_autofree char *escaped = g_uri_escape_string(text.c_str(), nullptr, FALSE);
    return escaped;
}

// What stands between two texts; "" when they are not there.
static std::string between(const std::string &text, const std::string &before, const std::string &after)
{
    const size_t at = text.find(before);
    return at == text.npos ? ""
                           : text.substr(at + before.size(), text.find(after, at + before.size()) - at - before.size());
}

static bool has(const Answer &answer, const std::string &part)
{
    return answer.body.find(part) != answer.body.npos;
}

namespace {
// Keeps the cookie, and the form of the last page.
struct Browser {
    const Cloud &cloud;
    std::string cookie, form;

    Answer ask(const std::string &method, const std::string &path, Headers headers, const std::string &body = "")
    {
        headers.push_back(NOBODY);
        if (!cookie.empty())
            headers.push_back("Cookie: other=1; " + cookie);
        Answer answer = cloud.ask(method, path, headers, body);
        if (const std::string set = answer.header("set-cookie"); !set.empty())
            cookie = set.substr(0, set.find(';'));
        if (const std::string token = between(answer.body, "name=\"form\" value=\"", "\""); !token.empty())
            form = token;
        return answer;
    }
    Answer get(const std::string &path, const Headers &headers = {})
    {
        return ask("GET", path, headers);
    }
    Answer post(const std::string &path, const Fields &fields, Headers headers = {})
    {
        std::string body = "form=" + form;
        for (const auto &[name, value] : fields)
            body.append("&").append(name).append("=").append(encoded(value));
        headers.emplace_back("Content-Type: application/x-www-form-urlencoded");
        return ask("POST", path, headers, body);
    }
    Answer sign_in(const std::string &path, const std::string &password = "secret", const std::string &email = ANN)
    {
        get(path);
        return post(path, {{"action", "signin"}, {"email", email}, {"password", password}});
    }
};

// A device that wants to be signed in.
struct Phone {
    const Cloud &cloud;
    std::string token, secret, callback = cloud.url + "/auth_complete";

    explicit Phone(const Cloud &service, const std::string &name = "Phone") : cloud(service)
    {
        const Answer answer = call("request_token", "{\"device\":\"" + name + "\"}");
        token = between(answer.body, "\"oauth_token\":\"", "\"");
        secret = between(answer.body, "\"oauth_token_secret\":\"", "\"");
    }
    Answer call(const std::string &what, const std::string &body, const std::string &authorization = NOBODY) const
    {
        return cloud.ask("POST", "/1/oauth/" + what, {authorization}, body);
    }
    std::string page() const
    {
        return "/1/oauth/authorize?oauth_token=" + token + "&oauth_callback=" + callback + "&locale=en_GB";
    }
    Answer redeem(const std::string &with_secret) const
    {
        return call("access_token",
                    "{\"oauth_token\":\"" + token + "\",\"oauth_token_secret\":\"" + with_secret + "\"}");
    }
};
} // namespace

TEST(Pages, ADeviceIsSignedInAndOut)
{
    Cloud cloud({"--log-sql"});
    Browser browser{cloud};
    const Phone phone(cloud, "Ann's \\u0007<b>phone\\u202e\\\"");
    EXPECT_EQ(phone.redeem(phone.secret).status, 401) << "before it was approved";
    const Answer first = browser.get(phone.page());
    EXPECT_TRUE(has(first, "Ann&#39;s &lt;b&gt;phone&quot;</bdi>")) << first.body;
    const std::string stranger = browser.cookie;
    EXPECT_EQ(browser.sign_in(phone.page()).status, 303);
    EXPECT_NE(browser.cookie, stranger) << "somebody else may know that one";
    const Answer page = browser.get(phone.page());
    EXPECT_TRUE(has(page, ANN) && has(page, "Connect this device?")) << page.body;
    const Answer approved = browser.post(phone.page(), {{"action", "approve"}});
    EXPECT_EQ(approved.status, 303);
    EXPECT_EQ(approved.header("location"), phone.callback + "?oauth_token=" + phone.token + "&uid=1");
    EXPECT_EQ(browser.get(phone.page()).status, 410);

    EXPECT_EQ(phone.redeem(std::string(64, '0')).status, 401);
    EXPECT_EQ(phone.redeem(phone.secret + "0").status, 401);
    const Answer access = phone.redeem(phone.secret);
    EXPECT_EQ(between(access.body, "\"email\":\"", "\""), ANN);
    EXPECT_EQ(access.header("cache-control"), "no-store");
    EXPECT_EQ(phone.redeem(phone.secret).status, 401) << "twice";
    const std::string bearer = "Authorization: Bearer " + between(access.body, "\"access_token\":\"", "\"");
    EXPECT_EQ(cloud.ask("GET", "/1/account/info", {bearer}).status, 200);

    const Answer account = browser.get("/m?cl=en");
    for (const char *part : {"Ann&#39;s &lt;b&gt;phone&quot;", "0\u00a0B</bdi> of", "Last used"})
        EXPECT_TRUE(has(account, part)) << account.body;
    const std::string device = between(account.body, "name=\"device\" value=\"", "\"");
    Browser eve{cloud};
    run_cloud({"--root", cloud.root, "--add-account", "eve@example.org"}, "word\n");
    EXPECT_EQ(eve.sign_in("/m", "word", "eve@example.org").status, 303);
    eve.get("/m");
    eve.post("/m", {{"action", "device"}, {"device", device}});
    EXPECT_EQ(cloud.ask("PROPFIND", "/dav/", {bearer, "Depth: 0"}).status, 207) << "by somebody else";
    EXPECT_EQ(browser.post("/m", {{"action", "device"}, {"device", device}}).status, 303);
    EXPECT_EQ(cloud.ask("PROPFIND", "/dav/", {bearer, "Depth: 0"}).status, 401);
    EXPECT_EQ(phone.call("revoke", "", bearer).status, 401);

    const std::string tool =
        "Authorization: Bearer " + run_cloud({"--root", cloud.root, "--token", ANN}).out.substr(0, 64);
    EXPECT_EQ(phone.call("revoke", "", tool).status, 204);
    EXPECT_EQ(cloud.ask("GET", "/1/account/info", {tool}).status, 401);
    EXPECT_EQ(phone.call("revoke", "").status, 401);

    const std::string known = browser.cookie;
    browser.post("/m", {{"action", "leave"}});
    browser.cookie = known;
    EXPECT_FALSE(has(browser.get("/m"), ANN)) << "the session goes on";
    browser.get("/m/register");
    EXPECT_EQ(browser.post("/m/register", {{"email", "x@example.org"}, {"password", "tall trees"}}).status, 303);
    expect_no_scans(cloud, 8);
}

TEST(Pages, ASignInThatMustNotSucceed)
{
    Cloud cloud({"--token-life", "2"});
    Browser browser{cloud};
    Phone phone(cloud);
    const std::string good = phone.callback;
    std::string upper = good;
    upper.replace(upper.find("auth"), 4, "Auth");
    for (const std::string &callback :
         {good + "/", good + "?", good + "?x=1", good + "%23", good + "@evil.example", upper,
          std::string("/auth_complete"), std::string("https://evil.example/auth_complete"),
          std::string("http://localhost/auth_complete"), std::string()}) {
        phone.callback = callback;
        for (const Answer &answer : {browser.get(phone.page()), browser.post(phone.page(), {{"action", "decline"}})}) {
            EXPECT_EQ(answer.status, 400) << callback;
            EXPECT_EQ(answer.header("location") + between(answer.body, "<form", ">"), "") << callback;
        }
    }
    phone.callback = good;
    // Forms that this browser was not shown, or that come from elsewhere.
    EXPECT_EQ(browser.sign_in(phone.page()).status, 303);
    browser.get(phone.page());
    Browser other{cloud}, bare{cloud, "", browser.form}, foreign = browser;
    other.get(phone.page());
    foreign.form = other.form;
    const struct {
        Browser from;
        Headers headers;
        int status;
    } forms[] = {{foreign, {}, 403},
                 {bare, {}, 403},
                 {{cloud, browser.cookie, ""}, {}, 403},
                 {browser, {"Origin: https://evil.example"}, 403},
                 {browser, {"Origin: null"}, 403},
                 {browser, {"Origin: " + cloud.url}, 303}};
    for (const auto &row : forms) {
        Browser from = row.from;
        EXPECT_EQ(from.post(phone.page(), {{"action", "other"}}, row.headers).status, row.status);
    }
    // Declined, by whoever is signed in or not.
    const Phone refused(cloud);
    other.get(refused.page());
    const Answer declined = other.post(refused.page(), {{"action", "decline"}});
    EXPECT_EQ(declined.header("location"), good + "?not_approved=true");
    EXPECT_EQ(other.get(refused.page()).status, 410);
    EXPECT_EQ(refused.redeem(refused.secret).status, 401);
    // Too late, with the approval and without.
    const Phone late(cloud), never(cloud);
    other.sign_in(late.page());
    other.get(late.page());
    EXPECT_EQ(other.post(late.page(), {{"action", "approve"}}).status, 303);
    std::this_thread::sleep_for(std::chrono::milliseconds(2100));
    EXPECT_EQ(late.redeem(late.secret).status, 401);
    EXPECT_EQ(other.get(never.page()).status, 410);

    for (const char *body : {"{}", "{\"device\":7}", "{\"device\":\"", "{\"oauth_token\":\"x\"}", ""})
        for (const char *what : {"request_token", "access_token"})
            EXPECT_EQ(phone.call(what, body).status, 400) << what << body;
    EXPECT_EQ(cloud.ask("GET", "/1/oauth/revoke", {NOBODY}).status, 405);
    EXPECT_EQ(phone.call("request_token", std::string(70'000, ' ')).status, 413);
    EXPECT_EQ(browser.post("/m", {{"email", std::string(70'000, 'x')}}).status, 413);
    EXPECT_EQ(cloud.ask("POST", "/m", {NOBODY, "Content-Type: text/plain"}, "x").status, 415);
    EXPECT_EQ(cloud.ask("DELETE", "/m", {NOBODY}).header("allow"), "GET, HEAD, POST");
    int asked = 0;
    Answer last;
    for (; last.status != 429 && asked < 50; asked++)
        last = phone.call("request_token", "{\"device\":\"x\"}");
    EXPECT_GT(asked, 15);
    EXPECT_GT(std::atoi(last.header("retry-after").c_str()), 0);
}

TEST(Pages, WhoGuessesLearnsNothing)
{
    Cloud cloud;
    std::string said[2];
    for (const bool exists : {true, false}) {
        Browser browser{cloud};
        const std::string email = exists ? ANN : "eve@example.org";
        Answer answer;
        for (int i = 0; i < 10; i++) {
            answer = browser.sign_in("/m?cl=en", "guess" + std::to_string(i), email);
            EXPECT_EQ(answer.status, 422);
        }
        EXPECT_TRUE(has(answer, "aria-describedby=\"password-error\" aria-invalid=\"true\"") &&
                    has(answer, "id=\"password-error\" role=\"alert\">The e-mail address or the password is wrong."))
            << answer.body;
        said[exists] =
            between(answer.body, "<main>", "<input") + between(answer.body, "<label for=\"password", "</main>");
        answer = browser.sign_in("/m?cl=en", "secret", email);
        EXPECT_EQ(answer.status, 429);
        EXPECT_GT(std::atoi(answer.header("retry-after").c_str()), 0);
        EXPECT_TRUE(has(answer, "role=\"alert\">Too many attempts."));
    }
    EXPECT_EQ(said[0], said[1]);
}

TEST(Pages, PeopleRegister)
{
    Cloud cloud;
    const Phone phone(cloud);
    const auto address = [](const std::string &cont) {
        return "/m/register?cl=de_DE&signup_data=x&cont=" + encoded(cont);
    };
    std::filesystem::create_directories(cloud.root / "files" / "left@example.org" / "kept");
    const std::vector<std::array<std::string, 3>> rows = {
        // the complaint; "": it becomes an account
        {"", "tall trees", "id=\"email-error\""},
        {"../bob@example.org", "tall trees", "id=\"email-error\""},
        {"bob\u202e@example.org", "tall trees", "id=\"email-error\""},
        {ANN, "tall trees", "gibt es schon ein Konto. <a href"},
        {"left@example.org", "tall trees", "gibt es schon"}, // its files are still there
        {"bob@example.org", "", "id=\"password-error\""},
        {"bob@example.org", "7 chars", "mindestens 8"},
        {"bob@example.org", "sieben\u00fc", "mindestens 8"},
        {"bob@example.org", std::string(300, 'x') + "y", "zu lang"},
        {"bob@example.org", "BOB@example.org", "nicht Ihre E-Mail"},
        {"lighthouse@example.org", "Lighthouse", "nicht Ihre E-Mail"},
        {"bob@example.org", "Password1", "benutzen zu viele"},
        {"bob@example.org", "aaaaaaaaaa", "benutzen zu viele"},
        {"<b>\"'@example.org", "short", "value=\"&lt;b&gt;&quot;&#39;@example.org\""},
        {"Bob@example.org", "tall trees", ""},
    };
    Browser browser{cloud};
    for (const auto &[email, password, complaint] : rows) {
        SCOPED_TRACE(email + " " + password);
        browser.get(address(phone.page()));
        const Answer answer = browser.post(address(phone.page()), {{"email", email}, {"password", password}});
        EXPECT_EQ(answer.status, complaint.empty() ? 303 : 422);
        EXPECT_TRUE(has(answer, complaint)) << answer.body;
        EXPECT_EQ(answer.header("location"), complaint.empty() ? phone.page() : "");
    }
    EXPECT_TRUE(has(browser.get(phone.page()), "bob@example.org")) << "is signed in";
    EXPECT_EQ(cloud.ask("GET", "/1/account/info", {basic_authorization("bob@example.org", "tall trees")}).status, 200);

    // Where to go on: with this service only.
    const std::string own = "/1/oauth/authorize?oauth_token=t";
    int number = 0;
    for (const std::string &cont : {cloud.url + own, "//evil.example" + own, "/\\evil.example" + own}) {
        const std::string email = std::to_string(number++) + "@example.org";
        browser.get(address(cont));
        const Answer answer = browser.post(address(cont), {{"email", email}, {"password", "tall trees"}});
        EXPECT_EQ(answer.header("location"), cont == cloud.url + own ? own : "/m") << cont;
    }
    for (const char *cont : {"/m", "https://evil.example/1/oauth/authorize?x", "/1/oauth/authorize/../../x",
                             "javascript:alert(1)", "/1/oauth/authorize?a\r\nb", "http:/1/oauth/authorize?x"})
        EXPECT_TRUE(has(browser.get(address(cont)), "<a href=\"/m?cl=de\">")) << cont;
    EXPECT_TRUE(has(browser.get("/m"), "Speicher")) << "the language stays";
    const Answer limited = browser.post("/m/register", {{"email", "more@example.org"}, {"password", "tall trees"}});
    EXPECT_EQ(limited.status, 429);
    EXPECT_GT(std::atoi(limited.header("retry-after").c_str()), 300);

    Cloud other({"--no-registration"});
    EXPECT_EQ(Browser{other}.get("/m/register").status, 403);
    EXPECT_FALSE(has(Browser{other}.get("/m"), "/m/register"));
}

TEST(Pages, TokensFromBeforeTheyHadDevicesGoOn)
{
    Cloud cloud;
    const std::string token = run_cloud({"--root", cloud.root, "--token", ANN}).out.substr(0, 64);
    cloud.stop(SIGTERM);
    ASSERT_TRUE(
        Db().open(cloud.root / "velora-cloud.db",
                  "DROP INDEX tokens_of_account; ALTER TABLE tokens DROP COLUMN device; ALTER TABLE tokens DROP "
                  "COLUMN used"));
    cloud.start();
    EXPECT_EQ(cloud.ask("GET", "/1/account/info", {"Authorization: Bearer " + token}).status, 200);
    Browser browser{cloud};
    browser.sign_in("/m?cl=en");
    EXPECT_TRUE(has(browser.get("/m"), "Unnamed device"));
}

static const char POLICY[] = "default-src 'none'; style-src 'self'; img-src 'self'; form-action 'self'; "
                             "base-uri 'none'; frame-ancestors 'none'";

// In each language: its own words on every page, what browsers are told about it, and nothing that can be embedded.
TEST(Pages, SpeakSixLanguages)
{
    Cloud cloud({"--base", "https://cloud.example.org"});
    Phone phone(cloud);
    phone.callback = "https://cloud.example.org/auth_complete";
    const std::string authorize = "/1/oauth/authorize?oauth_token=", OWN = "/m?y=1";
    const std::string signing_in = "Sign in|Anmelden|Se connecter|Iniciar sesión|로그인|登录";
    // Each name is a part of the page's.
    const std::pair<std::string, std::string> pages[] = {
        {"/m?x=1", signing_in},
        {authorize + phone.token + "&oauth_callback=" + phone.callback, signing_in},
        {authorize + phone.token, "cannot|kann nicht|ne peut pas|no puede|로그인을 계속|无法继续"},
        {authorize + "x&oauth_callback=" + phone.callback, "is over|beendet|plus valable|no es válido|유효하지|已失效"},
        {"/m/register?x=1", "an account|Konto|un compte|una cuenta|계정|账户"},
        {"/auth_complete?uid=1", "All done|Alles|C’est fait|Todo listo|완료|已完成"},
        {"/auth_complete?not_approved=true", "Not con|Nicht ver|Non associé|No con|연결되지|未连接"},
        {"/terms?x=1", "Terms|Nutzungs|Conditions|Condiciones|이용|条款"},
        {"/none?x=1", "no such|Diese Seite|Cette page|Esta página|페이지를|没有此页面"},
        {OWN, "Your account|Ihr Konto|Votre compte|Su cuenta|내 계정|您的账户"},
    };
    const char *const languages[][3] = {{"en_US", "en", "xx,en;q=0.1"}, {"de_DE", "de", "fr;q=0.5, de-AT;q=0.9"},
                                        {"fr_FR", "fr", "fr"},          {"es_ES", "es", "es-419,en"},
                                        {"ko_KR", "ko", "ko-KR"},       {"zh_CN", "zh-CN", "zh-Hans-CN, en;q=0.8"}};
    const char *const headers[][2] = {{"x-content-type-options", "nosniff"},
                                      {"x-frame-options", "DENY"},
                                      {"cache-control", "no-store"},
                                      {"referrer-policy", "same-origin"},
                                      {"content-type", "text/html; charset=utf-8"},
                                      {"content-security-policy", POLICY}};
    Browser stranger{cloud}, ann{cloud};
    ann.sign_in("/m", "secret");
    for (const auto &[path, names] : pages) {
        std::istringstream parts(names);
        for (size_t i = 0; i < std::size(languages); i++) {
            SCOPED_TRACE(path + " " + languages[i][0]);
            std::string name;
            std::getline(parts, name, '|');
            Browser &browser = path == OWN ? ann : stranger;
            const std::string locale = path + "&" + (i % 2 ? "cl=" : "locale=") + languages[i][0];
            const Answer answer = browser.get(locale, {"Accept: text/html"});
            const std::string title = between(answer.body, "<title>", "</title>");
            EXPECT_NE(title.find(name), title.npos) << title;
            EXPECT_EQ(title, between(answer.body, "<h1>", "</h1>") + " – Velora");
            EXPECT_TRUE(has(answer, std::string("<html lang=\"") + languages[i][1] + "\">"));
            EXPECT_FALSE(g_regex_match_simple("%[12][^0-9A-F]|<script|style=", answer.body.c_str(), {}, {}));
            for (const auto &[header, value] : headers)
                EXPECT_EQ(answer.header(header), value);
            EXPECT_EQ(answer.header("content-language"), languages[i][1]);
            if (path == OWN)
                continue; // the session knows
            const Headers liked{"Accept: text/html", std::string("Accept-Language: ") + languages[i][2]};
            EXPECT_EQ(between(browser.get(path, liked).body, "<html lang=\"", "\""), languages[i][1]);
        }
    }
    EXPECT_TRUE(ann.cookie.starts_with("__Host-velora="));
    EXPECT_EQ(ann.get("/").header("location"), "/m");
    EXPECT_EQ(ann.get("/page.css").header("content-type"), "text/css; charset=utf-8");
    const std::string cookie = Cloud().ask("GET", "/m", {NOBODY}).header("set-cookie");
    EXPECT_TRUE(cookie.starts_with("velora=") && cookie.ends_with("; Path=/; HttpOnly; SameSite=Lax")) << cookie;
}
