#pragma once
// A view in a window of its own, and what it has said.
#include "driver.h"
#include "webview/ewk.h"
#include <string>

struct Visit {
    Evas_Object *window = nullptr, *view = nullptr;
    std::string said, delete_at;

    Visit(const std::string &base, const std::string &ca_file = "");
    ~Visit();
    Visit(const Visit &) = delete;
    Visit &operator=(const Visit &) = delete;
    // Whether this is what comes to be said, after what was taken before.
    bool says(const std::string &words, double seconds = 10);
    bool load(const std::string &address, const std::string &words, double seconds = 10);
};
