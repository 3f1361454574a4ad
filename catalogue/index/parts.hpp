/// @file
/// Where each part of a code occurs: tables from the 16 bits of a part to the places that have
/// them.
///
/// Places are counted in units of eight codes, which keeps all tables together about as small as
/// the codes themselves; each track begins a unit. A list of places is a run of 16-bit words, each
/// the distance from the place before it: kFarther goes that far without a place there. Codes
/// without a bit, which are those of silence, are in no list.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/match/corpus.hpp"
#include "catalogue/store/little_endian.hpp"

namespace kzcat {

constexpr uint32_t kParts = 4;
constexpr uint32_t kPartBits = kPairs / kParts;
constexpr uint32_t kPartValues = 1U << kPartBits;
constexpr uint32_t kUnitCodes = 8;
constexpr uint16_t kFarther = 0xFFFF;

/// Most codes that tables are made of: their words are counted in 32 bits.
constexpr uint64_t kMaxIndexedCodes = uint64_t{1} << 31;

/// Sixteen neighbours: the low bands, and a third of the others each. What spoils some bands, as a
/// small loudspeaker or noise of some colour, leaves the other parts whole.
constexpr uint32_t part_of(Code code, uint32_t part)
{
    return static_cast<uint32_t>(code >> (kPartBits * part)) & (kPartValues - 1);
}

constexpr uint32_t part_bit(uint32_t part, uint32_t bit) { return kPartBits * part + bit; }

/// Units that a track takes.
constexpr uint64_t units_of(uint64_t codes) { return (codes + kUnitCodes - 1) / kUnitCodes; }

/// One part's table as it lies in a file: kPartValues + 1 starts of 32 bits, counted in words, and
/// the words.
struct PartTable {
    std::span<const std::byte> starts;
    std::span<const std::byte> words;

    /// Where the list of a value lies.
    std::span<const std::byte> list(uint32_t value) const
    {
        const size_t begin = get_little_endian<uint32_t>(starts.data() + size_t{4} * value);
        const size_t end = get_little_endian<uint32_t>(starts.data() + size_t{4} * value + 4);
        return words.subspan(2 * begin, 2 * (end - begin));
    }
};

using PartTables = std::array<PartTable, kParts>;

/// What is wrong with a table whose starts do not rise from zero to the number of words; nullptr
/// when all its lists lie in it.
const char* fault_of(const PartTable& table);

/// Calls `visit` with each unit of a list, as long as they lie below `units`: the words of a
/// damaged list may lead anywhere. The list has whole words.
template <class Visit>
void for_each_unit(std::span<const std::byte> list, uint32_t units, Visit visit)
{
    uint64_t unit = 0;
    for (size_t at = 0; at < list.size(); at += 2) {
        const auto word = get_little_endian<uint16_t>(list.data() + at);
        unit += word;
        if (unit >= units) {
            return;
        }
        if (word != kFarther) {
            visit(static_cast<uint32_t>(unit));
        }
    }
}

/// A table's bytes.
struct BuiltTable {
    std::vector<std::byte> starts;
    std::vector<std::byte> words;
};

/// The table of one part over all tracks, which have kMaxIndexedCodes codes at most.
BuiltTable build_table(const Corpus& corpus, uint32_t part);

} // namespace kzcat
