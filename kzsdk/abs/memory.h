/**
 * @file
 * Memory manager: one process-wide switch in front of the system heap.
 *
 * The switch starts off. While it is off every allocation fails and nothing is freed. One
 * kzmem_shutdown() switches memory off for every user in the process, however often it was switched
 * on, and the blocks that are still out can then no longer be given back. Dispose of everything
 * first; startup.h has a counted start for code that shares its process.
 *
 * Threads: the switch is read and written atomically; the allocation functions are as safe for use
 * from several threads as the system heap. Switching off while another thread works with the
 * library makes that thread's allocations fail and its blocks leak.
 */
#ifndef KZSDK_ABS_MEMORY_H
#define KZSDK_ABS_MEMORY_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"

KZ_C_BEGIN

/**
 * Switches the memory manager on.
 *
 * @param first   Accepted and ignored.
 * @param second  Accepted and ignored.
 * @return 0, or KZ_MEM_ALREADY_ON when it is already on (nothing changes).
 */
KZ_API kz_status kzmem_initialize(uint32_t first, int32_t second) KZ_NOEXCEPT;

/**
 * Switches the memory manager off. Blocks that are still out are neither freed nor tracked.
 *
 * @return 0, or KZ_MEM_NOT_ON when it is already off.
 */
KZ_API kz_status kzmem_shutdown(void) KZ_NOEXCEPT;

/**
 * Reports whether the memory manager is on.
 *
 * @return KZ_MEM_ALREADY_ON when it is on, KZ_MEM_NOT_ON when it is off; never 0.
 */
KZ_API kz_status kzmem_query_availability(void) KZ_NOEXCEPT;

/**
 * Allocates @p size bytes, uninitialised. A size of 0 is passed to the heap as it is.
 *
 * @return A block that the caller frees with _kzmem_free(); null when the manager is off or the
 *         heap fails.
 */
KZ_API void* _kzmem_malloc(uint32_t size) KZ_NOEXCEPT;

/**
 * Allocates @p count times @p size cleared bytes.
 *
 * The product is taken modulo 2^32 and not checked: a caller that multiplies to 2^32 or more gets
 * a small block. Check the product first.
 *
 * @return A block that the caller frees with _kzmem_free(); null when the manager is off or the
 *         heap fails.
 */
KZ_API void* _kzmem_calloc(uint32_t count, uint32_t size) KZ_NOEXCEPT;

/**
 * Resizes a block as `realloc` does, a size of 0 included: that frees the block and mostly returns
 * null, so the block must not be freed again. Use _kzmem_free() instead.
 *
 * @param block  A block of the library's, or null.
 * @return The resized block; null when the manager is off or the heap fails, with the old block
 *         untouched and still the caller's (unless the size was 0).
 */
KZ_API void* _kzmem_realloc(void* block, uint32_t size) KZ_NOEXCEPT;

/**
 * Frees a block.
 *
 * @param block  A block of the library's, or null, which does nothing.
 * @return 0, or KZ_MEM_NOT_ON while the manager is off: then nothing is freed.
 */
KZ_API kz_status _kzmem_free(void* block) KZ_NOEXCEPT;

/** `memset`, whether the manager is on or off. With a size of 0 pointers may be null. */
KZ_API void* kzmem_memset(void* destination, int32_t value, uint32_t size) KZ_NOEXCEPT;

/** `memmove`, whether the manager is on or off. The areas may overlap. */
KZ_API void* kzmem_memmove(void* destination, const void* source, uint32_t size) KZ_NOEXCEPT;

/** `memcpy`, whether the manager is on or off. The areas must not overlap. */
KZ_API void* kzmem_memcpy(void* destination, const void* source, uint32_t size) KZ_NOEXCEPT;

/**
 * Compares @p length bytes as unsigned values.
 *
 * @return -1, 0 or 1; 0 for a length of 0.
 */
KZ_API int16_t kzmem_memcmp(const void* a, const void* b, uint32_t length) KZ_NOEXCEPT;

KZ_C_END

#endif
