#pragma once
// A launch request as one text, so that it can be stored and sent: JSON-free key file, see bundle.cpp.
#include <string>

struct app_bundle {
    std::string text;
};
