#include "kzsdk/dsp/resampler.h"

#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/dsp/fxp_ops.hpp"
#include "kzsdk/dsp/polyphase_stream.hpp"

namespace {

using namespace kz::fxp;

struct Conversion {
    uint32_t input_rate;
    uint32_t output_rate;
    uint32_t up;
    uint32_t down;
    const int16_t* (*msb)() noexcept;
    const uint16_t* (*lsb)() noexcept;
    uint32_t (*length)() noexcept;
};

constexpr Conversion kCopy{1, 1, 1, 1, nullptr, nullptr, nullptr};

constexpr Conversion kConversions[] = {
    kCopy,
    {48000, 11025, 147, 640, kzdsp_get_48000_11025_fixed_coeff_msb,
     kzdsp_get_48000_11025_fixed_coeff_lsb, kzdsp_get_48000_11025_fixed_coeff_length},
    {44100, 11025, 1, 4, kzdsp_get_44100_11025_fixed_coeff_msb,
     kzdsp_get_44100_11025_fixed_coeff_lsb, kzdsp_get_44100_11025_fixed_coeff_length},
    {32000, 11025, 441, 1280, kzdsp_get_32000_11025_fixed_coeff_msb,
     kzdsp_get_32000_11025_fixed_coeff_lsb, kzdsp_get_32000_11025_fixed_coeff_length},
    {24000, 11025, 147, 320, kzdsp_get_24000_11025_fixed_coeff_msb,
     kzdsp_get_24000_11025_fixed_coeff_lsb, kzdsp_get_24000_11025_fixed_coeff_length},
    {22050, 11025, 1, 2, kzdsp_get_22050_11025_fixed_coeff_msb,
     kzdsp_get_22050_11025_fixed_coeff_lsb, kzdsp_get_22050_11025_fixed_coeff_length},
    {2, 1, 1, 2, kzdsp_get_22050_11025_fixed_coeff_msb, kzdsp_get_22050_11025_fixed_coeff_lsb,
     kzdsp_get_22050_11025_fixed_coeff_length},
    {16000, 11025, 441, 640, kzdsp_get_16000_11025_fixed_coeff_msb,
     kzdsp_get_16000_11025_fixed_coeff_lsb, kzdsp_get_16000_11025_fixed_coeff_length},
    {8000, 11025, 441, 320, kzdsp_get_8000_11025_fixed_coeff_msb,
     kzdsp_get_8000_11025_fixed_coeff_lsb, kzdsp_get_8000_11025_fixed_coeff_length},
};

const Conversion* find_conversion(uint32_t input_rate, uint32_t output_rate) noexcept
{
    if (input_rate == 0 || output_rate == 0) {
        return nullptr;
    }
    for (const Conversion& conversion : kConversions) {
        if (conversion.input_rate == input_rate && conversion.output_rate == output_rate) {
            return &conversion;
        }
    }
    return input_rate == output_rate ? &kCopy : nullptr;
}

struct Halves {
    int32_t high; // signed
    uint32_t low; // unsigned
};

constexpr Halves halves(int32_t word) noexcept
{
    return {word >> 16, static_cast<uint32_t>(word) & 0xffffU};
}

// low1 * high1 + low2 * high2, the middle of a product of 32-bit words. May wrap: see the header.
constexpr int32_t cross_products(Halves sample, int32_t msb, uint32_t lsb) noexcept
{
    return wrap_add(wrap_mul(sample.high, static_cast<int32_t>(lsb)),
                    wrap_mul(static_cast<int32_t>(sample.low), msb));
}

// One phase of the prototype against a window inside the block, in units of 2^-31 of the product.
int32_t polyphase(const KZDSP_resampler_fixed& r, const int32_t* window, uint32_t phase) noexcept
{
    const int32_t* newest = window + r.taps_per_phase - 1;
    int32_t sum = 0;
    for (uint32_t k = 0; k < r.taps_per_phase; ++k) {
        const uint32_t tap = phase + k * r.up;
        const Halves sample = halves(*(newest - k));
        const int32_t high = wrap_mul(2 * r.msb[tap], sample.high);
        const int32_t middle = cross_products(sample, r.msb[tap], r.lsb[tap]) >> 15;
        sum = wrap_add(sum, wrap_add(high, middle));
    }
    return sum;
}

// The symmetric filters of the integer decimators: a pair of samples is added before it is
// multiplied, and the product counts in units of 2^-32. (Polyphase filters count in 2^-31: so 22050
// and 44100 Hz come out at half level, which later stages level out.)
int32_t tap_product(const KZDSP_resampler_fixed& r, uint32_t tap, int32_t sample) noexcept
{
    const Halves s = halves(sample);
    return wrap_add(wrap_mul(r.msb[tap], s.high), cross_products(s, r.msb[tap], r.lsb[tap]) >> 16);
}

int32_t pair_product(const KZDSP_resampler_fixed& r, const int32_t* newest, uint32_t tap,
                     uint32_t centre) noexcept
{
    return tap_product(r, tap, wrap_add(*(newest - tap), *(newest - (2 * centre - tap))));
}

// Every even tap and the centre; the other odd taps are zero.
int32_t half_band(const KZDSP_resampler_fixed& r, const int32_t* window) noexcept
{
    constexpr uint32_t kCentre = 21;
    const int32_t* newest = window + r.taps_per_phase - 1;
    int32_t sum = tap_product(r, kCentre, *(newest - kCentre));
    for (uint32_t tap = 2; tap < kCentre; tap += 2) {
        sum = wrap_add(sum, pair_product(r, newest, tap, kCentre));
    }
    return sum;
}

// Three taps of four and the centre; every tap whose index is 3 modulo 4 is zero but the centre.
int32_t quarter_band(const KZDSP_resampler_fixed& r, const int32_t* window) noexcept
{
    constexpr uint32_t kCentre = 43;
    const int32_t* newest = window + r.taps_per_phase - 1;
    int32_t sum = tap_product(r, kCentre, *(newest - kCentre));
    for (uint32_t tap = 4; tap < kCentre; tap += 4) {
        for (uint32_t i = 0; i < 3; ++i) {
            sum = wrap_add(sum, pair_product(r, newest, tap + i, kCentre));
        }
    }
    return sum;
}

using Samples = std::span<const int32_t>;

struct Taps {
    const int16_t* msb;
    const uint16_t* lsb;
    uint32_t stride;
};

// Products of the samples, newest first, with the taps from `first_tap` on.
int32_t add_products(int32_t sum, Samples samples, const Taps& taps, size_t first_tap,
                     int32_t shift) noexcept
{
    for (size_t k = 0; k < samples.size(); ++k) {
        const size_t i = (first_tap + k) * taps.stride;
        const int32_t tap = (taps.msb[i] * 65536) | taps.lsb[i];
        const int64_t product = smul(samples[samples.size() - 1 - k], tap);
        const auto high = static_cast<uint32_t>(static_cast<uint64_t>(product) >> 32);
        const auto low = static_cast<uint32_t>(low_word(product));
        sum = static_cast<int32_t>(static_cast<uint32_t>(sum) + shift_left(high, shift) +
                                   shift_right(low, 32 - shift));
    }
    return sum;
}

int32_t dual_convolve(Samples newer, Samples older, const Taps& taps, int32_t shift) noexcept
{
    const int32_t sum = add_products(0, newer, taps, 0, shift);
    return add_products(sum, older, taps, newer.size(), shift);
}

kz::dsp::BlockCounts resample(KZDSP_resampler_fixed& r, Samples input,
                              std::span<int32_t> output) noexcept
{
    if (kz::dsp::copies(r)) {
        return kz::dsp::copy_block(input, output);
    }
    const auto across = [&r](Samples newer, Samples older, uint32_t phase) {
        return dual_convolve(newer, older, {r.msb + phase, r.lsb + phase, r.up}, r.up == 1 ? 0 : 1);
    };
    if (r.up != 1) {
        return kz::dsp::resample_block(
            r, input, output,
            [&r](const int32_t* window, uint32_t phase) { return polyphase(r, window, phase); },
            across);
    }
    if (r.down == 4) {
        return kz::dsp::resample_block(
            r, input, output,
            [&r](const int32_t* window, uint32_t) { return quarter_band(r, window); }, across);
    }
    return kz::dsp::resample_block(
        r, input, output, [&r](const int32_t* window, uint32_t) { return half_band(r, window); },
        across);
}

} // namespace

KZDSP_resampler_fixed* KZDSP_resampler_fixed_create(uint32_t input_rate,
                                                    uint32_t output_rate) noexcept
{
    const Conversion* conversion = find_conversion(input_rate >> 15, output_rate >> 15);
    if (conversion == nullptr) {
        return nullptr;
    }
    auto resampler = kz::make_record<KZDSP_resampler_fixed>();
    if (!resampler) {
        return nullptr;
    }
    resampler->up = conversion->up;
    resampler->down = conversion->down;
    if (conversion->length != nullptr) {
        resampler->length = conversion->length();
        resampler->msb = conversion->msb();
        resampler->lsb = conversion->lsb();
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
    const Samples newer(first_count == 0 ? nullptr : first - (first_count - 1), first_count);
    const Samples older(second_count == 0 ? nullptr : second - (second_count - 1), second_count);
    return dual_convolve(newer, older, {msb, lsb, stride}, shift);
}
