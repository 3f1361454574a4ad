/// @file
/// The order in which sums are taken: in eight lanes, whatever the width of the processor's
/// vectors.
#pragma once

#include <array>
#include <cstddef>

namespace kzcat {

inline constexpr size_t kLanes = 8;

/// ((0 + 4) + (2 + 6)) + ((1 + 5) + (3 + 7)): halves of a vector are added, then halves of what is
/// left.
inline float sum_of_lanes(const std::array<float, kLanes>& lanes)
{
    const auto pair = [&lanes](size_t i) { return lanes[i] + lanes[i + 4]; };
    return (pair(0) + pair(2)) + (pair(1) + pair(3));
}

} // namespace kzcat
