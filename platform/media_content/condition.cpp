#include "media_content/condition.h"
#include <charconv>
#include <cstring>
#include <strings.h>

namespace {

struct Column {
    std::string_view name;
    const char *sql;
    bool is_text;
    bool folds_case;
};
constexpr Column COLUMNS[] = {{"MEDIA_TYPE", "type", false, false},
                              {"MEDIA_TIMELINE", "timeline", false, false},
                              {"MEDIA_PATH", "path", true, false},
                              {"MEDIA_DISPLAY_NAME", "name", true, true}};

const Column *find_column(std::string_view name)
{
    for (const Column &column : COLUMNS)
        if (column.name == name)
            return &column;
    return nullptr;
}

const char *collation(const Column &column, media_content_collation_e collate)
{
    return column.folds_case && collate == MEDIA_CONTENT_COLLATE_NOCASE ? " COLLATE NOCASE" : "";
}

bool is_letter(char c)
{
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
}

// Recursive descent; every method returns false at the first fault and nothing is read after that.
class Parser {
  public:
    Parser(const char *text, media_content_collation_e coll) : rest(text), collate(coll) {}

    bool parse()
    {
        return condition(0) && (skip_spaces(), rest.empty());
    }

    MediaCondition result;

  private:
    static constexpr int DEEPEST = 32;
    std::string_view rest;
    media_content_collation_e collate;

    void skip_spaces()
    {
        rest.remove_prefix(std::min(rest.find_first_not_of(" \t"), rest.size()));
    }

    bool take(char c)
    {
        skip_spaces();
        if (rest.empty() || rest.front() != c)
            return false;
        rest.remove_prefix(1);
        return true;
    }

    std::string_view peek_word()
    {
        skip_spaces();
        size_t length = 0;
        while (length < rest.size() && is_letter(rest[length]))
            length++;
        return rest.substr(0, length);
    }

    bool take_word(std::string_view word)
    {
        const std::string_view next = peek_word();
        if (next.size() != word.size() || strncasecmp(next.data(), word.data(), word.size()) != 0)
            return false;
        rest.remove_prefix(word.size());
        return true;
    }

    bool condition(int depth)
    {
        if (!both(depth))
            return false;
        while (take_word("OR")) {
            result.sql += " OR ";
            if (!both(depth))
                return false;
        }
        return true;
    }

    bool both(int depth)
    {
        if (!comparison(depth))
            return false;
        while (take_word("AND")) {
            result.sql += " AND ";
            if (!comparison(depth))
                return false;
        }
        return true;
    }

    bool comparison(int depth)
    {
        if (take('(')) {
            result.sql += '(';
            if (depth >= DEEPEST || !condition(depth + 1) || !take(')'))
                return false;
            result.sql += ')';
            return true;
        }
        const std::string_view word = peek_word();
        const Column *column = find_column(word);
        if (!column)
            return false;
        rest.remove_prefix(word.size());
        if (!take('=') || !(column->is_text ? text(*column) : number()))
            return false;
        result.sql += std::string(column->sql) + " = ?" + std::to_string(result.values.size());
        result.sql += collation(*column, collate);
        return true;
    }

    bool number()
    {
        skip_spaces();
        long long value = 0;
        const auto [end, error] = std::from_chars(rest.data(), rest.data() + rest.size(), value);
        if (error != std::errc() || (end < rest.data() + rest.size() && is_letter(*end)))
            return false;
        rest.remove_prefix(static_cast<size_t>(end - rest.data()));
        result.values.emplace_back(value);
        return true;
    }

    bool text(const Column &column)
    {
        if (!take('\''))
            return false;
        const size_t last = rest.rfind('\'');
        if (last == rest.npos || rest.find_first_not_of(") \t", last + 1) != rest.npos)
            return false;
        const std::string value(rest.substr(0, last));
        rest.remove_prefix(last + 1);
        if (column.name == "MEDIA_PATH")
            result.path = value;
        result.values.emplace_back(value);
        return true;
    }
};

} // namespace

std::optional<MediaCondition> media_parse_condition(const char *text, media_content_collation_e collate)
{
    Parser parser(text, collate);
    if (!parser.parse())
        return std::nullopt;
    return parser.result;
}

std::optional<std::string> media_parse_order(const char *keywords, media_content_order_e order,
                                             media_content_collation_e collate)
{
    std::string sql;
    std::string_view rest = keywords;
    for (bool more = true; more;) {
        const size_t comma = rest.find(',');
        more = comma != rest.npos;
        std::string_view word = rest.substr(0, comma);
        rest.remove_prefix(more ? comma + 1 : rest.size());
        word.remove_prefix(std::min(word.find_first_not_of(" \t"), word.size()));
        word = word.substr(0, word.find_last_not_of(" \t") + 1);
        const Column *column = find_column(word);
        if (!column)
            return std::nullopt;
        sql += sql.empty() ? "" : ", ";
        sql += std::string(column->sql) + collation(*column, collate);
        sql += order == MEDIA_CONTENT_ORDER_DESC ? " DESC" : " ASC";
    }
    return sql;
}
