/// @file
/// How far up the sound of a file really reaches: encoders at low bit rates cut the top off, also
/// when the result is kept without loss afterwards.
#pragma once

#include <cstdint>
#include <span>

namespace kzfp {

/// The highest frequency in hertz, to about 250 Hz, at which there is more than rounding; 0 for
/// silence or less than 2048 samples.
double bandwidth_of(std::span<const float> samples, uint32_t rate);

} // namespace kzfp
