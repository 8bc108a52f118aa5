// The same as pages.hpp for the larger test programs.
#include "network.hpp"
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <thread>
