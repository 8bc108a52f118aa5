#pragma once
// What tests of all kinds share: folders and files of their own, a home for the platform's libraries, and the log.
#include "dlog/dlog.h"
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <string>
#include <thread>

inline void write_file(const std::filesystem::path &path, const std::string &bytes)
{
    std::ofstream(path, std::ios::binary) << bytes;
}

// An empty folder; it goes away with its owner.
struct TempFolder {
    std::string path = (std::filesystem::temp_directory_path() / "velora-test-XXXXXX").string();

    TempFolder()
    {
        if (!mkdtemp(path.data()))
            std::abort();
    }
    TempFolder(const TempFolder &) = delete;
    TempFolder &operator=(const TempFolder &) = delete;
    ~TempFolder()
    {
        std::error_code ignored;
        std::filesystem::remove_all(path, ignored);
    }
    std::filesystem::path operator/(const std::string &name) const
    {
        return std::filesystem::path(path) / name;
    }
    // Writes a file, with the folders above it, and gives its path.
    std::string file(const std::string &name, const std::string &bytes) const
    {
        std::filesystem::create_directories((*this / name).parent_path());
        write_file(*this / name, bytes);
        return *this / name;
    }
};

// One in which all databases and caches of the test lie.
struct TempHome : TempFolder {
    TempHome()
    {
        setenv("PLATFORM_DATA_DIR", path.c_str(), 1);
        setenv("XDG_CACHE_HOME", (path + "/cache").c_str(), 1);
        setenv("CLOUD_SECRETS", "file", 1); // nobody's keyring
    }
};

inline std::string read_file(const std::filesystem::path &path)
{
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

// Takes a text that was given to the caller; "(null)" for none.
inline std::string taken(char *text)
{
    std::string result = text ? text : "(null)";
    free(text);
    return result;
}

// Looks every 5 ms; false when ten seconds have not been enough.
template <class Condition> bool comes_true(Condition condition)
{
    for (int i = 0; i < 2000 && !condition(); i++)
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    return condition();
}

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
