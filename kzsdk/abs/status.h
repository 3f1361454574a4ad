/**
 * @file
 * Status codes: 0 for success, else 0x90000000 | (module << 16) | reason.
 *
 * Each failure is listed with its cause and its cure; kz_status_text() says the same at run time.
 * Allocation also fails while the library is not started up, so every ..._ERROR_MEMORY may mean
 * that neither kzinit_initialize_vesk() nor kzinit_acquire() was called.
 */
#ifndef KZSDK_ABS_STATUS_H
#define KZSDK_ABS_STATUS_H

#include "kzsdk/abs/base.h"

KZ_C_BEGIN

/** A status: 0 is success, everything else one of the failures below. */
typedef uint32_t kz_status;

/** Success. */
#define KZ_OK UINT32_C(0)

/* ---- Start-up arguments (module 0x00) -------------------------------------------------------- */

/** The configuration record is null, or the check is 0: pass the record, and 1 for the check. */
#define KZ_ERROR_INVALID_ARGUMENT UINT32_C(0x90000004)

/* ---- Tag trees (module 0x02) ----------------------------------------------------------------- */

/** Memory is short: free some, or start the library up first. */
#define KZ_XML_ERROR_MEMORY UINT32_C(0x90020001)
/** The path leads to no tag: correct it, or let the call create what is missing. */
#define KZ_XML_ERROR_NOT_FOUND UINT32_C(0x90020002)
/** A tag is null, or a name or path is null, empty or malformed: pass one that is not. */
#define KZ_XML_ERROR_INVALID_ARGUMENT UINT32_C(0x90020004)

/* ---- Dynamic buffer (module 0x03) ------------------------------------------------------------ */

/** Memory is short, or the buffer would pass 2^32 - 1 bytes: free memory, or append less. */
#define KZ_DYN_BUF_ERROR_MEMORY UINT32_C(0x90030001)
/** A pointer is null: pass a buffer and, also for 0 bytes, a text. */
#define KZ_DYN_BUF_ERROR_INVALID_ARGUMENT UINT32_C(0x90030004)

/* ---- Memory manager (module 0x04) ------------------------------------------------------------ */

/** The memory manager is on already, perhaps for another user: nothing is left to do. */
#define KZ_MEM_ALREADY_ON UINT32_C(0x90040005)
/** The memory manager is off: switch it on, or free before it is switched off. */
#define KZ_MEM_NOT_ON UINT32_C(0x90040006)

/* ---- Library start-up (module 0x05) ---------------------------------------------------------- */

/** There is no holder left to release: call kzinit_release() once for each kzinit_acquire(). */
#define KZ_INIT_ERROR_NOT_HELD UINT32_C(0x90050006)
/** The configuration record is null: pass one, even if it is cleared. */
#define KZ_INIT_ERROR_NO_RECORD UINT32_C(0x90050990)
/** The library has 2^30 - 1 holders: call kzinit_release() once for each kzinit_acquire(). */
#define KZ_INIT_ERROR_TOO_MANY_HOLDERS UINT32_C(0x90050991)

/* ---- Disc helpers, both families (module 0x06) ----------------------------------------------- */

/** Memory is short, a directory cannot be opened, or a name does not fit: look at the path, give
    the name more room, or free memory. */
#define KZ_DISC_ERROR_MEMORY UINT32_C(0x90060001)
/** A pointer is null, a size is 0, or the system refused an argument: pass what the call states. */
#define KZ_DISC_ERROR_INVALID_ARGUMENT UINT32_C(0x90060004)
/** The family is on already: nothing is left to do. */
#define KZ_DISC_ALREADY_ON UINT32_C(0x90060005)
/** The family is off: switch it on with its initialize call. */
#define KZ_DISC_NOT_ON UINT32_C(0x90060006)
/** The system failed for a reason without a code of its own here: look at the device or file. */
#define KZ_DISC_ERROR_SYSTEM UINT32_C(0x90060009)
/** Access is denied: give the user the right to read the file or device. */
#define KZ_DISC_ERROR_ACCESS_DENIED UINT32_C(0x90060047)
/** There is no such file, device or volume, or a seek names no known origin: correct the path, the
    disc or the origin. */
#define KZ_DISC_ERROR_NOT_FOUND UINT32_C(0x90060048)
/** The device has no space left: free some. */
#define KZ_DISC_ERROR_NO_SPACE UINT32_C(0x9006004a)
/** The process has too many files open: close some. */
#define KZ_DISC_ERROR_TOO_MANY_FILES UINT32_C(0x9006004b)
/** The descriptor is not open: use one that an open call returned and nobody has closed. */
#define KZ_DISC_ERROR_BAD_DESCRIPTOR UINT32_C(0x9006004c)

/* ---- Extraction interface (module 0x08) ------------------------------------------------------ */

/** Memory is short: free some, or start the library up first. */
#define KZ_FPX_ERROR_MEMORY UINT32_C(0x90080001)
/** A handle, an audio pointer or a place for a result is null: pass one. */
#define KZ_FPX_ERROR_INVALID_ARGUMENT UINT32_C(0x90080004)
/** The document could not be written as text, for want of memory: free some and serialize again. */
#define KZ_FPX_ERROR_RENDER UINT32_C(0x9008000b)
/** No input format takes the encoding of the sound: convert it to 8- or 16-bit PCM, A-law or
    mu-law. */
#define KZ_FPX_ERROR_NO_INPUT_FORMAT UINT32_C(0x9008000f)
/** The array is too small for the values; their count has been reported: pass one of that size. */
#define KZ_FPX_ERROR_ROOM UINT32_C(0x90080010)
/** All the sound there is was added and the fingerprint is not complete: give more sound. */
#define KZ_FPX_ERROR_NOT_ENOUGH_AUDIO UINT32_C(0x90080602)
/** There is no algorithm with this number: use KZ_FPX_ALGORITHM_FIXED or KZ_FPX_ALGORITHM_FLOAT. */
#define KZ_FPX_ERROR_NO_ALGORITHM UINT32_C(0x90080606)

/* ---- Streams (module 0x09) ------------------------------------------------------------------- */

/** Memory for the stream or its result is short: free some, and repeat the call. */
#define KZ_STREAM_ERROR_MEMORY UINT32_C(0x90090001)
/** A pointer is null, or a reserved field is not 0: pass what stream.h states, and clear the
    settings with kz_stream_initialize_settings(). */
#define KZ_STREAM_ERROR_INVALID_ARGUMENT UINT32_C(0x90090004)
/** kzinit_shutdown_vesk() was called while the stream was alive: start the library again, or free
    the stream. */
#define KZ_STREAM_ERROR_NOT_STARTED UINT32_C(0x90090006)
/** There is no algorithm with this number: use KZ_FPX_ALGORITHM_FIXED or KZ_FPX_ALGORITHM_FLOAT. */
#define KZ_STREAM_ERROR_ALGORITHM UINT32_C(0x90090010)
/** There is no sample format with this number: use one of KZ_STREAM_FORMAT_... */
#define KZ_STREAM_ERROR_FORMAT UINT32_C(0x90090011)
/** The algorithm cannot take the rate, or only by decimation, which KZ_STREAM_FORMAT_PCM8 does not
    allow: use one of the rates in stream.h, KZ_STREAM_FORMAT_LINEAR8 or the floating-point
    algorithm, or resample the sound. */
#define KZ_STREAM_ERROR_RATE UINT32_C(0x90090012)
/** There are 0 channels, or more than 65535, or more than 2 in KZ_STREAM_FORMAT_PCM8: pass the
    channels that the sound has, or use KZ_STREAM_FORMAT_LINEAR8. */
#define KZ_STREAM_ERROR_CHANNELS UINT32_C(0x90090013)
/** The stream was finished: create another one for more sound. */
#define KZ_STREAM_ERROR_FINISHED UINT32_C(0x90090014)
/** Memory was short while the stream took sound, and it cannot go on: free it and some memory,
    create another one, and feed that from the start. */
#define KZ_STREAM_ERROR_FAILED UINT32_C(0x90090015)

/* ---- Fingerprinters, both algorithms (module 0x0F) ------------------------------------------- */

/** Memory is short, or the algorithm does not take the sample rate: compare the rate with the table
    in fpx.h, free memory, or start the library up first. */
#define KZ_QV_ERROR_MEMORY UINT32_C(0x900f0001)
/** A format, rate, channel count, byte count or pointer is not allowed: compare with fpx.h, and add
    whole sample frames. */
#define KZ_QV_ERROR_INVALID_ARGUMENT UINT32_C(0x900f0004)
/** The fingerprint holds no values: add sound before asking for the result. */
#define KZ_QV_ERROR_EMPTY UINT32_C(0x900f0009)
/** The frame limit is reached; internal, reported to callers as success with the flag set. */
#define KZ_QV_FRAME_LIMIT_REACHED UINT32_C(0x900f0960)
/** The fingerprint is not complete: add sound until the flag is set. */
#define KZ_QV_ERROR_INCOMPLETE UINT32_C(0x900f0961)

/* ---- Texts ----------------------------------------------------------------------------------- */

/**
 * Describes a status in one English sentence: what went wrong, and what cures it.
 *
 * @return A constant of the library, never null: never free it. A number that is no status gets a
 *         sentence too. Callable at any time, also before start-up.
 */
KZ_API const char* kz_status_text(kz_status status) KZ_NOEXCEPT;

KZ_C_END

#endif
