/// @file
/// Rational resampling as one formula over the whole stream.
///
/// The stream is everything fed so far behind `preroll` zeros. Output n is formed from the P
/// samples that start at floor(n * down / up) and the taps of phase ((n + 1) * down) mod up: the
/// phase is one step ahead of the window. Nothing else of the past counts, except one thing in the
/// fixed-point path: which samples arrived in earlier calls. A window that reaches back to them is
/// summed with exact products, a window inside the samples of the present call with products of
/// 16-bit halves that leave out the product of the low halves.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <span>
#include <utility>
#include <vector>

#include "whole/model/words.hpp"

namespace kz::model {

struct Ratio {
    uint32_t hertz; ///< input rate; 2 for the 2:1 decimator
    uint32_t up;
    uint32_t down;
    size_t length; ///< taps; 0 where samples are copied
};

inline constexpr Ratio kCopy{11025, 1, 1, 0};
inline constexpr Ratio kHalf{2, 1, 2, 42};
inline constexpr Ratio kRatios[] = {
    {8000, 441, 320, 9261},   kCopy,
    {16000, 441, 640, 13230}, {22050, 1, 2, 42},
    {24000, 147, 320, 6615},  {32000, 441, 1280, 26460},
    {44100, 1, 4, 84},        {48000, 147, 640, 13377},
};

constexpr size_t raw_length(const Ratio& ratio, size_t outputs)
{
    return (outputs * ratio.down + ratio.up - 1) / ratio.up;
}

constexpr size_t taps_per_phase(const Ratio& ratio)
{
    return (ratio.length + ratio.up - 1) / ratio.up;
}

/// Zeros ahead of the stream: half the filter, so that the first output is centred on sample 0.
constexpr size_t preroll(const Ratio& ratio)
{
    return ratio.length == 0 ? 0 : raw_length(ratio, ratio.length * 128 / ratio.down / 256);
}

/// First sample of the window of output n, counted in the stream with its zeros.
constexpr size_t window_start(const Ratio& ratio, size_t n) { return n * ratio.down / ratio.up; }

constexpr size_t phase_of(const Ratio& ratio, size_t n) { return (n + 1) * ratio.down % ratio.up; }

struct StreamCounts {
    size_t consumed;
    size_t produced;
};

/// Everything fed so far, and how many outputs were made of it.
template <class Sample>
class SampleStream {
public:
    explicit SampleStream(const Ratio& ratio) : ratio_(ratio) { reset(); }

    void reset()
    {
        stream_.assign(preroll(ratio_), 0);
        outputs_ = 0;
    }

    const Ratio& ratio() const { return ratio_; }

    /// Fills `output` from the start as far as `input` reaches. `sum(window, phase, reaches_back)`
    /// makes an output of the samples of its window as the taps meet them, the newest first.
    template <class Sum>
    StreamCounts resample(std::span<const Sample> input, std::span<Sample> output, Sum sum)
    {
        if (ratio_.up == 1 && ratio_.down == 1) {
            const size_t count = std::min(input.size(), output.size());
            std::copy_n(input.begin(), count, output.begin());
            return {count, count};
        }
        const size_t before = stream_.size();
        stream_.insert(stream_.end(), input.begin(), input.end());
        size_t produced = 0;
        while (produced < output.size() && next_need() <= stream_.size()) {
            const bool reaches_back = window_start(ratio_, outputs_) < before;
            output[produced++] = sum(window(), phase_of(ratio_, outputs_), reaches_back);
            ++outputs_;
        }
        stream_.resize(std::min(next_need(), stream_.size()));
        return {stream_.size() - before, produced};
    }

private:
    size_t next_need() const { return window_start(ratio_, outputs_) + taps_per_phase(ratio_); }

    auto window() const
    {
        return std::make_reverse_iterator(stream_.begin() + static_cast<ptrdiff_t>(next_need()));
    }

    Ratio ratio_;
    std::vector<Sample> stream_; ///< preroll and everything consumed
    size_t outputs_ = 0;
};

/// One plain sum, whatever the call: rounded after each product and each addition.
class FloatResampler {
public:
    FloatResampler(const Ratio& ratio, std::vector<float> taps)
        : stream_(ratio), taps_(std::move(taps))
    {
    }

    const Ratio& ratio() const { return stream_.ratio(); }

    StreamCounts resample(std::span<const float> input, std::span<float> output)
    {
        return stream_.resample(input, output, [this](auto sample, size_t phase, bool) {
            float sum = 0;
            for (size_t tap = phase; tap < taps_.size(); tap += ratio().up) {
                const float product = *sample++ * taps_[tap];
                sum += product;
            }
            return sum;
        });
    }

private:
    SampleStream<float> stream_;
    std::vector<float> taps_;
};

class Resampler {
public:
    using Counts = StreamCounts;

    /// `taps` are the ratio's, in Q31; none for the copy.
    Resampler(const Ratio& ratio, std::vector<int32_t> taps)
        : stream_(ratio), taps_(std::move(taps))
    {
    }

    void reset() { stream_.reset(); }

    const Ratio& ratio() const { return stream_.ratio(); }

    Counts resample(std::span<const int32_t> input, std::span<int32_t> output)
    {
        return stream_.resample(input, output,
                                [this](auto sample, size_t phase, bool reaches_back) {
                                    if (reaches_back) {
                                        return exact_sum(sample, phase);
                                    }
                                    return ratio().up == 1 ? split_decimation_sum(sample)
                                                           : split_polyphase_sum(sample, phase);
                                });
    }

private:
    using Window = std::reverse_iterator<std::vector<int32_t>::const_iterator>;

    int32_t exact_sum(const Window& sample, size_t phase) const
    {
        const int shift = ratio().up == 1 ? 32 : 31;
        int64_t sum = 0;
        for (size_t k = 0; k < taps_per_phase(ratio()); ++k) {
            sum += (int64_t{sample[static_cast<ptrdiff_t>(k)]} * taps_[phase + k * ratio().up]) >>
                   shift;
        }
        return word(sum);
    }

    int32_t split_polyphase_sum(const Window& sample, size_t phase) const
    {
        int64_t sum = 0;
        for (size_t k = 0; k < taps_per_phase(ratio()); ++k) {
            const auto [high, low] = halves(sample[static_cast<ptrdiff_t>(k)]);
            const auto [msb, lsb] = halves(taps_[phase + k * ratio().up]);
            sum += 2 * msb * high + (word(high * lsb + msb * low) >> 15);
        }
        return word(sum);
    }

    /// Symmetric filters: the two samples that share a tap are added first, in 32 bits. Every tap
    /// at a whole number of `down` beside the centre is zero and left out.
    int32_t split_decimation_sum(const Window& newest) const
    {
        const uint32_t down = ratio().down;
        const size_t centre = 10 * down + down - 1;
        const auto sample = [&newest](size_t k) { return newest[static_cast<ptrdiff_t>(k)]; };
        int64_t sum = split_high_product(taps_[centre], sample(centre));
        for (size_t away = 1; away < 10 * down; ++away) {
            if (away % down != 0) {
                const int32_t pair = word(int64_t{sample(centre - away)} + sample(centre + away));
                sum += split_high_product(taps_[centre - away], pair);
            }
        }
        return word(sum);
    }

    struct Halves {
        int64_t high; ///< signed
        int64_t low;  ///< unsigned
    };

    static Halves halves(int32_t value) { return {value >> 16, value & 0xffff}; }

    static int64_t split_high_product(int32_t tap, int32_t value)
    {
        const auto [high, low] = halves(value);
        const auto [msb, lsb] = halves(tap);
        return msb * high + (word(low * msb + high * lsb) >> 16);
    }

    SampleStream<int32_t> stream_;
    std::vector<int32_t> taps_;
};

} // namespace kz::model
