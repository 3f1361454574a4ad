/// @file
/// Counting hits on diagonals, and choosing the diagonals that have most.
///
/// A clip that lies at position p of a track has its code j at p + j, so every agreeing part gives
/// the same difference, the diagonal. In units of eight codes the difference
///
///     floor((p + j) / 8) - floor(j / 8)
///
/// is floor(p / 8) or one more. Hits are counted for each such number over all tracks in a row, and
/// the numbers that have most, with those of their right neighbours, are looked at code by code.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/index/parts.hpp"

namespace kzcat {

/// Diagonals that are looked at code by code.
constexpr size_t kLooks = 3000;
/// Positions on both sides of a diagonal's eight that are looked at too: phases and a slightly
/// other tempo put some of the hits there.
constexpr int64_t kMargin = 2;

/// A diagonal and its hits. Diagonals are numbered from 0 in each of several runs of tracks.
struct Peak {
    uint32_t hits = 0;
    uint32_t bin = 0;
    uint32_t run = 0;
};

/// Room for the hits on all diagonals of `units` units of tracks, of which the first `shift` begin
/// before the first track.
size_t diagonals_of(uint32_t units, uint32_t shift);

/// Counts the units of a list that lie below `units`, `first` being the diagonal of unit 0.
void count_list(std::span<const std::byte> list, uint32_t units, uint32_t first,
                std::span<uint8_t> hits);

/// The diagonals of all runs with most hits, at most kLooks and two beside each other for each
/// clip's place, those with most hits first. Each run is as long as diagonals_of() says.
class Peaks {
public:
    void add_run(std::span<const uint8_t> hits);
    std::vector<Peak> take();

private:
    uint32_t least_hits() const;

    std::vector<std::span<const uint8_t>> runs_;
    std::vector<uint8_t> most_; ///< in each block of diagonals
};

/// The units of some tracks in a row.
class TrackUnits {
public:
    explicit TrackUnits(std::span<const TrackSpan> tracks);

    uint32_t count() const { return first_units_.back(); }

    /// Calls `visit` with the number of each track that a clip of so many units may lie on when it
    /// lies on a diagonal, and its position there.
    template <class Visit>
    void for_each_track(int64_t diagonal, uint64_t units, Visit visit) const
    {
        for (size_t track = track_of(diagonal); track + 1 < first_units_.size(); ++track) {
            const int64_t first_unit = first_units_[track];
            if (first_unit >= diagonal + static_cast<int64_t>(units) + 1) {
                break;
            }
            visit(track, (diagonal - first_unit) * int64_t{kUnitCodes});
        }
    }

private:
    size_t track_of(int64_t unit) const;

    std::vector<uint32_t> first_units_; ///< of each track, and behind the last
};

} // namespace kzcat
