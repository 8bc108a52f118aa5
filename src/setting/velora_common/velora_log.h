#pragma once
// Log lines of the application: "file: function(line) > message" under one tag.
#include "dlog/dlog.h"

// The part of a path after its last slash, worked out by the compiler for __FILE__.
constexpr const char *_velora_log_file(const char *path)
{
    const char *name = path;
    for (const char *c = path; *c; c++)
        if (*c == '/')
            name = c + 1;
    return name;
}

#define VELORA_LOGE(format, ...)                                                                                       \
    __dlog_print(DLOG_ERROR, "VELORA", "%s: %s(%d) > \033[0;31m* Critical * " format "\033[0;m",                       \
                 _velora_log_file(__FILE__), __func__, __LINE__ __VA_OPT__(, ) __VA_ARGS__)
#define VELORA_LOGI(format, ...)                                                                                       \
    __dlog_print(DLOG_INFO, "VELORA", "%s: %s(%d) > " format, _velora_log_file(__FILE__), __func__,                    \
                 __LINE__ __VA_OPT__(, ) __VA_ARGS__)
