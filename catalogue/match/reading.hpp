/// @file
/// Reads codes and masks out of the bands of a clip, at any pitch and tempo.
#pragma once

#include <cstddef>
#include <vector>

#include "catalogue/match/hypothesis.hpp"
#include "catalogue/model/fine_bands.hpp"

namespace kzcat {

/// The 18 hypotheses that are tried when the clip as it is was not recognised: 6 speeds, 6 tempi
/// and 6 pitches, up to 6 % either way.
const std::vector<Hypothesis>& further_hypotheses();

/// A part of a clip, in frames of its query.
struct Window {
    size_t first = 0;
    size_t count = 0;
};

/// Reads one window of a clip. An object belongs to one thread at a time; the bands have to outlive
/// it.
class QueryReader {
public:
    QueryReader(const QueryBands& bands, Window window);

    /// The sequences of all phases. Bits of a window are masked when they are the weakest of it.
    Reading read(const Hypothesis& hypothesis);

    const Window& window() const { return window_; }

    /// Frees what was kept for further readings, which then compute it again.
    void release();

private:
    /// Differences of all pairs, frame after frame.
    using Differences = std::vector<float>;

    const Differences& differences(int pitch_steps);

    const QueryBands& bands_;
    Window window_;
    std::vector<Differences> by_pitch_; ///< at kMaxPitchSteps + steps; empty until asked for
};

/// The fewest frames of a window that give a code at each phase.
size_t fewest_frames();

} // namespace kzcat
