/// @file
/// The search for the signal in vectors. A moving sum is a running sum of what enters less what
/// leaves; integer sums may be regrouped, so the running sums within a vector are made in
/// log2(lanes) steps and the last one of the vector before is added to all.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace {

template <class Simd>
void shift_towards_zero(const int32_t* input, int32_t* output, uint32_t count,
                        int32_t shift) noexcept
{
    const uint32_t left = count % Simd::kLanes;
    const uint32_t whole = count - left;
    for (size_t i = 0; i < whole; i += Simd::kLanes) {
        const auto x = Simd::load(input + i);
        const auto sign = Simd::template shift_right<31>(x);
        const auto size = Simd::sub(Simd::bit_xor(x, sign), sign);
        const auto shifted = Simd::shift_right_unsigned(size, shift);
        Simd::store(output + i, Simd::sub(Simd::bit_xor(shifted, sign), sign));
    }
    kz::kernels::plain::shift_towards_zero(input + whole, output + whole, left, shift);
}

template <class Simd>
void truncate(const float* input, int32_t* output, uint32_t count) noexcept
{
    const uint32_t left = count % Simd::kLanes;
    const uint32_t whole = count - left;
    for (size_t i = 0; i < whole; i += Simd::kLanes) {
        Simd::store(output + i, Simd::truncated(Simd::load(input + i)));
    }
    kz::kernels::plain::truncate(input + whole, output + whole, left);
}

// A sum divided by 2^log2 towards zero: negative sums are first raised by 2^log2 - 1.
template <class Simd>
typename Simd::Ints mean_of(typename Simd::Ints sum, int32_t log2) noexcept
{
    const auto negative = Simd::template shift_right<31>(sum);
    const auto raise = Simd::bit_and(negative, Simd::set((1 << log2) - 1));
    return Simd::shift_right(Simd::add(sum, raise), log2);
}

template <class Simd>
uint32_t pass_quiet(kz::kernels::MovingMeans& m, const int32_t* samples, uint32_t count) noexcept
{
    const auto most = Simd::set(m.max_deviation);
    const auto limit = Simd::set(static_cast<int32_t>(m.limit));
    auto level_sum = Simd::set(m.level_sum);
    auto deviation_sum = Simd::set(m.deviation_sum);
    uint32_t i = 0;
    for (; i + Simd::kLanes <= count; i += Simd::kLanes) {
        const auto x = Simd::load(samples + i);
        const auto gained = Simd::prefix_sums(Simd::sub(x, Simd::load(m.levels + i)));
        const auto levels = Simd::add(level_sum, gained);
        const auto distance = Simd::sub(x, mean_of<Simd>(levels, m.window_log2));
        const auto deviation = Simd::min(Simd::abs(distance), most);
        const auto strayed = Simd::prefix_sums(Simd::sub(deviation, Simd::load(m.deviations + i)));
        const auto deviations = Simd::add(deviation_sum, strayed);
        if (Simd::any_reaches(deviations, limit)) {
            break;
        }
        Simd::store(m.levels + i, x);
        Simd::store(m.deviations + i, deviation);
        level_sum = Simd::add(level_sum, Simd::broadcast_last(gained));
        deviation_sum = Simd::add(deviation_sum, Simd::broadcast_last(strayed));
    }
    m.level_sum = Simd::first_lane(level_sum);
    m.deviation_sum = Simd::first_lane(deviation_sum);
    return i;
}

} // namespace
