#include "backend.h"
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
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
    std::mt19937_64 random(seed);
    std::string bytes(size, '\0');
    for (size_t at = 0; at < size; at += sizeof(uint64_t)) {
        const uint64_t word = random();
        std::memcpy(bytes.data() + at, &word, std::min(sizeof word, size - at));
    }
    return bytes;
}
