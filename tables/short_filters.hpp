/// @file
/// The prototypes of the two integer decimators: a half-band filter and a quarter-band filter.
///
/// They are the ideal response over 10 * down samples to either side under a Kaiser window, with
/// the centre tap and the structural zeros exact and the other taps scaled to an exact sum. (The
/// Hamming design of filter_design.hpp would be off in the third decimal of the sums.)
/// Source of the window: J. F. Kaiser, "Nonrecursive digital filter design using the I0-sinh window
/// function", Proc. IEEE Int. Symp. Circuits and Systems (1974).
#pragma once

#include <cmath>
#include <cstdint>
#include <numbers>
#include <vector>

namespace kz::tables {

struct ShortFilter {
    uint32_t down;
    uint32_t length; ///< 21 * down: the centre tap is at index 10 * down + (down == 2 ? 1 : 3)
    double sum;      ///< gain at 0 Hz
};

constexpr ShortFilter kHalfBand{.down = 2, .length = 42, .sum = 0.99948};
constexpr ShortFilter kQuarterBand{.down = 4, .length = 84, .sum = 0.99936};

/// Modified Bessel function of the first kind and order 0, by its power series.
inline double bessel_i0(double x)
{
    double sum = 1.0;
    double term = 1.0;
    for (int k = 1; term > sum * 1e-17; ++k) {
        term *= (x / (2 * k)) * (x / (2 * k));
        sum += term;
    }
    return sum;
}

/// The ideal low-pass response for a decimation by `down` at `n` samples from its centre, windowed.
inline double windowed_response(uint32_t down, uint32_t n)
{
    constexpr double kBeta = 5.02;
    const double reach = 10.0 * down;
    const double angle = std::numbers::pi * n / down;
    const double window =
        bessel_i0(kBeta * std::sqrt(1 - (n / reach) * (n / reach))) / bessel_i0(kBeta);
    return std::sin(angle) / (std::numbers::pi * n) * window;
}

/// The taps, as the single-precision values that both resamplers use.
inline std::vector<float> design_short_filter(const ShortFilter& filter)
{
    const uint32_t reach = 10 * filter.down;
    const uint32_t centre = filter.length / 2 + (filter.down == 4 ? 1 : 0);
    const double centre_tap = 1.0 / filter.down;

    double one_side = 0;
    for (uint32_t n = 1; n <= reach; ++n) {
        one_side += n % filter.down == 0 ? 0 : windowed_response(filter.down, n);
    }
    const double scale = (filter.sum - centre_tap) / (2 * one_side);

    std::vector<float> taps(filter.length, 0.0F);
    taps[centre] = static_cast<float>(centre_tap);
    for (uint32_t n = 1; n <= reach; ++n) {
        if (n % filter.down != 0) {
            const auto tap = static_cast<float>(scale * windowed_response(filter.down, n));
            taps[centre - n] = tap;
            taps[centre + n] = tap;
        }
    }
    return taps;
}

} // namespace kz::tables
