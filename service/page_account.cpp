// The page of a person's own account: storage, and the devices that are signed in.
#include "pages.h"

static void show_sign_in(Visit &visit, const FormErrors &errors)
{
    std::string content = visit.form_of(visit.local("/m"), sign_in_fields(visit, errors) +
                                                               button(visit.say(Text::SIGN_IN), "signin", "main"));
    if (visit.service.site.registers)
        content += paragraph(visit.say(Text::NO_ACCOUNT) + " " +
                                 link(visit.local("/m/register"), visit.say(Text::CREATE_ACCOUNT)),
                             "aside");
    visit.show(errors.status, Text::SIGN_IN, content);
}

static std::string device_row(Visit &visit, const Device &device)
{
    const std::string id = std::to_string(device.id);
    const std::string name = device.name.empty() ? text_of(Text::UNNAMED_DEVICE, visit.language) : device.name;
    const std::string used = device.used ? visit.say(Text::LAST_USED, {date_text(device.used, true, visit.language)})
                                         : visit.say(Text::NEVER_USED);
    return "<li>\n<div><strong id=\"d" + id + "\"><bdi>" + escape(name) + "</bdi></strong>\n<span>" +
           visit.say(Text::SINCE, {date_text(device.issued, false, visit.language)}) + "</span>\n<span>" + used +
           "</span></div>\n" +
           visit.form_of(visit.local("/m"), "<input type=\"hidden\" name=\"device\" value=\"" + id +
                                                "\">\n<button name=\"action\" value=\"device\" class=\"soft\" id=\"b" +
                                                id + "\" aria-labelledby=\"b" + id + " d" + id + "\">" +
                                                visit.say(Text::SIGN_OUT) + "</button>\n") +
           "</li>\n";
}

static void show_account(Visit &visit)
{
    const Account &account = *visit.account;
    const std::string stored = std::to_string(account.stored()), quota = std::to_string(account.quota);
    std::string content = paragraph("<bdi>" + escape(account.email) + "</bdi>", "who");
    content += "<h2 id=\"storage\">" + visit.say(Text::STORAGE) +
               "</h2>\n<progress aria-labelledby=\"storage\" aria-describedby=\"used\" max=\"" + quota + "\" value=\"" +
               stored + "\"></progress>\n<p id=\"used\">" +
               visit.say(Text::USED_OF,
                         {size_text(account.stored(), visit.language), size_text(account.quota, visit.language)}) +
               "</p>\n<h2>" + visit.say(Text::DEVICES) + "</h2>\n";
    std::string rows;
    for (const Device &device : visit.service.accounts.devices(account))
        rows += device_row(visit, device);
    content += rows.empty() ? paragraph(visit.say(Text::NO_DEVICES)) : "<ul>\n" + rows + "</ul>\n";
    content += visit.form_of(visit.local("/m"), button(visit.say(Text::SIGN_OUT_HERE), "leave", "bare"));
    visit.show(200, Text::ACCOUNT, content);
}

void page_account(Visit &visit)
{
    if (!visit.is_post())
        return visit.account ? show_account(visit) : show_sign_in(visit, {});
    if (!visit.check_form(visit.local("/m")))
        return;
    const std::string action = visit.form("action");
    if (action == "device" && visit.account)
        visit.service.accounts.sign_out(*visit.account, g_ascii_strtoll(visit.form("device").c_str(), nullptr, 10));
    if (action == "leave")
        visit.sign_out();
    if (action != "signin")
        return visit.redirect(visit.local("/m"));
    sign_in_by_form(
        visit, [&visit](const FormErrors &errors) { show_sign_in(visit, errors); },
        [&visit] { visit.redirect(visit.local("/m")); });
}
