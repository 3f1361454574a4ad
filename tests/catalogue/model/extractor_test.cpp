// Trails and queries, against features worked out in double precision, and against each other.

#include <algorithm>
#include <cmath>
#include <span>
#include <stdexcept>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/model/extractor.hpp"
#include "extracted.hpp"
#include "kzsdk/stream/stream.h"
#include "reference_features.hpp"
#include "support/melody.hpp"
#include "support/signals.hpp"

namespace {

using kz::test::bytes_of;
using kz::test::query_of;
using kz::test::trail_in_pieces;
using kz::test::trail_of;
using kzcat::Code;
using kzcat::QueryBands;
using kzcat::QueryExtractor;
using kzcat::SoundFormat;
using kzcat::Trail;
using kzcat::TrailExtractor;

constexpr SoundFormat kWorking{KZ_STREAM_FORMAT_PCM16, kzcat::kWorkingRate, 1};

std::vector<float> floats_of(const std::vector<int16_t>& samples)
{
    return {samples.begin(), samples.end()};
}

// A change over time, from differences of all frames; frames beyond the ends are those at the ends.
template <class Frames>
double change_at(const Frames& frames, size_t centre, size_t pair, size_t lag)
{
    const size_t after = std::min(centre + lag, frames.size() - 1);
    return static_cast<double>(frames[after][pair]) -
           static_cast<double>(frames[centre - std::min(centre, lag)][pair]);
}

TEST(TrailExtractor, AgreesWithDoublePrecision)
{
    const auto sound = kz::test::melody(kzcat::kWorkingRate, 1, 30);
    const Trail trail = trail_of(kWorking, bytes_of(sound));
    const auto samples = floats_of(sound);
    const auto frames = kz::test::reference_differences_of(samples, kzcat::kTrailHop);
    ASSERT_EQ((frames.size() + 1) / 2, trail.codes.size());
    size_t different = 0;
    for (size_t c = 0; c < trail.codes.size(); ++c) {
        for (size_t pair = 0; pair < kzcat::kPairs; ++pair) {
            const double change = change_at(frames, 2 * c, pair, kzcat::pair_lag(pair));
            if ((change > 0) != ((trail.codes[c] >> pair & 1) != 0)) {
                EXPECT_LT(std::fabs(change), 1e-3) << "code " << c << " pair " << pair;
                ++different;
            }
        }
    }
    EXPECT_LE(different * 1000, trail.codes.size() * kzcat::kPairs);
}

// A band far below the loudest of its frame holds the rounding errors of that one: hence the width.
TEST(PairDifferences, AgreeWithDoublePrecision)
{
    constexpr double kTolerance = 3e-3;
    const auto sound = kz::test::melody(kzcat::kWorkingRate, 1, 2);
    const QueryBands query = query_of(kWorking, bytes_of(sound));
    const auto samples = floats_of(sound);
    for (const int steps : {-6, -3, 0, 1, 6}) {
        const auto frames = kz::test::reference_differences_of(samples, kzcat::kQueryHop, steps);
        ASSERT_EQ(frames.size(), query.frames());
        for (size_t m = 0; m < frames.size(); ++m) {
            std::array<float, kzcat::kPairs> differences;
            kzcat::pair_differences(query.frame(m), steps, differences);
            for (size_t pair = 0; pair < kzcat::kPairs; ++pair) {
                EXPECT_NEAR(frames[m][pair], static_cast<double>(differences[pair]), kTolerance)
                    << "steps " << steps << " frame " << m << " pair " << pair;
            }
        }
    }
}

TEST(QueryExtractor, GivesTheTrailsCodesAtPhaseZero)
{
    const auto sound = kz::test::melody(44100, 2, 20);
    const SoundFormat format{KZ_STREAM_FORMAT_PCM16, 44100, 2};
    const Trail trail = trail_of(format, bytes_of(sound));
    const QueryBands query = query_of(format, bytes_of(sound));
    ASSERT_EQ(trail.samples, query.samples);
    std::vector<std::array<float, kzcat::kPairs>> frames(query.frames());
    for (size_t m = 0; m < frames.size(); ++m) {
        kzcat::pair_differences(query.frame(m), 0, frames[m]);
    }
    for (size_t c = 2; c + 2 < trail.codes.size(); ++c) {
        Code code = 0;
        for (size_t pair = 0; pair < kzcat::kPairs; ++pair) {
            const bool rises = change_at(frames, 4 * c, pair, 2 * kzcat::pair_lag(pair)) > 0;
            code |= Code{rises} << pair;
        }
        EXPECT_EQ(trail.codes[c], code) << c;
    }
}

TEST(TrailExtractor, ShowsNoCuts)
{
    const auto sound = kz::test::melody(48000, 2, 5);
    const SoundFormat format{KZ_STREAM_FORMAT_PCM16, 48000, 2};
    const Trail whole = trail_of(format, bytes_of(sound));
    for (const size_t cut : {1U, 7U, 4096U, 100001U}) {
        EXPECT_EQ(whole, trail_in_pieces(format, bytes_of(sound), cut)) << "cut every " << cut;
    }
}

TEST(QueryExtractor, ShowsNoCuts)
{
    const auto sound = kz::test::melody(44056, 1, 2);
    const SoundFormat format{KZ_STREAM_FORMAT_PCM16, 44056, 1};
    const QueryBands whole = query_of(format, bytes_of(sound));
    QueryExtractor extractor(format);
    for (auto rest = bytes_of(sound); !rest.empty();) {
        const size_t count = std::min<size_t>(rest.size(), 333);
        extractor.feed(rest.first(count));
        rest = rest.subspan(count);
    }
    const QueryBands pieces = extractor.finish();
    EXPECT_EQ(whole.samples, pieces.samples);
    EXPECT_EQ(whole.levels, pieces.levels);
    EXPECT_EQ(whole.energies, pieces.energies);
}

// The energy of a frame's 4096 samples about their mean; a sine has half of its square.
TEST(QueryExtractor, MeasuresTheLevelOfEveryFrame)
{
    auto sound = kz::test::sine(kzcat::kWorkingRate, 441, 2, 1);
    for (size_t i = 0; i < sound.size() / 2; ++i) {
        sound[i] = static_cast<int16_t>(sound[i] / 100 + 5000);
    }
    const QueryBands query = query_of(kWorking, bytes_of(sound));
    for (size_t m = 0; m < query.frames(); ++m) {
        const auto frame = std::span(sound).subspan(m * kzcat::kQueryHop, kzcat::kFrameLength);
        double mean = 0;
        for (const int16_t sample : frame) {
            mean += sample / 4096.0;
        }
        double energy = 1;
        for (const int16_t sample : frame) {
            energy += (sample - mean) * (sample - mean);
        }
        EXPECT_NEAR(std::log2(energy), static_cast<double>(query.levels[m]), 1e-5) << m;
    }
    EXPECT_NEAR(41, static_cast<double>(query.levels.back()), 0.01);
    const std::vector<int16_t> constant(10000, -32768);
    for (const float level : query_of(kWorking, bytes_of(constant)).levels) {
        EXPECT_EQ(0, level);
    }
}

// Code c is that of frame 2c, and its longest lag looks three frames ahead.
TEST(TrailExtractor, GivesACodeWithItsLastFrame)
{
    const auto sound = kz::test::melody(kzcat::kWorkingRate, 1, 3);
    TrailExtractor extractor(kWorking);
    const size_t first = (3 * kzcat::kTrailHop + kzcat::kFrameLength) * sizeof sound[0];
    extractor.feed(bytes_of(sound).first(first - 1));
    EXPECT_TRUE(extractor.take_codes().empty());
    extractor.feed(bytes_of(sound).subspan(first - 1, 1));
    EXPECT_EQ(1U, extractor.take_codes().size());
    extractor.feed(bytes_of(sound).subspan(first, 2 * kzcat::kTrailHop * sizeof sound[0]));
    EXPECT_EQ(1U, extractor.take_codes().size());
}

TEST(TrailExtractor, OfAnythingShortIsEmpty)
{
    const std::vector<int16_t> sound(kzcat::kFrameLength - 1, 1000);
    EXPECT_EQ((Trail{kzcat::Profile::standard, kzcat::kFrameLength - 1, {}}),
              trail_of(kWorking, bytes_of(sound)));
    EXPECT_EQ(Trail{}, trail_of(kWorking, {}));
    EXPECT_EQ(0U, query_of(kWorking, bytes_of(sound)).frames());
}

TEST(TrailExtractor, EndsOnce)
{
    TrailExtractor trail(kWorking);
    static_cast<void>(trail.finish());
    EXPECT_THROW(trail.finish(), std::logic_error);
    EXPECT_THROW(trail.feed({}), std::logic_error);
    QueryExtractor query(kWorking);
    static_cast<void>(query.finish());
    EXPECT_THROW(query.finish(), std::logic_error);
    EXPECT_THROW(query.feed({}), std::logic_error);
}

} // namespace
