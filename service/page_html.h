#pragma once
// The pieces that pages are made of. Everything that comes from people is escaped here.
#include "page_texts.h"
#include <cstdint>
#include <initializer_list>
#include <string>

// A style sheet, and the mark of the service as an SVG.
extern const char PAGE_CSS[], PAGE_MARK[];

// Text as it may stand between tags and in quoted attributes.
std::string escape(const std::string &text);
// The text in HTML, with what people have typed in place of %1 and %2; it keeps its own direction of writing.
std::string say(Text text, Language language, std::initializer_list<std::string> typed = {});
// A value for a query or a form.
std::string encode(const std::string &text);

std::string paragraph(const std::string &html, const char *style = nullptr);
// A message that screen readers speak at once; nothing for an empty one.
std::string alert(const std::string &html);
std::string link(const std::string &address, const std::string &html);
std::string button(const std::string &html, const char *action, const char *style);

// A labelled input of a form.
struct Field {
    const char *name, *type, *autocomplete;
    std::string label, value;
    std::string hint, error; // HTML; empty: none
};
std::string field(const Field &one);

// A document around the content, which is HTML.
std::string document(Language language, const std::string &title, const std::string &content);

// "1.5 GB", in powers of 1024.
std::string size_text(int64_t bytes, Language language);
// A date, with the time if `is_exact`, in UTC.
std::string date_text(int64_t seconds, bool is_exact, Language language);
