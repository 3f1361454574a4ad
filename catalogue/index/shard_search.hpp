/// @file
/// The parts of a look-up that are done where the tracks are: counting hits, ranking places,
/// scanning. What they give for several servers is put together by the client.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <span>
#include <vector>

#include "catalogue/index/diagonals.hpp"
#include "catalogue/index/shard_bytes.hpp"

namespace kzcat {

/// Counts the hits of a look-up over the rows of postings, which come in any order.
class HitCounter {
public:
    explicit HitCounter(std::span<const std::byte> query);

    /// A row: see posting.sql. Throws ShardBytesError.
    void add(int32_t segment, int32_t list, std::span<const std::byte> words);

    /// The diagonals with most hits.
    std::vector<Look> looks() const;

private:
    struct Segment {
        std::vector<TrackSpan> tracks;
        uint32_t units = 0;
        std::vector<uint8_t> hits;
    };
    void count(Segment& segment, const CountQuery::List& list, std::span<const std::byte> words);
    static std::vector<uint8_t> trimmed(const Segment& segment, uint32_t shift);

    CountQuery query_;
    uint32_t shift_;
    std::map<int32_t, Segment> segments_;
};

/// Ranks places of tracks that were named as looks. Of a long track only the codes near these are
/// needed, which saves reading the others.
class Ranker {
public:
    explicit Ranker(std::span<const std::byte> reading);

    struct Range {
        uint64_t begin = 0;
        uint64_t end = 0;
    };
    /// The codes that are needed of a track that has so many.
    std::vector<Range> ranges(int64_t track, uint64_t count) const;

    /// `codes` has room for all of them, and has those that ranges() names.
    void add(int64_t track, std::span<const Code> codes);
    void add(std::span<const RankedPlace> places);

    /// The best places, of `limit` tracks at most.
    std::vector<RankedPlace> places() const;

private:
    std::span<const Look> looks_of(int64_t track) const;

    ShardReading query_;
    Ranking ranking_;
    std::vector<RankedPlace> places_;
};

/// Looks at all places of tracks. The agreement that places are put in order by is that above the
/// catalogue's mean.
class Scanner {
public:
    explicit Scanner(std::span<const std::byte> reading);

    void add(int64_t track, std::span<const Code> codes);
    void add(std::span<const RankedPlace> places);

    /// The best place of each of `limit` tracks at most; of equals the older track.
    std::vector<RankedPlace> places() const;

private:
    void shorten();

    ShardReading query_;
    std::vector<CoarsePhase> phases_;
    std::vector<RankedPlace> places_;
};

/// Sums the lengths of a part's lists over segments.
class LengthSum {
public:
    /// The starts of a segment's lists: see PartTable. Throws ShardBytesError.
    void add_starts(std::span<const std::byte> starts);
    /// What lengths() gave for other segments.
    void add(std::span<const std::byte> lengths);

    /// kPartValues lengths in words, 8 bytes each.
    ShardBytes lengths() const;

private:
    std::vector<uint64_t> words_ = std::vector<uint64_t>(kPartValues);
};

/// The postings of one part, of tracks that are added in the order of their ids.
class PostingBuilder {
public:
    explicit PostingBuilder(uint32_t part) : part_(part) {}

    void add(std::span<const Code> codes);

    /// Starts and words: see PartTable.
    BuiltTable build() const;

private:
    uint32_t part_;
    std::vector<Code> codes_;
    std::vector<TrackSpan> tracks_;
};

} // namespace kzcat
