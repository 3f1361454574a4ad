/// @file
/// The 64 pairs of neighbouring bands, and their differences.

#include "catalogue/model/fine_bands.hpp"

#include <array>
#include <cassert>
#include <cstdlib>

#include "catalogue/model/logarithm.hpp"

namespace kzcat {

namespace {

// A pair of neighbouring bands: the lower one is made of the `width` fine bands from `start`, the
// upper one of as many above it.
struct PairBands {
    int start;
    int width;
};

constexpr uint32_t kLowPairs = 16;

// numerator / denominator to the nearest integer, halves to the even one; the denominator is
// positive.
constexpr int rounded_quotient(int numerator, int denominator)
{
    constexpr int kOffset = 1000; // even, and keeps the quotient from rounding towards 0
    const int doubled = 2 * (numerator + kOffset * denominator) + denominator;
    int quotient = doubled / (2 * denominator);
    if (doubled % (2 * denominator) == 0 && quotient % 2 != 0) {
        --quotient;
    }
    return quotient - kOffset;
}

// 16 pairs of bands of 1/6 octave from 63 Hz, then 48 of bands of 1/9 octave up to 3225 Hz.
constexpr std::array<PairBands, kPairs> make_pair_bands()
{
    std::array<PairBands, kPairs> pairs{};
    for (uint32_t i = 0; i < kPairs; ++i) {
        const auto low = static_cast<int>(i);
        const int high = low - static_cast<int>(kLowPairs);
        pairs[i] = i < kLowPairs ? PairBands{rounded_quotient(-48 * 16 + 54 * low, 16), 6}
                                 : PairBands{rounded_quotient(6 * 47 + 142 * high, 47), 4};
    }
    return pairs;
}

constexpr std::array<PairBands, kPairs> kPairBands = make_pair_bands();

// Sums of four and of six in one order.
float energy_of(const float* bands, int width)
{
    const float four = (bands[0] + bands[1]) + (bands[2] + bands[3]);
    return width == 4 ? four : four + (bands[4] + bands[5]);
}

} // namespace

void pair_differences(std::span<const float> frame, int steps, std::span<float, kPairs> differences)
{
    assert(std::abs(steps) <= kMaxPitchSteps && frame.size() == kFineBands);
    for (uint32_t i = 0; i < kPairs; ++i) {
        const PairBands pair = kPairBands[i];
        const float* lower = frame.data() + (pair.start + steps - kFirstFineBand);
        const float* upper = lower + pair.width;
        differences[i] =
            log2_ratio(energy_of(lower, pair.width) + 1, energy_of(upper, pair.width) + 1);
    }
}

} // namespace kzcat
