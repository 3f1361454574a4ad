/// @file
/// What the floating-point fingerprinter brings to the feed loop and the life cycle of kzsdk/qv.
#pragma once

#include <cstdint>
#include <span>

#include "kzsdk/abs/saturate.hpp"
#include "kzsdk/dsp/convert.h"
#include "kzsdk/qv/fingerprinter.hpp"
#include "kzsdk/qvfloat/qvfloat.h"

namespace kz::qvfloat {

/// The floating-point twin. Its samples have full scale at 32768; two channels are added, not
/// averaged, and reach twice that.
struct Twin {
    using Object = QVFP;
    using Sample = float;
    using Config = QVConfig;

    /// In the order of the formats' numbers.
    static constexpr qv::Converters<Sample> kConverters[] = {
        {KZDSP_Offset128ToFloat, KZDSP_StereoOffset128ToMonoFloat,
         KZDSP_NChannelOffset128ToMonoFloat},
        {KZDSP_ShortToFloat, KZDSP_StereoShortToMonoFloat, KZDSP_NChannelShortToMonoFloat},
        {KZDSP_ALawToFloat, KZDSP_StereoALawToMonoFloat, KZDSP_NChannelALawToMonoFloat},
        {KZDSP_uLawToFloat, KZDSP_StereouLawToMonoFloat, KZDSP_NChanneluLawToMonoFloat},
    };

    static constexpr auto create_config = QVConfig_Create;
    static constexpr auto destroy_config = QVConfig_Destroy;
    static constexpr auto reset_resampler = KZDSP_ResetResampler;
    static constexpr auto destroy_resampler = KZDSP_DestroyResampler;
    static constexpr auto create_frame_manager = QVFM_Create;
    static constexpr auto destroy_frame_manager = QVFM_Destroy;
    static constexpr auto reset_frame_manager = QVFM_Reset;
    static constexpr auto get_fingerprint_size = QVFM_GetFingerprintSize;
    static constexpr auto get_fingerprint = QVFM_GetFingerprint;
    static constexpr auto get_frame_count = QVFM_GetFrameCount;
    static constexpr auto get_percent_progress = QVFM_GetPercentProgress;
    static constexpr auto create_detector = QVSD_Create;
    static constexpr auto destroy_detector = QVSD_Destroy;
    static constexpr auto reset_detector = QVSD_Reset;

    /// Rates in hertz. Null for one whose ratio has no filter, or none that memory can hold.
    static KZDSP_resampler* make_resampler(uint32_t input_rate, const Config& config) noexcept
    {
        return KZDSP_CreateResampler(static_cast<float>(input_rate), config.sample_rate);
    }

    static dsp::BlockCounts resample(Object& o, std::span<const Sample> input,
                                     std::span<Sample> output) noexcept
    {
        dsp::BlockCounts counts{};
        KZDSP_Resample(o.resampler, input.data(), static_cast<uint32_t>(input.size()),
                       output.data(), static_cast<uint32_t>(output.size()), &counts.consumed,
                       &counts.produced);
        return counts;
    }

    /// Samples count as the whole numbers they are truncated to: no shift is needed.
    static uint32_t signal_offset(Object& o, std::span<const Sample> samples) noexcept
    {
        return QVSD_GetSignalOffset(o.signal_detector, samples.data(),
                                    static_cast<uint32_t>(samples.size()));
    }

    /// A ring in two pieces. The second is empty when the frame starts at the ring's beginning.
    static void append_frame(Object& o, std::span<const Sample> older,
                             std::span<const Sample> newer) noexcept
    {
        static_cast<void>(QVFM_AppendDualPCMData(o.frame_manager, older.data(),
                                                 static_cast<uint32_t>(older.size()), newer.data(),
                                                 static_cast<uint32_t>(newer.size())));
    }

    static bool reached_limit(const Object& o) noexcept
    {
        return QVFM_ReachedFrameLimit(o.frame_manager) != 0;
    }

    /// In single precision: does not wrap, but has 24 bits.
    static uint32_t milliseconds(const Object& o, uint32_t samples) noexcept
    {
        return to_uint32(static_cast<float>(samples) * 1000.0F / o.working_rate);
    }

    static double seconds(const Object& o, uint32_t samples) noexcept
    {
        return static_cast<double>(samples) / static_cast<double>(o.working_rate);
    }
};

using Fingerprinter = qv::Fingerprinter<Twin>;

} // namespace kz::qvfloat
