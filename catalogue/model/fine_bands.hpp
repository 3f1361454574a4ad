/// @file
/// The energies of fine bands, from which a query can be read at any pitch and tempo.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/model/profile.hpp"

namespace kzcat {

/// Fine band j reaches from edge(j) to edge(j + 1), edge(j) = 160 Hz * 2^(j / 36), for
/// j = kFirstFineBand .. kFirstFineBand + kFineBands - 1. A pair at pitch step p uses the bands p
/// further up, so the range has room for kMaxPitchSteps on both sides.
constexpr int kMaxPitchSteps = 6;
constexpr int kFirstFineBand = -51 - kMaxPitchSteps;
constexpr size_t kFineBands = 160 + kMaxPitchSteps - kFirstFineBand;

/// What is kept of a clip: for every frame of the query's hop the energy of each fine band and the
/// level of the frame.
struct QueryBands {
    uint64_t samples = 0;        ///< of the clip, at the working rate
    std::vector<float> energies; ///< frames x kFineBands
    std::vector<float> levels;   ///< log2 of the frames' energy plus 1; 41 for a full sine

    size_t frames() const { return levels.size(); }
    std::span<const float> frame(size_t index) const
    {
        return std::span(energies).subspan(index * kFineBands, kFineBands);
    }
};

/// The difference in level of each pair of neighbouring bands, in octaves of energy, `steps` fine
/// bands further up; |steps| is at most kMaxPitchSteps. Bit-identical on all processors.
void pair_differences(std::span<const float> frame, int steps,
                      std::span<float, kPairs> differences);

/// How far apart the two frames are whose differences are compared, in units of kTrailHop either
/// way: 1 for even pairs, 3 for odd ones.
constexpr uint32_t pair_lag(size_t pair) { return pair % 2 == 0 ? 1 : 3; }

} // namespace kzcat
