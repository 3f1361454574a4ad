/// @file
/// The floating-point signal detector: finds where leading silence ends.
///
/// Each sample counts as the whole number that it is truncated to, so full scale has to be 32768:
/// audio scaled to +-1 is silence. The sums are the integer sums of the fixed-point twin.
#include <span>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/qv/signal_scan.hpp"
#include "kzsdk/qvfloat/qvfloat.h"

QVSD* QVSD_Create(uint32_t window, uint32_t threshold, int32_t max_deviation) noexcept
{
    return kz::qv::make_detector<QVSD>(window, threshold, max_deviation);
}

void QVSD_Destroy(QVSD* detector) noexcept { kz::qv::free_detector(detector); }

kz_status QVSD_Reset(QVSD* detector) noexcept { return kz::qv::reset_detector(detector); }

uint32_t QVSD_GetSignalOffset(QVSD* detector, const float* samples, uint32_t count) noexcept
{
    if (detector == nullptr || (samples == nullptr && count != 0)) {
        return count;
    }
    return kz::qv::signal_offset(*detector, std::span(samples, count),
                                 [](const float* from, uint32_t number, int32_t* levels) {
                                     kz::kernels::active().truncate(from, levels, number);
                                 });
}
