/// @file
/// The Hann window of a frame, worked out by the compiler, whose arithmetic is the same for every
/// processor.
#pragma once

#include <array>
#include <cstddef>

#include "catalogue/model/profile.hpp"
#include "catalogue/model/series.hpp"

namespace kzcat {

/// Half of the window: value i is 1/2 - cos(2 pi (i + 1/2) / kFrameLength) / 2, and the other half
/// mirrors it.
constexpr std::array<float, kFrameLength / 2> make_hann_half()
{
    constexpr size_t kQuarter = kFrameLength / 4;
    std::array<float, kFrameLength / 2> half{};
    for (size_t i = 0; i < kQuarter; ++i) {
        const double c = cosine(2 * kPi * (static_cast<double>(i) + 0.5) / kFrameLength);
        half[i] = static_cast<float>(0.5 - 0.5 * c);
        half[2 * kQuarter - 1 - i] = static_cast<float>(0.5 + 0.5 * c);
    }
    return half;
}

inline constexpr std::array<float, kFrameLength / 2> kHannHalf = make_hann_half();

} // namespace kzcat
