// The same as pages.hpp for the libraries and the service that draw nothing.
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
