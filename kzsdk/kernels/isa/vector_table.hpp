/// @file
/// The table of one variant, made of the kernels' templates over its vectors.
///
/// Only the file of a variant includes this. All that is local to that file: a function that was
/// compiled for a newer processor must not be linked where an older one may run.
#pragma once

#include <cstdint>

#include "kzsdk/kernels/bands_vector.hpp"
#include "kzsdk/kernels/convert_vector.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/levels_vector.hpp"
#include "kzsdk/kernels/plain.hpp"
#include "kzsdk/kernels/resample_fixed_vector.hpp"
#include "kzsdk/kernels/resample_float_vector.hpp"
#include "kzsdk/kernels/resample_halving_vector.hpp"
#include "kzsdk/kernels/silence_vector.hpp"
#include "kzsdk/kernels/transform_vector.hpp"

namespace {

template <class Simd>
void dct_fixed(int32_t* x, const int32_t* factors, int32_t order) noexcept
{
    if (!transform<Simd, FixedButterflies>(x, factors, order)) {
        kz::kernels::plain::dct_fixed(x, factors, order);
    }
}

template <class Simd>
void dct_float(float* x, const float* factors, int32_t order) noexcept
{
    if (!transform<Simd, FloatButterflies>(x, factors, order)) {
        kz::kernels::plain::dct_float(x, factors, order);
    }
}

template <class Simd>
constexpr kz::kernels::Variant vector_variant(const char* name) noexcept
{
    return {
        .name = name,
        .dct_fixed = dct_fixed<Simd>,
        .dct_float = dct_float<Simd>,
        .to_words = word_converters<Simd>(),
        .to_floats = float_converters<Simd>(),
        .shift_towards_zero = shift_towards_zero<Simd>,
        .truncate = truncate<Simd>,
        .pass_quiet = pass_quiet<Simd>,
        .polyphase = Polyphase<Simd>::run,
        .symmetric = Symmetric<Simd>::run,
        .convolve_from_bit_31 = convolve<Simd, 31>,
        .convolve_from_bit_32 = convolve<Simd, 32>,
        .polyphase_floats = polyphase_floats<Simd>,
        .track_word_extremes = track_word_extremes<Simd>,
        .track_float_extremes = track_float_extremes<Simd>,
        .word_levels = word_levels<Simd>,
        .float_levels = float_levels<Simd>,
        .replace_levels = replace_levels<Simd>,
        .apply_ramp = apply_ramp<Simd>,
        .sum_squares = sum_squares<Simd>,
    };
}

} // namespace
