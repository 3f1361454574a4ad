#include "kzsdk/dsp/convert.h"

#include <cstring>
#include <span>
#include <type_traits>

#include "kzsdk/dsp/fxp_ops.hpp"
#include "kzsdk/dsp/g711.hpp"

// A converter is an encoding (how a sample is read), a number of channels (known here or at run
// time), a sum (cleared at every frame or never) and a rule that makes the output word of the sum.

namespace {

using kz::fxp::shift_left;
using kz::fxp::wrap_add;

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
    static int32_t read(const uint8_t* at) noexcept { return kz::g711::kALaw[*at]; }
};

struct ULaw {
    static constexpr size_t kBytes = 1;
    static int32_t read(const uint8_t* at) noexcept { return kz::g711::kULaw[*at]; }
};

/// A number of channels that is known here, so that the channel loop is unrolled.
template <int32_t Count>
using Fixed = std::integral_constant<int32_t, Count>;
constexpr Fixed<1> kMono;
constexpr Fixed<2> kStereo;

int32_t plus(int32_t sum, int32_t sample) noexcept { return wrap_add(sum, sample); }
float plus(float sum, int32_t sample) noexcept { return sum + static_cast<float>(sample); }

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

auto shifted_by(int32_t count) noexcept
{
    return [count](int32_t sum) noexcept { return shift_left(sum, count); };
}

/// Divides a sum of samples by the smallest power of two not below the number of channels and
/// writes it in Q30; negative counts, from absurd numbers of channels, give 0.
auto averaged(int32_t channels, int32_t sample_bits) noexcept
{
    const uint32_t divisor = kz::fxp::next_power_of_two(static_cast<uint32_t>(channels));
    return shifted_by(kz::fxp::leading_zeros(divisor) - sample_bits);
}

float to_float(int32_t sum) noexcept { return static_cast<float>(sum); }
float to_float_times_256(int32_t sum) noexcept { return to_float(shift_left(sum, 8)); }
float as_it_is(float sum) noexcept { return sum; }

} // namespace

void KZDSP_PCM16ToQ29(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    mix<Pcm16>(kMono, input, output, frame_count, shifted_by(14));
}

void KZDSP_PCM16ToQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    mix<Pcm16>(kMono, input, output, frame_count, shifted_by(15));
}

void KZDSP_StereoPCM16ToMonoQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    mix<Pcm16>(kStereo, input, output, frame_count, shifted_by(14));
}

void KZDSP_NChannelPCM16ToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                  int32_t frame_count) noexcept
{
    mix<Pcm16>(channels, input, output, frame_count, averaged(channels, 16));
}

void KZDSP_PCM8ToQ29(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    mix<Pcm8>(kMono, input, output, frame_count, shifted_by(22));
}

void KZDSP_PCM8ToQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    mix<Pcm8>(kMono, input, output, frame_count, shifted_by(23));
}

void KZDSP_StereoPCM8ToMonoQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    mix<Pcm8>(kStereo, input, output, frame_count, shifted_by(22));
}

void KZDSP_NChannelPCM8ToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                 int32_t frame_count) noexcept
{
    mix<Pcm8>(channels, input, output, frame_count, averaged(channels, 8));
}

void KZDSP_ALawToQ29(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    mix<ALaw>(kMono, input, output, frame_count, shifted_by(14));
}

void KZDSP_StereoALawToMonoQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    mix<ALaw>(kStereo, input, output, frame_count, shifted_by(14));
}

void KZDSP_NChannelALawToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                 int32_t frame_count) noexcept
{
    accumulate<ALaw>(channels, input, output, frame_count, averaged(channels, 16));
}

void KZDSP_uLawToQ29(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    mix<ULaw>(kMono, input, output, frame_count, shifted_by(14));
}

void KZDSP_StereouLawToMonoQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    mix<ULaw>(kStereo, input, output, frame_count, shifted_by(14));
}

void KZDSP_NChanneluLawToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                 int32_t frame_count) noexcept
{
    accumulate<ULaw>(channels, input, output, frame_count, averaged(channels, 16));
}

void KZDSP_ShortToFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    mix<Pcm16>(kMono, input, output, frame_count, to_float);
}

void KZDSP_StereoShortToMonoFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    mix<Pcm16, float>(kStereo, input, output, frame_count, as_it_is);
}

void KZDSP_NChannelShortToMonoFloat(int32_t channels, const void* input, float* output,
                                    int32_t frame_count) noexcept
{
    mix<Pcm16, float>(channels, input, output, frame_count, as_it_is);
}

void KZDSP_Offset128ToFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    mix<Pcm8>(kMono, input, output, frame_count, to_float_times_256);
}

void KZDSP_StereoOffset128ToMonoFloat(const void* input, float* output,
                                      int32_t frame_count) noexcept
{
    mix<Pcm8>(kStereo, input, output, frame_count, to_float_times_256);
}

void KZDSP_NChannelOffset128ToMonoFloat(int32_t channels, const void* input, float* output,
                                        int32_t frame_count) noexcept
{
    mix<Pcm8>(channels, input, output, frame_count, to_float_times_256);
}

void KZDSP_ALawToFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    mix<ALaw>(kMono, input, output, frame_count, to_float);
}

void KZDSP_StereoALawToMonoFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    mix<ALaw>(kStereo, input, output, frame_count, to_float);
}

void KZDSP_NChannelALawToMonoFloat(int32_t channels, const void* input, float* output,
                                   int32_t frame_count) noexcept
{
    accumulate<ALaw>(channels, input, output, frame_count, to_float);
}

void KZDSP_uLawToFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    mix<ULaw>(kMono, input, output, frame_count, to_float);
}

void KZDSP_StereouLawToMonoFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    mix<ULaw>(kStereo, input, output, frame_count, to_float);
}

void KZDSP_NChanneluLawToMonoFloat(int32_t channels, const void* input, float* output,
                                   int32_t frame_count) noexcept
{
    accumulate<ULaw>(channels, input, output, frame_count, to_float);
}

const int16_t* KZDSP_GetuLawTable() noexcept { return kz::g711::kULaw.data(); }

const int16_t* KZDSP_GetALawTable() noexcept { return kz::g711::kALaw.data(); }
