/// @file
/// How well a reading agrees at some places of a track: what candidates are put in order by.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "catalogue/match/score.hpp"
#include "catalogue/match/searcher.hpp"

namespace kzcat {

/// A place and the agreement of the reading there, in deviations of independent bits.
struct RankedPlace {
    Candidate place;
    double agreement = 0;
};

/// A reading made ready for looking at single places. The reading has to outlive it.
class Ranking {
public:
    explicit Ranking(const Reading& reading);
    explicit Ranking(Reading&& reading) = delete;

    /// Codes of the longest sequence.
    size_t length() const { return length_; }

    /// The place between `first` and `last` where any phase agrees best, the first of equals; none
    /// where too little of the sequence lies on the track.
    std::optional<RankedPlace> best(int64_t track, std::span<const Code> codes, int64_t first,
                                    int64_t last) const;

private:
    struct Phase {
        const Sequence* sequence;
        ScanSequence scan; ///< for its weights
    };
    static double agreement_at(const Phase& phase, std::span<const Code> codes, int64_t position);

    std::vector<Phase> phases_;
    size_t length_ = 0;
};

/// Puts places in order, the best first and those of equal agreement by track, and keeps the best
/// of each track and of all `limit` at most.
void keep_best(std::vector<RankedPlace>& places, size_t limit);

} // namespace kzcat
