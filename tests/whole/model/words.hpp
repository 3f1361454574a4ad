/// @file
/// The few 32-bit rules that the model needs, expressed in 64-bit arithmetic.
///
/// The model computes in int64_t, where nothing overflows, and says with word() where the result is
/// kept in 32 bits.
#pragma once

#include <array>
#include <bit>
#include <cstdint>

namespace kz::model {

/// The low 32 bits of a value, read as signed: this is where sums and products wrap.
constexpr int32_t word(int64_t value) { return static_cast<int32_t>(static_cast<uint32_t>(value)); }

constexpr uint32_t unsigned_word(int64_t value) { return static_cast<uint32_t>(value); }

/// Upper half of the product of the magnitudes, with the sign of the product.
constexpr int32_t high_product(int32_t a, int32_t b)
{
    return word(int64_t{a} * b / (int64_t{1} << 32));
}

constexpr int leading_zeros(uint32_t value) { return std::countl_zero(value); }

/// A left shift whose count may be anything: outside 0..31 nothing is left.
constexpr int32_t shifted_left(int32_t value, int count)
{
    return count < 0 || count > 31 ? 0 : word(int64_t{value} * (int64_t{1} << count));
}

/// 2^63 / x in 32 bits, by three Newton steps from a seed of 64 equal segments; x has bit 31 set.
constexpr uint32_t reciprocal(uint32_t x)
{
    const uint64_t segment = (x >> 25) & 63;
    uint64_t y = (uint64_t{1} << 39) / (2 * segment + 129);
    for (int step = 0; step < 3; ++step) {
        const uint64_t t = (x * y) >> 32;
        const uint64_t rest = ((uint64_t{1} << 32) - t) & 0xffffffffu;
        y = (2 * ((rest * y) >> 32)) & 0xffffffffu;
    }
    return static_cast<uint32_t>(y);
}

static_assert(reciprocal(0x80000000) == 0xfffffffe);
static_assert(reciprocal(0xc0000000) == 0xaaaaaaaa);
static_assert(reciprocal(0xffffffff) == 0x80000000);
static_assert(high_product(-1, 1) == 0);

/// The reciprocal of a small integer, its power of two left out: a fraction in [1/4, 1/2) of 2^32
/// (or 1/2 less a little for a power of two); 0 for 0.
constexpr int32_t scaled_reciprocal(uint32_t integer)
{
    return integer == 0 ? 0 : word(reciprocal(integer << leading_zeros(integer)) >> 1);
}

static_assert(scaled_reciprocal(12) == 1431655765);

/// floor(sqrt(value * 2^30)), digit by digit in 32-bit registers. Above 2^30 the remainder can wrap
/// and the result be one less; the first such value is 2^30 + 4.
constexpr uint32_t square_root(uint32_t value)
{
    uint64_t input = value;
    uint64_t remainder = 0;
    uint64_t root = 0;
    for (int digit = 0; digit < 31; ++digit) {
        remainder = (remainder * 4 + (input >> 30)) & 0xffffffffu;
        input = (input * 4) & 0xffffffffu;
        root = (root * 2) & 0xffffffffu;
        const uint64_t trial = (root * 2 + 1) & 0xffffffffu;
        if (remainder >= trial) {
            remainder -= trial;
            root += 1;
        }
    }
    return static_cast<uint32_t>(root);
}

static_assert(square_root(1) == 32768 && square_root(4) == 65536);
static_assert(square_root(1u << 30) == 1u << 30);
static_assert(square_root(1u << 31) == 1518500248);

} // namespace kz::model
