/// @file
/// What the fingerprint means, in plain double arithmetic: no words, no rounding, no blocks.
///
/// Samples keep the scale of the integer path (a sample of 2^29 or 2^30 is full scale), because the
/// thresholds for silence are stated in it.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "whole/model/frame.hpp"
#include "whole/model/resampler.hpp"

namespace kz::model::ideal {

using Signal = std::vector<double>;
using Shares = std::array<double, 2 * kBands>;

/// All outputs whose windows lie within the signal. Keeps the gain of the stored filters and the
/// half level of the decimating ones.
Signal resample(const Ratio& ratio, std::span<const double> signal);

/// First sample of the signal proper: half a window before the mean deviation passes the threshold.
/// The size of the signal when it is silent. `unit` is what the detector counts as 1.
size_t signal_start(std::span<const double> signal, double unit = 8192);

/// Every sample becomes 32768 times the number of samples of its own and lower levels, less the
/// mean.
Signal equalise(std::span<const double> frame);

/// Half the samples; the filter sees zeros on either side of the frame.
Signal decimate(std::span<const double> frame);

/// (4 / L) sum of x[n] cos(pi (2n + 1) k / (2L)), by a Fourier transform; bin 0 all but removed.
Signal cosine_transform(std::span<const double> x);

struct Features {
    std::array<double, kBands> energy;
    std::array<double, kBands> amplitude;
};

Features analyse(std::span<const double> frame);

/// Shares of 32768: square root of the mean energy, standard deviation of the amplitude.
Shares condense(std::span<const Features> frames);

/// From input samples to the 30 values; the first 12 frames must be there.
Shares fingerprint(const Ratio& ratio, std::span<const double> input);

/// The same by the floating-point path's rules: full gain, no decimation, no ramp and no weights.
/// Samples have the scale of 16 bits.
Shares float_fingerprint(const Ratio& ratio, std::span<const double> input);

} // namespace kz::model::ideal
