#include "page_html.h"
#include <ctime>
#include <glib.h>
#include <iterator>
#include <memory>

std::string escape(const std::string &text)
{
    std::string safe;
    for (const char c : text) {
        switch (c) {
        case '&':
            safe += "&amp;";
            break;
        case '<':
            safe += "&lt;";
            break;
        case '>':
            safe += "&gt;";
            break;
        case '"':
            safe += "&quot;";
            break;
        case '\'':
            safe += "&#39;";
            break;
        default:
            safe += c;
        }
    }
    return safe;
}

std::string say(Text text, Language language, std::initializer_list<std::string> typed)
{
    const std::string words = escape(text_of(text, language));
    std::string html;
    for (size_t i = 0; i < words.size(); i++) {
        const size_t nth = words[i] == '%' && i + 1 < words.size() ? static_cast<size_t>(words[i + 1] - '1') : 9;
        if (nth >= typed.size()) {
            html += words[i];
            continue;
        }
        html += "<bdi>" + escape(std::data(typed)[nth]) + "</bdi>";
        i++;
    }
    return html;
}

std::string encode(const std::string &text)
{
    const std::unique_ptr<char, decltype(&g_free)> encoded(g_uri_escape_string(text.c_str(), nullptr, FALSE), g_free);
    return encoded.get();
}

std::string paragraph(const std::string &html, const char *style)
{
    return std::string("<p") + (style ? std::string(" class=\"") + style + "\"" : "") + ">" + html + "</p>\n";
}

std::string alert(const std::string &html)
{
    return html.empty() ? "" : "<p class=\"alert\" role=\"alert\">" + html + "</p>\n";
}

std::string link(const std::string &address, const std::string &html)
{
    return "<a href=\"" + escape(address) + "\">" + html + "</a>";
}

std::string button(const std::string &html, const char *action, const char *style)
{
    return std::string("<button name=\"action\" value=\"") + action + "\" class=\"" + style + "\">" + html +
           "</button>\n";
}

std::string field(const Field &one)
{
    const std::string name = one.name;
    std::string described, html = "<div class=\"field\">\n<label for=\"" + name + "\">" + one.label + "</label>\n";
    if (!one.error.empty())
        described += name + "-error";
    if (!one.hint.empty())
        described += (described.empty() ? "" : " ") + name + "-hint";
    html += "<input id=\"" + name + "\" name=\"" + name + "\" type=\"" + one.type + "\" autocomplete=\"" +
            one.autocomplete + "\" autocapitalize=\"none\" spellcheck=\"false\" required value=\"" + escape(one.value) +
            "\"";
    if (!described.empty())
        html += " aria-describedby=\"" + described + "\"";
    if (!one.error.empty())
        html += " aria-invalid=\"true\" autofocus";
    html += ">\n";
    if (!one.error.empty())
        html += "<p class=\"error\" id=\"" + name + "-error\" role=\"alert\">" + one.error + "</p>\n";
    if (!one.hint.empty())
        html += "<p class=\"hint\" id=\"" + name + "-hint\">" + one.hint + "</p>\n";
    return html + "</div>\n";
}

std::string document(Language language, const std::string &title, const std::string &content)
{
    const std::string terms = std::string("/terms?cl=") + language_name(language);
    return std::string("<!DOCTYPE html>\n<html lang=\"") + language_tag(language) +
           "\">\n<head>\n<meta charset=\"utf-8\">\n"
           "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n"
           "<meta name=\"color-scheme\" content=\"light dark\">\n<title>" +
           title +
           " – Velora</title>\n<link rel=\"stylesheet\" href=\"/page.css\">\n"
           "<link rel=\"icon\" type=\"image/svg+xml\" href=\"/mark.svg\">\n</head>\n<body>\n<header>"
           "<img src=\"/mark.svg\" alt=\"\" width=\"40\" height=\"40\"><span>Velora</span></header>\n<main>\n<h1>" +
           title + "</h1>\n" + content + "</main>\n<footer><a href=\"" + terms +
           "\" target=\"_blank\" rel=\"noopener\">" + say(Text::TERMS, language) + "</a></footer>\n</body>\n</html>\n";
}

std::string size_text(int64_t bytes, Language language)
{
    static const char *const UNITS[] = {"B", "KB", "MB", "GB", "TB"};
    auto amount = static_cast<double>(bytes);
    size_t unit = 0;
    for (; amount >= 1000 && unit + 1 < std::size(UNITS); unit++)
        amount /= 1024;
    char text[32];
    const bool is_round = unit == 0 || amount >= 99.95 || amount == static_cast<double>(static_cast<int64_t>(amount));
    g_snprintf(text, sizeof text, is_round ? "%.0f" : "%.1f", amount);
    std::string number = text;
    if (const size_t point = number.find('.'); point != std::string::npos)
        number.replace(point, 1, text_of(Text::POINT, language));
    return number + "\u00a0" + UNITS[unit];
}

std::string date_text(int64_t seconds, bool is_exact, Language language)
{
    const auto moment = static_cast<time_t>(seconds);
    tm parts{};
    char text[64] = "";
    gmtime_r(&moment, &parts);
    const std::string format = text_of(Text::DATE, language) + std::string(is_exact ? " %H:%M UTC" : "");
    const size_t size = strftime(text, sizeof text, format.c_str(), &parts);
    return {text, size};
}
