/// @file
/// The fixed-point histogram equaliser: replaces each sample of a frame by its rank among them.
///
/// Samples are Q29 or Q30 words, though any words will do: only their order and spacing count.
/// Ranks are Q30 fractions of a frame of 32768 samples, less their mean, so about -2^29 .. 2^29.
/// The factor 2^15 that makes them Q30 does not follow the frame's length.
#include <algorithm>
#include <limits>
#include <span>

#include "kzsdk/dsp/fxp.h"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/qv/byte_levels.hpp"
#include "kzsdk/qv/equalise.hpp"
#include "kzsdk/qvfixed/qvfixed.h"

namespace {

using namespace kz::fxp;

using Samples = std::span<const FxpType>;
using Pieces = kz::qv::FramePieces<FxpType>;

// A frame whose halved range is no more than this is silent. That is a range of one step of 16-bit
// audio, 2^14 in Q29, and of two steps at the rates that the resampler leaves at half level.
constexpr int32_t kSilentRange = 8192;

// The smallest and the largest sample of a frame.
struct SampleExtremes {
    kz::kernels::Extremes<int32_t> ends{std::numeric_limits<int32_t>::max(),
                                        std::numeric_limits<int32_t>::min()};

    void take(Samples samples) noexcept
    {
        kz::kernels::active().track_word_extremes(ends, samples.data(),
                                                  static_cast<uint32_t>(samples.size()));
    }

    // Halved before they are subtracted, so that the difference fits 32 bits.
    int32_t bottom() const noexcept { return ends.low >> 1; }
    int32_t range() const noexcept { return wrap_sub(ends.high >> 1, ends.low >> 1); }
    bool is_silent() const noexcept { return range() <= kSilentRange; }
};

// Maps halved samples to levels 0 .. K - 1 by a multiplication with (K - 1) / range.
//
// With R = range * 2^zeros / 2^32 in [0.5, 1), the scale is (K - 1) / R in Q22, and the product of
// a halved sample and the scale has 22 - zeros bits too many. That holds for 129 to 256 levels,
// where `bits` is 9. With fewer levels the scale is too large and the upper levels take most of the
// samples; with more it is too small and only the lower levels are used. Both are clamped into the
// table.
class Quantiser {
public:
    Quantiser(int32_t bottom, int32_t range, uint32_t levels) noexcept
        : bottom_(bottom), top_level_(static_cast<int32_t>(levels - 1))
    {
        const int32_t zeros = leading_zeros(static_cast<uint32_t>(range));
        const uint32_t normalised_q32 = shift_left(static_cast<uint32_t>(range), zeros);
        const uint32_t inverse_q31 = KZDSP_Reciprocal(normalised_q32);
        const int32_t bits = 33 - leading_zeros(levels - 1);
        scale_q22_ = static_cast<int32_t>((levels - 1) * shift_right(inverse_q31, bits));
        shift_ = zeros > 22 ? 31 : 22 - zeros;
    }

    // The level of one sample. The clamp matters outside of 129 to 256 levels, and for a range of 0
    // in the one-piece form, which has no reciprocal.
    int32_t level(FxpType sample) const noexcept
    {
        const int32_t level = smul_high(wrap_sub(sample >> 1, bottom_), scale_q22_) >> shift_;
        return std::clamp(level, 0, top_level_);
    }

    // Writes the levels of all samples, one byte each, and counts them: there are at most 256
    // levels.
    void write_levels(Samples samples, uint8_t* levels,
                      std::span<uint32_t> histogram) const noexcept
    {
        kz::kernels::active().word_levels({bottom_, scale_q22_, shift_, top_level_}, samples.data(),
                                          levels, static_cast<uint32_t>(samples.size()),
                                          histogram.data());
    }

private:
    int32_t bottom_;
    int32_t top_level_;
    int32_t scale_q22_ = 0;
    int32_t shift_ = 0;
};

// Writes each sample's level to its place in the output and counts the levels.
void quantise(Samples samples, const Quantiser& quantiser, FxpType* output,
              std::span<uint32_t> histogram) noexcept
{
    for (size_t i = 0; i < samples.size(); ++i) {
        const int32_t level = quantiser.level(samples[i]);
        ++histogram[static_cast<uint32_t>(level)];
        output[i] = level;
    }
}

// Turns the counts of the levels into their ranks: cumulative counts less their mean, as Q30
// fractions of 32768 samples. `total` is the mean times 32768 for that many samples: each sample
// adds the cumulative count of its level. It wraps for frames of more than 65536 samples.
void rank_values(std::span<const uint32_t> histogram, std::span<uint32_t> ranks_q30) noexcept
{
    uint32_t cumulative = 0;
    uint32_t total = 0;
    for (size_t i = 0; i < histogram.size(); ++i) {
        cumulative += histogram[i];
        total = wrap_add(total, wrap_mul(histogram[i], cumulative));
        ranks_q30[i] = cumulative;
    }
    for (uint32_t& rank_q30 : ranks_q30) {
        rank_q30 = wrap_sub(shift_left(rank_q30, 15), total);
    }
}

// What the plumbing of both twins needs of this one.
struct Equaliser {
    using Sample = FxpType;
    using Rank = uint32_t;
    using Extremes = SampleExtremes;

    // Equalises a frame. Up to 256 levels are kept as bytes in the first quarter of the output;
    // more are written as words, where the ranks that replace them will be.
    static void run(const Pieces& pieces, const SampleExtremes& extremes, FxpType* output,
                    std::span<uint32_t> histogram, std::span<uint32_t> ranks) noexcept
    {
        const Quantiser quantiser(extremes.bottom(), extremes.range(),
                                  static_cast<uint32_t>(histogram.size()));
        const std::span<FxpType> frame(output, pieces.older.size() + pieces.newer.size());
        if (histogram.size() <= kz::qv::kMaxByteLevels) {
            const kz::qv::ByteLevels<FxpType> levels(frame);
            quantiser.write_levels(pieces.older, levels.from(0), histogram);
            quantiser.write_levels(pieces.newer, levels.from(pieces.older.size()), histogram);
            rank_values(histogram, ranks);
            levels.replace(std::span<const uint32_t>(ranks));
            return;
        }
        quantise(pieces.older, quantiser, output, histogram);
        quantise(pieces.newer, quantiser, output + pieces.older.size(), histogram);
        rank_values(histogram, ranks);
        for (FxpType& value : frame) {
            value = static_cast<FxpType>(ranks[static_cast<uint32_t>(value)]);
        }
    }
};

} // namespace

kz_status kzqvfixed_hist_eq_dual(const FxpType* first, uint32_t first_count, const FxpType* second,
                                 uint32_t second_count, FxpType* output, uint32_t output_length,
                                 uint32_t* histogram, uint32_t levels) noexcept
{
    return kz::qv::equalise_two_pieces<Equaliser>(first, first_count, second, second_count, output,
                                                  output_length, histogram, levels);
}

kz_status kzqvfixed_hist_eq2(const FxpType* input, FxpType* output, uint32_t count,
                             uint32_t* histogram, uint32_t levels) noexcept
{
    return kz::qv::equalise_one_piece<Equaliser>(input, output, count, histogram, levels);
}
