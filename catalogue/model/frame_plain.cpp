/// @file
/// The inner loops for any processor, sample by sample: what the other variants are compared with.

#include <algorithm>
#include <array>

#include "catalogue/model/band_edges.hpp"
#include "catalogue/model/frame_variants.hpp"
#include "catalogue/model/hann_window.hpp"
#include "catalogue/model/lanes.hpp"
#include "catalogue/model/logarithm.hpp"
#include "catalogue/model/pair_bands.hpp"

namespace kzcat {

namespace {

Extremes extremes(const float* frame)
{
    Extremes ends{frame[0], frame[0]};
    for (size_t i = 1; i < kFrameLength; ++i) {
        ends.low = std::min(ends.low, frame[i]);
        ends.high = std::max(ends.high, frame[i]);
    }
    return ends;
}

void write_levels(const float* frame, float bottom, float scale, uint8_t* levels)
{
    for (size_t i = 0; i < kFrameLength; ++i) {
        const auto level = static_cast<int32_t>((frame[i] - bottom) * scale);
        levels[i] = static_cast<uint8_t>(std::min(level, 255));
    }
}

void write_windowed(const uint8_t* levels, const float* ranks, float* output)
{
    for (size_t i = 0; i < kFrameLength; ++i) {
        output[i] = ranks[levels[i]] * kRankWindow.values[i];
    }
}

// Lane l adds up every eighth bin from bin l of those that lie wholly inside.
float energy_of(const BandBins& band, const float* bins)
{
    std::array<float, kLanes> lanes{};
    for (size_t k = 0; k < band.whole_count; ++k) {
        const float bin = bins[band.whole_begin + k];
        lanes[k % kLanes] += bin * bin;
    }
    const float first = bins[band.first] * bins[band.first];
    const float last = bins[band.last] * bins[band.last];
    return (first * band.first_weight + last * band.last_weight) + sum_of_lanes(lanes);
}

void band_energies(const float* bins, float* energies)
{
    for (const BandBins& band : kBandBins.bands) {
        *energies++ = energy_of(band, bins);
    }
}

// Sums of four and of six in one order.
float sum_of_bands(const float* bands, uint32_t width)
{
    const float four = (bands[0] + bands[1]) + (bands[2] + bands[3]);
    return width == 4 ? four : four + (bands[4] + bands[5]);
}

void pair_differences(const float* bands, float* differences)
{
    for (const PairBands& pair : kPairBands.pairs) {
        const float lower = sum_of_bands(bands + pair.lower, pair.width);
        const float upper = sum_of_bands(bands + pair.lower + pair.width, pair.width);
        *differences++ = log2_ratio(lower + 1, upper + 1);
    }
}

// Lane l adds up every eighth product.
float dot(const float* samples, const float* taps, size_t count)
{
    std::array<float, kLanes> lanes{};
    for (size_t i = 0; i < count; i += kLanes) {
        for (size_t lane = 0; lane < kLanes; ++lane) {
            lanes[lane] += samples[i + lane] * taps[i + lane];
        }
    }
    return sum_of_lanes(lanes);
}

float interpolated(const float* samples, const float* taps, size_t row, float share)
{
    const float before = dot(samples, taps, row);
    const float after = dot(samples, taps + row, row);
    return before + share * (after - before);
}

} // namespace

constinit const FrameKernels kPlainFrame{
    "plain", extremes, write_levels, write_windowed, band_energies, pair_differences, interpolated,
};

} // namespace kzcat
