/// @file
/// Gain ramp and sums of squares in vectors. The sums are modulo 2^64 and may be taken in any
/// order.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace {

template <class Simd>
void apply_ramp(int32_t* words, uint32_t count, int32_t gain, int32_t step) noexcept
{
    const auto lane = [](size_t k, int32_t unit) noexcept {
        return static_cast<int32_t>(static_cast<int64_t>(k) * unit);
    };
    int32_t offsets[Simd::kLanes];
    for (size_t k = 0; k < Simd::kLanes; ++k) {
        offsets[k] = lane(k, step);
    }
    auto gains = Simd::add(Simd::set(gain), Simd::load(offsets));
    const auto advance = Simd::set(lane(Simd::kLanes, step));
    const uint32_t left = count % Simd::kLanes;
    const uint32_t whole = count - left;
    for (size_t i = 0; i < whole; i += Simd::kLanes) {
        const auto product = Simd::truncated_high_products(Simd::load(words + i), gains);
        Simd::store(words + i, Simd::shift_left(product, 2));
        gains = Simd::add(gains, advance);
    }
    kz::kernels::plain::apply_ramp(words + whole, left, Simd::first_lane(gains), step);
}

template <class Simd>
uint64_t sum_squares(const int32_t* words, uint32_t count) noexcept
{
    const uint32_t left = count % Simd::kLanes;
    const uint32_t whole = count - left;
    auto sums = Simd::no_wide_sums();
    for (size_t i = 0; i < whole; i += Simd::kLanes) {
        Simd::template add_shifted_squares<16>(sums, Simd::load(words + i));
    }
    return Simd::sum_of_wide_lanes(sums) + kz::kernels::plain::sum_squares(words + whole, left);
}

} // namespace
