/// @file
/// Counts of levels, for each variant by itself: a variant's file must not share functions.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace {

/// Counts bytes. Equal ones that follow each other would wait for one another's counter, so there
/// are four counters of each.
class LevelCounters {
public:
    void count_all(const uint8_t* levels, size_t count) noexcept
    {
        size_t i = 0;
        for (; i + 8 <= count; i += 8) {
            uint64_t eight = 0;
            std::memcpy(&eight, levels + i, sizeof eight);
            for (size_t k = 0; k < 8; ++k, eight >>= 8) {
                ++counters_[k % 4][eight & 0xff];
            }
        }
        for (; i < count; ++i) {
            ++counters_[0][levels[i]];
        }
    }

    /// Adds the counts of levels 0 to `top`.
    void add_to(uint32_t* histogram, int32_t top) const noexcept
    {
        const auto size = static_cast<size_t>(top) + 1;
        for (size_t level = 0; level < size; ++level) {
            histogram[level] += counters_[0][level] + counters_[1][level] + counters_[2][level] +
                                counters_[3][level];
        }
    }

private:
    uint32_t counters_[4][256] = {};
};

} // namespace
