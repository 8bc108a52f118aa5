#pragma once
// A launch request as one text, so that it can be stored and sent.
#include <string>

struct app_bundle {
    std::string text;
};
typedef app_bundle bundle;
