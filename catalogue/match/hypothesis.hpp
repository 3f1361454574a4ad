/// @file
/// Readings of a query: at some pitch and tempo, at each phase of the codes' grid.
#pragma once

#include <array>
#include <cstdint>
#include <vector>

#include "catalogue/model/fine_bands.hpp"

namespace kzcat {

/// How the clip may differ from the track. Only the query is changed, never what is stored.
struct Hypothesis {
    int pitch_steps = 0;  ///< fine bands (1/36 octave) that the clip is higher than the track
    double stretch = 1.0; ///< the clip runs this much faster than the track

    bool operator==(const Hypothesis&) const = default;
};

/// How far each bit of a code is from being the other one: the change of its pair's difference in
/// units of 1/32 octave, without its sign, rounded down, 255 at most.
using BitStrengths = std::array<uint8_t, kPairs>;

/// Codes of a query, one every kCodeHop samples of the track, and which of their bits count.
struct Sequence {
    std::vector<Code> codes;
    std::vector<Code> masks;
    std::vector<BitStrengths>
        strengths;    ///< one for each code, or none at all when they are unknown
    double start = 0; ///< of the first code's frame, seconds of the track after the clip's start
};

/// A query at one hypothesis: a sequence for every phase.
struct Reading {
    Hypothesis hypothesis;
    std::vector<Sequence> sequences;
};

} // namespace kzcat
