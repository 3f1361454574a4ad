/**
 * @file
 * Dot products of samples and taps.
 *
 * All of them walk the samples backwards, from the newest on: `samples[0]`, `samples[-1]`, ...,
 * and the taps forwards: `taps[0]`, `taps[stride]`, ... A float sum is kept in single precision and
 * rounded after each product and each addition, in that order, on every processor.
 *
 * Order of two runs. They are given in the order of the walk: `first` is the newer run, `second`
 * the older one. (The two pieces of a frame, in qvfixed.h and qvfloat.h, are given in the order of
 * time: there `first` is the older one.)
 *
 * A count of 0 reads nothing. Where there are samples but the samples or the taps are null, nothing
 * is read and the sum stays as it began.
 *
 * Threads: pure functions.
 */
#ifndef KZSDK_DSP_CONVOLVE_H
#define KZSDK_DSP_CONVOLVE_H

#include "kzsdk/abs/base.h"
#include "kzsdk/dsp/fxp.h"

KZ_C_BEGIN

/**
 * The sum over k < count of samples[-k] * taps[k * stride].
 *
 * @param samples  The newest sample; `count` - 1 older ones lie before it.
 * @param stride   Distance from one tap to the next; 0 uses the first tap throughout.
 */
KZ_API float KZDSP_Convolve(const float* samples, const float* taps, uint32_t count,
                            uint32_t stride) KZ_NOEXCEPT;

/** KZDSP_Convolve() with stride 1. */
KZ_API float KZDSP_ConvolveSimple(const float* samples, const float* taps,
                                  uint32_t count) KZ_NOEXCEPT;

/** KZDSP_Convolve() that begins with @p sum in place of 0 and adds its products one by one. */
KZ_API float KZDSP_ConvolveMore(const float* samples, const float* taps, uint32_t count,
                                uint32_t stride, float sum) KZ_NOEXCEPT;

/**
 * One sum over two runs of samples, the newer run first; the taps run on through both.
 *
 * @param first   Newest sample of the newer run.
 * @param second  Newest sample of the older run.
 */
KZ_API float KZDSP_DualConvolve(const float* first, uint32_t first_count, const float* second,
                                uint32_t second_count, const float* taps,
                                uint32_t stride) KZ_NOEXCEPT;

/**
 * KZDSP_DualConvolve() in fixed point.
 *
 * Each product of a sample and a Q31 tap is exact; its bits from 32 - @p shift up are added, modulo
 * 2^32. The result has the samples' scale for shift 1, half of it for shift 0.
 *
 * @param first         Newest sample of the newer run.
 * @param second        Newest sample of the older run. A run of no samples may be null.
 * @param msb, lsb      Halves of the first tap.
 * @param stride        Distance from one tap to the next.
 * @param shift         0 .. 31, taken modulo 256. (32 adds the low words; more adds nothing.)
 * @return The sum; 0 when there are samples but a table or an array is null.
 */
KZ_API FxpType KZDSP_DualConvolveFixed(const FxpType* first, uint32_t first_count,
                                       const FxpType* second, uint32_t second_count,
                                       const int16_t* msb, const uint16_t* lsb, uint32_t stride,
                                       int32_t shift) KZ_NOEXCEPT;

KZ_C_END

#endif
