/// @file
/// What the fixed-point fingerprinter brings to the feed loop and the life cycle of kzsdk/qv.
#pragma once

#include <cstdint>
#include <span>

#include "kzsdk/dsp/convert.h"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/qv/fingerprinter.hpp"
#include "kzsdk/qvfixed/qvfixed.h"

namespace kz::qvfixed {

/// The fixed-point twin. Its samples are Q29 words when the input is mono and Q30 words when it is
/// mixed down; a resampler leaves 22050 and 44100 Hz at half that level.
struct Twin {
    using Object = kzqvfixed_fingerprinter;
    using Sample = FxpType;
    using Config = kzqvfixed_config;

    /// Samples are Q29 or Q30; the detector judges them in units of 2^-16 or 2^-17 of full scale.
    static constexpr int32_t kDetectorShift = 13;

    /// In the order of the formats' numbers. Mono becomes Q29, mixed channels become Q30.
    static constexpr qv::Converters<Sample> kConverters[] = {
        {KZDSP_PCM8ToQ29, KZDSP_StereoPCM8ToMonoQ30, KZDSP_NChannelPCM8ToMonoQ30},
        {KZDSP_PCM16ToQ29, KZDSP_StereoPCM16ToMonoQ30, KZDSP_NChannelPCM16ToMonoQ30},
        {KZDSP_ALawToQ29, KZDSP_StereoALawToMonoQ30, KZDSP_NChannelALawToMonoQ30},
        {KZDSP_uLawToQ29, KZDSP_StereouLawToMonoQ30, KZDSP_NChanneluLawToMonoQ30},
    };

    static constexpr auto create_config = kzqvfixed_config_create;
    static constexpr auto destroy_config = kzqvfixed_config_destroy;
    static constexpr auto reset_resampler = KZDSP_resampler_fixed_reset;
    static constexpr auto destroy_resampler = KZDSP_resampler_fixed_destroy;
    static constexpr auto create_frame_manager = kzqvfixed_frame_manager_create;
    static constexpr auto destroy_frame_manager = kzqvfixed_frame_manager_destroy;
    static constexpr auto reset_frame_manager = kzqvfixed_frame_manager_reset;
    static constexpr auto get_fingerprint_size = kzqvfixed_frame_manager_get_fingerprint_size;
    static constexpr auto get_fingerprint = kzqvfixed_frame_manager_get_fingerprint;
    static constexpr auto get_frame_count = kzqvfixed_frame_manager_get_frame_count;
    static constexpr auto get_percent_progress = kzqvfixed_frame_manager_get_percent_progress;
    static constexpr auto create_detector = kzqvfixed_signal_detector_create;
    static constexpr auto destroy_detector = kzqvfixed_signal_detector_destroy;
    static constexpr auto reset_detector = kzqvfixed_signal_detector_reset;

    /// Null for a rate that is not in the resampler's table. Rates become Q15; the configured one
    /// has 12 fraction bits.
    static KZDSP_resampler_fixed* make_resampler(uint32_t input_rate, const Config& config) noexcept
    {
        constexpr uint32_t kFirstRateTooHigh = 1U << 17; // hertz in Q15 no longer fit 32 bits
        if (input_rate >= kFirstRateTooHigh) {
            return nullptr;
        }
        return KZDSP_resampler_fixed_create(input_rate << 15, config.sample_rate * 8);
    }

    static dsp::BlockCounts resample(Object& o, std::span<const Sample> input,
                                     std::span<Sample> output) noexcept
    {
        dsp::BlockCounts counts{};
        KZDSP_resampler_fixed_resample(
            o.resampler, input.data(), static_cast<uint32_t>(input.size()), output.data(),
            static_cast<uint32_t>(output.size()), &counts.consumed, &counts.produced);
        return counts;
    }

    static uint32_t signal_offset(Object& o, std::span<const Sample> samples) noexcept
    {
        return kzqvfixed_signal_detector_get_signal_offset(o.signal_detector, samples.data(),
                                                           static_cast<uint32_t>(samples.size()),
                                                           kDetectorShift);
    }

    /// A ring in two pieces. The second is empty when the frame starts at the ring's beginning.
    static void append_frame(Object& o, std::span<const Sample> older,
                             std::span<const Sample> newer) noexcept
    {
        static_cast<void>(kzqvfixed_frame_manager_append_dual_PCM_data(
            o.frame_manager, older.data(), static_cast<uint32_t>(older.size()), newer.data(),
            static_cast<uint32_t>(newer.size())));
    }

    static bool reached_limit(const Object& o) noexcept
    {
        return kzqvfixed_frame_manager_reached_frame_limit(o.frame_manager) != 0;
    }

    /// In 32 bits: wraps beyond 4.29 million samples (390 s).
    static uint32_t milliseconds(const Object& o, uint32_t samples) noexcept
    {
        return fxp::wrap_mul(samples, 1000U) / (o.working_rate >> 12);
    }

    static double seconds(const Object& o, uint32_t samples) noexcept
    {
        return static_cast<double>(samples) / (o.working_rate >> 12);
    }
};

using Fingerprinter = qv::Fingerprinter<Twin>;

} // namespace kz::qvfixed
