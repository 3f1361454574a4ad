/// @file
/// The inner loops over samples and frames. Every variant gives the same bits: sums run in eight
/// lanes in each of them (lanes.hpp), and no product is contracted with a sum.
#pragma once

#include <cstddef>
#include <cstdint>

#include "catalogue/model/processor.hpp"

namespace kzcat {

struct Extremes {
    float low;
    float high;
};

/// Inputs and outputs have the sizes that profile.hpp and fine_bands.hpp state.
struct FrameKernels {
    const char* name;

    /// The lowest and the highest of kFrameLength samples.
    Extremes (*extremes)(const float* frame);

    /// The level of each sample: its distance from `bottom` times `scale`, truncated, at most 255.
    /// No sample is below `bottom`.
    void (*write_levels)(const float* frame, float bottom, float scale, uint8_t* levels);

    /// The rank of each sample's level, of 256, times the window.
    void (*write_windowed)(const uint8_t* levels, const float* ranks, float* output);

    /// The energy of every fine band, from the bins of a transform.
    void (*band_energies)(const float* bins, float* energies);

    /// The differences of all pairs. `bands` begins where the lowest pair does.
    void (*pair_differences)(const float* bands, float* differences);

    /// Between the sums of the products of samples with a row of taps and with the row after it:
    /// before + share * (after - before). A row is a multiple of kLanes long.
    float (*interpolated)(const float* samples, const float* taps, size_t row, float share);
};

/// Those of the instruction set that was chosen for this process.
const FrameKernels& frame_kernels();

/// Those of one instruction set, or of the best one below it for which there are any.
const FrameKernels& frame_kernels(Instructions instructions);

} // namespace kzcat
