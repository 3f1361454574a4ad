/// @file
/// Which clips are looked up.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "kzfp/evaluate/kinds.hpp"
#include "kzfp/evaluate/music.hpp"

namespace kzfp::evaluate {

/// A kind at a length: a row of the table.
struct Series {
    const Kind* kind = nullptr;
    double seconds = 15;
};

/// A clip to be made. Its name is its own, "clean/k0003", and its place and noise follow from that
/// and the seed.
struct PlannedClip {
    size_t series = 0;
    size_t track = 0; ///< place in the music
    std::string name;
};

/// So many clips of each series from tracks that the catalogue has, and half as many of strangers,
/// as far as there are tracks that are long enough; no track a second time before each was there
/// once. The first clips of all series come first, so that a run that is interrupted has some of
/// each.
std::vector<PlannedClip> plan_clips(const Music& music, std::span<const Series> series,
                                    size_t clips, uint64_t seed);

/// "clean" or, when series of a run differ in length, "clean_6s".
std::string series_name(std::span<const Series> all, size_t place);

} // namespace kzfp::evaluate
