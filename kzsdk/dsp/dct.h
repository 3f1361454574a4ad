/**
 * @file
 * Discrete cosine transform, type II, in place. A call needs up to 100 KB of stack.
 */
#ifndef KZSDK_DSP_DCT_H
#define KZSDK_DSP_DCT_H

#include "kzsdk/abs/base.h"

KZ_C_BEGIN

/** A fixed-point transform of one length. Read it, do not change it. */
typedef struct KZDSP_DCT_fixed {
    int32_t order;               /**< base-2 logarithm of the length */
    uint32_t length;             /**< L: 16384 or 32768 points */
    const int32_t* coefficients; /**< L butterfly factors; entry 0 is not used */
    uint32_t owns_coefficients;  /**< 0: the factors are constants; else destroying frees them */
} KZDSP_DCT_fixed;

/**
 * Makes a transform of 2^@p order points.
 *
 * @param order  14 or 15.
 * @return The transform, which the caller frees with KZDSP_DCT_fixed_destroy(); null for any other
 *         order or when memory is short.
 */
KZ_API KZDSP_DCT_fixed* KZDSP_DCT_fixed_create(int32_t order) KZ_NOEXCEPT;

/** Frees a transform; null is ignored. */
KZ_API void KZDSP_DCT_fixed_destroy(KZDSP_DCT_fixed* dct) KZ_NOEXCEPT;

/**
 * Transforms the L words of @p data in place. Nothing happens when a pointer is null.
 *
 * With x the input, the output is
 *
 *     X[k] = (4 / L) sum over n of x[n] cos(pi (2n + 1) k / (2L))   for k >= 1
 *     X[0] = (sum of x / L) * 185363 / 2^32
 *
 * less the roundings of log2(L) stages. Products are rounded towards minus infinity and sums
 * gather that: low bins carry a bias of up to about L/2 (bin 1 the most), which is part of the
 * result.
 *
 * Scaling:  no headroom is taken: the sum of any L / 2^s inputs that a stage adds must fit 32 bits,
 *           else it wraps. Inputs below 2^31 / L in magnitude never wrap.
 * Threads:  a transform holds no state of a call and may be shared.
 *
 * @param data  L words.
 * @param mode  Accepted and ignored.
 */
KZ_API void KZDSP_DCT_fixed_compute(const KZDSP_DCT_fixed* dct, int32_t* data,
                                    int32_t mode) KZ_NOEXCEPT;

/** A floating-point transform of one length. Read it, do not change it. */
typedef struct KZDSP_DCT {
    int32_t order;              /**< base-2 logarithm of the length */
    uint32_t length;            /**< L */
    const float* coefficients;  /**< L butterfly factors; entry 0 is 0 and not used */
    uint32_t owns_coefficients; /**< 0 for a constant table, 1 for one made at creation */
} KZDSP_DCT;

/**
 * Makes a transform of 2^@p order points. Up to order 15 the factors are constants of the library;
 * above, one cosine per point is computed here.
 *
 * @param order  1 .. 29; factors of its own take 4 * 2^order bytes.
 * @return The transform, which the caller frees with KZDSP_DestroyDCT(); null for any other order
 *         (from 30 on the factors would not fit a 32-bit size) or when memory is short.
 */
KZ_API KZDSP_DCT* KZDSP_CreateDCT(int32_t order) KZ_NOEXCEPT;

/** Frees a transform; null is ignored. */
KZ_API void KZDSP_DestroyDCT(KZDSP_DCT* dct) KZ_NOEXCEPT;

/**
 * Transforms the L values of @p data in place. Nothing happens when a pointer is null.
 *
 * With x the input, the output is
 *
 *     X[k] = sum over n of x[n] cos(pi (2n + 1) k / (2L))   for k >= 1
 *     X[0] = (sum of x) / sqrt(2)
 *
 * in single precision, with one rounding per butterfly and addition.
 *
 * Scaling:  none but the above; with @p normalise every X[k] is multiplied by 2 / L. NaN and
 *           infinities spread over the output.
 * Threads:  a transform holds no state of a call and may be shared.
 *
 * @param data       L values.
 * @param normalise  0, or anything else to normalise.
 */
KZ_API void KZDSP_ComputeDCT(const KZDSP_DCT* dct, float* data, int32_t normalise) KZ_NOEXCEPT;

KZ_C_END

#endif
