/// @file
/// The search for the end of leading silence, the same for both twins. A twin brings its samples
/// and the rule that makes integers, the levels, of them: levels_of(samples, count, levels).
///
/// Two moving means run over a window of W levels: of the levels, and of their distances from that
/// mean, each cut to a maximum. The signal begins half a window before the second mean exceeds the
/// threshold. Sums are 32-bit and wrap; each mean keeps its window in a ring.
#pragma once

#include <algorithm>
#include <array>
#include <bit>
#include <cstdint>
#include <limits>
#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/kernels.hpp"

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

/// Frees a detector with its rings; null is ignored.
template <class Detector>
void free_detector(Detector* detector) noexcept
{
    if (detector != nullptr) {
        const owned<int32_t[]> levels(detector->levels);
        const owned<int32_t[]> deviations(detector->deviations);
        const owned<Detector> record(detector);
    }
}

/// Only the flag is cleared: priming overwrites everything else.
template <class Detector>
kz_status reset_detector(Detector* detector) noexcept
{
    if (detector != nullptr) {
        detector->primed = 0;
    }
    return KZ_OK;
}

/// Replaces the oldest level of the window.
template <class Detector>
void take_level(Detector& detector, int32_t level) noexcept
{
    int32_t& oldest = detector.levels[detector.position];
    detector.level_sum = fxp::wrap_add(fxp::wrap_sub(detector.level_sum, oldest), level);
    oldest = level;
}

/// Replaces the oldest deviation of the window.
template <class Detector>
void take_deviation(Detector& detector, int32_t deviation) noexcept
{
    int32_t& oldest = detector.deviations[detector.position];
    detector.deviation_sum =
        fxp::wrap_add(fxp::wrap_sub(detector.deviation_sum, oldest), deviation);
    oldest = deviation;
}

/// Moves the place of the oldest level and deviation on.
template <class Detector>
void advance(Detector& detector, uint32_t count) noexcept
{
    detector.position =
        static_cast<uint32_t>((uint64_t{detector.position} + count) % detector.window);
}

/// Takes one sample into both moving means.
///
/// @return Whether the mean deviation now exceeds the threshold.
template <class Detector>
bool step(Detector& detector, int32_t level) noexcept
{
    const auto window = static_cast<int32_t>(detector.window);
    take_level(detector, level);
    const int32_t distance = fxp::wrap_sub(level, detector.level_sum / window);
    const auto deviation = static_cast<int32_t>(fxp::magnitude(distance));
    take_deviation(detector, std::min(deviation, detector.max_deviation));
    detector.position = detector.position + 1 == detector.window ? 0 : detector.position + 1;
    return detector.threshold < static_cast<uint32_t>(detector.deviation_sum / window);
}

/// Takes levels for as long as they are certainly quiet, in a faster loop than step(). Stops early
/// where a level might not be, and at the end of the rings.
///
/// @return How many were taken.
template <class Detector>
uint32_t pass_quiet(Detector& detector, std::span<const int32_t> levels) noexcept
{
    if ((detector.window & (detector.window - 1)) != 0) {
        return 0; // the loop divides by shifting
    }
    // A sum below the limit has a mean that does not exceed the threshold. Negative sums count as
    // beyond it, whatever the threshold: step() compares their means unsigned.
    constexpr uint64_t kNegative = uint64_t{1} << 31;
    const uint64_t limit = (uint64_t{detector.threshold} + 1) * detector.window;
    kernels::MovingMeans means{
        .levels = detector.levels + detector.position,
        .deviations = detector.deviations + detector.position,
        .level_sum = detector.level_sum,
        .deviation_sum = detector.deviation_sum,
        .window_log2 = std::countr_zero(detector.window),
        .max_deviation = detector.max_deviation,
        .limit = static_cast<uint32_t>(std::min(limit, kNegative)),
    };
    const uint32_t room = detector.window - detector.position;
    const auto count = static_cast<uint32_t>(std::min<size_t>(levels.size(), room));
    const uint32_t taken = kernels::active().pass_quiet(means, levels.data(), count);
    detector.level_sum = means.level_sum;
    detector.deviation_sum = means.deviation_sum;
    detector.position = taken == room ? 0 : detector.position + taken;
    return taken;
}

/// Takes levels until the mean deviation exceeds the threshold.
///
/// @return The index of the level that did it; the number of levels when none does.
template <class Detector>
uint32_t search(Detector& detector, std::span<const int32_t> levels) noexcept
{
    const auto count = static_cast<uint32_t>(levels.size());
    uint32_t i = 0;
    while (i < count) {
        const uint32_t taken = pass_quiet(detector, levels.subspan(i));
        i += taken;
        if (taken == 0) {
            if (step(detector, levels[i])) {
                return i;
            }
            ++i;
        }
    }
    return count;
}

/// Levels are made this many at a time.
inline constexpr size_t kScanChunk = 1024;

/// Makes levels of samples and hands them on, chunk by chunk: take(first index, levels) returns
/// whether to go on.
template <class Sample, class LevelsOf, class Take>
void for_all_levels(std::span<const Sample> samples, LevelsOf levels_of, Take take) noexcept
{
    std::array<int32_t, kScanChunk> levels;
    for (size_t first = 0; first < samples.size(); first += levels.size()) {
        const size_t count = std::min(samples.size() - first, levels.size());
        levels_of(samples.data() + first, static_cast<uint32_t>(count), levels.data());
        if (!take(static_cast<uint32_t>(first), std::span<const int32_t>(levels.data(), count))) {
            return;
        }
    }
}

/// Fills the rings with the block's beginning; where that is shorter than the window, with zeros.
template <class Detector, class Sample, class LevelsOf>
void prime(Detector& detector, std::span<const Sample> block, LevelsOf levels_of) noexcept
{
    std::fill_n(detector.levels, detector.window, 0);
    std::fill_n(detector.deviations, detector.window, 0);
    detector.level_sum = 0;
    detector.deviation_sum = 0;
    detector.position = 0;
    for_all_levels(block.first(std::min<size_t>(block.size(), detector.window)), levels_of,
                   [&detector](uint32_t, std::span<const int32_t> levels) {
                       for (const int32_t level : levels) {
                           take_level(detector, level);
                           advance(detector, 1);
                       }
                       return true;
                   });
    detector.position = 0;
    detector.primed = 1;
}

/// Brings the means up to the end of a block. What they hold then depends on its last two windows
/// only: the deviations of the last window, and the levels from which those were taken. A longer
/// block is entered there:
///
///     |......... skipped .........|----- W -----|----- W -----| end of the block
///                                   levels only   levels and
///                                                 deviations
template <class Detector, class Sample, class LevelsOf>
void settle(Detector& detector, std::span<const Sample> rest, LevelsOf levels_of) noexcept
{
    const uint64_t remembered = uint64_t{detector.window} * 2;
    uint32_t unheard = 0; // levels that only fill the ring of levels
    if (rest.size() > remembered) {
        const auto skipped = static_cast<uint32_t>(rest.size() - remembered);
        advance(detector, skipped);
        rest = rest.subspan(skipped);
        unheard = detector.window;
    }
    for_all_levels(rest, levels_of,
                   [&detector, unheard](uint32_t first, std::span<const int32_t> levels) {
                       for (const int32_t level : levels) {
                           if (first++ < unheard) {
                               take_level(detector, level);
                               advance(detector, 1);
                           } else {
                               step(detector, level);
                           }
                       }
                       return true;
                   });
}

/// Where the signal starts in the next block of a stream; the block's size when it does not.
template <class Detector, class Sample, class LevelsOf>
uint32_t signal_offset(Detector& detector, std::span<const Sample> block,
                       LevelsOf levels_of) noexcept
{
    if (detector.primed == 0) {
        prime(detector, block,
              levels_of); // its first samples serve twice: they are scanned as well
    }
    const auto none = static_cast<uint32_t>(block.size());
    uint32_t crossing = none;
    for_all_levels(block, levels_of, [&](uint32_t first, std::span<const int32_t> levels) {
        const uint32_t found = search(detector, levels);
        crossing = found == levels.size() ? none : first + found;
        return crossing == none;
    });
    if (crossing == none) {
        return none;
    }
    // The rings must hold the end of this block when the next one comes.
    settle(detector, block.subspan(crossing + 1), levels_of);
    const uint32_t half = detector.window / 2;
    return crossing > half ? crossing - half : 0;
}

} // namespace kz::qv
