/// @file
/// Sound that is made with integers only: the same samples on every machine.
#pragma once

#include <cstdint>
#include <vector>

namespace kz::test {

/// A linear congruential generator with 64 bits of state.
class Congruential {
public:
    explicit Congruential(uint64_t seed) : state_(seed) {}
    uint32_t next()
    {
        state_ = state_ * 6364136223846793005U + 1442695040888963407U;
        return static_cast<uint32_t>(state_ >> 32);
    }
    uint32_t below(uint32_t bound)
    {
        return static_cast<uint32_t>((uint64_t{next()} * bound) >> 32);
    }

private:
    uint64_t state_;
};

/// Three voices that take a new note every fifth of a second and fade; `gain` in 1/256. The second
/// channel is a little softer than the first.
std::vector<int16_t> melody(uint32_t rate, uint32_t channels, double seconds, int64_t gain = 256);

} // namespace kz::test
