#pragma once
// The platform log.

enum log_priority {
    DLOG_VERBOSE = 2,
    DLOG_DEBUG = 3,
    DLOG_INFO = 4,
    DLOG_WARN = 5,
    DLOG_ERROR = 6,
    DLOG_FATAL = 7,
};

int __dlog_print(int priority, const char *tag, const char *format, ...) __attribute__((format(printf, 3, 4)));

typedef void (*dlog_sink)(int priority, const char *tag, const char *text, void *data);
void dlog_set_sink(dlog_sink sink, void *data);
