#pragma once
// Dates as HTTP writes them (RFC 9110, 5.6.7).
#include <cstdint>
#include <string>

// Nanoseconds since 1970.
std::string http_date(int64_t nanoseconds);
// The current second's. Main loop only.
const std::string &http_date_now();
// The date in seconds since 1970; -1 when the text (null is allowed) is none.
int64_t http_date_read(const char *text);
