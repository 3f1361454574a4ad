/// @file
/// Design of the resamplers' polyphase prototypes: a windowed sinc at the intermediate rate.
///
/// The fixed-point tables are made from this design during the build; a resampler for any other
/// ratio makes it at run time. The mixture of single and double precision is part of the result.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "kzsdk/abs/mathfn.h"
#include "kzsdk/kernels/fxp_ops.hpp"

namespace kz::dsp {

/// How a prototype for `up`/`down` lies in its array: zeros, taps, zeros. The array's length is a
/// multiple of `up`, so that every phase has the same number of taps.
struct FilterLayout {
    uint32_t up;
    uint32_t down;
    uint64_t leading; ///< zeros before the first tap; they set the delay
    uint64_t taps;    ///< odd; the centre tap is at leading + taps / 2
    uint64_t length;
};

constexpr FilterLayout filter_layout(uint32_t up, uint32_t down) noexcept
{
    const uint64_t longest = up > down ? up : down;
    const uint64_t half = 10 * longest;
    // The first term wraps at 32 bits when up is more than twice down.
    const uint32_t overlap = fxp::wrap_sub(2 * down, up);
    const auto lag = static_cast<uint32_t>(down - half % down);
    const uint64_t leading = down <= up ? fxp::wrap_add(overlap, lag) % down : down - up;
    const uint64_t taps = 2 * half + 1;
    const uint64_t used = leading + taps;
    return {up, down, leading, taps, used + (up - used % up)};
}

/// Writes the Hamming-windowed sinc with its cutoff at the lower of the two Nyquist frequencies.
/// Its gain at 0 Hz is about `up`, or up * up / down when upsampling.
///
/// @param taps  Room for `layout.length` values.
inline void design_windowed_sinc(const FilterLayout& layout, std::span<float> taps) noexcept
{
    const auto leading = static_cast<size_t>(layout.leading);
    const auto order = static_cast<size_t>(layout.taps - 1);
    const size_t half = order / 2;
    const float cutoff =
        3.1415927F / static_cast<float>(layout.up > layout.down ? layout.up : layout.down);
    const float window_step = 6.2831855F / static_cast<float>(order);
    const float gain = static_cast<float>(layout.up) / static_cast<float>(layout.down);

    for (float& tap : taps) {
        tap = 0;
    }
    for (size_t i = 0; i < half; ++i) {
        const double x =
            (static_cast<double>(i) - static_cast<double>(half)) * static_cast<double>(cutoff);
        const auto sinc = static_cast<float>(kz_sin(x) / x);
        const float angle = static_cast<float>(i) * window_step;
        const double window = 0.54 - 0.46 * kz_cos(static_cast<double>(angle));
        const auto tap = static_cast<float>(static_cast<double>(sinc * gain) * window);
        taps[leading + i] = tap;
        taps[leading + order - i] = tap;
    }
    taps[leading + half] = gain;
}

} // namespace kz::dsp
