/**
 * @file
 * Sample-rate conversion to the working rate.
 *
 * A resampler takes a mono stream block by block and keeps the tail of the input that later outputs
 * still need. It is a polyphase filter: with L the up and M the down factor of the ratio, each
 * output is one dot product of the newest P samples with every L-th tap of a low-pass prototype.
 *
 * Threads: one thread per resampler at a time; the tables are constants and shared. A call needs up
 * to 100 KB of stack.
 */
#ifndef KZSDK_DSP_RESAMPLER_H
#define KZSDK_DSP_RESAMPLER_H

#include "kzsdk/abs/base.h"
#include "kzsdk/dsp/convolve.h"
#include "kzsdk/dsp/fxp.h"

KZ_C_BEGIN

/** A fixed-point resampler. Read it, do not change it. */
typedef struct KZDSP_resampler_fixed {
    uint32_t up;             /**< L */
    uint32_t down;           /**< M */
    uint32_t taps_per_phase; /**< P; 0 when samples are only copied */
    uint32_t length;         /**< taps of the prototype, a multiple of L; 0 when copying */
    const uint16_t* lsb;     /**< low halves of the taps */
    const int16_t* msb;      /**< high halves of the taps */
    uint32_t phase;          /**< 0 .. L - 1 */
    FxpType* history;        /**< owned; room for P samples */
    uint32_t history_start;  /**< oldest sample still needed */
    uint32_t history_end;    /**< samples stored */
} KZDSP_resampler_fixed;

/**
 * Makes a resampler between two rates, of which fractions of a hertz are dropped.
 *
 * @param input_rate   Q15: hertz times 32768. 8000, 16000, 22050, 24000, 32000, 44100 or 48000 Hz.
 * @param output_rate  Q15: 11025 Hz. Two further pairs exist: 2 and 1 "Hz", which halves any
 *                     rate, and equal rates, which copy.
 * @return The resampler, which the caller frees with KZDSP_resampler_fixed_destroy(); null for a
 *         rate of 0, any other pair, or when memory is short.
 */
KZ_API KZDSP_resampler_fixed* KZDSP_resampler_fixed_create(uint32_t input_rate,
                                                           uint32_t output_rate) KZ_NOEXCEPT;

/** Frees a resampler; null is ignored. */
KZ_API void KZDSP_resampler_fixed_destroy(KZDSP_resampler_fixed* resampler) KZ_NOEXCEPT;

/**
 * Starts a new stream: phase 0, and a history of zeros half a filter long, so that the first
 * outputs are centred on the first inputs. Null is ignored.
 */
KZ_API void KZDSP_resampler_fixed_reset(KZDSP_resampler_fixed* resampler) KZ_NOEXCEPT;

/**
 * The outputs that @p count more inputs yield at most: count * L / M, truncated.
 *
 * @return 0 for a null resampler; 2^32 - 1 where the number does not fit.
 */
KZ_API uint32_t KZDSP_resampler_fixed_compute_resampled_length(
    const KZDSP_resampler_fixed* resampler, uint32_t count) KZ_NOEXCEPT;

/**
 * The inputs that @p count outputs need: (count * M + L - 1) / L, truncated.
 *
 * @return 0 for a null resampler; 2^32 - 1 where the number does not fit.
 */
KZ_API uint32_t KZDSP_resampler_fixed_compute_raw_length(const KZDSP_resampler_fixed* resampler,
                                                         uint32_t count) KZ_NOEXCEPT;

/**
 * Resamples one block.
 *
 * A stream may be cut into blocks of any length, with any capacities: no sample is lost or repeated
 * and the number of outputs does not change. The words do not depend on the cuts at equal rates. At
 * other rates an output is made by one of two rounding rules, depending on whether its window
 * reaches into an earlier block:
 *
 * - across a cut each product is rounded down on its own, from all its bits;
 * - inside a block products are formed from 16-bit halves without low times low, and at 22050 and
 *   44100 Hz from the sum of the two samples that share a tap.
 *
 * So a cut may change an output by up to 2 units in the last place per tap: at most 2 * P, upwards
 * only, for L > 1; 22 units either way at 22050 Hz and for halving, 62 at 44100 Hz. This holds as
 * long as the 32-bit sum of the two cross products in the second rule does not wrap. It can wrap
 * for down-mixed stereo near full scale at 8000, 16000, 22050 and 44100 Hz; an output then moves by
 * a multiple of 2^17 (L > 1) or 2^16.
 *
 * Timing: the phase advances before the taps are read and the window moves after, which places each
 * output up to one input sample beside its ideal time.
 *
 * Scaling:  22050 and 44100 Hz and halving leave at half level (-6 dB), 8000 Hz at 0.688 of full
 *           level, other rates at full level. Sums wrap at 32 bits; nothing saturates.
 * Cost:     one product per tap of a phase for each output. Never allocates.
 *
 * @param input           `input_count` mono samples, Q29 or Q30.
 * @param output          Room for `output_capacity` samples, apart from `input`.
 * @param[out] consumed   Samples taken, 0 .. `input_count`. Offer the rest again.
 * @param[out] produced   Samples written, 0 .. `output_capacity`.
 *
 * A null resampler takes and writes nothing; a null array counts as one of no samples; a null count
 * is not written.
 */
KZ_API void KZDSP_resampler_fixed_resample(KZDSP_resampler_fixed* resampler, const FxpType* input,
                                           uint32_t input_count, FxpType* output,
                                           uint32_t output_capacity, uint32_t* consumed,
                                           uint32_t* produced) KZ_NOEXCEPT;

/** A floating-point resampler. Read it, do not change it. */
typedef struct KZDSP_resampler {
    uint32_t up;             /**< L */
    uint32_t down;           /**< M */
    uint32_t taps_per_phase; /**< P; 0 when samples are only copied */
    uint32_t length;         /**< taps of the prototype, a multiple of L; 0 when copying */
    const float* taps;       /**< the prototype */
    uint32_t owns_taps;      /**< 1 when it was made for this resampler, 0 for a stored one */
    uint32_t phase;          /**< 0 .. L - 1 */
    float* history;          /**< owned; room for P samples */
    uint32_t history_start;  /**< oldest sample still needed */
    uint32_t history_end;    /**< samples stored */
} KZDSP_resampler;

/** The largest up or down factor for which KZDSP_CreateResampler() designs a filter. */
#define KZDSP_LARGEST_FACTOR UINT32_C(0x100000)

/**
 * Makes a resampler between any two rates.
 *
 * The quotient of the rates, in single precision, becomes L / M by KZDSP_Rationalize() to one part
 * in a million. Decimation by 2 and by 4 uses a stored filter; equal rates copy; for every other
 * ratio the resampler gets a Hamming-windowed sinc of 20 max(L, M) + 1 taps: a copy at the ratios
 * of the fixed-point resampler, else designed here, which takes a sine and a cosine for every
 * second tap.
 *
 * @param input_rate   Hertz, finite and above 0.
 * @param output_rate  Hertz, finite and above 0.
 * @return The resampler, which the caller frees with KZDSP_DestroyResampler(). Null for any other
 *         rate, for a quotient that is 0 or infinite in single precision, and when memory is short.
 *         A ratio with L or M above KZDSP_LARGEST_FACTOR counts as short of memory: its filter
 *         would take more than 88 MB. The tolerance keeps both below a million or so, whatever the
 *         rates, unless one is about a million times the other.
 */
KZ_API KZDSP_resampler* KZDSP_CreateResampler(float input_rate, float output_rate) KZ_NOEXCEPT;

/** Frees a resampler; null is ignored. */
KZ_API void KZDSP_DestroyResampler(KZDSP_resampler* resampler) KZ_NOEXCEPT;

/**
 * Starts a new stream: phase 0, and a history of zeros half a filter long, so that the first
 * outputs are centred on the first inputs. Null is ignored.
 */
KZ_API void KZDSP_ResetResampler(KZDSP_resampler* resampler) KZ_NOEXCEPT;

/**
 * The outputs that @p count more inputs yield at most: count * L / M, truncated.
 *
 * @return 0 for a null resampler; 2^32 - 1 where the number does not fit.
 */
KZ_API uint32_t KZDSP_ComputeResampledLength(const KZDSP_resampler* resampler,
                                             uint32_t count) KZ_NOEXCEPT;

/**
 * The inputs that @p count outputs need: (count * M + L - 1) / L, truncated.
 *
 * @return 0 for a null resampler; 2^32 - 1 where the number does not fit.
 */
KZ_API uint32_t KZDSP_ComputeRawLength(const KZDSP_resampler* resampler,
                                       uint32_t count) KZ_NOEXCEPT;

/**
 * Resamples one block.
 *
 * A stream may be cut into blocks of any length, with any capacities: the output is the same to the
 * bit. Every output is one sum over P samples, newest first, rounded to single precision after each
 * product and each addition.
 *
 * Timing: as in KZDSP_resampler_fixed_resample(), of which every call consumes and produces the
 * same counts at the rates that it supports.
 *
 * Scaling:  full level at every rate, 22050 and 44100 Hz included; upsampling gains L / M, so
 *           8000 Hz comes out at 1.376 times full level.
 * Cost:     one product per tap of a phase for each output. Never allocates.
 *
 * @param input           `input_count` mono samples. NaN and infinities reach the outputs whose
 *                        windows hold them, no other.
 * @param output          Room for `output_capacity` samples, apart from `input`.
 * @param[out] consumed   Samples taken, 0 .. `input_count`. Offer the rest again.
 * @param[out] produced   Samples written, 0 .. `output_capacity`.
 *
 * A null resampler takes and writes nothing; a null array counts as one of no samples; a null count
 * is not written.
 */
KZ_API void KZDSP_Resample(KZDSP_resampler* resampler, const float* input, uint32_t input_count,
                           float* output, uint32_t output_capacity, uint32_t* consumed,
                           uint32_t* produced) KZ_NOEXCEPT;

/**
 * Finds a fraction near @p x: the first convergent of its continued fraction, with every term
 * rounded to nearest, that is closer than the tolerance.
 *
 *     within the tolerance of 1 or -1    1 / 1 or -1 / 1
 *     closer to 0 than the tolerance     0 / 0
 *     nothing found in 64 terms          0 / 0 (NaN, infinities, a tolerance of 0 or NaN)
 *
 * A tolerance of 0 still finds a fraction whose continued fraction ends exactly, such as 0.25.
 *
 * @param[out] numerator    Carries the sign of @p x. Saturates at the ends of its range.
 * @param[out] denominator  0 or more. Saturates. A null result is not written.
 * @param tolerance         Largest distance, exclusive; its sign does not matter.
 */
KZ_API void KZDSP_Rationalize(double x, int32_t* numerator, int32_t* denominator,
                              double tolerance) KZ_NOEXCEPT;

/*
 * The prototypes of the seven rates: high halves, low halves (tap i is msb[i] * 65536 + lsb[i],
 * Q31) and number of taps. The tables are constants of the library.
 */
/** High halves of the taps for 8000 Hz. */
KZ_API const int16_t* kzdsp_get_8000_11025_fixed_coeff_msb(void) KZ_NOEXCEPT;
/** Low halves of the taps for 8000 Hz. */
KZ_API const uint16_t* kzdsp_get_8000_11025_fixed_coeff_lsb(void) KZ_NOEXCEPT;
/** Number of taps for 8000 Hz. */
KZ_API uint32_t kzdsp_get_8000_11025_fixed_coeff_length(void) KZ_NOEXCEPT;
/** High halves of the taps for 16000 Hz. */
KZ_API const int16_t* kzdsp_get_16000_11025_fixed_coeff_msb(void) KZ_NOEXCEPT;
/** Low halves of the taps for 16000 Hz. */
KZ_API const uint16_t* kzdsp_get_16000_11025_fixed_coeff_lsb(void) KZ_NOEXCEPT;
/** Number of taps for 16000 Hz. */
KZ_API uint32_t kzdsp_get_16000_11025_fixed_coeff_length(void) KZ_NOEXCEPT;
/** High halves of the taps for 22050 Hz. */
KZ_API const int16_t* kzdsp_get_22050_11025_fixed_coeff_msb(void) KZ_NOEXCEPT;
/** Low halves of the taps for 22050 Hz. */
KZ_API const uint16_t* kzdsp_get_22050_11025_fixed_coeff_lsb(void) KZ_NOEXCEPT;
/** Number of taps for 22050 Hz. */
KZ_API uint32_t kzdsp_get_22050_11025_fixed_coeff_length(void) KZ_NOEXCEPT;
/** High halves of the taps for 24000 Hz. */
KZ_API const int16_t* kzdsp_get_24000_11025_fixed_coeff_msb(void) KZ_NOEXCEPT;
/** Low halves of the taps for 24000 Hz. */
KZ_API const uint16_t* kzdsp_get_24000_11025_fixed_coeff_lsb(void) KZ_NOEXCEPT;
/** Number of taps for 24000 Hz. */
KZ_API uint32_t kzdsp_get_24000_11025_fixed_coeff_length(void) KZ_NOEXCEPT;
/** High halves of the taps for 32000 Hz. */
KZ_API const int16_t* kzdsp_get_32000_11025_fixed_coeff_msb(void) KZ_NOEXCEPT;
/** Low halves of the taps for 32000 Hz. */
KZ_API const uint16_t* kzdsp_get_32000_11025_fixed_coeff_lsb(void) KZ_NOEXCEPT;
/** Number of taps for 32000 Hz. */
KZ_API uint32_t kzdsp_get_32000_11025_fixed_coeff_length(void) KZ_NOEXCEPT;
/** High halves of the taps for 44100 Hz. */
KZ_API const int16_t* kzdsp_get_44100_11025_fixed_coeff_msb(void) KZ_NOEXCEPT;
/** Low halves of the taps for 44100 Hz. */
KZ_API const uint16_t* kzdsp_get_44100_11025_fixed_coeff_lsb(void) KZ_NOEXCEPT;
/** Number of taps for 44100 Hz. */
KZ_API uint32_t kzdsp_get_44100_11025_fixed_coeff_length(void) KZ_NOEXCEPT;
/** High halves of the taps for 48000 Hz. */
KZ_API const int16_t* kzdsp_get_48000_11025_fixed_coeff_msb(void) KZ_NOEXCEPT;
/** Low halves of the taps for 48000 Hz. */
KZ_API const uint16_t* kzdsp_get_48000_11025_fixed_coeff_lsb(void) KZ_NOEXCEPT;
/** Number of taps for 48000 Hz. */
KZ_API uint32_t kzdsp_get_48000_11025_fixed_coeff_length(void) KZ_NOEXCEPT;

KZ_C_END

#endif
