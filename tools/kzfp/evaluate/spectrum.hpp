/// @file
/// Filters and noise by way of the spectrum.
#pragma once

#include <cstddef>
#include <functional>
#include <vector>

#include "kzfp/evaluate/random.hpp"

namespace kzfp::evaluate {

/// The factor for a frequency in hertz.
using Gain = std::function<double(double hertz)>;

/// Samples with each frequency multiplied, without delay.
std::vector<float> filtered(const std::vector<float>& samples, double rate, const Gain& gain);

/// Convolves with a response, as long as the samples are, and filters.
std::vector<float> convolved(const std::vector<float>& samples, const std::vector<float>& response,
                             double rate, const Gain& gain);

/// Noise of level 1 up to 11025 Hz: white, or pink from 20 Hz.
enum class NoiseColour { white, pink };
std::vector<float> noise(Random& random, size_t count, double rate, NoiseColour colour);

} // namespace kzfp::evaluate
