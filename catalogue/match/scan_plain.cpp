/// @file
/// The inner loops in plain C++: they define the results.

#include "catalogue/match/scan_variants.hpp"

namespace kzcat {
namespace {

/// Set bits, counted in fields of 2, 4 and 8 bits side by side: processors without an instruction
/// for it would otherwise look up a table for every byte.
uint32_t bits_of(uint64_t x)
{
    x -= (x >> 1) & 0x5555555555555555U;
    x = (x & 0x3333333333333333U) + ((x >> 2) & 0x3333333333333333U);
    x = (x + (x >> 4)) & 0x0F0F0F0F0F0F0F0FU;
    return static_cast<uint32_t>((x * 0x0101010101010101U) >> 56);
}

uint32_t distance_at(const Code* codes, const Probe* probes, size_t count)
{
    uint32_t sum = 0;
    for (size_t i = 0; i < count; ++i) {
        sum += bits_of((codes[probes[i].offset] ^ probes[i].code) & probes[i].mask);
    }
    return sum;
}

void distances(const Code* codes, size_t positions, const Probe* probes, size_t count,
               uint16_t* out)
{
    for (size_t p = 0; p < positions; ++p) {
        out[p] = static_cast<uint16_t>(distance_at(codes + p, probes, count));
    }
}

size_t near(const Code* codes, size_t positions, const Probe* probes, size_t count, uint32_t limit,
            uint32_t* out)
{
    size_t found = 0;
    for (size_t p = 0; p < positions; ++p) {
        if (distance_at(codes + p, probes, count) <= limit) {
            out[found++] = static_cast<uint32_t>(p);
        }
    }
    return found;
}

uint32_t distance(const Code* codes, const Code* query, const Code* masks, size_t count)
{
    uint32_t sum = 0;
    for (size_t i = 0; i < count; ++i) {
        sum += bits_of((codes[i] ^ query[i]) & masks[i]);
    }
    return sum;
}

} // namespace

constinit const ScanKernels kPlainScan{"plain", distances, near, distance};

} // namespace kzcat
