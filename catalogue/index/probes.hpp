/// @file
/// Which lists of the part tables a reading looks into.
#pragma once

#include <cstdint>
#include <vector>

#include "catalogue/index/parts.hpp"
#include "catalogue/match/hypothesis.hpp"

namespace kzcat {

/// One list to look into, for one code of one sequence.
struct PartProbe {
    uint32_t part = 0;
    uint32_t value = 0;
    uint32_t code = 0; ///< its number in the sequence
};

/// How many words the list of each value of each part has.
class ListLengths {
public:
    virtual ~ListLengths() = default;
    virtual uint64_t words(uint32_t part, uint32_t value) const = 0;
};

/// Words that one look-up reads of tables with so many words in all: those of `lists` lists of
/// average length; 0: of the usual number.
uint64_t probe_budget(uint64_t words, uint32_t lists);

/// The lists that are most likely to hold the right place, by the words that have to be read for
/// it: for every part its value, and those with some of its weakest bits the other way round. Lists
/// are taken until they have `budget` words together.
///
/// A bit of strength s is taken to be wrong with odds of 1 to 2^(3 s / 64): of the steps that were
/// tried, the one that found most clips under noise. Only the order of the lists follows from it.
std::vector<PartProbe> choose_probes(const Reading& reading, const ListLengths& lengths,
                                     uint64_t budget);
std::vector<PartProbe> choose_probes(const Reading& reading, const PartTables& tables,
                                     uint64_t budget);

} // namespace kzcat
