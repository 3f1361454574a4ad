/**
 * @file
 * Sample conversion: interleaved audio of one of four encodings to a mono signal.
 *
 * All converters have one shape, (input, output, frame_count), those for any number of channels
 * have the channel count in front. A frame is one sample of every channel; each frame gives one
 * output word.
 *
 *   input        Interleaved samples at any address, odd ones included. 16-bit samples are signed
 *                and in the processor's byte order; those of the other encodings are bytes.
 *   output       Room for frame_count words, apart from the input.
 *   frame_count  Frames to convert; 0 converts nothing. It is counted down as an unsigned number: a
 *                negative count means billions of frames and runs over both buffers. Pass none.
 *   channels     1 or more. 0 or less reads nothing and writes zeros.
 *
 * Encodings. 16-bit PCM samples s are in -32768 .. 32767. A-law and mu-law bytes are expanded by
 * the tables below to samples of the same scale. 8-bit PCM is offset by 128 but is not expanded to
 * a signed sample: a byte b becomes u = b XOR 0x80, kept as a number 0 .. 255. Silence is 0 and the
 * upper half of the waveform gives 1 .. 127, but the lower half gives 128 .. 255 in place of
 * -128 .. -1: it is folded up. 8-bit audio converted so resembles the same audio in no other
 * encoding; widen it to 16 bits first where that matters.
 *
 * N channels. The fixed-point converters divide the sum of the channels by the smallest power of
 * two not below their number: an average for 1, 2, 4, 8 ... channels, up to 6 dB less for others.
 * With more than 32768 channels (8-bit: more than 2^23) the word is 0.
 *
 * Running sum. The N-channel converters of A-law and mu-law never clear their sum: output word k is
 * made from all samples of frames 0 to k of the call. Sums wrap. The signal that comes out is the
 * running integral of what went in and starts anew with every call; the one- and two-channel
 * converters and all of PCM start anew with every frame.
 *
 * Scaling: per converter below. Sums and shifts wrap at 32 bits, nothing saturates.
 * Failure: there is none to report. Cost: one pass, no allocation. Threads: pure functions.
 */
#ifndef KZSDK_DSP_CONVERT_H
#define KZSDK_DSP_CONVERT_H

#include "kzsdk/abs/base.h"
#include "kzsdk/dsp/fxp.h"

KZ_C_BEGIN

/* ---- 16-bit PCM to fixed point -------------------------------------------------------------- */

/** Mono: s << 14, full scale 1.0 in Q29. */
KZ_API void KZDSP_PCM16ToQ29(const void* input, FxpType* output, int32_t frame_count) KZ_NOEXCEPT;

/** Mono: s << 15, full scale 1.0 in Q30. */
KZ_API void KZDSP_PCM16ToQ30(const void* input, FxpType* output, int32_t frame_count) KZ_NOEXCEPT;

/** Two channels: (L + R) << 14, the average in Q30. */
KZ_API void KZDSP_StereoPCM16ToMonoQ30(const void* input, FxpType* output,
                                       int32_t frame_count) KZ_NOEXCEPT;

/** N channels: sum << (z - 16) with z the leading zeros of KZDSP_clp2(channels), in Q30. */
KZ_API void KZDSP_NChannelPCM16ToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                         int32_t frame_count) KZ_NOEXCEPT;

/* ---- 8-bit PCM to fixed point, folded ------------------------------------------------------- */

/** Mono: u << 22, 0 .. 2 in Q29. */
KZ_API void KZDSP_PCM8ToQ29(const void* input, FxpType* output, int32_t frame_count) KZ_NOEXCEPT;

/** Mono: u << 23, 0 .. 2 in Q30. */
KZ_API void KZDSP_PCM8ToQ30(const void* input, FxpType* output, int32_t frame_count) KZ_NOEXCEPT;

/** Two channels: (u1 + u2) << 22, the average in Q30. */
KZ_API void KZDSP_StereoPCM8ToMonoQ30(const void* input, FxpType* output,
                                      int32_t frame_count) KZ_NOEXCEPT;

/** N channels: sum << (z - 8) with z the leading zeros of KZDSP_clp2(channels), in Q30. */
KZ_API void KZDSP_NChannelPCM8ToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                        int32_t frame_count) KZ_NOEXCEPT;

/* ---- A-law to fixed point ------------------------------------------------------------------- */

/** Mono: sample << 14, in Q29. */
KZ_API void KZDSP_ALawToQ29(const void* input, FxpType* output, int32_t frame_count) KZ_NOEXCEPT;

/** Two channels: sum << 14, the average in Q30. */
KZ_API void KZDSP_StereoALawToMonoQ30(const void* input, FxpType* output,
                                      int32_t frame_count) KZ_NOEXCEPT;

/** N channels: running sum << (z - 16), z as for 16-bit PCM. */
KZ_API void KZDSP_NChannelALawToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                        int32_t frame_count) KZ_NOEXCEPT;

/* ---- mu-law to fixed point ------------------------------------------------------------------ */

/** Mono: sample << 14, in Q29. */
KZ_API void KZDSP_uLawToQ29(const void* input, FxpType* output, int32_t frame_count) KZ_NOEXCEPT;

/** Two channels: sum << 14, the average in Q30. */
KZ_API void KZDSP_StereouLawToMonoQ30(const void* input, FxpType* output,
                                      int32_t frame_count) KZ_NOEXCEPT;

/** N channels: running sum << (z - 16), z as for 16-bit PCM. */
KZ_API void KZDSP_NChanneluLawToMonoQ30(int32_t channels, const void* input, FxpType* output,
                                        int32_t frame_count) KZ_NOEXCEPT;

/* ---- To single-precision floats -------------------------------------------------------------
 * Nothing is scaled to 1: a full-scale 16-bit sample is about 32768, and channels are added, not
 * averaged. Integer sums are 32-bit, signed, and rounded to nearest when they pass 2^24. */

/** 16-bit PCM, mono: s. */
KZ_API void KZDSP_ShortToFloat(const void* input, float* output, int32_t frame_count) KZ_NOEXCEPT;

/** 16-bit PCM, two channels: L + R, added as floats. */
KZ_API void KZDSP_StereoShortToMonoFloat(const void* input, float* output,
                                         int32_t frame_count) KZ_NOEXCEPT;

/** 16-bit PCM, N channels: the samples added as floats, first channel first. */
KZ_API void KZDSP_NChannelShortToMonoFloat(int32_t channels, const void* input, float* output,
                                           int32_t frame_count) KZ_NOEXCEPT;

/** 8-bit PCM, folded, mono: u * 256. */
KZ_API void KZDSP_Offset128ToFloat(const void* input, float* output,
                                   int32_t frame_count) KZ_NOEXCEPT;

/** 8-bit PCM, folded, two channels: (u1 + u2) * 256. */
KZ_API void KZDSP_StereoOffset128ToMonoFloat(const void* input, float* output,
                                             int32_t frame_count) KZ_NOEXCEPT;

/** 8-bit PCM, folded, N channels: sum << 8. */
KZ_API void KZDSP_NChannelOffset128ToMonoFloat(int32_t channels, const void* input, float* output,
                                               int32_t frame_count) KZ_NOEXCEPT;

/** A-law, mono: the sample. */
KZ_API void KZDSP_ALawToFloat(const void* input, float* output, int32_t frame_count) KZ_NOEXCEPT;

/** A-law, two channels: the sum. */
KZ_API void KZDSP_StereoALawToMonoFloat(const void* input, float* output,
                                        int32_t frame_count) KZ_NOEXCEPT;

/** A-law, N channels: the running sum. */
KZ_API void KZDSP_NChannelALawToMonoFloat(int32_t channels, const void* input, float* output,
                                          int32_t frame_count) KZ_NOEXCEPT;

/** mu-law, mono: the sample. */
KZ_API void KZDSP_uLawToFloat(const void* input, float* output, int32_t frame_count) KZ_NOEXCEPT;

/** mu-law, two channels: the sum. */
KZ_API void KZDSP_StereouLawToMonoFloat(const void* input, float* output,
                                        int32_t frame_count) KZ_NOEXCEPT;

/** mu-law, N channels: the running sum. */
KZ_API void KZDSP_NChanneluLawToMonoFloat(int32_t channels, const void* input, float* output,
                                          int32_t frame_count) KZ_NOEXCEPT;

/* ---- Expansion tables ----------------------------------------------------------------------- */

/**
 * The G.711 mu-law expansion at 16-bit scale: 256 samples, indexed by the code byte.
 *
 * @return A constant table of the library's, -32124 .. 32124. Never null.
 */
KZ_API const int16_t* KZDSP_GetuLawTable(void) KZ_NOEXCEPT;

/**
 * The G.711 A-law expansion at 16-bit scale with its sign inverted: 256 samples, indexed by the
 * code byte. Bytes below 0x80 are positive here where the recommendation has them negative.
 *
 * @return A constant table of the library's, -32256 .. 32256. Never null.
 */
KZ_API const int16_t* KZDSP_GetALawTable(void) KZ_NOEXCEPT;

KZ_C_END

#endif
