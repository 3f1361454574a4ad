/// @file
/// The fixed-point fingerprinter under the names that tests over both twins use.
#pragma once

#include <cstdint>

#include "kzsdk/qvfixed/twin.hpp"
#include "support/twin_objects.hpp"

namespace kz::test {

struct Fixed : qvfixed::Twin {
    using Detector = kzqvfixed_signal_detector;
    using Manager = kzqvfixed_frame_manager;
    using Edge = int32_t; ///< of a band
    using Fingerprinter = qvfixed::Fingerprinter;

    static constexpr uint32_t kAlgorithm = 1;
    static constexpr uint32_t kSpareCounters = 1; ///< of the equaliser's histogram
    static constexpr double kRankScale = 0x1p30;  ///< of the equaliser's output

    static constexpr auto copy_freq_table = kzqvfixed_config_copy_freq_table;
    static constexpr auto set_freq_table = kzqvfixed_config_set_freq_table;
    static constexpr auto hist_eq_dual = kzqvfixed_hist_eq_dual;
    static constexpr auto hist_eq2 = kzqvfixed_hist_eq2;
    static constexpr auto append_dual = kzqvfixed_frame_manager_append_dual_PCM_data;
    static constexpr auto limit_reached = kzqvfixed_frame_manager_reached_frame_limit;
    static constexpr auto construct = kzqvfixed_constructor;
    static constexpr auto destruct = kzqvfixed_destructor;
    static constexpr auto add_samples = kzqvfixed_add_samples;
    static constexpr auto get_result = kzqvfixed_get_result;
    static constexpr auto get_object_progress = kzqvfixed_get_percent_progress;

    static uint32_t find_signal(Detector* detector, const Sample* samples, uint32_t count)
    {
        return kzqvfixed_signal_detector_get_signal_offset(detector, samples, count,
                                                           kDetectorShift);
    }

    /// The sample of a 16-bit value, from one channel.
    static Sample from_16_bits(int32_t value) { return value * (1 << 14); }
    /// The sample that the detector judges as `level`.
    static Sample with_level(int32_t level) { return level * (1 << kDetectorShift); }
};

} // namespace kz::test
