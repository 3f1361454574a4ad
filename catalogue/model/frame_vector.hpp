/// @file
/// The inner loops over vectors of eight lanes, as templates. Each lane does what one turn of the
/// plain loop does, and lanes are added as lanes.hpp has it.
///
/// A vector kind brings Floats, eight floats, Ints, as many integers of 32 bits, and:
///
///     load, store, set, add, sub, mul, min, max      lane by lane
///     first_lanes(v, count)                          with 0 in the lanes from `count` on
///     store_sums(to, v)                              the sum of the lanes of each of eight vectors
///     store_levels(to, a, b, c, d)                   truncated, at most 255, as bytes
///     look_up(table, indices)                        what eight bytes name
///     bits, from_bits, add_bits, sub_bits, shift_right<n>, shift_left<n>, to_floats
///
/// Everything here is local to the file that includes it: what the compiler makes of it for one
/// instruction set must not be taken for another.
#pragma once

#include <cstddef>
#include <cstdint>

#include "catalogue/model/band_edges.hpp"
#include "catalogue/model/frame_kernels.hpp"
#include "catalogue/model/hann_window.hpp"
#include "catalogue/model/logarithm.hpp"
#include "catalogue/model/pair_bands.hpp"

namespace {

using kzcat::kFineBands;
using kzcat::kFrameLength;
using kzcat::kPairs;

inline constexpr size_t kWidth = 8;

template <class V>
kzcat::Extremes vector_extremes(const float* frame)
{
    auto low = V::load(frame);
    auto high = low;
    for (size_t i = kWidth; i < kFrameLength; i += kWidth) {
        const auto v = V::load(frame + i);
        low = V::min(low, v);
        high = V::max(high, v);
    }
    float lows[kWidth];
    float highs[kWidth];
    V::store(lows, low);
    V::store(highs, high);
    kzcat::Extremes ends{lows[0], highs[0]};
    for (size_t lane = 1; lane < kWidth; ++lane) {
        ends.low = lows[lane] < ends.low ? lows[lane] : ends.low;
        ends.high = highs[lane] > ends.high ? highs[lane] : ends.high;
    }
    return ends;
}

template <class V>
void vector_levels(const float* frame, float bottom, float scale, uint8_t* levels)
{
    const auto bottoms = V::set(bottom);
    const auto scales = V::set(scale);
    const auto level = [=](const float* samples) {
        return V::mul(V::sub(V::load(samples), bottoms), scales);
    };
    for (size_t i = 0; i < kFrameLength; i += 4 * kWidth) {
        const float* samples = frame + i;
        V::store_levels(levels + i, level(samples), level(samples + kWidth),
                        level(samples + 2 * kWidth), level(samples + 3 * kWidth));
    }
}

template <class V>
void vector_windowed(const uint8_t* levels, const float* ranks, float* output)
{
    const float* window = kzcat::kRankWindow.values;
    for (size_t i = 0; i < kFrameLength; i += kWidth) {
        V::store(output + i, V::mul(V::look_up(ranks, levels + i), V::load(window + i)));
    }
}

// The bins that lie wholly inside a band, in eight sums.
template <class V>
auto sums_inside(const kzcat::BandBins& band, const float* bins)
{
    const float* from = bins + band.whole_begin;
    auto sums = V::set(0);
    size_t left = band.whole_count;
    for (; left >= kWidth; left -= kWidth, from += kWidth) {
        const auto v = V::load(from);
        sums = V::add(sums, V::mul(v, v));
    }
    const auto v = V::first_lanes(V::load(from), left);
    return V::add(sums, V::mul(v, v));
}

// The energies of eight bands.
template <class V>
void store_energies(const kzcat::BandBins* bands, const float* bins, float* energies)
{
    typename V::Floats inside[kWidth];
    float edges[4][kWidth];
    for (size_t i = 0; i < kWidth; ++i) {
        inside[i] = sums_inside<V>(bands[i], bins);
        edges[0][i] = bins[bands[i].first];
        edges[1][i] = bands[i].first_weight;
        edges[2][i] = bins[bands[i].last];
        edges[3][i] = bands[i].last_weight;
    }
    float sums[kWidth];
    V::store_sums(sums, inside);
    const auto first = V::load(edges[0]);
    const auto last = V::load(edges[2]);
    const auto outside = V::add(V::mul(V::mul(first, first), V::load(edges[1])),
                                V::mul(V::mul(last, last), V::load(edges[3])));
    V::store(energies, V::add(outside, V::load(sums)));
}

// The last group begins where it is full: some of its bands are worked out twice.
template <class V>
void vector_band_energies(const float* bins, float* energies)
{
    const kzcat::BandBins* bands = kzcat::kBandBins.bands;
    for (size_t i = 0; i + kWidth <= kFineBands; i += kWidth) {
        store_energies<V>(bands + i, bins, energies + i);
    }
    constexpr size_t kLast = kFineBands - kWidth;
    store_energies<V>(bands + kLast, bins, energies + kLast);
}

// The sums of two, of four and of six bands from each one on.
struct BandSums {
    float two[kzcat::kPairFineBands + kWidth];
    float four[kzcat::kPairFineBands];
    float six[kzcat::kPairFineBands];
};

// Sums near the end of the bands are of use to no pair, and the loops end before them.
template <class V>
void sum_bands(const float* bands, BandSums& sums)
{
    constexpr size_t kCount = kzcat::kPairFineBands;
    const auto add_up = [](size_t count, const float* a, const float* b, float* to) {
        for (size_t i = 0; i + kWidth <= count; i += kWidth) {
            V::store(to + i, V::add(V::load(a + i), V::load(b + i)));
        }
        const size_t last = count - kWidth;
        V::store(to + last, V::add(V::load(a + last), V::load(b + last)));
    };
    add_up(kCount - 1, bands, bands + 1, sums.two);
    add_up(kCount - 3, sums.two, sums.two + 2, sums.four);
    add_up(kCount - 5, sums.four, sums.two + 4, sums.six);
}

// Of 1 + t: the whole part of the logarithm is split off first.
template <class V>
void split_logarithm(typename V::Floats x, typename V::Ints& exponent, typename V::Floats& rest)
{
    const auto bits = V::bits(x);
    exponent = V::template shift_right<23>(V::sub_bits(bits, kzcat::kRootOfHalf));
    const auto t =
        V::sub(V::from_bits(V::sub_bits(bits, V::template shift_left<23>(exponent))), V::set(1));
    auto sum = V::set(kzcat::kLogarithmTerms[8]);
    for (int power = 7; power >= 0; --power) {
        sum = V::add(V::mul(sum, t), V::set(kzcat::kLogarithmTerms[power]));
    }
    rest = V::mul(sum, t);
}

template <class V>
void store_ratios(const float* lower, const float* upper, float* differences)
{
    typename V::Ints lower_exponent;
    typename V::Ints upper_exponent;
    typename V::Floats lower_rest;
    typename V::Floats upper_rest;
    split_logarithm<V>(V::add(V::load(lower), V::set(1)), lower_exponent, lower_rest);
    split_logarithm<V>(V::add(V::load(upper), V::set(1)), upper_exponent, upper_rest);
    const auto whole = V::to_floats(V::sub_bits(lower_exponent, upper_exponent));
    V::store(differences, V::add(whole, V::sub(lower_rest, upper_rest)));
}

template <class V>
void vector_differences(const float* bands, float* differences)
{
    BandSums sums;
    sum_bands<V>(bands, sums);
    float lower[kPairs];
    float upper[kPairs];
    for (size_t i = 0; i < kPairs; ++i) {
        const kzcat::PairBands pair = kzcat::kPairBands.pairs[i];
        const float* of_width = i < kzcat::kLowPairs ? sums.six : sums.four;
        lower[i] = of_width[pair.lower];
        upper[i] = of_width[pair.lower + pair.width];
    }
    for (size_t i = 0; i < kPairs; i += kWidth) {
        store_ratios<V>(lower + i, upper + i, differences + i);
    }
}

template <class V>
float vector_interpolated(const float* samples, const float* taps, size_t row, float share)
{
    typename V::Floats products[kWidth];
    for (auto& lanes : products) {
        lanes = V::set(0);
    }
    for (size_t i = 0; i < row; i += kWidth) {
        const auto v = V::load(samples + i);
        products[0] = V::add(products[0], V::mul(v, V::load(taps + i)));
        products[1] = V::add(products[1], V::mul(v, V::load(taps + row + i)));
    }
    float sums[kWidth];
    V::store_sums(sums, products);
    return sums[0] + share * (sums[1] - sums[0]);
}

template <class V>
constexpr kzcat::FrameKernels vector_frame_kernels(const char* name)
{
    return {name,
            vector_extremes<V>,
            vector_levels<V>,
            vector_windowed<V>,
            vector_band_energies<V>,
            vector_differences<V>,
            vector_interpolated<V>};
}

} // namespace
