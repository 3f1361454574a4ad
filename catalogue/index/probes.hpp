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

/// The lists that are most likely to hold the right place, by the words that have to be read for
/// it: for every part its value, and those with some of its weakest bits the other way round. Lists
/// are taken until they have `budget` words together.
///
/// A bit of strength s is taken to be wrong with odds of 1 to 2^(3 s / 64): of the steps that were
/// tried, the one that found most clips under noise. Only the order of the lists follows from it.
std::vector<PartProbe> choose_probes(const Reading& reading, const PartTables& tables,
                                     uint64_t budget);

} // namespace kzcat
