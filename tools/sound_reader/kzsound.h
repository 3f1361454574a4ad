/**
 * @file
 * Sound files as samples, for programs in other languages: every kind that kzfp reads, read in the
 * same way, so that fingerprints and answers are the same. A shared library with this interface is
 * a part of the Python package; it is not installed by itself.
 *
 *     kzsound_file* file = NULL;
 *     kzsound_request request = {NULL, 0, 1};
 *     kzsound_facts facts;
 *     if (kzsound_open("song.mp3", &request, &file) != KZSOUND_OK) {
 *         return;                                    kzsound_get_error_text() says why
 *     }
 *     kzsound_get_facts(file, &facts);               the format, rate and channels of samples
 *     while (kzsound_read(file, bytes, sizeof bytes, &size) == KZSOUND_OK && size > 0) {
 *         ...
 *     }
 *     kzsound_free(&file);
 *
 * Threads: files are independent of each other; one file belongs to one thread at a time.
 */
#ifndef KZSOUND_H
#define KZSOUND_H

#include "kzsdk/abs/base.h"

KZ_C_BEGIN

/** What became of a call. */
enum {
    KZSOUND_OK = 0,
    /** Memory is short: free some and repeat the call. */
    KZSOUND_ERROR_MEMORY = 1,
    /** The file cannot be read: kzsound_get_error_text() says why. */
    KZSOUND_ERROR_FILE = 2,
    /** A pointer is null or a number out of range: pass what the call states. */
    KZSOUND_ERROR_INVALID_ARGUMENT = 3
};

/** A sound file that is read from start to end. Opaque. */
typedef struct kzsound_file kzsound_file;

/** How a file is to be read. */
typedef struct kzsound_request {
    const uint32_t* rates; /**< hertz: sound of any other rate is converted to 44100 Hz; null for
                                sound as it is, whatever its rate */
    uint32_t rate_count;   /**< of @c rates */
    uint32_t floats;       /**< 1: what decoders make as floats is given as floats, with all
                                channels; 0: everything has 16 bits, but for A-law and mu-law */
} kzsound_request;

/** What is known of a file once it is open. */
typedef struct kzsound_facts {
    double duration;        /**< of the file, in seconds; negative when it is not known */
    uint32_t format;        /**< of the samples that are read: one of KZ_STREAM_FORMAT_... */
    uint32_t sample_rate;   /**< of the samples that are read, in hertz */
    uint32_t channels;      /**< of the samples that are read, interleaved */
    uint32_t file_rate;     /**< of the file itself, in hertz */
    uint32_t file_channels; /**< of the file itself */
    uint32_t tag_count;
} kzsound_facts;

/**
 * Opens a sound file. What comes through a named pipe is copied to its end first.
 *
 * @param path     Of a file, in the bytes of the system.
 * @param request  Read only during the call.
 * @param[out] out_file  The file, which the caller frees with kzsound_free(); null on failure.
 * @return KZSOUND_OK, KZSOUND_ERROR_FILE, KZSOUND_ERROR_MEMORY or KZSOUND_ERROR_INVALID_ARGUMENT.
 */
KZ_API uint32_t kzsound_open(const char* path, const kzsound_request* request,
                             kzsound_file** out_file) KZ_NOEXCEPT;

/**
 * Reports what is known of a file.
 *
 * @return KZSOUND_OK; KZSOUND_ERROR_INVALID_ARGUMENT when a pointer is null.
 */
KZ_API uint32_t kzsound_get_facts(const kzsound_file* file, kzsound_facts* out_facts) KZ_NOEXCEPT;

/**
 * Reports what a file says about itself: "title", "artist", ...
 *
 * @param place  0 .. kzsound_facts.tag_count - 1.
 * @param[out] out_name   In lower case; stays until the file is freed.
 * @param[out] out_value  UTF-8; stays until the file is freed.
 * @return KZSOUND_OK; KZSOUND_ERROR_INVALID_ARGUMENT, also when there is no tag at this place.
 */
KZ_API uint32_t kzsound_get_tag(const kzsound_file* file, uint32_t place, const char** out_name,
                                const char** out_value) KZ_NOEXCEPT;

/**
 * Reads the samples that follow.
 *
 * @param bytes     Room for @p capacity bytes, at an address that is aligned for the samples.
 * @param capacity  At least one frame: a sample of each channel.
 * @param[out] out_size  Bytes read, a whole number of frames: fewer than fit only at the end, and
 *                       then 0 from the next call on. 0 on failure.
 * @return KZSOUND_OK, KZSOUND_ERROR_FILE, KZSOUND_ERROR_MEMORY or KZSOUND_ERROR_INVALID_ARGUMENT.
 */
KZ_API uint32_t kzsound_read(kzsound_file* file, void* bytes, uint64_t capacity,
                             uint64_t* out_size) KZ_NOEXCEPT;

/**
 * Why the sound that was read so far is not what the file should hold: "is damaged (...)".
 *
 * @return Empty when there is no reason to doubt it, and for a null pointer; never null. Stays
 *         until the next call with this file.
 */
KZ_API const char* kzsound_get_trouble(kzsound_file* file) KZ_NOEXCEPT;

/** Closes a file and sets the caller's pointer to null, which it may be already. */
KZ_API void kzsound_free(kzsound_file** file_ref) KZ_NOEXCEPT;

/**
 * What went wrong in the last call that failed in the calling thread, without the file's name: "is
 * empty, a sound file is needed".
 *
 * @return Empty when no call has failed yet; never null. It stays until another one fails.
 */
KZ_API const char* kzsound_get_error_text(void) KZ_NOEXCEPT;

/**
 * What files are read with: "libsndfile 1.2.0, FFmpeg 5.1.9". FFmpeg's libraries are loaded to find
 * out.
 *
 * @return Never null; empty when memory is short. It stays until the program ends.
 */
KZ_API const char* kzsound_get_readers(void) KZ_NOEXCEPT;

KZ_C_END

#endif
