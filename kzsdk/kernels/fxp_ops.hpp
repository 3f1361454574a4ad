/// @file
/// The few functions in which fixed-point code wraps, shifts and multiplies.
///
/// All fixed-point arithmetic of the library is modulo 2^32. It is written here, through unsigned
/// words, so that no caller meets signed overflow or a shift that the language leaves undefined.
/// The inner loops use these forms; the exported operations of fxp.h are built from 32-bit
/// operations alone and give the same words, which fxp_test.cpp shows.
#pragma once

#include <bit>
#include <cstdint>

namespace kz::fxp {

constexpr uint32_t wrap_add(uint32_t a, uint32_t b) noexcept { return a + b; }

constexpr uint32_t wrap_sub(uint32_t a, uint32_t b) noexcept { return a - b; }

constexpr uint32_t wrap_mul(uint32_t a, uint32_t b) noexcept { return a * b; }

constexpr int32_t wrap_add(int32_t a, int32_t b) noexcept
{
    return static_cast<int32_t>(wrap_add(static_cast<uint32_t>(a), static_cast<uint32_t>(b)));
}

constexpr int32_t wrap_sub(int32_t a, int32_t b) noexcept
{
    return static_cast<int32_t>(wrap_sub(static_cast<uint32_t>(a), static_cast<uint32_t>(b)));
}

constexpr int32_t wrap_mul(int32_t a, int32_t b) noexcept
{
    return static_cast<int32_t>(wrap_mul(static_cast<uint32_t>(a), static_cast<uint32_t>(b)));
}

constexpr int32_t wrap_negate(int32_t a) noexcept { return wrap_sub(0, a); }

/// |a| as an unsigned word; -2^31 gives 2^31.
constexpr uint32_t magnitude(int32_t a) noexcept
{
    return a < 0 ? wrap_sub(0u, static_cast<uint32_t>(a)) : static_cast<uint32_t>(a);
}

/// Shifts by a count that is taken modulo 256, as the ARM's register shifts do: 32 and more give 0,
/// and so does a negative count.
constexpr uint32_t shift_left(uint32_t word, int32_t count) noexcept
{
    const auto n = static_cast<uint8_t>(count);
    return n < 32 ? word << n : 0;
}

constexpr int32_t shift_left(int32_t word, int32_t count) noexcept
{
    return static_cast<int32_t>(shift_left(static_cast<uint32_t>(word), count));
}

/// Logical right shift under the same rule.
constexpr uint32_t shift_right(uint32_t word, int32_t count) noexcept
{
    const auto n = static_cast<uint8_t>(count);
    return n < 32 ? word >> n : 0;
}

/// Arithmetic right shift under the same rule; 32 and more give the sign fill.
constexpr int32_t shift_right(int32_t word, int32_t count) noexcept
{
    const auto n = static_cast<uint8_t>(count);
    return word >> (n < 32 ? n : 31);
}

constexpr int32_t leading_zeros(uint32_t word) noexcept { return std::countl_zero(word); }

/// Exact signed product.
constexpr int64_t smul(int32_t a, int32_t b) noexcept { return static_cast<int64_t>(a) * b; }

/// floor(a * b / 2^32).
constexpr uint32_t umul_high(uint32_t a, uint32_t b) noexcept
{
    return static_cast<uint32_t>((static_cast<uint64_t>(a) * b) >> 32);
}

/// The sign of a*b times floor(|a|*|b| / 2^32): truncates towards zero, so smul_high(-1, 1) is 0
/// where an arithmetic shift would give -1. Two Q31 factors give a Q30 product.
constexpr int32_t smul_high(int32_t a, int32_t b) noexcept
{
    const uint32_t high = umul_high(magnitude(a), magnitude(b));
    return static_cast<int32_t>((a ^ b) < 0 ? wrap_sub(0u, high) : high);
}

/// The low 32 bits of a 64-bit value.
constexpr int32_t low_word(int64_t value) noexcept
{
    return static_cast<int32_t>(static_cast<uint32_t>(static_cast<uint64_t>(value)));
}

/// |a|; -2^31 gives 2^31 - 1.
constexpr int32_t saturate_abs(int32_t a) noexcept
{
    const uint32_t size = magnitude(a);
    return static_cast<int32_t>(size - (size >> 31));
}

/// The smallest power of two that is not below `word`; 0 for 0 and above 2^31.
constexpr uint32_t next_power_of_two(uint32_t word) noexcept
{
    const uint32_t below = wrap_sub(word, 1u);
    return shift_left(uint32_t{1}, 32 - leading_zeros(below));
}

/// A signed mantissa with its exponent: mantissa * 2^(exponent - 31).
struct Pair {
    int32_t mantissa;
    int32_t exponent;
};

/// Shifts the mantissa left until its two top bits differ. A zero keeps its exponent.
constexpr Pair normalised(Pair pair) noexcept
{
    if (pair.mantissa == 0) {
        return pair;
    }
    const int32_t m = pair.mantissa;
    const int32_t spare = leading_zeros(static_cast<uint32_t>(m < 0 ? ~m : m)) - 1;
    return {shift_left(m, spare), wrap_sub(pair.exponent, spare)};
}

} // namespace kz::fxp
