/// @file
/// What the fuzz targets share. A target reads its input as a list of choices, follows them, and
/// compares the library with a model by GoogleTest's checks; a check that fails ends the run.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include <fuzzer/FuzzedDataProvider.h>
#include <gtest/gtest.h>

#include "kzsdk/abs/memory.h"

namespace kz::fuzz {

using Choices = FuzzedDataProvider;

/// The target: follows the choices.
void run(Choices& choices);

/// True once in `n` times.
inline bool one_in(Choices& choices, uint32_t n)
{
    return choices.ConsumeIntegralInRange<uint32_t>(0, n - 1) == n - 1;
}

/// A copy that ends where its heap block ends and begins `offset` bytes into it, so that a read
/// outside it is detected and nothing relies on its alignment.
class Copy {
public:
    Copy(const void* bytes, size_t count, size_t offset)
        : block_(new uint8_t[count + offset]), offset_(offset)
    {
        if (count > 0) {
            std::memcpy(block_.get() + offset, bytes, count);
        }
    }
    const uint8_t* data() const { return block_.get() + offset_; }

private:
    std::unique_ptr<uint8_t[]> block_;
    size_t offset_;
};

} // namespace kz::fuzz
