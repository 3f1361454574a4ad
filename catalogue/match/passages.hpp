/// @file
/// Clips that are longer than a window: what is known of one window helps with the others.
#pragma once

#include "catalogue/match/search.hpp"

namespace kzcat {

/// Several tracks one after the other, in the order of the clip.
MatchAnswer recognise_passages(WindowSearch& search, const MatchOptions& options);

/// The score of a hit with what the other windows say of the same place: the sum of their scores,
/// by the square root of their number.
double pooled_score(WindowSearch& search, const Hit& hit);

/// A hit of a longer clip, with where the track begins and ends in it.
TrackMatch describe_long(WindowSearch& search, const Hit& hit);

} // namespace kzcat
