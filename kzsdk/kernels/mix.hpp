/// @file
/// The loop of all converters. A converter is an encoding (how a sample is read), a number of
/// channels (known here or at run time), a sum (cleared at every frame or never) and a rule that
/// makes the output word of the sum.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <type_traits>

#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/g711.hpp"

namespace kz::kernels {

struct Pcm16 {
    static constexpr size_t kBytes = 2;
    static int32_t read(const uint8_t* at) noexcept
    {
        int16_t sample = 0;
        std::memcpy(&sample, at, sizeof sample); // the caller's bytes may lie at any address
        return sample;
    }
};

/// Exclusive-or'ed but not sign-extended: the lower half of the waveform is folded up on purpose.
struct Pcm8 {
    static constexpr size_t kBytes = 1;
    static int32_t read(const uint8_t* at) noexcept { return *at ^ 0x80; }
};

struct ALaw {
    static constexpr size_t kBytes = 1;
    static int32_t read(const uint8_t* at) noexcept { return g711::kALaw[*at]; }
};

struct ULaw {
    static constexpr size_t kBytes = 1;
    static int32_t read(const uint8_t* at) noexcept { return g711::kULaw[*at]; }
};

/// A number of channels that is known here, so that the channel loop is unrolled.
template <int32_t Count>
using Fixed = std::integral_constant<int32_t, Count>;
inline constexpr Fixed<1> kMono;
inline constexpr Fixed<2> kStereo;

inline int32_t plus(int32_t sum, int32_t sample) noexcept { return fxp::wrap_add(sum, sample); }
inline float plus(float sum, int32_t sample) noexcept { return sum + static_cast<float>(sample); }

template <class Encoding, class Sum, class Channels>
Sum add_frame(Sum sum, const uint8_t*& at, Channels channels) noexcept
{
    for (int32_t channel = 0; channel < channels; ++channel) {
        sum = plus(sum, Encoding::read(at));
        at += Encoding::kBytes;
    }
    return sum;
}

template <class Word>
std::span<Word> frames(Word* output, int32_t count) noexcept
{
    return {output, static_cast<uint32_t>(count)};
}

/// Mixes the channels of each frame.
template <class Encoding, class Sum = int32_t, class Channels, class Word, class Finish>
void mix(Channels channels, const void* input, Word* output, int32_t count, Finish finish) noexcept
{
    const auto* at = static_cast<const uint8_t*>(input);
    for (Word& word : frames(output, count)) {
        word = finish(add_frame<Encoding>(Sum{0}, at, channels));
    }
}

/// Mixes the channels of each frame into a sum that is never cleared: each word is made from all
/// frames so far.
template <class Encoding, class Word, class Finish>
void accumulate(int32_t channels, const void* input, Word* output, int32_t count,
                Finish finish) noexcept
{
    const auto* at = static_cast<const uint8_t*>(input);
    int32_t sum = 0;
    for (Word& word : frames(output, count)) {
        sum = add_frame<Encoding>(sum, at, channels);
        word = finish(sum);
    }
}

inline auto shifted_by(int32_t count) noexcept
{
    return [count](int32_t sum) noexcept { return fxp::shift_left(sum, count); };
}

} // namespace kz::kernels
