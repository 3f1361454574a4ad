// Whole songs through the public interface: the 30 values of the document are the model's to the
// word, and those of plain double arithmetic within a bound.
#include "whole/model/paths.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <numeric>
#include <optional>
#include <string>

#include <gtest/gtest.h>

#include "kzsdk/kzsdk.h"
#include "whole/model/material.hpp"
#include "whole/model/query_document.hpp"

using namespace kz::model;

namespace {

constexpr double kSeconds = 14.5; // 12 frames take 14.21 s
constexpr Format kFormats[] = {Format::pcm8, Format::pcm16, Format::alaw, Format::ulaw};

class Library : public ::testing::Test {
protected:
    void SetUp() override
    {
        kzconf_configuration configuration;
        kzconf_initialize_configuration(&configuration);
        ASSERT_EQ(KZ_OK, kzinit_initialize_vesk(&configuration));
    }
    void TearDown() override { EXPECT_EQ(KZ_OK, kzinit_shutdown_vesk()); }
};

using Piece = std::span<const uint8_t>;

/// The document for a song fed in the given pieces; nothing when it is not complete after them.
std::optional<std::string> library_document(uint32_t algorithm, const Ratio& ratio, Format format,
                                            size_t channels, std::span<const Piece> pieces)
{
    kz_fpx_handle* handle = nullptr;
    EXPECT_EQ(KZ_OK,
              kz_fpx_fingerprint_create(algorithm, static_cast<uint32_t>(format), ratio.hertz,
                                        static_cast<uint32_t>(channels), &handle));
    uint8_t complete = 0;
    for (const Piece& piece : pieces) {
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_add_audio(
                             handle, piece.data(), static_cast<uint32_t>(piece.size()), &complete));
    }
    std::optional<std::string> document;
    char* text = nullptr;
    const kz_status status = kz_fpx_fingerprint_serialize(handle, &text);
    EXPECT_EQ(complete != 0 ? KZ_OK : KZ_QV_ERROR_INCOMPLETE, status);
    if (text != nullptr) {
        document = text;
    }
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize_free(&text));
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle));
    return document;
}

/// Feeds both, compares both; returns the model's values.
template <class Path>
std::optional<Values> compare(const Ratio& ratio, Format format, size_t channels,
                              std::span<const Piece> pieces)
{
    typename Path::Road model(ratio, format, channels, Path::filters(ratio));
    for (const Piece& piece : pieces) {
        model.feed(piece);
    }
    const std::optional<Values> values = model.values();
    const std::optional<std::string> document =
        library_document(Path::kAlgorithm, ratio, format, channels, pieces);
    EXPECT_EQ(values.has_value(), document.has_value());
    if (values && document) {
        const Element root = DocumentReader::read(*document);
        EXPECT_EQ(std::vector(values->begin(), values->end()), block_values(root))
            << ratio.hertz << " Hz, " << channels << " channels, format "
            << static_cast<int>(format);
        EXPECT_EQ(query_document(*values), root) << *document;
    }
    return values;
}

template <class Path>
std::optional<Values> compare(const Ratio& ratio, Format format, size_t channels, Piece song)
{
    return compare<Path>(ratio, format, channels, std::span(&song, 1));
}

/// The farthest that a value lies from plain double arithmetic on the same mono words.
template <class Path>
double distance_from_plain(const Ratio& ratio, Format format, size_t channels, Piece song,
                           const Values& values)
{
    const ideal::Shares plain = Path::plain(ratio, format, channels, song);
    double farthest = 0;
    for (size_t i = 0; i < values.size(); ++i) {
        farthest = std::max(farthest, std::abs(values[i] - plain[i]));
    }
    return farthest;
}

/// The code whose meaning is nearest, for each 16-bit sample.
template <class Meaning>
std::vector<uint8_t> companded(std::span<const int16_t> samples, Meaning meaning)
{
    std::vector<std::pair<int32_t, uint8_t>> codes;
    for (unsigned code = 0; code < 256; ++code) {
        codes.emplace_back(meaning(static_cast<uint8_t>(code)), static_cast<uint8_t>(code));
    }
    std::sort(codes.begin(), codes.end());
    std::vector<uint8_t> bytes;
    bytes.reserve(samples.size());
    for (const int16_t sample : samples) {
        auto above =
            std::lower_bound(codes.begin(), codes.end(), std::pair(int32_t{sample}, uint8_t{0}));
        above = above == codes.end() ? above - 1 : above;
        const auto below = above == codes.begin() ? above : above - 1;
        const bool nearer = above->first - sample < sample - below->first;
        bytes.push_back((nearer ? above : below)->second);
    }
    return bytes;
}

std::vector<uint8_t> encoded(Format format, std::span<const int16_t> samples)
{
    switch (format) {
    case Format::pcm8: {
        std::vector<uint8_t> bytes(samples.size());
        std::transform(samples.begin(), samples.end(), bytes.begin(),
                       [](int16_t sample) { return static_cast<uint8_t>((sample >> 8) + 128); });
        return bytes;
    }
    case Format::pcm16:
        return to_bytes(samples);
    case Format::alaw:
        return companded(samples, inverted_alaw_value);
    case Format::ulaw:
        return companded(samples, ulaw_value);
    }
    return {};
}

std::vector<int16_t> left_channel(std::span<const int16_t> stereo)
{
    std::vector<int16_t> left;
    for (size_t i = 0; i < stereo.size(); i += 2) {
        left.push_back(stereo[i]);
    }
    return left;
}

/// The tune in every format, from one channel and from two.
template <class Path>
void compare_all_formats(const Ratio& ratio)
{
    const std::vector<int16_t> stereo = kz::test::tune(ratio.hertz, 2, kSeconds);
    const std::vector<int16_t> mono = left_channel(stereo);
    for (const size_t channels : {size_t{1}, size_t{2}}) {
        for (const Format format : kFormats) {
            const std::vector<uint8_t> song = encoded(format, channels == 1 ? mono : stereo);
            const std::optional<Values> values = compare<Path>(ratio, format, channels, song);
            ASSERT_TRUE(values);
            if (format !=
                Format::pcm8) { // folded samples wrap when resampled, which doubles do not
                EXPECT_LE(distance_from_plain<Path>(ratio, format, channels, song, *values),
                          Path::kPlainBound)
                    << ratio.hertz << " Hz, " << channels << " channels, format "
                    << static_cast<int>(format);
            }
        }
    }
}

} // namespace

template <class Path>
class Song : public Library {
};
TYPED_TEST_SUITE(Song, Paths, PathNames);

TYPED_TEST(Song, At8000HertzInEveryFormat) { compare_all_formats<TypeParam>(kRatios[0]); }
TYPED_TEST(Song, At11025HertzInEveryFormat) { compare_all_formats<TypeParam>(kRatios[1]); }
TYPED_TEST(Song, At16000HertzInEveryFormat) { compare_all_formats<TypeParam>(kRatios[2]); }
TYPED_TEST(Song, At22050HertzInEveryFormat) { compare_all_formats<TypeParam>(kRatios[3]); }
TYPED_TEST(Song, At24000HertzInEveryFormat) { compare_all_formats<TypeParam>(kRatios[4]); }
TYPED_TEST(Song, At32000HertzInEveryFormat) { compare_all_formats<TypeParam>(kRatios[5]); }
TYPED_TEST(Song, At44100HertzInEveryFormat) { compare_all_formats<TypeParam>(kRatios[6]); }
TYPED_TEST(Song, At48000HertzInEveryFormat) { compare_all_formats<TypeParam>(kRatios[7]); }

TYPED_TEST(Song, LoudQuietAndNoisyOnesAgree)
{
    for (const Ratio& ratio : TypeParam::ratios()) {
        const auto samples = static_cast<size_t>(kSeconds * ratio.hertz);
        const std::vector<int16_t> songs[] = {
            kz::test::noise(2 * samples, 1.0, ratio.hertz),
            kz::test::noise(2 * samples, 8.0, ratio.hertz + 1), // clipped nearly everywhere
            kz::test::noise(2 * samples, 0.05, ratio.hertz + 2),
        };
        for (const std::vector<int16_t>& song : songs) {
            EXPECT_TRUE(compare<TypeParam>(ratio, Format::pcm16, 2, to_bytes(song)));
        }
    }
}

TYPED_TEST(Song, RandomBytesInEveryFormatAgree)
{
    for (const Ratio& ratio : TypeParam::ratios()) {
        kz::test::Random random(ratio.hertz);
        std::vector<uint8_t> bytes(static_cast<size_t>(kSeconds * ratio.hertz) * 4);
        std::generate(bytes.begin(), bytes.end(),
                      [&] { return static_cast<uint8_t>(random.next()); });
        for (const Format format : kFormats) {
            for (const size_t channels : {size_t{1}, size_t{2}}) {
                const size_t frame_bytes = bytes_per_sample(format) * channels;
                EXPECT_TRUE(compare<TypeParam>(ratio, format, channels,
                                               Piece(bytes).first(bytes.size() / 4 * frame_bytes)));
            }
        }
    }
}

TYPED_TEST(Song, AClippedTuneAgrees)
{
    for (const size_t which : {0u, 1u, 3u, 6u}) {
        const Ratio& ratio = kRatios[which];
        const std::vector<int16_t> loud = kz::test::tune(ratio.hertz, 2, kSeconds, 30.0);
        EXPECT_TRUE(compare<TypeParam>(ratio, Format::pcm16, 2, to_bytes(loud)));
    }
}

TYPED_TEST(Song, LeadingSilenceIsSkippedAtTheSameSample)
{
    for (const Ratio& ratio : TypeParam::ratios()) {
        const std::vector<int16_t> music =
            kz::test::noise(static_cast<size_t>(kSeconds * ratio.hertz), 0.6, 5);
        for (const double silence : {0.001, 2.9721, 7.0}) {
            std::vector<int16_t> song(static_cast<size_t>(silence * ratio.hertz), 0);
            song.insert(song.end(), music.begin(), music.end());
            EXPECT_TRUE(compare<TypeParam>(ratio, Format::pcm16, 1, to_bytes(song))) << silence;
        }
    }
}

TYPED_TEST(Song, NearSilenceBeforeTheMusicIsJudgedAlike)
{
    for (const Ratio& ratio : TypeParam::ratios()) {
        const auto length = static_cast<size_t>(kSeconds * ratio.hertz);
        for (const double level : {0.002, 0.01, 0.02, 0.05, 0.1}) {
            std::vector<int16_t> song = kz::test::sine(ratio.hertz, 60, 4.0, level);
            const std::vector<int16_t> music = kz::test::noise(length, 0.6, 6);
            song.insert(song.end(), music.begin(), music.end());
            EXPECT_TRUE(compare<TypeParam>(ratio, Format::pcm16, 1, to_bytes(song))) << level;
        }
    }
}

TYPED_TEST(Song, SilenceAndSongsTooShortAreNotComplete)
{
    for (const Ratio& ratio : TypeParam::ratios()) {
        const std::vector<int16_t> silence(static_cast<size_t>(20 * ratio.hertz), 0);
        EXPECT_FALSE(compare<TypeParam>(ratio, Format::pcm16, 1, to_bytes(silence)));
        const auto samples = static_cast<size_t>(14.1 * ratio.hertz);
        EXPECT_FALSE(compare<TypeParam>(ratio, Format::pcm16, 1,
                                        to_bytes(kz::test::noise(samples, 0.5, 7))));
    }
}

TYPED_TEST(Song, PiecesOfAnySizeAgreeWithTheModelFedAlike)
{
    for (const Ratio& ratio : TypeParam::ratios()) {
        std::vector<int16_t> samples = kz::test::sine(ratio.hertz, 30, 2.0, 0.0012);
        const auto frames = static_cast<size_t>(kSeconds * ratio.hertz);
        const std::vector<int16_t> noise = kz::test::noise(2 * frames, 0.7, 8);
        samples.insert(samples.end(), noise.begin(), noise.end());
        const std::vector<uint8_t> song = to_bytes(samples);
        for (const uint32_t largest : {3u, 500u, 20000u, 200000u}) {
            kz::test::Random random(largest + ratio.hertz);
            std::vector<Piece> pieces;
            for (Piece rest = song; !rest.empty(); rest = rest.subspan(pieces.back().size())) {
                pieces.push_back(
                    rest.first(std::min<size_t>(rest.size(), 4 * (1 + random.below(largest)))));
            }
            EXPECT_TRUE(compare<TypeParam>(ratio, Format::pcm16, 2, pieces)) << largest;
        }
    }
}
