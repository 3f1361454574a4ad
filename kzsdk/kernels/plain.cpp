#include "kzsdk/kernels/plain.hpp"

namespace kz::kernels {

namespace {

template <class Word>
constexpr Converters<Word> kPlainConverters = {
    .pcm16_mono = plain::pcm16_mono,
    .pcm16_stereo = plain::pcm16_stereo,
    .pcm8_mono = plain::pcm8_mono,
    .pcm8_stereo = plain::pcm8_stereo,
};

} // namespace

const Variant kPlainVariant = {
    .name = "plain",
    .dct_fixed = plain::dct_fixed,
    .dct_float = plain::dct_float,
    .words = kPlainConverters<int32_t>,
    .floats = kPlainConverters<float>,
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
    .apply_ramp = plain::apply_ramp,
    .sum_squares = plain::sum_squares,
};

} // namespace kz::kernels
