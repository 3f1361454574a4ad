/// @file
/// Reading from a place in a file.
#pragma once

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <limits>

#include <unistd.h>

namespace kz::disc {

static_assert(sizeof(off_t) == 8, "build with _FILE_OFFSET_BITS=64");

/// `read`, with a result that fits 32 bits.
inline int32_t read_here(int descriptor, void* buffer, uint32_t count) noexcept
{
    constexpr uint32_t kMax = std::numeric_limits<int32_t>::max();
    return static_cast<int32_t>(::read(descriptor, buffer, std::min(count, kMax)));
}

/// Moves to the offset and reads there. -1 on failure, with `errno` set: to 0 when the move went
/// elsewhere without an error of its own.
inline int32_t read_at(int descriptor, int64_t offset, void* buffer, uint32_t count) noexcept
{
    errno = 0;
    const int64_t place = ::lseek(descriptor, offset, SEEK_SET);
    if (place < 0 || place != offset) { // a failed move to -1 must not look like an arrival
        return -1;
    }
    return read_here(descriptor, buffer, count);
}

} // namespace kz::disc
