// Samples of every format as 16-bit words, and many channels as one: rule by rule, and from end to
// end by the document of the words.

#include <bit>
#include <cfenv>
#include <cmath>
#include <limits>

#include "kzsdk/dsp/convert.h"
#include "kzsdk/stream/frame_reader.hpp"
#include "library/stream/streams.hpp"

namespace kz::test {

namespace {

// The words that frames become; `layout` says how many channels are left.
std::vector<int16_t> words_of(uint32_t format, uint32_t channels, const Bytes& bytes)
{
    const auto layout = stream::layout_of(format, channels, true);
    const auto frames = static_cast<uint32_t>(bytes.size() / layout.frame_bytes);
    std::vector<int16_t> words(size_t{frames} * channels);
    stream::read_frames(layout, bytes.data(), frames, words.data());
    words.resize(size_t{frames} * layout.piece_channels);
    return words;
}

template <class Sample>
std::vector<int16_t> words_of(uint32_t format, const std::vector<Sample>& samples)
{
    return words_of(format, 1, bytes_of(samples));
}

} // namespace

TEST(Formats, IntegersKeepTheirUpperBits)
{
    const std::vector<int32_t> wide = {0, 65535, 65536, -1, -65536, INT32_MAX, INT32_MIN};
    EXPECT_EQ((std::vector<int16_t>{0, 0, 1, -1, -1, 32767, -32768}),
              words_of(KZ_STREAM_FORMAT_PCM32, wide));
    Bytes packed;
    for (const int32_t word : wide) {
        uint8_t raw[4];
        std::memcpy(raw, &word, 4);
        const size_t first = std::endian::native == std::endian::little ? 1 : 0;
        packed.insert(packed.end(), raw + first, raw + first + 3);
    }
    EXPECT_EQ((std::vector<int16_t>{0, 0, 1, -1, -1, 32767, -32768}),
              words_of(KZ_STREAM_FORMAT_PCM24, 1, packed));
}

TEST(Formats, LinearBytesAreSilentAt128)
{
    EXPECT_EQ((std::vector<int16_t>{-32768, -256, 0, 256, 32512}),
              words_of(KZ_STREAM_FORMAT_LINEAR8, 1, Bytes{0, 127, 128, 129, 255}));
}

// With the sign that G.711 gives them: the fixed-point converters have A-law inverted.
TEST(Formats, CompandedBytesAreExpandedByG711)
{
    EXPECT_EQ((std::vector<int16_t>{-8, 8, -32256, 32256}),
              words_of(KZ_STREAM_FORMAT_ALAW, 1, Bytes{0x55, 0xd5, 0x2a, 0xaa}));
    EXPECT_EQ((std::vector<int16_t>{-32124, 32124, 0, 0}),
              words_of(KZ_STREAM_FORMAT_ULAW, 1, Bytes{0x00, 0x80, 0x7f, 0xff}));
}

TEST(Formats, FloatsAreRoundedToTheNearestEven)
{
    const std::vector<float> floats = {0.5F,    1.5F,    2.5F,    -0.5F,    -1.5F,     -2.5F,
                                       0.4999F, 0.5001F, -1.499F, 32766.5F, -32767.5F, 1e-30F};
    std::vector<float> scaled = floats;
    std::ranges::transform(scaled, scaled.begin(), [](float f) { return f / 32768; });
    const std::vector<int16_t> expected = {0, 2, 2, 0, -2, -2, 0, 1, -1, 32766, -32768, 0};
    EXPECT_EQ(expected, words_of(KZ_STREAM_FORMAT_FLOAT32, scaled));
    const std::vector<double> doubles(scaled.begin(), scaled.end());
    EXPECT_EQ(expected, words_of(KZ_STREAM_FORMAT_FLOAT64, doubles));
}

TEST(Formats, FloatsAreClippedAndNansAreSilent)
{
    const float huge = std::numeric_limits<float>::max();
    const float infinite = std::numeric_limits<float>::infinity();
    const float nan = std::numeric_limits<float>::quiet_NaN();
    const std::vector<float> floats = {1, -1, 2, -2, huge, -huge, infinite, -infinite, nan, -nan};
    const std::vector<int16_t> expected = {32767,  -32768, 32767,  -32768, 32767,
                                           -32768, 32767,  -32768, 0,      0};
    EXPECT_EQ(expected, words_of(KZ_STREAM_FORMAT_FLOAT32, floats));
    std::vector<double> doubles(floats.begin(), floats.end());
    EXPECT_EQ(expected, words_of(KZ_STREAM_FORMAT_FLOAT64, doubles));
    doubles = {1e300, -1e300, 1e-300, std::numeric_limits<double>::denorm_min()};
    EXPECT_EQ((std::vector<int16_t>{32767, -32768, 0, 0}),
              words_of(KZ_STREAM_FORMAT_FLOAT64, doubles));
}

// A program that rounds its own numbers otherwise gets the same words.
TEST(Formats, FloatsIgnoreTheRoundingMode)
{
    std::vector<float> floats;
    Random random(3);
    for (int i = 0; i < 100000; ++i) {
        floats.push_back(static_cast<float>(random.unit()));
    }
    const auto expected = words_of(KZ_STREAM_FORMAT_FLOAT32, floats);
    for (size_t i = 0; i < floats.size(); ++i) {
        const float scaled = std::clamp(floats[i] * 32768.0F, -32768.0F, 32767.0F);
        ASSERT_EQ(std::lrint(scaled), expected[i]) << floats[i];
    }
#ifdef FE_UPWARD
    ASSERT_EQ(0, std::fesetround(FE_UPWARD));
    const auto upward = words_of(KZ_STREAM_FORMAT_FLOAT32, floats);
    std::fesetround(FE_TONEAREST);
    EXPECT_EQ(expected, upward);
#endif
}

// Straight to 16 bits: single precision in between would make a half of what is just off it.
TEST(Formats, DoublesAreRoundedOnce)
{
    const double off = 0x1p-36; // of a word; single precision loses it
    const std::vector<double> scaled = {0.5 + off,  0.5 - off,      1.5 - off,    2.5 + off,
                                        -0.5 - off, -1.5 + off,     1000.5 + off, 32766.5 + off,
                                        32767.5,    -32767.5 - off, 0.5,          1.5};
    std::vector<double> doubles(scaled);
    std::ranges::transform(doubles, doubles.begin(), [](double d) { return d / 32768; });
    EXPECT_EQ((std::vector<int16_t>{1, 0, 1, 3, -1, -1, 1001, 32767, 32767, -32768, 0, 2}),
              words_of(KZ_STREAM_FORMAT_FLOAT64, doubles));
}

TEST(Formats, DoublesIgnoreTheRoundingMode)
{
    std::vector<double> doubles;
    Random random(4);
    for (int i = 0; i < 100000; ++i) {
        const double sample = random.unit();
        doubles.push_back(sample);
        doubles.push_back((std::floor(sample * 32768) + 0.5) / 32768); // halves
        doubles.push_back(std::nextafter(doubles.back(), sample));
    }
    const auto expected = words_of(KZ_STREAM_FORMAT_FLOAT64, doubles);
    for (size_t i = 0; i < doubles.size(); ++i) {
        const double scaled = std::clamp(doubles[i] * 32768, -32768.0, 32767.0);
        ASSERT_EQ(std::lrint(scaled), expected[i]) << doubles[i];
    }
#if defined(FE_UPWARD) && defined(FE_DOWNWARD) && defined(FE_TOWARDZERO)
    for (const int mode : {FE_UPWARD, FE_DOWNWARD, FE_TOWARDZERO}) {
        ASSERT_EQ(0, std::fesetround(mode));
        const auto words = words_of(KZ_STREAM_FORMAT_FLOAT64, doubles);
        std::fesetround(FE_TONEAREST);
        EXPECT_EQ(expected, words) << mode;
    }
#endif
}

// The sum over the next power of two, rounded, halves up.
TEST(Formats, ManyChannelsBecomeOne)
{
    const auto mixed = [](const std::vector<int16_t>& frame) {
        const auto words =
            words_of(KZ_STREAM_FORMAT_PCM16, static_cast<uint32_t>(frame.size()), bytes_of(frame));
        EXPECT_EQ(1U, words.size());
        return words.at(0);
    };
    EXPECT_EQ(750, mixed({1000, 1000, 1000})) << "three are divided by four";
    EXPECT_EQ(1000, mixed({1000, 1000, 1000, 1000}));
    EXPECT_EQ(1, mixed({1, 1, 0})) << "a half goes up";
    EXPECT_EQ(0, mixed({-1, -1, 0}));
    EXPECT_EQ(-1, mixed({-1, -1, -1}));
    EXPECT_EQ(32767, mixed(std::vector<int16_t>(8, 32767)));
    EXPECT_EQ(-32768, mixed(std::vector<int16_t>(8, -32768)));
    EXPECT_EQ(32767, mixed(std::vector<int16_t>(65535, 32767))) << "no sum wraps";
    EXPECT_EQ(-32767, mixed(std::vector<int16_t>(65535, -32768))) << "65535 are divided by 65536";
}

TEST(Formats, OneAndTwoChannelsStayApart)
{
    const std::vector<int16_t> samples = {1, -2, 3, -4};
    EXPECT_EQ(samples, words_of(KZ_STREAM_FORMAT_PCM16, 1, bytes_of(samples)));
    EXPECT_EQ(samples, words_of(KZ_STREAM_FORMAT_PCM16, 2, bytes_of(samples)));
}

TEST(Formats, UnknownNumbersHaveNoSize)
{
    EXPECT_EQ(0U, stream::bytes_per_sample(0));
    EXPECT_EQ(0U, stream::bytes_per_sample(10));
    EXPECT_EQ(0U, stream::bytes_per_sample(UINT32_MAX));
}

// From end to end: the document of mixed sound is that of the words fed as mono.
TEST(Formats, DocumentsAreThoseOfTheWords)
{
    const uint32_t rate = 11025;
    const auto samples = music(rate, 3, 0.5, 15, 9);
    std::vector<int16_t> mono(samples.size() / 3);
    for (size_t i = 0; i < mono.size(); ++i) {
        const int32_t sum = samples[3 * i] + samples[3 * i + 1] + samples[3 * i + 2];
        mono[i] = static_cast<int16_t>(std::floor((sum + 2) / 4.0));
    }
    const auto settings = settings_of(KZ_FPX_ALGORITHM_FIXED, KZ_STREAM_FORMAT_PCM16, rate, 3);
    const Stream stream = create(settings);
    const Bytes sound = bytes_of(samples);
    EXPECT_TRUE(feed(stream.get(), sound.data(), sound.size()).complete);
    EXPECT_EQ(document_of_one_call(KZ_FPX_ALGORITHM_FIXED, KZ_FPX_FORMAT_PCM16, rate, 1,
                                   mono.data(), mono.size() * 2),
              document_of(stream.get()));
}

} // namespace kz::test
