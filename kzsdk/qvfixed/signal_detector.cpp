/// @file
/// The fixed-point signal detector: finds where leading silence ends.
///
/// Samples are Q29 or Q30 words. Shifted right by 13 they become Q16 or Q17, and the threshold, the
/// greatest deviation and the rings are in those units: 100 is 50 steps of 16-bit audio in mono.
#include <algorithm>
#include <span>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/qv/signal_scan.hpp"
#include "kzsdk/qvfixed/qvfixed.h"

kzqvfixed_signal_detector* kzqvfixed_signal_detector_create(uint32_t window, uint32_t threshold,
                                                            int32_t max_deviation) noexcept
{
    return kz::qv::make_detector<kzqvfixed_signal_detector>(window, threshold, max_deviation);
}

void kzqvfixed_signal_detector_destroy(kzqvfixed_signal_detector* detector) noexcept
{
    kz::qv::free_detector(detector);
}

kz_status kzqvfixed_signal_detector_reset(kzqvfixed_signal_detector* detector) noexcept
{
    return kz::qv::reset_detector(detector);
}

uint32_t kzqvfixed_signal_detector_get_signal_offset(kzqvfixed_signal_detector* detector,
                                                     const FxpType* samples, uint32_t count,
                                                     int32_t shift) noexcept
{
    if (detector == nullptr || (samples == nullptr && count != 0)) {
        return count;
    }
    // A shift of 32 or more leaves no bit, and a negative one counts as large.
    const bool leaves_bits = shift >= 0 && shift < 32;
    return kz::qv::signal_offset(*detector, std::span(samples, count),
                                 [=](const FxpType* from, uint32_t number, int32_t* levels) {
                                     if (leaves_bits) {
                                         kz::kernels::active().shift_towards_zero(from, levels,
                                                                                  number, shift);
                                     } else {
                                         std::fill_n(levels, number, 0);
                                     }
                                 });
}
