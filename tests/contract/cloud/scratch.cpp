#include "backend.h"
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <random>

Scratch::Scratch()
{
    char dir[] = "/tmp/cloud-test-XXXXXX";
    path = mkdtemp(dir) ? dir : "";
    if (path.empty())
        std::abort();
}

Scratch::~Scratch()
{
    std::error_code ignored;
    std::filesystem::remove_all(path, ignored);
}

std::string Scratch::file(const std::string &name, const std::string &bytes) const
{
    std::ofstream(path + "/" + name, std::ios::binary) << bytes;
    return path + "/" + name;
}

std::string some_bytes(size_t size, unsigned seed)
{
    std::mt19937 random(seed);
    std::string bytes(size, '\0');
    for (char &byte : bytes)
        byte = static_cast<char>(random());
    return bytes;
}
