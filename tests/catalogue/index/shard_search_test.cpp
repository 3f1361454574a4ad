// What servers do of a look-up, without servers: tracks on several of them give what one index over
// all gives, and bytes that are not what they should be are refused.

#include <algorithm>
#include <limits>
#include <random>

#include <gtest/gtest.h>

#include "catalogue/index/clips.hpp"
#include "catalogue/index/parts_search.hpp"
#include "catalogue/index/shard_search.hpp"
#include "catalogue/match/population.hpp"

namespace kzcat {
namespace {

using test::clip_of;
using test::codes_of;

constexpr uint64_t kTracks = 40;
constexpr uint32_t kLimit = 4;

/// A server: its tracks, and their postings as rows.
struct Shard {
    test::OwnedCorpus corpus;
    std::vector<BuiltTable> tables;
    std::vector<std::byte> directory;

    void build()
    {
        for (uint32_t part = 0; part < kParts; ++part) {
            PostingBuilder builder(part);
            for (const TrackSpan& track : corpus.tracks) {
                builder.add(corpus.segment().of(track));
            }
            tables.push_back(builder.build());
        }
        for (const TrackSpan& track : corpus.tracks) {
            for (const uint64_t number : {static_cast<uint64_t>(track.id), track.count}) {
                for (int byte = 7; byte >= 0; --byte) {
                    directory.push_back(static_cast<std::byte>(number >> (8 * byte) & 255U));
                }
            }
        }
    }
    PartTable table(uint32_t part) const { return {tables[part].starts, tables[part].words}; }
};

std::vector<Shard> shards(size_t count)
{
    std::vector<Shard> all(count);
    for (uint64_t number = 1; number <= kTracks; ++number) {
        all[number % count].corpus.add(static_cast<int64_t>(number), codes_of(number));
    }
    std::ranges::for_each(all, &Shard::build);
    return all;
}

class Lengths final : public ListLengths {
public:
    explicit Lengths(const std::vector<Shard>& shards) : shards_(shards) {}
    uint64_t words(uint32_t part, uint32_t value) const override
    {
        uint64_t words = 0;
        for (const Shard& shard : shards_) {
            words += shard.table(part).list(value).size() / 2;
        }
        return words;
    }

private:
    const std::vector<Shard>& shards_;
};

/// `rows` visits the rows that a look-up reads, in the order in which a server may give them.
std::vector<Look> counted(const Shard& shard, const CountQuery& query, bool directory_first)
{
    HitCounter counter(to_bytes(query));
    if (directory_first) {
        counter.add(7, kTracksList, shard.directory);
    }
    for (const auto& list : query.lists) {
        const auto part = static_cast<uint32_t>(list.list) / kPartValues;
        const auto words = shard.table(part).list(static_cast<uint32_t>(list.list) % kPartValues);
        if (!words.empty()) {
            counter.add(7, list.list, words);
        }
    }
    if (!directory_first) {
        counter.add(7, kTracksList, shard.directory);
    }
    return counter.looks();
}

std::vector<RankedPlace> ranked(const Shard& shard, const Reading& reading, std::vector<Look> looks)
{
    std::ranges::stable_sort(looks, {}, &Look::track);
    Ranker ranker(to_bytes(reading, kLimit, std::span<const Look>(looks)));
    for (const TrackSpan& track : shard.corpus.tracks) {
        const auto codes = shard.corpus.segment().of(track);
        std::vector<Code> needed(codes.size());
        for (const auto& range : ranker.ranges(track.id, codes.size())) {
            std::copy(codes.begin() + static_cast<std::ptrdiff_t>(range.begin),
                      codes.begin() + static_cast<std::ptrdiff_t>(range.end),
                      needed.begin() + static_cast<std::ptrdiff_t>(range.begin));
        }
        ranker.add(track.id, needed);
    }
    return to_places(to_bytes(std::span<const RankedPlace>(ranker.places())));
}

std::vector<RankedPlace> found_on(const std::vector<Shard>& all, const Reading& reading)
{
    const Lengths lengths(all);
    const auto query = count_query(reading, choose_probes(reading, lengths, 100'000));
    std::vector<RankedPlace> places;
    for (const Shard& shard : all) {
        const auto some = ranked(shard, reading, counted(shard, query, true));
        places.insert(places.end(), some.begin(), some.end());
    }
    keep_best(places, kLimit);
    return places;
}

bool operator==(const RankedPlace& left, const RankedPlace& right)
{
    return left.place.track == right.place.track && left.place.position == right.place.position &&
           left.place.phase == right.place.phase && left.agreement == right.agreement;
}

bool equal(const std::vector<RankedPlace>& left, const std::vector<RankedPlace>& right)
{
    return std::ranges::equal(left, right, [](const auto& a, const auto& b) { return a == b; });
}

TEST(ShardSearch, OfAnyNumberOfShardsIsThatOfOne)
{
    const auto one = shards(1);
    const auto three = shards(3);
    for (uint64_t number = 1; number <= kTracks; number += 6) {
        const Reading clip = clip_of(number, 12);
        const auto found = found_on(one, clip);
        ASSERT_FALSE(found.empty());
        EXPECT_EQ(static_cast<int64_t>(number), found[0].place.track);
        EXPECT_EQ(50, found[0].place.position);
        EXPECT_TRUE(equal(found, found_on(three, clip))) << number;
    }
}

TEST(ShardSearch, CountsRowsInAnyOrder)
{
    const auto all = shards(1);
    const Reading clip = clip_of(9, 12);
    const auto query = count_query(clip, choose_probes(clip, Lengths(all), 100'000));
    const auto looks = counted(all[0], query, true);
    EXPECT_FALSE(looks.empty());
    EXPECT_EQ(looks, counted(all[0], query, false));
}

TEST(ShardSearch, ScansTrackByTrackAsAllInARow)
{
    const auto all = shards(1);
    const auto corpus = all[0].corpus.corpus();
    const Population population = choose_population(corpus);
    const Reading clip = clip_of(9, 12);
    const auto phases = coarse_phases(clip, population.corpus());
    Scanner scanner(to_bytes(clip, kLimit, std::span<const CoarsePhase>(phases)));
    for (const TrackSpan& track : all[0].corpus.tracks) {
        scanner.add(track.id, corpus.segments[0].of(track));
    }
    EXPECT_EQ(9, scanner.places().at(0).place.track);
    EXPECT_EQ(50, scanner.places().at(0).place.position);
    EXPECT_EQ(kLimit, scanner.places().size());
}

TEST(ShardSearch, RefusesBytesThatAreCutOrLonger)
{
    const Reading clip = clip_of(1, 4);
    const auto query = to_bytes(count_query(clip, {{{.part = 1, .value = 2, .code = 3}}}));
    const std::vector<Look> looks = {{.track = 4, .position = -5}};
    const auto reading = to_bytes(clip, kLimit, std::span<const Look>(looks));
    EXPECT_NO_THROW(HitCounter{query});
    EXPECT_NO_THROW(Ranker{reading});
    for (size_t length = 0; length < query.size(); ++length) {
        EXPECT_THROW(HitCounter(std::span(query).first(length)), ShardBytesError) << length;
    }
    for (size_t length = 0; length < reading.size(); length += 5) {
        EXPECT_THROW(Ranker(std::span(reading).first(length)), ShardBytesError) << length;
        EXPECT_THROW(Scanner(std::span(reading).first(length)), ShardBytesError) << length;
    }
    auto longer = reading;
    longer.push_back({});
    EXPECT_THROW(Ranker{longer}, ShardBytesError);
}

TEST(ShardSearch, SurvivesAnyBytes)
{
    const auto all = shards(1);
    const Reading clip = clip_of(9, 12);
    const auto query = to_bytes(count_query(clip, choose_probes(clip, Lengths(all), 2000)));
    const std::vector<Look> looks = {{.track = 4, .position = -5}, {.track = 9, .position = 48}};
    const auto reading = to_bytes(clip, kLimit, std::span<const Look>(looks));
    const auto phases = coarse_phases(clip, choose_population(all[0].corpus.corpus()).corpus());
    const auto plans = to_bytes(clip, kLimit, std::span<const CoarsePhase>(phases));
    const auto codes = codes_of(9);
    std::mt19937 random(3);
    const auto spoilt = [&random](ShardBytes bytes) {
        bytes[random() % bytes.size()] ^= static_cast<std::byte>(1U << random() % 8);
        return bytes;
    };
    for (int i = 0; i < 2000; ++i) {
        try {
            HitCounter counter(spoilt(query));
            counter.add(1, kTracksList, spoilt(all[0].directory));
            counter.add(1, list_number(0, random() % kPartValues), spoilt(query));
            counter.looks();
        } catch (const ShardBytesError&) { // as good
        }
        try {
            Ranker ranker(spoilt(reading));
            for (const auto& range : ranker.ranges(9, codes.size())) {
                ASSERT_LE(range.begin, range.end);
                ASSERT_LE(range.end, codes.size());
            }
            ranker.add(9, codes);
        } catch (const ShardBytesError&) {
        }
        try {
            Scanner scanner(spoilt(plans));
            scanner.add(9, codes);
            scanner.places();
        } catch (const ShardBytesError&) {
        }
    }
}

TEST(ShardSearch, RefusesListsOfHalfAWord)
{
    const auto all = shards(1);
    HitCounter counter(
        to_bytes(count_query(clip_of(9, 12), {{{.part = 0, .value = 2, .code = 3}}})));
    const std::vector<std::byte> words(3);
    EXPECT_THROW(counter.add(7, list_number(0, 2), words), ShardBytesError);
    counter.add(7, kTracksList, all[0].directory);
    EXPECT_THROW(counter.add(7, list_number(0, 2), words), ShardBytesError);
    EXPECT_NO_THROW(counter.add(7, list_number(0, 2), std::span(words).first(2)));
}

TEST(ShardSearch, RefusesSpreadsThatHaveNoOrder)
{
    constexpr double kInfinite = std::numeric_limits<double>::infinity();
    constexpr double kNone = std::numeric_limits<double>::quiet_NaN();
    const Reading clip = clip_of(9, 12);
    const auto scanner_of = [&clip](const Spread& spread) {
        const std::vector<CoarsePhase> phases = {{clip, 0, {.codes = 8, .spread = spread}}};
        Scanner{to_bytes(clip, kLimit, std::span<const CoarsePhase>(phases))};
    };
    EXPECT_NO_THROW(scanner_of({.mean = -3, .deviation = 1}));
    for (const Spread& spread : {Spread{0, 0}, Spread{0, -1}, Spread{0, kNone},
                                 Spread{0, kInfinite}, Spread{kNone, 1}, Spread{-kInfinite, 1}}) {
        EXPECT_THROW(scanner_of(spread), ShardBytesError) << spread.mean << spread.deviation;
    }
    const std::vector<RankedPlace> places = {{.place = {.track = 1}, .agreement = kNone}};
    EXPECT_THROW(to_places(to_bytes(std::span<const RankedPlace>(places))), ShardBytesError);
}

TEST(ShardSearch, SumsTheLengthsOfLists)
{
    const auto all = shards(2);
    LengthSum sum;
    LengthSum other;
    sum.add_starts(all[0].table(1).starts);
    other.add_starts(all[1].table(1).starts);
    sum.add(other.lengths());
    const auto lengths = to_lengths(sum.lengths());
    for (uint32_t value = 0; value < kPartValues; ++value) {
        ASSERT_EQ(Lengths(all).words(1, value), lengths[value]) << value;
    }
    auto falling = all[0].tables[1].starts;
    falling[3] = std::byte{255};
    EXPECT_THROW(sum.add_starts(falling), ShardBytesError);
    EXPECT_THROW(sum.add_starts(std::span(falling).first(8)), ShardBytesError);
    EXPECT_THROW(sum.add(falling), ShardBytesError);
}

} // namespace
} // namespace kzcat
