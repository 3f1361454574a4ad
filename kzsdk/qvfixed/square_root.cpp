#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/qvfixed/qvfixed.h"

using kz::fxp::shift_left;

// The bit-pair method on 32-bit registers, all of which wrap: two bits of the value enter the
// remainder in each round, and zeros once the value is used up, which makes it the root of
// value * 2^30.
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
