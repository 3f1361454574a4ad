/// @file
/// The floating-point histogram equaliser: replaces each sample of a frame by its rank among them.
///
/// Samples are single precision with full scale at 32768; ranks are fractions of the frame less
/// their mean, so about -1/2 .. 1/2. All sums run in one fixed order without fused products: the
/// order is part of the result.
#include <algorithm>
#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/abs/saturate.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/qv/byte_levels.hpp"
#include "kzsdk/qv/equalise.hpp"
#include "kzsdk/qvfloat/qvfloat.h"

namespace {

using Samples = std::span<const float>;
using Pieces = kz::qv::FramePieces<float>;

// A frame whose range is no more than this, one step of 16-bit audio, is silent.
constexpr float kSilentRange = 1.0F;

// The smallest and the largest sample of a frame. The search starts beyond any sample of 16 bits,
// not at the ends of the type: a frame that lies wholly beyond a million is measured from there.
struct SampleExtremes {
    kz::kernels::Extremes<float> ends{1e6F, -1e6F};

    void take(Samples samples) noexcept
    {
        kz::kernels::active().track_float_extremes(ends, samples.data(),
                                                   static_cast<uint32_t>(samples.size()));
    }

    float range() const noexcept { return ends.high - ends.low; }
    bool is_silent() const noexcept { return range() <= kSilentRange; }
};

// Maps samples to levels 0 .. K - 1: (sample - bottom) * (K - 1) / range, truncated.
class Quantiser {
public:
    // A constant frame in one piece has a range of 0.
    Quantiser(const SampleExtremes& extremes, uint32_t levels) noexcept
        : bottom_(extremes.ends.low), scale_(static_cast<float>(levels - 1) / extremes.range()),
          top_level_(levels - 1)
    {
    }

    // The level of one sample. A constant frame has an infinite scale, and a sample need not be a
    // number: NaN becomes level 0, and no level may leave the table.
    uint32_t level(float sample) const noexcept
    {
        return std::min(kz::to_uint32((sample - bottom_) * scale_), top_level_);
    }

    // Writes the levels of all samples, one byte each, and counts them: there are at most 256
    // levels.
    void write_levels(Samples samples, uint8_t* levels,
                      std::span<uint32_t> histogram) const noexcept
    {
        kz::kernels::active().float_levels({bottom_, scale_, static_cast<int32_t>(top_level_)},
                                           samples.data(), levels,
                                           static_cast<uint32_t>(samples.size()), histogram.data());
    }

private:
    float bottom_;
    float scale_;
    uint32_t top_level_;
};

// Counts the levels of samples. They are not stored: map_levels() works them out again.
void count_levels(Samples samples, const Quantiser& quantiser,
                  std::span<uint32_t> histogram) noexcept
{
    for (const float sample : samples) {
        ++histogram[quantiser.level(sample)];
    }
}

// Turns the counts of the levels into their ranks: cumulative shares of `count` samples less their
// mean over the samples. Products are rounded before they are added.
void rank_values(std::span<const uint32_t> histogram, float count, std::span<float> ranks) noexcept
{
    float cumulative = 0;
    float total = 0;
    for (size_t i = 0; i < histogram.size(); ++i) {
        const auto here = static_cast<float>(histogram[i]);
        cumulative = cumulative + here / count;
        total = total + cumulative * here;
        ranks[i] = cumulative;
    }
    const float mean = total / count;
    for (float& rank : ranks) {
        rank -= mean;
    }
}

// Writes the rank of each sample.
void map_levels(Samples samples, const Quantiser& quantiser, std::span<const float> ranks,
                float* output) noexcept
{
    for (size_t i = 0; i < samples.size(); ++i) {
        output[i] = ranks[quantiser.level(samples[i])];
    }
}

// What the plumbing of both twins needs of this one.
struct Equaliser {
    using Sample = float;
    using Rank = float;
    using Extremes = SampleExtremes;

    // Equalises a frame. Up to 256 levels are kept as bytes in the first quarter of the output;
    // more are worked out twice.
    static void run(const Pieces& pieces, const SampleExtremes& extremes, float* output,
                    std::span<uint32_t> histogram, std::span<float> ranks) noexcept
    {
        const Quantiser quantiser(extremes, static_cast<uint32_t>(histogram.size()));
        const std::span<float> frame(output, pieces.older.size() + pieces.newer.size());
        const auto count = static_cast<float>(frame.size());
        if (histogram.size() <= kz::qv::kMaxByteLevels) {
            const kz::qv::ByteLevels<float> levels(frame);
            quantiser.write_levels(pieces.older, levels.from(0), histogram);
            quantiser.write_levels(pieces.newer, levels.from(pieces.older.size()), histogram);
            rank_values(histogram, count, ranks);
            levels.replace(std::span<const float>(ranks));
            return;
        }
        count_levels(pieces.older, quantiser, histogram);
        count_levels(pieces.newer, quantiser, histogram);
        rank_values(histogram, count, ranks);
        map_levels(pieces.older, quantiser, ranks, output);
        map_levels(pieces.newer, quantiser, ranks, output + pieces.older.size());
    }
};

} // namespace

// The form that brings its own counters. It is short of memory twice: once here, once in
// hist_eq2().
kz_status hist_eq(const float* input, float* output, uint32_t count, uint32_t levels) noexcept
{
    if (input == nullptr || output == nullptr || levels == 0) {
        return KZ_OK;
    }
    const auto histogram = kz::make_array<uint32_t>(levels);
    if (!histogram) {
        kz::qv::copy_unless_in_place(input, output, count);
        return KZ_OK;
    }
    return hist_eq2(input, output, count, histogram.get(), levels);
}

kz_status hist_eq2(const float* input, float* output, uint32_t count, uint32_t* histogram,
                   uint32_t levels) noexcept
{
    return kz::qv::equalise_one_piece<Equaliser>(input, output, count, histogram, levels);
}

kz_status hist_eq_dual(const float* first, uint32_t first_count, const float* second,
                       uint32_t second_count, float* output, uint32_t output_length,
                       uint32_t* histogram, uint32_t levels) noexcept
{
    return kz::qv::equalise_two_pieces<Equaliser>(first, first_count, second, second_count, output,
                                                  output_length, histogram, levels);
}
