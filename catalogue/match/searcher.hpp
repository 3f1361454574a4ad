/// @file
/// What recognition needs from a place that holds codes.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/match/corpus.hpp"
#include "catalogue/match/hypothesis.hpp"

namespace kzcat {

/// A place where a reading may lie: to be scored exactly.
struct Candidate {
    int64_t track = 0;
    uint32_t phase = 0;
    int64_t position =
        0; ///< of the sequence's first code among those of the track; may be negative
};

/// Finds where a reading may lie. A scan looks everywhere, an index only where parts of codes
/// agree, and a database elsewhere answers over the network.
class Searcher {
public:
    virtual ~Searcher() = default;

    /// The best places, the most likely first, at most `limit` tracks.
    virtual std::vector<Candidate> find(const Reading& reading, size_t limit) = 0;

    /// Looks everywhere, for when nothing that find() gave reaches its threshold; nullptr when
    /// find() does so itself, or nothing more is wanted.
    virtual Searcher* thorough() { return nullptr; }

    /// The codes of a track; empty when it is no longer there.
    virtual std::span<const Code> codes(int64_t track) = 0;

    /// Runs of codes from fixed places all over the catalogue: what an arbitrary place looks like.
    virtual const Corpus& population() = 0;

    /// The number of codes stored; the threshold grows with it.
    virtual uint64_t code_count() = 0;
};

} // namespace kzcat
