/// @file
/// The door to the inner loop that compares neighbouring bands.

#include "catalogue/model/fine_bands.hpp"

#include <cassert>
#include <cstdlib>

#include "catalogue/model/frame_kernels.hpp"
#include "catalogue/model/pair_bands.hpp"

namespace kzcat {

static_assert(kLowestPairEdge - kMaxPitchSteps >= kFirstFineBand);
static_assert(kLowestPairEdge - kFirstFineBand + kMaxPitchSteps + kPairFineBands <= kFineBands);

void pair_differences(std::span<const float> frame, int steps, std::span<float, kPairs> differences)
{
    assert(std::abs(steps) <= kMaxPitchSteps && frame.size() == kFineBands);
    const float* lowest = frame.data() + (kLowestPairEdge - kFirstFineBand + steps);
    frame_kernels().pair_differences(lowest, differences.data());
}

} // namespace kzcat
