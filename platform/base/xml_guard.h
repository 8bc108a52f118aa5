#pragma once
// Looks at XML before a parser does, for what makes parsers slow. libxml2 compares each attribute of an element with
// all the others, and each prefix with all namespaces in sight: a few hundred kilobytes keep it busy for a minute.
#include <cstddef>

class XmlGuard {
  public:
    // More of the document, in pieces of any size. False as soon as an element has more than 64 attributes or is within
    // more than 64 others, a tag is longer than 64 KiB, or the text is in no encoding that extends ASCII; the parser
    // must be told to ignore the encoding that the document names. Any thread, one at a time.
    bool feed(const char *bytes, size_t size);

  private:
    enum class Place { TEXT, TAG, SINGLE_QUOTES, DOUBLE_QUOTES, COMMENT, CDATA, INSTRUCTION };
    bool step(char c);
    void enter_tag(char c);
    bool leave_tag();
    bool ends_with(const char *text) const;

    Place place = Place::TEXT;
    size_t length = 0;  // of the tag so far, without its "<"
    char start[9] = {}; // its first characters
    char last[3] = {};  // of the document
    unsigned attributes = 0, depth = 0;
    bool is_empty = true, is_bad = false;
};
