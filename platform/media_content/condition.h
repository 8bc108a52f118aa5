#pragma once
// Parsing of filter texts into parameterised SQL; for media_content.cpp.
#include "media_content/media_content.h"
#include <optional>
#include <string>
#include <variant>
#include <vector>

struct MediaCondition {
    std::string sql; // an expression of fixed words and parameters ?1, ?2, ...
    std::vector<std::variant<long long, std::string>> values;
    std::string path; // that MEDIA_PATH is compared with, or empty
};

// Nothing when the text breaks the grammar of media_filter_set_condition.
std::optional<MediaCondition> media_parse_condition(const char *text, media_content_collation_e collate);
// The words behind ORDER BY, or nothing when the text breaks the grammar of media_filter_set_order.
std::optional<std::string> media_parse_order(const char *keywords, media_content_order_e order,
                                             media_content_collation_e collate);
