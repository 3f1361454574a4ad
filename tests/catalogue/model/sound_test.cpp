// Sound of every encoding, rate and number of channels.

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>
#include <limits>
#include <span>
#include <stdexcept>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/model/extractor.hpp"
#include "catalogue/model/sound_reader.hpp"
#include "extracted.hpp"
#include "kzsdk/dsp/convert.h"
#include "kzsdk/stream/stream.h"
#include "support/melody.hpp"
#include "support/signals.hpp"

namespace {

using kz::test::agreement;
using kz::test::bytes_of;
using kz::test::trail_in_pieces;
using kz::test::trail_of;
using kzcat::SoundFormat;
using kzcat::Trail;

constexpr uint32_t kRates[] = {8000,  11025, 12000, 16000, 22050, 24000,  32000,  37800,  44056,
                               44100, 48000, 64000, 88200, 96000, 100001, 176400, 192000, 384000};

Trail of_16_bits(uint32_t rate, uint32_t channels, const std::vector<int16_t>& sound)
{
    return trail_of({KZ_STREAM_FORMAT_PCM16, rate, channels}, bytes_of(sound));
}

template <class Sample, class FromWord>
std::vector<Sample> converted(const std::vector<int16_t>& sound, FromWord from_word)
{
    std::vector<Sample> samples;
    for (const int16_t word : sound) {
        samples.push_back(from_word(word));
    }
    return samples;
}

std::vector<uint8_t> packed_24_bits(const std::vector<int16_t>& sound)
{
    std::vector<uint8_t> bytes;
    for (const int16_t word : sound) {
        const int32_t wide = word * 65536;
        std::array<uint8_t, 4> four{};
        std::memcpy(four.data(), &wide, sizeof wide);
        const bool little = std::endian::native == std::endian::little;
        bytes.insert(bytes.end(), four.begin() + (little ? 1 : 0), four.end() - (little ? 0 : 1));
    }
    return bytes;
}

TEST(Sound, OfMoreBitsGivesTheSameTrail)
{
    const auto sound = kz::test::melody(44100, 2, 4);
    const Trail words = of_16_bits(44100, 2, sound);
    const auto trail = [](uint32_t encoding, const auto& samples) {
        return trail_of({encoding, 44100, 2}, bytes_of(samples));
    };
    EXPECT_EQ(words, trail(KZ_STREAM_FORMAT_PCM24, packed_24_bits(sound)));
    EXPECT_EQ(words, trail(KZ_STREAM_FORMAT_PCM32,
                           converted<int32_t>(sound, [](int16_t word) { return word * 65536; })));
    EXPECT_EQ(words, trail(KZ_STREAM_FORMAT_FLOAT32, converted<float>(sound, [](int16_t word) {
                               return static_cast<float>(word) / 32768;
                           })));
    EXPECT_EQ(words, trail(KZ_STREAM_FORMAT_FLOAT64,
                           converted<double>(sound, [](int16_t word) { return word / 32768.0; })));
}

// Both 8-bit encodings are silent at 128 here; nothing is folded.
TEST(Sound, OfEightBitsIsThatOfTheirWords)
{
    const auto sound = kz::test::melody(16000, 1, 4);
    const auto bytes = converted<uint8_t>(
        sound, [](int16_t word) { return static_cast<uint8_t>((word >> 8) + 128); });
    const auto words =
        converted<int16_t>(sound, [](int16_t word) { return static_cast<int16_t>(word & ~255); });
    const Trail expected = of_16_bits(16000, 1, words);
    EXPECT_EQ(expected, trail_of({KZ_STREAM_FORMAT_LINEAR8, 16000, 1}, bytes_of(bytes)));
    EXPECT_EQ(expected, trail_of({KZ_STREAM_FORMAT_PCM8, 16000, 1}, bytes_of(bytes)));
}

TEST(Sound, OfTelephonesIsThatOfTheirWords)
{
    std::vector<uint8_t> codes(16000);
    kz::test::Random random(3);
    for (uint8_t& code : codes) {
        code = static_cast<uint8_t>(random.below(256));
    }
    std::vector<int16_t> a_law;
    std::vector<int16_t> mu_law;
    for (const uint8_t code : codes) {
        a_law.push_back(static_cast<int16_t>(-KZDSP_GetALawTable()[code]));
        mu_law.push_back(KZDSP_GetuLawTable()[code]);
    }
    EXPECT_EQ(of_16_bits(8000, 1, a_law),
              trail_of({KZ_STREAM_FORMAT_ALAW, 8000, 1}, bytes_of(codes)));
    EXPECT_EQ(of_16_bits(8000, 1, mu_law),
              trail_of({KZ_STREAM_FORMAT_ULAW, 8000, 1}, bytes_of(codes)));
}

// The melody is made at each rate, where its edges alias in another way: hence the width.
TEST(Sound, IsTheSameMusicAtEveryRate)
{
    const Trail expected = of_16_bits(44100, 1, kz::test::melody(44100, 1, 10));
    for (const uint32_t rate : kRates) {
        const Trail trail = of_16_bits(rate, 1, kz::test::melody(rate, 1, 10));
        EXPECT_GE(agreement(expected, trail), 0.8) << rate << " Hz";
        EXPECT_NEAR(10 * 11025, static_cast<double>(trail.samples), 20) << rate << " Hz";
    }
}

TEST(Sound, OfEqualChannelsIsThatOfOne)
{
    const auto mono = kz::test::melody(22050, 1, 3);
    const Trail expected = of_16_bits(22050, 1, mono);
    for (const uint32_t channels : {2U, 3U, 4U, 64U}) {
        std::vector<int16_t> sound;
        for (const int16_t word : mono) {
            sound.insert(sound.end(), channels, word);
        }
        const Trail trail = of_16_bits(22050, channels, sound);
        EXPECT_EQ(expected.samples, trail.samples) << channels;
        // A mean of a number of channels that is no power of two is rounded.
        EXPECT_GE(agreement(expected, trail), channels == 3 ? 0.999 : 1) << channels;
    }
}

TEST(Sound, MayHaveTheMostChannels)
{
    constexpr uint32_t kChannels = KZ_STREAM_MAX_CHANNELS;
    const std::vector<int16_t> sound(size_t{kChannels} * 100, 32767);
    const Trail trail =
        trail_in_pieces({KZ_STREAM_FORMAT_PCM16, 11025, kChannels}, bytes_of(sound), 300000);
    EXPECT_EQ(100U, trail.samples);
}

TEST(Sound, MayBeCutInsideASample)
{
    for (const uint32_t encoding :
         {KZ_STREAM_FORMAT_PCM24, KZ_STREAM_FORMAT_FLOAT32, KZ_STREAM_FORMAT_FLOAT64,
          KZ_STREAM_FORMAT_ULAW, KZ_STREAM_FORMAT_PCM32, KZ_STREAM_FORMAT_PCM16}) {
        std::vector<float> sound;
        kz::test::Random random(encoding);
        for (size_t i = 0; i < 60000; ++i) {
            sound.push_back(static_cast<float>(random.unit()));
        }
        const SoundFormat format{encoding, 11000, 3};
        const Trail whole = trail_of(format, bytes_of(sound));
        for (const size_t cut : {1U, 5U, 1000U}) {
            EXPECT_EQ(whole, trail_in_pieces(format, bytes_of(sound), cut)) << encoding << cut;
        }
    }
}

TEST(Sound, OfTheLowestAndHighestRatesIsTaken)
{
    const std::vector<int16_t> few(100, 5);
    EXPECT_GE(of_16_bits(1, 1, few).samples, 80U * 11025);
    const std::vector<int16_t> many(KZ_STREAM_MAX_RATE, 5);
    EXPECT_NEAR(11025, static_cast<double>(of_16_bits(KZ_STREAM_MAX_RATE, 1, many).samples), 20);
}

TEST(Sound, OfSilenceHasNoBits)
{
    for (const uint32_t rate : kRates) {
        const Trail trail = of_16_bits(rate, 1, std::vector<int16_t>(rate * 3));
        EXPECT_EQ(std::vector<kzcat::Code>(trail.codes.size()), trail.codes) << rate << " Hz";
        EXPECT_EQ(15U, trail.codes.size()) << rate << " Hz";
    }
}

// Only the step at the beginning is heard.
TEST(Sound, OfAConstantHasNoBits)
{
    for (const uint32_t rate : kRates) {
        Trail trail = of_16_bits(rate, 1, std::vector<int16_t>(rate * 3, 32767));
        trail.codes.erase(trail.codes.begin(), trail.codes.begin() + 2);
        EXPECT_EQ(std::vector<kzcat::Code>(trail.codes.size()), trail.codes) << rate << " Hz";
    }
}

TEST(Sound, OfOneStepOfSixteenBitsHasNoBits)
{
    std::vector<int16_t> sound(33075);
    kz::test::Random random(5);
    for (int16_t& word : sound) {
        word = static_cast<int16_t>(random.below(2));
    }
    const Trail trail = of_16_bits(11025, 1, sound);
    EXPECT_EQ(std::vector<kzcat::Code>(trail.codes.size()), trail.codes);
}

// What cannot be a sample becomes one: silence, or the loudest one.
TEST(Sound, MayHoldWhatIsNoNumber)
{
    auto sound = converted<float>(kz::test::melody(11025, 1, 3),
                                  [](int16_t word) { return static_cast<float>(word) / 32768; });
    auto mended = sound;
    for (size_t i = 0; i < sound.size(); i += 1000) {
        sound[i] = std::numeric_limits<float>::quiet_NaN();
        mended[i] = 0;
        sound[i + 1] = std::numeric_limits<float>::infinity();
        mended[i + 1] = 16;
        sound[i + 2] = -1e30F;
        mended[i + 2] = -16;
    }
    const SoundFormat format{KZ_STREAM_FORMAT_FLOAT32, 11025, 1};
    EXPECT_EQ(trail_of(format, bytes_of(mended)), trail_of(format, bytes_of(sound)));
}

// What the level of a query shows of single samples: NaN is 0, and 16 times full scale the loudest.
TEST(Sound, IsClippedFarBeyondFullScale)
{
    const auto level_of = [](float one, float other) {
        std::vector<float> sound(kzcat::kFrameLength);
        for (size_t i = 0; i < sound.size(); ++i) {
            sound[i] = i % 2 == 0 ? one : other;
        }
        kzcat::QueryExtractor extractor({KZ_STREAM_FORMAT_FLOAT32, 11025, 1});
        extractor.feed(bytes_of(sound));
        return extractor.finish().levels.at(0);
    };
    EXPECT_EQ(12 + 2 * 15, level_of(1, -1));
    EXPECT_EQ(12 + 2 * 19, level_of(16, -16));
    EXPECT_EQ(12 + 2 * 19, level_of(17, -1e30F));
    EXPECT_EQ(level_of(1e-4F, 0), level_of(1e-4F, std::numeric_limits<float>::quiet_NaN()));
}

std::string refusal(const SoundFormat& format)
{
    try {
        const kzcat::TrailExtractor extractor(format);
    } catch (const std::invalid_argument& error) {
        return error.what();
    }
    return "";
}

double clipped(double sample)
{
    constexpr double kLimit = 16.0 * 32768;
    return std::isnan(sample) ? 0 : std::clamp(sample * 32768, -kLimit, kLimit);
}

std::vector<float> odd_floats(size_t count)
{
    const float infinity = std::numeric_limits<float>::infinity();
    const std::array odd = {std::numeric_limits<float>::quiet_NaN(),
                            infinity,
                            -infinity,
                            std::numeric_limits<float>::denorm_min(),
                            std::numeric_limits<float>::max(),
                            -0.0F,
                            15.999999F,
                            -16.000002F};
    kz::test::Random random(5);
    std::vector<float> samples(count);
    for (float& sample : samples) {
        sample = random.below(4) == 0
                     ? odd.at(random.below(odd.size()))
                     : static_cast<float>(std::ldexp(random.unit(), -int(random.below(40))));
    }
    return samples;
}

// Single precision serves one channel and two to the bit.
TEST(Sound, OfFloatsIsSummedInDoublesAndRoundedOnce)
{
    constexpr size_t kFrames = 5000;
    for (const uint32_t channels : {1U, 2U, 3U}) {
        const std::vector<float> samples = odd_floats(channels * kFrames);
        kzcat::SoundReader reader({KZ_STREAM_FORMAT_FLOAT32, 44100, channels});
        auto bytes = std::as_bytes(std::span(samples));
        size_t frame = 0;
        while (!bytes.empty()) {
            for (const float sum : reader.read(bytes)) {
                double expected = 0;
                for (uint32_t c = 0; c < channels; ++c) {
                    expected += clipped(samples[frame * channels + c]);
                }
                ASSERT_EQ(static_cast<float>(expected), sum) << channels << ' ' << frame;
                ++frame;
            }
        }
        EXPECT_EQ(kFrames, frame);
    }
}

TEST(Sound, OfAnUnknownFormatIsRefused)
{
    EXPECT_EQ("Encoding 10 of samples is not known; use one of KZ_STREAM_FORMAT_...",
              refusal({10, 44100, 2}));
    EXPECT_EQ("A sample rate of 0 Hz cannot be used; it must be 1 to 4000000.",
              refusal({KZ_STREAM_FORMAT_PCM16, 0, 2}));
    EXPECT_EQ("A sample rate of 4000001 Hz cannot be used; it must be 1 to 4000000.",
              refusal({KZ_STREAM_FORMAT_PCM16, 4000001, 2}));
    EXPECT_EQ("Sound of 0 channels cannot be used; there must be 1 to 65535.",
              refusal({KZ_STREAM_FORMAT_PCM16, 44100, 0}));
    EXPECT_EQ("Sound of 65536 channels cannot be used; there must be 1 to 65535.",
              refusal({KZ_STREAM_FORMAT_PCM16, 44100, 65536}));
    EXPECT_THROW(kzcat::QueryExtractor({0, 44100, 2}), std::invalid_argument);
}

} // namespace
