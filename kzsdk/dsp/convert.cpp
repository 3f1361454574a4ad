#include "kzsdk/dsp/convert.h"

#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/g711.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/mix.hpp"

namespace {

using namespace kz::kernels;
using kz::fxp::shift_left;

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
    active().words.pcm16_mono(input, output, frame_count, 14);
}

void KZDSP_PCM16ToQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    active().words.pcm16_mono(input, output, frame_count, 15);
}

void KZDSP_StereoPCM16ToMonoQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    active().words.pcm16_stereo(input, output, frame_count, 14);
}

void KZDSP_NChannelPCM16ToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                  int32_t frame_count) noexcept
{
    mix<Pcm16>(channels, input, output, frame_count, averaged(channels, 16));
}

void KZDSP_PCM8ToQ29(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    active().words.pcm8_mono(input, output, frame_count, 22);
}

void KZDSP_PCM8ToQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    active().words.pcm8_mono(input, output, frame_count, 23);
}

void KZDSP_StereoPCM8ToMonoQ30(const void* input, FxpType* output, int32_t frame_count) noexcept
{
    active().words.pcm8_stereo(input, output, frame_count, 22);
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
    active().floats.pcm16_mono(input, output, frame_count, 0);
}

void KZDSP_StereoShortToMonoFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    active().floats.pcm16_stereo(input, output, frame_count, 0);
}

void KZDSP_NChannelShortToMonoFloat(int32_t channels, const void* input, float* output,
                                    int32_t frame_count) noexcept
{
    mix<Pcm16, float>(channels, input, output, frame_count, as_it_is);
}

void KZDSP_Offset128ToFloat(const void* input, float* output, int32_t frame_count) noexcept
{
    active().floats.pcm8_mono(input, output, frame_count, 8);
}

void KZDSP_StereoOffset128ToMonoFloat(const void* input, float* output,
                                      int32_t frame_count) noexcept
{
    active().floats.pcm8_stereo(input, output, frame_count, 8);
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
