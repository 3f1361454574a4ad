#include "kzsdk/dsp/convert.h"

#include <bit>
#include <cstdint>
#include <cstring>
#include <functional>
#include <limits>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "support/signals.hpp"

namespace {

using kz::test::Random;
using Bytes = std::vector<uint8_t>;

// ---- Companding -----------------------------------------------------------------------------

/// As the recommendation defines it: decision values divide the range into intervals, each is
/// expanded to its middle. `first` intervals of the narrowest width come before every group of 16,
/// which doubles the width.
std::vector<int32_t> interval_middles(int32_t start, size_t first)
{
    std::vector<int32_t> middles;
    int32_t edge = start;
    int32_t width = 2;
    while (middles.size() < 128) {
        if (middles.size() >= first && (middles.size() - first) % 16 == 0) {
            width *= 2;
        }
        middles.push_back(edge + width / 2);
        edge += width;
    }
    return middles;
}

TEST(Companding, MuLawExpandsToTheMiddlesOfItsIntervals)
{
    // The first interval reaches from -1 to 1. All bits are inverted; a set sign bit is positive.
    const std::vector<int32_t> middles = interval_middles(-1, 16);
    for (uint32_t n = 0; n < 128; ++n) {
        EXPECT_EQ(4 * middles[n], KZDSP_GetuLawTable()[0xff - n]) << n;
        EXPECT_EQ(-4 * middles[n], KZDSP_GetuLawTable()[0x7f - n]) << n;
    }
}

TEST(Companding, ALawExpandsToInvertedMiddlesOfItsIntervals)
{
    const std::vector<int32_t> middles = interval_middles(0, 32);
    for (uint32_t n = 0; n < 128; ++n) {
        EXPECT_EQ(-8 * middles[n], KZDSP_GetALawTable()[(0x80 | n) ^ 0x55]) << n;
        EXPECT_EQ(8 * middles[n], KZDSP_GetALawTable()[n ^ 0x55]) << n;
    }
}

TEST(Companding, MuLawGivesTheStatedSamples)
{
    const int16_t* table = KZDSP_GetuLawTable();
    EXPECT_EQ(-32124, table[0x00]);
    EXPECT_EQ(0, table[0x7f]);
    EXPECT_EQ(32124, table[0x80]);
    EXPECT_EQ(0, table[0xff]);
}

TEST(Companding, ALawPolarityIsInverted)
{
    const int16_t* table = KZDSP_GetALawTable();
    EXPECT_EQ(32256, table[0x2a]);
    EXPECT_EQ(8, table[0x55]);
    EXPECT_EQ(-32256, table[0xaa]);
    EXPECT_EQ(-8, table[0xd5]);
    for (int byte = 0; byte < 256; ++byte) {
        EXPECT_EQ(byte<0x80, table[byte]> 0) << byte;
    }
}

// ---- All converters against one model -------------------------------------------------------

enum class Encoding { Pcm16, Pcm8, ALaw, ULaw };

int32_t sample_bytes(Encoding encoding) { return encoding == Encoding::Pcm16 ? 2 : 1; }

int64_t sample_at(Encoding encoding, const Bytes& audio, size_t index)
{
    switch (encoding) {
    case Encoding::Pcm16: {
        int16_t sample = 0;
        std::memcpy(&sample, audio.data() + 2 * index, 2);
        return sample;
    }
    case Encoding::Pcm8:
        return audio[index] >= 0x80 ? audio[index] - 0x80 : audio[index] + 0x80;
    case Encoding::ALaw:
        return KZDSP_GetALawTable()[audio[index]];
    case Encoding::ULaw:
        return KZDSP_GetuLawTable()[audio[index]];
    }
    return 0;
}

template <class Word>
using Convert = std::function<void(int32_t, const void*, Word*, int32_t)>;

template <class Word>
Convert<Word> without_channels(void (*convert)(const void*, Word*, int32_t))
{
    return [convert](int32_t, const void* input, Word* output, int32_t frames) {
        convert(input, output, frames);
    };
}

template <class Word>
struct Converter {
    std::string name;
    Encoding encoding;
    int32_t channels; ///< 0: any number
    int32_t shift;    ///< for a fixed number of channels
    Convert<Word> convert;
};

std::vector<Converter<FxpType>> fixed_converters()
{
    const auto fixed = without_channels<FxpType>;
    return {
        {"PCM16ToQ29", Encoding::Pcm16, 1, 14, fixed(KZDSP_PCM16ToQ29)},
        {"PCM16ToQ30", Encoding::Pcm16, 1, 15, fixed(KZDSP_PCM16ToQ30)},
        {"StereoPCM16ToMonoQ30", Encoding::Pcm16, 2, 14, fixed(KZDSP_StereoPCM16ToMonoQ30)},
        {"NChannelPCM16ToMonoQ30", Encoding::Pcm16, 0, 0, KZDSP_NChannelPCM16ToMonoQ30},
        {"PCM8ToQ29", Encoding::Pcm8, 1, 22, fixed(KZDSP_PCM8ToQ29)},
        {"PCM8ToQ30", Encoding::Pcm8, 1, 23, fixed(KZDSP_PCM8ToQ30)},
        {"StereoPCM8ToMonoQ30", Encoding::Pcm8, 2, 22, fixed(KZDSP_StereoPCM8ToMonoQ30)},
        {"NChannelPCM8ToMonoQ30", Encoding::Pcm8, 0, 0, KZDSP_NChannelPCM8ToMonoQ30},
        {"ALawToQ29", Encoding::ALaw, 1, 14, fixed(KZDSP_ALawToQ29)},
        {"StereoALawToMonoQ30", Encoding::ALaw, 2, 14, fixed(KZDSP_StereoALawToMonoQ30)},
        {"NChannelALawToMonoQ30", Encoding::ALaw, 0, 0, KZDSP_NChannelALawToMonoQ30},
        {"uLawToQ29", Encoding::ULaw, 1, 14, fixed(KZDSP_uLawToQ29)},
        {"StereouLawToMonoQ30", Encoding::ULaw, 2, 14, fixed(KZDSP_StereouLawToMonoQ30)},
        {"NChanneluLawToMonoQ30", Encoding::ULaw, 0, 0, KZDSP_NChanneluLawToMonoQ30},
    };
}

std::vector<Converter<float>> float_converters()
{
    const auto fixed = without_channels<float>;
    return {
        {"ShortToFloat", Encoding::Pcm16, 1, 0, fixed(KZDSP_ShortToFloat)},
        {"StereoShortToMonoFloat", Encoding::Pcm16, 2, 0, fixed(KZDSP_StereoShortToMonoFloat)},
        {"NChannelShortToMonoFloat", Encoding::Pcm16, 0, 0, KZDSP_NChannelShortToMonoFloat},
        {"Offset128ToFloat", Encoding::Pcm8, 1, 0, fixed(KZDSP_Offset128ToFloat)},
        {"StereoOffset128ToMonoFloat", Encoding::Pcm8, 2, 0,
         fixed(KZDSP_StereoOffset128ToMonoFloat)},
        {"NChannelOffset128ToMonoFloat", Encoding::Pcm8, 0, 0, KZDSP_NChannelOffset128ToMonoFloat},
        {"ALawToFloat", Encoding::ALaw, 1, 0, fixed(KZDSP_ALawToFloat)},
        {"StereoALawToMonoFloat", Encoding::ALaw, 2, 0, fixed(KZDSP_StereoALawToMonoFloat)},
        {"NChannelALawToMonoFloat", Encoding::ALaw, 0, 0, KZDSP_NChannelALawToMonoFloat},
        {"uLawToFloat", Encoding::ULaw, 1, 0, fixed(KZDSP_uLawToFloat)},
        {"StereouLawToMonoFloat", Encoding::ULaw, 2, 0, fixed(KZDSP_StereouLawToMonoFloat)},
        {"NChanneluLawToMonoFloat", Encoding::ULaw, 0, 0, KZDSP_NChanneluLawToMonoFloat},
    };
}

bool keeps_its_sum(int32_t converter_channels, Encoding encoding)
{
    return converter_channels == 0 && (encoding == Encoding::ALaw || encoding == Encoding::ULaw);
}

int32_t wrapped(int64_t value) { return std::bit_cast<int32_t>(static_cast<uint32_t>(value)); }

/// Sum << bits for one channel, halved in weight as often as the number of channels requires.
int32_t averaged(int64_t sum, int32_t channels, int32_t bits)
{
    for (int64_t divisor = 1; divisor < channels; divisor *= 2) {
        --bits;
    }
    return bits < 0 ? 0 : wrapped(sum * (int64_t{1} << bits));
}

std::vector<FxpType> model(const Converter<FxpType>& converter, int32_t channels,
                           const Bytes& audio)
{
    std::vector<FxpType> words;
    const auto samples = audio.size() / static_cast<size_t>(sample_bytes(converter.encoding));
    int64_t sum = 0;
    for (size_t i = 0; i < samples;) {
        if (!keeps_its_sum(converter.channels, converter.encoding)) {
            sum = 0;
        }
        for (int32_t channel = 0; channel < channels; ++channel) {
            sum += sample_at(converter.encoding, audio, i++);
        }
        if (converter.channels == 0) {
            words.push_back(
                averaged(sum, channels, converter.encoding == Encoding::Pcm8 ? 23 : 15));
        } else {
            words.push_back(wrapped(sum << converter.shift));
        }
    }
    return words;
}

std::vector<float> model(const Converter<float>& converter, int32_t channels, const Bytes& audio)
{
    std::vector<float> words;
    const auto samples = audio.size() / static_cast<size_t>(sample_bytes(converter.encoding));
    int64_t sum = 0;
    for (size_t i = 0; i < samples;) {
        if (!keeps_its_sum(converter.channels, converter.encoding)) {
            sum = 0;
        }
        float float_sum = 0;
        for (int32_t channel = 0; channel < channels; ++channel) {
            const int64_t sample = sample_at(converter.encoding, audio, i++);
            sum += sample;
            float_sum += static_cast<float>(sample);
        }
        if (converter.encoding == Encoding::Pcm16) {
            words.push_back(float_sum);
        } else {
            words.push_back(static_cast<float>(
                wrapped(converter.encoding == Encoding::Pcm8 ? sum * 256 : sum)));
        }
    }
    return words;
}

Bytes random_audio(size_t bytes, uint64_t seed)
{
    Random random(seed);
    Bytes audio(bytes);
    for (uint8_t& byte : audio) {
        byte = static_cast<uint8_t>(random.next() >> 24);
    }
    return audio;
}

/// Converts from an address `offset` bytes beside an aligned one, and checks that no word outside
/// the output is written.
template <class Word>
std::vector<Word> convert(const Converter<Word>& converter, int32_t channels, const Bytes& audio,
                          size_t offset)
{
    const auto frame_bytes = static_cast<size_t>(channels * sample_bytes(converter.encoding));
    const size_t frames = audio.size() / frame_bytes;
    Bytes input(offset);
    input.insert(input.end(), audio.begin(), audio.end());
    const Word guard = std::bit_cast<Word>(0x4b5a4b5a);
    std::vector<Word> output(frames + 2, guard);
    converter.convert(channels, input.data() + offset, output.data() + 1,
                      static_cast<int32_t>(frames));
    EXPECT_EQ(guard, output.front()) << converter.name;
    EXPECT_EQ(guard, output.back()) << converter.name;
    return {output.begin() + 1, output.end() - 1};
}

template <class Word>
void expect_the_model(const std::vector<Converter<Word>>& converters)
{
    for (const auto& converter : converters) {
        for (const int32_t channels : {1, 2, 3, 4, 5, 6, 7, 8, 9, 16, 17, 100, 1000, 2049}) {
            if (converter.channels != 0 && converter.channels != channels) {
                continue;
            }
            for (const size_t frames : {1u, 2u, 3u, 15u, 16u, 17u, 255u, 1001u}) {
                const size_t bytes = frames * static_cast<size_t>(channels) *
                                     static_cast<size_t>(sample_bytes(converter.encoding));
                const Bytes audio = random_audio(bytes, frames);
                const std::vector<Word> expected = model(converter, channels, audio);
                const size_t offset = frames % 4;
                ASSERT_EQ(expected, convert(converter, channels, audio, offset))
                    << converter.name << ", " << channels << " channels, " << frames << " frames";
            }
        }
    }
}

TEST(Convert, ToFixedPointAgreesWithTheModel) { expect_the_model(fixed_converters()); }

TEST(Convert, ToFloatAgreesWithTheModel) { expect_the_model(float_converters()); }

TEST(Convert, AFullScaleSumOfManyChannelsAgreesWithTheModel)
{
    // 3000 samples of one sign pass 2^24, where floats begin to round, and, never cleared, 2^31.
    for (const uint8_t byte : Bytes{0x00, 0x2a, 0x7f, 0x80, 0xff}) {
        const Bytes audio(2 * 3000 * 40, byte);
        for (const auto& converter : float_converters()) {
            if (converter.channels == 0) {
                EXPECT_EQ(model(converter, 3000, audio), convert(converter, 3000, audio, 1))
                    << converter.name << " of " << int{byte};
            }
        }
        for (const auto& converter : fixed_converters()) {
            if (converter.channels == 0) {
                EXPECT_EQ(model(converter, 3000, audio), convert(converter, 3000, audio, 1))
                    << converter.name << " of " << int{byte};
            }
        }
    }
}

TEST(Convert, ReadsSamplesAtAnyAddress)
{
    const Bytes audio = random_audio(2 * 2 * 333, 7);
    for (const auto& converter : fixed_converters()) {
        const int32_t channels = converter.channels == 1 ? 1 : 2;
        const auto aligned = convert(converter, channels, audio, 0);
        for (const size_t offset : {1u, 2u, 3u, 5u}) {
            EXPECT_EQ(aligned, convert(converter, channels, audio, offset)) << converter.name;
        }
    }
    for (const auto& converter : float_converters()) {
        const int32_t channels = converter.channels == 1 ? 1 : 2;
        const auto aligned = convert(converter, channels, audio, 0);
        for (const size_t offset : {1u, 2u, 3u, 5u}) {
            EXPECT_EQ(aligned, convert(converter, channels, audio, offset)) << converter.name;
        }
    }
}

TEST(Convert, NoFramesWriteNothing)
{
    for (const auto& converter : fixed_converters()) {
        FxpType word = 77;
        converter.convert(3, nullptr, &word, 0);
        EXPECT_EQ(77, word) << converter.name;
    }
    for (const auto& converter : float_converters()) {
        float word = 77;
        converter.convert(3, nullptr, &word, 0);
        EXPECT_EQ(77.0f, word) << converter.name;
    }
}

// A count below 0 is read as one of billions.
TEST(ConvertDeath, ANegativeFrameCountRunsOverTheOutput)
{
    const std::vector<uint8_t> input(64, 0x81);
    std::vector<FxpType> words(16);
    for (const auto& converter : fixed_converters()) {
        EXPECT_DEATH(converter.convert(1, input.data(), words.data(), -1), "") << converter.name;
    }
    std::vector<float> floats(16);
    for (const auto& converter : float_converters()) {
        EXPECT_DEATH(converter.convert(1, input.data(), floats.data(), -1), "") << converter.name;
    }
}

TEST(Convert, NoChannelsReadNothingAndGiveZeros)
{
    constexpr int32_t kLeast = std::numeric_limits<int32_t>::min();
    for (const int32_t channels : {0, -1, kLeast}) {
        for (const auto& converter : fixed_converters()) {
            if (converter.channels == 0) {
                FxpType words[] = {77, 77};
                converter.convert(channels, nullptr, words, 2);
                EXPECT_TRUE(words[0] == 0 && words[1] == 0) << converter.name;
            }
        }
        for (const auto& converter : float_converters()) {
            if (converter.channels == 0) {
                float words[] = {77, 77};
                converter.convert(channels, nullptr, words, 2);
                EXPECT_TRUE(words[0] == 0 && words[1] == 0) << converter.name;
            }
        }
    }
}

// ---- What each encoding does ----------------------------------------------------------------

template <class Sample>
FxpType one_frame(void (*converter)(int32_t, const void*, FxpType*, int32_t), int32_t channels,
                  Sample sample)
{
    const std::vector<Sample> frame(static_cast<size_t>(channels), sample);
    FxpType word = 0;
    converter(channels, frame.data(), &word, 1);
    return word;
}

TEST(Convert, LowerHalfOf8BitAudioIsFoldedUp)
{
    const uint8_t bytes[] = {0x80, 0x81, 0x7f, 0x00, 0xff};
    FxpType words[5] = {};
    KZDSP_PCM8ToQ29(bytes, words, 5);
    EXPECT_EQ(0, words[0]);
    EXPECT_EQ(0x00400000, words[1]);
    EXPECT_EQ(0x3fc00000, words[2]) << "one step below silence comes out as the largest value";
    EXPECT_EQ(0x20000000, words[3]);
    EXPECT_EQ(0x1fc00000, words[4]);
    float floats[5] = {};
    KZDSP_Offset128ToFloat(bytes, floats, 5);
    EXPECT_EQ(0.0f, floats[0]);
    EXPECT_EQ(256.0f, floats[1]);
    EXPECT_EQ(65280.0f, floats[2]);
    EXPECT_EQ(32768.0f, floats[3]);
    EXPECT_EQ(32512.0f, floats[4]);
}

TEST(Convert, FullScaleStereoFits)
{
    const int16_t frames[] = {32767, 32767, -32768, -32768, 32767, -32768};
    FxpType words[3] = {};
    KZDSP_StereoPCM16ToMonoQ30(frames, words, 3);
    EXPECT_EQ(0x3fff8000, words[0]);
    EXPECT_EQ(-0x40000000, words[1]);
    EXPECT_EQ(-0x4000, words[2]);
}

TEST(Convert, ThreeChannelsAreDividedByFour)
{
    EXPECT_EQ(3000 << 13, one_frame<int16_t>(KZDSP_NChannelPCM16ToMonoQ30, 3, 1000));
    EXPECT_EQ(4000 << 13, one_frame<int16_t>(KZDSP_NChannelPCM16ToMonoQ30, 4, 1000));
    EXPECT_EQ(3 << 21, one_frame<uint8_t>(KZDSP_NChannelPCM8ToMonoQ30, 3, 0x81));
}

TEST(Convert, AbsurdNumbersOfChannelsGiveZero)
{
    EXPECT_EQ(32768, one_frame<int16_t>(KZDSP_NChannelPCM16ToMonoQ30, 32768, 1));
    EXPECT_EQ(0, one_frame<int16_t>(KZDSP_NChannelPCM16ToMonoQ30, 32769, 1));
    EXPECT_EQ(0, one_frame<int16_t>(KZDSP_NChannelPCM16ToMonoQ30, 65536, 1));
    EXPECT_EQ(0, one_frame<int16_t>(KZDSP_NChannelPCM16ToMonoQ30, 65537, 1));
    EXPECT_EQ(1 << 23, one_frame<uint8_t>(KZDSP_NChannelPCM8ToMonoQ30, 1 << 23, 0x81));
    EXPECT_EQ(0, one_frame<uint8_t>(KZDSP_NChannelPCM8ToMonoQ30, (1 << 23) + 1, 0x81));
    EXPECT_EQ(0, one_frame<uint8_t>(KZDSP_NChannelALawToMonoQ30, 32769, 0x2a));
    EXPECT_EQ(0, one_frame<uint8_t>(KZDSP_NChanneluLawToMonoQ30, 32769, 0x80));
}

TEST(Convert, RunningSumOfManyLawChannelsIsNeverCleared)
{
    const uint8_t ulaw[] = {0x80, 0x80, 0xff, 0xff, 0x00, 0xff};
    FxpType words[3] = {};
    KZDSP_NChanneluLawToMonoQ30(2, ulaw, words, 3);
    EXPECT_EQ((32124 + 32124) << 14, words[0]);
    EXPECT_EQ((32124 + 32124) << 14, words[1]) << "the second frame adds zeros";
    EXPECT_EQ(32124 << 14, words[2]);
    float floats[3] = {};
    KZDSP_NChanneluLawToMonoFloat(2, ulaw, floats, 3);
    EXPECT_EQ(64248.0f, floats[1]);

    const uint8_t alaw[] = {0x2a, 0x2a, 0x55, 0xd5};
    KZDSP_NChannelALawToMonoFloat(2, alaw, floats, 2);
    EXPECT_EQ(64512.0f, floats[0]);
    EXPECT_EQ(64512.0f, floats[1]);
}

TEST(Convert, RunningSumStartsAnewWithEveryCall)
{
    const uint8_t loud[] = {0x80, 0x80};
    FxpType first = 0;
    FxpType second = 0;
    KZDSP_NChanneluLawToMonoQ30(2, loud, &first, 1);
    KZDSP_NChanneluLawToMonoQ30(2, loud, &second, 1);
    EXPECT_EQ(first, second);
}

TEST(Convert, StereoAndPcmSumsAreClearedAtEveryFrame)
{
    const uint8_t loud_then_silent[] = {0x80, 0x80, 0xff, 0xff};
    FxpType words[2] = {};
    KZDSP_StereouLawToMonoQ30(loud_then_silent, words, 2);
    EXPECT_EQ(0, words[1]);
    const int16_t samples[] = {9, 9, 0, 0};
    KZDSP_NChannelPCM16ToMonoQ30(2, samples, words, 2);
    EXPECT_EQ(0, words[1]);
}

TEST(Convert, ALawThroughAConverterIsInvertedToo)
{
    const uint8_t byte = 0xd5;
    float value = 0;
    KZDSP_ALawToFloat(&byte, &value, 1);
    EXPECT_EQ(-8.0f, value);
}

} // namespace
