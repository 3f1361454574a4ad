/// @file
/// A share that was counted, with its uncertainty.
#pragma once

#include <cstdint>

namespace report {

struct Share {
    double value = 0;
    double low = 0;  ///< the true share lies above this with 97.5 %
    double high = 1; ///< and below this
};

/// Wilson's interval of 95 %. Of nothing, every share is possible: 0 to 1.
Share share_of(uint64_t part, uint64_t whole);

} // namespace report
