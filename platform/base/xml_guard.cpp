#include "base/xml_guard.h"
#include <cstring>

static constexpr unsigned ATTRIBUTES_MOST = 64, DEPTH_MOST = 64;
static constexpr size_t TAG_MOST = 64 << 10;

bool XmlGuard::feed(const char *bytes, size_t size)
{
    for (size_t i = 0; i < size && !is_bad; i++)
        is_bad = !step(bytes[i]);
    return !is_bad;
}

// Whether the last characters are these, of which there are at most three.
bool XmlGuard::ends_with(const char *text) const
{
    const size_t count = std::strlen(text);
    return std::memcmp(last + sizeof last - count, text, count) == 0;
}

void XmlGuard::enter_tag(char c)
{
    if (length < sizeof start)
        start[length] = c;
    length++;
    if (length == 1 && c == '?')
        place = Place::INSTRUCTION;
    else if (length == 3 && std::memcmp(start, "!--", 3) == 0)
        place = Place::COMMENT;
    else if (length == 8 && std::memcmp(start, "![CDATA[", 8) == 0)
        place = Place::CDATA;
    else if (c == '=')
        attributes++;
    else if (c == '\'')
        place = Place::SINGLE_QUOTES;
    else if (c == '"')
        place = Place::DOUBLE_QUOTES;
}

bool XmlGuard::leave_tag()
{
    place = Place::TEXT;
    const bool closes = start[0] == '/', is_declaration = start[0] == '!', stands_alone = last[1] == '/';
    if (closes)
        depth -= depth > 0;
    else if (!is_declaration && !stands_alone)
        depth++;
    return depth <= DEPTH_MOST;
}

bool XmlGuard::step(char c)
{
    // UTF-16 and UTF-32 have zeros; other families begin with neither "<", white space nor the mark of UTF-8.
    if (c == '\0' || (is_empty && !std::strchr("<\t\r\n \xEF", c)))
        return false;
    is_empty = false;
    std::memmove(last, last + 1, sizeof last - 1);
    last[sizeof last - 1] = c;
    switch (place) {
    case Place::TEXT:
        if (c == '<') {
            place = Place::TAG;
            length = attributes = 0;
            std::memset(start, 0, sizeof start);
        }
        return true;
    case Place::TAG:
        if (c == '>')
            return leave_tag();
        enter_tag(c);
        return attributes <= ATTRIBUTES_MOST && length <= TAG_MOST;
    case Place::SINGLE_QUOTES:
    case Place::DOUBLE_QUOTES:
        if (c == (place == Place::SINGLE_QUOTES ? '\'' : '"'))
            place = Place::TAG;
        return ++length <= TAG_MOST;
    case Place::COMMENT:
        if (ends_with("-->"))
            place = Place::TEXT;
        return true;
    case Place::CDATA:
        if (ends_with("]]>"))
            place = Place::TEXT;
        return true;
    case Place::INSTRUCTION:
        if (ends_with("?>"))
            place = Place::TEXT;
        return true;
    }
    return true;
}
