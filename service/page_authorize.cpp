// The page on which a person lets a device sign in.
#include "pages.h"

namespace {
// What the address of the page says.
struct Asked {
    std::string token, callback;
    std::string address; // of this page, again
};
} // namespace

static void show_sign_in(Visit &visit, const Asked &asked, const FormErrors &errors)
{
    const RequestToken *token = visit.service.request_tokens.find_waiting(asked.token);
    std::string content = paragraph(token && !token->device.empty() ? visit.say(Text::SIGN_IN_FOR, {token->device})
                                                                    : visit.say(Text::SIGN_IN_FOR_UNNAMED));
    content += visit.form_of(asked.address, sign_in_fields(visit, errors) +
                                                button(visit.say(Text::SIGN_IN), "signin", "main") +
                                                button(visit.say(Text::CANCEL), "decline", "soft"));
    if (visit.service.site.registers)
        content += paragraph(
            visit.say(Text::NO_ACCOUNT) + " " +
                link(visit.local("/m/register?cont=" + encode(asked.address)), visit.say(Text::CREATE_ACCOUNT)),
            "aside");
    visit.show(errors.status, Text::SIGN_IN, content);
}

static void show_approval(Visit &visit, const Asked &asked, const RequestToken &token)
{
    const std::string device = token.device.empty() ? text_of(Text::UNNAMED_DEVICE, visit.language) : token.device;
    std::string content = "<dl>\n<div><dt>" + visit.say(Text::DEVICE) + "</dt><dd><bdi>" + escape(device) +
                          "</bdi></dd></div>\n<div><dt>" + visit.say(Text::ACCOUNT_NAME) + "</dt><dd><bdi>" +
                          escape(visit.account->email) + "</bdi></dd></div>\n</dl>\n";
    if (token.network != visit.network)
        content += paragraph(visit.say(Text::OTHER_NETWORK), "warning");
    content += paragraph(visit.say(Text::APPROVE_WHAT)) + paragraph(visit.say(Text::APPROVE_WARNING));
    content += visit.form_of(asked.address, button(visit.say(Text::ALLOW), "approve", "main") +
                                                button(visit.say(Text::DECLINE), "decline", "soft") +
                                                button(visit.say(Text::NOT_YOU), "other", "bare"));
    visit.show(200, Text::APPROVE_TITLE, content);
}

static void answer_form(Visit &visit, const Asked &asked, RequestToken &token)
{
    const std::string action = visit.form("action");
    if (action == "decline") {
        visit.service.request_tokens.remove(asked.token);
        return visit.redirect(asked.callback + "?not_approved=true");
    }
    if (action == "approve" && visit.account) {
        token.account = visit.account->id;
        return visit.redirect(asked.callback + "?oauth_token=" + encode(asked.token) +
                              "&uid=" + std::to_string(visit.account->id));
    }
    if (action == "other")
        visit.sign_out();
    if (action != "signin")
        return visit.redirect(asked.address);
    sign_in_by_form(
        visit, [&visit, asked](const FormErrors &errors) { show_sign_in(visit, asked, errors); },
        [&visit, asked] { visit.redirect(asked.address); });
}

void page_authorize(Visit &visit)
{
    Asked asked{visit.request.query_field("oauth_token"), visit.request.query_field("oauth_callback"), ""};
    asked.address = visit.local("/1/oauth/authorize?oauth_token=" + encode(asked.token) +
                                "&oauth_callback=" + encode(asked.callback));
    // Compared as a whole: what only begins like ours may be somebody else's.
    if (asked.callback.empty() || asked.callback != visit.callback())
        return visit.show(400, Text::CALLBACK_TITLE, paragraph(visit.say(Text::CALLBACK_TEXT)));
    RequestToken *token = visit.service.request_tokens.find_waiting(asked.token);
    if (!token)
        return visit.show(410, Text::GONE_TITLE, paragraph(visit.say(Text::GONE_TEXT)));
    if (visit.is_post())
        return visit.check_form(asked.address) ? answer_form(visit, asked, *token) : void();
    if (visit.account)
        return show_approval(visit, asked, *token);
    show_sign_in(visit, asked, {});
}
