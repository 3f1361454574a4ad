/// @file
/// Where each part of a code occurs: tables from the 16 bits of a part to the places that have
/// them.

#include "catalogue/index/parts.hpp"

#include <algorithm>

namespace kzcat {

namespace {

/// Calls `visit` with each value that the codes of a unit have, once for each value. `codes` are
/// those of one unit.
template <class Visit>
void for_each_value(std::span<const Code> codes, uint32_t part, Visit visit)
{
    std::array<uint32_t, kUnitCodes> seen{};
    auto* end = seen.data();
    for (const Code code : codes) {
        const uint32_t value = part_of(code, part);
        if (code != 0 && std::find(seen.data(), end, value) == end) {
            *end++ = value;
            visit(value);
        }
    }
}

/// Calls `visit` with the unit and the value of every occurrence, in rising order of units.
template <class Visit>
void for_each_occurrence(const Corpus& corpus, uint32_t part, Visit visit)
{
    uint32_t unit = 0;
    for (const auto& segment : corpus.segments) {
        for (const auto& track : segment.tracks) {
            const auto codes = segment.of(track);
            for (size_t first = 0; first < codes.size(); first += kUnitCodes, ++unit) {
                const size_t count = std::min<size_t>(kUnitCodes, codes.size() - first);
                for_each_value(codes.subspan(first, count), part,
                               [&](uint32_t value) { visit(unit, value); });
            }
        }
    }
}

/// Words that lead from one unit to the next of the same value.
uint32_t words_between(uint32_t earlier, uint32_t unit) { return (unit - earlier) / kFarther + 1; }

/// The end of every list while it is being counted or written.
struct ListEnds {
    std::vector<uint32_t> last = std::vector<uint32_t>(kPartValues); ///< unit, 0 before the first
    std::vector<uint32_t> words = std::vector<uint32_t>(kPartValues + 1);
};

/// words[value + 1]: how many words the list of the value takes.
ListEnds count_words(const Corpus& corpus, uint32_t part)
{
    ListEnds ends;
    for_each_occurrence(corpus, part, [&](uint32_t unit, uint32_t value) {
        ends.words[value + 1] += words_between(ends.last[value], unit);
        ends.last[value] = unit;
    });
    return ends;
}

void put_word(std::vector<std::byte>& words, uint32_t at, uint16_t word)
{
    put_little_endian(word, words.data() + size_t{2} * at);
}

} // namespace

const char* fault_of(const PartTable& table)
{
    if (table.starts.size() != size_t{4} * (kPartValues + 1) || table.words.size() % 2 != 0) {
        return "a table of parts has another size than it must have";
    }
    uint32_t earlier = 0;
    bool rises = get_little_endian<uint32_t>(table.starts.data() + 0) == 0;
    for (size_t value = 0; value <= kPartValues; ++value) {
        const auto start = get_little_endian<uint32_t>(table.starts.data() + 4 * value);
        rises = rises && start >= earlier;
        earlier = start;
    }
    if (!rises || earlier != table.words.size() / 2) {
        return "the lists of a table of parts overlap or leave the table";
    }
    return nullptr;
}

BuiltTable build_table(const Corpus& corpus, uint32_t part)
{
    ListEnds ends = count_words(corpus, part);
    std::vector<uint32_t>& next = ends.words; // where the next word of each list goes
    BuiltTable table;
    table.starts.resize(size_t{4} * (kPartValues + 1));
    for (size_t value = 0; value <= kPartValues; ++value) {
        next[value] += value > 0 ? next[value - 1] : 0;
        put_little_endian(next[value], table.starts.data() + 4 * value);
    }
    table.words.resize(size_t{2} * next[kPartValues]);
    std::fill(ends.last.begin(), ends.last.end(), 0U);
    for_each_occurrence(corpus, part, [&](uint32_t unit, uint32_t value) {
        uint32_t distance = unit - ends.last[value];
        for (; distance >= kFarther; distance -= kFarther) {
            put_word(table.words, next[value]++, kFarther);
        }
        put_word(table.words, next[value]++, static_cast<uint16_t>(distance));
        ends.last[value] = unit;
    });
    return table;
}

} // namespace kzcat
