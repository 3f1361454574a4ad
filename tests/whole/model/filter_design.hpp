/// @file
/// The low-pass filters of the resampler, designed independently.
#pragma once

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <numbers>
#include <span>
#include <vector>

#include "whole/model/resampler.hpp"

namespace kz::model {

/// Zero taps ahead of the filter, so that its centre lies where the preroll expects it.
constexpr size_t leading_zero_taps(const Ratio& ratio)
{
    if (ratio.down > ratio.up) {
        return ratio.down - ratio.up;
    }
    const uint32_t half = 10 * std::max(ratio.up, ratio.down);
    return (2 * ratio.down - ratio.up + (ratio.down - half % ratio.down)) % ratio.down;
}

/// Position of the centre tap.
constexpr size_t centre_tap(const Ratio& ratio)
{
    return leading_zero_taps(ratio) + 10 * std::max(ratio.up, ratio.down);
}

/// A sinc of ten zero crossings on either side under a Hamming window, partly in single precision;
/// its centre tap is up / down and its length a multiple of `up`.
inline std::vector<float> windowed_sinc(const Ratio& ratio)
{
    const uint32_t longer = std::max(ratio.up, ratio.down);
    const uint32_t order = 20 * longer;
    const size_t zeros = leading_zero_taps(ratio);
    const size_t used = zeros + order + 1;
    const float cutoff = 3.1415927f / static_cast<float>(longer);
    const float window_step = 6.2831855f / static_cast<float>(order);
    const float gain = static_cast<float>(ratio.up) / static_cast<float>(ratio.down);
    std::vector<float> taps(used + (ratio.up - used % ratio.up), 0.0f);
    for (uint32_t i = 0; i < order / 2; ++i) {
        const double x = (static_cast<double>(i) - static_cast<double>(order / 2)) * double{cutoff};
        const double window = 0.54 - 0.46 * std::cos(double{static_cast<float>(i) * window_step});
        const auto value =
            static_cast<float>(double{static_cast<float>(std::sin(x) / x) * gain} * window);
        taps[zeros + i] = value;
        taps[zeros + order - i] = value;
    }
    taps[zeros + order / 2] = gain;
    return taps;
}

/// Modified Bessel function of the first kind, order 0.
inline double bessel_i0(double x)
{
    double sum = 1;
    double term = 1;
    for (int k = 1; term > 1e-18 * sum; ++k) {
        term *= (x / (2 * k)) * (x / (2 * k));
        sum += term;
    }
    return sum;
}

/// The filter for decimation by 2 or 4: the same sinc under a Kaiser window, taps at its zero
/// crossings exactly 0, the others scaled so that all add up to `sum`.
inline std::vector<float> kaiser_sinc(uint32_t down, double sum)
{
    constexpr double kBeta = 5.02;
    const auto centre = static_cast<size_t>(11 * down - 1);
    std::vector<double> side(10 * down, 0.0); // by distance from the centre
    double side_sum = 0;
    for (size_t away = 1; away < side.size(); ++away) {
        if (away % down == 0) {
            continue;
        }
        const auto x = std::numbers::pi * static_cast<double>(away) / down;
        const double share = static_cast<double>(away) / static_cast<double>(side.size());
        const double window = bessel_i0(kBeta * std::sqrt(1 - share * share)) / bessel_i0(kBeta);
        side[away] = std::sin(x) / x / down * window;
        side_sum += 2 * side[away];
    }
    const double scale = (sum - 1.0 / down) / side_sum;
    std::vector<float> taps(21 * down, 0.0f);
    taps[centre] = 1.0f / static_cast<float>(down);
    for (size_t away = 1; away < side.size(); ++away) {
        taps[centre - away] = taps[centre + away] = static_cast<float>(side[away] * scale);
    }
    return taps;
}

inline std::vector<float> design(const Ratio& ratio)
{
    if (ratio.length == 0) {
        return {};
    }
    if (ratio.up == 1) {
        return ratio.down == 2 ? kaiser_sinc(2, 0.99948) : kaiser_sinc(4, 0.99936);
    }
    return windowed_sinc(ratio);
}

/// The gain that the stored taps have on top of their design: a centre tap above 1 would not fit
/// Q31.
constexpr double storage_gain(const Ratio& ratio) { return ratio.up > ratio.down ? 0.5 : 1.0; }

/// The design in Q31, rounded to nearest.
inline std::vector<int32_t> design_words(const Ratio& ratio)
{
    const std::vector<float> taps = design(ratio);
    std::vector<int32_t> words(taps.size());
    std::transform(taps.begin(), taps.end(), words.begin(), [&ratio](float tap) {
        return static_cast<int32_t>(std::llround(double{tap} * storage_gain(ratio) * 0x1p31));
    });
    return words;
}

/// Amplitude response at a frequency, relative to the sampling rate of the taps.
template <class Tap>
double response(std::span<const Tap> taps, double frequency)
{
    std::complex<double> sum = 0;
    for (size_t i = 0; i < taps.size(); ++i) {
        sum += static_cast<double>(taps[i]) *
               std::polar(1.0, -2 * std::numbers::pi * frequency * static_cast<double>(i));
    }
    return std::abs(sum);
}

} // namespace kz::model
