#pragma once
// What tests of the application's parts share: a home of their own for the platform's libraries, and the log.
#include "dlog/dlog.h"
#include <cstdlib>
#include <filesystem>
#include <mutex>
#include <string>

// An empty folder in which all databases and caches of the test lie; it goes away with its owner.
struct TempHome {
    std::string path = (std::filesystem::temp_directory_path() / "velora-test-XXXXXX").string();

    TempHome()
    {
        if (!mkdtemp(path.data()))
            std::abort();
        setenv("PLATFORM_DATA_DIR", path.c_str(), 1);
        setenv("XDG_CACHE_HOME", (path + "/cache").c_str(), 1);
    }
    TempHome(const TempHome &) = delete;
    TempHome &operator=(const TempHome &) = delete;
    ~TempHome()
    {
        std::error_code ignored;
        std::filesystem::remove_all(path, ignored);
    }
};

// Takes the log instead of standard error while it lives.
struct LogCatcher {
    LogCatcher()
    {
        dlog_set_sink(
            [](int, const char *, const char *text, void *data) {
                auto *self = static_cast<LogCatcher *>(data);
                const std::lock_guard guard(self->lock);
                self->all += std::string(text) + "\n";
            },
            this);
    }
    LogCatcher(const LogCatcher &) = delete;
    LogCatcher &operator=(const LogCatcher &) = delete;
    ~LogCatcher()
    {
        dlog_set_sink(nullptr, nullptr);
    }
    bool has(const std::string &text)
    {
        const std::lock_guard guard(lock);
        return all.find(text) != std::string::npos;
    }

  private:
    std::mutex lock;
    std::string all;
};
