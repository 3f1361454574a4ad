/// @file
/// A trail: the codes of one recording.
#pragma once

#include <cstdint>
#include <vector>

#include "catalogue/model/profile.hpp"

namespace kzcat {

struct Trail {
    Profile profile = Profile::standard;
    uint64_t samples = 0; ///< of the recording, at the working rate
    std::vector<Code> codes;

    double seconds() const { return static_cast<double>(samples) / kWorkingRate; }
    bool operator==(const Trail&) const = default;
};

/// The codes of a recording of `samples`: one for every second frame.
constexpr uint64_t code_count(uint64_t samples)
{
    return samples < kFrameLength ? 0 : (samples - kFrameLength) / kCodeHop + 1;
}

} // namespace kzcat
