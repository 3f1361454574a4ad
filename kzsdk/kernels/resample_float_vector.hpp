/// @file
/// The choice among the floating-point polyphase filters in vectors. All have one lane per output,
/// and each sum takes its products in the stated order and rounds as the plain one does: they are
/// bit-identical to it.
///
/// Lanes beyond the outputs that are wanted work on whatever is there; their sums are not stored.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/plain.hpp"
#include "kzsdk/kernels/resample_float_columns.hpp"
#include "kzsdk/kernels/resample_float_decimator.hpp"
#include "kzsdk/kernels/resample_float_neighbours.hpp"

namespace {

template <class Simd>
void polyphase_floats(const kz::kernels::FloatPhases& phases, const float* oldest, uint32_t phase,
                      float* output, uint32_t count) noexcept
{
    if (count == 0) {
        return;
    }
    if (FloatDecimator<Simd, 2>::suits(phases)) {
        return FloatDecimator<Simd, 2>::run(phases.taps, oldest, output, count);
    }
    if (FloatDecimator<Simd, 4>::suits(phases)) {
        return FloatDecimator<Simd, 4>::run(phases.taps, oldest, output, count);
    }
    if (count <= phases.up && FloatNeighbours<Simd>::suits(phases)) {
        return FloatNeighbours<Simd>::run(phases, oldest, phase, output, count);
    }
    if (phases.taps_per_phase > Columns<Simd, 2>::kSteps) {
        return kz::kernels::plain::polyphase_floats(phases, oldest, phase, output, count);
    }
    const kz::kernels::PhaseWalk walk(phases.up, phases.down, phase);
    const auto samples = static_cast<size_t>(walk.window_after(count - 1)) + phases.taps_per_phase;
    if (count <= uint64_t{phases.up} * Simd::kLanes) {
        run_columns<Simd, 1>(phases, oldest, samples, phase, output, count);
    } else {
        run_columns<Simd, 2>(phases, oldest, samples, phase, output, count);
    }
}

} // namespace
