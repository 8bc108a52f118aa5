// What most sources of the application's pages begin with, compiled once for each of the larger libraries. Every source
// still includes what it uses: a build with -Db_pch=false tells where one does not.
#include <Elementary.h>
#include <algorithm>
#include <chrono>
#include <cstring>
#include <functional>
#include <glib.h>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>
