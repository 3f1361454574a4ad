// The tables of parts, against a plain search for every value.

#include <map>
#include <set>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/index/corpora.hpp"
#include "catalogue/index/parts.hpp"

namespace kzcat {
namespace {

using test::OwnedCorpus;

using Occurrences = std::map<uint32_t, std::set<uint32_t>>; ///< units of each value

Occurrences searched(const Corpus& corpus, uint32_t part)
{
    Occurrences found;
    uint32_t first_unit = 0;
    for (const auto& segment : corpus.segments) {
        for (const auto& track : segment.tracks) {
            const auto codes = segment.of(track);
            for (uint32_t i = 0; i < codes.size(); ++i) {
                if (codes[i] != 0) {
                    found[part_of(codes[i], part)].insert(first_unit + i / kUnitCodes);
                }
            }
            first_unit += static_cast<uint32_t>(units_of(codes.size()));
        }
    }
    return found;
}

PartTable view(const BuiltTable& built) { return {built.starts, built.words}; }

Occurrences listed(const PartTable& table, uint32_t units)
{
    Occurrences found;
    for (uint32_t value = 0; value < kPartValues; ++value) {
        for_each_unit(table.list(value), units, [&](uint32_t unit) {
            EXPECT_TRUE(found[value].empty() || *found[value].rbegin() < unit);
            found[value].insert(unit);
        });
    }
    return found;
}

Occurrences listed_without_empty(const PartTable& table)
{
    Occurrences found = listed(table, UINT32_MAX);
    std::erase_if(found, [](const auto& entry) { return entry.second.empty(); });
    return found;
}

TEST(Parts, TogetherHaveEachBitOnce)
{
    for (uint32_t part = 0; part < kParts; ++part) {
        for (uint32_t bit = 0; bit < kPartBits; ++bit) {
            const Code code = Code{1} << part_bit(part, bit);
            for (uint32_t other = 0; other < kParts; ++other) {
                EXPECT_EQ(other == part ? 1U << bit : 0U, part_of(code, other));
            }
        }
    }
}

TEST(PartTables, ListEachValueWhereItOccurs)
{
    const OwnedCorpus first = test::small_corpus(20);
    OwnedCorpus second;
    second.add(1000, test::random_codes(5, 333));
    const Corpus corpus{{first.segment(), second.segment()}};
    for (uint32_t part = 0; part < kParts; ++part) {
        const BuiltTable built = build_table(corpus, part);
        EXPECT_EQ(nullptr, fault_of(view(built)));
        EXPECT_EQ(searched(corpus, part), listed(view(built), UINT32_MAX));
    }
}

TEST(PartTables, ReachPlacesThatAreFarApart)
{
    for (const uint32_t distance : {65534U, 65535U, 65536U, 131070U}) {
        OwnedCorpus corpus;
        const std::vector<Code> rare{0x1111111111111111};
        corpus.add(1, rare);
        corpus.add(2, std::vector<Code>((size_t{distance} - 1) * kUnitCodes, 0x2222222222222222));
        corpus.add(3, rare);
        const BuiltTable built = build_table(corpus.corpus(), 1);
        const Occurrences found = listed(view(built), UINT32_MAX);
        EXPECT_EQ((std::set<uint32_t>{0, distance}), found.at(part_of(rare[0], 1)));
    }
}

TEST(PartTables, DoNotListSilence)
{
    OwnedCorpus corpus;
    corpus.add(1, std::vector<Code>{0, 0, 0xF00000, 0});
    const BuiltTable built = build_table(corpus.corpus(), 1);
    EXPECT_EQ((Occurrences{{0xF0, {0}}}), listed_without_empty(view(built)));
}

TEST(PartTables, LeadToNoPlaceBeyondTheLast)
{
    const BuiltTable built = build_table(test::small_corpus(20).corpus(), 2);
    for (const auto& [value, units] : listed(view(built), 7)) {
        EXPECT_TRUE(units.empty() || *units.rbegin() < 7U) << value;
    }
}

TEST(PartTables, AreFaultyWhenAListLeavesThem)
{
    const BuiltTable whole = build_table(test::small_corpus(20).corpus(), 2);
    const auto with_start = [&](size_t value, uint32_t start) {
        BuiltTable changed = whole;
        put_little_endian(start, changed.starts.data() + 4 * value);
        return fault_of(view(changed)) != nullptr;
    };
    const auto words = static_cast<uint32_t>(whole.words.size() / 2);
    EXPECT_TRUE(with_start(0, 1));
    EXPECT_TRUE(with_start(1000, words + 1));
    EXPECT_TRUE(with_start(1000, UINT32_MAX));
    EXPECT_TRUE(with_start(kPartValues, words - 1));
    EXPECT_TRUE(with_start(kPartValues, words + 1));
    EXPECT_FALSE(with_start(kPartValues, words));
}

TEST(PartTables, AreFaultyWhenTheirSizesDoNotFit)
{
    const BuiltTable whole = build_table(test::small_corpus(20).corpus(), 2);
    BuiltTable changed = whole;
    changed.words.pop_back();
    EXPECT_NE(nullptr, fault_of(view(changed)));
    changed = whole;
    changed.starts.pop_back();
    EXPECT_NE(nullptr, fault_of(view(changed)));
    EXPECT_NE(nullptr, fault_of({}));
}

} // namespace
} // namespace kzcat
