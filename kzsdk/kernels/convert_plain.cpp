/// @file
/// Sample conversion, one frame at a time: the loop of all converters. A converter is an encoding
/// (how a sample is read), a number of channels, a sum (cleared at every frame or never) and a rule
/// that makes the output word of the sum.

#include <cstddef>
#include <cstring>
#include <span>
#include <type_traits>

#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/g711.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace kz::kernels {

constinit const SampleTable kALawSamples = g711::expansion_table(g711::expand_alaw);
constinit const SampleTable kULawSamples = g711::expansion_table(g711::expand_ulaw);

namespace {

struct Pcm16 {
    static constexpr size_t kBytes = 2;
    static int32_t read(const uint8_t* at) noexcept
    {
        int16_t sample = 0;
        std::memcpy(&sample, at, sizeof sample); // the caller's bytes may lie at any address
        return sample;
    }
};

// Exclusive-or'ed but not sign-extended: the lower half of the waveform is folded up on purpose.
struct Pcm8 {
    static constexpr size_t kBytes = 1;
    static int32_t read(const uint8_t* at) noexcept { return *at ^ 0x80; }
};

struct ALaw {
    static constexpr size_t kBytes = 1;
    static int32_t read(const uint8_t* at) noexcept { return kALawSamples[*at]; }
};

struct ULaw {
    static constexpr size_t kBytes = 1;
    static int32_t read(const uint8_t* at) noexcept { return kULawSamples[*at]; }
};

/// When the sum of a frame starts from 0.
enum class Sum { kOfFrame, kRunning };

int32_t plus(int32_t sum, int32_t sample) noexcept { return fxp::wrap_add(sum, sample); }
float plus(float sum, int32_t sample) noexcept { return sum + static_cast<float>(sample); }

// `Channels` is a number, or a type that stands for one, so that the loop is unrolled.
template <class Encoding, Sum kSum, class Total, class Channels, class Word, class Finish>
void mix(Channels channels, const void* input, Word* output, int32_t frames, Finish finish) noexcept
{
    const auto* at = static_cast<const uint8_t*>(input);
    Total total{};
    for (Word& word : std::span<Word>(output, static_cast<uint32_t>(frames))) {
        if (kSum == Sum::kOfFrame) {
            total = 0;
        }
        for (int32_t channel = 0; channel < channels; ++channel) {
            total = plus(total, Encoding::read(at));
            at += Encoding::kBytes;
        }
        word = finish(total);
    }
}

template <class Encoding, Sum kSum = Sum::kOfFrame, class Total = int32_t, class Word, class Finish>
void convert(int32_t channels, const void* input, Word* output, int32_t frames,
             Finish finish) noexcept
{
    if (channels == 1) {
        mix<Encoding, kSum, Total>(std::integral_constant<int32_t, 1>{}, input, output, frames,
                                   finish);
    } else if (channels == 2) {
        mix<Encoding, kSum, Total>(std::integral_constant<int32_t, 2>{}, input, output, frames,
                                   finish);
    } else {
        mix<Encoding, kSum, Total>(channels, input, output, frames, finish);
    }
}

auto shifted_by(int32_t count) noexcept
{
    return [count](int32_t sum) noexcept { return fxp::shift_left(sum, count); };
}

auto float_shifted_by(int32_t count) noexcept
{
    return
        [count](int32_t sum) noexcept { return static_cast<float>(fxp::shift_left(sum, count)); };
}

} // namespace

namespace plain {

void pcm16(int32_t channels, const void* input, int32_t* output, int32_t frames,
           int32_t shift) noexcept
{
    convert<Pcm16>(channels, input, output, frames, shifted_by(shift));
}

void pcm8(int32_t channels, const void* input, int32_t* output, int32_t frames,
          int32_t shift) noexcept
{
    convert<Pcm8>(channels, input, output, frames, shifted_by(shift));
}

void alaw(int32_t channels, const void* input, int32_t* output, int32_t frames,
          int32_t shift) noexcept
{
    convert<ALaw>(channels, input, output, frames, shifted_by(shift));
}

void ulaw(int32_t channels, const void* input, int32_t* output, int32_t frames,
          int32_t shift) noexcept
{
    convert<ULaw>(channels, input, output, frames, shifted_by(shift));
}

void alaw_running(int32_t channels, const void* input, int32_t* output, int32_t frames,
                  int32_t shift) noexcept
{
    convert<ALaw, Sum::kRunning>(channels, input, output, frames, shifted_by(shift));
}

void ulaw_running(int32_t channels, const void* input, int32_t* output, int32_t frames,
                  int32_t shift) noexcept
{
    convert<ULaw, Sum::kRunning>(channels, input, output, frames, shifted_by(shift));
}

void pcm16(int32_t channels, const void* input, float* output, int32_t frames) noexcept
{
    convert<Pcm16, Sum::kOfFrame, float>(channels, input, output, frames,
                                         [](float sum) noexcept { return sum; });
}

void pcm8(int32_t channels, const void* input, float* output, int32_t frames) noexcept
{
    convert<Pcm8>(channels, input, output, frames, float_shifted_by(8));
}

void alaw(int32_t channels, const void* input, float* output, int32_t frames) noexcept
{
    convert<ALaw>(channels, input, output, frames, float_shifted_by(0));
}

void ulaw(int32_t channels, const void* input, float* output, int32_t frames) noexcept
{
    convert<ULaw>(channels, input, output, frames, float_shifted_by(0));
}

void alaw_running(int32_t channels, const void* input, float* output, int32_t frames) noexcept
{
    convert<ALaw, Sum::kRunning>(channels, input, output, frames, float_shifted_by(0));
}

void ulaw_running(int32_t channels, const void* input, float* output, int32_t frames) noexcept
{
    convert<ULaw, Sum::kRunning>(channels, input, output, frames, float_shifted_by(0));
}

} // namespace plain
} // namespace kz::kernels
