/// @file
/// The equalisers' passes over a frame, one sample at a time: the extremes, the level of each
/// sample with the histogram of all, and the value that stands for each level. Levels are bytes.

#include <algorithm>
#include <cstddef>
#include <cstring>

#include "kzsdk/abs/saturate.hpp"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/level_counters.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace kz::kernels::plain {

using namespace fxp;

void track_word_extremes(Extremes<int32_t>& extremes, const int32_t* samples,
                         uint32_t count) noexcept
{
    for (uint32_t i = 0; i < count; ++i) {
        extremes.low = std::min(extremes.low, samples[i]);
        extremes.high = std::max(extremes.high, samples[i]);
    }
}

void track_float_extremes(Extremes<float>& extremes, const float* samples, uint32_t count) noexcept
{
    for (uint32_t i = 0; i < count; ++i) {
        extremes.low = samples[i] < extremes.low ? samples[i] : extremes.low;
        extremes.high = samples[i] > extremes.high ? samples[i] : extremes.high;
    }
}

void word_levels(const WordLevels& rule, const int32_t* samples, uint8_t* levels, uint32_t count,
                 uint32_t* histogram) noexcept
{
    LevelCounters counters;
    for (uint32_t i = 0; i < count; ++i) {
        const int32_t level =
            smul_high(wrap_sub(samples[i] >> 1, rule.bottom), rule.scale) >> rule.shift;
        levels[i] = static_cast<uint8_t>(std::clamp(level, 0, rule.top));
    }
    counters.count_all(levels, count);
    counters.add_to(histogram, rule.top);
}

void float_levels(const FloatLevels& rule, const float* samples, uint8_t* levels, uint32_t count,
                  uint32_t* histogram) noexcept
{
    LevelCounters counters;
    for (uint32_t i = 0; i < count; ++i) {
        const int32_t level = to_int32((samples[i] - rule.bottom) * rule.scale);
        levels[i] = static_cast<uint8_t>(std::clamp(level, 0, rule.top));
    }
    counters.count_all(levels, count);
    counters.add_to(histogram, rule.top);
}

void replace_levels(const void* values, const uint8_t* levels, void* output,
                    uint32_t count) noexcept
{
    constexpr size_t kBytes = 4;
    const auto* words = static_cast<const uint8_t*>(values);
    auto* to = static_cast<uint8_t*>(output);
    for (size_t i = count; i > 0; --i) {
        std::memcpy(to + (i - 1) * kBytes, words + levels[i - 1] * kBytes, kBytes);
    }
}

} // namespace kz::kernels::plain
