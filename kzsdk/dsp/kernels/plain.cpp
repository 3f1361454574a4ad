#include "kzsdk/dsp/kernels/plain.hpp"

#include "kzsdk/dsp/kernels/kernels.hpp"

namespace kz::dsp {

namespace {

template <class Word>
constexpr Converters<Word> kPlainConverters = {
    .pcm16_mono = plain::pcm16_mono,
    .pcm16_stereo = plain::pcm16_stereo,
    .pcm8_mono = plain::pcm8_mono,
    .pcm8_stereo = plain::pcm8_stereo,
};

} // namespace

const Kernels kPlainKernels = {
    .name = "plain",
    .dct_fixed = plain::dct_fixed,
    .dct_float = plain::dct_float,
    .words = kPlainConverters<int32_t>,
    .floats = kPlainConverters<float>,
};

} // namespace kz::dsp
