/// @file
/// The passes of a scan over some tracks: a coarse one over all places, and a closer look at those
/// it leaves.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "catalogue/match/corpus.hpp"
#include "catalogue/match/hypothesis.hpp"
#include "catalogue/match/score.hpp"

namespace kzcat {

/// What a scan needs to be told of a phase by whoever has the catalogue's population.
struct PassPlan {
    size_t codes = 0;                   ///< of the coarse pass
    Spread spread = {};                 ///< of the whole sequence
    std::optional<uint32_t> limit = {}; ///< on the coarse distance; none when no place can pass
};

/// One phase of a reading, ready for the scan. The reading has to outlive it.
struct CoarsePhase {
    uint32_t phase;
    const Sequence* sequence;
    ScanSequence coarse;
    ScanSequence whole;
    PassPlan plan;

    CoarsePhase(const Reading& reading, uint32_t number, const Corpus& population);
    CoarsePhase(const Reading& reading, uint32_t number, const PassPlan& as_planned);
};

/// Those that a scan looks at: every second one.
std::vector<CoarsePhase> coarse_phases(const Reading& reading, const Corpus& population);

/// The best place of a track.
struct BestPlace {
    double deviations = 0; ///< above the catalogue's mean
    uint32_t phase = 0;
    int64_t position = 0;
    bool found = false;
};

/// Of each track of a segment.
std::vector<BestPlace> best_places(const Segment& segment, std::span<const CoarsePhase> phases);

} // namespace kzcat
