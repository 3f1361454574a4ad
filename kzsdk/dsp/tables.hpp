/// @file
/// The coefficient tables that tables/tablegen.cpp writes during the build.
#pragma once

#include <cstdint>

namespace kz::dsp {

/// Butterfly factors of the 32768-point transform: entry h + j is 2^31 / h times
/// butterfly_factor(h, j), truncated. The first half serves the 16384-point transform.
extern const int32_t kDctCoefficients[32768];

} // namespace kz::dsp
