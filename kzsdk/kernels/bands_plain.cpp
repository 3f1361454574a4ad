/// @file
/// The last steps of a fixed-point frame, one word at a time: a gain ramp and sums of squares.
/// Words are spectrum bins in the transform's scale; gains are in the format of the caller, of
/// which a quarter of the product's upper half is kept. Sums of squares are modulo 2^64.

#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/plain.hpp"

namespace kz::kernels::plain {

using namespace fxp;

void apply_ramp(int32_t* words, uint32_t count, int32_t gain, int32_t step) noexcept
{
    for (uint32_t i = 0; i < count; ++i) {
        words[i] = shift_left(smul_high(words[i], gain), 2);
        gain = wrap_add(gain, step);
    }
}

uint64_t sum_squares(const int32_t* words, uint32_t count) noexcept
{
    uint64_t sum = 0;
    for (uint32_t i = 0; i < count; ++i) {
        sum += static_cast<uint64_t>(smul(words[i], words[i])) >> 16;
    }
    return sum;
}

} // namespace kz::kernels::plain
