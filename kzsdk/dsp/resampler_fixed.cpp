/// @file
/// The fixed-point resampler: seven rates to 11025 Hz, halving of any rate, and copying.
///
/// Samples are Q29 or Q30 words, taps Q31 words in two 16-bit halves; a product of the two is taken
/// from bit 31 on, which keeps the samples' format, or for L = 1 from bit 32 on, which halves the
/// level. Sums wrap. Windows that reach into the history take exact products, those inside a block
/// the rounding of the kernels, so a cut may show in the last bits.
#include "kzsdk/dsp/resampler.h"

#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/dsp/polyphase_stream.hpp"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/tables.hpp"

namespace {

using namespace kz::fxp;

/// A ratio that has a filter: its rates in whole hertz, L, M, and the taps in two forms. The halves
/// are what callers can read; the rows are what the loops read, phase by phase.
struct RatePair {
    uint32_t input_rate;
    uint32_t output_rate;
    uint32_t up;
    uint32_t down;
    const int16_t* (*msb)() noexcept;
    const uint16_t* (*lsb)() noexcept;
    uint32_t (*length)() noexcept;
    const kz::kernels::PhaseRows* rows;
};

constexpr RatePair kCopy{1, 1, 1, 1, nullptr, nullptr, nullptr, nullptr};

// Searched in this order.
constexpr RatePair kRatePairs[] = {
    kCopy,
    {48000, 11025, 147, 640, kzdsp_get_48000_11025_fixed_coeff_msb,
     kzdsp_get_48000_11025_fixed_coeff_lsb, kzdsp_get_48000_11025_fixed_coeff_length,
     &kz::kernels::rows_48000},
    {44100, 11025, 1, 4, kzdsp_get_44100_11025_fixed_coeff_msb,
     kzdsp_get_44100_11025_fixed_coeff_lsb, kzdsp_get_44100_11025_fixed_coeff_length,
     &kz::kernels::rows_44100},
    {32000, 11025, 441, 1280, kzdsp_get_32000_11025_fixed_coeff_msb,
     kzdsp_get_32000_11025_fixed_coeff_lsb, kzdsp_get_32000_11025_fixed_coeff_length,
     &kz::kernels::rows_32000},
    {24000, 11025, 147, 320, kzdsp_get_24000_11025_fixed_coeff_msb,
     kzdsp_get_24000_11025_fixed_coeff_lsb, kzdsp_get_24000_11025_fixed_coeff_length,
     &kz::kernels::rows_24000},
    {22050, 11025, 1, 2, kzdsp_get_22050_11025_fixed_coeff_msb,
     kzdsp_get_22050_11025_fixed_coeff_lsb, kzdsp_get_22050_11025_fixed_coeff_length,
     &kz::kernels::rows_22050},
    {2, 1, 1, 2, kzdsp_get_22050_11025_fixed_coeff_msb, kzdsp_get_22050_11025_fixed_coeff_lsb,
     kzdsp_get_22050_11025_fixed_coeff_length, &kz::kernels::rows_22050},
    {16000, 11025, 441, 640, kzdsp_get_16000_11025_fixed_coeff_msb,
     kzdsp_get_16000_11025_fixed_coeff_lsb, kzdsp_get_16000_11025_fixed_coeff_length,
     &kz::kernels::rows_16000},
    {8000, 11025, 441, 320, kzdsp_get_8000_11025_fixed_coeff_msb,
     kzdsp_get_8000_11025_fixed_coeff_lsb, kzdsp_get_8000_11025_fixed_coeff_length,
     &kz::kernels::rows_8000},
};

/// Null for a rate of 0 and for different rates that the table does not have. Equal rates copy,
/// even where the table has neither.
const RatePair* find_rate_pair(uint32_t input_rate, uint32_t output_rate) noexcept
{
    if (input_rate == 0 || output_rate == 0) {
        return nullptr;
    }
    for (const RatePair& pair : kRatePairs) {
        if (pair.input_rate == input_rate && pair.output_rate == output_rate) {
            return &pair;
        }
    }
    return input_rate == output_rate ? &kCopy : nullptr;
}

using Samples = std::span<const int32_t>;

/// Taps in halves, tap i at i * stride: msb * 2^16 + lsb, Q31.
struct Taps {
    const int16_t* msb;
    const uint16_t* lsb;
    uint32_t stride;
};

// Adds the products of the samples, newest first, and the taps from `first_tap` on to a sum. Each
// product is exact and rounded down to the bits from 32 - shift up. Under the rule for shift counts
// a shift of 0 adds the high words, since the low ones are shifted out.
int32_t add_products(int32_t sum, Samples samples, const Taps& taps, size_t first_tap,
                     int32_t shift) noexcept
{
    for (size_t k = 0; k < samples.size(); ++k) {
        const size_t i = (first_tap + k) * taps.stride;
        const int32_t tap_q31 = (taps.msb[i] * 65536) | taps.lsb[i];
        const int64_t product = smul(samples[samples.size() - 1 - k], tap_q31);
        const auto high = static_cast<uint32_t>(static_cast<uint64_t>(product) >> 32);
        const auto low = static_cast<uint32_t>(low_word(product));
        const uint32_t shifted = wrap_add(shift_left(high, shift), shift_right(low, 32 - shift));
        sum = wrap_add(sum, static_cast<int32_t>(shifted));
    }
    return sum;
}

// One sum over two runs; the taps go on where the newer run ends.
int32_t dual_convolve(Samples newer, Samples older, const Taps& taps, int32_t shift) noexcept
{
    const int32_t sum = add_products(0, newer, taps, 0, shift);
    return add_products(sum, older, taps, newer.size(), shift);
}

// Found by the ratio: the record is public and has no room for a pointer to its row.
const kz::kernels::PhaseRows& rows_of(const KZDSP_resampler_fixed& r) noexcept
{
    for (const RatePair& pair : kRatePairs) {
        if (pair.up == r.up && pair.down == r.down && pair.rows != nullptr) {
            return *pair.rows;
        }
    }
    return *kRatePairs[1].rows; // not reached: every resampler is made from the table
}

// Outputs whose windows reach into the history: each product is exact, and taken from bit 31 on, or
// from bit 32 on when decimating by a whole number. The few samples that such windows touch are
// copied into one run first.
void make_across(const KZDSP_resampler_fixed& r, const kz::kernels::PhaseRows& rows, Samples older,
                 Samples newer, uint32_t phase, std::span<int32_t> outputs) noexcept
{
    const auto& variant = kz::kernels::active();
    const auto convolve = r.up == 1 ? variant.convolve_from_bit_32 : variant.convolve_from_bit_31;
    const kz::dsp::JoinedSamples<int32_t> joined(older, newer, r.taps_per_phase);
    kz::kernels::PhaseWalk walk(r.up, r.down, phase);
    for (int32_t& output : outputs) {
        const size_t row = rows.row_of[walk.tap_phase()];
        output = convolve(joined.begin() + walk.window(), rows.taps + row * rows.row_length,
                          rows.row_length);
        walk.advance();
    }
}

// One block: outputs across the cut by make_across(), those inside by the kernel for the ratio.
kz::dsp::BlockCounts resample(KZDSP_resampler_fixed& r, Samples input,
                              std::span<int32_t> output) noexcept
{
    if (kz::dsp::copies(r)) {
        return kz::dsp::copy_block(input, output);
    }
    const kz::kernels::PhaseRows& rows = rows_of(r);
    const auto& variant = kz::kernels::active();
    const auto run = r.up == 1 ? variant.symmetric : variant.polyphase;
    return kz::dsp::resample_block(
        r, input, output,
        [&](Samples older, Samples newer, uint32_t phase, std::span<int32_t> outputs) {
            make_across(r, rows, older, newer, phase, outputs);
        },
        [&](const int32_t* oldest, uint32_t phase, std::span<int32_t> outputs) {
            run(rows, {oldest, r.taps_per_phase, r.down, phase}, outputs.data(),
                static_cast<uint32_t>(outputs.size()));
        });
}

} // namespace

// Rates are Q15; their fractions are dropped.
KZDSP_resampler_fixed* KZDSP_resampler_fixed_create(uint32_t input_rate,
                                                    uint32_t output_rate) noexcept
{
    const RatePair* pair = find_rate_pair(input_rate >> 15, output_rate >> 15);
    if (pair == nullptr) {
        return nullptr;
    }
    auto resampler = kz::make_record<KZDSP_resampler_fixed>();
    if (!resampler) {
        return nullptr;
    }
    resampler->up = pair->up;
    resampler->down = pair->down;
    if (pair->length != nullptr) {
        resampler->length = pair->length();
        resampler->msb = pair->msb();
        resampler->lsb = pair->lsb();
    }
    if (!kz::dsp::make_history(*resampler)) {
        return nullptr;
    }
    return resampler.release();
}

void KZDSP_resampler_fixed_destroy(KZDSP_resampler_fixed* resampler) noexcept
{
    if (resampler != nullptr) {
        const kz::owned<FxpType[]> history(resampler->history);
        const kz::owned<KZDSP_resampler_fixed> record(resampler);
    }
}

void KZDSP_resampler_fixed_reset(KZDSP_resampler_fixed* resampler) noexcept
{
    if (resampler != nullptr) {
        kz::dsp::restart(*resampler);
    }
}

uint32_t KZDSP_resampler_fixed_compute_resampled_length(const KZDSP_resampler_fixed* resampler,
                                                        uint32_t count) noexcept
{
    return resampler == nullptr ? 0 : kz::dsp::resampled_length(*resampler, count);
}

uint32_t KZDSP_resampler_fixed_compute_raw_length(const KZDSP_resampler_fixed* resampler,
                                                  uint32_t count) noexcept
{
    return resampler == nullptr ? 0 : kz::dsp::raw_length(*resampler, count);
}

void KZDSP_resampler_fixed_resample(KZDSP_resampler_fixed* resampler, const FxpType* input,
                                    uint32_t input_count, FxpType* output, uint32_t output_capacity,
                                    uint32_t* consumed, uint32_t* produced) noexcept
{
    kz::dsp::resample_call(resampler, kz::dsp::block(input, input_count),
                           kz::dsp::block(output, output_capacity), consumed, produced, resample);
}

FxpType KZDSP_DualConvolveFixed(const FxpType* first, uint32_t first_count, const FxpType* second,
                                uint32_t second_count, const int16_t* msb, const uint16_t* lsb,
                                uint32_t stride, int32_t shift) noexcept
{
    if (msb == nullptr || lsb == nullptr || (first == nullptr && first_count != 0) ||
        (second == nullptr && second_count != 0)) {
        return 0;
    }
    // The pointers are those of the newest samples; a run begins at its oldest.
    const Samples newer(first_count == 0 ? nullptr : first - (first_count - 1), first_count);
    const Samples older(second_count == 0 ? nullptr : second - (second_count - 1), second_count);
    return dual_convolve(newer, older, {msb, lsb, stride}, shift);
}
