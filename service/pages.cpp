#include "pages.h"
#include "secrets.h"
#include <cstring>

Visit::Visit(Request &asked) : request(asked), service(*asked.service), network(network_of(asked.peer()))
{
    const char *host = request.header("Host");
    if (!service.site.base.empty())
        base = service.site.base;
    else if (host && *host)
        base = std::string(request.is_secure() ? "https://" : "http://") + host;
    const std::string name = std::string(base.starts_with("https:") ? "__Host-" : "") + "velora=";
    const char *cookies = request.header("Cookie");
    char **items = g_strsplit(cookies ? cookies : "", ";", 64);
    for (char **item = items; *item; item++)
        if (const char *cookie = g_strstrip(*item); g_str_has_prefix(cookie, name.c_str()))
            id = cookie + name.size();
    g_strfreev(items);
    if (!Sessions::is_id(id))
        id.clear();
    std::string kept;
    if (const long long account_id = service.sessions.account_of(id, kept))
        account = service.accounts.find(account_id);
    const std::string locale = request.query_field("locale"), cl = request.query_field("cl");
    if (!read_language(locale, language) && !read_language(cl, language) && !read_language(kept, language))
        language = accepted_language(request.header("Accept-Language"));
}

std::string Visit::local(const std::string &path) const
{
    return path + (path.find('?') == std::string::npos ? "?cl=" : "&cl=") + language_name(language);
}

std::string Visit::callback() const
{
    if (!service.site.callback.empty())
        return service.site.callback;
    return base.empty() ? "" : base + "/auth_complete";
}

// The scheme, host and port of an address.
static std::string origin_of(const std::string &address)
{
    const size_t host = address.find("://");
    return address.substr(0, host == std::string::npos ? host : address.find('/', host + 3));
}

// Forms go nowhere else, and nothing comes from anywhere else. What follows a form may be the callback, which browsers
// count as the form's target. With "no-referrer" they would not tell us from where a form comes.
void Visit::set_headers()
{
    const std::string &callback = service.site.callback;
    request.set_header("Content-Security-Policy",
                       "default-src 'none'; style-src 'self'; img-src 'self'; form-action 'self'" +
                           (callback.empty() ? "" : " " + origin_of(callback)) +
                           "; base-uri 'none'; frame-ancestors 'none'");
    request.set_header("X-Content-Type-Options", "nosniff");
    request.set_header("X-Frame-Options", "DENY");
    request.set_header("Referrer-Policy", "same-origin");
    request.set_header("Cache-Control", "no-store");
    if (!is_new_id)
        return;
    const bool is_secure = base.starts_with("https:");
    request.set_header("Set-Cookie", std::string(is_secure ? "__Host-" : "") + "velora=" + id +
                                         "; Path=/; HttpOnly; SameSite=Lax" + (is_secure ? "; Secure" : ""));
}

void Visit::show(int status, Text title, const std::string &content)
{
    set_headers();
    request.set_header("Content-Language", language_tag(language));
    request.answer(status, "text/html; charset=utf-8", document(language, say(title), content));
}

void Visit::redirect(const std::string &address)
{
    set_headers();
    request.set_header("Location", address);
    request.answer(303);
}

void Visit::sign_in(const Account &signed_in)
{
    service.sessions.end(id);
    id = service.sessions.begin(signed_in.id, language_name(language));
    is_new_id = true;
}

void Visit::sign_out()
{
    service.sessions.end(id);
    id = Sessions::new_id();
    is_new_id = true;
}

std::string Visit::form_of(const std::string &address, const std::string &fields)
{
    if (id.empty()) {
        id = Sessions::new_id();
        is_new_id = true;
    }
    return "<form method=\"post\" action=\"" + escape(address) + "\" novalidate>\n" +
           "<input type=\"hidden\" name=\"form\" value=\"" + service.sessions.form_token(id) + "\">\n" + fields +
           "</form>\n";
}

bool Visit::check_form(const std::string &again)
{
    const char *origin = request.header("Origin");
    const bool is_ours = !origin || origin == base;
    if (is_ours && !id.empty() && equal_in_constant_time(form("form"), service.sessions.form_token(id)))
        return true;
    show(403, Text::FORM_TITLE, paragraph(say(Text::FORM_TEXT)) + paragraph(link(again, say(Text::OPEN_AGAIN))));
    return false;
}

FormErrors errors_for_wait(Visit &visit, int seconds)
{
    visit.request.set_header("Retry-After", std::to_string(seconds));
    const bool is_long = seconds > 120;
    const std::string count = std::to_string(is_long ? (seconds + 59) / 60 : seconds);
    return {429, visit.say(is_long ? Text::WAIT_MINUTES : Text::WAIT_SECONDS, {count}), "", ""};
}

std::string sign_in_fields(const Visit &visit, const FormErrors &errors)
{
    return alert(errors.form) +
           field({"email", "email", "username", visit.say(Text::EMAIL), visit.form("email"), "", errors.email}) +
           field({"password", "password", "current-password", visit.say(Text::PASSWORD), "", "", errors.password});
}

void sign_in_by_form(Visit &visit, const std::function<void(const FormErrors &)> &again,
                     const std::function<void()> &done)
{
    const std::string email = visit.form("email"), password = visit.form("password");
    FormErrors errors{422};
    if (email.empty())
        errors.email = visit.say(Text::NEED_EMAIL);
    if (password.empty())
        errors.password = visit.say(Text::NEED_PASSWORD);
    if (email.empty() || password.empty())
        return again(errors);
    auto check = std::make_shared<PasswordCheck>();
    const Account *known = visit.service.accounts.authorize(email, password, *check);
    if (known) {
        visit.sign_in(*known);
        return done();
    }
    const std::string who = "account " + check->email, where = "address " + visit.network;
    if (const int seconds = visit.service.attempts.begin(who, where))
        return again(errors_for_wait(visit, seconds));
    in_thread(
        visit.request, [check] { check->run(); },
        [kept = visit.shared_from_this(), &visit, check, who, where, again, done] {
            const Account *right = visit.service.accounts.settle(*check);
            if (!right)
                return again({422, "", "", visit.say(Text::WRONG_PASSWORD)});
            visit.service.attempts.succeeded(who, where);
            visit.sign_in(*right);
            done();
        },
        &visit.service.hashers);
}

static void page_home(Visit &visit)
{
    visit.redirect("/m");
}

static void page_complete(Visit &visit)
{
    if (visit.request.query_field("not_approved") == "true")
        return visit.show(200, Text::DECLINED_TITLE, paragraph(visit.say(Text::DECLINED_TEXT)));
    visit.show(200, Text::COMPLETE_TITLE, paragraph(visit.say(Text::COMPLETE_TEXT)));
}

static void page_terms(Visit &visit)
{
    std::string content;
    for (const Text text : {Text::TERMS_WHO, Text::TERMS_FILES, Text::TERMS_USE, Text::TERMS_WARRANTY})
        content += paragraph(visit.say(text));
    visit.show(200, Text::TERMS, content);
}

static void answer_asset(Request &request, const char *type, const char *text)
{
    request.set_header("Cache-Control", "max-age=600");
    request.set_header("X-Content-Type-Options", "nosniff");
    request.answer(200, type, text);
}

static void page_style(Visit &visit)
{
    answer_asset(visit.request, "text/css; charset=utf-8", PAGE_CSS);
}

static void page_mark(Visit &visit)
{
    answer_asset(visit.request, "image/svg+xml", PAGE_MARK);
}

static const struct Place {
    const char *path;
    void (*show)(Visit &visit);
    bool takes_forms;
} PLACES[] = {{"/1/oauth/authorize", page_authorize, true},
              {"/m/register", page_register, true},
              {"/m", page_account, true},
              {"/auth_complete", page_complete, false},
              {"/terms", page_terms, false},
              {"/page.css", page_style, false},
              {"/mark.svg", page_mark, false},
              {"/", page_home, false}};

static const Place *place_of(const Request &request)
{
    for (const Place &place : PLACES)
        if (request.target_path() == place.path)
            return &place;
    return nullptr;
}

static bool is_reading(const Request &request)
{
    return request.is("GET") || request.is("HEAD");
}

// Clients that look for WebDAV at "/" find nothing there.
bool is_page(const Request &request)
{
    return place_of(request) && (request.target_path() != "/" || is_reading(request));
}

int page_refusal(Request &request)
{
    const bool takes_forms = place_of(request)->takes_forms;
    if (!is_reading(request) && !(takes_forms && request.is("POST"))) {
        request.set_header("Allow", takes_forms ? "GET, HEAD, POST" : "GET, HEAD");
        return 405;
    }
    if (request.body_length() > static_cast<int64_t>(FORM_AT_MOST))
        return 413;
    const char *type = request.header("Content-Type");
    static const char FORM_TYPE[] = "application/x-www-form-urlencoded";
    return request.is("POST") && (!type || g_ascii_strncasecmp(type, FORM_TYPE, sizeof FORM_TYPE - 1) != 0) ? 415 : 0;
}

void page_request(Request &request)
{
    const auto visit = std::make_shared<Visit>(request);
    place_of(request)->show(*visit);
}

bool wants_page(const Request &request)
{
    const char *accepted = request.header("Accept");
    return is_reading(request) && accepted && std::strstr(accepted, "text/html");
}

void page_missing(Request &request)
{
    Visit visit(request);
    visit.show(404, Text::MISSING_TITLE,
               paragraph(visit.say(Text::MISSING_TEXT)) +
                   paragraph(link(visit.local("/m"), visit.say(Text::TO_ACCOUNT))));
}
