#pragma once
// What the tests of the platform's libraries share.
#include "base/base.h"
#include <chrono>
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <unistd.h>

// Each test has a home of its own, so that no test sees another one's databases.
class PlatformTest : public testing::Test {
  protected:
    std::filesystem::path home;

    void SetUp() override
    {
        char name[] = "/tmp/platform-test-XXXXXX";
        home = mkdtemp(name);
        setenv("PLATFORM_DATA_DIR", (home / "data").c_str(), 1);
        setenv("XDG_CACHE_HOME", (home / "cache").c_str(), 1);
    }

    void TearDown() override
    {
        std::filesystem::remove_all(home);
    }

    void write(const std::filesystem::path &name, const std::string &text) const
    {
        std::filesystem::create_directories((home / name).parent_path());
        std::ofstream(home / name, std::ios::binary) << text;
    }
};

inline std::string taken(char *text)
{
    const CString owner(text);
    return text ? text : "(null)";
}

inline double milliseconds_since(std::chrono::steady_clock::time_point start)
{
    return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count();
}
