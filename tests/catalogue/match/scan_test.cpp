// The scan finds what a comparison with every track would find, however tracks are cut into
// segments.

#include <gtest/gtest.h>

#include "catalogue/match/reading.hpp"
#include "catalogue/match/score.hpp"
#include "musical_corpus.hpp"

namespace {

using namespace kzcat;
using namespace kzcat::test;

Reading read(const Samples& sound, const Hypothesis& hypothesis = {})
{
    const QueryBands bands = query_of(sound);
    return QueryReader(bands, {.first = 0, .count = bands.frames()}).read(hypothesis);
}

// The tracks of `pieces()`, one to a segment, with other codes between them.
class Scattered {
public:
    Scattered()
    {
        for (size_t i = 0; i < kPieces; ++i) {
            const auto codes = pieces().track(i);
            std::vector<Code> memory(7 + i, ~Code{0});
            memory.insert(memory.end(), codes.begin(), codes.end());
            memory.resize(memory.size() + 3, Code{5});
            codes_.push_back(std::move(memory));
            spans_.push_back(
                {.id = static_cast<int64_t>(i) + 1, .first = 7 + i, .count = codes.size()});
        }
        for (size_t i = 0; i < kPieces; ++i) {
            corpus_.segments.push_back({.codes = codes_[i], .tracks = {&spans_[i], 1}});
        }
    }
    const Corpus& corpus() const { return corpus_; }

private:
    std::vector<std::vector<Code>> codes_;
    std::vector<TrackSpan> spans_;
    Corpus corpus_;
};

bool same(const Candidate& a, const Candidate& b)
{
    return a.track == b.track && a.phase == b.phase && a.position == b.position;
}

TEST(Scan, FindsTheTrackThatScoresHighest)
{
    ScanSearcher searcher(pieces().corpus());
    for (size_t i = 0; i < kPieces; ++i) {
        const Reading reading = read(part_of(piece(i), 20, 8));
        const ReadingScorer scorer(reading, searcher.population());
        const auto found = searcher.find(reading, 3);
        ASSERT_FALSE(found.empty());
        const double best = scorer.score(searcher.codes(found[0].track)).score;
        for (size_t other = 0; other < kPieces; ++other) {
            EXPECT_LE(scorer.score(pieces().track(other)).score, best);
        }
        EXPECT_EQ(static_cast<int64_t>(i) + 1, found[0].track);
    }
}

TEST(Scan, GivesNoMoreTracksThanAsked)
{
    ScanSearcher searcher(pieces().corpus());
    const Reading reading = read(part_of(piece(2), 20, 14.3));
    EXPECT_TRUE(searcher.find(reading, 0).empty());
    EXPECT_EQ(1U, searcher.find(reading, 1).size());
    EXPECT_LE(searcher.find(reading, 100).size(), kPieces);
}

TEST(Scan, DoesNotDependOnSegments)
{
    const Scattered scattered;
    ScanSearcher one(pieces().corpus());
    ScanSearcher other(scattered.corpus());
    EXPECT_EQ(one.code_count(), other.code_count());
    for (const Hypothesis& hypothesis : {Hypothesis{}, further_hypotheses()[4]}) {
        const Reading reading = read(part_of(piece(5), 30, 14.3), hypothesis);
        const auto a = one.find(reading, 2);
        const auto b = other.find(reading, 2);
        ASSERT_FALSE(a.empty());
        ASSERT_FALSE(b.empty());
        EXPECT_TRUE(same(a[0], b[0]));
    }
    const QueryBands query = query_of(part_of(piece(5), 30, 14.3));
    const auto a = recognise(query, one, {});
    const auto b = recognise(query, other, {});
    EXPECT_EQ(a.matches.at(0).score, b.matches.at(0).score);
    EXPECT_EQ(a.matches.at(0).offset, b.matches.at(0).offset);
}

TEST(Scan, HandsOutCodesByTrack)
{
    const Scattered scattered;
    ScanSearcher searcher(scattered.corpus());
    const auto codes = searcher.codes(3);
    const auto expected = pieces().track(2);
    EXPECT_TRUE(std::equal(codes.begin(), codes.end(), expected.begin(), expected.end()));
    EXPECT_TRUE(searcher.codes(0).empty());
    EXPECT_TRUE(searcher.codes(99).empty());
}

TEST(Population, IsTheSameHoweverTracksAreKept)
{
    const Scattered scattered;
    const Population one = choose_population(pieces().corpus());
    const Population other = choose_population(scattered.corpus());
    const auto& a = one.corpus().segments.at(0).codes;
    const auto& b = other.corpus().segments.at(0).codes;
    EXPECT_TRUE(std::equal(a.begin(), a.end(), b.begin(), b.end()));
}

TEST(Population, HoldsAllOfASmallCatalogue)
{
    const Population chosen = choose_population(pieces().corpus());
    EXPECT_EQ(kBackgroundPieces + kPieces, chosen.corpus().track_count());
    EXPECT_EQ(background_codes().size() + pieces().corpus().code_count(),
              chosen.corpus().code_count());
}

TEST(Population, HoldsRunsOfALargeCatalogue)
{
    const std::vector<Code> codes(200000, 3);
    const std::vector<TrackSpan> spans = {{.id = 1, .first = 0, .count = 50},
                                          {.id = 2, .first = 50, .count = 199950}};
    const Population chosen = choose_population({.segments = {{.codes = codes, .tracks = spans}}});
    EXPECT_EQ(kBackgroundPieces + 192, chosen.corpus().track_count());
    EXPECT_LE(chosen.corpus().code_count(), background_codes().size() + 192 * 160);
}

} // namespace
