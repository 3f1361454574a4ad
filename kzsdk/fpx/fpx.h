/**
 * @file
 * Extraction interface: audio in, query document out, whatever the algorithm.
 *
 * Order of calls: create; add audio, once or in pieces, until the complete flag is set; serialize;
 * serialize_free; free. The library must have been started (kzinit_initialize_vesk()).
 *
 * Threads: handles are independent of each other; one handle belongs to one thread at a time. A
 * call needs up to 100 KB of stack.
 */
#ifndef KZSDK_FPX_FPX_H
#define KZSDK_FPX_FPX_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"

KZ_C_BEGIN

/** A fingerprint in the making. Opaque. */
typedef struct kz_fpx_handle kz_fpx_handle;

/** Algorithm numbers. */
enum {
    KZ_FPX_ALGORITHM_FIXED = 1, /**< fixed point: eight rates, exact to the bit everywhere */
    KZ_FPX_ALGORITHM_FLOAT =
        2 /**< floating point: any rate; values a little apart from the other's */
};

/** Input formats. Channels are interleaved. */
enum {
    KZ_FPX_FORMAT_PCM8 = 1,  /**< 8-bit offset PCM; its lower half is folded up, see convert.h */
    KZ_FPX_FORMAT_PCM16 = 2, /**< 16-bit signed PCM, in the processor's byte order */
    KZ_FPX_FORMAT_ALAW = 3,  /**< G.711 A-law */
    KZ_FPX_FORMAT_ULAW = 4   /**< G.711 mu-law */
};

/**
 * Makes a fingerprint in the making. Note the order: the format comes before the rate here, and
 * after it in the fingerprinters' own constructors.
 *
 * @param algorithm    One of the algorithm numbers.
 * @param format       One of the input formats.
 * @param sample_rate  Hertz: 8000, 11025, 16000, 22050, 24000, 32000, 44100 or 48000; with
 *                     KZ_FPX_ALGORITHM_FLOAT any rate that KZDSP_CreateResampler() takes.
 * @param channels     1 or 2.
 * @param[out] out_handle  The handle, which the caller frees with kz_fpx_fingerprint_free(). Left
 *                     untouched on failure: set it to null first. Must not be null.
 * @return 0; 0x90080606 for an unknown algorithm; 0x90080001 when memory is short; else the
 *         fingerprinter's status: 0x900f0004 for a bad format, a rate of 0 or a bad channel count,
 *         0x900f0001 for an unsupported rate or when memory is short.
 */
KZ_API kz_status kz_fpx_fingerprint_create(uint32_t algorithm, uint32_t format,
                                           uint32_t sample_rate, uint32_t channels,
                                           kz_fpx_handle** out_handle) KZ_NOEXCEPT;

/**
 * Feeds audio. May be called again with what follows, in pieces of any whole number of frames.
 *
 * Leading silence is skipped. A default fingerprint is complete after 14.2 s of what follows it;
 * audio fed after that is ignored. Where the stream is cut does not show at 11025 Hz once the
 * signal has begun; at other rates it may show in the last bits of the resampled signal
 * (resampler.h says how far), and leading silence is judged piece by piece.
 *
 * @param audio       Interleaved samples at any address; read only during the call.
 * @param byte_count  Bytes in @p audio: a whole number of frames, not 0.
 * @param[out] out_complete  Set to 1 once the fingerprint is complete, else to 0.
 * @return 0; 0x90080004 when a pointer is null; 0x900f0004 for a byte count that is 0 or not a
 *         whole number of frames (nothing is consumed then).
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
 * @return 0; 0x90080004 when a pointer is null; 0x900f0961 when the fingerprint is not complete;
 *         0x900f0001 when memory is short; 0x9008000b when the text could not be rendered.
 */
KZ_API kz_status kz_fpx_fingerprint_serialize(kz_fpx_handle* handle, char** out_text) KZ_NOEXCEPT;

/**
 * Frees a text of kz_fpx_fingerprint_serialize() and sets the caller's pointer to null.
 *
 * While the memory manager is off nothing is freed: the text is lost, and 0 is returned.
 *
 * @return 0, also when *text_ref is null; 0x90080004 when @p text_ref is null.
 */
KZ_API kz_status kz_fpx_fingerprint_serialize_free(char** text_ref) KZ_NOEXCEPT;

/**
 * Frees a handle and sets the caller's pointer to null, whatever the outcome.
 *
 * While the memory manager is off nothing is freed: the handle is lost, and 0 is returned.
 *
 * @return 0, also when *handle_ref is null; 0x90080004 when @p handle_ref is null; else the
 *         fingerprinter's status.
 */
KZ_API kz_status kz_fpx_fingerprint_free(kz_fpx_handle** handle_ref) KZ_NOEXCEPT;

KZ_C_END

#endif
