// Clips longer than what is searched at once, clips of several tracks, and trails as queries.

#include <gtest/gtest.h>

#include "catalogue/match/source.hpp"
#include "musical_corpus.hpp"
#include "support/signals.hpp"

namespace {

using namespace kzcat;
using namespace kzcat::test;

template <class Query>
MatchAnswer look_up(const Query& query, MatchOptions options = {})
{
    ScanSearcher searcher(pieces().corpus());
    return recognise(query, searcher, options);
}

Samples joined(const std::vector<Samples>& parts)
{
    Samples sound;
    for (const Samples& part : parts) {
        sound.insert(sound.end(), part.begin(), part.end());
    }
    return sound;
}

void expect_passage(int64_t track, double begin, double end, double offset, const TrackMatch& match)
{
    EXPECT_EQ(track, match.track);
    EXPECT_NEAR(begin, match.clip_begin, 2);
    EXPECT_NEAR(end, match.clip_end, 2);
    EXPECT_NEAR(offset, match.offset, 0.05);
}

TEST(LongClips, HoldTheirTrackFromEndToEnd)
{
    const auto answer = look_up(query_of(part_of(piece(3), 5, 50)));
    ASSERT_EQ(Verdict::match, answer.verdict);
    ASSERT_EQ(1U, answer.matches.size());
    expect_passage(4, 0, 50, 5, answer.matches[0]);
}

TEST(LongClips, AreFoundBehindOtherMusic)
{
    const auto sound = joined({part_of(piece(20), 5, 35), part_of(piece(3), 10, 25)});
    const auto answer = look_up(query_of(sound));
    ASSERT_EQ(Verdict::match, answer.verdict);
    expect_passage(4, 35, 60, -25, answer.matches[0]);
}

TEST(LongClips, AreFoundAtAnotherSpeed)
{
    const auto answer = look_up(query_of(part_of(piece(3), 5, 50), 11465)); // 4 % faster
    ASSERT_EQ(Verdict::match, answer.verdict);
    EXPECT_NEAR(1.04, answer.matches[0].speed, 0.002);
    expect_passage(4, 0, 50 / 1.04, 5, answer.matches[0]);
}

TEST(LongClips, OfTwoDaysAreCutFromEndToEnd)
{
    Trail trail;
    trail.codes.resize(1'000'000);
    trail.samples = (trail.codes.size() - 1) * kCodeHop + kFrameLength;
    const auto source = source_of(trail);
    double end = 0;
    for (size_t window = 0; window < source->windows(); ++window) {
        ASSERT_DOUBLE_EQ(end, source->begin(window)) << window;
        end = source->end(window);
        ASSERT_LT(source->begin(window), end) << window;
    }
    EXPECT_DOUBLE_EQ(trail.seconds(), end);
}

TEST(LongClips, AddUpWhatTheirWindowsSay)
{
    Samples sound = part_of(piece(3), 5, 50);
    const Samples noise = kz::test::noise(sound.size(), 0.6, 11);
    for (size_t i = 0; i < sound.size(); ++i) {
        sound[i] = static_cast<int16_t>(sound[i] / 4 + noise[i]);
    }
    const double whole = look_up(query_of(sound)).candidates[0].score;
    const double part = look_up(query_of(part_of(sound, 0, 14.3))).candidates[0].score;
    EXPECT_GT(whole, part + 1) << "of 50 and of 14.3 seconds";
}

TEST(Passages, AreListedInTheOrderOfTheClip)
{
    const auto sound = joined({part_of(piece(5), 10, 30), part_of(piece(1), 20, 40),
                               part_of(piece(20), 0, 30), part_of(piece(6), 5, 25)});
    const auto answer = look_up(query_of(sound), {.passages = true});
    ASSERT_EQ(Verdict::match, answer.verdict);
    ASSERT_EQ(3U, answer.matches.size());
    expect_passage(6, 0, 30, 10, answer.matches[0]);
    expect_passage(2, 30, 70, -10, answer.matches[1]);
    expect_passage(7, 100, 125, -95, answer.matches[2]);
}

TEST(Passages, OfAShortClipAreItsMatch)
{
    const auto answer = look_up(query_of(part_of(piece(2), 20, 14.3)), {.passages = true});
    ASSERT_EQ(1U, answer.matches.size());
    expect_passage(3, 0, 14.3, 20, answer.matches[0]);
}

TEST(Passages, AreNoneInOtherMusic)
{
    const auto answer = look_up(query_of(part_of(piece(21), 0, 50)), {.passages = true});
    EXPECT_EQ(Verdict::no_match, answer.verdict);
    EXPECT_TRUE(answer.matches.empty());
}

TEST(Trails, AreFoundAsQueries)
{
    for (const double begin : {10.0, 10.05, 10.1, 10.15}) { // within a step of the codes
        const auto answer = look_up(trail_of(part_of(piece(4), begin, 14.3)));
        ASSERT_EQ(Verdict::match, answer.verdict) << begin;
        EXPECT_EQ(5, answer.matches[0].track);
        EXPECT_NEAR(begin, answer.matches[0].offset, 0.1);
    }
    EXPECT_EQ(Verdict::no_match, look_up(trail_of(part_of(piece(21), 10, 14.3))).verdict);
    EXPECT_EQ(Verdict::too_quiet, look_up(Trail{}).verdict);
}

} // namespace
