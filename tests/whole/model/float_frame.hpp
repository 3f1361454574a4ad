/// @file
/// One analysis frame in single precision, each sum in the order of its terms; and the 30 values.
#pragma once

#include <algorithm>
#include <array>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "whole/model/dct.hpp"
#include "whole/model/frame.hpp"
#include "whole/model/statistics.hpp"

namespace kz::model {

/// Band b runs from edge b to edge b + 1, in hertz.
inline constexpr std::array<double, kBands + 1> kBandHertz = {
    0, 99.8, 200, 299.8, 400, 510, 630, 769.9, 920, 1080, 1269.8, 1480, 1719.8, 2000, 2320, 2700};

struct FloatFeatures {
    std::array<float, kBands> energy;
    std::array<float, kBands> amplitude;
};

inline float rounded_root(float value) { return static_cast<float>(std::sqrt(double{value})); }

/// Ranks as fractions of the frame, less their mean. Samples must be finite.
inline std::vector<float> equalise_float(std::span<const float> samples, uint32_t levels)
{
    const auto [lowest, highest] = std::minmax_element(samples.begin(), samples.end());
    const float low = std::min(1e6f, *lowest);
    const float high = std::max(-1e6f, *highest);
    const float scale = static_cast<float>(levels - 1) / (high - low);
    std::vector<size_t> level(samples.size(), 0);
    if (std::isfinite(scale)) {
        std::transform(samples.begin(), samples.end(), level.begin(), [&](float sample) {
            return std::min<size_t>(static_cast<size_t>((sample - low) * scale), levels - 1);
        });
    }
    std::vector<float> counts(levels, 0);
    for (const size_t each : level) {
        counts[each] += 1; // exact up to 2^24
    }
    const auto all = static_cast<float>(samples.size());
    std::vector<float> ranks(levels);
    float below = 0;
    float total = 0;
    for (size_t i = 0; i < levels; ++i) {
        const float share = counts[i] / all;
        ranks[i] = below + share;
        const float weighted = ranks[i] * counts[i];
        total += weighted;
        below = ranks[i];
    }
    const float mean = total / all;
    std::vector<float> result(samples.size());
    std::transform(level.begin(), level.end(), result.begin(),
                   [&](size_t each) { return ranks[each] - mean; });
    return result;
}

inline std::vector<float> equalise_float_unless_silent(std::span<const float> samples,
                                                       uint32_t levels)
{
    const auto [lowest, highest] = std::minmax_element(samples.begin(), samples.end());
    const float range = std::max(-1e6f, *highest) - std::min(1e6f, *lowest);
    return range <= 1.0f ? std::vector<float>(samples.begin(), samples.end())
                         : equalise_float(samples, levels);
}

class FloatFrameAnalyser {
public:
    FloatFeatures operator()(std::span<const float> frame) const
    {
        std::vector<float> spectrum = equalise_float_unless_silent(frame, kLevels);
        dct_(spectrum);
        return features(spectrum);
    }

    static FloatFeatures features(std::span<const float> spectrum)
    {
        const float bin_width = 11025.0f / static_cast<float>(2 * kFrameLength);
        const auto bin_of = [bin_width](double hertz) {
            return static_cast<size_t>(static_cast<float>(hertz) / bin_width);
        };
        FloatFeatures result{};
        for (size_t band = 0; band < kBands; ++band) {
            const size_t first = bin_of(kBandHertz[band]);
            const size_t last = bin_of(kBandHertz[band + 1]);
            float sum = 0;
            for (size_t bin = first; bin <= last; ++bin) {
                const float square = spectrum[bin] * spectrum[bin];
                sum += square;
            }
            result.energy[band] = sum;
            result.amplitude[band] = rounded_root(sum / static_cast<float>(last - first + 1));
        }
        return result;
    }

private:
    FloatDct dct_{15};
};

/// Shares of 32768; what is no share (of silence, of one frame) is 0.
inline void store_float_shares(std::span<const float, kBands> values,
                               std::span<int16_t, kBands> shares)
{
    float total = 0;
    for (const float value : values) {
        total += value;
    }
    for (size_t band = 0; band < kBands; ++band) {
        const float share = 32768.0f * (values[band] / total);
        shares[band] =
            std::isnan(share) ? int16_t{0} : static_cast<int16_t>(static_cast<int32_t>(share));
    }
}

inline Values condense_float(std::span<const FloatFeatures> frames)
{
    const auto count = static_cast<float>(frames.size());
    std::array<float, kBands> mean{};
    std::array<float, kBands> spread{};
    for (size_t band = 0; band < kBands; ++band) {
        float energies = 0;
        float amplitudes = 0;
        for (const FloatFeatures& frame : frames) {
            energies += frame.energy[band];
            amplitudes += frame.amplitude[band];
        }
        mean[band] = rounded_root(energies / count);
        const float average = amplitudes / count;
        float squares = 0;
        for (const FloatFeatures& frame : frames) {
            const float distance = frame.amplitude[band] - average;
            const float square = distance * distance;
            squares += square;
        }
        spread[band] = rounded_root(squares / (count - 1));
    }
    Values values{};
    store_float_shares(mean, std::span(values).first<kBands>());
    store_float_shares(spread, std::span(values).last<kBands>());
    return values;
}

} // namespace kz::model
