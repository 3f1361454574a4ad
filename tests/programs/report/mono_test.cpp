// Sound as it is read for pictures.

#include "audio/mono.hpp"

#include <cmath>
#include <fstream>
#include <numbers>

#include <gtest/gtest.h>

#include "audio/source.hpp"
#include "support/scratch_directory.hpp"

namespace audio {
namespace {

class MonoSound : public testing::Test {
protected:
    template <class Number>
    std::string raw_file(const std::vector<Number>& samples) const
    {
        const std::string path = scratch_.path() + "/sound.raw";
        std::ofstream(path, std::ios::binary)
            .write(reinterpret_cast<const char*>(samples.data()),
                   static_cast<std::streamsize>(samples.size() * sizeof(Number)));
        return path;
    }

    kz::test::ScratchDirectory scratch_;
};

std::vector<int16_t> sine(uint32_t rate, double hertz, size_t count)
{
    std::vector<int16_t> samples;
    for (size_t i = 0; i < count; ++i) {
        const double phase = 2 * std::numbers::pi * hertz * static_cast<double>(i) / rate;
        samples.push_back(static_cast<int16_t>(std::lround(16384 * std::sin(phase))));
    }
    return samples;
}

double level_of(const std::vector<float>& samples)
{
    double power = 0;
    for (const float sample : samples) {
        power += double{sample} * sample;
    }
    return std::sqrt(2 * power / static_cast<double>(samples.size()));
}

TEST_F(MonoSound, IsConvertedToALowRate)
{
    const std::string path = raw_file(sine(44100, 1000, 44100));
    const Mono mono = read_mono(path, StreamFormat{.rate = 44100, .channels = 1}, {});
    EXPECT_EQ(kMonoRate, mono.rate);
    EXPECT_NEAR(11025, static_cast<double>(mono.samples.size()), 2);
    EXPECT_NEAR(0.5, level_of(mono.samples), 0.005);
}

TEST_F(MonoSound, HasNothingOfWhatALowRateCannotHold)
{
    const std::string path = raw_file(sine(44100, 8000, 44100));
    const Mono mono = read_mono(path, StreamFormat{.rate = 44100, .channels = 1}, {});
    EXPECT_LT(level_of(mono.samples), 0.005);
}

TEST_F(MonoSound, IsASectionOfTheFile)
{
    const std::string path = raw_file(sine(8000, 440, 80000));
    const Mono mono =
        read_mono(path, StreamFormat{.rate = 8000, .channels = 1}, {.start = 2, .length = 3});
    EXPECT_EQ(8000U, mono.rate);
    EXPECT_EQ(24000U, mono.samples.size());
}

TEST_F(MonoSound, IsTheMeanOfTheChannels)
{
    const std::string path = raw_file<float>({1, 0.5F, 0, -1, -0.5F, 0});
    const Mono mono =
        read_mono(path, StreamFormat{.rate = 8000, .channels = 3, .encoding = Encoding::f32}, {});
    EXPECT_EQ((std::vector<float>{0.5F, -0.5F}), mono.samples);
}

TEST_F(MonoSound, TelephoneCodesAreExpanded)
{
    const StreamFormat alaw = {.rate = 8000, .channels = 1, .encoding = Encoding::alaw};
    EXPECT_EQ(
        (std::vector<float>{8.0F / 32768, -8.0F / 32768, 32256.0F / 32768, -32256.0F / 32768}),
        read_mono(raw_file<uint8_t>({0xD5, 0x55, 0xAA, 0x2A}), alaw, {}).samples);
    const StreamFormat ulaw = {.rate = 8000, .channels = 1, .encoding = Encoding::ulaw};
    EXPECT_EQ((std::vector<float>{0, 0, 32124.0F / 32768, -32124.0F / 32768}),
              read_mono(raw_file<uint8_t>({0xFF, 0x7F, 0x80, 0x00}), ulaw, {}).samples);
    const StreamFormat u8 = {.rate = 8000, .channels = 1, .encoding = Encoding::u8};
    EXPECT_EQ((std::vector<float>{0, -1}),
              read_mono(raw_file<uint8_t>({0x80, 0x00}), u8, {}).samples);
}

TEST_F(MonoSound, AFileThatIsNotThereIsAnError)
{
    EXPECT_THROW(read_mono(scratch_.path() + "/nothing.wav", {}, {}), FileError);
}

} // namespace
} // namespace audio
