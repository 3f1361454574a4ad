/// @file
/// The codes that a query is compared with, wherever they lie.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/model/profile.hpp"

namespace kzcat {

/// The codes of one track among those of a segment.
struct TrackSpan {
    int64_t id = 0;
    uint64_t first = 0; ///< index into the codes of the segment
    uint64_t count = 0;
};

/// Tracks whose codes lie one after the other: a mapped file, or memory. Codes of removed tracks
/// may lie between them, and count for nothing. Owns nothing.
struct Segment {
    std::span<const Code> codes;
    std::span<const TrackSpan> tracks; ///< ids rise

    std::span<const Code> of(const TrackSpan& track) const
    {
        return codes.subspan(static_cast<size_t>(track.first), static_cast<size_t>(track.count));
    }
};

/// All tracks of a catalogue. Ids rise from segment to segment too; where segments end makes no
/// difference to any answer.
struct Corpus {
    std::vector<Segment> segments;

    uint64_t code_count() const;
    uint64_t track_count() const;
};

} // namespace kzcat
