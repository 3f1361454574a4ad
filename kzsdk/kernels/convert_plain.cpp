#include "kzsdk/kernels/mix.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace kz::kernels::plain {
namespace {

template <class Encoding, class Channels>
void to_words(Channels channels, const void* input, int32_t* output, int32_t frames,
              int32_t shift) noexcept
{
    mix<Encoding>(channels, input, output, frames, shifted_by(shift));
}

template <class Encoding, class Channels>
void to_floats(Channels channels, const void* input, float* output, int32_t frames,
               int32_t shift) noexcept
{
    mix<Encoding>(channels, input, output, frames, [shift](int32_t sum) noexcept {
        return static_cast<float>(fxp::shift_left(sum, shift));
    });
}

} // namespace

void pcm16_mono(const void* input, int32_t* output, int32_t frames, int32_t shift) noexcept
{
    to_words<Pcm16>(kMono, input, output, frames, shift);
}

void pcm16_stereo(const void* input, int32_t* output, int32_t frames, int32_t shift) noexcept
{
    to_words<Pcm16>(kStereo, input, output, frames, shift);
}

void pcm8_mono(const void* input, int32_t* output, int32_t frames, int32_t shift) noexcept
{
    to_words<Pcm8>(kMono, input, output, frames, shift);
}

void pcm8_stereo(const void* input, int32_t* output, int32_t frames, int32_t shift) noexcept
{
    to_words<Pcm8>(kStereo, input, output, frames, shift);
}

void pcm16_mono(const void* input, float* output, int32_t frames, int32_t shift) noexcept
{
    to_floats<Pcm16>(kMono, input, output, frames, shift);
}

// The sum of two samples is exact as a float, whichever way it is made.
void pcm16_stereo(const void* input, float* output, int32_t frames, int32_t shift) noexcept
{
    to_floats<Pcm16>(kStereo, input, output, frames, shift);
}

void pcm8_mono(const void* input, float* output, int32_t frames, int32_t shift) noexcept
{
    to_floats<Pcm8>(kMono, input, output, frames, shift);
}

void pcm8_stereo(const void* input, float* output, int32_t frames, int32_t shift) noexcept
{
    to_floats<Pcm8>(kStereo, input, output, frames, shift);
}

} // namespace kz::kernels::plain
