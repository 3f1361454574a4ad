// Scores against a second computation, bit by bit and in the plainest way.

#include <algorithm>
#include <cmath>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/match/score.hpp"
#include "catalogue/match/thresholds.hpp"
#include "support/signals.hpp"

namespace {

using namespace kzcat;
using kz::test::Random;
using Codes = std::vector<Code>;

Codes random_codes(size_t count, uint64_t seed)
{
    Random random(seed);
    Codes codes(count);
    for (Code& code : codes) {
        code = random.next64();
    }
    return codes;
}

// A sequence with every fourth bit or so masked, and one code wholly.
Sequence random_sequence(size_t count, uint64_t seed)
{
    Random random(seed);
    Sequence sequence;
    sequence.codes = random_codes(count, seed + 1);
    for (size_t i = 0; i < count; ++i) {
        sequence.masks.push_back(random.next64() | random.next64());
    }
    sequence.masks[3] = 0;
    return sequence;
}

// Lays a sequence over a track, with so many of 64 bits wrong.
void plant(Codes& track, const Sequence& sequence, int64_t position, uint32_t wrong)
{
    Random random(99);
    for (size_t j = 0; j < sequence.codes.size(); ++j) {
        const int64_t at = position + static_cast<int64_t>(j);
        if (at >= 0 && at < static_cast<int64_t>(track.size())) {
            Code code = sequence.codes[j];
            for (uint32_t i = 0; i < wrong; ++i) {
                code ^= Code{1} << random.below(64);
            }
            track[static_cast<size_t>(at)] = code;
        }
    }
}

// Agreeing bits less differing ones, by the root of their number; false when less than 80 % of the
// sequence lies on the track.
bool plain_agreement(const Sequence& sequence, const Codes& track, int64_t position, double& result)
{
    double agreeing = 0;
    double differing = 0;
    size_t overlap = 0;
    for (size_t j = 0; j < sequence.codes.size(); ++j) {
        const int64_t at = position + static_cast<int64_t>(j);
        if (at < 0 || at >= static_cast<int64_t>(track.size())) {
            continue;
        }
        ++overlap;
        for (int bit = 0; bit < 64; ++bit) {
            const bool same =
                (sequence.codes[j] >> bit & 1) == (track[static_cast<size_t>(at)] >> bit & 1);
            if ((sequence.masks[j] >> bit & 1) != 0) {
                (same ? agreeing : differing) += 1;
            }
        }
    }
    const size_t shorter = std::min(track.size(), sequence.codes.size());
    result = (agreeing - differing) / std::sqrt(agreeing + differing);
    return static_cast<double>(overlap) >= 0.8 * static_cast<double>(shorter);
}

std::vector<double> whole_agreements(const Sequence& sequence, const Codes& track)
{
    std::vector<double> all;
    for (size_t p = 0; p + sequence.codes.size() <= track.size(); ++p) {
        double here = 0;
        plain_agreement(sequence, track, static_cast<int64_t>(p), here);
        all.push_back(here);
    }
    return all;
}

struct Expected {
    double in_catalogue;
    double in_track;
    int64_t position = 0;
};

Expected plain_score(const Sequence& sequence, const Codes& track, const Codes& population)
{
    double sum = 0;
    double squares = 0;
    const auto others = whole_agreements(sequence, population);
    for (const double one : others) {
        sum += one;
        squares += one * one;
    }
    const auto count = static_cast<double>(others.size());
    const double mean = sum / count;
    const double deviation = std::max(std::sqrt(squares / count - mean * mean), 1.0);

    Expected result{};
    double best = -1e9;
    for (int64_t p = -100; p < static_cast<int64_t>(track.size()); ++p) {
        double here = 0;
        if (plain_agreement(sequence, track, p, here) && here > best) {
            best = here;
            result.position = p;
        }
    }
    auto own = whole_agreements(sequence, track);
    std::sort(own.begin(), own.end(), std::greater<>()); // distances, rising
    const auto quantile = [&own](size_t percent) { return own[(own.size() - 1) * percent / 100]; };
    result.in_catalogue = (best - mean) / deviation;
    result.in_track = (best - quantile(50)) /
                      std::max((quantile(16) - quantile(84)) / 2, kLeastOwnSpread * deviation);
    return result;
}

Corpus one_run(const Codes& codes, const TrackSpan& span)
{
    return {.segments = {{.codes = codes, .tracks = {&span, 1}}}};
}

TrackScore score(const Sequence& sequence, const Codes& track, const Codes& population)
{
    const TrackSpan span{.id = 1, .first = 0, .count = population.size()};
    const Reading reading{.hypothesis = {}, .sequences = {sequence}};
    return ReadingScorer(reading, one_run(population, span)).score(track);
}

TEST(Score, IsThatOfTheFormula)
{
    const Codes population = random_codes(900, 1);
    for (const int64_t position : {0, 1, 57, 150, 260, 268, -8, -3}) {
        const Sequence sequence = random_sequence(40, 7);
        Codes track = random_codes(300, 5);
        plant(track, sequence, position, 24);
        const Expected expected = plain_score(sequence, track, population);
        const TrackScore actual = score(sequence, track, population);
        ASSERT_TRUE(actual.found);
        EXPECT_EQ(position, actual.position);
        EXPECT_EQ(expected.position, actual.position);
        EXPECT_NEAR(expected.in_catalogue, actual.in_catalogue, 1e-9);
        EXPECT_NEAR(expected.in_track, actual.in_track, 1e-9);
        EXPECT_NEAR(std::max(std::min(expected.in_catalogue, expected.in_track),
                             std::min(kLoopShare * expected.in_catalogue,
                                      kMostOverOwn * expected.in_track)),
                    actual.score, 1e-9);
    }
}

TEST(Score, TakesTheBestPhase)
{
    const Codes population = random_codes(900, 1);
    Codes track = random_codes(300, 5);
    Reading reading{.hypothesis = {}, .sequences = {}};
    for (uint64_t phase = 0; phase < 4; ++phase) {
        reading.sequences.push_back(random_sequence(40, 20 + phase));
    }
    plant(track, reading.sequences[2], 111, 10);
    const TrackSpan span{.id = 1, .first = 0, .count = population.size()};
    const auto found = ReadingScorer(reading, one_run(population, span)).score(track);
    EXPECT_EQ(2U, found.phase);
    EXPECT_EQ(111, found.position);
}

TEST(Score, NeedsMostOfTheClipOnTheTrack)
{
    const Codes population = random_codes(900, 1);
    const Sequence sequence = random_sequence(40, 7);
    for (const int64_t position : {-9, 270}) { // 31 and 30 codes of 40 lie on the track
        Codes track = random_codes(300, 5);
        plant(track, sequence, position, 0);
        EXPECT_LT(score(sequence, track, population).score, 5) << position;
    }
    EXPECT_FALSE(score(sequence, random_codes(kFewestCodes - 1, 3), population).found);
    EXPECT_FALSE(score(sequence, {}, population).found);
}

TEST(Score, FallsWithTracksThatRepeatThemselves)
{
    const Codes population = random_codes(900, 1);
    const Sequence sequence = random_sequence(40, 7);
    Codes once = random_codes(300, 5);
    plant(once, sequence, 100, 10);
    Codes often = once;
    for (int64_t p = 0; p < 260; p += 5) { // every fifth place agrees a little
        plant(often, sequence, p, 28);
    }
    plant(often, sequence, 100, 10);
    EXPECT_LT(score(sequence, often, population).score,
              0.9 * score(sequence, once, population).score);
}

TEST(ScoreNear, LooksNoFurtherThanAsked)
{
    const Codes population = random_codes(900, 1);
    Reading reading{.hypothesis = {}, .sequences = {random_sequence(40, 7)}};
    reading.sequences[0].start = 2.5;
    Codes track = random_codes(300, 5);
    plant(track, reading.sequences[0], 100, 10);
    const TrackSpan span{.id = 1, .first = 0, .count = population.size()};
    const ReadingScorer scorer(reading, one_run(population, span));
    const double beginning = 100 * kCodeSeconds - 2.5;
    const auto near = scorer.score_near(track, beginning + 3 * kCodeSeconds, 3);
    EXPECT_EQ(100, near.position);
    EXPECT_EQ(scorer.score(track).score, near.score);
    EXPECT_LT(scorer.score_near(track, beginning + 4 * kCodeSeconds, 3).score, 5);
    EXPECT_FALSE(scorer.score_near(track, beginning + 400 * kCodeSeconds, 3).found);
}

} // namespace
