#include <span>

#include "kzsdk/dsp/fxp_ops.hpp"
#include "kzsdk/qv/signal_scan.hpp"
#include "kzsdk/qvfixed/qvfixed.h"

namespace {

constexpr int32_t shifted_towards_zero(int32_t sample, int32_t shift) noexcept
{
    const auto shifted =
        static_cast<int32_t>(kz::fxp::shift_right(kz::fxp::magnitude(sample), shift));
    return sample < 0 ? kz::fxp::wrap_negate(shifted) : shifted;
}

} // namespace

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
    return kz::qv::signal_offset(*detector, std::span(samples, count), [shift](FxpType sample) {
        return shifted_towards_zero(sample, shift);
    });
}
