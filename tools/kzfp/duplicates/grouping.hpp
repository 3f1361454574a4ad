/// @file
/// From what pairs of recordings have in common to groups of duplicates. Nothing here reads files.
#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "kzcat.h"

namespace kzfp {

/// What two recordings are to each other.
enum class Relation {
    different,       ///< also when they share a passage, such as a loop
    same,            ///< nearly all of both agrees
    second_in_first, ///< nearly all of the second agrees with a part of the first
    first_in_second
};

/// The share of what sounds in the shorter recording, and for Relation::same in the longer one too,
/// that has to agree. docs/duplicates.md has the measurements.
inline constexpr double kMostOfIt = 0.7;

/// Fewer seconds that agree say nothing.
inline constexpr double kFewestSeconds = 6;

Relation relation_of(const kzcat_alignment& alignment);

/// Two recordings, by their numbers, that are not different.
struct Link {
    size_t first = 0;
    size_t second = 0;
    Relation relation = Relation::same;
};

/// Recordings that are the same, and those that are excerpts of them; both in rising order.
struct Group {
    std::vector<size_t> whole;
    std::vector<size_t> excerpts;
};

/// Every recording is whole in one group; an excerpt is listed in each group that it is from, so
/// that two tunes do not become one because a mix holds both.
std::vector<Group> group_recordings(size_t count, std::span<const Link> links);

} // namespace kzfp
