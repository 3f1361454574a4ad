#include "kzfp/duplicates/bandwidth.hpp"

#include <algorithm>
#include <cmath>
#include <numbers>
#include <vector>

#include "kzfp/fourier.hpp"

namespace kzfp {

namespace {

constexpr size_t kLength = 2048;
constexpr size_t kHop = 4 * kLength; // an average of some moments is enough
constexpr double kStep = 250;        ///< hertz

/// What is weaker than the strongest step by more than this, or than a full sine by more than that,
/// is rounding, dither or what the filters of rate converters leave.
constexpr double kBelowStrongest = 1e-7;
constexpr double kBelowFullScale = 1e-10;

/// The power of each step of frequency, 1 for a full sine, on average over the moments.
std::vector<double> powers_of(std::span<const float> samples, uint32_t rate)
{
    const uint32_t highest = rate / 2;
    std::vector<double> powers(static_cast<size_t>(highest / kStep) + 1);
    const FourierTransform transform(kLength, FourierTransform::Direction::forward);
    Spectrum frame(kLength);
    size_t moments = 0;
    for (size_t at = 0; at + kLength <= samples.size(); at += kHop, ++moments) {
        for (size_t i = 0; i < kLength; ++i) {
            const double phase = 2 * std::numbers::pi * static_cast<double>(i) / kLength;
            // Blackman: its sides fall far enough that a strong bass does not show at the top.
            const double window = 0.42 - 0.5 * std::cos(phase) + 0.08 * std::cos(2 * phase);
            frame[i] = window * double{samples[at + i]};
        }
        transform(frame);
        for (size_t bin = 1; bin < kLength / 2; ++bin) {
            const double frequency = static_cast<double>(bin) * rate / kLength;
            powers[static_cast<size_t>(frequency / kStep)] +=
                std::norm(frame[bin]) / (kLength * kLength * 0.08);
        }
    }
    for (double& power : powers) {
        power /= static_cast<double>(std::max<size_t>(moments, 1));
    }
    return powers;
}

} // namespace

double bandwidth_of(std::span<const float> samples, uint32_t rate)
{
    const std::vector<double> powers = powers_of(samples, rate);
    const double least =
        std::max(kBelowFullScale, kBelowStrongest * *std::ranges::max_element(powers));
    size_t steps = powers.size();
    while (steps > 0 && powers[steps - 1] <= least) {
        --steps;
    }
    return std::min(static_cast<double>(steps) * kStep, rate / 2.0);
}

} // namespace kzfp
