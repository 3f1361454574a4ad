/**
 * @file
 * Fixed-point arithmetic: number types, double words, products, pairs of mantissa and exponent.
 *
 * Mantissa and exponent. Where a word travels with an exponent the pair denotes
 *
 *     signed    m * 2^(e - 31)    the mantissa is a fraction in [-1, 1)
 *     unsigned  m * 2^(e - 32)    the mantissa is a fraction in [0, 1)
 *
 * A signed mantissa is normalised when it is 0 or its two top bits differ, an unsigned one when it
 * is 0 or its top bit is set. Normalising shifts the mantissa left and lowers the exponent by as
 * much. A mantissa of 0 keeps its exponent.
 *
 * Shifts. The shift operations take their count modulo 256; a word shifted by 32 or more becomes 0,
 * or the sign fill in an arithmetic right shift. A negative count is thus a large one and not a
 * shift the other way, unless an operation says so.
 *
 * Overflow. Everything wraps modulo 2^32 (exponents too) or 2^64; KZDSP_SaturateAbsFxpType() alone
 * saturates. No operation fails. An out pointer must not be null.
 *
 * Cost. All operations are made of 32-bit operations and 16 by 16 bit products, so that they run
 * everywhere in the same few instructions; none allocates.
 *
 * Threads: pure functions, callable from anywhere.
 */
#ifndef KZSDK_DSP_FXP_H
#define KZSDK_DSP_FXP_H

#include "kzsdk/abs/base.h"

/** A signed fixed-point value, or the mantissa of a pair. */
typedef int32_t FxpType;

/** An unsigned fixed-point value, or the mantissa of a pair. */
typedef uint32_t FxpUType;

/** A signed 64-bit integer: hi * 2^32 + lo. */
typedef struct FxpTypeLong {
    int32_t hi;  /**< upper half, carries the sign */
    uint32_t lo; /**< lower half */
} FxpTypeLong;

/** An unsigned 64-bit integer: hi * 2^32 + lo. */
typedef struct FxpUTypeLong {
    uint32_t hi; /**< upper half */
    uint32_t lo; /**< lower half */
} FxpUTypeLong;

KZ_C_BEGIN

/* ---- Word times halfword -------------------------------------------------------------------- */

/** floor(a * h / 2^16), h being the low half of @p b taken as signed. Exact. */
KZ_API FxpType KZDSP_SmulWLo_SW_SL(FxpType a, FxpType b) KZ_NOEXCEPT;

/** floor(a * h / 2^16), h being the high half of @p b taken as signed. Exact. */
KZ_API FxpType KZDSP_SmulWHi_SW_SL(FxpType a, FxpType b) KZ_NOEXCEPT;

/** KZDSP_SmulWLo_SW_SL() of @p a and @p b, plus @p acc; the sum wraps. */
KZ_API FxpType KZDSP_SmulAddWLo_SW_SL(FxpType a, FxpType b, FxpType acc) KZ_NOEXCEPT;

/** KZDSP_SmulWHi_SW_SL() of @p a and @p b, plus @p acc; the sum wraps. */
KZ_API FxpType KZDSP_SmulAddWHi_SW_SL(FxpType a, FxpType b, FxpType acc) KZ_NOEXCEPT;

/* ---- Shifts of double words -----------------------------------------------------------------
 * A right shift by n gives lo' = (lo >> n) + (hi << (32 - n)) and hi' = hi >> n; a left shift gives
 * hi' = (hi << n) + (lo >> (32 - n)) and lo' = lo << n: each word shift under the rule above, n
 * modulo 256. So
 *   n = 0          changes nothing;
 *   n = 1 .. 31    is the shift of the 64-bit value;
 *   n = 32         moves one half into the other;
 *   n = 33 .. 255  does NOT move bits over the middle: a right shift gives a low word of 0 and the
 *                  sign fill (or 0) above it, a left shift gives 0. */

/** Arithmetic right shift of a signed double word. */
KZ_API FxpTypeLong KZDSP_RSHFT_FxpTypeLong(int32_t hi, uint32_t lo, int32_t count) KZ_NOEXCEPT;

/** Left shift of a signed double word. */
KZ_API FxpTypeLong KZDSP_LSHFT_FxpTypeLong(int32_t hi, uint32_t lo, int32_t count) KZ_NOEXCEPT;

/** Right shift by -count when @p count is negative, otherwise left shift by @p count. */
KZ_API FxpTypeLong KZDSP_SHFT_FxpTypeLong(int32_t hi, uint32_t lo, int32_t count) KZ_NOEXCEPT;

/** Logical right shift of an unsigned double word. */
KZ_API FxpUTypeLong KZDSP_RSHFT_FxpUTypeLong(uint32_t hi, uint32_t lo, int32_t count) KZ_NOEXCEPT;

/** Left shift of an unsigned double word. */
KZ_API FxpUTypeLong KZDSP_LSHFT_FxpUTypeLong(uint32_t hi, uint32_t lo, int32_t count) KZ_NOEXCEPT;

/** Logical right shift by -count when @p count is negative, otherwise left shift by @p count. */
KZ_API FxpUTypeLong KZDSP_SHFT_FxpUTypeLong(uint32_t hi, uint32_t lo, int32_t count) KZ_NOEXCEPT;

/* ---- Sums and differences ------------------------------------------------------------------- */

/** a + b modulo 2^32. */
KZ_API FxpType KZDSP_ADD_FxpType(FxpType a, FxpType b) KZ_NOEXCEPT;

/** a - b modulo 2^32. */
KZ_API FxpType KZDSP_SUB_FxpType(FxpType a, FxpType b) KZ_NOEXCEPT;

/** Sum of two signed double words modulo 2^64. */
KZ_API FxpTypeLong KZDSP_ADD_FxpTypeLong(int32_t hi1, uint32_t lo1, int32_t hi2,
                                         uint32_t lo2) KZ_NOEXCEPT;

/** Sum of two unsigned double words modulo 2^64. */
KZ_API FxpUTypeLong KZDSP_ADD_FxpUTypeLong(uint32_t hi1, uint32_t lo1, uint32_t hi2,
                                           uint32_t lo2) KZ_NOEXCEPT;

/**
 * Difference of two signed pairs.
 *
 * Both are normalised, then the one with the smaller exponent is shifted right (arithmetically) to
 * the larger exponent; 31 or more places leave 0 of it, also when it is negative.
 *
 * A zero takes part with the exponent it comes with: subtract a zero whose exponent is 31 or more
 * above the other's and nothing is left. The difference of values of opposite sign and like size
 * needs 33 bits and wraps: halve such values first.
 *
 * @param[out] exponent  The larger of the normalised exponents.
 * @return m1 - m2 after alignment, modulo 2^32, not normalised again.
 */
KZ_API FxpType KZDSP_ALIGNED_SUB_FxpType(FxpType m1, int32_t e1, FxpType m2, int32_t e2,
                                         int32_t* exponent) KZ_NOEXCEPT;

/**
 * m << k: bits shifted out are lost, no saturation. k is taken modulo 256; 32 and more give 0, and
 * so do small negative counts.
 */
KZ_API FxpType KZDSP_MUL_POW2_FxpType(FxpType m, int32_t k) KZ_NOEXCEPT;

/* ---- Products ------------------------------------------------------------------------------- */

/** The exact signed product. */
KZ_API FxpTypeLong KZDSP_SMUL_FxpTypeLong(FxpType a, FxpType b) KZ_NOEXCEPT;

/** The exact unsigned product. */
KZ_API FxpUTypeLong KZDSP_UMUL_FxpUTypeLong(FxpUType a, FxpUType b) KZ_NOEXCEPT;

/** floor((hi * 2^32 + lo) * b / 2^32): the upper 64 of the product's 96 bits. */
KZ_API FxpUTypeLong KZDSP_UMUL_FxpUTypeLong2(uint32_t hi, uint32_t lo, FxpUType b) KZ_NOEXCEPT;

/**
 * High word of a signed product: the sign of a * b times floor(|a| * |b| / 2^32).
 *
 * Truncates towards zero, so (-1, 1) gives 0 and not -1. Two Q31 factors give a Q30 product, which
 * callers double for Q31.
 */
KZ_API FxpType KZDSP_SMUL_HIGH_FxpType(FxpType a, FxpType b) KZ_NOEXCEPT;

/** High word of an unsigned product: floor(a * b / 2^32). */
KZ_API FxpUType KZDSP_UMUL_HIGH_FxpUType(FxpUType a, FxpUType b) KZ_NOEXCEPT;

/* ---- Magnitudes and bits -------------------------------------------------------------------- */

/** |x|; -2^31 gives 2^31 - 1. */
KZ_API FxpType KZDSP_SaturateAbsFxpType(FxpType x) KZ_NOEXCEPT;

/** |x|; -2^31 stays -2^31. */
KZ_API int32_t kz_abs(int32_t x) KZ_NOEXCEPT;

/** Number of zero bits above the topmost set bit; 32 for 0. */
KZ_API int32_t KZDSP_CountLeadingZeros(uint32_t x) KZ_NOEXCEPT;

/** The smallest power of two that is not below @p x; 0 for 0 and for x above 2^31. */
KZ_API uint32_t KZDSP_clp2(uint32_t x) KZ_NOEXCEPT;

/* ---- Comparison of pairs --------------------------------------------------------------------
 * Each returns 1 or 0. Two mantissas of different sign are compared as they are, whatever their
 * exponents. Otherwise both pairs are normalised and the one with the smaller exponent is shifted
 * right to the larger: 31 or more places (32 unsigned) leave 0 of it, also of a negative one, so a
 * value far smaller in magnitude compares as zero. A zero takes part with the exponent it comes
 * with, so against a zero with a large exponent small values compare as zero too. */

/** m1 * 2^e1 < m2 * 2^e2 for signed pairs. */
KZ_API int32_t KZDSP_LESS_FxpType(FxpType m1, int32_t e1, FxpType m2, int32_t e2) KZ_NOEXCEPT;

/** m1 * 2^e1 <= m2 * 2^e2 for signed pairs. */
KZ_API int32_t KZDSP_LESSEQ_FxpType(FxpType m1, int32_t e1, FxpType m2, int32_t e2) KZ_NOEXCEPT;

/** m1 * 2^e1 < m2 * 2^e2 for unsigned pairs. */
KZ_API int32_t KZDSP_LESS_FxpUType(FxpUType m1, int32_t e1, FxpUType m2, int32_t e2) KZ_NOEXCEPT;

/* ---- Reciprocal, ratio, logarithm ----------------------------------------------------------- */

/**
 * Reciprocal of a normalised unsigned fraction, by three Newton steps from a table of 64 seeds.
 *
 * @param x  X = x / 2^32 in [0.5, 1): bit 31 must be set, else the result means nothing. 0 gives 0.
 * @return 1/X in unsigned Q31 (result / 2^31), less than 2 units of the last place above the true
 *         value and at most 2 below it.
 */
KZ_API FxpUType KZDSP_Reciprocal(FxpUType x) KZ_NOEXCEPT;

/**
 * Reciprocal of any unsigned word.
 *
 * @param[out] shift  Leading zeros of @p x, by which it is shifted before it is inverted; 32 for 0.
 * @return r with 1 / x = r * 2^(shift - 63); 0 for 0.
 */
KZ_API FxpUType KZDSP_ReciprocalWithScaling(FxpUType x, int32_t* shift) KZ_NOEXCEPT;

/**
 * Ratio of two unsigned integers.
 *
 * @param[out] exponent  Exponent of the result.
 * @return Mantissa of a / b as an unsigned pair, within 3 units of the last place, not always
 *         normalised; 0 when a or b is 0.
 */
KZ_API FxpUType KZDSP_UIntRatio_FxpUType(FxpUType a, FxpUType b, int32_t* exponent) KZ_NOEXCEPT;

/**
 * Natural logarithm of an unsigned pair.
 *
 * The error stays below 2e-8 times the larger of 1 and the logarithm's magnitude: log2 of the
 * mantissa is a quadratic on each of 128 segments. The logarithm of 1 is not exactly 0.
 *
 * @param mantissa  Not 0, else the result is finite and means nothing. Need not be normalised.
 * @param exponent  Exponent of @p mantissa.
 * @param[out] out_exponent  Exponent of the result.
 * @return Mantissa of the logarithm as a normalised signed pair.
 */
KZ_API FxpType kzlog_fixed(FxpUType mantissa, int32_t exponent, int32_t* out_exponent) KZ_NOEXCEPT;

KZ_C_END

#endif
