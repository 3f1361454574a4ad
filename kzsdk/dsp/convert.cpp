/// @file
/// The sample converters. Which loop serves a format, and by how much sums are shifted, is decided
/// here; the loops themselves, with their A-law and mu-law arithmetic, are kernels. Words come out
/// in Q29 or Q30, floats in units of a 16-bit sample.

#include "kzsdk/dsp/convert.h"

#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/kernels.hpp"

namespace {

/// The active variant's converters to words and to floats.
const auto& to_words() noexcept { return kz::kernels::active().to_words; }
const auto& to_floats() noexcept { return kz::kernels::active().to_floats; }

/// The shift that divides a sum of samples by the smallest power of two not below the number of
/// channels and writes it in Q30. It is negative, which leaves 0, for absurd numbers of channels.
int32_t averaging_shift(int32_t channels, int32_t sample_bits) noexcept
{
    const uint32_t divisor = kz::fxp::next_power_of_two(static_cast<uint32_t>(channels));
    return kz::fxp::leading_zeros(divisor) - sample_bits;
}

} // namespace

// ---- 16-bit PCM to words. A shift by 14 makes Q29 of one sample and Q30 of the average of two.

void KZDSP_PCM16ToQ29(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    to_words().pcm16(1, input, output, frame_count, 14);
}

void KZDSP_PCM16ToQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    to_words().pcm16(1, input, output, frame_count, 15);
}

void KZDSP_StereoPCM16ToMonoQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    to_words().pcm16(2, input, output, frame_count, 14);
}

void KZDSP_NChannelPCM16ToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                  int32_t frame_count) noexcept
{
    to_words().pcm16(channels, input, output, frame_count, averaging_shift(channels, 16));
}

// ---- 8-bit PCM to words: the same, with 8 bits more. Bytes below silence are folded up.

void KZDSP_PCM8ToQ29(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    to_words().pcm8(1, input, output, frame_count, 22);
}

void KZDSP_PCM8ToQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    to_words().pcm8(1, input, output, frame_count, 23);
}

void KZDSP_StereoPCM8ToMonoQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    to_words().pcm8(2, input, output, frame_count, 22);
}

void KZDSP_NChannelPCM8ToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                 int32_t frame_count) noexcept
{
    to_words().pcm8(channels, input, output, frame_count, averaging_shift(channels, 8));
}

// ---- A-law and mu-law to words, expanded to the scale of 16-bit PCM. A-law comes out inverted.
// The sums of the N-channel converters run on from frame to frame and are never cleared.

void KZDSP_ALawToQ29(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    to_words().alaw(1, input, output, frame_count, 14);
}

void KZDSP_StereoALawToMonoQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    to_words().alaw(2, input, output, frame_count, 14);
}

void KZDSP_NChannelALawToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                 int32_t frame_count) noexcept
{
    to_words().alaw_running(channels, input, output, frame_count, averaging_shift(channels, 16));
}

void KZDSP_uLawToQ29(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    to_words().ulaw(1, input, output, frame_count, 14);
}

void KZDSP_StereouLawToMonoQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    to_words().ulaw(2, input, output, frame_count, 14);
}

void KZDSP_NChanneluLawToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                 int32_t frame_count) noexcept
{
    to_words().ulaw_running(channels, input, output, frame_count, averaging_shift(channels, 16));
}

// ---- to floats: channels are added, not averaged; 8-bit PCM is brought to the scale of 16 bits

void KZDSP_ShortToFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    to_floats().pcm16(1, input, output, frame_count);
}

void KZDSP_StereoShortToMonoFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    to_floats().pcm16(2, input, output, frame_count);
}

void KZDSP_NChannelShortToMonoFloat(int32_t channels, const void* input, float* output,
                                    int32_t frame_count) noexcept
{
    to_floats().pcm16(channels, input, output, frame_count);
}

void KZDSP_Offset128ToFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    to_floats().pcm8(1, input, output, frame_count);
}

void KZDSP_StereoOffset128ToMonoFloat(const void* input, float* output,
                                      int32_t frame_count) noexcept
{
    to_floats().pcm8(2, input, output, frame_count);
}

void KZDSP_NChannelOffset128ToMonoFloat(int32_t channels, const void* input, float* output,
                                        int32_t frame_count) noexcept
{
    to_floats().pcm8(channels, input, output, frame_count);
}

void KZDSP_ALawToFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    to_floats().alaw(1, input, output, frame_count);
}

void KZDSP_StereoALawToMonoFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    to_floats().alaw(2, input, output, frame_count);
}

void KZDSP_NChannelALawToMonoFloat(int32_t channels, const void* input, float* output,
                                   int32_t frame_count) noexcept
{
    to_floats().alaw_running(channels, input, output, frame_count);
}

void KZDSP_uLawToFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    to_floats().ulaw(1, input, output, frame_count);
}

void KZDSP_StereouLawToMonoFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    to_floats().ulaw(2, input, output, frame_count);
}

void KZDSP_NChanneluLawToMonoFloat(int32_t channels, const void* input, float* output,
                                   int32_t frame_count) noexcept
{
    to_floats().ulaw_running(channels, input, output, frame_count);
}

// ---- the tables of both laws, 256 samples each

const int16_t* KZDSP_GetuLawTable() noexcept { return kz::kernels::kULawSamples.data(); }

const int16_t* KZDSP_GetALawTable() noexcept { return kz::kernels::kALawSamples.data(); }
