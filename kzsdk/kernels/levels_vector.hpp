/// @file
/// The equalisers' passes over samples in vectors. Each lane does what one turn of the plain loop
/// does; extremes do not depend on the order in which samples are looked at. (Of zeros of both
/// signs either may come out: no difference is seen in a difference.)
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/level_counters.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace {

template <class Simd, class Sample>
uint32_t track_extremes(kz::kernels::Extremes<Sample>& extremes, const Sample* samples,
                        uint32_t count) noexcept
{
    constexpr size_t kStep = 2 * Simd::kLanes;
    const uint32_t whole = count - static_cast<uint32_t>(count % kStep);
    auto low = Simd::set(extremes.low);
    auto low2 = low;
    auto high = Simd::set(extremes.high);
    auto high2 = high;
    for (size_t i = 0; i < whole; i += kStep) {
        const auto a = Simd::load(samples + i);
        const auto b = Simd::load(samples + i + Simd::kLanes);
        low = Simd::min(a, low);
        low2 = Simd::min(b, low2);
        high = Simd::max(a, high);
        high2 = Simd::max(b, high2);
    }
    Sample lows[Simd::kLanes];
    Sample highs[Simd::kLanes];
    Simd::store(lows, Simd::min(low, low2));
    Simd::store(highs, Simd::max(high, high2));
    for (size_t k = 0; k < Simd::kLanes; ++k) {
        extremes.low = lows[k] < extremes.low ? lows[k] : extremes.low;
        extremes.high = highs[k] > extremes.high ? highs[k] : extremes.high;
    }
    return whole;
}

template <class Simd>
void track_word_extremes(kz::kernels::Extremes<int32_t>& extremes, const int32_t* samples,
                         uint32_t count) noexcept
{
    const uint32_t done = track_extremes<Simd>(extremes, samples, count);
    kz::kernels::plain::track_word_extremes(extremes, samples + done, count - done);
}

template <class Simd>
void track_float_extremes(kz::kernels::Extremes<float>& extremes, const float* samples,
                          uint32_t count) noexcept
{
    const uint32_t done = track_extremes<Simd>(extremes, samples, count);
    kz::kernels::plain::track_float_extremes(extremes, samples + done, count - done);
}

/// Writes the bytes of whole groups of four vectors and counts them; level_of(index) gives a
/// vector's levels. Bytes are counted two groups after they are written: by then they need not be
/// waited for, and counting, which takes a store for each byte, hides the arithmetic.
template <class Simd, class LevelOf>
uint32_t write_levels(uint8_t* levels, uint32_t count, LevelCounters& counters,
                      LevelOf level_of) noexcept
{
    constexpr size_t kStep = 4 * Simd::kLanes;
    constexpr size_t kBehind = 2 * kStep;
    const uint32_t whole = count - static_cast<uint32_t>(count % kStep);
    for (size_t i = 0; i < whole; i += kStep) {
        Simd::store_bytes(levels + i, level_of(i), level_of(i + Simd::kLanes),
                          level_of(i + 2 * Simd::kLanes), level_of(i + 3 * Simd::kLanes));
        if (i >= kBehind) {
            counters.count_all(levels + i - kBehind, kStep);
        }
    }
    const size_t left = whole < kBehind ? whole : kBehind;
    counters.count_all(levels + whole - left, left);
    return whole;
}

// Where neither factor is negative, the product's upper half is truncated and rounded down alike;
// where one is, both give a level that is raised to 0.
template <class Simd>
void word_levels(const kz::kernels::WordLevels& rule, const int32_t* samples, uint8_t* levels,
                 uint32_t count, uint32_t* histogram) noexcept
{
    const auto bottom = Simd::set(rule.bottom);
    const auto scale = Simd::set(rule.scale);
    const auto top = Simd::set(rule.top);
    LevelCounters counters;
    const uint32_t done = write_levels<Simd>(levels, count, counters, [&](size_t i) noexcept {
        const auto halved = Simd::template shift_right<1>(Simd::load(samples + i));
        const auto scaled = Simd::template product_bits<32>(Simd::sub(halved, bottom), scale);
        const auto level = Simd::min(Simd::shift_right(scaled, rule.shift), top);
        return Simd::max(level, Simd::set(0));
    });
    counters.add_to(histogram, rule.top);
    if (done != count) {
        kz::kernels::plain::word_levels(rule, samples + done, levels + done, count - done,
                                        histogram);
    }
}

template <class Simd>
void float_levels(const kz::kernels::FloatLevels& rule, const float* samples, uint8_t* levels,
                  uint32_t count, uint32_t* histogram) noexcept
{
    const auto bottom = Simd::set(rule.bottom);
    const auto scale = Simd::set(rule.scale);
    const auto top = Simd::set(rule.top);
    LevelCounters counters;
    const uint32_t done = write_levels<Simd>(levels, count, counters, [&](size_t i) noexcept {
        const auto scaled = Simd::mul(Simd::sub(Simd::load(samples + i), bottom), scale);
        return Simd::max(Simd::min(Simd::truncated(scaled), top), Simd::set(0));
    });
    counters.add_to(histogram, rule.top);
    if (done != count) {
        kz::kernels::plain::float_levels(rule, samples + done, levels + done, count - done,
                                         histogram);
    }
}

/// Four values at a time: a store takes as long for one as for four.
template <class Simd>
void replace_levels(const void* values, const uint8_t* levels, void* output,
                    uint32_t count) noexcept
{
    constexpr size_t kBytes = 4;
    const auto* words = static_cast<const uint8_t*>(values);
    auto* to = static_cast<uint8_t*>(output);
    const uint32_t left = count % 8;
    size_t i = count - left;
    kz::kernels::plain::replace_levels(values, levels + i, to + i * kBytes, left);
    for (; i != 0; i -= 8) {
        Simd::copy_four_words(to + (i - 4) * kBytes, words, levels + i - 4);
        Simd::copy_four_words(to + (i - 8) * kBytes, words, levels + i - 8);
    }
}

} // namespace
