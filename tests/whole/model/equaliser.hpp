/// @file
/// Histogram equalisation: each sample becomes its level's cumulative count, centred.
#pragma once

#include <algorithm>
#include <cstdint>
#include <span>
#include <vector>

#include "whole/model/words.hpp"

namespace kz::model {

/// The level of every sample, 0..levels - 1: a sample's share of the range, by a rounded
/// reciprocal.
inline std::vector<uint32_t> levels_of(std::span<const int32_t> samples, uint32_t levels)
{
    const auto [lowest, highest] = std::minmax_element(samples.begin(), samples.end());
    const int64_t floor = *lowest >> 1;
    const auto range = unsigned_word((*highest >> 1) - floor);
    const int zeros = leading_zeros(range);
    const uint32_t inverse = reciprocal(unsigned_word(shifted_left(word(range), zeros)));
    const int32_t scale = word(int64_t{levels - 1} * (inverse >> (33 - leading_zeros(levels - 1))));
    const int down = zeros > 22 ? 31 : 22 - zeros;
    std::vector<uint32_t> result(samples.size());
    std::transform(samples.begin(), samples.end(), result.begin(), [&](int32_t sample) {
        const int32_t level = high_product(word((sample >> 1) - floor), scale) >> down;
        return static_cast<uint32_t>(std::clamp<int32_t>(level, 0, word(levels - 1)));
    });
    return result;
}

inline std::vector<int32_t> equalise(std::span<const int32_t> samples, uint32_t levels)
{
    const std::vector<uint32_t> level = levels_of(samples, levels);
    std::vector<int64_t> counts(levels, 0);
    for (const uint32_t each : level) {
        ++counts[each];
    }
    int64_t cumulative = 0;
    int64_t total = 0;
    std::vector<int64_t> ranks;
    for (const int64_t count : counts) {
        cumulative += count;
        total += count * cumulative;
        ranks.push_back(cumulative * 32768);
    }
    std::vector<int32_t> result(samples.size());
    std::transform(level.begin(), level.end(), result.begin(),
                   [&](uint32_t each) { return word(ranks[each] - total); });
    return result;
}

/// True when a frame is too quiet to be equalised; it is then taken as it is.
inline bool is_silence(std::span<const int32_t> samples)
{
    const auto [lowest, highest] = std::minmax_element(samples.begin(), samples.end());
    return word(int64_t{*highest >> 1} - (*lowest >> 1)) <= 8192;
}

inline std::vector<int32_t> equalise_unless_silent(std::span<const int32_t> samples,
                                                   uint32_t levels)
{
    return is_silence(samples) ? std::vector<int32_t>(samples.begin(), samples.end())
                               : equalise(samples, levels);
}

} // namespace kz::model
