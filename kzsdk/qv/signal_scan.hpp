/// @file
/// Both twins search for the end of leading silence in the same way. A twin brings its samples and
/// the rule that makes an integer of one.
#pragma once

#include <cstdint>
#include <limits>
#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/dsp/fxp_ops.hpp"

namespace kz::qv {

/// Makes a detector with both rings cleared. Null when memory is short, and for a window that is 0
/// or whose rings would not fit 32 bits of bytes.
template <class Detector>
Detector* make_detector(uint32_t window, uint32_t threshold, int32_t max_deviation) noexcept
{
    auto detector = make_record<Detector>();
    auto levels = make_array<int32_t>(window);
    auto deviations = make_array<int32_t>(window);
    if (window == 0 || !detector || !levels || !deviations) {
        return nullptr;
    }
    detector->window = window;
    detector->threshold = threshold;
    detector->max_deviation = max_deviation;
    detector->levels = levels.release();
    detector->deviations = deviations.release();
    return detector.release();
}

template <class Detector>
void free_detector(Detector* detector) noexcept
{
    if (detector != nullptr) {
        const owned<int32_t[]> levels(detector->levels);
        const owned<int32_t[]> deviations(detector->deviations);
        const owned<Detector> record(detector);
    }
}

template <class Detector>
kz_status reset_detector(Detector* detector) noexcept
{
    if (detector != nullptr) {
        detector->primed = 0;
    }
    return KZ_OK;
}

/// Fills the rings with the block's beginning; where that is shorter than the window, with zeros.
template <class Detector, class Sample, class ToInteger>
void prime(Detector& detector, std::span<const Sample> block, ToInteger to_integer) noexcept
{
    detector.level_sum = 0;
    detector.deviation_sum = 0;
    detector.position = 0;
    for (uint32_t i = 0; i < detector.window; ++i) {
        detector.levels[i] = i < block.size() ? to_integer(block[i]) : 0;
        detector.level_sum = fxp::wrap_add(detector.level_sum, detector.levels[i]);
        detector.deviations[i] = 0;
    }
    detector.primed = 1;
}

/// Takes one sample into both moving means.
///
/// @return Whether the mean deviation now exceeds the threshold.
template <class Detector>
bool step(Detector& detector, int32_t level) noexcept
{
    const auto window = static_cast<int32_t>(detector.window);
    int32_t& oldest_level = detector.levels[detector.position];
    detector.level_sum = fxp::wrap_add(fxp::wrap_sub(detector.level_sum, oldest_level), level);
    oldest_level = level;

    const int32_t distance = fxp::wrap_sub(level, detector.level_sum / window);
    auto deviation = static_cast<int32_t>(fxp::magnitude(distance));
    deviation = deviation < detector.max_deviation ? deviation : detector.max_deviation;
    int32_t& oldest_deviation = detector.deviations[detector.position];
    detector.deviation_sum =
        fxp::wrap_add(fxp::wrap_sub(detector.deviation_sum, oldest_deviation), deviation);
    oldest_deviation = deviation;

    detector.position = detector.position + 1 == detector.window ? 0 : detector.position + 1;
    return detector.threshold < static_cast<uint32_t>(detector.deviation_sum / window);
}

/// Where the signal starts in the next block of a stream; the block's size when it does not.
template <class Detector, class Sample, class ToInteger>
uint32_t signal_offset(Detector& detector, std::span<const Sample> block,
                       ToInteger to_integer) noexcept
{
    if (detector.primed == 0) {
        prime(detector, block,
              to_integer); // its first samples serve twice: they are scanned as well
    }
    const auto none = static_cast<uint32_t>(block.size());
    uint32_t offset = none;
    for (uint32_t i = 0; i < block.size(); ++i) {
        const bool sounding = step(detector, to_integer(block[i]));
        if (sounding && offset == none) {
            offset = i > detector.window / 2 ? i - detector.window / 2 : 0;
        } // no early exit: the rings must hold the end of this block when the next one comes
    }
    return offset;
}

} // namespace kz::qv
