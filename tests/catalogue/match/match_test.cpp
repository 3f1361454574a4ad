// Clips of synthetic music are recognised, with their place and how they were changed, and what is
// no clip of a track is not.

#include <cmath>

#include <gtest/gtest.h>

#include "musical_corpus.hpp"
#include "support/signals.hpp"

namespace {

using namespace kzcat;
using namespace kzcat::test;

MatchAnswer look_up(const QueryBands& query, MatchOptions options = {})
{
    ScanSearcher searcher(pieces().corpus());
    return recognise(query, searcher, options);
}

void expect_track(size_t number, double offset, const MatchAnswer& answer)
{
    ASSERT_EQ(Verdict::match, answer.verdict);
    ASSERT_EQ(static_cast<int64_t>(number) + 1, answer.matches[0].track);
    EXPECT_NEAR(offset, answer.matches[0].offset, 0.03);
}

TEST(Recognise, FindsEveryClipAtItsPlace)
{
    for (size_t i = 0; i < kPieces; ++i) {
        const double begin = 7.3 + 3.21 * static_cast<double>(i);
        const auto answer = look_up(query_of(part_of(piece(i), begin, 14.3)));
        expect_track(i, begin, answer);
        EXPECT_EQ(1.0, answer.matches[0].speed);
        EXPECT_EQ(1.0, answer.matches[0].tempo);
        EXPECT_EQ(1.0, answer.matches[0].pitch);
    }
}

TEST(Recognise, FindsClipsOfAnotherSpeed)
{
    for (const uint32_t rate :
         {10474U, 10805U, 10915U, 11135U, 11212U, 11350U, 11576U}) { // -5 to +5 %
        const auto answer = look_up(query_of(part_of(piece(2), 11.1, 15.5), rate));
        expect_track(2, 11.1, answer);
        const double speed = static_cast<double>(rate) / kWorkingRate;
        EXPECT_NEAR(speed, answer.matches[0].speed, 0.002);
        EXPECT_EQ(answer.matches[0].speed, answer.matches[0].tempo);
        EXPECT_EQ(answer.matches[0].speed, answer.matches[0].pitch);
    }
}

TEST(Recognise, FindsClipsOfAnotherTempo)
{
    const auto note = static_cast<double>(sixteenth_note(kFirstPiece + 4));
    const auto shorter = static_cast<uint32_t>(note * 0.04);
    const double tempo = note / (note - shorter);
    const auto answer =
        look_up(query_of(part_of(piece(4, {.shorter = shorter}), 12 / tempo, 14.3)));
    expect_track(4, 12, answer);
    EXPECT_NEAR(tempo, answer.matches[0].tempo, 0.003);
    EXPECT_EQ(1.0, answer.matches[0].speed);
    EXPECT_EQ(1.0, answer.matches[0].pitch);
}

TEST(Recognise, FindsClipsOfAnotherPitch)
{
    const auto answer = look_up(query_of(part_of(piece(5, {.semitones = 1}), 20, 14.3)));
    expect_track(5, 20, answer);
    EXPECT_NEAR(1.0595, answer.matches[0].pitch, 0.005);
    EXPECT_EQ(1.0, answer.matches[0].speed);
    EXPECT_EQ(1.0, answer.matches[0].tempo);
}

TEST(Recognise, FindsNothingOfOtherMusic)
{
    for (size_t i = 0; i < 4; ++i) {
        const auto answer = look_up(query_of(part_of(piece(20 + i), 10, 14.3)));
        EXPECT_EQ(Verdict::no_match, answer.verdict) << i;
        EXPECT_TRUE(answer.matches.empty());
        EXPECT_EQ(2U, answer.candidates.size());
    }
}

TEST(Recognise, TriesOtherSpeedsOnlyWhenAsked)
{
    const auto query = query_of(part_of(piece(3), 11.1, 15.5), 11576);
    EXPECT_EQ(Verdict::match, look_up(query).verdict);
    EXPECT_EQ(Verdict::no_match, look_up(query, {.speeds = false}).verdict);
}

TEST(Recognise, CallsTooShortOrSilentClipsTooQuiet)
{
    EXPECT_EQ(Verdict::too_quiet, look_up(query_of({})).verdict);
    EXPECT_EQ(Verdict::too_quiet, look_up(query_of(part_of(piece(1), 10, 2.5))).verdict);
    EXPECT_EQ(Verdict::too_quiet, look_up(query_of(Samples(samples_in(14.3)))).verdict);
    EXPECT_EQ(Verdict::too_quiet, look_up(query_of(Samples(samples_in(14.3), 500))).verdict);
}

TEST(Recognise, WorksInACatalogueOfOneShortTrack)
{
    MusicalCorpus corpus;
    corpus.add(trail_of(part_of(piece(0), 10, 20)));
    ScanSearcher searcher(corpus.corpus());
    expect_track(0, 3, recognise(query_of(part_of(piece(0), 13, 10)), searcher, {}));
    EXPECT_EQ(Verdict::no_match,
              recognise(query_of(part_of(piece(1), 13, 10)), searcher, {}).verdict);
}

TEST(Recognise, FindsNothingInAnEmptyCatalogue)
{
    ScanSearcher searcher(Corpus{});
    const auto answer = recognise(query_of(part_of(piece(0), 13, 10)), searcher, {});
    EXPECT_EQ(Verdict::no_match, answer.verdict);
    EXPECT_TRUE(answer.candidates.empty());
    EXPECT_EQ(0, answer.runner_up);
}

TEST(Recognise, FindsClipsThatOverhangTheEnds)
{
    const Samples sound = piece(6);
    Samples before(samples_in(2));
    const Samples first = part_of(sound, 0, 12.3);
    before.insert(before.end(), first.begin(), first.end());
    expect_track(6, -2, look_up(query_of(before)));

    Samples after = part_of(sound, kPieceSeconds - 12.3, 12.3);
    after.resize(samples_in(14.3));
    expect_track(6, kPieceSeconds - 12.3, look_up(query_of(after)));
}

TEST(Recognise, FindsTracksShorterThanTheClip)
{
    MusicalCorpus corpus;
    for (size_t i = 0; i < 4; ++i) {
        corpus.add(trail_of(part_of(piece(i), 10, 6)));
    }
    ScanSearcher searcher(corpus.corpus());
    expect_track(2, -4, recognise(query_of(part_of(piece(2), 6, 14.3)), searcher, {}));
}

} // namespace
