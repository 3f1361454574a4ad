/// @file
/// The floating-point fingerprinter under the names that tests over both twins use.
#pragma once

#include <cstdint>

#include "kzsdk/qvfloat/twin.hpp"
#include "support/twin_objects.hpp"

namespace kz::test {

struct Float : qvfloat::Twin {
    using Detector = QVSD;
    using Manager = QVFM;
    using Edge = float; ///< of a band
    using Fingerprinter = qvfloat::Fingerprinter;

    static constexpr uint32_t kAlgorithm = 2;
    static constexpr uint32_t kSpareCounters = 0; ///< of the equaliser's histogram
    static constexpr double kRankScale = 1;       ///< of the equaliser's output

    static constexpr auto copy_freq_table = QVConfig_CopyFreqTable;
    static constexpr auto set_freq_table = QVConfig_SetFreqTable;
    static constexpr auto hist_eq_dual = ::hist_eq_dual;
    static constexpr auto hist_eq2 = ::hist_eq2;
    static constexpr auto append_dual = QVFM_AppendDualPCMData;
    static constexpr auto limit_reached = QVFM_ReachedFrameLimit;
    static constexpr auto construct = QVFP_Constructor;
    static constexpr auto destruct = QVFP_Destructor;
    static constexpr auto add_samples = QVFP_AddSamples;
    static constexpr auto get_result = QVFP_GetResult;
    static constexpr auto get_object_progress = QVFP_GetPercentProgress;
    static constexpr auto find_signal = QVSD_GetSignalOffset;

    /// The sample of a 16-bit value, from one channel.
    static Sample from_16_bits(int32_t value) { return static_cast<float>(value); }
    /// The sample that the detector judges as `level`.
    static Sample with_level(int32_t level) { return static_cast<float>(level); }
};

} // namespace kz::test
