/**
 * @file
 * A growable byte buffer, filled piece by piece and returned as one block.
 *
 * It keeps bytes only; callers that want a text append the NUL. It grows by a fixed step and not by
 * a factor: right for documents of a few hundred bytes, while a large one costs time in the square
 * of its length wherever `realloc` has to copy. A failed call leaves the buffer as it was.
 *
 * Threads: one buffer belongs to one thread at a time.
 */
#ifndef KZSDK_ABS_DYN_BUF_H
#define KZSDK_ABS_DYN_BUF_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"

KZ_C_BEGIN

/** A buffer. It belongs to the caller of kz_dyn_buf_create() until disposed of. */
typedef struct kz_dyn_buf {
    uint8_t* data;     /**< owned; from the library's allocator */
    uint32_t length;   /**< bytes in use, from the start of `data` */
    uint32_t capacity; /**< bytes that `data` can hold; never below `length` */
    uint32_t grow_by;  /**< smallest step by which `capacity` grows, in bytes */
} kz_dyn_buf;

/**
 * Makes an empty buffer.
 *
 * @param capacity  Bytes to begin with; 0 is allowed.
 * @param grow_by   Smallest step of growth in bytes; 0 is allowed: each growth is then exact.
 * @return The buffer, which the caller gives to kz_dyn_buf_dispose() or
 *         kz_dyn_buf_dispose_and_return_buffer(); null when memory is short.
 */
KZ_API kz_dyn_buf* kz_dyn_buf_create(uint32_t capacity, uint32_t grow_by) KZ_NOEXCEPT;

/**
 * Copies a buffer: its bytes, capacity and step.
 *
 * @return The copy, the caller's as after kz_dyn_buf_create(); null for null or when memory is
 *         short.
 */
KZ_API kz_dyn_buf* kz_dyn_buf_clone(const kz_dyn_buf* buffer) KZ_NOEXCEPT;

/**
 * Frees a buffer and its bytes. Null is allowed.
 *
 * @return 0.
 */
KZ_API kz_status kz_dyn_buf_dispose(kz_dyn_buf* buffer) KZ_NOEXCEPT;

/**
 * Frees a buffer but keeps its bytes.
 *
 * @return The bytes, which the caller frees with _kzmem_free(); null for null.
 */
KZ_API uint8_t* kz_dyn_buf_dispose_and_return_buffer(kz_dyn_buf* buffer) KZ_NOEXCEPT;

/**
 * Appends @p count bytes. If they do not fit, the capacity grows by the larger of the buffer's step
 * and what is missing.
 *
 * @param bytes  May lie in the buffer itself. Not null, even when @p count is 0.
 * @return 0; KZ_DYN_BUF_ERROR_INVALID_ARGUMENT when a pointer is null; KZ_DYN_BUF_ERROR_MEMORY when
 *         memory is short or the capacity would pass 2^32 - 1.
 */
KZ_API kz_status kz_dyn_buf_append_buf(kz_dyn_buf* buffer, const void* bytes,
                                       uint32_t count) KZ_NOEXCEPT;

/**
 * Appends a text without its NUL, as kz_dyn_buf_append_buf() does.
 *
 * @return As kz_dyn_buf_append_buf(); KZ_DYN_BUF_ERROR_INVALID_ARGUMENT when @p text is null.
 */
KZ_API kz_status kz_dyn_buf_append_str(kz_dyn_buf* buffer, const char* text) KZ_NOEXCEPT;

/**
 * Gives back what is not in use: the capacity becomes the length. An empty buffer stays usable.
 *
 * @return 0; KZ_DYN_BUF_ERROR_INVALID_ARGUMENT for null; KZ_DYN_BUF_ERROR_MEMORY when the heap
 *         fails.
 */
KZ_API kz_status kz_dyn_buf_compact(kz_dyn_buf* buffer) KZ_NOEXCEPT;

/** The bytes, the buffer's own and valid until it changes; null for null. */
KZ_API uint8_t* kz_dyn_buf_get_data(const kz_dyn_buf* buffer) KZ_NOEXCEPT;

/** Bytes in use; 0 for null. */
KZ_API uint32_t kz_dyn_buf_get_length(const kz_dyn_buf* buffer) KZ_NOEXCEPT;

KZ_C_END

#endif
