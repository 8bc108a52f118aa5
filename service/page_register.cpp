// The page on which a person makes an account.
#include "pages.h"
#include "secrets.h"
#include <algorithm>

static const glong PASSWORD_LEAST = 8;
static const size_t PASSWORD_MOST = 256; // bytes; the hash takes no more than 511
// What one address may do: so many accounts at once and one more after so many seconds; and so many attempts, each of
// which may tell whether there is an account.
static const double ACCOUNTS_AT_ONCE = 5, SECONDS_PER_ACCOUNT = 720, ATTEMPTS_AT_ONCE = 20, SECONDS_PER_ATTEMPT = 30;

std::string safe_continuation(const Visit &visit, const std::string &wanted)
{
    static const std::string PLACE = "/1/oauth/authorize?";
    const bool is_whole = !visit.base.empty() && wanted.starts_with(visit.base + PLACE);
    const std::string path = is_whole ? wanted.substr(visit.base.size()) : wanted;
    const bool is_plain = std::all_of(path.begin(), path.end(), [](char c) {
        return c > ' ' && c < 127 && c != '\\' && c != '"' && c != '<' && c != '>' && c != '#';
    });
    return path.starts_with(PLACE) && is_plain ? path : "/m";
}

// Where somebody who has an account goes instead.
static std::string sign_in_address(const Visit &visit, const std::string &cont)
{
    return cont == "/m" ? visit.local(cont) : cont;
}

static std::string lower(const std::string &text)
{
    const std::unique_ptr<char, decltype(&g_free)> folded(g_utf8_casefold(text.c_str(), -1), g_free);
    return folded.get();
}

// What everybody would try first. Passwords of one repeated character count as well.
static bool is_common(const std::string &password)
{
    static const char *const COMMON[] = {
        "password", "password1",  "password123", "passw0rd",   "12345678",  "123456789", "1234567890",
        "87654321", "0123456789", "qwertyui",    "qwertyuiop", "qwerty123", "asdfghjk",  "asdfghjkl",
        "1q2w3e4r", "1qaz2wsx",   "abcd1234",    "abc12345",   "iloveyou",  "sunshine",  "princess",
        "football", "baseball",   "superman",    "trustno1",   "letmein1",  "welcome1",  "passwort",
        "hallo123", "motdepasse", "azertyuiop",  "contraseña", "a1b2c3d4",  "admin123",  "administrator"};
    return std::any_of(std::begin(COMMON), std::end(COMMON), [&](const char *one) { return password == one; }) ||
           password.find_first_not_of(password[0]) == std::string::npos;
}

static std::string wrong_with_password(const Visit &visit, const std::string &email, const std::string &password)
{
    if (password.empty())
        return visit.say(Text::NEED_PASSWORD);
    if (g_utf8_strlen(password.c_str(), -1) < PASSWORD_LEAST)
        return visit.say(Text::PASSWORD_SHORT);
    if (password.size() > PASSWORD_MOST)
        return visit.say(Text::PASSWORD_LONG);
    const std::string plain = lower(password), address = lower(email);
    if (plain == address || plain == address.substr(0, address.find('@')))
        return visit.say(Text::PASSWORD_LIKE_EMAIL);
    return is_common(plain) ? visit.say(Text::PASSWORD_COMMON) : "";
}

static void show_form(Visit &visit, const std::string &cont, const FormErrors &errors)
{
    const std::string own = visit.local("/m/register?cont=" + encode(cont));
    const std::string fields =
        alert(errors.form) +
        field({"email", "email", "username", visit.say(Text::EMAIL), visit.form("email"), "", errors.email}) +
        field({"password", "password", "new-password", visit.say(Text::PASSWORD), "", visit.say(Text::PASSWORD_RULE),
               errors.password}) +
        button(visit.say(Text::CREATE_ACCOUNT), "register", "main");
    visit.show(errors.status, Text::CREATE_ACCOUNT,
               visit.form_of(own, fields) + paragraph(visit.say(Text::HAVE_ACCOUNT) + " " +
                                                          link(sign_in_address(visit, cont), visit.say(Text::SIGN_IN)),
                                                      "aside"));
}

static FormErrors taken(const Visit &visit, const std::string &cont)
{
    return {422, "",
            visit.say(Text::TAKEN) + " " + link(sign_in_address(visit, cont), visit.say(Text::SIGN_IN_INSTEAD)), ""};
}

static void make_account(Visit &visit, const std::string &email, const std::string &password, const std::string &cont)
{
    auto hash = std::make_shared<std::string>();
    in_thread(
        visit.request, [hash, password] { *hash = password_hash(password); },
        [kept = visit.shared_from_this(), &visit, hash, email, cont] {
            Accounts &accounts = visit.service.accounts;
            const Accounts::Made made = accounts.make(email, *hash);
            if (made == Accounts::Made::TAKEN)
                return show_form(visit, cont, taken(visit, cont));
            const Account *account = made == Accounts::Made::YES ? accounts.find(email) : nullptr;
            if (!account)
                return visit.show(500, Text::FAILED_TITLE, paragraph(visit.say(Text::FAILED_TEXT)));
            visit.sign_in(*account);
            visit.redirect(cont);
        },
        &visit.service.hashers);
}

static void answer_form(Visit &visit, const std::string &cont)
{
    const std::string email = visit.form("email"), password = visit.form("password");
    FormErrors errors{422, "", "", wrong_with_password(visit, email, password)};
    if (email.empty())
        errors.email = visit.say(Text::NEED_EMAIL);
    else if (!valid_email(email) || plain_text(email, static_cast<long>(email.size())) != email)
        errors.email = visit.say(Text::BAD_EMAIL);
    if (!errors.email.empty() || !errors.password.empty())
        return show_form(visit, cont, errors);
    Attempts &attempts = visit.service.attempts;
    if (const int seconds = attempts.take("register " + visit.network, ATTEMPTS_AT_ONCE, SECONDS_PER_ATTEMPT))
        return show_form(visit, cont, errors_for_wait(visit, seconds));
    if (visit.service.accounts.exists(email))
        return show_form(visit, cont, taken(visit, cont));
    if (const int seconds = attempts.take("accounts " + visit.network, ACCOUNTS_AT_ONCE, SECONDS_PER_ACCOUNT))
        return show_form(visit, cont, errors_for_wait(visit, seconds));
    make_account(visit, email, password, cont);
}

void page_register(Visit &visit)
{
    const std::string cont = safe_continuation(visit, visit.request.query_field("cont"));
    if (!visit.service.site.registers)
        return visit.show(403, Text::CLOSED_TITLE,
                          paragraph(visit.say(Text::CLOSED_TEXT)) +
                              paragraph(link(sign_in_address(visit, cont), visit.say(Text::SIGN_IN)), "aside"));
    if (!visit.is_post())
        return show_form(visit, cont, {});
    if (visit.check_form(visit.local("/m/register?cont=" + encode(cont))))
        answer_form(visit, cont);
}
