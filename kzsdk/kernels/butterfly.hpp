/// @file
/// What the fixed-point and the floating-point DCT share: the factor of a butterfly, the order of
/// the samples and the recursive additions.
///
/// The transform is the fast DCT-II by inverse-cosine butterflies: reorder the input, run one stage
/// of butterflies per bit of the length, undo the bit reversal, and add recursively. Source: B. G.
/// Lee, "A new algorithm to compute the discrete cosine transform", IEEE Trans. ASSP 32 (1984).
#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <span>
#include <utility>

#include "kzsdk/abs/mathfn.h"

namespace kz::kernels {

/// 1 / (2 cos((4j + 1) pi / (4h))), the factor of butterfly j in the stage of half-width h.
inline float butterfly_factor(uint32_t half_width, uint32_t j) noexcept
{
    constexpr double kPi = 3.14159265358979; // with these digits: the tables are made of it
    const double angle = (4.0 * j + 1.0) * kPi / (4.0 * half_width);
    return static_cast<float>(1.0 / (2.0 * kz_cos(angle)));
}

/// Factor j of half-width h at h + j; 0 at 0.
inline void fill_butterfly_factors(std::span<float> factors) noexcept
{
    for (uint32_t half_width = 1; half_width < factors.size(); half_width *= 2) {
        for (uint32_t j = 0; j < half_width; ++j) {
            factors[half_width + j] = butterfly_factor(half_width, j);
        }
    }
}

/// Swaps every value with the one at the bit-reversed index. The length is a power of two.
template <class T>
void bit_reverse(std::span<T> x) noexcept
{
    for (size_t i = 0, j = 0; i < x.size(); ++i) {
        if (i < j) {
            std::swap(x[i], x[j]);
        }
        size_t bit = x.size() / 2;
        for (; bit != 0 && (j & bit) != 0; bit /= 2) {
            j ^= bit;
        }
        j |= bit;
    }
}

/// Brings the even samples, in order, into the first half and the odd ones, reversed, into the
/// second: a bit reversal of the whole, then of each half, then a reversal of the second half.
template <class T>
void reorder_input(std::span<T> x) noexcept
{
    const auto second_half = x.subspan(x.size() / 2);
    bit_reverse(x);
    bit_reverse(x.first(x.size() / 2));
    bit_reverse(second_half);
    for (size_t i = 0; i < second_half.size() / 2; ++i) {
        std::swap(second_half[i], second_half[second_half.size() - 1 - i]);
    }
}

/// Turns the butterflies' sums into coefficients.
///
/// @param rounds  At most the base-2 logarithm of the length; later rounds would do nothing.
template <class T, class Add>
void add_recursively(std::span<T> x, int32_t rounds, Add add) noexcept
{
    size_t block = x.size() / 4;
    size_t stride = x.size() / 2;
    size_t terms = 1;
    for (int32_t round = 0; round < rounds && block != 0; ++round) {
        for (size_t first = block; first < 2 * block; ++first) {
            size_t t = first;
            for (size_t term = 0; term < terms; ++term, t += stride) {
                x[t] = add(x[t], x[t + stride]);
            }
        }
        block /= 2;
        stride /= 2;
        terms = 2 * terms + 1;
    }
}

/// The frame of both transforms, of 2^`order` points.
///
/// @param run_stage  stage -> nothing: the butterflies of half-width 2^(stage - 1).
/// @param add        Adds two values.
template <class T, class RunStage, class Add>
void transform(std::span<T> x, int32_t order, RunStage run_stage, Add add) noexcept
{
    reorder_input(x);
    for (int32_t stage = order; stage >= 1; --stage) {
        run_stage(stage);
    }
    bit_reverse(x);
    add_recursively(x, order, add);
}

} // namespace kz::kernels
