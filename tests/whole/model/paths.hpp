/// @file
/// The two paths as tests over both see them: the model's road, the library's number of the
/// algorithm, the filters, and what plain double arithmetic makes of a song.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "whole/model/filter_design.hpp"
#include "whole/model/fingerprint.hpp"
#include "whole/model/ideal.hpp"
#include "whole/model/library_taps.hpp"

namespace kz::model {

/// Length of a designed filter: its zeros and taps, filled up to the next multiple of `up`, by `up`
/// when they are one.
constexpr size_t designed_length(const Ratio& ratio)
{
    const size_t used = leading_zero_taps(ratio) + 20 * std::max(ratio.up, ratio.down) + 1;
    return used + (ratio.up - used % ratio.up);
}

/// The ratio that the floating-point path takes for a rate: the first convergent, of nearest
/// integers, within a millionth of the quotient in single precision.
inline Ratio float_ratio(uint32_t hertz)
{
    const double x = 11025.0f / static_cast<float>(hertz);
    double h = 1, h_before = 0, k = 0, k_before = 1;
    for (double rest = x;;) {
        const double term = std::floor(rest + 0.5);
        h_before = std::exchange(h, term * h + h_before);
        k_before = std::exchange(k, term * k + k_before);
        if (rest == term || std::abs(h / k - x) < x * 1e-6) {
            break;
        }
        rest = 1 / (rest - term);
    }
    Ratio ratio{hertz, static_cast<uint32_t>(std::abs(h)), static_cast<uint32_t>(std::abs(k)), 0};
    ratio.length = designed_length(ratio);
    return ratio;
}

struct FixedPath {
    using Road = Fingerprint;
    static constexpr uint32_t kAlgorithm = 1;
    static constexpr const char* kName = "Fixed";
    /// How far a value may lie from plain double arithmetic, in units of 1 / 32768. The value
    /// itself is cut to an integer, which takes up to 1; the largest distance measured is 1.98.
    static constexpr double kPlainBound = 3.0;

    static Filters filters(const Ratio& ratio) { return library_filters(ratio); }

    static std::span<const Ratio> ratios() { return kRatios; }

    static ideal::Shares plain(const Ratio& ratio, Format format, size_t channels,
                               std::span<const uint8_t> song)
    {
        const std::vector<int32_t> mono = to_mono(format, channels, song);
        return ideal::fingerprint(ratio, ideal::Signal(mono.begin(), mono.end()));
    }
};

struct FloatPath {
    using Road = FloatFingerprint;
    static constexpr uint32_t kAlgorithm = 2;
    static constexpr const char* kName = "Float";
    /// Nothing but that cut: the largest distance measured is 1.00.
    static constexpr double kPlainBound = 1.1;

    static std::vector<float> filters(const Ratio& ratio) { return design(ratio); }

    /// Those of the fixed path, and some that only this path takes.
    static std::span<const Ratio> ratios()
    {
        static const std::vector<Ratio> all = [] {
            std::vector<Ratio> made(std::begin(kRatios), std::end(kRatios));
            for (const uint32_t hertz : {11024u, 12345u, 44056u}) {
                made.push_back(float_ratio(hertz));
            }
            return made;
        }();
        return all;
    }

    static ideal::Shares plain(const Ratio& ratio, Format format, size_t channels,
                               std::span<const uint8_t> song)
    {
        const std::vector<float> mono = to_mono_float(format, channels, song);
        return ideal::float_fingerprint(ratio, ideal::Signal(mono.begin(), mono.end()));
    }
};

using Paths = ::testing::Types<FixedPath, FloatPath>;

struct PathNames {
    template <class Path>
    static std::string GetName(int /*number*/)
    {
        return Path::kName;
    }
};

} // namespace kz::model
