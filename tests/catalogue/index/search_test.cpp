// The steps of a search by parts: which lists are read, how places are put in order, and that a
// clip is found wherever it lies.

#include <algorithm>
#include <array>
#include <cmath>
#include <optional>
#include <random>
#include <set>

#include <gtest/gtest.h>

#include "catalogue/index/corpora.hpp"
#include "catalogue/index/measure.hpp"
#include "catalogue/index/parts_search.hpp"
#include "catalogue/index/probes.hpp"

namespace kzcat {
namespace {

using test::OwnedCorpus;

/// The tables of a corpus, with the bytes that they lie in.
struct BuiltTables {
    explicit BuiltTables(const Corpus& corpus)
    {
        for (uint32_t part = 0; part < kParts; ++part) {
            built[part] = build_table(corpus, part);
            tables[part] = {built[part].starts, built[part].words};
        }
    }
    std::array<BuiltTable, kParts> built;
    PartTables tables;
};

Sequence sequence_of(std::span<const Code> codes)
{
    Sequence sequence;
    sequence.codes.assign(codes.begin(), codes.end());
    sequence.masks.assign(codes.size(), ~Code{0});
    BitStrengths strong;
    strong.fill(200);
    sequence.strengths.assign(codes.size(), strong);
    return sequence;
}

Reading reading_of(std::span<const Code> codes) { return {{}, {sequence_of(codes)}}; }

using Values = std::set<std::pair<uint32_t, uint32_t>>; ///< part and value

Values values_of(const std::vector<PartProbe>& probes)
{
    Values values;
    for (const auto& probe : probes) {
        values.insert({probe.part, probe.value});
    }
    return values;
}

TEST(Probes, TakeEveryPartOfEveryCodeFirst)
{
    const OwnedCorpus corpus = test::small_corpus(4);
    const BuiltTables built(corpus.corpus());
    const auto probes =
        choose_probes(reading_of(std::span(corpus.codes).first(10)), built.tables, 1000);
    const Values values = values_of(probes);
    for (size_t code = 0; code < 10; ++code) {
        for (uint32_t part = 0; part < kParts; ++part) {
            EXPECT_TRUE(values.contains({part, part_of(corpus.codes[code], part)}));
        }
    }
}

TEST(Probes, TurnTheWeakestBits)
{
    OwnedCorpus corpus;
    std::vector<Code> near;
    for (const uint32_t bit : {20U, 21U, 25U}) {
        near.push_back(0x5555555555555555 ^ Code{1} << bit);
    }
    near.resize(8, 0x5555555555555555);
    corpus.add(1, near);
    const BuiltTables built(corpus.corpus());
    Reading reading = reading_of(std::array<Code, 1>{0x5555555555555555});
    reading.sequences[0].strengths[0][21] = 3;
    const Values values = values_of(choose_probes(reading, built.tables, 1000));
    EXPECT_TRUE(values.contains({1, part_of(near[1], 1)}));
    EXPECT_FALSE(values.contains({1, part_of(near[0], 1)}));
    EXPECT_FALSE(values.contains({1, part_of(near[2], 1)}));
}

TEST(Probes, StayWithinTheirBudget)
{
    const OwnedCorpus corpus = test::small_corpus(60);
    const BuiltTables built(corpus.corpus());
    const Reading reading = sample_reading(corpus.corpus());
    for (const uint64_t budget : {0U, 10U, 50U, 100U}) {
        uint64_t words = 0;
        for (const auto& probe : choose_probes(reading, built.tables, budget)) {
            words += built.tables[probe.part].list(probe.value).size() / 2;
        }
        EXPECT_LE(words, budget);
    }
}

TEST(Probes, LeaveOutCodesOfWhichNoBitCounts)
{
    const OwnedCorpus corpus = test::small_corpus(4);
    const BuiltTables built(corpus.corpus());
    Reading reading = reading_of(std::span(corpus.codes).first(3));
    reading.sequences[0].masks[1] = 0;
    for (const auto& probe : choose_probes(reading, built.tables, 1000)) {
        EXPECT_NE(1U, probe.code);
    }
}

TEST(Probes, TakeBitsOfUnknownStrengthForRight)
{
    const OwnedCorpus corpus = test::small_corpus(4);
    const BuiltTables built(corpus.corpus());
    Reading reading = reading_of(std::span(corpus.codes).first(5));
    reading.sequences[0].strengths.clear();
    uint64_t words = 0;
    Values own;
    for (const Code code : reading.sequences[0].codes) {
        for (uint32_t part = 0; part < kParts; ++part) {
            own.insert({part, part_of(code, part)});
            words += built.tables[part].list(part_of(code, part)).size() / 2;
        }
    }
    EXPECT_EQ(own, values_of(choose_probes(reading, built.tables, words)));
}

TEST(Ranking, PutsTheTruePlaceFirst)
{
    const auto codes = test::random_codes(1, 300);
    const Reading reading = reading_of(std::span(codes).subspan(120, 60));
    const Ranking ranking(reading);
    const auto best = ranking.best(9, codes, 0, 240);
    ASSERT_TRUE(best);
    EXPECT_EQ(120, best->place.position);
    EXPECT_EQ(9, best->place.track);
    EXPECT_DOUBLE_EQ(std::sqrt(60 * 64.0), best->agreement);
}

TEST(Ranking, LetsAFifthOfTheClipStickOut)
{
    const auto codes = test::random_codes(2, 100);
    auto clip = test::random_codes(3, 60);
    std::copy_n(codes.begin(), 48, clip.begin() + 12);
    const Reading reading = reading_of(clip);
    const Ranking ranking(reading);
    const auto before = ranking.best(1, codes, -12, -12);
    ASSERT_TRUE(before);
    EXPECT_DOUBLE_EQ(std::sqrt(48 * 64.0), before->agreement);
    EXPECT_FALSE(ranking.best(1, codes, -13, -13));
    EXPECT_FALSE(ranking.best(1, codes, 53, 53));
}

TEST(Ranking, KeepsTheBestPlaceOfEachTrack)
{
    const auto place = [](int64_t track, double agreement) {
        return RankedPlace{{.track = track, .phase = 0, .position = 0}, agreement};
    };
    std::vector<RankedPlace> places{place(5, 2), place(3, 4), place(5, 9), place(4, 4),
                                    place(1, 1)};
    keep_best(places, 3);
    ASSERT_EQ(3U, places.size());
    EXPECT_EQ(5, places[0].place.track);
    EXPECT_EQ(3, places[1].place.track);
    EXPECT_EQ(4, places[2].place.track);
}

class PartsSearchTest : public testing::Test {
protected:
    std::optional<RankedPlace> found(const Reading& reading)
    {
        const Ranking ranking(reading);
        auto places = search_.find(ranking, reading, scratch_);
        keep_best(places, 1);
        return places.empty() ? std::nullopt : std::optional(places[0]);
    }

    OwnedCorpus corpus_ = test::small_corpus(200);
    BuiltTables built_{corpus_.corpus()};
    PartsSearch search_{corpus_.codes, corpus_.tracks, built_.tables, 0};
    SearchScratch scratch_;
};

TEST_F(PartsSearchTest, FindsAClipWhereverItLies)
{
    for (size_t track = 0; track < corpus_.tracks.size(); track += 3) {
        const auto codes = corpus_.segment().of(corpus_.tracks[track]);
        for (size_t first = 0; first + 30 <= codes.size(); first += 7) {
            const auto place = found(reading_of(codes.subspan(first, 30)));
            ASSERT_TRUE(place);
            EXPECT_EQ(corpus_.tracks[track].id, place->place.track);
            EXPECT_EQ(static_cast<int64_t>(first), place->place.position);
        }
    }
}

TEST_F(PartsSearchTest, FindsAClipThatSticksOut)
{
    for (const size_t track : {size_t{0}, size_t{50}, size_t{199}}) {
        const auto codes = corpus_.segment().of(corpus_.tracks[track]);
        auto clip = test::random_codes(track, 40);
        std::ranges::copy(codes.first(33), clip.begin() + 7);
        const auto before = found(reading_of(clip));
        ASSERT_TRUE(before);
        EXPECT_EQ(corpus_.tracks[track].id, before->place.track);
        EXPECT_EQ(-7, before->place.position);
        std::ranges::copy(codes.last(33), clip.begin());
        const auto behind = found(reading_of(clip));
        ASSERT_TRUE(behind);
        EXPECT_EQ(static_cast<int64_t>(codes.size()) - 33, behind->place.position);
    }
}

TEST_F(PartsSearchTest, FindsAClipThatIsLongerThanItsTrack)
{
    const auto codes = corpus_.segment().of(corpus_.tracks[70]);
    auto clip = test::random_codes(70, codes.size() + 50);
    std::ranges::copy(codes, clip.begin() + 20);
    const auto place = found(reading_of(clip));
    ASSERT_TRUE(place);
    EXPECT_EQ(corpus_.tracks[70].id, place->place.track);
    EXPECT_EQ(-20, place->place.position);
}

TEST_F(PartsSearchTest, GivesTheSameAnswerEachTime)
{
    const Reading reading = sample_reading(corpus_.corpus());
    const Ranking ranking(reading);
    const auto first = search_.find(ranking, reading, scratch_);
    SearchScratch other;
    const auto again = search_.find(ranking, reading, other);
    ASSERT_EQ(first.size(), again.size());
    for (size_t i = 0; i < first.size(); ++i) {
        EXPECT_EQ(first[i].place.track, again[i].place.track);
        EXPECT_EQ(first[i].agreement, again[i].agreement);
    }
}

TEST(PartsSearch, FindsNothingAmongNoTracks)
{
    const OwnedCorpus none;
    const BuiltTables built(none.corpus());
    const PartsSearch search(none.codes, none.tracks, built.tables, 0);
    const Reading reading = reading_of(test::random_codes(1, 20));
    SearchScratch scratch;
    EXPECT_TRUE(search.find(Ranking(reading), reading, scratch).empty());
}

} // namespace
} // namespace kzcat
