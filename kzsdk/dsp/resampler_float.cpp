/// @file
/// The floating-point resampler: any ratio of two rates that a filter can be designed for.
///
/// Everything is single precision. An output is one sum over P products, newest sample first, each
/// product and each sum rounded: the order is the same across a cut and inside a block, so cuts do
/// not show. Upsampling gains L / M.
#include <limits>
#include <memory>
#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/dsp/convolve.h"
#include "kzsdk/dsp/filter_design.hpp"
#include "kzsdk/dsp/polyphase_stream.hpp"
#include "kzsdk/dsp/resampler.h"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/tables.hpp"

namespace {

constexpr double kTolerance = 1e-6; // relative

// Finite and above 0; NaN is neither. Two negative rates would have a quotient, but are refused.
bool is_rate(float hertz) noexcept
{
    return hertz > 0 && hertz <= std::numeric_limits<float>::max();
}

// L / M is the first convergent of the quotient's continued fraction that lies within one part in a
// million. Rates that are closer than that count as equal.
void set_ratio(KZDSP_resampler& r, float input_rate, float output_rate) noexcept
{
    const double ratio = output_rate / input_rate; // rounded to single precision first
    int32_t up = 0;
    int32_t down = 0;
    KZDSP_Rationalize(ratio, &up, &down, ratio * kTolerance);
    r.up = static_cast<uint32_t>(up);
    r.down = static_cast<uint32_t>(down);
}

// The two stored filters belong to the library, not to the resampler.
template <size_t Length>
bool use_stored(KZDSP_resampler& r, const float (&taps)[Length]) noexcept
{
    r.taps = taps;
    r.length = Length;
    return true;
}

// The ratios of the fixed-point resampler were designed when the library was built; null for
// others.
const kz::kernels::DesignedFilter* find_designed(const KZDSP_resampler& r) noexcept
{
    for (const kz::kernels::DesignedFilter& filter : kz::kernels::designed_filters) {
        if (filter.up == r.up && filter.down == r.down) {
            return &filter;
        }
    }
    return nullptr;
}

// Interleaves the taps, which are stored phase by phase: what design_windowed_sinc() would write.
void copy_designed(const kz::kernels::DesignedFilter& filter, float* taps) noexcept
{
    const float* tap = filter.taps;
    for (uint32_t phase = 0; phase < filter.up; ++phase) {
        for (uint32_t k = 0; k < filter.taps_per_phase; ++k) {
            taps[phase + size_t{k} * filter.up] = *tap++;
        }
    }
}

// A factor of 0 means that no fraction was found.
bool is_designable(uint32_t factor) noexcept
{
    return factor != 0 && factor <= KZDSP_LARGEST_FACTOR;
}

// Gives the resampler taps of its own. False when memory is short, which a filter beyond the
// largest factor counts as.
bool design(KZDSP_resampler& r) noexcept
{
    if (!is_designable(r.up) || !is_designable(r.down)) {
        return false;
    }
    const kz::dsp::FilterLayout layout = kz::dsp::filter_layout(r.up, r.down);
    auto taps = kz::make_array<float>(layout.length);
    if (!taps) {
        return false;
    }
    r.length = static_cast<uint32_t>(layout.length);
    if (const kz::kernels::DesignedFilter* filter = find_designed(r)) {
        copy_designed(*filter, taps.get());
    } else {
        kz::dsp::design_windowed_sinc(layout, {taps.get(), r.length});
    }
    r.taps = taps.release();
    r.owns_taps = 1;
    return true;
}

// Equal rates need none; decimation by 4 and by 2 has stored filters; all others are designed.
bool choose_filter(KZDSP_resampler& r) noexcept
{
    if (kz::dsp::copies(r)) {
        return true;
    }
    if (r.up == 1 && r.down == 4) {
        return use_stored(r, kz::kernels::coefficients_4to1);
    }
    if (r.up == 1 && r.down == 2) {
        return use_stored(r, kz::kernels::coefficients_2to1);
    }
    return design(r);
}

using Samples = std::span<const float>;

// The taps as the kernels read them. Tables shared by all resamplers have the taps of a phase side
// by side and are faster to read than a resampler's own taps, where those are L apart.
kz::kernels::FloatPhases phases_of(const KZDSP_resampler& r) noexcept
{
    if (const kz::kernels::DesignedFilter* filter = find_designed(r)) {
        return {filter->taps, filter->taps_per_phase, 1, r.taps_per_phase, r.up, r.down};
    }
    return {r.taps, 1, r.up, r.taps_per_phase, r.up, r.down};
}

// Outputs whose windows reach into the history and are too long to be copied into one run.
void make_across(const kz::kernels::FloatPhases& phases, Samples older, Samples newer,
                 uint32_t phase, std::span<float> outputs) noexcept
{
    kz::kernels::PhaseWalk walk(phases.up, phases.down, phase);
    for (float& output : outputs) {
        const Samples rest = older.subspan(static_cast<size_t>(walk.window()));
        const size_t fresh = phases.taps_per_phase - rest.size();
        output = KZDSP_DualConvolve(fresh == 0 ? nullptr : &newer[fresh - 1],
                                    static_cast<uint32_t>(fresh), &rest.back(),
                                    static_cast<uint32_t>(rest.size()),
                                    phases.taps + walk.tap_phase() * phases.phase_stride,
                                    static_cast<uint32_t>(phases.tap_stride));
        walk.advance();
    }
}

kz::dsp::BlockCounts resample(KZDSP_resampler& r, Samples input, std::span<float> output) noexcept
{
    if (kz::dsp::copies(r)) {
        return kz::dsp::copy_block(input, output);
    }
    const kz::kernels::FloatPhases phases = phases_of(r);
    const auto make = [&](const float* oldest, uint32_t phase, std::span<float> outputs) {
        kz::kernels::active().polyphase_floats(phases, oldest, phase, outputs.data(),
                                               static_cast<uint32_t>(outputs.size()));
    };
    // All sums run over the same products in the same order, so that a cut does not show.
    return kz::dsp::resample_block(
        r, input, output,
        [&](Samples older, Samples newer, uint32_t phase, std::span<float> outputs) {
            using Joined = kz::dsp::JoinedSamples<float>;
            if (r.taps_per_phase > Joined::kMaxTaps) {
                return make_across(phases, older, newer, phase, outputs);
            }
            make(Joined(older, newer, r.taps_per_phase).begin(), phase, outputs);
        },
        make);
}

struct Destroy {
    void operator()(KZDSP_resampler* r) const noexcept { KZDSP_DestroyResampler(r); }
};

} // namespace

KZDSP_resampler* KZDSP_CreateResampler(float input_rate, float output_rate) noexcept
{
    if (!is_rate(input_rate) || !is_rate(output_rate)) {
        return nullptr;
    }
    std::unique_ptr<KZDSP_resampler, Destroy> resampler(
        kz::make_record<KZDSP_resampler>().release());
    if (!resampler) {
        return nullptr;
    }
    set_ratio(*resampler, input_rate, output_rate);
    if (!choose_filter(*resampler) || !kz::dsp::make_history(*resampler)) {
        return nullptr;
    }
    return resampler.release();
}

void KZDSP_DestroyResampler(KZDSP_resampler* resampler) noexcept
{
    if (resampler != nullptr) {
        const kz::owned<float[]> taps(
            resampler->owns_taps != 0 ? const_cast<float*>(resampler->taps) : nullptr);
        const kz::owned<float[]> history(resampler->history);
        const kz::owned<KZDSP_resampler> record(resampler);
    }
}

void KZDSP_ResetResampler(KZDSP_resampler* resampler) noexcept
{
    if (resampler != nullptr) {
        kz::dsp::restart(*resampler);
    }
}

uint32_t KZDSP_ComputeResampledLength(const KZDSP_resampler* resampler, uint32_t count) noexcept
{
    return resampler == nullptr ? 0 : kz::dsp::resampled_length(*resampler, count);
}

uint32_t KZDSP_ComputeRawLength(const KZDSP_resampler* resampler, uint32_t count) noexcept
{
    return resampler == nullptr ? 0 : kz::dsp::raw_length(*resampler, count);
}

void KZDSP_Resample(KZDSP_resampler* resampler, const float* input, uint32_t input_count,
                    float* output, uint32_t output_capacity, uint32_t* consumed,
                    uint32_t* produced) noexcept
{
    kz::dsp::resample_call(resampler, kz::dsp::block(input, input_count),
                           kz::dsp::block(output, output_capacity), consumed, produced, resample);
}
