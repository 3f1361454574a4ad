/// @file
/// The table of the plain variant, which defines the results and runs on every processor.

#include "kzsdk/kernels/plain.hpp"

namespace kz::kernels {

namespace {

template <class Convert>
constexpr Encodings<Convert> kPlainEncodings = {
    .pcm16 = plain::pcm16,
    .pcm8 = plain::pcm8,
    .alaw = plain::alaw,
    .ulaw = plain::ulaw,
    .alaw_running = plain::alaw_running,
    .ulaw_running = plain::ulaw_running,
};

} // namespace

const Variant kPlainVariant = {
    .name = "plain",
    .dct_fixed = plain::dct_fixed,
    .dct_float = plain::dct_float,
    .to_words = kPlainEncodings<ToWords>,
    .to_floats = kPlainEncodings<ToFloats>,
    .shift_towards_zero = plain::shift_towards_zero,
    .truncate = plain::truncate,
    .pass_quiet = plain::pass_quiet,
    .polyphase = plain::polyphase,
    .symmetric = plain::symmetric,
    .convolve_from_bit_31 = plain::convolve_from_bit_31,
    .convolve_from_bit_32 = plain::convolve_from_bit_32,
    .polyphase_floats = plain::polyphase_floats,
    .track_word_extremes = plain::track_word_extremes,
    .track_float_extremes = plain::track_float_extremes,
    .word_levels = plain::word_levels,
    .float_levels = plain::float_levels,
    .replace_levels = plain::replace_levels,
    .apply_ramp = plain::apply_ramp,
    .sum_squares = plain::sum_squares,
};

} // namespace kz::kernels
