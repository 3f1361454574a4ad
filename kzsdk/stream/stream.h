/**
 * @file
 * Streams: sound as programs have it, in any format and cut anywhere, to a fingerprint.
 *
 *     kz_stream_settings settings;
 *     kz_stream* stream = NULL;
 *     uint8_t complete = 0;
 *     kz_stream_initialize_settings(&settings);        fixed algorithm, 16 bits, 44100 Hz, stereo
 *     settings.format = KZ_STREAM_FORMAT_FLOAT32;
 *     if (kz_stream_create(&settings, &stream) != KZ_OK) {
 *         return;                                      kz_status_text() says why
 *     }
 *     while (!complete && bytes are at hand) {
 *         kz_stream_feed(stream, bytes, byte_count, NULL, &complete);
 *     }
 *     kz_stream_finish(stream, &complete);
 *     if (complete) {
 *         kz_stream_get_values(stream, values, 30, &count);
 *     } else {
 *         kz_stream_get_state(stream, &state);         silence, too short, how much more
 *     }
 *     kz_stream_free(&stream);
 *
 * The library needs no start-up for it: a stream holds the library by kzinit_acquire() from its
 * creation to its end.
 *
 * The same sound gives the same document to the bit, however it is cut: in single bytes, in the
 * middle of samples, all in one call. Where the extraction interface takes the sound too (its
 * formats and rates, one or two channels), the document is that of one
 * kz_fpx_fingerprint_add_audio() with all of it.
 *
 * Threads: streams are independent of each other; one stream belongs to one thread at a time. A
 * call needs up to 100 KB of stack.
 */
#ifndef KZSDK_STREAM_STREAM_H
#define KZSDK_STREAM_STREAM_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"
#include "kzsdk/fpx/fpx.h"

KZ_C_BEGIN

/** A stream of sound on its way to a fingerprint. Opaque. */
typedef struct kz_stream kz_stream;

/**
 * Sample formats. Channels are interleaved; samples of several bytes are in the processor's byte
 * order, at any address.
 *
 * Formats with more than 16 bits are taken as 16 bits, without dither. Integers lose their low bits
 * (rounded down). Of floating-point samples full scale is 1: they are multiplied by 32768, rounded
 * to the nearest integer, halves to the even one, and clipped at -32768 and 32767; NaN becomes
 * silence. Doubles are rounded only once, straight to 16 bits. The caller's rounding mode has no
 * influence.
 *
 * A-law, mu-law and KZ_STREAM_FORMAT_PCM8 go to the fingerprinter as they are where it takes the
 * rate and the channels; else the first two are expanded to 16 bits by G.711.
 *
 * There are two 8-bit formats. KZ_STREAM_FORMAT_LINEAR8 is that of WAV files, silent at 128: sound
 * of 16 bits, (sample - 128) * 256. KZ_STREAM_FORMAT_PCM8 is that of the extraction interface,
 * whose converters fold the lower half up: use it to compare with fingerprints made that way. It
 * can neither be mixed down nor decimated: with more channels, or at a rate that has to be
 * decimated, use KZ_STREAM_FORMAT_LINEAR8.
 */
enum {
    KZ_STREAM_FORMAT_PCM8 = 1,    /**< 8-bit offset PCM, folded, as KZ_FPX_FORMAT_PCM8 */
    KZ_STREAM_FORMAT_PCM16 = 2,   /**< 16-bit signed */
    KZ_STREAM_FORMAT_ALAW = 3,    /**< G.711 A-law */
    KZ_STREAM_FORMAT_ULAW = 4,    /**< G.711 mu-law */
    KZ_STREAM_FORMAT_PCM24 = 5,   /**< 24-bit signed in three bytes */
    KZ_STREAM_FORMAT_PCM32 = 6,   /**< 32-bit signed */
    KZ_STREAM_FORMAT_FLOAT32 = 7, /**< single precision */
    KZ_STREAM_FORMAT_FLOAT64 = 8, /**< double precision */
    KZ_STREAM_FORMAT_LINEAR8 = 9  /**< 8-bit unsigned, as in WAV files */
};

/** The most channels that a stream can have. */
#define KZ_STREAM_MAX_CHANNELS UINT32_C(65535)

/** The highest rate of a stream, in hertz. */
#define KZ_STREAM_MAX_RATE UINT32_C(4000000)

/**
 * What a stream is made of; the caller's, read only by kz_stream_create(). Fill it with
 * kz_stream_initialize_settings() and change what differs.
 *
 * Rates. The fixed-point algorithm takes 8000, 11025, 16000, 22050, 24000, 32000, 44100 and
 * 48000 Hz as they are. Two, four, eight and sixteen times one of them (64000, 88200, 96000,
 * 176400, 192000, ... 768000 Hz) are decimated to the highest of them by the library's 2:1 filter,
 * run one to four times over each channel: in 32 bits, from 16-bit samples times 2^14, in blocks
 * of 4096 frames counted from the start of the stream, and rounded to 16 bits at the end. The
 * floating-point algorithm takes every rate from 1 Hz to KZ_STREAM_MAX_RATE.
 *
 * Channels. One and two go to the fingerprinter as they are. More become one: their sum in 16-bit
 * samples divided by the smallest power of two that is not below their number, rounded to the
 * nearest, halves up.
 */
typedef struct kz_stream_settings {
    uint32_t algorithm;    /**< KZ_FPX_ALGORITHM_FIXED or KZ_FPX_ALGORITHM_FLOAT */
    uint32_t format;       /**< one of KZ_STREAM_FORMAT_... */
    uint32_t sample_rate;  /**< hertz */
    uint32_t channels;     /**< 1 .. KZ_STREAM_MAX_CHANNELS */
    uint32_t reserved[12]; /**< 0 */
} kz_stream_settings;

/**
 * Fills settings: fixed-point algorithm, 16-bit samples, 44100 Hz, two channels.
 *
 * @return 0; KZ_STREAM_ERROR_INVALID_ARGUMENT when @p settings is null.
 */
KZ_API kz_status kz_stream_initialize_settings(kz_stream_settings* settings) KZ_NOEXCEPT;

/**
 * Creates a stream. It allocates what feeding needs, about 1 MB at 48000 Hz; feeding then allocates
 * only small blocks, for each second of sound.
 *
 * @param[out] out_stream  The stream, which the caller frees with kz_stream_free(); null on
 *                         failure.
 * @return 0; KZ_STREAM_ERROR_INVALID_ARGUMENT when a pointer is null or a reserved field is not 0;
 *         KZ_STREAM_ERROR_ALGORITHM, KZ_STREAM_ERROR_FORMAT, KZ_STREAM_ERROR_RATE or
 *         KZ_STREAM_ERROR_CHANNELS for the first field that cannot be used;
 *         KZ_INIT_ERROR_TOO_MANY_HOLDERS; KZ_STREAM_ERROR_MEMORY when memory is short.
 */
KZ_API kz_status kz_stream_create(const kz_stream_settings* settings,
                                  kz_stream** out_stream) KZ_NOEXCEPT;

/**
 * Feeds what follows, any number of bytes. What is not yet a whole sample, frame or piece is kept.
 * Once the fingerprint is complete, bytes are no longer taken.
 *
 * @param bytes       At any address; read only during the call. May be null when there are 0.
 * @param byte_count  Of @p bytes.
 * @param[out] out_used  Bytes taken: all of them, or up to where the fingerprint was complete.
 *                    Where that is in the stream does not depend on its cuts; it may lie up to 3 s
 *                    of sound beyond what was needed. May be null.
 * @param[out] out_complete  Set to 1 once the fingerprint is complete, else to 0, also on every
 *                    failure.
 * @return 0; KZ_STREAM_ERROR_INVALID_ARGUMENT when a pointer is null; KZ_STREAM_ERROR_FINISHED
 *         after kz_stream_finish(), unless it is complete; KZ_STREAM_ERROR_NOT_STARTED when the
 *         library was shut down (nothing is taken); KZ_STREAM_ERROR_FAILED when memory was short in
 *         this feed or an earlier one: frames may be lost, so every later call that feeds, finishes
 *         or asks for results fails too.
 */
KZ_API kz_status kz_stream_feed(kz_stream* stream, const void* bytes, uint64_t byte_count,
                                uint64_t* out_used, uint8_t* out_complete) KZ_NOEXCEPT;

/**
 * Ends the sound: what is kept is analysed, but for the bytes of an unfinished frame
 * (kz_stream_state.partial_frame_bytes). May be repeated.
 *
 * @param[out] out_complete  1 when the fingerprint is complete; else 0, also on every failure,
 *                           and kz_stream_get_state() reports what it lacks.
 * @return As kz_stream_feed() does, but for KZ_STREAM_ERROR_FINISHED.
 */
KZ_API kz_status kz_stream_finish(kz_stream* stream, uint8_t* out_complete) KZ_NOEXCEPT;

/** The state of a stream. */
enum {
    KZ_STREAM_COMPLETE = 0,    /**< the fingerprint is complete */
    KZ_STREAM_NOTHING_FED = 1, /**< no whole frame has come yet */
    KZ_STREAM_SILENT = 2,      /**< all that was analysed is silence */
    KZ_STREAM_TOO_SHORT = 3,   /**< more sound is needed */
    KZ_STREAM_FAILED = 4       /**< memory was short; the stream cannot go on */
};

/**
 * What a stream reports about itself. Leading silence is found piece by piece: until then, and for
 * 3 s of sound at most, it counts as sound.
 */
typedef struct kz_stream_state {
    uint64_t frames;               /**< whole frames taken so far */
    uint64_t silence_milliseconds; /**< leading silence that was skipped */
    uint64_t sound_milliseconds;   /**< the rest of what was taken */
    uint32_t phase;                /**< one of the numbers above */
    uint32_t percent;              /**< of the frames of the fingerprint, 0 .. 100 */
    uint32_t missing_milliseconds; /**< of sound, before the fingerprint is complete: about
                                        KZ_FPX_MILLISECONDS_NEEDED in all; 0 when it is complete,
                                        else not 0 */
    uint32_t partial_frame_bytes;  /**< bytes of a frame that is not whole yet */
    uint32_t reserved[6];          /**< 0 */
} kz_stream_state;

/**
 * Reports the state of a stream, at any time.
 *
 * @return 0; KZ_STREAM_ERROR_INVALID_ARGUMENT when a pointer is null.
 */
KZ_API kz_status kz_stream_get_state(const kz_stream* stream,
                                     kz_stream_state* out_state) KZ_NOEXCEPT;

/**
 * Copies the values of a complete fingerprint, as kz_fpx_fingerprint_get_values() does.
 *
 * @param values     Room for @p capacity values. Null, with a @p capacity of 0, asks for the count
 *                   alone.
 * @param[out] out_count  The number of values there are, also when the fingerprint is not complete
 *                   or the room too small; 0 on every other failure.
 * @return 0; KZ_STREAM_ERROR_INVALID_ARGUMENT when a pointer is null; KZ_QV_ERROR_INCOMPLETE when
 *         the fingerprint is not complete; KZ_FPX_ERROR_ROOM when @p capacity is below the count;
 *         KZ_STREAM_ERROR_NOT_STARTED when the library was shut down; KZ_STREAM_ERROR_FAILED when
 *         the stream cannot go on; KZ_STREAM_ERROR_MEMORY when memory is short: the call may then
 *         be repeated.
 */
KZ_API kz_status kz_stream_get_values(kz_stream* stream, int16_t* values, uint32_t capacity,
                                      uint32_t* out_count) KZ_NOEXCEPT;

/**
 * Writes the query document of a complete fingerprint: that of kz_fpx_fingerprint_serialize().
 *
 * @param[out] out_text  NUL-terminated UTF-8, which belongs to the stream and stays until that is
 *                       freed; null on failure.
 * @return 0; KZ_STREAM_ERROR_INVALID_ARGUMENT when a pointer is null; KZ_QV_ERROR_INCOMPLETE when
 *         the fingerprint is not complete; KZ_STREAM_ERROR_NOT_STARTED when the library was shut
 *         down; KZ_STREAM_ERROR_FAILED when the stream cannot go on; KZ_STREAM_ERROR_MEMORY when
 *         memory is short: the call may then be repeated.
 */
KZ_API kz_status kz_stream_get_document(kz_stream* stream, const char** out_text) KZ_NOEXCEPT;

/**
 * Reports where the signal starts, as kz_fpx_fingerprint_get_signal_offset() does, at any time. A
 * pointer may be null when its number is not wanted.
 *
 * @param[out] out_samples  At the working rate, 11025 Hz.
 * @return 0; KZ_STREAM_ERROR_INVALID_ARGUMENT when @p stream is null.
 */
KZ_API kz_status kz_stream_get_signal_offset(const kz_stream* stream, uint32_t* out_samples,
                                             double* out_seconds, uint8_t* out_found) KZ_NOEXCEPT;

/**
 * Reports the start and the duration of the fingerprint in milliseconds, as
 * kz_fpx_fingerprint_get_times() does, at any time. A pointer may be null.
 *
 * @return 0; KZ_STREAM_ERROR_INVALID_ARGUMENT when @p stream is null.
 */
KZ_API kz_status kz_stream_get_times(const kz_stream* stream, uint32_t* out_start,
                                     uint32_t* out_duration) KZ_NOEXCEPT;

/**
 * Frees a stream with its document, gives back its hold on the library and sets the caller's
 * pointer to null. Nothing leaks after a kzinit_shutdown_vesk() either; the library stays off then.
 *
 * @return 0, also when *stream_ref is null; KZ_STREAM_ERROR_INVALID_ARGUMENT when @p stream_ref is
 *         null.
 */
KZ_API kz_status kz_stream_free(kz_stream** stream_ref) KZ_NOEXCEPT;

KZ_C_END

#endif
