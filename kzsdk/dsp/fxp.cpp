/// @file
/// The exported fixed-point operations: shifts, sums, products, comparisons, reciprocals, ratios.
///
/// Values are 32-bit words, double words of two of them, or pairs of a mantissa and an exponent: a
/// signed mantissa m stands for m * 2^(e - 31), an unsigned one for m * 2^(e - 32). Everything is
/// made of 32-bit words and 16 by 16 bit products, as for a processor with nothing wider. Inner
/// loops use the inline forms of fxp_ops.hpp, which take wider products and are bit-identical.
#include "kzsdk/dsp/fxp.h"

#include <array>

#include "kzsdk/kernels/fxp_ops.hpp"

namespace {

using kz::fxp::leading_zeros;
using kz::fxp::magnitude;
using kz::fxp::normalised;
using kz::fxp::Pair;
using kz::fxp::shift_left;
using kz::fxp::shift_right;
using kz::fxp::wrap_add;
using kz::fxp::wrap_negate;
using kz::fxp::wrap_sub;

constexpr uint32_t high_half(uint32_t word) noexcept { return word >> 16; }
constexpr uint32_t low_half(uint32_t word) noexcept { return word & 0xffff; }
constexpr int32_t signed_half(uint32_t half) noexcept { return static_cast<int16_t>(half); }

/// floor(a * half / 2^16), exactly, for a half in the range of 16 bits: the low half of `a` counts
/// as unsigned, and the arithmetic shift takes its product down to the floor.
constexpr int32_t word_times_half(int32_t a, int32_t half) noexcept
{
    const auto low = static_cast<int32_t>(low_half(static_cast<uint32_t>(a)));
    return (a >> 16) * half + ((low * half) >> 16);
}

// A double word is shifted as two words, and the part that crosses the middle is shifted by 32 - n.
// From n = 33 on that count is negative, which shifts everything out: nothing crosses, and the low
// word of a right shift is 0.

template <class Long>
constexpr Long shifted_right(Long x, int32_t n) noexcept
{
    const uint32_t crossing = shift_left(static_cast<uint32_t>(x.hi), wrap_sub(32, n));
    return {.hi = shift_right(x.hi, n), .lo = shift_right(x.lo, n) + crossing};
}

template <class Long>
constexpr Long shifted_left(Long x, int32_t n) noexcept
{
    const uint32_t crossing = shift_right(x.lo, wrap_sub(32, n));
    const uint32_t hi = shift_left(static_cast<uint32_t>(x.hi), n) + crossing;
    return {.hi = static_cast<decltype(x.hi)>(hi), .lo = shift_left(x.lo, n)};
}

/// Left by a count of 0 or more, right by the magnitude of a negative one.
template <class Long>
constexpr Long shifted(Long x, int32_t n) noexcept
{
    return n < 0 ? shifted_right(x, wrap_negate(n)) : shifted_left(x, n);
}

/// The carry comes from the sum of the low 31 bits and the two top bits, which fit in a word.
constexpr FxpUTypeLong sum(FxpUTypeLong a, FxpUTypeLong b) noexcept
{
    const uint32_t low_bits = (a.lo & 0x7fffffff) + (b.lo & 0x7fffffff);
    const uint32_t carry = ((a.lo >> 31) + (b.lo >> 31) + (low_bits >> 31)) >> 1;
    return {.hi = wrap_add(wrap_add(a.hi, b.hi), carry), .lo = wrap_add(a.lo, b.lo)};
}

/// Modulo 2^64: all bits turned, plus 1, which carries only out of a low word of 0.
constexpr FxpUTypeLong negated(FxpUTypeLong x) noexcept
{
    return {.hi = wrap_add(~x.hi, x.lo == 0 ? 1u : 0u), .lo = wrap_sub(0u, x.lo)};
}

constexpr FxpUTypeLong widened(uint32_t word) noexcept { return {.hi = 0, .lo = word}; }

constexpr FxpTypeLong as_signed(FxpUTypeLong x) noexcept
{
    return {.hi = static_cast<int32_t>(x.hi), .lo = x.lo};
}

/// All 64 bits of a product, from four products of halves:
///
///     a * b = (ah * bh * 2^16 + ah * bl + al * bh) * 2^16 + al * bl
constexpr FxpUTypeLong product(uint32_t a, uint32_t b) noexcept
{
    const uint32_t ah = high_half(a);
    const uint32_t al = low_half(a);
    const uint32_t bh = high_half(b);
    const uint32_t bl = low_half(b);
    const FxpUTypeLong cross = sum(widened(ah * bl), widened(bh * al));
    const FxpUTypeLong upper = sum(shifted_left(widened(ah * bh), 16), cross);
    return sum(shifted_left(upper, 16), widened(al * bl));
}

/// The high word of product(). Of the low parts only the carry counts: their upper halves are
/// summed before the last shift, so the result is exact.
constexpr uint32_t product_high(uint32_t a, uint32_t b) noexcept
{
    const uint32_t ah = high_half(a);
    const uint32_t al = low_half(a);
    const uint32_t bh = high_half(b);
    const uint32_t bl = low_half(b);
    const uint32_t middle = high_half(al * bl) + low_half(ah * bl) + low_half(bh * al);
    return ah * bh + high_half(ah * bl) + high_half(bh * al) + high_half(middle);
}

/// Two mantissas that share an exponent.
struct Aligned {
    int32_t first;
    int32_t second;
    int32_t exponent;
};

/// A mantissa shifted down by some octaves. From 31 on it counts as 0, also when it is negative,
/// where the sign fill would make it -1.
constexpr int32_t lowered(int32_t mantissa, uint32_t octaves) noexcept
{
    return octaves < 31 ? mantissa >> octaves : 0;
}

/// Normalises both pairs and brings them to the larger exponent.
constexpr Aligned aligned(Pair a, Pair b) noexcept
{
    a = normalised(a);
    b = normalised(b);
    const int32_t apart = wrap_sub(a.exponent, b.exponent);
    if (apart < 0) {
        return {lowered(a.mantissa, magnitude(apart)), b.mantissa, b.exponent};
    }
    return {a.mantissa, lowered(b.mantissa, magnitude(apart)), a.exponent};
}

/// 1/X in Q31 at the middle of each of the 64 segments of [0.5, 1), to start Newton's iteration.
consteval std::array<uint32_t, 64> reciprocal_seeds() noexcept
{
    std::array<uint32_t, 64> seeds{};
    for (uint32_t i = 0; i < seeds.size(); ++i) {
        seeds[i] = static_cast<uint32_t>((uint64_t{1} << 39) / (2 * i + 129));
    }
    return seeds;
}

constexpr auto kReciprocalSeeds = reciprocal_seeds();
static_assert(kReciprocalSeeds.front() == 0xfe03f80f && kReciprocalSeeds.back() == 0x80808080);

/// 1/X by Newton's iteration, Y <- Y (2 - X Y), three times: from 7 good bits to all of them. X is
/// x / 2^32 in [0.5, 1), the result is Q31. Every step rounds down, so 2^32 is never reached; an x
/// with bit 31 clear gives 0 or a number without meaning.
constexpr uint32_t reciprocal(uint32_t x) noexcept
{
    uint32_t y = kReciprocalSeeds[(x & 0x7fffffff) >> 25];
    for (int step = 0; step < 3; ++step) {
        const uint32_t residue = wrap_sub(0u, product_high(x, y)); // 2 - XY, in units of 2^-31
        y = shift_left(product_high(residue, y), 1);
    }
    return y;
}

} // namespace

// ---- a word times a signed half

FxpType KZDSP_SmulWLo_SW_SL(FxpType a, FxpType b) noexcept
{
    return word_times_half(a, signed_half(low_half(static_cast<uint32_t>(b))));
}

FxpType KZDSP_SmulWHi_SW_SL(FxpType a, FxpType b) noexcept { return word_times_half(a, b >> 16); }

FxpType KZDSP_SmulAddWLo_SW_SL(FxpType a, FxpType b, FxpType acc) noexcept
{
    return wrap_add(KZDSP_SmulWLo_SW_SL(a, b), acc);
}

FxpType KZDSP_SmulAddWHi_SW_SL(FxpType a, FxpType b, FxpType acc) noexcept
{
    return wrap_add(KZDSP_SmulWHi_SW_SL(a, b), acc);
}

// ---- shifts of double words

FxpTypeLong KZDSP_RSHFT_FxpTypeLong(int32_t hi, uint32_t lo, int32_t count) noexcept
{
    return shifted_right(FxpTypeLong{hi, lo}, count);
}

FxpTypeLong KZDSP_LSHFT_FxpTypeLong(int32_t hi, uint32_t lo, int32_t count) noexcept
{
    return shifted_left(FxpTypeLong{hi, lo}, count);
}

FxpTypeLong KZDSP_SHFT_FxpTypeLong(int32_t hi, uint32_t lo, int32_t count) noexcept
{
    return shifted(FxpTypeLong{hi, lo}, count);
}

FxpUTypeLong KZDSP_RSHFT_FxpUTypeLong(uint32_t hi, uint32_t lo, int32_t count) noexcept
{
    return shifted_right(FxpUTypeLong{hi, lo}, count);
}

FxpUTypeLong KZDSP_LSHFT_FxpUTypeLong(uint32_t hi, uint32_t lo, int32_t count) noexcept
{
    return shifted_left(FxpUTypeLong{hi, lo}, count);
}

FxpUTypeLong KZDSP_SHFT_FxpUTypeLong(uint32_t hi, uint32_t lo, int32_t count) noexcept
{
    return shifted(FxpUTypeLong{hi, lo}, count);
}

// ---- sums and differences, all of which wrap

FxpType KZDSP_ADD_FxpType(FxpType a, FxpType b) noexcept { return wrap_add(a, b); }

FxpType KZDSP_SUB_FxpType(FxpType a, FxpType b) noexcept { return wrap_sub(a, b); }

FxpTypeLong KZDSP_ADD_FxpTypeLong(int32_t hi1, uint32_t lo1, int32_t hi2, uint32_t lo2) noexcept
{
    return as_signed(sum({static_cast<uint32_t>(hi1), lo1}, {static_cast<uint32_t>(hi2), lo2}));
}

FxpUTypeLong KZDSP_ADD_FxpUTypeLong(uint32_t hi1, uint32_t lo1, uint32_t hi2, uint32_t lo2) noexcept
{
    return sum({hi1, lo1}, {hi2, lo2});
}

FxpType KZDSP_ALIGNED_SUB_FxpType(FxpType m1, int32_t e1, FxpType m2, int32_t e2,
                                  int32_t* exponent) noexcept
{
    const Aligned pairs = aligned({m1, e1}, {m2, e2});
    *exponent = pairs.exponent;
    return wrap_sub(pairs.first, pairs.second);
}

FxpType KZDSP_MUL_POW2_FxpType(FxpType m, int32_t k) noexcept { return shift_left(m, k); }

// ---- products

// From the magnitudes, negated when the signs differ. Exact for every pair, -2^31 included.
FxpTypeLong KZDSP_SMUL_FxpTypeLong(FxpType a, FxpType b) noexcept
{
    const FxpUTypeLong size = product(magnitude(a), magnitude(b));
    return as_signed((a ^ b) < 0 ? negated(size) : size);
}

FxpUTypeLong KZDSP_UMUL_FxpUTypeLong(FxpUType a, FxpUType b) noexcept { return product(a, b); }

// The upper 64 of 96 bits: the lowest word only carries.
FxpUTypeLong KZDSP_UMUL_FxpUTypeLong2(uint32_t hi, uint32_t lo, FxpUType b) noexcept
{
    return sum(product(hi, b), widened(product_high(lo, b)));
}

// Truncates towards zero, where a shift of the product would round down.
FxpType KZDSP_SMUL_HIGH_FxpType(FxpType a, FxpType b) noexcept
{
    const uint32_t high = product_high(magnitude(a), magnitude(b));
    return static_cast<FxpType>((a ^ b) < 0 ? wrap_sub(0u, high) : high);
}

FxpUType KZDSP_UMUL_HIGH_FxpUType(FxpUType a, FxpUType b) noexcept { return product_high(a, b); }

// ---- magnitudes and bits

FxpType KZDSP_SaturateAbsFxpType(FxpType x) noexcept { return kz::fxp::saturate_abs(x); }

int32_t kz_abs(int32_t x) noexcept { return static_cast<int32_t>(magnitude(x)); }

int32_t KZDSP_CountLeadingZeros(uint32_t x) noexcept { return leading_zeros(x); }

uint32_t KZDSP_clp2(uint32_t x) noexcept { return kz::fxp::next_power_of_two(x); }

// ---- comparisons of pairs

// Different signs decide at once, whatever the exponents; 0 counts as positive.
int32_t KZDSP_LESS_FxpType(FxpType m1, int32_t e1, FxpType m2, int32_t e2) noexcept
{
    if ((m1 ^ m2) < 0) {
        return m1 < m2;
    }
    const Aligned pairs = aligned({m1, e1}, {m2, e2});
    return pairs.first < pairs.second;
}

int32_t KZDSP_LESSEQ_FxpType(FxpType m1, int32_t e1, FxpType m2, int32_t e2) noexcept
{
    if ((m1 ^ m2) < 0) {
        return m1 <= m2;
    }
    const Aligned pairs = aligned({m1, e1}, {m2, e2});
    return pairs.first <= pairs.second;
}

// Unsigned mantissas are normalised to bit 31 and may lie 31 octaves apart before one counts as 0.
int32_t KZDSP_LESS_FxpUType(FxpUType m1, int32_t e1, FxpUType m2, int32_t e2) noexcept
{
    const int32_t spare1 = m1 != 0 ? leading_zeros(m1) : 0;
    const int32_t spare2 = m2 != 0 ? leading_zeros(m2) : 0;
    const uint32_t first = m1 << spare1;
    const uint32_t second = m2 << spare2;
    const int32_t apart = wrap_sub(wrap_sub(e1, spare1), wrap_sub(e2, spare2));
    const uint32_t octaves = magnitude(apart);
    const auto lower = [octaves](uint32_t m) { return octaves < 32 ? m >> octaves : 0; };
    return apart < 0 ? lower(first) < second : first < lower(second);
}

// ---- reciprocals and ratios

FxpUType KZDSP_Reciprocal(FxpUType x) noexcept { return reciprocal(x); }

// The shift normalises x; that of 0 is 32, and its reciprocal 0.
FxpUType KZDSP_ReciprocalWithScaling(FxpUType x, int32_t* shift) noexcept
{
    *shift = leading_zeros(x);
    return reciprocal(shift_left(x, *shift));
}

// Both numbers are normalised; the exponent makes up for the two shifts. The mantissa is a little
// too small at most, as the reciprocal is.
FxpUType KZDSP_UIntRatio_FxpUType(FxpUType a, FxpUType b, int32_t* exponent) noexcept
{
    int32_t b_shift = 0;
    const uint32_t inverse = KZDSP_ReciprocalWithScaling(b, &b_shift);
    const int32_t a_shift = leading_zeros(a);
    *exponent = b_shift - a_shift + 1;
    return product_high(shift_left(a, a_shift), inverse);
}
