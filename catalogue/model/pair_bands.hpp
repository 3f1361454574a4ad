/// @file
/// The 64 pairs of neighbouring bands.
#pragma once

#include <cstdint>

#include "catalogue/model/profile.hpp"

namespace kzcat {

/// A pair of neighbouring bands: the lower one is made of `width` fine bands, the upper one of as
/// many above it.
struct PairBands {
    uint32_t lower; ///< its first fine band, counted from edge kLowestPairEdge
    uint32_t width; ///< 6 for the low pairs, 4 for the others
};

constexpr uint32_t kLowPairs = 16;
constexpr int kLowestPairEdge = -48;

/// numerator / denominator to the nearest integer, halves to the even one; neither is negative.
constexpr uint32_t rounded_quotient(uint32_t numerator, uint32_t denominator)
{
    const uint32_t quotient = numerator / denominator;
    const uint32_t rest = 2 * (numerator % denominator);
    const bool up = rest > denominator || (rest == denominator && quotient % 2 != 0);
    return quotient + (up ? 1 : 0);
}

/// An array that can be read without a function: the inner loops must not share any.
struct PairTable {
    PairBands pairs[kPairs];
};

/// 16 pairs of bands of 1/6 octave from 63 Hz, then 48 of bands of 1/9 octave up to 3225 Hz.
constexpr PairTable make_pair_bands()
{
    constexpr uint32_t kFirstHighEdge = 6 - kLowestPairEdge;
    constexpr uint32_t kHighSteps = 142;
    constexpr uint32_t kHighPairs = kPairs - kLowPairs;
    PairTable table{};
    for (uint32_t i = 0; i < kLowPairs; ++i) {
        table.pairs[i] = {rounded_quotient(54 * i, kLowPairs), 6};
    }
    for (uint32_t i = 0; i < kHighPairs; ++i) {
        table.pairs[kLowPairs + i] = {
            kFirstHighEdge + rounded_quotient(kHighSteps * i, kHighPairs - 1), 4};
    }
    return table;
}

inline constexpr PairTable kPairBands = make_pair_bands();

/// Fine bands from kLowestPairEdge on that the pairs use.
constexpr uint32_t kPairFineBands =
    kPairBands.pairs[kPairs - 1].lower + 2 * kPairBands.pairs[kPairs - 1].width;

} // namespace kzcat
