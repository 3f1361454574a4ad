/**
 * @file
 * Extraction interface: audio in, query document out, whatever the algorithm.
 *
 * Order of calls: create; add audio, once or in pieces, until the complete flag is set; serialize;
 * serialize_free; free. The library must have been started (kzsdk/abs/startup.h).
 *
 * What may be combined:
 *
 *     algorithm  KZ_FPX_ALGORITHM_FIXED                KZ_FPX_ALGORITHM_FLOAT
 *     format     PCM8, PCM16, ALAW, ULAW               the same
 *     rate       8000, 11025, 16000, 22050,            any whole number of hertz
 *                24000, 32000, 44100 or 48000 Hz       from 1 to 1000000000
 *     channels   1 or 2                                the same
 *
 * Threads: handles are independent of each other; one handle belongs to one thread at a time. A
 * call needs up to 100 KB of stack.
 */
#ifndef KZSDK_FPX_FPX_H
#define KZSDK_FPX_FPX_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"

KZ_C_BEGIN

/** A fingerprint context. Opaque. */
typedef struct kz_fpx_handle kz_fpx_handle;

/** Algorithm numbers. */
enum {
    KZ_FPX_ALGORITHM_FIXED = 1, /**< fixed point; the same bits on every processor */
    KZ_FPX_ALGORITHM_FLOAT = 2  /**< floating point; values a little apart from the other's */
};

/** Input formats. Channels are interleaved. */
enum {
    KZ_FPX_FORMAT_PCM8 = 1,  /**< 8-bit offset PCM; its lower half is folded up, see convert.h */
    KZ_FPX_FORMAT_PCM16 = 2, /**< 16-bit signed PCM, in the processor's byte order */
    KZ_FPX_FORMAT_ALAW = 3,  /**< G.711 A-law */
    KZ_FPX_FORMAT_ULAW = 4   /**< G.711 mu-law */
};

/**
 * Milliseconds of sound, after leading silence, that complete a default fingerprint at any rate
 * from 2000 Hz up and however the stream is cut: twelve frames, each 11264 samples at 11025 Hz
 * after the one before and the last 32768 long, and what the resampler and the search for the
 * signal hold back. There is no document of less sound.
 */
#define KZ_FPX_MILLISECONDS_NEEDED UINT32_C(14220)

/**
 * Creates a fingerprint context. Note the order: the format comes before the rate here, and
 * after it in the fingerprinters' own constructors.
 *
 * @param algorithm    One of the algorithm numbers.
 * @param format       One of the input formats.
 * @param sample_rate  Hertz, as the table above allows.
 * @param channels     1 or 2.
 * @param[out] out_handle  The handle, which the caller frees with kz_fpx_fingerprint_free(). Left
 *                     untouched on failure: set it to null first. Must not be null.
 * @return 0; KZ_FPX_ERROR_NO_ALGORITHM for an unknown algorithm; KZ_FPX_ERROR_MEMORY when memory is
 *         short; else the fingerprinter's status: KZ_QV_ERROR_INVALID_ARGUMENT for a bad format, a
 *         rate of 0 or a bad channel count, KZ_QV_ERROR_MEMORY for an unsupported rate or when
 *         memory is short.
 */
KZ_API kz_status kz_fpx_fingerprint_create(uint32_t algorithm, uint32_t format,
                                           uint32_t sample_rate, uint32_t channels,
                                           kz_fpx_handle** out_handle) KZ_NOEXCEPT;

/**
 * Feeds audio. May be called again with what follows, in pieces of any whole number of frames.
 *
 * Leading silence is skipped. A default fingerprint is complete after 14.22 s of what follows it
 * (KZ_FPX_MILLISECONDS_NEEDED); audio fed after that is ignored. Where the stream is cut does not
 * show at 11025 Hz once the signal has begun; at other rates it may show in the last bits of the
 * resampled signal (resampler.h states how far), and leading silence is judged piece by piece.
 *
 * @param audio       Interleaved samples at any address; read only during the call.
 * @param byte_count  Bytes in @p audio: a whole number of frames, not 0.
 * @param[out] out_complete  Set to 1 once the fingerprint is complete, else to 0.
 * @return 0; KZ_FPX_ERROR_INVALID_ARGUMENT when a pointer is null; KZ_QV_ERROR_INVALID_ARGUMENT for
 *         a byte count that is 0 or not a whole number of frames (nothing is consumed then).
 */
KZ_API kz_status kz_fpx_fingerprint_add_audio(kz_fpx_handle* handle, const void* audio,
                                              uint32_t byte_count,
                                              uint8_t* out_complete) KZ_NOEXCEPT;

/**
 * Renders the query document of a complete fingerprint: UTF-8 XML, NUL-terminated. When memory runs
 * short, a text that lacks the version or the name, or is malformed, may come out as a success.
 *
 * @param[out] out_text  The text, which the caller frees with kz_fpx_fingerprint_serialize_free();
 *                       null on failure.
 * @return 0; KZ_FPX_ERROR_INVALID_ARGUMENT when a pointer is null; KZ_QV_ERROR_INCOMPLETE when the
 *         fingerprint is not complete; KZ_QV_ERROR_MEMORY when memory is short; KZ_FPX_ERROR_RENDER
 *         when the text could not be rendered.
 */
KZ_API kz_status kz_fpx_fingerprint_serialize(kz_fpx_handle* handle, char** out_text) KZ_NOEXCEPT;

/**
 * Frees a text of kz_fpx_fingerprint_serialize() and sets the caller's pointer to null.
 *
 * While the memory manager is off nothing is freed: the text is lost, and 0 is returned.
 *
 * @return 0, also when *text_ref is null; KZ_FPX_ERROR_INVALID_ARGUMENT when @p text_ref is null.
 */
KZ_API kz_status kz_fpx_fingerprint_serialize_free(char** text_ref) KZ_NOEXCEPT;

/**
 * Copies the values of a complete fingerprint: those that the document holds, with their sign.
 *
 * @param values     Room for @p capacity values. Null, with a @p capacity of 0, asks for the count
 *                   alone.
 * @param capacity   Values that fit; a default fingerprint has 30: the means of 15 bands from low
 *                   to high, then their spreads, each a share of its half's sum in units of
 *                   2^-15. A share of 1 wraps to -32768.
 * @param[out] out_count  The number of values there are, also when the fingerprint is not complete
 *                   or the room too small; 0 on every other failure.
 * @return 0; KZ_FPX_ERROR_INVALID_ARGUMENT when a pointer is null; KZ_QV_ERROR_INCOMPLETE when the
 *         fingerprint is not complete; KZ_FPX_ERROR_ROOM when @p capacity is below the count;
 *         KZ_FPX_ERROR_MEMORY when memory is short. Nothing is copied on failure.
 */
KZ_API kz_status kz_fpx_fingerprint_get_values(kz_fpx_handle* handle, int16_t* values,
                                               uint32_t capacity, uint32_t* out_count) KZ_NOEXCEPT;

/**
 * Reports how much leading silence was skipped so far, at any time. A pointer may be null when its
 * number is not wanted.
 *
 * @param[out] out_samples  Samples at the working rate, 11025 Hz, counted modulo 2^32 (4.5 days).
 * @param[out] out_seconds  The same in seconds.
 * @param[out] out_found    1 once the end of the silence was found: the other two are final then;
 *                          else 0.
 * @return 0; KZ_FPX_ERROR_INVALID_ARGUMENT when @p handle is null.
 */
KZ_API kz_status kz_fpx_fingerprint_get_signal_offset(const kz_fpx_handle* handle,
                                                      uint32_t* out_samples, double* out_seconds,
                                                      uint8_t* out_found) KZ_NOEXCEPT;

/**
 * Reports the times of the frames collected so far, at any time. A pointer may be null when its
 * time is not wanted. They are not part of the document.
 *
 * @param[out] out_start     Milliseconds of leading silence that were skipped.
 * @param[out] out_duration  Milliseconds from the start of the first frame to the end of the last;
 *                           0 before the first frame is full, 14210 once a default fingerprint is
 *                           complete.
 *
 * The fixed-point algorithm computes in 32 bits, which wrap beyond 390 s; the floating-point one
 * in single precision, which keeps 24 bits.
 *
 * @return 0; KZ_FPX_ERROR_INVALID_ARGUMENT when @p handle is null.
 */
KZ_API kz_status kz_fpx_fingerprint_get_times(const kz_fpx_handle* handle, uint32_t* out_start,
                                              uint32_t* out_duration) KZ_NOEXCEPT;

/**
 * Reports how far the fingerprint is, at any time.
 *
 * @param[out] out_percent  0 .. 100: the share of the frames that are needed; 100 exactly when it
 *                          is complete.
 * @return 0; KZ_FPX_ERROR_INVALID_ARGUMENT when a pointer is null.
 */
KZ_API kz_status kz_fpx_fingerprint_get_progress(const kz_fpx_handle* handle,
                                                 uint32_t* out_percent) KZ_NOEXCEPT;

/**
 * Reports how many frames the next piece should have. A stream that is fed in exactly such pieces
 * gives the same document, to the bit, as one call with the whole of it; only the last piece may
 * be shorter. A stream (kzsdk/stream/stream.h) is cut in this way by the library.
 *
 * @param[out] out_frames  Never 0. Below 150000 for rates up to 48000 Hz, about 3 s of audio in
 *                         general, but never more than the 2^32 - 1 bytes that one
 *                         kz_fpx_fingerprint_add_audio() takes.
 * @return 0; KZ_FPX_ERROR_INVALID_ARGUMENT when a pointer is null.
 */
KZ_API kz_status kz_fpx_fingerprint_get_next_frames(const kz_fpx_handle* handle,
                                                    uint32_t* out_frames) KZ_NOEXCEPT;

/**
 * Frees a handle and sets the caller's pointer to null, whatever the outcome.
 *
 * While the memory manager is off nothing is freed: the handle is lost, and 0 is returned.
 *
 * @return 0, also when *handle_ref is null; KZ_FPX_ERROR_INVALID_ARGUMENT when @p handle_ref is
 *         null; else the fingerprinter's status.
 */
KZ_API kz_status kz_fpx_fingerprint_free(kz_fpx_handle** handle_ref) KZ_NOEXCEPT;

KZ_C_END

#endif
