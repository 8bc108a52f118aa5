#pragma once
// What the tests of the platform's libraries share.
#include "base/base.h"
#include "temp_home.h"
#include <chrono>
#include <gtest/gtest.h>
#include <unistd.h>
#include <vector>

// Each test has a home of its own, so that no test sees another one's databases.
class PlatformTest : public testing::Test {
  protected:
    TempHome home;
};

// Makes a database believe that its passing records were written before the machine's last start.
inline bool age_records(const char *database, const char *table)
{
    Db db;
    return db.open(platform_data_dir() + "/" + database, nullptr) &&
           db.run(("UPDATE " + std::string(table) + " SET boot = 'an earlier start' WHERE boot IS NOT NULL").c_str());
}

inline double milliseconds_since(std::chrono::steady_clock::time_point start)
{
    return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count();
}
