/// @file
/// The exact place, speed and pitch of a clip that has been found.
#pragma once

#include <span>

#include "catalogue/match/reading.hpp"
#include "catalogue/match/score.hpp"

namespace kzcat {

/// Where a clip lies in a track and how it was changed.
struct Placement {
    Hypothesis hypothesis; ///< of the reading that fits best
    double offset = 0;     ///< seconds of the track at which the clip begins
    double stretch = 1;    ///< the clip runs this much faster
    double pitch = 1;      ///< the clip's frequencies are this many times the track's
    double agreement = 0;  ///< of the best reading, in deviations of independent bits
};

/// What a score says of the place: to the nearest phase and hypothesis.
Placement coarse_alignment(const Reading& reading, const TrackScore& score);

/// Tries stretches up to 7 % and pitches one fine band around what was found, at places up to half
/// a second around it, and interpolates between the best and its neighbours.
Placement refined_alignment(QueryReader& reader, std::span<const Code> track,
                            const Reading& reading, const TrackScore& score);

} // namespace kzcat
