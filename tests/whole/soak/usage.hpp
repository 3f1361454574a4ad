/// @file
/// What the process holds of the machine.
#pragma once

#include <cstdint>

namespace kz::soak {

struct Usage {
    uint64_t resident_kibibytes = 0;
    uint64_t threads = 0;
    uint64_t descriptors = 0;
};

Usage usage_now();

} // namespace kz::soak
