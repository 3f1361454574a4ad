/// @file
/// The integer square root of the fixed-point frame manager: floor(sqrt(value * 2^30)).
///
/// Where the value has 2n fraction bits, the root has n + 15. Above 2^30 the remainder may wrap,
/// and the root can then be one too small.
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/qvfixed/qvfixed.h"

using kz::fxp::shift_left;

// The bit-pair method, one bit of the root in each round. Two bits of the value enter the remainder
// from above; after 16 rounds the value is used up and zeros follow, which multiplies it by 2^30.
// All three registers wrap.
uint32_t sq_root(uint32_t value) noexcept
{
    uint32_t remainder = 0;
    uint32_t root = 0;
    for (int round = 0; round < 31; ++round) {
        remainder = shift_left(remainder, 2) | (value >> 30);
        value = shift_left(value, 2);
        root <<= 1;
        const uint32_t trial = (root << 1) + 1;
        if (remainder >= trial) {
            remainder -= trial;
            ++root;
        }
    }
    return root;
}
