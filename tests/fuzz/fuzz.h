#pragma once
// What the fuzz targets share: each is one function over bytes, which must not fault and must hold what its file says.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size);

// Ends the run with a fault that the fuzzer keeps the input of.
inline void must(bool holds)
{
    if (!holds)
        std::abort();
}
