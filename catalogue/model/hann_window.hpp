/// @file
/// The Hann window of a frame, worked out by the compiler, whose arithmetic is the same for every
/// processor.
#pragma once

#include <cstddef>

#include "catalogue/model/profile.hpp"
#include "catalogue/model/series.hpp"

namespace kzcat {

/// An array that can be read without a function: the inner loops must not share any.
struct WindowTable {
    float values[kFrameLength];
};

/// The window times 2^-10, which turns ranks in units of 2^-24 into values of up to 2^14: value i
/// is (1/2 - cos(2 pi (i + 1/2) / kFrameLength) / 2) / 1024, rounded once.
constexpr WindowTable make_rank_window()
{
    constexpr size_t kQuarter = kFrameLength / 4;
    WindowTable window{};
    for (size_t i = 0; i < kQuarter; ++i) {
        const double c = cosine(2 * kPi * (static_cast<double>(i) + 0.5) / kFrameLength);
        window.values[i] = static_cast<float>((0.5 - 0.5 * c) * 0x1p-10);
        window.values[2 * kQuarter - 1 - i] = static_cast<float>((0.5 + 0.5 * c) * 0x1p-10);
    }
    for (size_t i = 0; i < 2 * kQuarter; ++i) {
        window.values[kFrameLength - 1 - i] = window.values[i];
    }
    return window;
}

inline constexpr WindowTable kRankWindow = make_rank_window();

} // namespace kzcat
