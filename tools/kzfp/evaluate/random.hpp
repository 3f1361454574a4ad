/// @file
/// Seeded random numbers, the same on every machine.
#pragma once

#include <cstdint>
#include <string_view>

namespace kzfp::evaluate {

/// SplitMix64 (Steele, Lea, Flood: Fast Splittable Pseudorandom Number Generators, 2014). A name
/// gives a generator of its own, whatever others were used for.
class Random {
public:
    Random(uint64_t seed, std::string_view name);

    uint64_t next();
    /// Uniform in 0 .. bound - 1; `bound` is above 0.
    uint64_t below(uint64_t bound);
    /// Uniform above 0 and at most 1.
    double unit();
    /// Of the standard normal distribution.
    double normal();

private:
    uint64_t state_;
    double spare_ = 0;
    bool has_spare_ = false;
};

} // namespace kzfp::evaluate
