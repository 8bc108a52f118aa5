#pragma once
// What the service shows to people with a browser.
#include "http.h"
#include "page_html.h"

// One request for a page, and what it tells of who asks. It lives as long as its answer takes.
struct Visit : std::enable_shared_from_this<Visit> {
    Request &request;
    Service &service;
    Language language = Language::EN;
    std::string base;           // "https://cloud.example.org"; empty when the request does not tell
    std::string network;        // of the client
    std::string id;             // of the browser; empty when it has none yet
    Account *account = nullptr; // that is signed in; borrowed
    bool is_new_id = false;     // the browser has to be told

    explicit Visit(Request &asked);
    bool is_post() const
    {
        return request.is("POST");
    }
    std::string form(const char *name) const
    {
        return request.form_field(name);
    }
    // An address of ours in the language of this page; `path` may have a query.
    std::string local(const std::string &path) const;
    std::string say(Text text, std::initializer_list<std::string> typed = {}) const
    {
        return ::say(text, language, typed);
    }
    std::string callback() const;
    // Whether a form that came was shown to this browser by us. If not that was answered; `again` is the page that
    // shows it.
    bool check_form(const std::string &again);
    // A form that posts to the address, with the token that proves that.
    std::string form_of(const std::string &address, const std::string &fields);

    void show(int status, Text title, const std::string &content);
    void redirect(const std::string &address);
    void sign_in(const Account &signed_in);
    void sign_out();

  private:
    void set_headers();
};

// What was wrong with a form: HTML, empty where nothing was.
struct FormErrors {
    int status = 200;
    std::string form, email, password;
};
// For somebody who has tried too often.
FormErrors errors_for_wait(Visit &visit, int seconds);
// The fields of a sign-in form; the address is filled in.
std::string sign_in_fields(const Visit &visit, const FormErrors &errors);
// Reads such a form. `done` runs once somebody is signed in, else `again` with what was wrong.
void sign_in_by_form(Visit &visit, const std::function<void(const FormErrors &errors)> &again,
                     const std::function<void()> &done);

bool is_page(const Request &request);
// A refusal that needs no body, or 0.
int page_refusal(Request &request);
// Answers with a page, once the body is there.
void page_request(Request &request);
// Whether somebody with a browser asks for what there is not, and the answer to that.
bool wants_page(const Request &request);
void page_missing(Request &request);

void page_authorize(Visit &visit);
// Where to go on after a registration: an address of page_authorize, else "/m".
std::string safe_continuation(const Visit &visit, const std::string &wanted);
void page_register(Visit &visit);
void page_account(Visit &visit);
