/// @file
/// The features of a frame once more, written from their definition in double precision.
#pragma once

#include <span>
#include <vector>

#include "catalogue/model/profile.hpp"

namespace kz::test {

/// The differences in level of the 64 pairs, of kFrameLength samples.
std::vector<double> reference_differences(std::span<const float> frame, int steps = 0);

/// Of frames one `hop` apart, in order.
std::vector<std::vector<double>> reference_differences_of(std::span<const float> samples,
                                                          size_t hop, int steps = 0);

} // namespace kz::test
