/// @file
/// The coefficient tables that tables/tablegen.cpp writes during the build.
#pragma once

#include <cstdint>

namespace kz::dsp {

/// Butterfly factors of the 32768-point transform: entry h + j is 2^31 / h times
/// butterfly_factor(h, j), truncated. The first half serves the 16384-point transform.
extern const int32_t kDctCoefficients[32768];

/// Prototypes of the floating-point decimators; in Q31 they serve the fixed-point ones. The
/// half-band filter has its centre tap, 0.5, at index 21; the quarter-band filter its own, 0.25, at
/// index 43.
extern const float coefficients_2to1[42];
extern const float coefficients_4to1[84];

} // namespace kz::dsp
