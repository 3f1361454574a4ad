/// @file
/// A frame's way through equaliser, window, transform and bands.

#include "catalogue/model/frame_analyser.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <new>

#include "catalogue/model/frame_kernels.hpp"

namespace kzcat {

namespace {

constexpr size_t kLevels = 256;
constexpr int kOrder = 12;
static_assert(1 << kOrder == kFrameLength);

// Range of a frame that says nothing: one step of 16-bit audio, or what a resampler leaves of a
// constant.
bool is_silent(Extremes ends)
{
    const float distance = std::max(std::fabs(ends.low), std::fabs(ends.high));
    return ends.high - ends.low <= std::max(1.0F, distance * (1.0F / 256));
}

// How often each level occurs. Equal ones that follow each other would wait for one another's
// counter, so there are four counters of each.
std::array<int32_t, kLevels> counts_of(std::span<const uint8_t> levels)
{
    std::array<std::array<int32_t, kLevels>, 4> counters{};
    for (size_t i = 0; i < kFrameLength; i += counters.size()) {
        for (size_t k = 0; k < counters.size(); ++k) {
            ++counters[k][levels[i + k]];
        }
    }
    for (size_t level = 0; level < kLevels; ++level) {
        counters[0][level] += counters[1][level] + counters[2][level] + counters[3][level];
    }
    return counters[0];
}

// The share of samples at or below each level, less the mean of that over the frame. Shares are
// whole numbers of samples and the mean is of a power of two of them, so nothing is rounded: the
// values are whole numbers of 2^-24.
std::array<float, kLevels> ranks_of(std::span<const uint8_t> levels)
{
    const std::array<int32_t, kLevels> counts = counts_of(levels);
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
    const FrameKernels& kernels = frame_kernels();
    const Extremes ends = kernels.extremes(frame.data());
    if (is_silent(ends)) {
        std::fill(energies.begin(), energies.end(), 0.0F);
        return;
    }
    const float scale = static_cast<float>(kLevels - 1) / (ends.high - ends.low);
    kernels.write_levels(frame.data(), ends.low, scale, levels_.data());
    kernels.write_windowed(levels_.data(), ranks_of(levels_).data(), transformed_.data());
    KZDSP_ComputeDCT(dct_.get(), transformed_.data(), 0);
    kernels.band_energies(transformed_.data(), energies.data());
}

} // namespace kzcat
