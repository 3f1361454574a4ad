/// @file
/// Every sum below is taken in one stated order, which suits vectors of up to eight lanes.

#include "catalogue/model/frame_analyser.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <new>

#include "catalogue/model/band_edges.hpp"
#include "catalogue/model/hann_window.hpp"
#include "catalogue/model/lanes.hpp"
#include "catalogue/model/logarithm.hpp"

namespace kzcat {

namespace {

constexpr size_t kLevels = 256;
constexpr int kOrder = 12;
static_assert(1 << kOrder == kFrameLength);

struct Extremes {
    float low;
    float high;

    // Range of a frame that says nothing: one step of 16-bit audio, or what a resampler leaves of a
    // constant.
    bool is_silent() const
    {
        const float distance = std::max(std::fabs(low), std::fabs(high));
        return high - low <= std::max(1.0F, distance * (1.0F / 256));
    }
};

Extremes extremes_of(Frame frame)
{
    Extremes ends{frame[0], frame[0]};
    for (const float sample : frame) {
        ends.low = std::min(ends.low, sample);
        ends.high = std::max(ends.high, sample);
    }
    return ends;
}

// Quantises the samples to levels between the extremes.
void write_levels(Frame frame, Extremes ends, std::span<uint8_t> levels)
{
    const float scale = static_cast<float>(kLevels - 1) / (ends.high - ends.low);
    for (size_t i = 0; i < kFrameLength; ++i) {
        const auto level = static_cast<int32_t>((frame[i] - ends.low) * scale);
        levels[i] = static_cast<uint8_t>(std::min<int32_t>(level, kLevels - 1));
    }
}

// The share of samples at or below each level, less the mean of that over the frame. Shares are
// whole numbers of samples and the mean is of a power of two of them, so nothing is rounded: the
// values are whole numbers of 2^-24.
std::array<float, kLevels> ranks_of(std::span<const uint8_t> levels)
{
    std::array<int32_t, kLevels> counts{};
    for (const uint8_t level : levels) {
        ++counts[level];
    }
    std::array<int32_t, kLevels> below{};
    int32_t cumulative = 0;
    int32_t total = 0;
    for (size_t i = 0; i < kLevels; ++i) {
        cumulative += counts[i];
        total += cumulative * counts[i];
        below[i] = cumulative * static_cast<int32_t>(kFrameLength);
    }
    std::array<float, kLevels> ranks{};
    std::transform(below.begin(), below.end(), ranks.begin(),
                   [total](int32_t rank) { return static_cast<float>(rank - total); });
    return ranks;
}

// Windowed ranks, 2^14 times their size.
void write_windowed(std::span<const uint8_t> levels, const std::array<float, kLevels>& ranks,
                    std::span<float> output)
{
    constexpr float kScale = 0x1p-24F * 16384;
    constexpr size_t kHalf = kFrameLength / 2;
    for (size_t i = 0; i < kHalf; ++i) {
        const float weight = kHannHalf[i] * kScale;
        const size_t mirrored = kFrameLength - 1 - i;
        output[i] = ranks[levels[i]] * weight;
        output[mirrored] = ranks[levels[mirrored]] * weight;
    }
}

// Lane l adds up every eighth bin from bin l of those that lie wholly inside.
float energy_of(const BandBins& band, std::span<const float> bins)
{
    std::array<float, kLanes> lanes{};
    const auto whole = bins.subspan(band.whole_begin, band.whole_count);
    for (size_t k = 0; k < whole.size(); ++k) {
        lanes[k % kLanes] += whole[k] * whole[k];
    }
    const float first = bins[band.first] * bins[band.first];
    const float last = bins[band.last] * bins[band.last];
    return (first * band.first_weight + last * band.last_weight) + sum_of_lanes(lanes);
}

} // namespace

FrameAnalyser::FrameAnalyser()
    : dct_(KZDSP_CreateDCT(kOrder)), transformed_(kFrameLength), levels_(kFrameLength)
{
    if (!dct_) {
        throw std::bad_alloc();
    }
}

void FrameAnalyser::analyse(Frame frame, std::span<float, kFineBands> energies)
{
    const Extremes ends = extremes_of(frame);
    if (ends.is_silent()) {
        std::fill(energies.begin(), energies.end(), 0.0F);
        return;
    }
    write_levels(frame, ends, levels_);
    write_windowed(levels_, ranks_of(levels_), transformed_);
    KZDSP_ComputeDCT(dct_.get(), transformed_.data(), 0);
    std::transform(kBandBins.begin(), kBandBins.end(), energies.begin(),
                   [this](const BandBins& band) { return energy_of(band, transformed_); });
}

float level_of(Frame frame)
{
    std::array<double, kLanes> sums{};
    std::array<double, kLanes> squares{};
    for (size_t i = 0; i < kFrameLength; ++i) {
        const double sample = frame[i];
        sums[i % kLanes] += sample;
        squares[i % kLanes] += sample * sample;
    }
    double sum = 0;
    double square = 0;
    for (size_t lane = 0; lane < kLanes; ++lane) {
        sum += sums[lane];
        square += squares[lane];
    }
    const double about_mean = std::max(0.0, square - sum * sum / kFrameLength);
    return log2_of(static_cast<float>(about_mean) + 1);
}

} // namespace kzcat
