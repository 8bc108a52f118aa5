#pragma once
// A launch request as one text, so that it can be stored and sent.
#include <string>

struct app_bundle {
    // A dictionary a{sv} in GVariant's text format. It is plain ASCII without NUL: other bytes are escaped.
    std::string text;
};
typedef app_bundle bundle;
