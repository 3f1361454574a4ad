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

// A frame whose halved range is no more than this is silent.
constexpr int32_t kSilentRange = 8192;

struct SampleExtremes {
    kz::kernels::Extremes<int32_t> ends{std::numeric_limits<int32_t>::max(),
                                        std::numeric_limits<int32_t>::min()};

    void take(Samples samples) noexcept
    {
        kz::kernels::active().track_word_extremes(ends, samples.data(),
                                                  static_cast<uint32_t>(samples.size()));
    }

    // Halved before they are subtracted, so that the difference fits.
    int32_t bottom() const noexcept { return ends.low >> 1; }
    int32_t range() const noexcept { return wrap_sub(ends.high >> 1, ends.low >> 1); }
    bool is_silent() const noexcept { return range() <= kSilentRange; }
};

// Maps halved samples to levels 0 .. K - 1 by a multiplication with (K - 1) / range.
class Quantiser {
public:
    Quantiser(int32_t bottom, int32_t range, uint32_t levels) noexcept
        : bottom_(bottom), top_level_(static_cast<int32_t>(levels - 1))
    {
        const int32_t zeros = leading_zeros(static_cast<uint32_t>(range));
        const uint32_t normalised = shift_left(static_cast<uint32_t>(range), zeros);
        const uint32_t inverse = KZDSP_Reciprocal(normalised);
        const int32_t bits = 33 - leading_zeros(levels - 1);
        scale_ = static_cast<int32_t>((levels - 1) * shift_right(inverse, bits));
        shift_ = zeros > 22 ? 31 : 22 - zeros;
    }

    // The reciprocal can come out a little large, and a range of 0 has none: levels beyond the
    // table are brought back into it.
    int32_t level(FxpType sample) const noexcept
    {
        const int32_t level = smul_high(wrap_sub(sample >> 1, bottom_), scale_) >> shift_;
        return std::clamp(level, 0, top_level_);
    }

    // The same as bytes: there are at most 256 levels.
    void write_levels(Samples samples, uint8_t* levels) const noexcept
    {
        kz::kernels::active().word_levels({bottom_, scale_, shift_, top_level_}, samples.data(),
                                          levels, static_cast<uint32_t>(samples.size()));
    }

private:
    int32_t bottom_;
    int32_t top_level_;
    int32_t scale_ = 0;
    int32_t shift_ = 0;
};

// Writes each sample's level to its place and counts the levels.
void quantise(Samples samples, const Quantiser& quantiser, FxpType* output,
              std::span<uint32_t> histogram) noexcept
{
    for (size_t i = 0; i < samples.size(); ++i) {
        const int32_t level = quantiser.level(samples[i]);
        ++histogram[static_cast<uint32_t>(level)];
        output[i] = level;
    }
}

// Cumulative counts, in units of 1/32768 and less their mean over a frame of 32768 samples.
void rank_values(std::span<const uint32_t> histogram, std::span<uint32_t> ranks) noexcept
{
    uint32_t cumulative = 0;
    uint32_t total = 0;
    for (size_t i = 0; i < histogram.size(); ++i) {
        cumulative += histogram[i];
        total = wrap_add(total, wrap_mul(histogram[i], cumulative));
        ranks[i] = cumulative;
    }
    for (uint32_t& rank : ranks) {
        rank = wrap_sub(shift_left(rank, 15), total);
    }
}

struct Equaliser {
    using Sample = FxpType;
    using Rank = uint32_t;
    using Extremes = SampleExtremes;

    static void run(const Pieces& pieces, const SampleExtremes& extremes, FxpType* output,
                    std::span<uint32_t> histogram, std::span<uint32_t> ranks) noexcept
    {
        const Quantiser quantiser(extremes.bottom(), extremes.range(),
                                  static_cast<uint32_t>(histogram.size()));
        const std::span<FxpType> frame(output, pieces.older.size() + pieces.newer.size());
        if (histogram.size() <= kz::qv::kMaxByteLevels) {
            const kz::qv::ByteLevels<FxpType> levels(frame);
            quantiser.write_levels(pieces.older, levels.from(0));
            quantiser.write_levels(pieces.newer, levels.from(pieces.older.size()));
            levels.count(histogram);
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
