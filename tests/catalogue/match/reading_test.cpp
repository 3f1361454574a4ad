// Readings of a query: masks, phases, and codes that coincide with those of the track.

#include <bit>
#include <cmath>
#include <set>

#include <gtest/gtest.h>

#include "catalogue/match/reading.hpp"
#include "catalogue/match/thresholds.hpp"
#include "musical_corpus.hpp"
#include "support/signals.hpp"

namespace {

using namespace kzcat;
using namespace kzcat::test;

Reading read(const QueryBands& bands, const Hypothesis& hypothesis = {})
{
    return QueryReader(bands, {.first = 0, .count = bands.frames()}).read(hypothesis);
}

// Clip that begins with the code `position` of a piece.
QueryBands clip(size_t number, size_t position)
{
    const Samples sound = piece(number);
    const auto first = sound.begin() + static_cast<std::ptrdiff_t>(position * kCodeHop);
    return query_of({first, first + static_cast<std::ptrdiff_t>(samples_in(14.3))});
}

// Music over noise: no band is empty.
Samples noisy_piece()
{
    Samples sound = piece(3);
    const Samples noise = kz::test::noise(sound.size(), 0.05, 8);
    for (size_t i = 0; i < sound.size(); ++i) {
        sound[i] = static_cast<int16_t>(sound[i] / 2 + noise[i]);
    }
    return sound;
}

TEST(Readings, HaveTheCodesOfTheTrackWhereTheyCoincide)
{
    const Samples sound = noisy_piece();
    const Trail track = trail_of(sound);
    const auto first = sound.begin() + 50 * std::ptrdiff_t{kCodeHop};
    const Samples cut(first, first + static_cast<std::ptrdiff_t>(samples_in(14.3)));
    const Reading reading = read(query_of(cut));
    ASSERT_EQ(kPhases, reading.sequences.size());
    const Sequence& sequence = reading.sequences[2]; // frame 8 of the clip
    EXPECT_DOUBLE_EQ(8.0 * kQueryHop / kWorkingRate, sequence.start);
    int differing = 0;
    int bits = 0;
    for (size_t k = 0; k < sequence.codes.size(); ++k) {
        const Code mask = sequence.masks[k];
        differing += std::popcount((track.codes[52 + k] ^ sequence.codes[k]) & mask);
        bits += std::popcount(mask);
    }
    EXPECT_GT(bits, 3000);
    EXPECT_LT(differing, bits / 500);
}

TEST(Readings, MaskTheWeakestQuarter)
{
    const Reading reading = read(clip(1, 30));
    double bits = 0;
    double counting = 0;
    uint8_t strongest_masked = 0;
    uint8_t weakest_counting = 255;
    for (const Sequence& sequence : reading.sequences) {
        ASSERT_EQ(sequence.codes.size(), sequence.masks.size());
        ASSERT_EQ(sequence.codes.size(), sequence.strengths.size());
        for (size_t k = 0; k < sequence.codes.size(); ++k) {
            bits += kPairs;
            counting += std::popcount(sequence.masks[k]);
            for (size_t i = 0; i < kPairs; ++i) {
                const bool counts = (sequence.masks[k] >> i & 1) != 0;
                const uint8_t strength = sequence.strengths[k][i];
                uint8_t& limit = counts ? weakest_counting : strongest_masked;
                limit = counts ? std::min(limit, strength) : std::max(limit, strength);
            }
        }
    }
    EXPECT_NEAR(0.75, counting / bits, 0.001);
    EXPECT_LE(strongest_masked, weakest_counting);
}

TEST(Readings, OfFasterClipsHaveMoreCodes)
{
    const QueryBands bands = clip(2, 10);
    const auto codes = [&](double stretch) {
        return read(bands, {.stretch = stretch}).sequences[0].codes.size();
    };
    EXPECT_NEAR(static_cast<double>(bands.frames()) * 0.06 / kPhases,
                static_cast<double>(codes(1.06)) - static_cast<double>(codes(1.0)), 1.01);
    EXPECT_LT(codes(0.94), codes(1.0));
}

TEST(Readings, AreEmptyWhenTheClipIsTooShort)
{
    const QueryBands bands = clip(2, 10);
    const size_t fewest = fewest_frames();
    EXPECT_TRUE(QueryReader(bands, {.first = 0, .count = fewest - 1}).read({}).sequences.empty());
    const Reading shortest = QueryReader(bands, {.first = 0, .count = fewest}).read({});
    ASSERT_EQ(kPhases, shortest.sequences.size());
    EXPECT_EQ(1U, shortest.sequences[3].codes.size());
}

TEST(Hypotheses, AreSixSpeedsSixTempiAndSixPitches)
{
    size_t speeds = 0;
    size_t tempi = 0;
    size_t pitches = 0;
    std::set<std::pair<int, double>> all;
    for (const Hypothesis& one : further_hypotheses()) {
        all.insert({one.pitch_steps, one.stretch});
        const double ratio = std::pow(2.0, one.pitch_steps / 36.0);
        tempi += one.pitch_steps == 0 ? 1 : 0;
        pitches += one.stretch == 1 ? 1 : 0;
        speeds += one.pitch_steps != 0 && std::fabs(one.stretch - ratio) < 1e-12 ? 1 : 0;
        EXPECT_LE(std::fabs(one.stretch - 1), 0.0601);
    }
    EXPECT_EQ(18U, all.size());
    EXPECT_EQ(6U, speeds);
    EXPECT_EQ(6U, tempi);
    EXPECT_EQ(6U, pitches);
}

TEST(Thresholds, GrowWithEveryDoubling)
{
    const auto reference = static_cast<uint64_t>(kReferenceCodes);
    EXPECT_DOUBLE_EQ(kBaseThreshold, threshold_for(0, 1, kFullWindow));
    EXPECT_DOUBLE_EQ(kBaseThreshold, threshold_for(reference, 1, kFullWindow));
    EXPECT_NEAR(kBaseThreshold + kThresholdGrowth, threshold_for(2 * reference, 1, kFullWindow),
                1e-9);
    EXPECT_NEAR(kBaseThreshold + 2 * kThresholdGrowth, threshold_for(2 * reference, 2, kFullWindow),
                1e-9);
    EXPECT_NEAR(kBaseThreshold + kThresholdGrowth * std::log2(59.0),
                threshold_for(59 * reference, 1, kFullWindow), 1e-8);
}

TEST(Thresholds, AreLowerForShortClips)
{
    EXPECT_DOUBLE_EQ(kBaseThreshold - kShortAllowance, threshold_for(0, 1, kShortWindow));
    EXPECT_DOUBLE_EQ(kBaseThreshold - kShortAllowance, threshold_for(0, 1, 2.5));
    EXPECT_NEAR(kBaseThreshold - kShortAllowance / 2,
                threshold_for(0, 1, (kShortWindow + kFullWindow) / 2), 1e-9);
    EXPECT_DOUBLE_EQ(kBaseThreshold, threshold_for(0, 1, 16.7));
}

} // namespace
