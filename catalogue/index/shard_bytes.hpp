/// @file
/// What travels between a client and the servers that have the tracks, as bytes: numbers lie with
/// their lowest byte first. Both sides are of one version: the catalogue's schema sees to that.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/index/byte_streams.hpp"
#include "catalogue/index/probes.hpp"
#include "catalogue/index/ranking.hpp"
#include "catalogue/match/scan_passes.hpp"

namespace kzcat {

using ShardBytes = std::vector<std::byte>;

/// A list of postings: 65536 * part + value.
constexpr int32_t list_number(uint32_t part, uint32_t value)
{
    return static_cast<int32_t>(part * kPartValues + value);
}

/// The row of a segment that has its tracks, and that with the starts of a part's lists.
constexpr int32_t kTracksList = -1;
constexpr int32_t starts_list(uint32_t part) { return -2 - static_cast<int32_t>(part); }

/// What the lists of a look-up are counted by: the longest sequence's codes, and for each list the
/// numbers of the codes that look into it.
struct CountQuery {
    struct List {
        int32_t list = 0;
        uint32_t begin = 0; ///< among `codes`
        uint32_t end = 0;
    };
    uint32_t length = 0;
    std::vector<List> lists; ///< rising
    std::vector<uint16_t> codes;
};
CountQuery count_query(const Reading& reading, std::span<const PartProbe> probes);
ShardBytes to_bytes(const CountQuery& query);
CountQuery to_count_query(std::span<const std::byte> bytes);

/// A diagonal to be looked at: the position of a track at which the clip's first code may lie, and
/// the seven behind it.
struct Look {
    int64_t track = 0;
    int64_t position = 0;
    bool operator==(const Look&) const = default;
};
ShardBytes to_bytes(std::span<const Look> looks);
std::vector<Look> to_looks(std::span<const std::byte> bytes);

/// A reading's codes and masks, and how many tracks are wanted.
struct ShardReading {
    Reading reading;
    uint32_t limit = 0;
    std::vector<PassPlan> plans; ///< of phases 0, 2, 4 ...; for a scan
    std::vector<Look> looks;     ///< rising; for ranking
};
ShardBytes to_bytes(const Reading& reading, uint32_t limit, std::span<const CoarsePhase> phases);
ShardBytes to_bytes(const Reading& reading, uint32_t limit, std::span<const Look> looks);
ShardReading to_shard_reading(std::span<const std::byte> bytes);

/// Places with what they are put in order by.
ShardBytes to_bytes(std::span<const RankedPlace> places);
std::vector<RankedPlace> to_places(std::span<const std::byte> bytes);

/// The lengths of a part's lists, in words.
std::vector<uint64_t> to_lengths(std::span<const std::byte> bytes);

/// The tracks of a segment as a row has them: see posting.sql.
std::vector<TrackSpan> to_track_spans(std::span<const std::byte> bytes);

} // namespace kzcat
