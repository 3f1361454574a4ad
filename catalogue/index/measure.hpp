/// @file
/// How long a look-up takes, for choosing between the plans.
#pragma once

#include <cstdint>
#include <functional>

#include "catalogue/match/corpus.hpp"
#include "catalogue/match/hypothesis.hpp"

namespace kzcat {

/// A reading of 14.3 s as a clip with some noise gives it, from the middle of the corpus: a sixth
/// of its bits are the other way round, most of them weak ones. Always the same for equal codes.
Reading sample_reading(const Corpus& corpus);

/// Microseconds that `look_up` takes, the least of `times`.
uint32_t measured_us(int times, const std::function<void()>& look_up);

} // namespace kzcat
