// Every sample converter on bytes at any address, against the model's sums in 64 bits.

#include <bit>

#include "fuzz.hpp"
#include "kzsdk/dsp/convert.h"
#include "whole/model/convert.hpp"

namespace kz::fuzz {

namespace {

using model::Format;

template <class Word>
struct Converter {
    Format format;
    int32_t shift;    ///< of the sum of the channels
    int32_t channels; ///< 0: any number
    void (*few)(const void*, Word*, int32_t);
    void (*any)(int32_t, const void*, Word*, int32_t);
};

constexpr Converter<FxpType> kFixed[] = {
    {Format::pcm16, 14, 1, KZDSP_PCM16ToQ29, nullptr},
    {Format::pcm16, 15, 1, KZDSP_PCM16ToQ30, nullptr},
    {Format::pcm16, 14, 2, KZDSP_StereoPCM16ToMonoQ30, nullptr},
    {Format::pcm16, 16, 0, nullptr, KZDSP_NChannelPCM16ToMonoQ30},
    {Format::pcm8, 22, 1, KZDSP_PCM8ToQ29, nullptr},
    {Format::pcm8, 23, 1, KZDSP_PCM8ToQ30, nullptr},
    {Format::pcm8, 22, 2, KZDSP_StereoPCM8ToMonoQ30, nullptr},
    {Format::pcm8, 8, 0, nullptr, KZDSP_NChannelPCM8ToMonoQ30},
    {Format::alaw, 14, 1, KZDSP_ALawToQ29, nullptr},
    {Format::alaw, 14, 2, KZDSP_StereoALawToMonoQ30, nullptr},
    {Format::alaw, 16, 0, nullptr, KZDSP_NChannelALawToMonoQ30},
    {Format::ulaw, 14, 1, KZDSP_uLawToQ29, nullptr},
    {Format::ulaw, 14, 2, KZDSP_StereouLawToMonoQ30, nullptr},
    {Format::ulaw, 16, 0, nullptr, KZDSP_NChanneluLawToMonoQ30},
};

constexpr Converter<float> kFloat[] = {
    {Format::pcm16, 0, 1, KZDSP_ShortToFloat, nullptr},
    {Format::pcm16, 0, 2, KZDSP_StereoShortToMonoFloat, nullptr},
    {Format::pcm16, 0, 0, nullptr, KZDSP_NChannelShortToMonoFloat},
    {Format::pcm8, 8, 1, KZDSP_Offset128ToFloat, nullptr},
    {Format::pcm8, 8, 2, KZDSP_StereoOffset128ToMonoFloat, nullptr},
    {Format::pcm8, 8, 0, nullptr, KZDSP_NChannelOffset128ToMonoFloat},
    {Format::alaw, 0, 1, KZDSP_ALawToFloat, nullptr},
    {Format::alaw, 0, 2, KZDSP_StereoALawToMonoFloat, nullptr},
    {Format::alaw, 0, 0, nullptr, KZDSP_NChannelALawToMonoFloat},
    {Format::ulaw, 0, 1, KZDSP_uLawToFloat, nullptr},
    {Format::ulaw, 0, 2, KZDSP_StereouLawToMonoFloat, nullptr},
    {Format::ulaw, 0, 0, nullptr, KZDSP_NChanneluLawToMonoFloat},
};

/// The sums of the frames; those of companded audio of many channels run on.
template <class Word>
std::vector<int64_t> sums_of(const Converter<Word>& converter, int32_t channels,
                             std::span<const uint8_t> bytes)
{
    auto sums = model::frame_sums(converter.format, static_cast<size_t>(channels), bytes);
    const bool companded = converter.format == Format::alaw || converter.format == Format::ulaw;
    if (converter.channels == 0 && companded) {
        for (size_t i = 1; i < sums.size(); ++i) {
            sums[i] += sums[i - 1];
        }
    }
    return sums;
}

FxpType expected_word(const Converter<FxpType>& converter, int32_t channels, int64_t sum)
{
    int32_t shift = converter.shift;
    if (converter.channels == 0) {
        shift = std::countl_zero(std::bit_ceil(static_cast<uint32_t>(channels))) - converter.shift;
    }
    return model::shifted_left(model::word(sum), shift);
}

float expected_word(const Converter<float>& converter, int32_t /*channels*/, int64_t sum)
{
    return static_cast<float>(sum * (int64_t{1} << converter.shift));
}

template <class Word>
void convert(const Converter<Word>& converter, int32_t channels, const uint8_t* bytes,
             std::vector<Word>& words)
{
    const auto count = static_cast<int32_t>(words.size());
    if (converter.few != nullptr) {
        converter.few(bytes, words.data(), count);
    } else {
        converter.any(channels, bytes, words.data(), count);
    }
}

template <class Word>
void check(Choices& choices, const Converter<Word>& converter)
{
    const int32_t channels = converter.channels != 0
                                 ? converter.channels
                                 : choices.ConsumeIntegralInRange<int32_t>(1, 40);
    const size_t offset = choices.ConsumeIntegralInRange<size_t>(0, 3);
    const size_t offset_out = choices.ConsumeIntegralInRange<size_t>(0, 5);
    const auto bytes = choices.ConsumeRemainingBytes<uint8_t>();
    const auto sums = sums_of(converter, channels, bytes);
    const size_t frame = static_cast<size_t>(channels) * model::bytes_per_sample(converter.format);
    const Copy copy(bytes.data(), sums.size() * frame, offset);
    std::vector<Word> words(sums.size());
    convert(converter, channels, copy.data(), words);
    for (size_t i = 0; i < sums.size(); ++i) {
        ASSERT_EQ(expected_word(converter, channels, sums[i]), words[i]) << "word " << i;
    }
    // In two calls, which restart the running sum and leave the rest of the output untouched.
    const size_t half = std::min(offset_out, words.size());
    std::vector<Word> begin(half);
    convert(converter, channels, copy.data(), begin);
    ASSERT_TRUE(std::equal(begin.begin(), begin.end(), words.begin()));
}

} // namespace

void run(Choices& choices)
{
    if (choices.ConsumeBool()) {
        check(choices, choices.PickValueInArray(kFixed));
    } else {
        check(choices, choices.PickValueInArray(kFloat));
    }
}

} // namespace kz::fuzz
