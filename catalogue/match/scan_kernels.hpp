/// @file
/// The inner loops of matching: how many bits of codes differ. Every variant gives the same
/// numbers.
#pragma once

#include <cstddef>
#include <cstdint>

#include "catalogue/model/processor.hpp"
#include "catalogue/model/profile.hpp"

namespace kzcat {

/// One code of a sequence, the bits of it that count, and how many codes it lies after the first.
struct Probe {
    Code code;
    Code mask;
    uint64_t offset;
};

/// The most codes a distance may be taken over, so that it fits 16 bits.
constexpr size_t kMostProbes = 1023;

/// The distance at position p is the number of bits in which codes[p + offset] and the probe's code
/// differ where its mask is set, added up over all probes.
struct ScanKernels {
    const char* name;

    /// The distances at positions 0 .. positions - 1.
    void (*distances)(const Code* codes, size_t positions, const Probe* probes, size_t count,
                      uint16_t* out);

    /// Writes the positions below `positions` at which the distance is at most `limit`, in rising
    /// order, and returns how many there are. `out` has room for all.
    size_t (*near)(const Code* codes, size_t positions, const Probe* probes, size_t count,
                   uint32_t limit, uint32_t* out);

    /// The distance of `count` codes from those of a query.
    uint32_t (*distance)(const Code* codes, const Code* query, const Code* masks, size_t count);
};

/// Those of the instruction set that was chosen for this process.
const ScanKernels& scan_kernels();

/// Those of one instruction set, or of the best one below it for which there are any.
const ScanKernels& scan_kernels(Instructions instructions);

} // namespace kzcat
